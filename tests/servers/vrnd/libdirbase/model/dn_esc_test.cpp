// Structured DNs: tables of spellings, and random DNs that a slow and obvious writer spells in many ways.
#include "servers/vrnd/libdirbase/model/dn_esc.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <memory>
#include <random>
#include <set>

#include "libraries/libber/ldap_result.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/uni_case.h"
#include "tests/servers/vrnd/libdirbase/base/slow_utf8.h"
#include "tests/servers/vrnd/libdirbase/model/active_schema.h"

namespace {

struct release {
    void operator()(ldap_escDN* dn) const { free_ldap_escDN(&dn); }
    void operator()(char* text) const { std::free(text); }
};
using heap_dn = std::unique_ptr<ldap_escDN, release>;
using heap_chars = std::unique_ptr<char, release>;

heap_dn normalized(const std::string& dn)
{
    return heap_dn(dn_normalize_esc(dn.c_str()));
}

std::string shown(const char* text)
{
    return text == nullptr ? "(null)" : text;
}

// "canonical | upper", or "result, internal error".
std::string told(const heap_dn& dn)
{
    if (dn == nullptr) {
        return "(null)";
    }
    return dn->result == 0 ? shown(GetDNString33(dn.get())) + " | " + shown(GetDNUpper33(dn.get()))
                           : std::to_string(dn->result) + ", " + std::to_string(dn->internal_error);
}

class DnNormalize : public model_test::with_active_schema {};

TEST_F(DnNormalize, SpellingsComeOutInOneForm)
{
    const struct {
        const char* dn;
        const char* expected;
    } cases[] = {
        {"", " | "},
        {" \r\n ", " | "},
        {"CN=Bob Smith , O=Acme ; C=us", "cn=Bob Smith,o=Acme,c=us | CN=BOB SMITH,O=ACME,C=US"},
        {"\r\n\t cn\t=\na\t\n,\to=x", "cn=a,o=x | CN=A,O=X"},
        {"2.5.4.3=a", "cn=a | CN=A"},
        {"oid.2.5.4.3=a", "cn=a | CN=A"},
        {"OID.2.5.4.3 = a", "cn=a | CN=A"},
        {"commonName=a,organizationalUnitName=b", "cn=a,ou=b | CN=A,OU=B"},
        {"emailAddress=a@b.c", "email=a@b.c | EMAIL=A@B.C"},
        {"1.1=a", "a-name-that-takes-much-more-room-than-the-number-it-is-written-by=a | "
                  "A-NAME-THAT-TAKES-MUCH-MORE-ROOM-THAN-THE-NUMBER-IT-IS-WRITTEN-BY=A"},
        // several pairs
        {"sn=b+cn=a", "cn=a+sn=b | CN=A+SN=B"},
        {"cn=b + CN=A+commonName=a;o=x", "cn=A+cn=a+cn=b,o=x | CN=A+CN=A+CN=B,O=X"},
        {"sn=c+cn=b+sn=a+cn=a+l=z", "cn=a+cn=b+l=z+sn=a+sn=c | CN=A+CN=B+L=Z+SN=A+SN=C"},
        // quotes, escapes, bytes
        {"cn=\"a,b\"", "cn=a\\,b | CN=A\\,B"},
        {"cn=a\\,b", "cn=a\\,b | CN=A\\,B"},
        {"cn=a\\2Cb", "cn=a\\,b | CN=A\\,B"},
        {"cn=\"<=>;+\\\"\\\\\"", "cn=\\<\\=\\>\\;\\+\\\"\\\\ | CN=\\<\\=\\>\\;\\+\\\"\\\\"},
        {"cn=a\\=b , o=\"x\" ", "cn=a\\=b,o=x | CN=A\\=B,O=X"},
        {"cn=\\41\\c3\\A9", "cn=A\u00E9 | CN=A\u00C9"},
        {"cn=#04024142", "cn=AB | CN=AB"},
        {"cn=#0482000141 ,o=x", "cn=A,o=x | CN=A,O=X"},
        {"cn=#0488000000000000000141", "cn=A | CN=A"},
        {"cn=\\#a#b", "cn=\\#a#b | CN=\\#A#B"},
        // blanks at the ends of values, and empty values
        {"cn=\\ a", "cn=\\ a | CN=\\ A"},
        {"cn=a\\ ,o=x", "cn=a\\ ,o=x | CN=A\\ ,O=X"},
        {"cn=a\\20  ,o=x", "cn=a\\ ,o=x | CN=A\\ ,O=X"},
        {"cn=\" a \"", "cn=\\ a\\  | CN=\\ A\\ "},
        {"cn=\"\\ a\\ \"", "cn=\\ a\\  | CN=\\ A\\ "},
        {"cn=\" \",o=\"  \"", "cn=\\ ,o=\\ \\  | CN=\\ ,O=\\ \\ "},
        {"cn=\"\na\t\"", "cn=\\0Aa\\09 | CN=\\0AA\\09"},
        {"cn=a\\\\ ,o=x", "cn=a\\\\,o=x | CN=A\\\\,O=X"},
        {"cn=,o=x", "cn=,o=x | CN=,O=X"},
        {"sn=a+cn=,o=x", "cn=+sn=a,o=x | CN=+SN=A,O=X"},
        {"cn=a,", "cn=a | CN=A"},
        {"cn=a;", "cn=a | CN=A"},
        // what the schema compares exactly stays as it is
        {"memberUid=aB,cn=aB", "memberUid=aB,cn=aB | MEMBERUID=aB,CN=AB"},
        {"memberUid=a\\+B+cn=aB,o=x", "cn=aB+memberUid=a\\+B,o=x | CN=AB+MEMBERUID=a\\+B,O=X"},
        {"memberUid=\xFF,o=x", "memberUid=\xFF,o=x | MEMBERUID=\xFF,O=X"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.dn);
        const heap_dn dn = normalized(c.dn);
        EXPECT_EQ(told(dn), c.expected);
        EXPECT_EQ(told(normalized(dn->canonical)), c.expected) << "the canonical text is normalised again";
        EXPECT_EQ(static_cast<std::size_t>(dn->length), std::strlen(dn->canonical));
    }
}

TEST_F(DnNormalize, WhatIsNoDnIsRefusedAndLeavesEmptyTexts)
{
    // clang-format off
    const struct {
        const char* dn;
        const char* expected;
    } cases[] = {
        {"\t", "34, 1"}, {"cn", "34, 1"}, {"cn a=b", "34, 1"}, {"=a", "34, 1"}, {"cn;=a", "34, 1"},
        {"cn,=a", "34, 1"}, {"cn-\xC3=a", "34, 1"}, {"2.5.=a", "34, 7"}, {"2..5=a", "34, 7"}, {"oid.x=a", "34, 7"},
        {"oid.", "34, 1"}, {"2.5.4.3a=b", "34, 1"}, {"cn=", "34, -1"}, {"cn= \t", "34, -1"}, {"cn=,", "34, -1"},
        {"cn=\"\"", "34, -1"}, {"ou=+cn=x", "34, -1"}, {"cn=x+ou=,", "34, -1"}, {"sn=x+cn=;", "34, -1"},
        {"cn=a+", "34, 1"}, {"cn=a, ", "34, 1"}, {"cn=a,,o=x", "34, 1"}, {",cn=a", "34, 1"}, {"cn=a\\z", "34, 2"},
        {"cn=a\\", "34, 2"}, {"cn=\"a\\", "34, 2"}, {"cn=a\\4z", "34, 3"}, {"cn=a\\4", "34, 3"}, {"cn=#0", "34, 3"},
        {"cn=#04z", "34, 4"}, {"cn=a=b", "34, 6"}, {"cn=<", "34, 6"}, {"cn=a\"b\"", "34, 6"}, {"cn=\"a\"b", "34, 9"},
        {"cn=#0401 41", "34, 9"}, {"cn=\"a", "34, 1"}, {"cn=a\\ b", "34, 1"}, {"cn=\"a\\ b\"", "34, 1"},
        {"cn=#", "34, 1"}, {"cn=# ,o=x", "34, 1"}, {"cn=#04", "34, 1"}, {"cn=#0502ab", "34, 1"},
        {"cn=#0489", "34, 1"}, {"cn=#048201", "34, 1"}, {"cn=a\\00b", "34, 1"}, {"cn=\"\\00\"", "34, 1"},
        {"cn=#040100", "34, 1"}, {"foo=a", "17, 10"}, {"cn=a,foo=a", "17, 10"}, {"9.9.9=a", "17, 10"},
        {"cn=a\xFF", "34, 34"}, {"o=x,cn=\xC3", "34, 34"}, {"cn=\xF0\x9F\x98\x80", "34, 34"},
        {"cn=a\xC0\x80" "b", "34, 34"}, {"cn=a\xC0\xA2" "b,o=x", "34, 34"}, {"cn=a\xE0\x80\xAC,memberUid=b", "34, 34"}, {"cn=a\xE9,memberUid=b", "34, 34"},
    };
    // clang-format on
    for (const auto& c : cases) {
        const test_support::message_catcher messages;
        const heap_dn dn = normalized(c.dn);
        EXPECT_EQ(told(dn), c.expected) << c.dn;
        EXPECT_EQ(messages.count(MSG_COMPONENT_RDBM, 13), dn->internal_error == DN_ERR_UNDEFINED ? 1u : 0u) << c.dn;
        if (dn->internal_error != DN_ERR_UTF8) {
            EXPECT_EQ(shown(dn->canonical) + shown(dn->upper) + dn->scratch, "") << c.dn;
        }
    }
    EXPECT_EQ(dn_normalize_esc(nullptr), nullptr);
    EXPECT_EQ(getRC(nullptr), 34);

    const test_support::debug_catcher debug;
    normalized("foo=a");
    normalized("2.x=a");
    normalized("cn a=b");
    EXPECT_EQ(debug.texts(), (std::vector<std::string>{"attribute foo is not defined in the schema\n",
                                                       "Found bad type spec, bad oid x not digit.\n",
                                                       "Found bad type spec, bad char a after type.\n"}));
}

TEST_F(DnNormalize, TwoThousandBytesPassAndOneMoreIsTooLong)
{
    const std::string most = "cn=" + std::string(dn_longest - 3, 'a');
    EXPECT_EQ(told(normalized(most)).size(), 2 * dn_longest + 3);
    for (const std::string& dn : {most + "a", " " + most, std::string(100'000, ',')}) {
        const heap_dn refused = normalized(dn);
        EXPECT_EQ(told(refused), "34, 64");
        EXPECT_EQ(refused->canonical, nullptr);
        EXPECT_EQ(refused->upper, nullptr);
        EXPECT_EQ(static_cast<std::size_t>(refused->length), dn.size());
    }
    EXPECT_EQ(told(normalized(std::string(100'000, ' '))), " | ");

    // Every byte escaped, and every type a number with a long name: the texts are longer than twice the input.
    EXPECT_EQ(told(normalized("cn=\"" + std::string(dn_longest - 5, '<') + "\"")).size(),
              2 * (2 * (dn_longest - 5) + 3) + 3);
    std::string numbers = "1.1=\"\n\"";
    std::string names = std::string(model_test::long_name) + "=\\0A";
    const std::string one = names;
    while (numbers.size() + 8 <= dn_longest) {
        numbers += numbers.size() % 3 == 0 ? ",1.1=\"\n\"" : "+1.1=\"\n\"";
        names += (numbers[numbers.size() - 8] + one);
    }
    const heap_dn grown = normalized(numbers);
    EXPECT_EQ(grown->canonical, names);
    EXPECT_EQ(grown->scratch, names);
}

TEST_F(DnNormalize, HostileRunsAreRefusedWhateverTheirLength)
{
    for (const char* unit :
         {",",     ";",      "+", "=",    "\"",   "\\",   "#",           "\\,",  "\\\"", "\"\\", "a=", "a=+", "cn=\"",
          "cn=\\", "cn=#04", "4", "\\41", "\xFF", "\xC3", "cn=\xE2\x82", "oid.", "1.",   "<>",   " ,", "\n="}) {
        for (const std::size_t size : {std::size_t{60}, dn_longest, dn_longest + 1, std::size_t{100'000}}) {
            std::string text;
            while (text.size() + std::strlen(unit) <= size) {
                text += unit;
            }
            EXPECT_NE(normalized(text)->result, LDAP_SUCCESS) << unit << " " << size;
        }
    }
    std::string reversed = "cn=99";
    for (int i = 98; i > 9; --i) {
        reversed += "+cn=" + std::to_string(i);
    }
    const heap_dn dn = normalized(reversed);
    EXPECT_TRUE(std::string(dn->canonical).starts_with("cn=10+cn=11+cn=12+"));
    EXPECT_STREQ(dn->rdns->last->rdn->value, "99");
}

TEST_F(DnNormalize, WithoutTheSchemaTypesStayAndEverythingIsFolded)
{
    const auto light = [](const char* dn) { return told(heap_dn(dn_normalize_light_esc(dn))); };
    EXPECT_EQ(light("foo=a"), "foo=a | FOO=A");
    EXPECT_EQ(light("memberUid = aB , 2.5.4.3=c"), "memberUid=aB,2.5.4.3=c | MEMBERUID=AB,2.5.4.3=C");
    EXPECT_EQ(light("Sn=b+commonName=a+CN=c"), "CN=c+commonName=a+Sn=b | CN=C+COMMONNAME=A+SN=B");
    EXPECT_EQ(light("cn=a=b"), "34, 6");
}

TEST_F(DnNormalize, TheRecordTellsWhatWasParsed)
{
    const heap_dn dn = normalized(" 2.5.4.4=\"b,\" + OID.2.5.4.3=a ; homeDirectory= /X#, commonName=\\ c , o=,c=d,");
    EXPECT_STREQ(dn->scratch, "sn=b\\,+OID.2.5.4.3=a,homeDirectory=/X#,commonName=\\ c,o=,c=d");
    EXPECT_EQ(dn->count, 5);
    EXPECT_EQ(dn->all_case_ignore & 1, 0u);
    const ldapDN_elem33& first = *dn->rdns;
    EXPECT_EQ(first.count, 2);
    EXPECT_EQ(first.syntax_mask, 1u);
    EXPECT_EQ(first.encrypted, 0u);
    EXPECT_STREQ(first.pairs->next->rdn->type, "sn");
    EXPECT_STREQ(first.pairs->next->rdn->value, "b,");
    EXPECT_EQ(first.next->syntax_mask, 0u);
    EXPECT_STREQ(first.next->next->pairs->rdn->value, " c");
    EXPECT_EQ(normalized("userPassword=a")->rdns->encrypted,
              ldcf_api_attr_get_info("userPassword", nullptr)->encryption != 1 ? 1u : 0u);
}

TEST_F(DnNormalize, TheOlderHandlingEscapesEveryHash)
{
    testing::GTEST_FLAG(death_test_style) = "threadsafe";
    EXPECT_EXIT(
        {
            setenv("VRND_V4_DN_PROCESSING", "", 1);
            const test_support::debug_catcher debug;
            const std::string told_twice = told(normalized("cn=\\#a\\23b,o=\"#\"")) + "; " + told(normalized("cn=a#b"));
            std::exit(told_twice == "cn=\\#a\\#b,o=\\# | CN=\\#A\\#B,O=\\#; 34, 6" && needsEscape('#') == 1 &&
                              debug.texts().at(0) == "WARNING!!! Setting DN processing to V4 style.\n" &&
                              debug.count() == 2
                          ? 0
                          : 1);
        },
        testing::ExitedWithCode(0), "");
}

// ---- random DNs
// ---------------------------------------------------------------------------------------------------------

struct slow_type {
    std::vector<std::string> spellings;  // the first is the schema's first name
    bool exact;
};
const slow_type slow_types[] = {
    {{"cn", "commonName", "2.5.4.3", "oid.2.5.4.3"}, false},
    {{"sn", "surname", "2.5.4.4", "Oid.2.5.4.4"}, false},
    {{"memberUid", "1.3.6.1.1.1.1.12"}, true},
    {{model_test::long_name, "1.1"}, false},
};
struct slow_pair {
    const slow_type* type;
    std::string value;  // bare
};
using slow_dn = std::vector<std::vector<slow_pair>>;

constexpr char specials[] = "\"+,;<=>\\";

std::string lower(std::string text)
{
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return c < 0x80 ? std::tolower(c) : c; });
    return text;
}

std::string hex_of(char c)
{
    char text[3];
    std::snprintf(text, sizeof text, "%02x", static_cast<unsigned>(static_cast<unsigned char>(c)));
    return text;
}

std::string upper_of(std::string text)
{
    EXPECT_EQ(test_support::slow_fold(text, UniToupper), 0);
    return text;
}

// The canonical text, or the upper one, by the rules of the header read one after the other.
std::string written(slow_dn dn, bool upper)
{
    std::string text;
    for (auto& rdn : dn) {
        std::stable_sort(rdn.begin(), rdn.end(), [](const slow_pair& a, const slow_pair& b) {
            return std::pair(lower(a.type->spellings[0]), lower(a.value)) <
                   std::pair(lower(b.type->spellings[0]), lower(b.value));
        });
        text += text.empty() ? "" : ",";
        for (const slow_pair& pair : rdn) {
            text += &pair == &rdn[0] ? "" : "+";
            std::string value;
            for (std::size_t i = 0; i < pair.value.size(); ++i) {
                const char c = pair.value[i];
                const bool at_end = i == 0 || i + 1 == pair.value.size();
                if (at_end && (c == '\n' || c == '\t')) {
                    value += c == '\n' ? "\\0A" : "\\09";
                    continue;
                }
                const bool escape = std::strchr(specials, c) != nullptr || (c == ' ' && at_end) || (c == '#' && i == 0);
                value += (escape ? "\\" : "") + std::string(1, c);
            }
            const std::string type = pair.type->spellings[0];
            text += (upper ? upper_of(type) : type) + "=" + (upper && !pair.type->exact ? upper_of(value) : value);
        }
    }
    return text;
}

class speller {
public:
    explicit speller(unsigned seed) : random_(seed) {}

    std::size_t below(std::size_t limit) { return std::uniform_int_distribution<std::size_t>(0, limit - 1)(random_); }

    slow_dn make()
    {
        static const char* const pieces[] = {"a", "B", "z",  " ",  " ",  "#",  "\"", "+",      ",",      ";",      "<",
                                             "=", ">", "\\", "\n", "\t", "\r", "0",  "\u00E9", "\u0101", "\u20AC", "-"};
        slow_dn dn(1 + below(4));
        for (auto& rdn : dn) {
            std::set<std::pair<const slow_type*, std::string>> seen;
            for (std::size_t count = below(4) == 0 ? 3 : 1; count != 0; --count) {
                slow_pair pair{&slow_types[below(std::size(slow_types))], ""};
                for (std::size_t length = 1 + below(6); length != 0; --length) {
                    pair.value += pieces[below(std::size(pieces))];
                }
                if (seen.emplace(pair.type, lower(pair.value)).second) {  // the order of equal pairs is that of writing
                    rdn.push_back(pair);
                }
            }
        }
        return dn;
    }

    std::string spell(slow_dn dn)
    {
        std::string text = blanks();
        for (auto& rdn : dn) {
            std::shuffle(rdn.begin(), rdn.end(), random_);
            for (const slow_pair& pair : rdn) {
                std::string type = pair.type->spellings[below(pair.type->spellings.size())];
                for (char& c : type) {
                    c = static_cast<char>(below(2) == 0 ? std::toupper(c) : c);
                }
                text += type + blanks() + "=" + blanks() + value_of(pair.value) + blanks();
                text += &pair != &rdn.back() ? "+" : &rdn == &dn.back() ? "" : below(2) == 0 ? "," : ";";
                text += &pair == &rdn.back() && &rdn == &dn.back() ? "" : blanks();
            }
        }
        return text + (below(4) == 0 ? "," : "");
    }

private:
    std::string blanks()
    {
        static const char* const some[] = {"", "", " ", "\n", "\t", "  "};
        return some[below(std::size(some))];
    }

    std::string value_of(const std::string& value)
    {
        const std::size_t form = below(4);
        std::string text;
        if (form == 0) {
            text = below(2) == 0 ? "#04" + hex_of(static_cast<char>(value.size())) : "#048100";
            for (const char c : value) {
                text += hex_of(c);
            }
            return text;
        }
        const bool quoted = form == 1;
        for (std::size_t i = 0; i < value.size(); ++i) {
            const char c = value[i];
            const bool at_end = i == 0 || i + 1 == value.size();
            const bool special = std::strchr(specials, c) != nullptr;
            const bool blank = c == ' ' || c == '\n' || c == '\t';
            const bool must = quoted ? c == '"' || c == '\\' : special || (at_end && blank) || (i == 0 && c == '#');
            const bool may = special || c == '#' || (c == ' ' && at_end);
            if (may && (must || below(3) == 0) && below(3) != 0) {
                text += std::string("\\") + c;
            } else {
                text += must || below(5) == 0 ? "\\" + hex_of(c) : std::string(1, c);
            }
        }
        return quoted ? "\"" + text + "\"" : text;
    }

    std::mt19937 random_;
};

TEST_F(DnNormalize, RandomDnsComeOutAsOneWhateverTheirSpelling)
{
    for (unsigned seed = 0; seed < 1500; ++seed) {
        speller source(seed);
        const slow_dn dn = source.make();
        const std::string expected = written(dn, false) + " | " + written(dn, true);
        heap_dn before;
        for (int spelling = 0; spelling < 3; ++spelling) {
            const std::string text = source.spell(dn);
            heap_dn now = normalized(text);
            ASSERT_EQ(told(now), expected) << "seed " << seed << " from: " << text;
            ASSERT_EQ(told(normalized(now->scratch)), expected) << "seed " << seed << " by way of: " << now->scratch;
            EXPECT_EQ(before == nullptr ? 1 : compare_ldap_escDN(before.get(), now.get()), 1) << text;
            before = std::move(now);
        }
    }
}

// ---- what stands beside the normaliser
// --------------------------------------------------------------------------------------

TEST_F(DnNormalize, ComparisonIgnoresCaseAndTellsValuesApart)
{
    // clang-format off
    const struct {
        const char *a, *b;
        int expected;
    } cases[] = {
        {"cn=a+sn=b,o=x", "SN=B+2.5.4.3=A,O=X", 1}, {"cn=a,o=x", "cn=a", 0}, {"cn=a+sn=b", "cn=a", 0},
        {"cn=a", "sn=a", 0}, {"cn=a\\,b", "cn=a\\,c", 0}, {"cn=a\\=b", "cn=a\\=c", 0}, {"cn=a\\,b", "cn=\"A,B\"", 1},
        {"cn=\\\"a\\\"", "cn=a", 1}, {"", "", 1},
    };
    // clang-format on
    for (const auto& c : cases) {
        EXPECT_EQ(compare_ldap_escDN(normalized(c.a).get(), normalized(c.b).get()), c.expected) << c.a << " " << c.b;
    }
}

TEST_F(DnNormalize, ParentsKeepWhatTheirValuesMean)
{
    const struct {
        const char *dn, *parent, *text, *upper;
    } cases[] = {
        {"cn=a,o=X,c=y", "o=X,c=y | O=X,C=Y", "o=X,c=y,", "O=X,C=Y"},
        {"cn=a,sn=b+cn=\\ c\\,", "cn=\\ c\\,+sn=b | CN=\\ C\\,+SN=B", "cn= c,+sn=b,", "CN=\\ C\\,+SN=B"},
        {"memberUid=a,1.1=b",
         "a-name-that-takes-much-more-room-than-the-number-it-is-written-by=b | "
         "A-NAME-THAT-TAKES-MUCH-MORE-ROOM-THAN-THE-NUMBER-IT-IS-WRITTEN-BY=B",
         "a-name-that-takes-much-more-room-than-the-number-it-is-written-by=b,",
         "A-NAME-THAT-TAKES-MUCH-MORE-ROOM-THAN-THE-NUMBER-IT-IS-WRITTEN-BY=B"},
        {"cn=a,cn=b,cn", "34, 1", "(null)", "(null)"},
        {"o=x", "(null)", "(null)", "(null)"},
        {"", "(null)", "(null)", "(null)"},
    };
    for (const auto& c : cases) {
        const heap_dn dn = normalized(c.dn);
        const heap_dn parent(ParentDN33(dn.get()));
        EXPECT_EQ(told(parent), c.parent) << c.dn;
        EXPECT_EQ(parent == nullptr ? 0 : parent->count, std::max<std::int64_t>(dn->count - 1, 0));
        EXPECT_EQ(shown(heap_chars(getParentDn(dn.get())).get()), c.text);
        EXPECT_EQ(shown(heap_chars(getParentDnUpper(dn.get())).get()), c.upper);
    }
    EXPECT_EQ(ParentDN33(nullptr), nullptr);
    EXPECT_EQ(ldcf_api_get_modify_attr_info_lock_g()->count, 0) << "the schema lock is given back";
}

TEST_F(DnNormalize, ADnIsReplacedByItsUpperTextOnlyWhenItIsOne)
{
    char* dn = strdup("cn=a, o=x");
    EXPECT_EQ(replace_DN(&dn, 1), 0);
    EXPECT_STREQ(dn, "CN=A,O=X");
    char* const same = dn;
    EXPECT_EQ(replace_DN(&dn, 1), 0);
    EXPECT_EQ(dn, same);
    std::free(dn);
    char kept[] = "cn=a;";
    dn = kept;
    EXPECT_EQ(replace_DN(&dn, 0), 0);
    EXPECT_STREQ(heap_chars(dn).get(), "CN=A");
    char refused[] = "foo=a";
    dn = refused;
    EXPECT_EQ(replace_DN(&dn, 1), 17);
    EXPECT_EQ(dn, refused);
    dn = nullptr;
    EXPECT_EQ(replace_DN(&dn, 1), 90);
}

TEST_F(DnNormalize, ValuesResolveToTheirBareText)
{
    // clang-format off
    const struct {
        const char *value, *expected;  // null: malformed
    } cases[] = {
        {"  a b ", "a b "},         {" a b  ,c", "a b"},  {"a\\20 ,c", "a "}, {"\\ a\\ ", " a "},    {"a\\ ,b", "a "},
        {"\" a,b \" ; c", " a,b "}, {"\"a\" b", nullptr}, {"\"a", nullptr},   {"a<b", nullptr},      {"a\\", nullptr},
        {"\\2c\\2C\\,", ",,,"},     {"#04016142", "aB"},  {"#040", nullptr},  {"#0401616", nullptr}, {"", ""},
    };
    // clang-format on
    for (const auto& c : cases) {
        int error = -2;
        const heap_chars bare(normAttrValue(c.value, &error));
        EXPECT_EQ(shown(bare.get()), shown(c.expected)) << c.value;
        EXPECT_EQ(error, c.expected == nullptr ? DN_ERR_SYNTAX : 0);
    }
    EXPECT_EQ(canEscape(' ') + canEscape('#') + canEscape('<'), 3);
    EXPECT_EQ(canEscape('a') + needsEscape(' ') + needsEscape('#'), 0);
}

}  // namespace
