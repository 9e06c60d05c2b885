// Language tags, and the forms and order of attribute names.
#include "servers/vrnd/libdirbase/model/language_tag.h"

#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

namespace {

class AttrNames : public model_test::Model {};

TEST(LanguageTag, NamesAreSplitAtTheirLastSemicolon)
{
    const std::string longest(240, 'T');
    struct {
        std::string name;
        const char* base;  // null: no tag
        std::string tag;
    } const table[] = {
        {"cn", nullptr, ""},
        {"cn;Lang-EN", "cn", "lang-en"},
        {"cn;a;B", "cn;a", "b"},
        {"cn;", "cn", ""},
        {";", "", ""},
        {"cert;Binary", nullptr, ""},
        {"cn;x;binary", nullptr, ""},
        {"cn;binary;X", "cn;binary", "x"},
        {"cn;" + longest, "cn", std::string(240, 't')},
    };
    for (const auto& row : table) {
        for (const int mode : {0, 1, 2}) {
            char untouched[] = "(untouched)";
            char* base = untouched;
            char* tag = untouched;
            EXPECT_EQ(parse_language_tags(row.name.c_str(), &base, &tag, mode, 1), 0) << row.name;
            EXPECT_STREQ(base, mode == 1 ? "(untouched)" : row.base) << row.name;
            EXPECT_STREQ(tag, mode == 2 ? "(untouched)" : (row.base == nullptr ? nullptr : row.tag.c_str()))
                << row.name;
            std::free(base == untouched ? nullptr : base);
            std::free(tag == untouched ? nullptr : tag);

            char buffer[language_tag_buffer] = "x";
            std::size_t length = 77;
            base = nullptr;
            EXPECT_EQ(parse_language_tags_with_buffer(row.name.c_str(), &base, buffer, &length, mode), 0);
            EXPECT_EQ(buffer, mode == 2 ? "" : row.tag) << row.name;
            EXPECT_EQ(length, std::strlen(buffer));
            std::free(base);
        }
    }
    char* base = nullptr;
    char* tag = nullptr;
    EXPECT_EQ(parse_language_tags(("cn;" + longest + "t").c_str(), &base, &tag, 2, 1), 21);
    const test_support::debug_catcher debug;
    EXPECT_EQ(parse_language_tags("cn;a", &base, &tag, 3, 1), 80);
    EXPECT_TRUE(debug.has("Error - parse_language_tags: parameter is not valid\n"));
    EXPECT_TRUE(base == nullptr && tag == nullptr);
}

TEST(LanguageTag, ValidTagsAndTheirOrder)
{
    const std::string longest = "lang-" + std::string(235, 'x');
    for (const char* tag : {"lang-e", "LANG-en-US1", "lang-en-1-x", longest.c_str()}) {
        EXPECT_EQ(is_valid_language_tag(tag), 1) << tag;
        EXPECT_TRUE(contains_valid_language_tag(("cn;" + std::string(tag)).c_str())) << tag;
    }
    for (const char* tag : {"lang-", "lang-en-", "lang--a", "lang-e1", "lang-en--x", "long-en", "lang-en_x", ""}) {
        EXPECT_EQ(is_valid_language_tag(tag), 0) << tag;
        EXPECT_FALSE(contains_valid_language_tag(("cn;" + std::string(tag)).c_str())) << tag;
    }
    EXPECT_EQ(is_valid_language_tag((longest + "x").c_str()), 0);
    EXPECT_FALSE(contains_valid_language_tag("cn") || contains_valid_language_tag("lang-en"));
    EXPECT_EQ(strtagcmp("", nullptr), 0);
    EXPECT_EQ(strtagcmp("LANG-en", "lang-EN"), 0);
    EXPECT_LT(strtagcmp(nullptr, "a"), 0);
    EXPECT_GT(strtagcmp("b", "A"), 0);
    EXPECT_GT(strtagcmp("a", ""), 0);
}

TEST_F(AttrNames, FormsOfNames)
{
    for (const char* name : {"oid.1.2.3", "OID.0", "2.5.4.3", "cn;lang-en", "a-b", "x", "oid"}) {
        EXPECT_TRUE(is_attr_name_valid(name, static_cast<int>(std::strlen(name)))) << name;
    }
    for (const char* name : {"", "1abc.", "-abc", "oid.", "oid.a", "1..2", "1.", "a b", "a\xc3\xbc", "oid..1", "1;x"}) {
        EXPECT_FALSE(is_attr_name_valid(name, static_cast<int>(std::strlen(name)))) << name;
    }
    EXPECT_TRUE(is_attr_name_valid("ab!", 2) && !is_attr_name_valid("ab", -1));
    EXPECT_TRUE(is_string_alphanum(nullptr) && is_string_alphanum("") && is_string_alphanum("aZ09"));
    EXPECT_FALSE(is_string_alphanum("a-b") || is_string_alphanum("\xc3\xbc"));
    char name[] = "\n OID.Ab\xc3\x9c \\  ";
    EXPECT_STREQ(attr_normalize(name), "oid.ab\xc3\x9c \\ ");
    EXPECT_STREQ(uppercase(removeOIDstr(name)), "AB\xc3\x9c \\ ");
    char listed[] = "CN", all[] = "*";
    char* const list[] = {listed, nullptr};
    char* const with_all[] = {listed, all, nullptr};
    EXPECT_TRUE(attr_selected("cn", const_cast<char**>(list)) && attr_selected("x", nullptr));
    EXPECT_TRUE(attr_selected("x", const_cast<char**>(with_all)) && !attr_selected("x", const_cast<char**>(list)));
}

TEST_F(AttrNames, OrderVersionsAndSyntaxes)
{
    struct {
        const char* a;
        const char* b;
        bool subtype;
    } const pairs[] = {
        {"cn", "commonName", true},         {"cn", "2.5.4.3;lang-en", true},     {"cn;lang-en", "cn", false},
        {"cn;lang-en", "CN;LANG-EN", true}, {"cn;lang-en", "cn;lang-de", false}, {"cn", "sn", false},
        {"cert;binary", "cert", false},     {"none", "nothing", true},           {"cn;lang-en", "sn;lang-en", false},
    };
    for (const auto& pair : pairs) {
        EXPECT_EQ(is_subtype_attr(pair.a, pair.b), pair.subtype) << pair.a << " " << pair.b;
    }
    asyntaxinfo* cn = model_test::info_of("cn");
    asyntaxinfo* sn = model_test::info_of("sn");
    const attr_type_key by_record[] = {{cn, "x"}, {sn, "a"}, {nullptr, "x"}, {nullptr, "X"}};
    EXPECT_LT(attr_type_cmp(&by_record[0], &by_record[1]), 0);
    EXPECT_EQ(attr_type_cmp(&by_record[0], &by_record[0]), 0);
    EXPECT_EQ(attr_type_cmp(&by_record[0], &by_record[2]), 1);
    EXPECT_EQ(attr_type_cmp(&by_record[2], &by_record[3]), 0);
    EXPECT_EQ(attr_syntax_name_cmp("CN", cn), 0);
    EXPECT_GT(attr_syntax_name_cmp("commonName", cn), 0);  // "cn" is the first name
    EXPECT_TRUE(attr_syntax_names_cmp("COMMONNAME", cn) == 0 && attr_syntax_names_cmp("sn", cn) == 1);
    EXPECT_EQ(attr_syntaxes_get(), nullptr);

    for (const int enabled : {0, 1}) {
        set_g_language_tags_enabled(enabled);
        asyntaxinfo* info = sn;
        EXPECT_EQ(attr_syntax_for_filter_return_asi("member", &info), SC_DN | SC_CIS);
        EXPECT_EQ(info, model_test::info_of("member"));
        EXPECT_EQ(attr_syntax_for_filter_return_asi("none", &info), 0u);
        EXPECT_EQ(info, nullptr);
        EXPECT_EQ(attr_syntax_for_filter("cn;lang-en"), enabled == 0 ? 0 : SC_CIS);
        EXPECT_EQ(attr_syntax_for_filter("cert;binary"), SC_BIN);
    }
    set_g_language_tags_enabled(0);
    EXPECT_TRUE(attr_syntax("none") == SC_CIS && attr_syntax("ref") == SC_CES && attr_syntax("flag") == SC_BOOL);
}

TEST_F(AttrNames, MappingsAreCheckedAndTakenApart)
{
    struct {
        const char* text;
        int message;  // 0 for a good one, -1 for a bad one without a message
        const char* told;
    } const table[] = {
        {"cn $ \nOID.1.2", 0, "cn 1.2"},
        {"oid.2.5.4.3$mail", 0, "2.5.4.3 mail"},
        {"", -1, ""},
        {"cn", 171, "cn"},
        {"cn$", 171, "cn$"},
        {"$cn", 171, "$cn"},
        {"none$mail", 168, "none"},
        {"cn$a b", 170, "a b"},
        {"cn$ ", 170, ""},
    };
    for (const auto& row : table) {
        const test_support::message_catcher log;
        char* first = nullptr;
        char* second = nullptr;
        EXPECT_EQ(verifyAttributeMapping(row.text, &second, &first), row.message == 0 ? 0 : 19) << row.text;
        EXPECT_EQ(verifyAttributeMapping(row.text, nullptr, nullptr), row.message == 0 ? 0 : 19) << row.text;
        if (row.message == 0) {
            EXPECT_EQ(std::string(first) + " " + second, row.told);
        } else {
            EXPECT_TRUE(first == nullptr && second == nullptr);
            ASSERT_EQ(log.count(MSG_COMPONENT_SERVER, row.message), row.message > 0 ? 2u : 0u) << row.text;
            EXPECT_TRUE(row.message < 0 || log.messages()[0].arguments[0] == row.told) << row.text;
        }
        std::free(first);
        std::free(second);
    }
    EXPECT_EQ(verifyAttributeMapping(nullptr, nullptr, nullptr), 19);
}

// The environment is asked once, so each answer takes a process of its own.
TEST(AttrNamesDeathTest, NamesGoOutInLowerCaseUnlessTheEnvironmentSaysNo)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    const auto answer_of = [](const char* value, int expected) {
        value == nullptr ? unsetenv("XANLDAP_ATTRLOWERCASE") : setenv("XANLDAP_ATTRLOWERCASE", value, 1);
        const int answer = convertAttrLowerCase();
        setenv("XANLDAP_ATTRLOWERCASE", answer == 1 ? "NO" : "YES", 1);
        std::exit(answer == expected && convertAttrLowerCase() == expected ? 0 : 1);
    };
    EXPECT_EXIT(answer_of(nullptr, 1), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(answer_of("no", 0), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(answer_of("FALSE", 0), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(answer_of("0", 1), testing::ExitedWithCode(0), "");
}

}  // namespace
