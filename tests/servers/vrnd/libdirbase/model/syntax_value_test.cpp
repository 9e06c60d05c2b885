// Integers, booleans, and what each syntax code leads to.
#include <gtest/gtest.h>

#include <cstdint>
#include <optional>
#include <utility>
#include <vector>

#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/syntax_value.h"
#include "servers/vrnd/libdirbase/model/timestamp.h"
#include "tests/support/message_catcher.h"

namespace {

struct row {
    const char* text;
    std::optional<int> value;  // none: the text is refused
};

void expect_rows(std::uint32_t syntax, const std::vector<row>& table)
{
    for (const row& r : table) {
        EXPECT_EQ(check_syntax(syntax, r.text), r.value ? 0 : 21) << testing::PrintToString(r.text);
        int result = -7;
        const heap_pointer<std::int32_t> value(static_cast<std::int32_t*>(str2syntaxvalue(r.text, syntax, &result)));
        EXPECT_EQ(result, r.value ? 0 : 21) << testing::PrintToString(r.text);
        EXPECT_EQ(value == nullptr ? std::optional<int>() : *value, r.value) << testing::PrintToString(r.text);
    }
}

TEST(SyntaxValue, Integers)
{
    constexpr int max = 2147483647;
    expect_rows(SC_INT, {{"0", 0}, {"-17", -17}, {"+17", 17}, {"", 0}, {"+", 0}, {"-", 0}, {"0000000001", 1}});
    expect_rows(SC_INT,
                {{"2147483647", max}, {"+2147483647", max}, {"-2147483648", -max - 1}, {"2147483639", max - 8}});
    expect_rows(SC_INT, {{"2147483648", {}}, {"+2147483648", {}}, {"-2147483649", {}}, {"00000000001", {}}});
    expect_rows(SC_INT, {{"1999999999", 1999999999}, {"2147483650", {}}, {"3000000000", {}}, {nullptr, {}}});
    expect_rows(SC_INT, {{"--1", {}}, {"+-1", {}}, {" 1", {}}, {"1 ", {}}, {"1a", {}}});
}

TEST(SyntaxValue, BooleansAndTheLineOfABadOne)
{
    const test_support::debug_catcher debug;
    expect_rows(SC_BOOL, {{"true", 1}, {"True", 1}, {"TRUE", 1}, {"fALSE", 0}});
    EXPECT_EQ(debug.count(), 0u);
    expect_rows(SC_BOOL, {{"1", {}}, {"TRUEx", {}}, {"", {}}, {nullptr, {}}});
    EXPECT_TRUE(debug.has("bad boolean value TRUEx\n"));
}

TEST(SyntaxValue, WhatEachCodeLeadsTo)
{
    struct code {
        std::uint32_t syntax;
        int check, value_result;    // of the text "n/a"
        int length_result, length;  // of a value of 7 bytes
    };
    const code table[] = {
        {0x001, 0, 0, 0, 7},    {0x002, 0, 0, 0, 7},   {0x004, 0, 0, 0, 1},   {0x009, 0, 0, 0, 7},
        {0x011, 34, 0, 0, 7},   {0x020, 21, 21, 0, 4}, {0x040, 21, 21, 0, 4}, {0x080, 21, 21, 0, 16},
        {0x100, 21, 21, 0, 16}, {0x201, 0, 0, 0, 7},   {0x401, 0, 0, 0, 7},   {0x801, 0, 0, 0, 7},
        {0x000, 0, 21, 21, 0},  {0x003, 0, 21, 0, 7},  {0x008, 0, 21, 21, 0}, {0x200, 0, 21, 21, 0},  // not in use
        {0x1A4, 0, 21, 0, 1},   {0x0A0, 0, 21, 0, 16}, {0x060, 0, 21, 0, 4},  {0x3E3, 0, 21, 0, 7},
    };
    for (const code& c : table) {
        int result = -7;
        int length = -7;
        EXPECT_EQ(check_syntax(c.syntax, "n/a"), c.check) << c.syntax;
        EXPECT_EQ(str2syntaxvalue("n/a", c.syntax, &result), nullptr) << c.syntax;
        EXPECT_EQ(result, c.value_result) << c.syntax;
        EXPECT_EQ(find_value_length(c.syntax, 7, &length), c.length_result) << c.syntax;
        EXPECT_EQ(length, c.length) << c.syntax;
        EXPECT_TRUE(find_value_length(c.syntax, -1, &length) == 0 && length == 0) << c.syntax;
    }
    EXPECT_EQ(check_syntax(SC_DN | SC_CIS, "cn=a"), 0);
    int result = -7;
    EXPECT_EQ(str2timestamp("20240229120000Z", SC_INT, &result), nullptr);
    EXPECT_EQ(result, 1);
    for (const auto& [syntax, text] : {std::pair(SC_GT, "20240229120000Z"), std::pair(SC_UTCT, "240229120000Z")}) {
        const heap_pointer<void> value(str2syntaxvalue(text, syntax, &result));
        ASSERT_TRUE(value != nullptr && result == 0 && check_syntax(syntax, text) == 0) << text;
        EXPECT_EQ(static_cast<tag_timestamp_struct*>(value.get())->day, 29);
    }
}

}  // namespace
