// dirbase filter parse: verdicts with their reasons and places, canonical texts, trees, and filters of every kind and
// size.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <optional>
#include <random>

#include "tests/tools/dirbase/run_tool.h"

using testing::AllOf;
using testing::ContainsRegex;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;
using tool_test::joined;
using tool_test::lines_of;
using tool_test::run_tool;
using tool_test::tool_run;
using tool_test::words;

namespace {

// Filters by standard input, which has no limit as arguments have.
tool_run parse_lines(const std::string& lines, const words& options = {})
{
    return run_tool(joined({"filter", "parse", "-"}, options), {.input = lines});
}

// A filter's text at random, and what a server should make of it, by the plainest means.
class random_filter {
public:
    explicit random_filter(unsigned seed) : random_(seed) {}

    // canonical  takes the text, or nothing when the filter is undefined
    std::string make(unsigned depth, std::optional<std::string>& canonical)
    {
        const auto kind = random_() % (depth == 0 ? 4 : 8);
        return kind < 4 ? item(kind, canonical) : list("&|!|"[kind % 4], depth, canonical);
    }

private:
    std::string list(char sign, unsigned depth, std::optional<std::string>& canonical)
    {
        std::string text = std::string("(") + sign;
        std::string joined;
        bool all_defined = true;
        for (auto count = sign == '!' ? 1 : 1 + random_() % 4; count > 0; --count) {
            std::optional<std::string> member;
            text += random_() % 4 == 0 ? " \t" : "";
            text += make(depth - 1, member);
            all_defined = all_defined && member;
            joined += member.value_or("");
        }
        if (!joined.empty() && (sign == '|' || all_defined)) {
            canonical = std::string("(") + sign + joined + ")";
        }
        return text + ")";
    }

    std::string item(unsigned long kind, std::optional<std::string>& canonical)
    {
        const bool unknown = random_() % 4 == 0;
        const std::string type = unknown ? "nonesuch" : random_() % 2 == 0 ? "cn" : "SN;lang-de";
        std::string lower = type;
        std::transform(lower.begin(), lower.end(), lower.begin(),
                       [](char c) { return c < 'a' && c >= 'A' ? c + 32 : c; });
        std::string written;
        std::string shown;
        std::string sign = "=";
        if (kind == 0) {
            written = shown = "*";
        } else if (kind == 1) {
            for (int i = 0; i < 3; ++i) {
                add_value(written, shown);
                written += i < 2 ? "*" : "";
                shown += i < 2 ? "*" : "";
            }
        } else {
            const char* const signs[] = {"=", ">=", "<=", "~="};
            sign = signs[random_() % 4];
            add_value(written, shown);
        }
        if (!unknown) {
            canonical = "(" + lower + sign + shown + ")";
        }
        return "(" + type + sign + written + ")";
    }

    void add_value(std::string& written, std::string& shown)
    {
        for (auto length = 1 + random_() % 6; length > 0; --length) {
            const char c = "abcXYZ019=&|!,/()*\\"[random_() % 20];
            if (c == '\0') {
                written += "\\5C";
                shown += "\\5c";
                continue;
            }
            const bool special = std::string("()*\\").find(c) != std::string::npos;
            char escaped[16];
            std::snprintf(escaped, sizeof escaped, random_() % 2 == 0 ? "\\%02x" : "\\%02X", static_cast<unsigned>(c));
            written += special || random_() % 4 == 0 ? escaped : std::string(1, c);
            std::snprintf(escaped, sizeof escaped, "\\%02x", static_cast<unsigned>(c));
            shown += special ? escaped : std::string(1, c >= 'a' && c <= 'z' ? static_cast<char>(c - 32) : c);
        }
    }

    std::mt19937 random_;
};

}  // namespace

TEST(FilterParse, DefinedFiltersHaveACanonicalTextAndATree)
{
    const struct {
        const char* filter;
        const char* out;
    } cases[] = {
        {"(cn=Bob)", "(cn=BOB)\n  equality cn = BOB\n"},
        {"cn=bob", "(cn=BOB)\n  equality cn = BOB\n"},
        {" \t(cn=a)\n", "(cn=A)\n  equality cn = A\n"},
        {"( CN =a)", "(cn=A)\n  equality cn = A\n"},
        {"(cn=*)", "(cn=*)\n  presence cn\n"},
        {"(cn=\\2a)", "(cn=\\2a)\n  equality cn = *\n"},
        {"(cn=a\\28b)", "(cn=A\\28B)\n  equality cn = A(B\n"},
        {"(cn=a*b*c)", "(cn=A*B*C)\n  substrings cn: initial A, any B, final C\n"},
        {"(cn=*\\2a\\5c*)", "(cn=*\\2a\\5c*)\n  substrings cn: any *\\\n"},
        {"(cn=*z)", "(cn=*Z)\n  substrings cn: final Z\n"},
        {"(sn~=Smith)", "(sn~=SMITH)\n  approximate sn ~= SMITH\n"},
        {"(uidNumber>=7)", "(uidnumber>=7)\n  greater or equal uidnumber >= 7\n"},
        {"(createTimestamp<=20240101000000Z)",
         "(createtimestamp<=20240101000000Z)\n  less or equal createtimestamp <= 20240101000000Z\n"},
        {"(member=CN = a , O=b)", "(member=CN=A,O=B)\n  equality member = CN=A,O=B\n"},
        {"(member=CN=a*)", "(member=CN=A*)\n  substrings member: initial CN=A\n"},
        {"(telephoneNumber=+1 555-01)", "(telephonenumber=+155501)\n  equality telephonenumber = +155501\n"},
        {"(title;lang-de=a)", "(title;lang-de=A)\n  equality title;lang-de = A\n"},
        {"(debug=x)", "(debug=x)\n  equality debug = x\n"},
        // Values that aren't of their syntax are compared as well as they can.
        {"(uidNumber>=x)",
         "(uidnumber>=x)\n  greater or equal uidnumber >= x (the value is no integer from -2147483648 to 2147483647; it "
         "counts as the number that it begins with, or 0)\n"},
        {"(pwdReset=maybe)",
         "(pwdreset=maybe)\n  equality pwdreset = maybe (the value is neither TRUE nor FALSE; no proper value equals "
         "it)\n"},
        {"(createTimestamp<=2024)",
         "(createtimestamp<=2024)\n  less or equal createtimestamp <= 2024 (the value is no time of the form "
         "YYYYMMDDHHMMSS[.F](Z|+HHMM|-HHMM); every proper time counts as the greater one)\n"},
        // Texts that the parser takes more than the grammar has.
        {"(cn=a\\zz)", "(cn=A\\5cZZ)\n  equality cn = A\\ZZ\n"},
        {"(cn=a\\2)", "(cn=A\\02)\n  equality cn = A\\x02\n"},
        {"cn=a)", "(cn=A\\29)\n  equality cn = A)\n"},
        {"(&(cn=a) (|(!(sn=b))(nonesuch=c)) )",
         "(&(cn=A)(|(!(sn=B))))\n  and\n    equality cn = A\n    or\n      not\n        equality sn = B\n"
         "      undefined: equality nonesuch = c (the schema has no attribute \"nonesuch\")\n"},
        {"(cn=\x01\\ff)", "(cn=\\01\\ff)\n  equality cn = \\x01\xff\n"},
        {"(xan-nationalNumber=*)", "(xan-nationalnumber=*)\n  presence xan-nationalnumber\n"},
    };
    for (const auto& c : cases) {
        const tool_run run = run_tool({"filter", "parse", c.filter});
        EXPECT_EQ(run.out, c.out) << c.filter;
        EXPECT_EQ(run.status, 0) << c.filter << run.err;
    }
}

TEST(FilterParse, UndefinedRefusedAndBrokenFiltersSayWhy)
{
    const std::string undefined = "undefined  no entry matches it\n";
    const std::string long_value(257, 'x');
    const struct {
        std::string filter;
        std::string begins;
        std::string holds;
    } cases[] = {
        {"(nonesuch=b)", undefined, "the schema has no attribute \"nonesuch\""},
        {"(no such=b)", undefined, "\"no such\" is no name of an attribute"},
        {"(nonesuch=*)", undefined, "presence nonesuch (the schema"},
        {"(nonesuch=a*b*c)", undefined, "initial a, any b, final c (the schema"},
        {"(&(cn=a)(nonesuch=b))", undefined + "  and\n    equality cn = A\n    undefined: equality nonesuch", ""},
        {"(!(nonesuch=b))", undefined + "  not\n    undefined: equality nonesuch", ""},
        {"(|(nonesuch=b))", undefined, ""},
        {"(cn=" + long_value + ")", undefined,
         "x... (257 bytes) (the value is longer than the attribute's column, 256"},
        {"(cn=a*" + long_value + ")", undefined, "longer than the attribute's column, 256 bytes"},
        {"(cn:dn:2.5.13.5:=x)", undefined, "extensible match cn:dn:2.5.13.5 := x (extensible match isn't supported)"},
        {"(:caseExactMatch:=a*b)", undefined, "extensible match :caseExactMatch := a*b"},
        {"(cn:=*)", undefined, "extensible match cn := *"},
        {"(&)", undefined, "and (it has no elements)"},
        {"(|)", undefined, "or (it has no elements)"},
        {"(member=x)", "refused    34 invalidDNSyntax: ", "refused: equality member = x (34 invalidDNSyntax"},
        {"(cn=a**b)", "refused    21 invalidAttributeSyntax: ", "for nothing stands between two \"*\""},
        {"(cn=a\\00b)", "refused    21 invalidAttributeSyntax: ", "for the value holds a byte 0"},
        {"(cn=a*\\00*)", "refused    21 invalidAttributeSyntax: ", "for the value holds a byte 0"},
        {"(|(nonesuch=a)(cn=**))", "refused    21 ", "undefined: equality nonesuch"},
        {"(xan-nationalNumber>=1)", "refused    53 unwillingToPerform: ", "xan-nationalNumber"},
        {"(xan-recoveryAnswer=1)", "refused    53 unwillingToPerform: ", "xan-recoveryAnswer"},
        {"(&(nonesuch=a)(!(xan-taxNumber=1)))", "refused    53 unwillingToPerform: ", "xan-taxNumber"},
        {"", "no filter  at byte 0: nothing, where a filter is expected\n", ""},
        {" ", "no filter  at byte 0: no \"=\" in \" \"\n", ""},
        {"(", "no filter  at byte 0: the parenthesis isn't closed\n", ""},
        {")", "no filter  at byte 0: no \"=\" in \")\"\n", ""},
        {"()", "no filter  at byte 1: nothing between the parentheses\n", ""},
        {"(cn)", "no filter  at byte 1: no \"=\" in \"cn\"\n", ""},
        {"cn", "no filter  at byte 0: no \"=\" in \"cn\"\n", ""},
        {"(=a)", "no filter  at byte 1: no attribute in front of \"=\"\n", ""},
        {"(>=a)", "no filter  at byte 1: no attribute in front of \"=\"\n", ""},
        {"(cn=a", "no filter  at byte 0: the parenthesis isn't closed\n", ""},
        {"(cn=a\\)", "no filter  at byte 0: the parenthesis isn't closed\n", ""},
        {"  (&(cn=a)(sn=b)", "no filter  at byte 2: the parenthesis isn't closed\n", ""},
        {"(cn=a))", "no filter  at byte 6: text behind the closing parenthesis of the filter\n", ""},
        {"(cn=a)(sn=b)", "no filter  at byte 6: text behind", ""},
        {"((cn=a))", "no filter  at byte 1: a parenthesis, where the name of an attribute is expected\n", ""},
        {"( &(cn=a))", "no filter  at byte 3: a parenthesis, where the name of an attribute is expected\n", ""},
        {"(&(cn=a)sn=b)", "no filter  at byte 8: a \"(\" is expected here\n", ""},
        {"(&(cn=a)(sn))", "no filter  at byte 9: no \"=\" in \"sn\"\n", ""},
        {"(!)", "no filter  at byte 1: a NOT takes one element, and has 0\n", ""},
        {"(|(cn=a)(!(cn=a)(sn=b)))", "no filter  at byte 9: a NOT takes one element, and has 2\n", ""},
    };
    for (const auto& c : cases) {
        const tool_run run = run_tool({"filter", "parse", c.filter});
        EXPECT_THAT(run.out, AllOf(StartsWith(c.begins), HasSubstr(c.holds))) << c.filter;
        EXPECT_EQ(run.status, 1) << c.filter << run.err;
    }
}

TEST(FilterParse, RandomFiltersComeToTheTextThatAPlainGeneratorGivesAndThatTextToItself)
{
    random_filter generator(20);
    std::string given;
    std::string again;
    words expected;
    words defined;
    for (int i = 0; i < 3000; ++i) {
        std::optional<std::string> canonical;
        given += generator.make(4, canonical) + "\n";
        expected.push_back(canonical.value_or(""));
        if (canonical) {
            defined.push_back(*canonical);
            again += *canonical + "\n";
        }
    }
    ASSERT_GT(defined.size(), 1000u);
    ASSERT_LT(defined.size(), expected.size() - 500);
    for (const auto& [lines, texts] : {std::pair(given, expected), {again, defined}}) {
        const auto shown = nlohmann::json::parse(parse_lines(lines, {"--json"}).out);
        ASSERT_EQ(shown["filters"].size(), texts.size());
        for (std::size_t i = 0; i < texts.size(); ++i) {
            const auto& filter = shown["filters"][i];
            EXPECT_EQ(filter.value("text", ""), texts[i]) << filter["filter"];
            EXPECT_EQ(filter["verdict"], texts[i].empty() ? "undefined" : "defined") << filter["filter"];
        }
    }
}

TEST(FilterParse, FiltersOfAnySizeGetAnAnswer)
{
    const auto nested = [](std::size_t depth) {
        std::string text;
        for (std::size_t i = 1; i < depth; ++i) {
            text += "(!";
        }
        return text + "(cn=a)" + std::string(depth - 1, ')');
    };
    const tool_run deepest = parse_lines(nested(100));
    EXPECT_EQ(deepest.status, 0);
    EXPECT_EQ(lines_of(deepest.out).size(), 101u);
    EXPECT_THAT(deepest.out, StartsWith("(!(!(!"));
    std::string many = "(|";
    for (int i = 0; i < 20'000; ++i) {
        many += "(cn=" + std::to_string(i) + ")";
    }
    many += ")";
    const struct {
        std::string filter;
        int status;
        const char* holds;
    } cases[] = {
        {nested(101), 1, "no filter  at byte 200: nested deeper than 100 levels\n"},
        {nested(100'000), 1, "no filter  at byte 200: nested deeper than 100 levels\n"},
        {std::string(300'000, '('), 1, "no filter  at byte 0: the parenthesis isn't closed\n"},
        {"(cn=" + std::string(1'000'000, 'x') + ")", 1, "xxx... (1000000 bytes) (the value is longer"},
        {"(jpegPhoto=" + std::string(32'000, 'x') + ")", 0, "xxx... (32000 bytes)\n"},
        {std::string(1'000'000, 'x') + "=a", 1, "the schema has no attribute \"xxx"},
        {many, 0, "(cn=19999))\n  or\n    equality cn = 0\n"},
    };
    for (const auto& c : cases) {
        const tool_run run = parse_lines(c.filter);
        EXPECT_EQ(run.status, c.status) << c.holds;
        EXPECT_TRUE(run.out.find(c.holds) != std::string::npos) << c.holds << run.out.substr(0, 1000);
    }
}

TEST(FilterParse, BytesOfAnyKindGetAnAnswerAndReachNoTerminalAsTheyAre)
{
    std::mt19937 random(5);
    std::string noise;
    for (int i = 0; i < 200'000; ++i) {
        noise += static_cast<char>(1 + random() % 255);
    }
    const tool_run run = parse_lines(noise + "\n(cn=a)");
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.out, AllOf(Not(ContainsRegex("[\x01-\x09\x0b-\x1f]")), HasSubstr("(cn=A)\n")));
    const tool_run zero = parse_lines(std::string("(cn=a\0b)", 8));
    EXPECT_EQ(zero.status, 2);
}

TEST(FilterParse, EachFilterHasItsAnswerInOrderAndAsJson)
{
    const words filters = {"(cn=a*)", "(|(jpegPhoto=\\00\\ff)(nonesuch=b))", "(cn=**)", "(x"};
    const tool_run run = run_tool(joined({"filter", "parse", "--json"}, filters));
    EXPECT_EQ(run.status, 1);
    const auto shown = nlohmann::json::parse(run.out);
    EXPECT_EQ(shown["ok"], false);
    EXPECT_EQ(shown["filters"].size(), filters.size());
    const auto& initial = shown["filters"][0];
    EXPECT_EQ(initial["text"], "(cn=A*)");
    EXPECT_EQ(initial["tree"],
              nlohmann::json::parse(R"({"kind": "substrings", "attribute": "cn", "pieces": [{"initial": "A"}]})"));
    const auto& mixed = shown["filters"][1];
    EXPECT_EQ(mixed["verdict"], "defined");
    EXPECT_EQ(mixed["tree"]["elements"][0]["value"], nlohmann::json::parse(R"({"base64": "AP8="})"));
    EXPECT_EQ(mixed["tree"]["elements"][1]["undefined"], "the schema has no attribute \"nonesuch\"");
    EXPECT_THAT(mixed["remarks"].get<words>(),
                ElementsAre("equality nonesuch = b is undefined: the schema has no attribute \"nonesuch\""));
    EXPECT_EQ(shown["filters"][2]["verdict"], "refused");
    EXPECT_THAT(shown["filters"][2]["tree"]["refused"].get<std::string>(), StartsWith("21 "));
    EXPECT_EQ(shown["filters"][3]["verdict"], "no filter");
    EXPECT_EQ(shown["filters"][3]["error"]["offset"], 0);
    const tool_run text = run_tool({"filter", "parse", "-", "(sn=c)"}, {.input = "cn=a\r\n(cn=b)\n"});
    EXPECT_EQ(text.out, "(cn=A)\n  equality cn = A\n\n(cn=B)\n  equality cn = B\n\n(sn=C)\n  equality sn = C\n");
    EXPECT_EQ(run_tool({"filter", "parse"}).status, 2);
}
