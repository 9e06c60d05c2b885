// Messages: their markers against a second parser, the message ids, and what reaches the message log.
#include "servers/vrnd/libcsgl/csgl_message.h"

#include <gtest/gtest.h>

#include <optional>
#include <random>
#include <string>
#include <vector>

#include "tests/support/message_catcher.h"

using test_support::message_catcher;

namespace {

using strings = std::vector<std::string>;
using optional_text = std::optional<std::string>;

// A message taken apart, in one text: plain{parameter}{parameter}<variable>
std::string joined(const std::string& plain, const strings& parameters, const optional_text& variable)
{
    std::string result = plain;
    for (const std::string& parameter : parameters) {
        result += "{" + parameter + "}";
    }
    return variable ? result + "<" + *variable + ">" : result;
}

// The markers by the rules alone, without blocks and pointers.
std::string parse_slowly(const std::string& bytes, std::size_t length)
{
    const std::string text = bytes.substr(0, length).c_str();
    std::size_t at = 0;
    std::string plain;
    strings parameters;
    optional_text variable, open;
    const auto skip = [&](const std::string& marker) {
        const bool here = text.compare(at, marker.size(), marker) == 0;
        at += here ? marker.size() : 0;
        return here;
    };
    if (skip("[v[")) {
        const std::size_t end = text.find("]v]", at);
        variable = text.substr(at, end == std::string::npos ? end : end - at);
        at = end == std::string::npos ? text.size() : end + 3;
    }
    while (at < text.size()) {
        if (!open && skip("[p[")) {
            open = "";
        } else if (open && skip("]p]")) {
            parameters.push_back(*open);
            open.reset();
        } else if (skip("[v[")) {
            if (skip("=v=VAR=v=")) {
                skip("]v]");
                parameters.resize(parameters.size() + variable.has_value(), variable.value_or(""));
                plain += variable.value_or("");
            }
        } else {
            plain += text[at];
            open = open ? optional_text(*open + text[at]) : open;
            ++at;
        }
    }
    parameters.resize(std::min<std::size_t>(parameters.size(), 10));
    return joined(plain.substr(0, length), parameters, variable);  // a plain text never outgrows its message
}

std::string parse(const std::string& text, std::size_t length)
{
    const std::vector<char> bytes(text.begin(), text.end());  // without anything behind its end
    const csgl_refcounted_pointer_to<csgl_message_> body(new csgl_message_);
    body->init(bytes.data(), static_cast<unsigned>(length), 0, "file", 1);
    strings parameters;
    for (int i = 0; i < csgl_message_::parameter_limit; ++i) {
        EXPECT_EQ(body->parameter(i) != nullptr, i < body->parameter_count()) << "parameter " << i;
        if (body->parameter(i) != nullptr) {
            parameters.emplace_back(body->parameter(i));
        }
    }
    const bool has_variable = length >= 3 && text.substr(0, 3) == "[v[";
    return joined(body->text(), parameters, has_variable ? optional_text(body->variable()) : std::nullopt);
}

std::string times(int count, const std::string& text)
{
    return count == 0 ? "" : text + times(count - 1, text);
}

}  // namespace

TEST(Message, MarkersAreTakenApart)
{
    const std::string ref = "[v[=v=VAR=v=]v]";
    const std::string z(40, 'z');
    const struct {
        std::string text, expected;
        std::size_t length = text.size();
    } cases[] = {
        {"", ""},
        {"a [p text] with [v brackets]", "a [p text] with [v brackets]"},
        {"[p[a]p]", "a{a}"},
        {"[p[]p]x[p[b]p]", "xb{}{b}"},
        {"[p[a", "a"},
        {"x]p]y", "x]p]y"},
        {"a[p[b[p[c]p]", "ab[p[c{b[p[c}"},
        {"[[p[a]]p]p]", "[a]p]{a]}"},
        {"[p[a[p[v[b]p]", "a[pb{a[pb}"},
        {times(12, "[p[a]p]") + "z", times(12, "a") + "z" + times(10, "{a}")},
        {"[v[z]v]", "<z>"},
        {"[v[z]v", "<z]v>"},
        {"[v[[p[z]p]]v]x", "x<[p[z]p]>"},
        {"[v['a b']v]want [p[oid]p] at " + ref + ".", "want oid at 'a b'.{oid}{'a b'}<'a b'>"},
        {"[v[]v][p[a]p]" + ref, "a{a}{}<>"},
        {ref, "<=v=VAR=v=>"},
        {"x" + ref + "y", "xy"},
        {"x[v[y]v]z", "xy]v]z"},
        {"[v[z]v][p[a" + ref + "b]p]", "azb{z}{ab}<z>"},
        {"[v[z]v][v[=v=VAR=v=", "z{z}<z>"},
        {"[v[z]v]" + times(10, "[p[a]p]") + ref, times(10, "a") + "z" + times(10, "{a}") + "<z>"},
        {"[v[z]v]" + ref + ref, "zz{z}{z}<z>"},
        {"[v[" + z + "]v]" + times(3, ref) + "end", std::string(94, 'z') + times(3, "{" + z + "}") + "<" + z + ">"},
        {"[p[abc]p]d", "abc{abc}", 9},
        {"[p[abc]p]", "abc]p", 8},
        {"[v[z]v]x", "<z]>", 5},
        {"abc", "", 0},
        {std::string("a[p[b\0c]p]", 10), "ab"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(parse(c.text, c.length), c.expected) << c.text;
        EXPECT_EQ(parse_slowly(c.text, c.length), c.expected) << c.text;
    }
    const csgl_message none(nullptr, 0, nullptr, 7);
    EXPECT_STREQ(none.text(), "");
    EXPECT_EQ(none->parameter_count(), 0);
    EXPECT_EQ(parse(std::string("ab\0", 3), 5000), "ab");
}

TEST(Message, RandomMarkersParseAsTheRulesSay)
{
    const strings pieces = {"[p[", "]p]", "[v[", "]v]", "=v=VAR=v=", "[v[=v=VAR=v=]v]", "[", "]", "p", "v[", "a word"};
    std::mt19937 random(1);
    for (int round = 0; round < 20000; ++round) {
        std::string text = round % 2 == 0 ? "[v[var]v]" : "";
        for (auto count = random() % 24; count > 0; --count) {
            text += pieces[random() % pieces.size()];
        }
        const std::size_t length = text.size() - random() % (text.size() + 1) / 4;
        ASSERT_EQ(parse(text, length), parse_slowly(text, length)) << text << " of " << length;
    }
}

TEST(Message, BlockUnitsGrowInPowersAndThenInWholeSteps)
{
    const std::size_t cases[][2] = {{0, 8},       {8, 8},       {9, 16},      {17, 32},    {33, 64},     {65, 128},
                                    {129, 256},   {257, 512},   {512, 512},   {513, 1024}, {1024, 1024}, {1025, 2048},
                                    {2047, 2048}, {2048, 3072}, {3071, 3072}, {3072, 4096}};
    for (const auto& [n, unit] : cases) {
        EXPECT_EQ(csgl_message_::allocation_size(n), unit) << n;
    }
}

TEST(Message, IdsHoldANumberAndPerhapsACatalogue)
{
    const struct {
        unsigned id;
        int catalogue, number;
    } cases[] = {
        {0, 4, 0},
        {31, 4, 31},
        {0u - 31, 4, -31},
        {0xbffbffe1, 4, -31},
        {0x40070000, 7, 0},
        {0x7fffffff, 0x3fff, 0xffff},
        {0x80000001, 0x3fff, -0xffff},
        {0x3fffffff, 4, 0x3fffffff},  // without bit 30 all of it is the number
        {0xc0000001, 4, -0x3fffffff},
        {0xc0000000, 0, 0},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(csgl_get_catid(static_cast<int>(c.id)), c.catalogue) << std::hex << c.id;
        EXPECT_EQ(csgl_get_msgid(static_cast<int>(c.id)), c.number) << std::hex << c.id;
    }
}

TEST(MessageLog, TheSignAndThePlaceShapeWhatIsLogged)
{
    const struct {
        int number;
        const char* file;
        strings arguments;
        bool has_rendering = true;
    } cases[] = {
        {-31, "a.schema", {"oid", "cn"}},
        {-31, "", {"oid", "cn"}},
        {5, "a.schema", {"a.schema", "12", "oid", "cn"}},
        {5, "", {"ldap modify", "12", "oid", "cn"}},
        {5, nullptr, {"ldap modify", "12", "oid", "cn"}},
        {24, "", {"ldap modify", "12", "oid", "cn"}, false},    // an entry with nothing behind the place
        {5000, "", {"ldap modify", "12", "oid", "cn"}, false},  // no entry at all
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.number);
        const message_catcher log;
        const std::string text = "[p[oid]p] [p[cn]p]" + std::string(80, '.');  // room for the whole rendering
        const csgl_message message(text.c_str(), c.number, c.file, 12);
        EXPECT_STREQ(message.printed(), "");
        message->log(8, 4);

        ASSERT_EQ(log.count(4, std::abs(c.number)), 1u);
        const test_support::caught_message caught = log.messages()[0];
        strings arguments = c.arguments;
        arguments.resize(c.number < 0 ? 10 : 12);  // null texts arrive as empty ones
        EXPECT_EQ(caught.arguments, arguments);
        EXPECT_EQ(caught.severity, 8);

        const std::size_t place = caught.text.find("ldap modify: ");
        const std::string rendering = place == std::string::npos ? caught.text : caught.text.substr(place + 13);
        EXPECT_EQ(message.printed(), c.has_rendering ? rendering : "");
        EXPECT_EQ(message->printed() != nullptr, c.has_rendering);
    }
}

TEST(MessageLog, NumberZeroStaysOutOfItAndRenderingsEndAtHalfTheBlock)
{
    const message_catcher log;
    const csgl_message silent("[p[a]p]", 0, "file", 1);
    silent->log(8, 4);
    EXPECT_EQ(log.count(), 0u);
    EXPECT_STREQ(silent->printed(), "");

    const csgl_message message("[p[a]p]", -31, "", 1);  // 8 bytes with the terminator: a block of 32
    message->log(8, 4);
    EXPECT_EQ(message.printed(), log.messages().at(0).text.substr(0, 15));
}
