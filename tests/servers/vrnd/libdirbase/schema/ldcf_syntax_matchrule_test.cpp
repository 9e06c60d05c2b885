// Syntaxes and matching rules, and with them the shape that all kinds of definition share.
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using schema_test::parsed;
using schema_test::read_all;
using schema_test::refused;

TEST(LdcfSyntax, DefinitionsReadAndPrint)
{
    const std::string expected = "expected one of the following: 'DESC' ')'" NOT_FOUND;
    const std::pair<const char*, std::string> cases[] = {
        {"(1.2.3)", "1.2.3:( 1.2.3 );"},
        {"( 'name' desc 'A b' )", "name:( name DESC 'A b' );"},
        {"( 2 DESC 'a' )\n( 1 )", "1:( 1 );2:( 2 DESC 'a' );"},
        {"1.2", "exc_invalid_token_t 1 @1: expected '('" NOT_FOUND "'1.2'"},
        {"( 1 NAME 'a' )", "exc_invalid_grammar_t 2 @1: " + expected + "'NAME 'a' )'"},
        {"( 1 'DESC' )", "exc_invalid_token_t 2 @1: " + expected + "''DESC' )'"},
        {"( 1 DESC a )", "exc_invalid_token_t 7 @1: expected qdstring" NOT_FOUND "'a )'"},
        {"( 1 DESC 'a' DESC 'b' )", "exc_invalid_token_t 1 @1: expected ')'" NOT_FOUND "'DESC 'b' )'"},
        {"( ab )\n( aB )", "ab:( ab );exc_invalid_grammar_t 19 @2: duplicate definition of syntax 'aB'"},
    };
    for (const auto& [text, result] : cases) {
        EXPECT_EQ(read_all<ldcf_syntax>(text), result) << text;
    }
}

TEST(LdcfMatchrule, DefinitionsReadAndPrint)
{
    const std::string expected = "expected one of the following: 'NAME' 'DESC' 'OBSOLETE' 'SYNTAX' ')'" NOT_FOUND;
    const std::pair<const char*, std::string> cases[] = {
        {"( 1 SYNTAX 5 )", "1:( 1 SYNTAX 5 );"},
        {"( 1 syntax '5.1' obsolete DESC 'd' NAME 'a' )", "1:( 1 NAME 'a' DESC 'd' OBSOLETE SYNTAX 5.1 );"
                                                          "a:( 1 NAME 'a' DESC 'd' OBSOLETE SYNTAX 5.1 );"},
        {"( 1 NAME ('b' 'a') NAME 'c' SYNTAX 5 DESC 'x' SYNTAX 6 DESC 'y' )",
         "1:( 1 NAME 'c' DESC 'y' SYNTAX 6 );c:( 1 NAME 'c' DESC 'y' SYNTAX 6 );"},
        {"( 1 NAME 'a' )", "exc_invalid_grammar_t 23 @1: matching rule 'a' must have a syntax."},
        {"( 1 )", "exc_invalid_grammar_t 23 @1: matching rule '' must have a syntax."},
        {"( 1 SUP a )", "exc_invalid_grammar_t 2 @1: " + expected + "'SUP a )'"},
        {"( 1 SYNTAX 5 $ )", "exc_invalid_token_t 2 @1: " + expected + "'$ )'"},
        {"( 1 SYNTAX 5 ) ( 1 SYNTAX 6 )",
         "1:( 1 SYNTAX 5 );exc_invalid_grammar_t 19 @1: duplicate definition of matching rule '1'"},
        {"( 1 NAME 'a' SYNTAX 5 ) ( 2 NAME ( 'x' 'A' ) SYNTAX 5 )",
         "1:( 1 NAME 'a' SYNTAX 5 );a:( 1 NAME 'a' SYNTAX 5 );"
         "exc_invalid_grammar_t 18 @1: matching rule 'A' has already been defined"},
    };
    for (const auto& [text, result] : cases) {
        EXPECT_EQ(read_all<ldcf_matchrule>(text), result) << text;
    }
}

TEST(LdcfMatchrule, CompletionFindsTheSyntaxAndIncompletionDropsIt)
{
    ldcf_map_name_to<ldcf_syntax> syntaxes;
    const ldcf_matchrule rule = parsed<ldcf_matchrule>("( 1 NAME 'a' SYNTAX 5 )");
    std::vector<std::string> arguments;
    EXPECT_EQ(refused([&] { rule->complete(syntaxes); }, &arguments),
              "exc_invalid_input_t -25: syntax '5' not found when processing matching rule 'a'");
    EXPECT_EQ(arguments, (std::vector<std::string>{"syntax", "'5'", "matching rule", "'a'"}));
    syntaxes["5"] = parsed<ldcf_syntax>("( 5 )");
    rule->complete(syntaxes);
    EXPECT_TRUE(rule->syntax() == syntaxes["5"]);

    // A clone has a body of its own with the same handles; retarget moves it to another schema's syntax.
    ldcf_matchrule copy = rule.clone();
    EXPECT_EQ(copy->value(), 1);
    EXPECT_TRUE(copy->syntax() == rule->syntax() && !(copy == rule));
    const ldcf_syntax other = syntaxes["5"].clone();
    copy.retarget({{syntaxes["5"], other}});
    EXPECT_TRUE(copy->syntax() == other && rule->syntax() == syntaxes["5"]);
    copy.retarget({});
    rule->incomplete();
    EXPECT_FALSE(copy->syntax() || rule->syntax());
}

TEST(LdcfMatchrule, ReplaceChangesTheBodyForAllHandlesAndKeepsItsFiles)
{
    ldcf_matchrule rule = parsed<ldcf_matchrule>("( 1 NAME 'a' SYNTAX 5 )", "old");
    rule.xan_file("old xan");
    const ldcf_matchrule second = rule;
    EXPECT_STREQ(rule.v3_string(), "( 1 NAME 'a' SYNTAX 5 )");
    ldcf_matchrule changed = parsed<ldcf_matchrule>("( 1 NAME 'b' OBSOLETE SYNTAX 6 )", "new");
    rule.replace(changed);
    EXPECT_STREQ(second.v3_string(), "( 1 NAME 'b' OBSOLETE SYNTAX 6 )");
    EXPECT_STREQ((second->v3_file() + second->xan_file()), "oldold xan");
    EXPECT_STREQ((second.xan_string() + second.v3_string_inherited()), "( 1 )( )");
}

TEST(LdcfSyntaxAndMatchrule, EqualityComparesWhatTheDefinitionsSay)
{
    EXPECT_TRUE(parsed<ldcf_syntax>("( aB DESC 'x' )").v3_syntax_equal(parsed<ldcf_syntax>("( Ab )")));
    EXPECT_FALSE(parsed<ldcf_syntax>("( 1 DESC 'x' )").v3_syntax_equal(parsed<ldcf_syntax>("( 2 DESC 'x' )")));
    const ldcf_matchrule rule = parsed<ldcf_matchrule>("( 1 NAME ( 'a' 'b' ) DESC 'x' SYNTAX 5 )");
    const std::pair<const char*, bool> others[] = {
        {"( 1 NAME ( 'A' 'B' ) DESC 'y' SYNTAX '5' )", true}, {"( 2 NAME ( 'a' 'b' ) SYNTAX 5 )", false},
        {"( 1 NAME ( 'b' 'a' ) SYNTAX 5 )", false},           {"( 1 NAME 'a' SYNTAX 5 )", false},
        {"( 1 NAME ( 'a' 'c' ) SYNTAX 5 )", false},           {"( 1 NAME ( 'a' 'b' ) SYNTAX 6 )", false},
        {"( 1 NAME ( 'a' 'b' ) OBSOLETE SYNTAX 5 )", false},
    };
    for (const auto& [text, equal] : others) {
        EXPECT_EQ(rule.v3_syntax_equal(parsed<ldcf_matchrule>(text)), equal) << text;
        EXPECT_EQ(rule.xan_syntax_equal(parsed<ldcf_matchrule>(text)), text[2] == '1') << text;
    }
}
