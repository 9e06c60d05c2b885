// The catalogue's wording as clients and administrators read it, and the printing of places.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <limits>
#include <string>
#include <string_view>
#include <vector>

#include "libraries/libmsg/message_format.h"
#include "libraries/libmsg/message_log.h"

namespace {

std::string rendered(int component, int id, const std::vector<message_argument>& arguments)
{
    char buffer[2000];
    getPrintedMessageArguments(buffer, sizeof buffer, component, MSG_SEVERE, id, arguments.data(), arguments.size());
    return buffer;
}

struct wording {
    int id;
    std::vector<message_argument> parameters;
    const char* text;
};

// What a message of the schema engine brings along: its parameters, and null texts up to ten.
std::vector<message_argument> ten(const std::vector<message_argument>& parameters)
{
    std::vector<message_argument> all = parameters;
    all.resize(10, message_argument(static_cast<const char*>(nullptr)));
    return all;
}

TEST(Catalogue, FaultsInSchemaTextReadAsTheParserToldThemBehindTheirPlace)
{
    const wording table[] = {
        {1, {"'('", "'x'"}, "expected '(', but could not find it at or before 'x'"},
        {1, {"numeric object ID", "'cn'"}, "expected numeric object ID, but could not find it at or before 'cn'"},
        {2, {"'DESC' ')'", "'x'"}, "expected one of the following: 'DESC' ')', but could not find it at or before 'x'"},
        {3, {"'1.'"}, "expected digit after '.', but could not find it at or before '1.'"},
        {4, {"''''"}, "expected non-empty quoted string, but could not find it at or before ''''"},
        {5, {"number after '{'", "'x'"}, "expected number after '{', but could not find it at or before 'x'"},
        {6,
         {"'}' after '{' <number>", "'x'"},
         "expected '}' after '{' <number>, but could not find it at or before 'x'"},
        {7, {"'x'"}, "expected qdstring, but could not find it at or before 'x'"},
        {8, {"a qdstring or '('", "'x'"}, "expected a qdstring or '(', but could not find it at or before 'x'"},
        {9, {"'x'"}, "expected descr, but could not find it at or before 'x'"},
        {10, {"'x'"}, "expected qdescr, but could not find it at or before 'x'"},
        {11, {"a qdescr or '('", "'x'"}, "expected a qdescr or '(', but could not find it at or before 'x'"},
        {12, {"''abc'"}, "non-terminated quoted string ''abc'"},
        {13, {}, "unexpected end of input"},
        {14, {"'%'"}, "invalid token '%'"},
        {15, {"'x'"}, "expected usage specification, but could not find it at or before 'x'"},
        {16,
         {"'x'"},
         "expected one or two quoted strings (database table and/or column names), "
         "but could not find it at or before 'x'"},
        {17, {"'x'"}, "expected ACCESS-CLASS specification, but could not find it at or before 'x'"},
        {18, {"attribute type", "'cn'"}, "attribute type 'cn' has already been defined"},
        {19, {"object class", "'1.2'"}, "duplicate definition of object class '1.2'"},
        {20, {"'1.2'"}, "attribute type '1.2' already has an XAN extended definition"},
        {21,
         {"attribute type", "'1.2'", "a.at"},
         "all alternate definitions of same attribute type must be in a single file: '1.2' is also defined in a.at"},
        {22, {"attribute types", "'b'", "'a'", "1.2"}, "inconsistent attribute types 'b' and 'a' (with OID 1.2)"},
        {23, {"matching rule", "'m'"}, "matching rule 'm' must have a syntax."},
        {41, {"'x'"}, "expected ENCRYPT specification, but could not find it at or before 'x'"},
        {42, {"'x'"}, "expected RETURN-VALUE specification, but could not find it at or before 'x'"},
    };
    for (const wording& entry : table) {
        std::vector<message_argument> arguments = ten(entry.parameters);
        arguments.insert(arguments.begin(), {message_argument("ldap modify"), message_argument(7)});
        EXPECT_EQ(rendered(MSG_COMPONENT_SCHEMA, entry.id, arguments),
                  std::string("line 7 of ldap modify: ") + entry.text)
            << "id " << entry.id;
    }
}

TEST(Catalogue, FaultsOfDefinitionsReadAsTheSchemaEngineToldThem)
{
    const wording table[] = {
        {24,
         {"add, delete, replace"},
         "invalid op value; Expected one of the following operation: add, delete, replace"},
        {25,
         {"SUP attribute type", "'a'", "attribute type", "'b'"},
         "SUP attribute type 'a' not found when processing attribute type 'b'"},
        {26, {"syntax", "'1.2'"}, "syntax '1.2' does not exist"},
        {27, {"object class", "'1.2'"}, "object class '1.2' does not exist"},
        {28, {"attribute type", "'cn'", "1.2"}, "attribute type 'cn' (oid 1.2) does not have a syntax"},
        {29,
         {"object class", "'1.2'", "'n'", "object class"},
         "object class: OID '1.2' and 'n' do not refer to the same object class"},
        {30, {"syntax", "'1.2'", "'n'", "syntax"}, "syntax: OID '1.2' and 'n' do not refer to the same syntax"},
        {31, {"attribute type", "'1.2'"}, "attribute type '1.2' already exists"},
        {32, {"syntax", "'1.2'", "3", "2"}, "syntax '1.2' can not be deleted; its refcount is 3.  It should be 2"},
        {33, {"1.2"}, "missing LDAPv3 spec for attribute 1.2"},
        {34, {"attribute type", "'a'", "'b'"}, "attribute type 'a' and its supertype 'b' have different usages"},
        {35, {"'a <= a'"}, "There is a cycle in the supertype specification: 'a <= a'"},
        {36, {"'a <= a'"}, "There is a cycle in the supertype specification: 'a <= a'"},
        {37, {"syntax", "'1'", "( 1 )"}, " Error syntax '1' was not provided; must be provided as ( 1 )"},
        {38, {"syntax", "'1'", "( 1 )", "( 2 )"}, " Error syntax '1' must be provided as ( 1 ) was provided as ( 2 )"},
        {39,
         {"object class", "'o'", "A", "B", "C", "D"},
         " Error object class 'o' must be provided as A with inherited properties or XAN extensions B "
         "was provided as C with inherited properties or XAN extensions D"},
        {40,
         {"attribute type", "'a'", "X", "Y"},
         " Error the XAN extension for attribute type 'a' must be provided as X was provided as Y"},
        {43, {"'a'", "'1.2'"}, "Attribute 'a' cannot be encypted.  Syntax '1.2' is not allowed to be encrypted."},
        {44, {"'a'"}, "Attribute 'a' cannot be encypted. Special attributes are not allowed to be encrypted."},
        {47, {"'a'"}, "Password attribute 'a' cannot be encypted in the schema."},
        {48, {"cn", "1.2"}, "cn already exists with the specified OID: 1.2"},
    };
    for (const wording& entry : table)
        EXPECT_EQ(rendered(MSG_COMPONENT_SCHEMA, entry.id, ten(entry.parameters)), entry.text) << "id " << entry.id;
}

TEST(Catalogue, NoticesNameEverythingTheyAreGiven)
{
    const struct {
        int component;
        int id;
        std::size_t parameters;
    } table[] = {
        {MSG_COMPONENT_SCHEMA, 45, 2}, {MSG_COMPONENT_SCHEMA, 46, 4}, {MSG_COMPONENT_SCHEMA, 49, 3},
        {MSG_COMPONENT_RDBM, 30, 2},   {MSG_COMPONENT_RDBM, 31, 2},   {MSG_COMPONENT_RDBM, 32, 2},
    };
    const std::vector<message_argument> names = {"first-one", "second-one", "third-one", "fourth-one"};
    for (const auto& entry : table) {
        const std::string text = rendered(entry.component, entry.id, names);
        for (std::size_t i = 0; i < names.size(); ++i)
            EXPECT_EQ(text.find(names[i].text) != std::string::npos, i < entry.parameters) << text;
    }
}

TEST(Catalogue, AMessageItDoesNotKnowShowsItsNumbersAndArguments)
{
    EXPECT_EQ(rendered(5, 143, {"cn", 12, static_cast<const char*>(nullptr)}),
              "component 5, severity 8, id 143: 'cn' 12 ''");
    EXPECT_EQ(rendered(MSG_COMPONENT_SCHEMA, 50, {}), "component 4, severity 8, id 50");
    EXPECT_EQ(rendered(MSG_COMPONENT_SCHEMA, -25, {}), "component 4, severity 8, id -25");
}

std::string patterned(std::string_view pattern, const std::vector<message_argument>& arguments)
{
    char buffer[200];
    bounded_text out(buffer, sizeof buffer);
    put_pattern(out, pattern, arguments.data(), arguments.size());
    out.finish();
    return buffer;
}

TEST(MessagePattern, PlacesPrintTheirArgumentByItsOwnTypeAndNeverReadWhatIsNotThere)
{
    const std::vector<message_argument> arguments = {"A", 7, reinterpret_cast<const void*>(0xbeef),
                                                     std::numeric_limits<long>::min(), -1};
    const struct {
        const char* pattern;
        const char* text;
    } table[] = {
        {"%2$s then %1$s", "7 then A"},
        {"%1$d %2$d %3$d", "A 7 0xbeef"},
        {"%4$s %5$s", "-9223372036854775808 -1"},
        {"%1$s%1$s%1$s", "AAA"},
        {"[%6$s][%99$s]", "[][]"},
        {"100%% of %1$s%%", "100% of A%"},
        {"%%1$s", "%1$s"},
        {"%", "%"},
        {"%1", "%1"},
        {"%1$", "%1$"},
        {"%0$s", "%0$s"},
        {"%1$n %s %d", "%1$n %s %d"},
        {"%99999999999999999999$s", "%99999999999999999999$s"},
        {"", ""},
    };
    for (const auto& entry : table)
        EXPECT_EQ(patterned(entry.pattern, arguments), entry.text) << entry.pattern;
    EXPECT_EQ(patterned("%1$s", {"%2$s %n"}), "%2$s %n") << "an argument is no pattern";
}

}  // namespace
