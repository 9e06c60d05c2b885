// DNs as texts: checkers, the in-place normaliser, suffixes, parents, and the older machines.
#include "servers/vrnd/libdirbase/model/dn_plain.h"

#include <cstring>
#include <functional>
#include <memory>
#include <random>
#include <set>

#include "servers/vrnd/libdirbase/model/be_suffix.h"
#include "servers/vrnd/libdirbase/model/dn_check.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_suffix.h"
#include "tests/servers/vrnd/libdirbase/model/active_schema.h"

namespace {

// What an in-place routine makes of a text, in a block of its exact size.
std::string in_place(const std::function<char*(char*)>& routine, const std::string& text)
{
    const std::unique_ptr<char[]> copy(new char[text.size() + 1]);
    std::memcpy(copy.get(), text.c_str(), text.size() + 1);
    EXPECT_EQ(routine(copy.get()), copy.get());
    return copy.get();
}

std::string taken(char* text)
{
    const std::string result = text == nullptr ? "(null)" : text;
    std::free(text);
    return result;
}

class DnPlain : public model_test::with_active_schema {};

TEST(DnCheck, TellsWhereATextStopsBeingADn)
{
    constexpr int good = -1;
    // clang-format off
    const struct {
        const char* text;
        int dn, rdn;  // offset of the fault
    } cases[] = {
        {"", good, good}, {"cn=a", good, good}, {"cn=", good, good}, {"cn=+sn=b", good, good},
        {"cn=a+sn=b", good, good}, {"cn=a+sn=b,o=x", good, 9}, {"cn=a;o=b", good, 4}, {"oid.2.5.4.3=a", good, good},
        {"OID.1=a", good, good}, {"oidx=a", good, good}, {"2.5.4.3=#0401", good, good}, {"cn=\"a,b\"", good, good},
        {"cn=a\\,b\\2Cc\\#\\\\", good, good}, {"\r\n cn \r=\n a b \r, o = x ", good, 15},
        {"cn=\"\\\"\\4f#\" ", good, good}, {"cn=a,", 5, 4}, {"cn=a+", 5, 5}, {"=a", 0, 0}, {"1cn=a", 1, 1},
        {"2.5.=a", 4, 4}, {"Oid.1=a", 3, 3}, {"oid.x=a", 4, 4}, {"cn a=b", 3, 3}, {"cn=,o=x", 3, 3}, {"cn=a=b", 4, 4},
        {"cn=\"a", 5, 5}, {"cn=\"a\\z\"", 5, 5}, {"cn=#0", 4, 4}, {"cn=#", 4, 4}, {"cn=#010", 6, 6},
        {"cn=a\\zb", 4, 4}, {"cn=a\\ ", 4, 4}, {"cn=a\\", 4, 4}, {"cn=a\\4", 4, 4}, {"cn=a#b", 4, 4},
        {"cn=\"a\"b", 6, 6}, {"cn", 2, 2}, {" ", 1, 1}, {"cn=a,,o=x", 5, 4},
    };
    // clang-format on
    for (const auto& c : cases) {
        for (const auto& [check, expected] : {std::pair(&dn_check, c.dn), std::pair(&rdn_check, c.rdn)}) {
            std::size_t offset = 999;
            EXPECT_EQ(check(c.text, &offset), expected == good ? 0 : 34) << c.text;
            EXPECT_EQ(offset, expected == good ? 999u : static_cast<std::size_t>(expected)) << c.text;
            EXPECT_EQ(check(c.text, nullptr), expected == good ? 0 : 34);
        }
    }
    const test_support::debug_catcher debug;
    for (const char* text : {static_cast<const char*>(nullptr), "2.=a", "=a", "cn a", "cn=,", "cn=\"a", "cn=a=b"}) {
        dn_check(text, nullptr);
        rdn_check(text, nullptr);
    }
    EXPECT_EQ(
        debug.texts(),
        (std::vector<std::string>{
            "dn_check: Found bad DN (NULL)\n", "Found bad DN (NULL)\n", "dn_check: Found bad char (expected digit)\n",
            "Found bad char (expected digit)\n", "dn_check: Found bad DN (dn[0]!=alpha_num)\n",
            "Found bad DN (dn[0]!=alpha_num)\n", "dn_check: Found bad char (expected '=')\n",
            "Found bad char (expected '=')\n", "missing value in RDN\n", "Found  , (expected end of rdn)\n",
            "dn_check: Found bad char (expected \")\n", "Found bad char (expected \")\n",
            "dn_check: Found more than one rdn within a rdn\n", "Found  =b (expected end of rdn)\n"}));
}

TEST_F(DnPlain, NormalizingCleansATextInPlace)
{
    const struct {
        const char *dn, *light, *full;
    } cases[] = {
        {"", "", ""},
        {"  cn = a b ,  o=x ; c = us  ", "cn=a b,o=x,c=us", nullptr},
        {"c n = a\n\n,\no=x\r\n", "cn=a,o=x", nullptr},
        {"cn=a\\,b;o=x\\=", "cn=a\\,b,o=x\\=", nullptr},
        {"cn=a\\b\\2C", "cn=ab2C", nullptr},
        {"cn=a\\\\\\b,o=\\\\", "cn=a\\\\b,o=\\\\", nullptr},
        {"cn=\"a b\" , o=x", "cn=\"a b\",o=x", nullptr},
        {"cn=\"a,;\\b\\\" \"junk;o= \"x\"", "cn=\"a,;b\\\" \";o=\"x\"", nullptr},
        {"cn=a\\ ,o=x\\ ", "cn=a,o=x", nullptr},
        {"cn=a\\\\ ,o=x\\\\ ", "cn=a\\\\,o=x\\\\", nullptr},
        {"cn=, o=x", "cn=, o=x", nullptr},
        {"a b c", "abc", nullptr},
        {"cn=a\\", "cn=a\\", nullptr},
        {"sn=b + cn=a;o=x", "sn=b+cn=a,o=x", "cn=a+sn=b,o=x"},
        {"cn=\"a\"+commonName=b+2.5.4.4=c,surname=d", "cn=\"a\"+commonName=b+2.5.4.4=c,surname=d",
         "cn=\"a\"+cn=b+sn=c,surname=d"},
        {"sn=b+cn=A\\+B+cn=\"+\"+cn=a;o=\"x\";c=y", "sn=b+cn=A\\+B+cn=\"+\"+cn=a,o=\"x\";c=y",
         "cn=\"+\"+cn=a+cn=A\\+B+sn=b,o=\"x\",c=y"},
        {"sn=b+1.1=a", "sn=b+1.1=a", "1.1=a+sn=b"},
        {"sn=b+foo=a", "sn=b+foo=a", nullptr},
        {"sn=b+a", "sn=b+a", nullptr},
        {"sn=b+cn=a,", "sn=b+cn=a,", nullptr},
        {"xan-kerberosname=abc,o=x", "xan-kerberosname=abc,o=x", "xan-kn=abc,o=x"},
        {"XAN-KerberosName=a", "XAN-KerberosName=a", "xan-kn=a"},
        {"xan-kerberosname=", "xan-kerberosname=", nullptr},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.dn);
        const std::string full = c.full == nullptr ? c.light : c.full;
        const test_support::message_catcher messages;
        EXPECT_EQ(in_place([](char* dn) { return dn_normalize_light(dn, 0); }, c.dn), c.light);
        EXPECT_EQ(in_place(dn_normalize, c.dn), full);
        EXPECT_EQ(in_place(dn_normalize_case, c.dn), in_place(dn_upcase, full));
        EXPECT_EQ(in_place([](char* dn) { return dn_normalize_light(dn, 1); }, c.dn), in_place(dn_upcase, c.light));
        EXPECT_EQ(messages.count(MSG_COMPONENT_RDBM, 13), full.find("foo") == full.npos ? 0u : 2u);
    }
    EXPECT_EQ(dn_normalize(nullptr), nullptr);
    EXPECT_EQ(dn_normalize_light(nullptr, 1), nullptr);
    EXPECT_EQ(dn_compare("sn=b+cn=a, o=X", "CN=a+sn=B,O=x"), 0);
    EXPECT_LT(dn_compare("cn=a", "cn=b"), 0);
    EXPECT_GT(dn_compare("cn=\"a\"+sn=b", "CN=\"A\"+SN=A"), 0);
}

TEST_F(DnPlain, LongTextsAreSortedAndCleanedWithoutGrowing)
{
    std::mt19937 random(1);
    std::multiset<std::string> values;
    std::string pairs;
    while (pairs.size() < 100'000) {
        const std::string value = std::to_string(100'000 + random() % 900'000);
        pairs += (pairs.empty() ? "commonName=" : "+2.5.4.3 = ") + value;
        values.insert(value);
    }
    std::string expected;
    for (const std::string& value : values) {
        expected += (expected.empty() ? "cn=" : "+cn=") + value;
    }
    EXPECT_EQ(in_place(dn_normalize, pairs + ",o=x"), expected + ",o=x");

    for (const char* unit :
         {",", "+", "\"", "\\", "\\ ", "=", "a=", "a=b+", " ", "\xFF", "\"\\", "a=\\\\ ,", "a=\"b\" +"}) {
        std::string text;
        while (text.size() < 100'000) {
            text += unit;
        }
        EXPECT_LE(in_place(dn_normalize_case, text).size(), text.size()) << unit;
        EXPECT_EQ(dn_check(text.c_str(), nullptr), 34) << unit;
        EXPECT_LE(taken(minAttrValue(text.c_str())).size(), text.size()) << unit;
    }
}

TEST_F(DnPlain, SmallTextRoutines)
{
    for (const auto& [text, leading, trailing] :
         {std::tuple("", "", ""), std::tuple(" \r\na ", "a ", " \r\na"), std::tuple("\ta\\ ", "\ta\\ ", "\ta\\ "),
          std::tuple(" \n", "", ""), std::tuple("a\\  \r", "a\\  \r", "a\\ "), std::tuple("\\\\ ", "\\\\ ", "\\\\")}) {
        EXPECT_EQ(in_place(string_strip_leading, text), leading);
        EXPECT_EQ(in_place(string_strip_trailing, text), trailing);
    }
    for (const auto& [value, bare] : {std::pair(" a b", "a b"), std::pair("\"a, \" ", "a, "), std::pair("#4142 ", "AB"),
                                      std::pair("#414", "A"), std::pair("a\\2c\\,b,c", "a,,b"), std::pair("a\\zb", "a"),
                                      std::pair("\\#a\\ ", "#a "), std::pair("a\\00b", "a"), std::pair("a=b", "a")}) {
        EXPECT_EQ(taken(minAttrValue(value)), bare) << value;
    }
    for (int i = 0; i < 16; ++i) {
        EXPECT_EQ(hexval("0123456789abcdef"[i]), i);
        EXPECT_EQ(hexval("0123456789ABCDEF"[i]), i);
    }
    EXPECT_STREQ(ShortRDNType("oid.2.5.4.3"), "cn");
    EXPECT_STREQ(ShortRDNType(model_test::long_name), "1.1");
    int temporary = 7;
    EXPECT_STREQ(dn_attr_get_short_name("emailAddress", &temporary), "email");
    EXPECT_EQ(temporary, 0);
    const test_support::message_catcher messages;
    EXPECT_EQ(ShortRDNType("foo"), nullptr);
    EXPECT_EQ(messages.count(MSG_COMPONENT_RDBM, 13), 1u);
    rdn_type* rdn = rdn_type_init("a=b=c");
    EXPECT_EQ(std::string(rdn->type) + "|" + rdn->value, "a|b=c");
    rdn_type_delete(rdn);
    EXPECT_EQ(rdn_type_init("ab"), nullptr);
}

TEST(DnMachines, FindTheEndsOfAnElement)
{
    using machine = const char* (*)(const char**, const char**, int*);
    const struct {
        machine type, value;
        const char* text;
        const char* expected;  // of the type, then of the value behind its "="
    } cases[] = {
        {find_end_attr_type33, find_end_attr_value33, " cn\t= a b ,c", "1-2>4 6-8>10"},
        {find_end_attr_type33, find_end_attr_value33, "1.2=\"a,\" +c", "0-2>3 4-7>9"},
        {find_end_attr_type33, find_end_attr_value33, "oID.1=#0a  ", "0-4>5 6-8>11"},
        {find_end_attr_type33, find_end_attr_value33, "a=\\ \\ ;", "0-0>1 2-5>6"},
        {find_end_attr_type33, find_end_attr_value33, "a= ,", "0-0>1 3-2>3"},
        {find_end_attr_type33, find_end_attr_value33, "a=", "0-0>1 e-1>2"},
        {find_end_attr_type33, find_end_attr_value33, "a", "e1>1"},
        {find_end_attr_type, find_end_attr_value, " cn\t= a b ,c", "1-2>4 6-8>10"},
        {find_end_attr_type, find_end_attr_value, "a=\\#", "0-0>1 e2>2"},
        {find_end_attr_type, find_end_attr_value, "a=", "0-0>1 2-1>2"},
        {find_end_attr_type, find_end_attr_value, "cn ", "0-1>3"},
        {find_end_attr_type, find_end_attr_value, "2.", "0-1>2"},
        {find_end_attr_type, find_end_attr_value, "2.x", "e7>2"},
        {find_end_attr_type, find_end_attr_value, "a=b<", "0-0>1 e6>3"},
    };
    for (const auto& c : cases) {
        const auto told = [&](machine find, const char* start) {
            const char *first = start, *last = nullptr;
            int error = 0;
            const char* next = find(&first, &last, &error);
            const std::string behind = ">" + std::to_string(next - c.text);
            return error != 0 ? "e" + std::to_string(error) + behind
                              : std::to_string(first - c.text) + "-" + std::to_string(last - c.text) + behind;
        };
        const char* equals = std::strchr(c.text, '=');
        EXPECT_EQ(told(c.type, c.text) + (equals == nullptr ? "" : " " + told(c.value, equals + 1)), c.expected)
            << c.text;
    }
}

TEST_F(DnPlain, SuffixesAndParents)
{
    const struct {
        const char *dn, *suffix;
        bool norm, ignoring_case;
    } suffixes[] = {
        {"cn=b", "cn=b", true, true},
        {"acn=b", "cn=b", false, false},
        {"a=c,cn=b", "cn=b", true, true},
        {"a=c,cn=B", "CN=b", false, true},
        {"b", "cn=b", false, false},
        {"a=c;cn=b", "cn=b", false, false},
        {"", "", true, true},
        {"cn=b", "", false, false},
        {nullptr, "", false, false},
        {"", nullptr, false, false},
    };
    for (const auto& c : suffixes) {
        EXPECT_EQ(dn_issuffix_norm(c.dn, c.suffix), c.norm);
        EXPECT_EQ(dn_issuffix(c.dn, c.suffix), c.ignoring_case);
        EXPECT_EQ(are_nested_dn(c.dn, c.suffix), c.norm);
        EXPECT_EQ(are_nested_dn(c.suffix, c.dn), c.norm);
    }
    char suffix[] = "O=X,C=Y";
    char other[] = "O=Z";
    char* list[] = {other, suffix, nullptr};
    Backend be{.be_suffix = list, .be_type = "rdbm"};
    const struct {
        const char *dn, *parent, *parent_norm;  // both below the back end
    } parents[] = {
        {"cn=a, o=x", " o=x", " o=x"},
        {"o=x", "(null)", "(null)"},
        {"cn=\"a,b\",o=y", "o=y", "o=y"},
        {"cn=a\\,b;o=y", "o=y", "o=y"},
        {"cn=\"\\\",\",o=y", "o=y", "o=y"},
        {"o=x, c=y", "(null)", " c=y"},
        {"O=X,C=Y", "(null)", "(null)"},
        {"O=Z", "(null)", "(null)"},
        {"cn=a,O=Z", "O=Z", "O=Z"},
        {"a.b@c.d", "c.d", "c.d"},
        {"a.b.c", "b.c", "b.c"},
        {"a@", "(null)", "(null)"},
        {"cn=a,", "(null)", "(null)"},
        {"", "(null)", "(null)"},
        {"name", "(null)", "(null)"},
        {"cn=a\\", "(null)", "(null)"},
        {nullptr, "(null)", "(null)"},
    };
    for (const auto& c : parents) {
        SCOPED_TRACE(c.dn == nullptr ? "null" : c.dn);
        EXPECT_EQ(taken(dn_parent(&be, c.dn)), c.parent);
        EXPECT_EQ(taken(dn_parent_norm(&be, c.dn)), c.parent_norm);
        char* parent = nullptr;
        EXPECT_EQ(dn_get_parent(&be, c.dn, &parent), 0);
        EXPECT_EQ(taken(parent), c.parent);
        EXPECT_EQ(dn_get_parent_norm(&be, c.dn, &parent, 1), 0);
        EXPECT_EQ(taken(parent), c.parent_norm);
        EXPECT_EQ(dn_get_parent_norm(&be, c.dn, &parent, 0), 0);
        EXPECT_EQ(parent == nullptr ? "(null)" : std::string(parent), c.parent_norm);
        EXPECT_TRUE(parent == nullptr || parent + std::strlen(parent) == c.dn + std::strlen(c.dn));
    }
    EXPECT_EQ(taken(dn_parent(nullptr, "O=X,C=Y")), "C=Y");
    EXPECT_EQ(be_issuffix_internal(&be, "o = x , c=\"y\"", 0), 1);
    EXPECT_EQ(be_issuffix_internal(&be, "o=x,,c=y", 0), 0);
    be.be_suffix = nullptr;
    EXPECT_EQ(be_issuffix_internal(&be, "O=Z", 1), 0);
}

}  // namespace
