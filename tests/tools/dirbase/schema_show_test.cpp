// dirbase schema show: what a definition comes to, and where it has it from.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "tests/tools/dirbase/run_tool.h"

using testing::Contains;
using testing::HasSubstr;
using tool_test::lines_of;
using tool_test::schema_copy;
using tool_test::tool_run;

namespace {

constexpr char family[] =
    "attributeTypes { ( 1.2.3.1 NAME ( 'root' 'stem' ) EQUALITY caseExactMatch\n"
    "    SYNTAX 1.3.6.1.4.1.1466.115.121.1.15{40} )\n"
    "  ( 1.2.3.2 NAME 'middle' SUP stem ORDERING caseExactOrderingMatch )\n"
    "  ( 1.2.3.3 NAME 'leaf' DESC 'At the end' SUP 1.2.3.2 SINGLE-VALUE )\n"
    "  ( 1.2.3.4 NAME 'phone' SYNTAX 1.3.6.1.4.1.1466.115.121.1.50 ) ( 1.2.3.5 NAME 'call' SUP phone )\n"
    "  ( 1.2.3.6 NAME 'huge' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15{32701} )\n"
    "  ( 1.2.3.7 NAME 'a-long-name-of-a' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15{241} ) }\n"
    "XANattributeTypes { ( 1.2.3.2 DBNAME ( 'mid_table' 'mid_column' ) LENGTH 77 EQUALITY ORDERING 9\n"
    "    ENCRYPT AES-256 ) }\n"
    "objectClasses { ( 1.2.3.10 NAME 'base' ABSTRACT SUP top MUST root MAY ( leaf $ phone ) )\n"
    "  ( 1.2.3.11 NAME 'derived' SUP base MUST leaf MAY ( call $ stem $ phone ) )\n"
    "  ( 1.2.3.12 NAME 'leaf' SUP derived ) }\n"
    "matchingRules { ( 1.2.3.20 NAME 'leaf' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 ) }";

// The line of a label, its blanks as one.
std::vector<std::string> squeezed_lines(const std::string& text)
{
    std::vector<std::string> lines = lines_of(text);
    for (std::string& line : lines) {
        line.erase(std::unique(line.begin(), line.end(), [](char a, char b) { return a == ' ' && b == ' '; }),
                   line.end());
    }
    return lines;
}

}  // namespace

TEST(SchemaShow, EachFactNamesItsSource)
{
    const schema_copy schema;
    schema.write_schema("V3.additions", family);
    const struct {
        const char* name;
        std::vector<std::string> lines;
    } cases[] = {
        {"1.2.3.3",
         {"attribute type leaf", " description At the end", " supertypes middle, root", " subtypes none",
          " equality rule caseExactMatch (2.5.13.5), inherited from root",
          " ordering rule caseExactOrderingMatch (2.5.13.6), inherited from middle", " substrings rule none",
          " syntax 1.3.6.1.4.1.1466.115.121.1.15 (Directory String), inherited from root",
          " effective length 77, from LENGTH of the extended definition of middle", " single value yes", " table LEAF",
          " column LEAF, 77 bytes", " values held as text (0x002)", " equality compares text (0x002)",
          " truncated column none", " extended definition none", " file V3.additions"}},
        {"MIDDLE",
         {"attribute type middle", " subtypes leaf", " ordering rule caseExactOrderingMatch (2.5.13.6)",
          " effective length 77, from LENGTH of the extended definition", " table MID_TABLE",
          " column MID_COLUMN, 77 bytes", " indexes EQUALITY, ORDERING 9", " encryption AES-256",
          " access class NORMAL", " extended in file V3.additions"}},
        {"stem", {"attribute type root", " names root, stem", " effective length 40, from SYNTAX", " supertypes none"}},
        {"phone",
         {" effective length 32, by default for the syntax", " values held as telephone number (0x009)",
          " equality compares none", " short table none"}},
        {"1.2.3.6",
         {" values held as nothing: the server can't compare values of this syntax, or store such long ones",
          " table HUGE", " column HUGE"}},
        {"1.2.3.7", {" truncated column A_LONG_NAME_OF__T, 240 bytes"}},
        {"call", {" effective length 32, by default for the syntax of phone"}},
        {"derived",
         {"object class derived", " class kind STRUCTURAL", " superclasses base, top", " subclasses leaf",
          " must leaf derived", " must objectClass top", " must root base", " may call derived",
          " may phone derived, base"}},
        {"base", {" class kind ABSTRACT", " must root base", " may leaf base", " subclasses derived, leaf"}},
        {"caseexactmatch", {"matching rule caseExactMatch", " oid 2.5.13.5"}},
        {"1.3.6.1.4.1.1466.115.121.1.7", {"syntax 1.3.6.1.4.1.1466.115.121.1.7", " description Boolean"}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const tool_run run = schema.run("show", {c.name});
        EXPECT_EQ(run.status, 0) << run.err;
        const std::vector<std::string> lines = squeezed_lines(run.out);
        for (const std::string& line : c.lines) {
            EXPECT_THAT(lines, Contains(line));
        }
    }
}

TEST(SchemaShow, AllThatANameLeadsToIsShownAndUnknownNamesAreFindings)
{
    const schema_copy schema;
    schema.write_schema("V3.additions", family);
    const tool_run run = schema.run("show", {"Leaf", "nobody", "derived", "--json"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("nobody: no definition"));
    const auto parsed = nlohmann::json::parse(run.out);
    EXPECT_EQ(parsed["ok"], false);
    EXPECT_EQ(parsed["unknown"], std::vector<std::string>{"nobody"});
    const auto listed = [](const nlohmann::json& members, const char* field) {
        std::vector<std::string> texts;
        for (const auto& member : members) {
            texts.push_back(member[field]);
        }
        return texts;
    };
    EXPECT_EQ(listed(parsed["definitions"], "oid"),
              (std::vector<std::string>{"1.2.3.3", "1.2.3.12", "1.2.3.20", "1.2.3.11"}));
    const auto& derived = parsed["definitions"][3];  // what a class requires it doesn't permit too
    EXPECT_EQ(listed(derived["must"], "attribute"), (std::vector<std::string>{"leaf", "objectClass", "root"}));
    EXPECT_EQ(listed(derived["may"], "attribute"), (std::vector<std::string>{"call", "phone"}));
}
