// The readers of the small productions and the printers that undo them.
#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"

#include <functional>
#include <map>
#include <random>

#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

namespace {

template <typename Items>
std::string listed(const Items& items)
{
    std::string text;
    for (const csgl_string& item : items) {
        text += "[" + std::string(item) + "]";
    }
    return text;
}

using reader = std::function<std::string(ldcf_token_factory&)>;
const std::map<std::string, reader> readers = {
    {"oid", [](auto& f) { return std::string(ldcf_stream::oid(f)); }},
    {"oids", [](auto& f) { return listed(ldcf_stream::oids(f)); }},
    {"qnoid", [](auto& f) { return std::string(ldcf_stream::qnoid(f)); }},
    {"optlen", [](auto& f) { return std::to_string(ldcf_stream::optlen(f)); }},
    {"qdstring", [](auto& f) { return std::string(ldcf_stream::qdstring(f)); }},
    {"qdstrings", [](auto& f) { return listed(ldcf_stream::qdstrings(f)); }},
    {"descr", [](auto& f) { return std::string(ldcf_stream::descr(f)); }},
    {"qdescr", [](auto& f) { return std::string(ldcf_stream::qdescr(f)); }},
    {"qdescrs",
     [](auto& f) {
         csgl_string first("none");
         const std::string names = listed(ldcf_stream::qdescrs(f, first));
         return names + " by " + std::string(first);
     }},
};

#define TOKEN(id) "exc_invalid_token_t " #id " @1: expected "
#define ONE_OF TOKEN(2) "one of the following: "
#define NOT_NUMERIC "exc_invalid_grammar_t 1 @1: expected numeric object ID" NOT_FOUND

}  // namespace

TEST(LdcfStream, ReadersTakeWhatTheirGrammarSays)
{
    // A reader, a text, and what it reads with the rest of the text behind a bar.
    const char* const cases[][3] = {
        {"oid", "cn x", "cn | x"},
        {"oid", "25 'cn'", "25 | cn"},
        {"oid", "'c n'", TOKEN(1) "object ID" NOT_FOUND "''c n''"},
        {"oid", "# c", TOKEN(1) "object ID" NOT_FOUND "'# c'"},
        {"oid", " ", "exc_unexpected_end_of_input_t 13 @1: unexpected end of input"},
        {"oids", "a b", "[a] | b"},
        {"oids", "( ) b", " | b"},
        {"oids", "( b $ 'A' $ 1.2 $ B $ a) c", "[1.2][A][b] | c"},
        {"oids", "$ a", ONE_OF "'object ID' '('" NOT_FOUND "'$ a'"},
        {"oids", "( $ a )", ONE_OF "'object ID' ')'" NOT_FOUND "'$ a )'"},
        {"oids", "( a b )", ONE_OF "'$' ')'" NOT_FOUND "'b )'"},
        {"oids", "( a $ )", TOKEN(1) "object ID" NOT_FOUND "')'"},
        {"qnoid", "1.2 x", "1.2 | x"},
        {"qnoid", "' 1.2 ' x", "1.2 | x"},
        {"qnoid", "'cn' x", NOT_NUMERIC "''cn' x'"},
        {"qnoid", "'1.2 3'", NOT_NUMERIC "''1.2 3''"},
        {"qnoid", "' '", NOT_NUMERIC "'' ''"},
        {"qnoid", "'1.'", NOT_NUMERIC "''1.''"},
        {"qnoid", "cn", TOKEN(1) "numeric object ID" NOT_FOUND "'cn'"},
        {"optlen", "016 x", "16 | x"},
        {"optlen", "x", "0 | x"},
        {"optlen", "1.2", "0 | 1.2"},
        {"qdstring", "'a b' x", "a b | x"},
        {"qdstring", "'a'", "a |"},
        {"qdstring", "a", TOKEN(7) "qdstring" NOT_FOUND "'a'"},
        {"qdstrings", "( 'b' 'a' 'b' )", "[b][a][b] |"},
        {"qdstrings", "b", TOKEN(8) "a qdstring or '('" NOT_FOUND "'b'"},
        {"qdstrings", "( )", TOKEN(8) "a qdstring or ')'" NOT_FOUND "')'"},
        {"qdstrings", "( 'a' $ 'b' )", TOKEN(8) "a qdstring or ')'" NOT_FOUND "'$ 'b' )'"},
        {"descr", "cn x", "cn | x"},
        {"descr", "'cn'", TOKEN(9) "descr" NOT_FOUND "''cn''"},
        {"qdescr", "'cn' x", "cn | x"},
        {"qdescr", "'1.2'", TOKEN(10) "qdescr" NOT_FOUND "''1.2''"},
        {"qdescrs", "'cn' x", "[cn] by cn | x"},
        {"qdescrs", "( 'b' 'a' 'B' )", "[a][b] by b |"},
        {"qdescrs", "'a b'", TOKEN(11) "a qdescr or '('" NOT_FOUND "''a b''"},
        {"qdescrs", "( )", TOKEN(11) "a qdescr or ')'" NOT_FOUND "')'"},
        {"qdescrs", "( 'a' b )", TOKEN(11) "a qdescr or ')'" NOT_FOUND "'b )'"},
    };
    for (const auto& [name, text, expected] : cases) {
        ldcf_token_factory factory(text, "test");
        std::string result;
        const std::string fault = schema_test::refused([&] {
            result = readers.at(name)(factory) + " |";
            while (!factory.empty()) {
                result += " " + std::string(ldcf_token(factory).text());
            }
        });
        EXPECT_EQ(result + fault, expected) << name << " on " << text;
    }
}

TEST(LdcfStream, WhatIsPrintedReadsBackAsItWas)
{
    const ldcf_names none, one = {"x"}, three = {"c", "A", "b"};
    EXPECT_STREQ((ldcf_stream::oids("MAY", none) + ldcf_stream::qdescrs("NAME", none, "x")), "");
    EXPECT_STREQ((ldcf_stream::oids(" MAY", one) + ldcf_stream::oids("MAY", three)), " MAY x MAY ( A $ b $ c ) ");
    EXPECT_STREQ((ldcf_stream::qdescrs("NAME", one, "X") + ldcf_stream::qdescrs("NAME", three, "B")),
                 "NAME 'X' NAME ( 'B' 'A' 'c' ) ");
    std::mt19937 random(2);
    for (int round = 0; round < 500; ++round) {
        ldcf_names names;
        csgl_string primary;
        for (auto n = random() % 6 + 1; n > 0; --n) {
            const char* const parts[] = {"a", "A", "b", "B", "c1", "-", "_;"};
            primary = csgl_string(parts[random() % 4]) + parts[random() % 7] + parts[random() % 7];
            names.insert(primary);
        }
        const csgl_string oids = ldcf_stream::oids("", names);
        const csgl_string quoted = ldcf_stream::qdescrs("", names, primary);
        ldcf_token_factory oid_text(oids, "");
        ldcf_token_factory quoted_text(quoted, "");
        csgl_string first;
        EXPECT_TRUE(ldcf_names_equal(ldcf_stream::oids(oid_text), names)) << oids;
        EXPECT_TRUE(ldcf_names_equal(ldcf_stream::qdescrs(quoted_text, first), names)) << quoted;
        EXPECT_STREQ(first, primary);
    }
}
