// Lines of LDIF: tables for reading, and a slow writer that goes character by character for writing.
#include "libraries/libldif/line64.h"

#include <gtest/gtest.h>
#include <sys/mman.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "tests/support/message_catcher.h"

using namespace std::string_literals;

namespace {

// Base64 bit by bit.
std::string slow_base64(const std::string& bytes)
{
    std::string bits;
    for (const char c : bytes) {
        for (int bit = 7; bit >= 0; --bit) {
            bits += (static_cast<unsigned char>(c) >> bit & 1) != 0 ? '1' : '0';
        }
    }
    bits.append((6 - bits.size() % 6) % 6, '0');
    std::string text;
    for (std::size_t i = 0; i < bits.size(); i += 6) {
        text += "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/"[std::stoul(bits.substr(i, 6),
                                                                                              nullptr, 2)];
    }
    return text.append((4 - text.size() % 4) % 4, '=');
}

bool slow_is_safe(const std::string& value)
{
    return value.find_first_not_of("\x02\x03\x04\x05\x06\x07\x08\x09\x0b\x0c"
                                   "\x0e\x0f\x10\x11\x12\x13\x14\x15\x16\x17\x18\x19\x1a\x1b\x1c\x1d\x1e\x1f"
                                   " !\"#$%&'()*+,-./0123456789:;<=>?@ABCDEFGHIJKLMNOPQRSTUVWXYZ[\\]^_`"
                                   "abcdefghijklmnopqrstuvwxyz{|}~") == std::string::npos &&
           (value.empty() || (value[0] != ' ' && value[0] != ':' && value[0] != '<'));
}

std::string slow_line(const std::string& type, const std::string& value, bool encode)
{
    std::string line = type.substr(0, type.find(':'));
    line += encode ? ":: " : ": ";
    std::size_t column = line.size();
    for (const char c : encode ? slow_base64(value) : value) {
        if (++column > 76) {
            line += "\n ";
            column = 1;
        }
        line += c;
    }
    return line + "\n";
}

// Pages with one behind them that can't be touched.
class guarded_room {
public:
    guarded_room()
        : start_(static_cast<char*>(
              mmap(nullptr, size + page, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0)))
    {
        mprotect(start_ + size, page, PROT_NONE);
    }
    ~guarded_room() { munmap(start_, size + page); }
    char* last(std::size_t bytes) { return start_ + size - bytes; }

private:
    static constexpr std::size_t page = 4096;
    static constexpr std::size_t size = 16 * page;
    char* start_;
};

std::string random_value(std::mt19937& random, std::size_t length)
{
    std::string value;
    const auto kind = random() % 4;
    for (std::size_t i = 0; i < length; ++i) {
        value += static_cast<char>(kind < 2 ? 'a' + random() % 26 : kind == 2 ? random() % 0x80 : random());
    }
    if (kind == 1 && length != 0) {
        value[random() % length] = "\x01\t\x7f\n\r :<\0"[random() % 9];
    }
    return value;
}

// "type|value", with the result in front where it isn't 0 and marks of Base64 and URL behind.
std::string parsed(std::string line, int mode = LDIF_MODE_ENTRY)
{
    char* type = nullptr;
    char* value = nullptr;
    std::size_t length = 99;
    int url = 9;
    int base64 = 9;
    const int result = str_parse_line_v_or_bv(line.data(), &type, &value, &length, mode, &url, &base64);
    EXPECT_EQ(type == nullptr, result == LDIF_LINE_BAD && base64 == 0);
    EXPECT_TRUE(value == nullptr ? result == LDIF_LINE_BAD && length == 0 : value[length] == '\0');
    return (result == 0 ? "" : std::to_string(result) + " ") + (type == nullptr ? "?" : type) + "|" +
           (value == nullptr ? "?" : std::string(value, length)) + (base64 == 1 ? " b" : "") + (url == 1 ? " u" : "");
}

TEST(Line64, LinesAreTakenWithWhatContinuesThem)
{
    struct {
        const char* text;
        std::vector<std::string> lines;
        const char* rest;  // null: the position is null
    } const table[] = {
        {"cn: a\n b\nsn: c\n",
         {"cn: a\x01\x01"
          "b",
          "sn: c"},
         ""},
        {"cn: a\n\n b", {"cn: a"}, "\n b"},
        {"cn: a\n\tb\n  c",
         {"cn: a\x01\x01"
          "b\x01\x01 c"},
         nullptr},
        {"a\r\nb\r\n", {"a\r", "b\r"}, ""},
        {"a\n \n\n", {"a\x01\x01"}, "\n"},
        {" a\nb", {" a", "b"}, nullptr},
        {"", {}, ""},
        {"\na", {}, "\na"},
    };
    for (const auto& row : table) {
        std::string text = row.text;
        char* next = text.data();
        for (const std::string& line : row.lines) {
            EXPECT_STREQ(str_getline(&next), line.c_str());
        }
        EXPECT_EQ(str_getline(&next), nullptr) << row.text;
        EXPECT_STREQ(next, row.rest);
    }
    char* none = nullptr;
    EXPECT_EQ(str_getline(&none), nullptr);
    char text[] = "\x01"
                  "a\x01\x01"
                  "b\x01";
    int removed = 1;
    EXPECT_STREQ(str_remove_continued_line_marker(text, &removed), "ab");
    EXPECT_EQ(removed, 5);
}

TEST(Line64, LinesPartIntoTypeAndValue)
{
    struct {
        const char* line;
        const char* entry;     // in mode LDIF_MODE_ENTRY
        const char* tolerant;  // and the others; null for the same
        const char* trimmed;
    } const table[] = {
        {"cn: a\x01\x01"
         "b",
         "cn|ab", nullptr, nullptr},
        {"cn: a\n b\n  c", "cn|ab c", nullptr, nullptr},
        {"c\x01\x01n::\x01\x01YW\x01\x01I=", "cn|ab b", nullptr, nullptr},
        {"cn:\x01\x01: YQ==", "cn|: YQ==", nullptr, nullptr},
        {"cn:\n  b", "cn| b", nullptr, nullptr},
        {"cn:\x01\x01", "cn|", nullptr, nullptr},
        {"\x01 cn \x01 \x01: a", "cn|a", nullptr, nullptr},
        {"cn:  a ", "cn| a ", "cn|a ", "cn|a"},
        {" \tcn  :a\t\r", "cn|a\t\r", nullptr, "cn|a"},
        {"cn:\ta", "cn|\ta", nullptr, nullptr},
        {"cn:", "-2 cn|", nullptr, nullptr},
        {"cn:   ", "cn|  ", "-2 cn|", "-2 cn|"},
        {"cn", "-1 ?|?", nullptr, nullptr},
        {"", "-1 ?|?", nullptr, nullptr},
        {": a:b", "|a:b", nullptr, nullptr},
        {"cn:: YWJj", "cn|abc b", nullptr, nullptr},
        {"cn::  YWJj", "-1 cn|? b", "cn|abc b", "cn|abc b"},
        {"cn::", "cn| b", nullptr, nullptr},
        {"cn:: Y!==", "-1 cn|? b", nullptr, nullptr},
        {"cn:< file:///x", "cn|file:///x u", nullptr, nullptr},
        {"cn;lang-en: \xc3\xa4", "cn;lang-en|\xc3\xa4", nullptr, nullptr},
    };
    for (const auto& row : table) {
        EXPECT_EQ(parsed(row.line), row.entry) << row.line;
        EXPECT_EQ(parsed(row.line, LDIF_MODE_TOLERANT), row.tolerant != nullptr ? row.tolerant : row.entry) << row.line;
        EXPECT_EQ(parsed(row.line, LDIF_MODE_TRIMMED), row.trimmed != nullptr ? row.trimmed : row.entry) << row.line;
    }
    const test_support::debug_catcher log;
    parsed("cn");
    parsed("cn:");
    parsed("cn:: A?==");
    EXPECT_EQ(log.texts(),
              (std::vector<std::string>{"parse_line missing ':'\n", "parse_line missing value- setting length=0\n",
                                        "base64decode: invalid base 64 encoding char (?) 0x3f\n"}));
}

TEST(Line64, Base64DecodesWholeGroupsOnly)
{
    const std::pair<const char*, const char*> table[] = {
        {"YQ==", "a"},   {"YWI=", "ab"},  {"YWJj\nYWJj", "abc"}, {"YQ==YQ==", "a"}, {"YWJjY===", "abc"},
        {"=", ""},       {"YWJ!", "ab@"}, {"Y!==", "?"},         {"Y", "?"},        {"YW", "?"},
        {"YWJ", "?"},    {"YWJjY", "?"},  {"YWJjYW\nJ", "?"},    {" YQ==", "?"},    {"YQ==\r", "a"},
        {"YWJj\r", "?"}, {"\xff", "?"},
    };
    for (const auto& [source, expected] : table) {
        std::string text = source;
        std::size_t length = 99;
        const int result = base64decode(text.data(), text.data(), &length);
        EXPECT_EQ(result == 0 ? std::string(text.data(), length) : "?", expected) << source;
        EXPECT_TRUE(result == 0 || (result == 84 && length == 0));
    }
    std::size_t length = 0;
    char text[] = "YQ==";
    char* none = nullptr;
    EXPECT_EQ(base64decode(nullptr, text, &length), -1);
    EXPECT_EQ(base64encode(&none, text, text, -1), -1);
}

TEST(Line64, WhatIsWrittenIsWhatASlowWriterWritesAndStaysInItsRoom)
{
    std::mt19937 random(1);
    guarded_room room;
    bool filled = false;
    for (std::size_t i = 0; i < 30'000; ++i) {
        const std::string type(random() % (i % 50 == 0 ? 200 : 24), 't');
        const std::string value = random_value(random, random() % (i % 50 == 0 ? 9000 : 260));
        const std::size_t size = ldif_line_room(type.size(), value.size());
        char* const start = room.last(size);
        char* out = start;
        put_type_and_value(&out, type.c_str(), value.data(), value.size());
        const std::string line(start, out);
        ASSERT_EQ(line, slow_line(type, value, !slow_is_safe(value)));
        filled = filled || line.size() == size;

        out = start;
        const bool forced = i % 2 == 0;
        put_type_and_value_or_bvalue(&out, type.c_str(), forced ? value.data() : nullptr, 0, value.data(),
                                     value.size());
        ASSERT_EQ(std::string(start, out), forced ? slow_line(type, value, true) : line);

        std::string text = line;
        char* next = text.data();
        char* read_type = nullptr;
        char* read = nullptr;
        std::size_t length = 0;
        ASSERT_EQ(str_parse_line(str_getline(&next), &read_type, &read, &length, LDIF_MODE_ENTRY, nullptr),
                  value.empty() ? -2 : 0);
        ASSERT_EQ(read_type, type);
        ASSERT_EQ(std::string(read, length), value);
    }
    EXPECT_TRUE(filled) << "the room is the least that suffices";
}

TEST(Line64, LinesInNewTextsAndValuesInTwoForms)
{
    const auto line = [](const char* type, const char* value, const char* bvalue, std::size_t length) {
        const std::unique_ptr<char, decltype(&std::free)> text(
            ldif_type_and_value_or_bvalue(type, value, 0, bvalue, length), std::free);
        return text == nullptr ? "(null)"s : std::string(text.get());
    };
    EXPECT_EQ(line("cn", "a:b", nullptr, 3), "cn: a:b\n");
    EXPECT_EQ(line("cn:x", nullptr, "a", 1), "cn: a\n");
    EXPECT_EQ(line("cn", "text", "safe", 4), "cn: text\n");
    EXPECT_EQ(line("cn", "t", "safe", 4), "cn: t\n");
    EXPECT_EQ(line("cn", "longer than that", "safe", 4), "cn: long\n");
    EXPECT_EQ(line("cn", "text", " a", 2), "cn:: IGE=\n");
    EXPECT_EQ(line("cn", nullptr, nullptr, 0), "cn: \n");
    EXPECT_EQ(line(nullptr, "a", nullptr, 1), "(null)");
    std::string unfolded(400, '\0');
    char* out = unfolded.data();
    EXPECT_EQ(base64encode(&out, unfolded.data() + 100, unfolded.data() + 325, -1), 0);
    EXPECT_EQ(std::string(unfolded.data(), out), slow_base64(std::string(225, '\0')));
}

TEST(Line64, MegabytesInOneLineTakeOnePass)
{
    std::string text = "cn: a";
    std::string value = "a";
    for (int i = 0; i < 500'000; ++i) {
        text += "\n bcdefg";
        value += "bcdefg";
    }
    char* next = text.data();
    EXPECT_EQ(parsed(str_getline(&next)), "cn|" + value);
    EXPECT_EQ(parsed(std::string(5'000'000, ':')), "-1 |? b");
}

}  // namespace
