// Normal forms in all three forms of the call, and the order of values.
#include "servers/vrnd/libdirbase/model/value_normalize.h"

#include <utility>

#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

using model_test::text_of;
using test_support::debug_catcher;

namespace {

constexpr unsigned DN = SC_DN | SC_CIS;
constexpr unsigned TEL = SC_TEL | SC_CIS;
constexpr unsigned BITS = SC_BIT_STRING | SC_CIS;
constexpr unsigned DIGITS = SC_NUMERIC_STRING | SC_CIS;
constexpr unsigned COUNTRY = SC_COUNTRY_STRING | SC_CIS;

class ValueNormalize : public model_test::Model {};
class ValueCompare : public model_test::Model {};

TEST_F(ValueNormalize, EveryRuleInEveryForm)
{
    struct {
        unsigned syntax;
        const char* text;
        int result;
        const char* normal;  // or, for a refused text, the line of value_normalize behind "Error - value_normalize"
        const char* berval_line = "";  // the line of value_normalize_berval where it is another
    } const table[] = {
        {SC_CIS, "a  b \xc3\xbc", 0, "A  B \xc3\x9c"},
        {SC_CIS,
         "a\xff"
         "b",
         0,
         "A\xff"
         "b"},
        {SC_CES, "aB", 0, "aB"},
        {SC_BIN, "aB", 0, "aB"},
        {SC_INT, "+1", 0, "+1"},
        {DN, "CN = a\\2Cb , commonname=c", 0, "CN=A\\,B,CN=C"},
        {DN, "", 0, ""},
        {DN, "cn=\"a,b;c+d\"", 0, "CN=A\\,B\\;C\\+D"},  // longer than it was
        {DN, "none=a", 17, nullptr},
        {DN, "cn", 34, nullptr},
        {TEL, "+1 (512) 555-1212", 0, "+1(512)5551212"},
        {TEL, "ab-c\xc3\xbc", 0, "ABC\xc3\xbc"},
        {BITS, "'0101'B", 0, "0101"},
        {BITS, "  '1'b  ", 0, "1"},
        {BITS, "0101", 21, "bit string missing leading quote 0101\n"},
        {BITS, "'012'B", 21, "bit string value out of range '012'B\n", "bit string value out of range 'B' '012'B\n"},
        {BITS, "''B", 21, "empty bit string\n", "empty bit string value ''B\n"},
        {BITS, "'01", 21, "bad bit string value '01\n", "bit string missing trailing 'B' '01\n"},
        {BITS, "'01' B", 21, "bad bit string value '01' B\n", "bit string missing trailing 'B' '01' B\n"},
        {BITS, "'01'Bx", 21, "bad bit string value '01'Bx\n"},
        {DIGITS, "  123  ", 0, "123"},
        {DIGITS, "   ", 0, ""},
        {DIGITS, "1 23", 21, "bad numeric string value 1 23\n"},
        {DIGITS, " 1x", 21, "numeric string value out of range  1x\n"},
        {COUNTRY, "us", 0, "US"},
        {COUNTRY, "usa", 21, "bad country string value usa\n"},
        {COUNTRY, "u1", 21, "bad country string value u1\n"},
    };
    for (const auto& row : table) {
        const debug_catcher debug;
        const std::string expected = row.result == 0 ? row.normal : row.text;
        char* text = strdup(row.text);
        EXPECT_EQ(value_normalize(&text, row.syntax), row.result) << row.text;
        EXPECT_EQ(text, expected);
        std::free(text);

        for (const int embedded : {0, 1}) {
            berval value = {std::strlen(row.text), strdup(row.text)};
            char* const buffer = value.bv_val;
            EXPECT_EQ(value_normalize_berval(&value, row.syntax, embedded), row.result) << row.text;
            EXPECT_EQ(text_of(value), expected);
            EXPECT_EQ(value.bv_val[value.bv_len], '\0');
            EXPECT_EQ(value.bv_val != buffer, expected.size() > std::strlen(row.text));
            if (embedded != 0 && value.bv_val != buffer) {
                std::free(buffer);
            }
            std::free(value.bv_val);
        }
        if (row.result == 21) {
            const std::string line = *row.berval_line == '\0' ? row.normal : row.berval_line;
            EXPECT_TRUE(debug.has("Error - value_normalize: " + std::string(row.normal))) << row.text;
            EXPECT_TRUE(debug.has("Error - value_normalize_berval: " + line)) << row.text;
        }

        berval record = {77, nullptr};
        berval* target = &record;
        EXPECT_EQ(value_normalize_for_tables(*model_test::value_list({row.text}).get(), &target, row.syntax), 0);
        ASSERT_EQ(target, row.syntax == SC_BIN ? nullptr : &record);
        EXPECT_EQ(target == nullptr ? row.text : text_of(record), expected);
        std::free(record.bv_val);
    }
}

TEST_F(ValueNormalize, BytesBehindAByte0AreOfNoForm)
{
    for (const auto& [syntax, text, result] : {std::tuple(unsigned{DN}, "cn=a", 34),
                                               {BITS, "'1'B", 21},
                                               {DIGITS, "12", 21},
                                               {COUNTRY, "us", 21},
                                               {TEL, "A1", 0},
                                               {SC_CIS, "A", 0}}) {
        std::string bytes = text + std::string("\0b", 2);
        berval value = {bytes.size(), bytes.data()};
        EXPECT_EQ(value_normalize_berval(&value, syntax, 1), result) << text;
        EXPECT_STREQ(value.bv_val, text);
        EXPECT_EQ(value.bv_len, result == 0 ? std::strlen(text) : bytes.size());
    }
}

TEST_F(ValueCompare, TextsNumbersAndBytesByTheirSyntax)
{
    constexpr int below = -1;
    constexpr int above = 1;
    const std::string zero("\0", 1);
    struct {
        unsigned syntax;
        std::string a, b;
        int raw;
        int order;
        bool exact = false;  // the order is a result code
    } const table[] = {
        {SC_CIS, "abc", "ABC", 3, 0},
        {SC_CIS, "abc", "ABC", 2, above},
        {SC_CIS, "ABC", "abc", 2, 0},
        {SC_CIS, "AB", "ABC", 0, below},
        {SC_CIS, "\xc3\xa4", "b", 3, above},  // bytes are unsigned
        {SC_CIS, "a" + zero + "b", "A", 3, 0},
        {SC_CES, "abc", "ABC", 3, above},
        {DN, "cn=a, cn=b", "commonName=A,CN=B", 3, 0},
        {TEL, "1 2-3", "123", 1, 0},
        {DIGITS, "1 2", "1 2", 1, 0},  // refused, so as it is
        {SC_BIN, "ab", "ab" + zero, 3, below},
        {SC_BIN, "b", "ab", 0, above},
        {SC_BIN, "", "", 0, 0},
        {SC_INT, "-5", "4", 0, below},
        {SC_INT, "+007", "7", 0, 0},
        {SC_INT, "10", "9", 0, above},
        {SC_BOOL, "TRUE", "FALSE", 0, above},
        {SC_BOOL, "TRU", "TRUE", 0, below},
        {SC_GT, "20240101000000Z", "20240101010000+0100", 0, 0},
        {SC_GT, "20240101000000Z", "20231231235959.5Z", 0, above},
        {SC_UTCT, "2401010000Z", "240101000001Z", 0, below},
        {SC_GT, "20240101000000Z", "2024", 0, 21, true},
        {0x003, "a", "a", 0, 21, true},
    };
    for (const auto& row : table) {
        const model_test::value_list values({row.a, row.b});
        const int order = value_cmp(values.get()[0], values.get()[1], row.syntax, row.raw);
        EXPECT_EQ(row.exact ? order : (order > 0) - (order < 0), row.order)
            << row.a << " " << row.b << " " << row.syntax;
        EXPECT_EQ(text_of(*values.get()[0]), row.a);
    }
    const debug_catcher debug;
    EXPECT_EQ(value_cmp(nullptr, *model_test::value_list({"a"}).get(), SC_CIS, 0), 80);
    EXPECT_TRUE(debug.has("Error - value_cmp: berval is NULL\n"));
}

}  // namespace
