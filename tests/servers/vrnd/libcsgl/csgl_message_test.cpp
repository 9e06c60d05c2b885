// Messages: their markers, the message ids, and what reaches the message log.
#include "servers/vrnd/libcsgl/csgl_message.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <string>
#include <vector>

#include "tests/support/message_catcher.h"

using test_support::message_catcher;

namespace {

// A message taken apart: plain{parameter}{parameter}<variable>
std::string parse(const std::string& text, std::size_t length)
{
    const std::vector<char> bytes(text.begin(), text.end());  // without anything behind its end
    const csgl_refcounted_pointer_to<csgl_message_> body(new csgl_message_);
    body->init(bytes.data(), static_cast<unsigned>(length), 0, "file", 1);
    std::string result = body->text();
    for (int i = 0; i < csgl_message_::parameter_limit; ++i) {
        EXPECT_EQ(body->parameter(i) != nullptr, i < body->parameter_count()) << "parameter " << i;
        result += body->parameter(i) == nullptr ? "" : "{" + std::string(body->parameter(i)) + "}";
    }
    return text.substr(0, length).rfind("[v[", 0) == 0 ? result + "<" + body->variable() + ">" : result;
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
        // clang-format off
    } cases[] = {
        {"", ""}, {"[p[a]p]", "a{a}"}, {"[p[]p]x[p[b]p]", "xb{}{b}"}, {"[p[a", "a"}, {"x]p]y", "x]p]y"},
        {"a[p[b[p[c]p]", "ab[p[c{b[p[c}"}, {"[p[a[p[v[b]p]", "a[pb{a[pb}"}, {"[v[z]v]", "<z>"}, {"[v[z]v", "<z]v>"},
        {ref, "<=v=VAR=v=>"}, {"x" + ref + "[v[y]v]z", "xy]v]z"}, {"[v[z]v][p[a" + ref + "b]p]", "azb{z}{ab}<z>"},
        {"[v[z]v][v[=v=VAR=v=", "z{z}<z>"}, {"[p[abc]p]", "abc]p", 8}, {"[v[z]v]x", "<z]>", 5}, {"abc", "", 0},
        {std::string("a[p[b\0c]p]", 10), "ab", 5000},
        {times(12, "[p[a]p]") + "z", times(12, "a") + "z" + times(10, "{a}")},
        {"[v['a b']v]want [p[oid]p] at " + ref + ".", "want oid at 'a b'.{oid}{'a b'}<'a b'>"},
        {"[v[z]v]" + times(10, "[p[a]p]") + ref, times(10, "a") + "z" + times(10, "{a}") + "<z>"},
        {"[v[" + z + "]v]" + times(3, ref) + "end", std::string(94, 'z') + times(3, "{" + z + "}") + "<" + z + ">"}};
    // clang-format on
    for (const auto& c : cases)
        EXPECT_EQ(parse(c.text, c.length), c.expected) << c.text;
    EXPECT_STREQ(csgl_message(nullptr, 0, nullptr, 7).text(), "");
}

TEST(Message, IdsHoldANumberAndPerhapsACatalogueAndUnitsGrowBySteps)
{
    const long cases[][3] = {{0, 4, 0},
                             {31, 4, 31},
                             {-31, 4, -31},
                             {static_cast<int>(0xbffbffe1), 4, -31},
                             {0x40070000, 7, 0},
                             {0x7fffffff, 0x3fff, 0xffff},
                             {-0x3fffffff, 4, -0x3fffffff}};
    for (const auto& [id, catalogue, number] : cases) {
        EXPECT_EQ(csgl_get_catid(static_cast<int>(id)), catalogue) << id;
        EXPECT_EQ(csgl_get_msgid(static_cast<int>(id)), number) << id;
    }
    for (std::size_t n = 0; n < 5000; ++n) {
        const std::size_t unit = n <= 1024 ? std::bit_ceil(std::max<std::size_t>(n, 8)) : (n / 1024 + 1) * 1024;
        ASSERT_EQ(csgl_message_::allocation_size(n), unit) << n;
    }
}

TEST(MessageLog, TheSignAndThePlaceShapeWhatIsLogged)
{
    const struct {
        int number;
        const char* file;
        std::vector<std::string> arguments;
        bool has_rendering = true;
    } cases[] = {{-31, "a.schema", {"cn"}},
                 {5, "a.schema", {"a.schema", "12", "cn"}},
                 {5, "", {"ldap modify", "12", "cn"}},
                 {5, nullptr, {"ldap modify", "12", "cn"}},
                 {24, "", {"ldap modify", "12", "cn"}, false}};  // the catalogue's text puts nothing behind the place
    for (auto c : cases) {
        const message_catcher log;
        const std::string text = "[p[cn]p]" + std::string(80, '.');  // room for the whole rendering
        const csgl_message message(text.c_str(), c.number, c.file, 12);
        message->log(8, 4);
        ASSERT_EQ(log.count(4, std::abs(c.number)), 1u);
        const test_support::caught_message caught = log.messages()[0];
        c.arguments.resize(c.number < 0 ? 10 : 12);  // a null text arrives as an empty one
        EXPECT_EQ(caught.arguments, c.arguments);
        EXPECT_EQ(caught.severity, 8);
        const std::size_t place = caught.text.find("ldap modify: ");
        const std::string rendering = place == std::string::npos ? caught.text : caught.text.substr(place + 13);
        EXPECT_EQ(message.printed(), c.has_rendering ? rendering : "");
        EXPECT_EQ(message->printed() != nullptr, c.has_rendering);
    }
    const message_catcher log;
    const csgl_message silent("[p[a]p]", 0, "file", 1);
    silent->log(8, 4);
    EXPECT_EQ(log.count(), 0u);
    const csgl_message cut("[p[a]p]", -31, "", 1);  // 8 bytes with the terminator: a block of 32, and half of it
    cut->log(8, 4);
    EXPECT_EQ(cut.printed(), log.messages().at(0).text.substr(0, 15));
}
