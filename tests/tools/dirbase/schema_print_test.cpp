// dirbase schema print: what is printed loads again and prints the same.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "tests/tools/dirbase/run_tool.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using tool_test::lines_of;
using tool_test::run_tool;
using tool_test::schema_copy;
using tool_test::single_file_schema;
using tool_test::tool_run;

namespace {

// Whatever the grammar allows and a printer could get wrong.
constexpr char odd_definitions[] =
    "XANattributeTypes = ( 1.2.3.1 DBNAME 'one' ENCRYPT AES-128 RETURN-VALUE type-only SUBSTR 12 REVERSE NONMATCHABLE\n"
    "    SECURE-CONNECTION-REQUIRED ACCESS-CLASS restricted )\n"
    "ATTRIBUTETYPES { ( 1.2.3.1 NAME ( 'Zulu' 'alpha' 'ZULU' ) DESC 'two\nlines, \xff\xfe and \x01' OBSOLETE\n"
    "    EQUALITY 2.5.13.5 SYNTAX '1.3.6.1.4.1.1466.115.121.1.15{32}' SINGLE-VALUE )\n"
    "  ( 1.2.3.2 SUP 'zulu' )\n"
    "  ( 1.2.3.3 NAME 'twice' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 ) ( 1.2.3.3 NAME 'again' SYNTAX\n"
    "    1.3.6.1.4.1.1466.115.121.1.15 ) ( Word-OID NAME 'named' SUP 1.2.3.2 COLLECTIVE NO-USER-MODIFICATION ) }\n"
    "objectClasses { ( 1.2.3.4 ) ( 1.2.3.5 NAME 'aux' AUXILIARY MUST zulu MAY ( alpha $ again ) OBSOLETE )\n"
    "  ( 1.2.3.6 NAME 'both' SUP ( top $ aux ) ABSTRACT MAY ( ) ) }\n"
    "matchingRules: ( 1.2.3.7 OBSOLETE SYNTAX '1.3.6.1.4.1.1466.115.121.1.15' )\n"
    "ldapSyntaxes{(1.2.3.8)}";

std::string section(const std::string& file, const std::string& keyword)
{
    const std::string opening = keyword + " {\n";
    const std::size_t start = file.find(opening) + opening.size();
    return file.substr(start, file.find("\n}\n", start) + 1 - start);
}

// What a text in JSON stands for: itself, or bytes that aren't UTF-8, in Base64.
std::string bytes_of(const nlohmann::json& text)
{
    if (text.is_string()) {
        return text.get<std::string>();
    }
    const std::string digits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string bytes;
    std::size_t bits = 0;
    int held = 0;
    for (const char c : text["base64"].get<std::string>()) {
        if (c != '=') {
            bits = bits << 6 | digits.find(c);
            held += 6;
        }
        if (held >= 8) {
            held -= 8;
            bytes += static_cast<char>(bits >> held);
        }
    }
    return bytes;
}

}  // namespace

TEST(SchemaPrint, WhatIsPrintedSaysWhatWasSaidAndLoadsToTheSamePrint)
{
    const schema_copy schema;
    schema.write_schema("V3.additions", odd_definitions);
    for (const std::vector<std::string>& form : {std::vector<std::string>{}, {"--form", "v3"}}) {
        SCOPED_TRACE(testing::PrintToString(form));
        const tool_run first = schema.run("print", form);
        ASSERT_EQ(first.status, 0) << first.err;
        const single_file_schema again(first.out);

        std::vector<std::string> call = {"schema", "print", "--schema", again.folder()};
        call.insert(call.end(), form.begin(), form.end());
        const tool_run second = run_tool(call);
        EXPECT_EQ(second.status, 0) << second.err;
        EXPECT_TRUE(first.out == second.out) << "the second print differs";
        EXPECT_EQ(run_tool({"schema", "check", "--schema", again.folder()}).out, schema.run("check").out);
    }
    EXPECT_THAT(schema.run("print").out,
                AllOf(HasSubstr("( 1.2.3.1 NAME ( 'Zulu' 'alpha' ) DESC 'two\nlines, \xff\xfe and \x01' OBSOLETE "
                                "EQUALITY 2.5.13.5 SYNTAX 1.3.6.1.4.1.1466.115.121.1.15{32} SINGLE-VALUE )\n"),
                      HasSubstr("( 1.2.3.1 DBNAME 'one' ACCESS-CLASS RESTRICTED SUBSTR 12 REVERSE ENCRYPT AES-128 "
                                "RETURN-VALUE type-only SECURE-CONNECTION-REQUIRED NONMATCHABLE )\n"),
                      HasSubstr("\n( 1.2.3.2 SUP zulu )\n"),
                      HasSubstr("\n( 1.2.3.3 NAME ( 'twice' 'again' ) SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )\n"),
                      HasSubstr("\n( 1.2.3.4 SUP top STRUCTURAL )\n"),
                      HasSubstr("\n( 1.2.3.7 OBSOLETE SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )\n")));
}

TEST(SchemaPrint, AKindIsTheLinesOfItsSection)
{
    const schema_copy schema;
    const char* const cases[][3] = {
        {"v3", "syntaxes", "ldapSyntaxes"},
        {"v3", "matchingRules", "matchingRules"},
        {"v3", "ATTRIBUTETYPES", "attributeTypes"},
        {"v3", "objectclasses", "objectClasses"},
        {"xan", "attributetypes", "XANattributeTypes"},
        {"XAN-default", "attributetypes", "XANattributeTypes"},
        {"inherited", "attributetypes", "attributeTypes"},
    };
    for (const auto& [form, kind, keyword] : cases) {
        const tool_run run = schema.run("print", {"--form", form, "--kind", kind});
        EXPECT_NE(run.out, "") << run.err;
        EXPECT_EQ(run.out, section(schema.run("print", {"--form", form}).out, keyword)) << form << kind;
    }
}

TEST(SchemaPrint, TheFormsOfAnAttributeTypeCompleteEachOther)
{
    const schema_copy schema;
    schema.write_schema("V3.additions", "attributeTypes { ( 1.2.3.1 NAME 'under-scored' SUP name ) }");
    const auto lines = [&schema](const char* form) {
        return lines_of(schema.run("print", {"--form", form, "--kind", "attributetypes"}).out);
    };
    const std::vector<std::string> standard = lines("v3");
    const auto at = std::find(standard.begin(), standard.end(), "( 1.2.3.1 NAME 'under-scored' SUP name )");
    const auto line_of = [&](const char* form) {
        EXPECT_EQ(lines(form).size(), standard.size());
        return lines(form).at(static_cast<std::size_t>(at - standard.begin()));
    };
    EXPECT_EQ(line_of("inherited"),
              "( EQUALITY caseIgnoreMatch SUBSTR caseIgnoreSubstringsMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 "
              "LENGTH 256 )");
    EXPECT_EQ(line_of("xan-default"),
              "( 1.2.3.1 DBNAME ( 'under_scored' 'UNDER_SCORED' ) ACCESS-CLASS NORMAL LENGTH 256 )");
    EXPECT_THAT(schema.run("print", {"--form", "xan"}).out, Not(HasSubstr("1.2.3.1 ")));
}

// Standard definitions and filled-in extended ones are two files of one schema.
TEST(SchemaPrint, ExtendedDefinitionsLoadBesideTheStandardOnes)
{
    const schema_copy schema;
    const std::string extended = schema.run("print", {"--form", "xan-default"}).out;
    const single_file_schema both(schema.run("print", {"--form", "v3"}).out + extended);
    const tool_run run = run_tool({"schema", "print", "--form", "xan-default", "--schema", both.folder()});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_TRUE(run.out == extended) << "the extended definitions changed";
}

TEST(SchemaPrint, JsonHoldsTheSameTexts)
{
    const schema_copy schema;
    schema.write_schema("V3.additions", odd_definitions);
    const auto parsed = nlohmann::json::parse(schema.run("print", {"--json"}).out);
    std::string texts;
    for (const auto& definition : parsed["definitions"]) {
        texts += bytes_of(definition["text"]) + "\n";
    }
    std::string expected;
    for (const char* keyword :
         {"ldapSyntaxes", "matchingRules", "attributeTypes", "XANattributeTypes", "objectClasses"}) {
        expected += section(schema.run("print").out, keyword);
    }
    ASSERT_NE(expected.find("\xff\xfe"), std::string::npos);
    EXPECT_EQ(texts, expected);
}
