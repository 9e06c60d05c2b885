// Reads every token of any text, side by side with a slow and obvious reader of the same rules.
#include <cstring>
#include <string>
#include <string_view>

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libdirbase/schema/ldcf_token.h"

namespace {

using fuzz_support::expect;

constexpr std::string_view letters = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ";
constexpr std::string_view digits = "0123456789";
constexpr std::string_view name_rest = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789;_-";
constexpr std::string_view white_space = " \t\n\v\f\r";
constexpr std::size_t shown_of_a_token = 43 + 5;  // and the mark of a cut

enum class outcome { token, invalid, unexpected_end };

// What should come next at the start of a text.
struct expected_token {
    outcome result;
    unsigned type = 0;
    std::string_view raw = {};   // as it stands in the source
    std::string_view text = {};  // as it is handed out
};

bool is_name(std::string_view text)
{
    return !text.empty() && letters.find(text[0]) != letters.npos && text.find_first_not_of(name_rest) == text.npos;
}

std::string_view front_of(std::string_view rest, std::string_view bytes)
{
    return rest.substr(0, rest.find_first_not_of(bytes));
}

expected_token expect_number(std::string_view rest)
{
    std::string_view raw = front_of(rest, digits);
    while (rest.substr(raw.size(), 1) == ".") {
        const std::string_view group = front_of(rest.substr(raw.size() + 1), digits);
        if (group.empty()) {
            return {outcome::invalid};
        }
        raw = rest.substr(0, raw.size() + 1 + group.size());
    }
    return {outcome::token, raw.find('.') == raw.npos ? token_number : token_dotted_oid, raw, raw};
}

expected_token expect_quoted(std::string_view rest)
{
    const std::size_t end = rest.find('\'', 1);
    if (end == rest.npos) {
        return {outcome::unexpected_end};
    }
    const std::string_view text = rest.substr(1, end - 1);
    if (text.empty()) {
        return {outcome::invalid};
    }
    return {outcome::token, is_name(text) ? token_qdescr : token_qdstring, rest.substr(0, end + 1), text};
}

expected_token expect_next(std::string_view rest)
{
    constexpr std::pair<char, unsigned> separators[] = {
        {'(', token_left_paren}, {')', token_right_paren}, {'{', token_left_brace}, {'}', token_right_brace},
        {'$', token_dollar},     {'=', token_equals},      {':', token_colon},
    };
    if (rest.empty()) {
        return {outcome::unexpected_end};
    }
    for (const auto& [byte, type] : separators) {
        if (rest[0] == byte) {
            return {outcome::token, type, rest.substr(0, 1), rest.substr(0, 1)};
        }
    }
    if (rest[0] == '#') {
        const std::string_view line = rest.substr(0, rest.find('\n'));
        return {outcome::token, token_comment, line, line};
    }
    if (rest[0] == '\'') {
        return expect_quoted(rest);
    }
    if (digits.find(rest[0]) != digits.npos) {
        return expect_number(rest);
    }
    if (letters.find(rest[0]) != letters.npos) {
        const std::string_view name = front_of(rest, name_rest);
        return {outcome::token, token_descr, name, name};
    }
    return {outcome::invalid};
}

bool admitted(unsigned type, unsigned mask)
{
    return type == mask || (mask == token_dotted_oid && type == token_number) ||
           (mask == token_qdstring && type == token_qdescr);
}

void expect_same(const ldcf_token& token, const ldcf_token_factory& factory, const expected_token& expected, int line)
{
    expect(token.type() == expected.type, "the token's type");
    expect(token.text().c_str() == expected.text && token.text().length() == expected.text.size(), "the token's text");
    expect(factory.current_token().c_str() == expected.raw, "the token stands where it should in the source");
    expect(factory.line() == line, "lines are counted outside of tokens");
    for (unsigned mask = token_descr; mask <= token_comment; mask <<= 1) {
        expect(token[mask] == admitted(expected.type, mask), "the test with a mask");
    }
    const csgl_string spot = factory.error_token_spot();
    expect(spot.length() <= shown_of_a_token && spot.find('\n') < 0, "the excerpt is short and one line at the most");
}

void read_tokens(const char* source)
{
    ldcf_token_factory factory(source, "input");
    std::string_view rest(source);
    int line = 1;
    for (;;) {
        const std::string_view skipped = front_of(rest, white_space);
        for (const char c : skipped) {
            line += c == '\n' ? 1 : 0;
        }
        rest.remove_prefix(skipped.size());
        const expected_token expected = expect_next(rest);
        outcome found = outcome::token;
        try {
            ldcf_token token(factory);
            expect(expected.result == outcome::token, "no token where none should be");
            expect_same(token, factory, expected, line);
            factory.return_token();
            token.assign(factory);
            expect_same(token, factory, expected, line);
        } catch (const exc_invalid_token_t& failure) {
            found = outcome::invalid;
            expect(failure.line() == line, "the line of a failure");
        } catch (const exc_unexpected_end_of_input_t& failure) {
            found = outcome::unexpected_end;
            expect(failure.line() == line, "the line of a failure");
        }
        expect(found == expected.result, "the kind of failure");
        if (found != outcome::token) {
            return;
        }
        rest.remove_prefix(expected.raw.size());
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    read_tokens(fuzz_support::exact_text(data, size).c_str());
    return 0;
}
