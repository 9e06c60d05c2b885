// Character sinks and the forms of values, the numbers against snprintf.
#include "servers/vrnd/libcsgl/csgl_output.h"

#include <gtest/gtest.h>

#include <cinttypes>
#include <climits>
#include <cstdio>
#include <random>
#include <string>
#include <vector>

namespace {

class collector : public csgl_output_imp {
public:
    void really_put_char(char c) override { text += c; }
    std::string text;
};

// A buffer of three bytes in front of a list of what it handed on.
class short_buffer : public csgl_output_buffer_imp {
public:
    short_buffer() : csgl_output_buffer_imp(bytes_, sizeof(bytes_)) {}
    void flush() override
    {
        write(begin_, static_cast<unsigned>(current_ - begin_));
        current_ = begin_;
    }
    unsigned write(void* data, unsigned size) override
    {
        pieces.emplace_back(static_cast<const char*>(data), size);
        return size;
    }
    std::vector<std::string> pieces;

private:
    char bytes_[3];
};

class text_input : public csgl_input {
public:
    explicit text_input(std::string text) : text_(text) {}
    bool get_char(char& c) override
    {
        if (at_ == text_.size()) {
            return false;
        }
        c = text_[at_++];
        return true;
    }

private:
    std::string text_;
    std::size_t at_ = 0;
};

template <typename Value>
std::string printed(const Value& value)
{
    collector output;
    csgl_output& result = output << value;
    EXPECT_EQ(&result, &output);
    return output.text;
}

template <typename... Arguments>
std::string formatted(const char* format, Arguments... arguments)
{
    char text[64];
    return {text, static_cast<std::size_t>(std::snprintf(text, sizeof(text), format, arguments...))};
}

}  // namespace

TEST(Output, NumbersPrintAsSnprintfPrintsThem)
{
    std::vector<std::uint64_t> values = {
        0,          1,          9,          10,    99,        0x7fffffff,      0x80000000,
        0xffffffff, 1ull << 32, 1ull << 63, ~0ull, ~0ull - 4, (1ull << 63) - 1};
    std::mt19937_64 random(4);
    for (int i = 0; i < 2000; ++i) {
        values.push_back(random() >> (random() % 64));
    }
    for (const std::uint64_t bits : values) {
        const auto i = static_cast<int>(bits);
        const auto u = static_cast<unsigned>(bits);
        const auto l = static_cast<long>(bits);
        EXPECT_EQ(printed(i), formatted("%d", i));
        EXPECT_EQ(printed(u), formatted("%u", u));
        EXPECT_EQ(printed(l), formatted("%ld", l));
        EXPECT_EQ(printed(static_cast<unsigned long>(bits)), formatted("%" PRIu64, bits));
        EXPECT_EQ(printed(csgl_hex(u)), formatted("0x%08x", u));
        EXPECT_EQ(printed(csgl_output_voidp_proxy(reinterpret_cast<void*>(bits))), formatted("%08x", u));
        EXPECT_EQ(csgl_output_length(i), std::snprintf(nullptr, 0, "%d", i));
    }
}

TEST(Output, QuotesInsideAQuotedTextAreDoubled)
{
    const struct {
        const char* text;
        char quote;
        const char* expected;
    } cases[] = {
        {"", '\'', "''"},        {"a'b", '\'', "'a''b'"}, {"''", '\'', "''''''"},
        {"a'b", '"', "\"a'b\""}, {"\"", '"', "\"\"\"\""}, {"plain", 'l', "lpllainl"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(printed(csgl_str_quoted(csgl_string(c.text), c.quote)), c.expected);
    }
}

TEST(Output, TextsAndInputsAreCopiedWhole)
{
    collector output;
    text_input input(std::string("x\0y", 3));
    output << "ab" << static_cast<const char*>(nullptr) << "" << csgl_string("cd") << input << input;
    output.put_chars('-', 3);
    output.put_chars('+', 0);
    output.flush();
    EXPECT_EQ(output.text, std::string("abcdx\0y---", 10));
}

TEST(Output, ABufferIsHandedOnWhenTheNextByteFindsItFull)
{
    short_buffer output;
    output << "abc";
    EXPECT_TRUE(output.pieces.empty());
    output << "d";
    EXPECT_EQ(output.pieces, std::vector<std::string>({"abc"}));
    output.put_chars('e', 6);
    output.flush();
    EXPECT_EQ(output.pieces, std::vector<std::string>({"abc", "dee", "eee", "e"}));
}

TEST(Output, AStringSinkLeavesOtherHandlesAloneAndSkipsByteZero)
{
    csgl_string text("start ");
    const csgl_string before = text;
    csgl_output_str output(text);
    output << 12 << " ";
    output.really_put_char('\0');
    output.put_chars('x', 40);
    EXPECT_EQ(text.c_str(), "start 12 " + std::string(40, 'x'));
    EXPECT_EQ(text.length(), 49u);
    EXPECT_STREQ(before.c_str(), "start ");
}

TEST(Output, ARedirectorFeedsBothUntilItIsHalted)
{
    collector primary;
    collector secondary;
    csgl_output_redirector output(primary, secondary);
    output << "a" << 1;
    output.put_chars('\0', 2);
    output.halt_redirection();
    output << "b";
    EXPECT_EQ(primary.text, std::string("a1\0\0b", 5));
    EXPECT_EQ(secondary.text, "a1\n\n");
}
