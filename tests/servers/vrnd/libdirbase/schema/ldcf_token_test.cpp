// Tokens: random texts against a slow tokenizer, the faults and their excerpts, and dots in names.
#include "servers/vrnd/libdirbase/schema/ldcf_token.h"

#include <iostream>
#include <random>
#include <string_view>

#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using schema_test::refused;

namespace {

// All tokens of a text up to its end or its first fault: "type:text@line", or the class, id and line of the fault.
std::string tokens_of(const std::string& text)
{
    std::ostringstream out;
    ldcf_token_factory factory(text.c_str(), "test");
    const std::string fault = refused([&] {
        while (!factory.empty()) {
            const ldcf_token token(factory);
            out << std::hex << token.type() << std::dec << ":" << token.text() << "@" << factory.line() << " ";
        }
    });
    out << fault.substr(0, fault.find(':'));
    return out.str();
}

// The same, slowly: one look at what the rest of the text begins with.
std::string tokens_read_slowly(std::string_view rest)
{
    const std::string letters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
    const std::string name_bytes = letters + "0123456789;_-";
    const std::string separators = "(){}$=:";
    const auto front = [&](std::string_view bytes) { return rest.substr(0, rest.find_first_not_of(bytes)); };
    int line = 1;
    std::ostringstream out;
    const auto take = [&](const char* type, std::string_view text, std::size_t length) {
        out << type << ":" << text << "@" << line << " ";
        rest.remove_prefix(length);
    };
    const auto fault = [&](const char* name) { return out.str() + name + " @" + std::to_string(line); };
    for (;;) {
        const std::string_view space = front(" \t\n\v\f\r");
        line += static_cast<int>(std::count(space.begin(), space.end(), '\n'));
        rest.remove_prefix(space.size());
        const char first = rest.empty() ? '\0' : rest[0];
        if (rest.empty()) {
            return out.str();
        } else if (first == '#') {
            take("2000", rest.substr(0, rest.find('\n')), rest.substr(0, rest.find('\n')).size());
        } else if (const std::size_t i = separators.find(first); i != separators.npos) {
            const char* const types[] = {"40", "80", "100", "200", "400", "800", "1000"};
            take(types[i], rest.substr(0, 1), 1);
        } else if (letters.find(first) != letters.npos) {
            take("2", front(name_bytes), front(name_bytes).size());
        } else if (first >= '0' && first <= '9') {
            const std::string_view text = front("0123456789.");
            if (text.back() == '.' || text.find("..") != text.npos) {
                return fault("exc_invalid_token_t 3");
            }
            take(text.find('.') == text.npos ? "8" : "4", text, text.size());
        } else if (first != '\'') {
            return fault("exc_invalid_token_t 14");
        } else if (const std::size_t end = rest.find('\'', 1); end == 1) {
            return fault("exc_invalid_token_t 4");
        } else if (end == rest.npos) {
            return fault("exc_unexpected_end_of_input_t 12");
        } else {
            const std::string_view text = rest.substr(1, end - 1);
            const bool name = letters.find(text[0]) != letters.npos && text.find_first_not_of(name_bytes) == text.npos;
            take(name ? "10" : "20", text, end + 1);
        }
    }
}

#define EXPECTED_X "expected [p[x]p], but could not find it at or before [v[=v=VAR=v=]v]"

}  // namespace

TEST(LdcfToken, RandomTextsReadAsByASlowTokenizer)
{
    EXPECT_EQ(tokens_of("a 'b' 'c\n d' 1 2.3\n# x"), "2:a@1 10:b@1 20:c\n d@1 8:1@1 4:2.3@1 2000:# x@2 ");
    const char* const pieces[] = {"a", "Z", "cn-1", ".", "1", "23", "4.5", "'", "'b'", "'c d'", " ",    "\n", "\t",
                                  "#", "(", ")",    "{", "}", "$",  "=",   ":", ";",   "_",     "\x80", "%",  "\v"};
    std::mt19937 random(1);
    std::size_t whole = 0;
    for (int round = 0; round < 20000; ++round) {
        std::string text;
        for (auto n = random() % 12; n > 0; --n) {
            text += pieces[random() % std::size(pieces)];
        }
        const std::string tokens = tokens_of(text);
        ASSERT_EQ(tokens, tokens_read_slowly(text)) << text;
        whole += tokens.find("exc") == tokens.npos ? 1u : 0u;
    }
    EXPECT_GT(whole, 2000u);
}

TEST(LdcfToken, FaultsTellTheExcerptAndThePlace)
{
    const std::pair<const char*, const char*> cases[] = {
        {"1.x y", "exc_invalid_token_t 3 @1: expected digit after '.'" NOT_FOUND "'1.x y'"},
        {"'' y", "exc_invalid_token_t 4 @1: expected non-empty quoted string" NOT_FOUND "''' y'"},
        {"'y", "exc_unexpected_end_of_input_t 12 @1: non-terminated quoted string ''y'"},
        {"  \n ", "exc_unexpected_end_of_input_t 13 @2: unexpected end of input"},
        {"\n\n%y", "exc_invalid_token_t 14 @3: invalid token '%y'"},
    };
    for (const auto& [text, fault] : cases) {
        ldcf_token_factory factory(text, "test");
        EXPECT_EQ(refused([&] { ldcf_token token(factory); }), fault);
    }
    ldcf_token_factory factory("\n a (", "the file");
    EXPECT_EQ(refused([&] { ldcf_token(factory, EXPECTED_X, token_number, 5); }),
              "exc_invalid_token_t 5 @2: expected x" NOT_FOUND "'a ('");
    try {
        const test_support::message_catcher log;
        factory.throw_exc(EXPECTED_X, 1);
    } catch (const exc_invalid_grammar_t& e) {
        EXPECT_STREQ(e.file(), "the file");
        EXPECT_STREQ(e.message().text(), "expected x" NOT_FOUND "'a ('");
    }
    EXPECT_EQ(schema_test::logged_arguments([&] { factory.throw_exc(EXPECTED_X, 1); }),
              (std::vector<std::string>{"the file", "2", "x", "'a ('"}));
}

TEST(LdcfToken, TheExcerptIsCutAtABlankAndAtALineFeed)
{
    const std::string w20(20, 'w');
    const std::pair<std::string, std::string> cases[] = {
        {"short", "short"},
        {"a b\nc", "a "},  // the byte ahead of the line feed goes too
        {"a\nc", ""},
        {std::string(42, 'x'), std::string(42, 'x')},
        {std::string(43, 'x'), std::string(43, 'x') + "....."},
        {std::string(99, 'x'), std::string(43, 'x') + "....."},
        {w20 + " " + w20 + " " + w20, w20 + " " + w20 + " ....."},
        {w20 + "\n" + w20 + " " + w20, std::string(19, 'w')},
    };
    for (const auto& [text, spot] : cases) {
        EXPECT_EQ(std::string(ldcf_token_factory(text.c_str(), "").error_token_spot()), spot);
    }
}

TEST(LdcfToken, ATokenThatIsPutBackIsReadAgain)
{
    ldcf_token_factory factory(" first\n 'se cond' 3", "one");
    ldcf_token token(factory);
    token.assign(factory);
    EXPECT_STREQ(factory.current_token(), "'se cond'");
    factory.return_token();
    factory.return_token();
    EXPECT_STREQ(factory.current_token(), "");
    token.assign(factory, "", token_qdstring, 1);
    EXPECT_STREQ(token.text(), "se cond");
}

TEST(LdcfToken, MasksForOidsAdmitNumbersAndMasksForQuotedTextAdmitQuotedNames)
{
    const unsigned masks[] = {token_descr, token_dotted_oid, token_number, token_qdescr, token_qdstring, token_comment};
    const std::pair<const char*, const char*> cases[] = {{"1", "011000"},     {"1.2", "010000"}, {"'a'", "000110"},
                                                         {"'a b'", "000010"}, {"a", "100000"},   {"#", "000001"}};
    for (const auto& [text, admitted] : cases) {
        ldcf_token_factory factory(text, "");
        const ldcf_token token(factory);
        for (std::size_t i = 0; i < std::size(masks); ++i) {
            EXPECT_EQ(token[masks[i]], admitted[i] == '1') << text << " " << masks[i];
        }
    }
}

namespace {

// Reads a name with dots as the first thing that this process reads, and ends it.
[[noreturn]] void read_dotted_name(const char* setting)
{
    setenv("VRN_ATTRNAME_CONTAINS_DOTS", setting, 1);
    const test_support::debug_catcher debug(LDAP_DEBUG_TRACE);
    ldcf_token_factory factory("a.b", "");
    setenv("VRN_ATTRNAME_CONTAINS_DOTS", std::string_view(setting) == "YES" ? "NO" : "YES", 1);
    const bool told = debug.has("server allows attrnames to contain dots\n");
    std::cerr << ldcf_token(factory).text() << (told ? " told\n" : " untold\n");
    std::exit(0);
}

}  // namespace

TEST(LdcfTokenDeathTest, DotsInNamesAreAllowedByTheExactWordOnly)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(read_dotted_name("YES"), testing::ExitedWithCode(0), "^a\\.b told");
    EXPECT_EXIT(read_dotted_name("yes"), testing::ExitedWithCode(0), "^a untold");
}
