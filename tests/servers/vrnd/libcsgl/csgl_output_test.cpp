// Character sinks and the forms of values, the numbers against snprintf.
#include "servers/vrnd/libcsgl/csgl_output.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <random>
#include <string>

namespace {

struct collector : csgl_output_imp {
    void really_put_char(char c) override { text += c; }
    std::string text;
};

std::string printed(const auto& value)
{
    collector output;
    output << value;
    return output.text;
}

std::string formatted(const char* format, auto value)
{
    char text[64];
    return {text, static_cast<std::size_t>(std::snprintf(text, sizeof(text), format, value))};
}

}  // namespace

TEST(Output, NumbersPrintAsSnprintfPrintsThem)
{
    std::mt19937_64 random(4);
    for (unsigned round = 0; round < 2000; ++round) {
        const unsigned long bits = round < 128 ? (1ul << (round / 2)) - round % 2 : random() >> (random() % 64);
        const auto i = static_cast<int>(bits);
        const auto u = static_cast<unsigned>(bits);
        const auto l = static_cast<long>(bits);
        EXPECT_EQ(printed(i), formatted("%d", i));
        EXPECT_EQ(printed(u), formatted("%u", u));
        EXPECT_EQ(printed(l), formatted("%ld", l));
        EXPECT_EQ(printed(bits), formatted("%lu", bits));
        EXPECT_EQ(printed(csgl_hex(u)), formatted("0x%08x", u));
        EXPECT_EQ(printed(csgl_output_voidp_proxy(reinterpret_cast<void*>(bits))), formatted("%08x", u));
        EXPECT_EQ(csgl_output_length(i), static_cast<int>(formatted("%d", i).size()));
    }
}

TEST(Output, AQuoteInsideAQuotedTextIsDoubled)
{
    const char* cases[][2] = {{"", "''"}, {"a'b", "'a''b'"}, {"''", "''''''"}, {"\"", "'\"'"}};
    for (const auto& [text, expected] : cases)
        EXPECT_EQ(printed(csgl_str_quoted(csgl_string(text), '\'')), expected);
}

TEST(Output, ARedirectorFeedsAStringAndAnotherUntilItIsHalted)
{
    csgl_string text("start ");
    const csgl_string before = text;
    csgl_output_str primary(text);  // which skips byte 0
    collector secondary;
    csgl_output_redirector output(primary, secondary);
    output << 12;
    output.put_chars('\0', 2);
    output.halt_redirection();
    output.put_chars('x', 40);
    EXPECT_EQ(text.c_str(), "start 12" + std::string(40, 'x'));
    EXPECT_STREQ(before.c_str(), "start ");
    EXPECT_EQ(secondary.text, "12\n\n");
}
