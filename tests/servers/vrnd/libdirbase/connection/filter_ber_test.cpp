// Filters as clients send them.
#include "servers/vrnd/libdirbase/connection/filter_ber.h"

#include "libraries/libber/ldap_result.h"
#include "libraries/libpwd/pwd_format.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "tests/servers/vrnd/libdirbase/connection/filter_fixture.h"
#include "tests/servers/vrnd/libdirbase/model/active_schema.h"
#include "tests/support/message_catcher.h"

using namespace model_test;
using test_support::ber_string;
using test_support::ber_value;
using test_support::debug_catcher;
using test_support::message_catcher;

namespace {

using GetFilter = Model;

TEST_F(GetFilter, NormalisesWhatItKnowsAndLeavesOutWhatItDoesNot)
{
    const std::string longest(info_of("cn")->attr->length, 'X');
    const std::string too_long = longest + "X";
    const struct {
        std::string filter;
        std::string told;
    } cases[] = {
        {"(CN=Bob Smith)", "(cn=BOB SMITH)"},
        {"(CommonName;x=a)", "undefined"},  // tags are switched off
        {"(cn>=b)", "(cn>=B)"},
        {"(cn<=b)", "(cn<=B)"},
        {"(cn~=b)", "(cn~=B)"},
        {"( Cn =a)", "(cn=A)"},
        {"(CN=*)", "(cn=*)"},
        {"(nosuch=*)", "undefined"},
        {"(cn=a*b*c)", "(cn=A*B*C)"},
        {"(cn=*a)", "(cn=*A)"},
        {"(cn=a*)", "(cn=A*)"},
        {"(cn=*a*b*)", "(cn=*A*B*)"},
        {"(cn=a\\28b\\29\\2a\\5c)", "(cn=A\\28B\\29\\2a\\5c)"},
        {"(cn=\\fc\\0a)", "(cn=\xfc\n)"},
        {"(member=CN = a)", "(member=CN=A)"},
        {"(member=*a*)", "(member=*A*)"},  // no DN, taken as text
        {"(member=no dn)", "34"},
        {"(number=12)", "(number=12)"},
        {"(nosuch=a)", "undefined"},
        {"(nosuch=a*b)", "undefined"},
        {"(&(cn=a)(nosuch=b))", "undefined"},
        {"(&(nosuch=b)(cn=a))", "undefined"},
        {"(|(cn=a)(nosuch=b))", "(|(cn=A))"},
        {"(|(nosuch=b)(cn=a)(nosuch=c)(sn=d))", "(|(cn=A)(sn=D))"},
        {"(|(nosuch=b))", "undefined"},
        {"(!(nosuch=b))", "undefined"},
        {"(!(|(nosuch=b)(cn=a)))", "(!(|(cn=A)))"},
        {"(|(&(cn=a)(nosuch=*))(sn=b))", "(|(sn=B))"},
        {"(&)", "undefined"},
        {"(|)", "undefined"},
        {"(cn=" + longest + ")", "(cn=" + longest + ")"},
        {"(cn=*" + longest + ")", "(cn=*" + longest + ")"},
        {"(member=cn=x, " + longest.substr(15) + "=y)", "17"},
        {"(cn=" + too_long + ")", "undefined"},
        {"(cn=*" + too_long + ")", "undefined"},
        {"(debug=any\\01thing)", "(debug=any\x01thing)"},
        {"(DEBUG>=x)", "(debug>=x)"},
        {"(&(cn=a)(member=no dn)(nosuch=b))", "34"},
        {"(|(cn=a)(member=no dn))", "34"},
        {"(&(nosuch=b)(member=no dn))", "34"},  // undefined as it is, it's read to its end
        {"(oneWay=a)", "53"},
        {"(oneWay=*)", "(oneway=*)"},
        {"(twoWay>=a)", "53"},
        {"(twoWay=a*)", "53"},
        {"(twoWay=*)", "(twoway=*)"},
        {"(cert=\\00\\01\\02)", "(cert=)"},
        {"(cn=a\\00)", "21"},
    };
    for (const auto& test : cases) {
        const filter_answer answer = read_filter_text(test.filter.c_str());
        EXPECT_EQ(told(answer), test.told) << test.filter;
        EXPECT_EQ(answer.filter != nullptr, answer.text != nullptr);
        EXPECT_TRUE(answer.left == 0 || answer.result != 0) << test.filter;
        if (answer.filter != nullptr && test.told.find('\\') == std::string::npos) {
            EXPECT_EQ(owned(filter2str(answer.filter.get())).get(), test.told);
        }
    }
    EXPECT_EQ(read_filter_text("(cert=\\00\\01\\02)").filter->f_ava.ava_value.bv_len, 3u);
    set_g_language_tags_enabled(1);
    EXPECT_EQ(told(read_filter_text("(cn;lang-DE=a)")), "(cn;lang-de=A)");
    set_g_language_tags_enabled(0);
}

TEST_F(GetFilter, TakesNoBytesFromBeyondAConstruction)
{
    const std::string cn = ber_string("cn");
    const std::string a = ber_string("a");
    const std::string equality = ber_value(0xa3, cn + a);
    const auto pieces = [&](const std::string& members) { return ber_value(0xa4, cn + ber_value(0x30, members)); };
    const struct {
        const char* what;
        std::string bytes;
        const char* told;
    } cases[] = {
        {"nothing", "", "2"},
        {"an unknown tag", ber_value(0xaa, ""), "2"},
        {"a NOT as a value", ber_value(0x82, equality), "2"},
        {"a type alone", ber_value(0xa3, cn), "2"},
        {"the value outside the assertion", ber_value(0xa1, ber_value(0xa3, cn) + a), "2"},
        {"a member longer than the set", ber_value(0xa0, equality.substr(0, 7)) + equality.substr(7), "2"},
        {"unknown members behind a value", ber_value(0xa1, ber_value(0xa3, cn + a + a) + equality), "(|(cn=A)(cn=A))"},
        {"two children of a NOT", ber_value(0xa2, equality + equality), "2"},
        {"no child of a NOT", ber_value(0xa2, ""), "2"},
        {"a byte 0 in a type", ber_value(0xa3, ber_value(4, std::string("c\0n", 3)) + a), "2"},
        {"a byte 0 in a type that is present", ber_value(0x87, std::string("c\0n", 3)), "2"},
        {"no pieces", pieces(""), "2"},
        {"an empty piece", pieces(ber_value(0x81, "")), "21"},
        {"an empty piece of an unknown type", ber_value(0xa4, ber_string("x") + ber_value(0x30, ber_value(0x81, ""))),
         "21"},
        {"a byte 0 in a piece", pieces(ber_value(0x80, std::string("a\0", 2))), "21"},
        {"an unknown kind of piece", pieces(ber_value(0x83, "a")), "2"},
        {"two initial pieces", pieces(ber_value(0x80, "a") + ber_value(0x80, "b")), "2"},
        {"two final pieces", pieces(ber_value(0x82, "a") + ber_value(0x82, "b")), "2"},
        {"pieces in another order", pieces(ber_value(0x82, "a") + ber_value(0x81, "b")), "(cn=*A*B)"},
        {"a piece longer than the pieces",
         ber_value(0xa4, cn + ber_value(0x30, "\x80\x02"
                                              "a")),
         "2"},
        {"extensible match", ber_value(0xa1, ber_value(0xa9, ber_value(0x82, "cn")) + equality), "(|(cn=A))"},
        {"a list in a primitive value", ber_value(0xa2, ber_value(0x80, equality)), "2"},
    };
    for (const auto& test : cases) {
        EXPECT_EQ(told(read_filter(test.bytes)), test.told) << test.what;
    }
    for (const unsigned tag : {0x85u, 0xa0u, 0x31u, 0x80u}) {  // in the place of the SEQUENCE
        EXPECT_EQ(told(read_filter(ber_value(0xa4, cn + ber_value(tag, ber_value(0x80, "a"))))), "2") << tag;
    }
    const std::string whole =
        ber_value(0xa0, equality + pieces(ber_value(0x80, "a")) + ber_value(0xa2, ber_value(0x87, "sn")));
    const filter_answer answer = read_filter(whole + "more");
    EXPECT_EQ(told(answer), "(&(cn=A)(cn=A*)(!(sn=*)))");
    EXPECT_EQ(answer.left, 4u);
    // Cut anywhere, inside of lengths that hold.
    const std::string substrings = pieces(ber_value(0x80, "a"));
    for (const std::string& member : {equality, substrings, ber_value(0xa2, equality)}) {
        for (std::size_t length = 1; length < member.size(); ++length) {
            std::string cut = member.substr(0, length);
            EXPECT_EQ(told(read_filter(ber_value(0xa0, cut))), "2") << length;
            if (length >= 2) {
                cut[1] = static_cast<char>(length - 2);
                EXPECT_EQ(told(read_filter(ber_value(0xa0, cut))), "2") << length;
            }
        }
    }
}

std::string nested(unsigned levels)
{
    std::string bytes = ber_value(0x87, "cn");
    for (unsigned i = 1; i < levels; ++i) {
        bytes = ber_value(i % 2 == 0 ? 0xa2 : 0xa0, bytes);
    }
    return bytes;
}

TEST_F(GetFilter, ReadsDeepFiltersAndRefusesThoseThatAreTooDeep)
{
    const filter_answer deepest = read_filter(nested(FILTER_MAX_DEPTH));
    EXPECT_EQ(told(deepest).size(), 6u + 3u * (FILTER_MAX_DEPTH - 1));
    for (const unsigned levels : {FILTER_MAX_DEPTH + 1, 5000u}) {
        const filter_answer refused = read_filter(nested(levels));
        EXPECT_EQ(told(refused), "53");
        EXPECT_STREQ(refused.error_text.get(), "The search filter has more than 100 levels.");
    }
    EXPECT_EQ(told(read_filter(std::string(200000, '\xa2'))), "2");
    const std::string member = ber_value(0xa3, ber_string("cn") + ber_string("a"));
    std::string members;
    for (int i = 0; i < 100000; ++i) {
        members += member;
    }
    EXPECT_EQ(told(read_filter(ber_value(0xa1, members))).size(), 3u + 100000u * 6u);
}

TEST_F(GetFilter, TellsWhoSentAnAssertionThatIsNone)
{
    Operation operation;
    operation.o_opid = 7;
    Connection conn;
    conn.c_connid = 42;
    const message_catcher messages;
    const debug_catcher debug;
    read_filter(ber_value(0xa3, ber_string("cn")), &conn);
    conn.c_ops = &operation;
    conn.c_client_ip = "192.0.2.1";
    read_filter(ber_value(0xa8, ""), &conn);
    BerElement nothing = {};
    ava assertion;
    EXPECT_EQ(get_ava(&nothing, &assertion), LDAP_PROTOCOL_ERROR);
    ASSERT_EQ(messages.count(MSG_COMPONENT_SERVER, 5), 3u);
    using arguments = std::vector<std::string>;
    EXPECT_EQ(messages.messages()[0].arguments, (arguments{"42", "NULL", "0", "get_ava_for_filter"}));
    EXPECT_EQ(messages.messages()[1].arguments, (arguments{"42", "192.0.2.1", "7", "get_ava_for_filter"}));
    EXPECT_EQ(messages.messages()[2].arguments, (arguments{"-1", "NULL", "0", "get_ava"}));
    EXPECT_TRUE(debug.has("Error - get_ava_for_filter: SBER_SCANF failed.\n"));
}

TEST_F(GetFilter, AsksWhatTheConnectionMayAsk)
{
    Connection open, secure;
    secure.c_ssl = 1;
    info_of("cn")->secure_connection = 1;
    info_of("sn")->non_matchable = 1;
    for (const char* const filter : {"(cn=a)", "(cn<=a)", "(cn=a*)", "(|(sn=*)(!(cn=a)))"}) {
        const filter_answer refused = read_filter_text(filter, &open);
        EXPECT_EQ(told(refused), "13") << filter;
        EXPECT_STREQ(refused.error_text.get(), "The attribute cn can be searched for only over a secure connection.");
        EXPECT_EQ(read_filter_text(filter, &secure).result, 0) << filter;
    }
    EXPECT_EQ(told(read_filter_text("(sn=a)", &secure)), "53");
    EXPECT_EQ(told(read_filter_text("(sn=a*)", &secure)), "53");
}

TEST_F(GetFilter, TellsTheDebugLogWhyThereIsNoFilter)
{
    const std::string cn = ber_string("cn");
    const struct {
        std::string bytes;
        const char* line;
    } cases[] = {
        {ber_value(0xaa, ""), "get_filter: unknown filter type 170\n"},
        {ber_value(0xa9, ""), "get_filter: extensibleMatch filter type is not supported\n"},
        {ber_value(0xa3, ber_string("x") + cn), "get_ava_for_filter: Unknown attribute in filter.\n"},
        {ber_value(0xa3, cn + ber_value(4, std::string(5000, 'x'))),
         "get_ava_for_filter: value specified exceeds attribute length in schema.\n"},
        {ber_value(0xa4, cn + ber_value(0x30, ber_value(0x80, ""))), "get_substring_filter: Invalid syntax\n"},
        {ber_value(0xa4, cn + ber_value(0x30, ber_value(0x83, "a"))), "get_substring_filter: unknown type\n"},
        {ber_value(0xa4, cn + ber_value(0x30, ber_value(0x80, std::string(5000, 'x')))),
         "get_substring_filter: value longer than schema allows.\n"},
    };
    for (const auto& test : cases) {
        const debug_catcher debug;
        EXPECT_EQ(read_filter(test.bytes).filter, nullptr);
        EXPECT_TRUE(debug.has(test.line)) << test.line;
    }
}

TEST_F(GetFilter, EncodesTheValueOfATwoWayAttribute)
{
    filter_answer answer = read_filter_text("(twoWay=secret)");
    ASSERT_EQ(told(answer), "(twoway=SECRET)");
    ava& assertion = answer.filter->f_ava;
    char* text = nullptr;
    unsigned long length = 0;
    ASSERT_EQ(
        unformat_password(assertion.ava_encoded.bv_val, assertion.ava_encoded.bv_len, g_DirKeyData, &text, &length), 1);
    EXPECT_STREQ(owned(text).get(), "SECRET");
    filter_answer plain = read_filter_text("(cn=a)");
    answer.filter->f_next = plain.filter.get();
    EXPECT_EQ(filter_swap_with_encoded(answer.filter.get()), 0);  // the last one had nothing to swap
    EXPECT_STREQ(assertion.ava_encoded.bv_val, "SECRET");
    EXPECT_STREQ(plain.filter->f_ava.ava_value.bv_val, "A");
    answer.filter->f_next = nullptr;
    EXPECT_EQ(filter_swap_with_encoded(answer.filter.get()), 1);
    EXPECT_STREQ(assertion.ava_value.bv_val, "SECRET");
    EXPECT_EQ(filter_swap_with_encoded(read_filter_text("(|(twoWay=a))").filter.get()), 0);
}

TEST_F(GetFilter, ListsAndAssertionsCanBeReadByThemselves)
{
    const std::string members = ber_value(0x87, "cn") + ber_value(0x87, "nosuch") + ber_value(0x87, "sn");
    const struct {
        std::uint64_t choice;
        int result;
        const char* text;
    } cases[] = {{LDAP_FILTER_OR, 0, "(cn=*)(sn=*)"}, {LDAP_FILTER_AND, 0, nullptr}, {LDAP_FILTER_NOT, 1, nullptr}};
    for (const auto& test : cases) {
        ber_input input(ber_value(0x31, members));
        Filter* list = nullptr;
        char* text = nullptr;
        EXPECT_EQ(get_filter_list(nullptr, input.get(), &list, &text, test.choice, nullptr), test.result);
        EXPECT_STREQ(owned(text).get(), test.text);
        EXPECT_EQ(list != nullptr, test.text != nullptr);
        for (; list != nullptr; filter_free(std::exchange(list, list->f_next))) {}
    }
    for (const char* const filter : {"(nosuch=a)", "(cn=a\\00)", "(cn=%)", "(oneWay=a)"}) {
        filter_guard raw(str2filter(filter, 0));
        if (std::strchr(filter, '%') != nullptr) {
            std::free(raw->f_ava.ava_value.bv_val);
            raw->f_ava.ava_value = {5000, ::strdup(std::string(5000, 'x').c_str())};
        }
        ber_input input(test_support::ber_of(*raw));
        ava assertion;
        const int result = get_ava_for_filter(nullptr, input.get(), &assertion, LDAP_FILTER_EQUALITY, nullptr);
        EXPECT_EQ(result, filter[1] == 'n' ? 16 : filter[1] == 'o' ? 53 : filter[4] == '%' ? 19 : 21) << filter;
        EXPECT_TRUE(assertion.ava_type == nullptr && assertion.ava_value.bv_val == nullptr);
    }
    for (const char* const filter : {"(nosuch=a*b*)", "(cn=a*b*)"}) {
        ber_input input(test_support::ber_of(*filter_guard(str2filter(filter, 0))));
        const filter_guard record(static_cast<Filter*>(std::calloc(1, sizeof(Filter))));
        char* text = nullptr;
        EXPECT_EQ(get_substring_filter(nullptr, input.get(), record.get(), &text, nullptr), filter[1] == 'n' ? 16 : 0);
        EXPECT_STREQ(owned(text).get(), filter[1] == 'n' ? nullptr : "(cn=A*B*)");
        EXPECT_STREQ(record->f_sub.f_sub_type, filter[1] == 'n' ? "nosuch" : "cn");
    }
    const struct {
        const char* type;
        const char* value;
        const char* normal;
    } compared[] = {{" CN ", "a", "A"}, {"nosuch", "a", "A"}, {"member", "no dn", "no dn"}, {"number", "x", "x"}};
    for (const auto& test : compared) {
        ber_input input(ber_value(0x30, ber_string(test.type) + ber_string(test.value)));
        ava assertion;
        EXPECT_EQ(get_ava(input.get(), &assertion), LDAP_SUCCESS);
        EXPECT_STREQ(assertion.ava_value.bv_val, test.normal);
        EXPECT_EQ(assertion.ava_value.bv_len, std::strlen(test.normal));
        ava_free(&assertion, 0);
        EXPECT_EQ(assertion.ava_type, nullptr);
    }
}

TEST(ExpandFilterValue, EscapesFourBytes)
{
    const debug_catcher debug(LDAP_DEBUG_TRACE);
    char* text = nullptr;
    ASSERT_EQ(expand_filter_value("(a\0*)\\\xff", 7, &text), LDAP_SUCCESS);
    EXPECT_EQ(std::memcmp(text, "\\28a\0\\2a\\29\\5c\xff", 16), 0);
    std::free(text);
    ASSERT_EQ(expand_filter_value(nullptr, 0, &text), LDAP_SUCCESS);
    EXPECT_STREQ(owned(text).get(), "");
    for (const std::size_t length : {8099u, 8100u}) {
        ASSERT_EQ(expand_filter_value(std::string(length, 'x').c_str(), length, &text), LDAP_SUCCESS);
        EXPECT_EQ(std::strlen(text), length);
        std::free(text);
    }
    EXPECT_TRUE(debug.has("expand_filter_value: " + std::string(8099, 'x') + "\n"));
    EXPECT_TRUE(debug.has("expand_filter_value: too long\n"));
}

class GetFilterShipped : public with_active_schema {};

TEST_F(GetFilterShipped, PiecesHaveTheNormalFormOfTheirSyntax)
{
    const struct {
        const char* filter;
        const char* told;
    } cases[] = {
        {"(c=u*)", "(c=U*)"},
        {"(c=*S)", "(c=*S)"},
        {"(c=1*)", "(c=1*)"},  // of one character anything is taken
        {"(c=u1*)", "21"},
        {"(c=u)", "21"},
        {"(telephoneNumber=+1 2-3*4 5)", "(telephonenumber=+123*45)"},
        {"(telephoneNumber=*-*)", "(telephonenumber=**)"},
        {"(seeAlso=cn = X*)", "(seealso=CN=X*)"},
        {"(seeAlso=*x,c=*)", "(seealso=*X,C=*)"},
        {"(seeAlso=nosuch=x*)", "17"},
    };
    for (const auto& test : cases) {
        EXPECT_EQ(told(read_filter_text(test.filter)), test.told) << test.filter;
    }
}

TEST(FilterConstraints, AreThoseOfTheAttributeAndTheConnection)
{
    char name[] = "secret";
    char* names[] = {name, nullptr};
    const auto answer = [&](std::uint64_t choice, int encryption, bool matchable, bool secure, const Connection* conn) {
        asyntaxinfo info = {};
        info.names = names;
        info.encryption = encryption;
        info.non_matchable = matchable ? 0 : 1;
        info.secure_connection = secure ? 1 : 0;
        char* text = nullptr;
        const int result = filter_check_attr_constraints(conn, choice, &info, &text);
        const heap_chars owner = owned(text);
        EXPECT_EQ(result == LDAP_SUCCESS, text == nullptr);
        const std::string words = text == nullptr ? "" : text;
        EXPECT_TRUE(words.empty() || words.find("secret") != std::string::npos) << words;
        const char* const parts[] = {"equality and presence", "one way", "can not be used", "secure connection"};
        for (int i = 0; i < 4; ++i) {
            if (words.find(parts[i]) != std::string::npos) {
                return std::to_string(result) + "/" + std::to_string(157 + i);
            }
        }
        return std::to_string(result);
    };
    const Connection open;
    Connection bound, tls, audited;
    bound.c_bind_state = 1;
    tls.c_ssl = 1;
    audited.c_audit_flag = 1;
    constexpr auto present = LDAP_FILTER_PRESENT, equality = LDAP_FILTER_EQUALITY, substrings = LDAP_FILTER_SUBSTRINGS;
    const struct {
        std::uint64_t choice;
        int encryption;
        bool matchable, secure;
        const Connection* conn;
        const char* told;
    } cases[] = {
        {equality, 1, true, false, &open, "0"},
        {substrings, 133, true, false, &open, "53/157"},
        {LDAP_FILTER_LE, 133, true, false, &open, "53/157"},
        {equality, 133, true, false, &open, "0"},
        {present, 133, true, false, &open, "0"},
        {equality, 133, false, false, &open, "53/159"},
        {equality, 9, true, false, &open, "53/158"},
        {LDAP_FILTER_APPROX, 9, true, false, &open, "53/158"},
        {present, 9, true, false, &open, "0"},
        {equality, 1, false, true, &open, "53/159"},
        {present, 1, false, false, &open, "53/159"},
        {LDAP_FILTER_GE, 1, true, true, &open, "13/160"},
        {equality, 1, true, true, nullptr, "13/160"},
        {equality, 1, true, true, &bound, "0"},
        {equality, 1, true, true, &tls, "0"},
        {equality, 1, true, true, &audited, "0"},
        {LDAP_FILTER_AND, 9, false, true, &open, "0"},
        {LDAP_FILTER_EXTENDED, 9, false, true, &open, "0"},
    };
    for (const auto& test : cases) {
        EXPECT_EQ(answer(test.choice, test.encryption, test.matchable, test.secure, test.conn), test.told)
            << std::hex << test.choice << " " << test.encryption;
    }
    EXPECT_EQ(filter_check_attr_constraints(&open, equality, nullptr, nullptr), LDAP_SUCCESS);
    asyntaxinfo nameless = {};
    char* text = nullptr;
    EXPECT_EQ(filter_check_attr_constraints(&open, equality, &nameless, &text), LDAP_UNWILLING_TO_PERFORM);
    EXPECT_NE(std::string(owned(text).get()).find(" null "), std::string::npos);
}

}  // namespace
