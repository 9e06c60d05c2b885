// Object classes: parsing, text forms, the flat tree, cycles, and comparison.
#include <functional>
#include <map>

#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using schema_test::names_of;
using schema_test::parsed;
using schema_test::refused;

namespace {

// A schema of classes over attribute types that are named a to h (with the aliases aa to hh, and the oids 1 to 8).
void load(ldcf_schema& schema, const std::string& classes)
{
    std::string text = "ldapSyntaxes:( 5 ) attributeTypes {";
    for (int i = 0; i < 8; ++i) {
        const std::string name(1, static_cast<char>('a' + i));
        text += "( " + std::to_string(i + 1) + " NAME ( '" + name + "' '" + name + name + "' ) SYNTAX 5 )";
    }
    schema.parse_str((text + "} objectClasses { ( 0 NAME 'top' ABSTRACT ) " + classes + "}").c_str(), "test");
}

#define KEYWORDS "'NAME' 'DESC' 'OBSOLETE' 'SUP'  'ABSTRACT' 'STRUCTURAL' 'AUXILIARY' 'MUST' 'MAY'"
#define OF "expected one of the following: "
#define KINDS                                                                                   \
    "exc_invalid_input_t 0: 1 has too many object class types.The type can be only one of the " \
    "[ABSTRACT|STRUCTURAL|AUXILIARY]"
#define CYCLE "exc_invalid_input_t -36: There is a cycle in the supertype specification: "
#define MISSING " not found when processing object class "

}  // namespace

TEST(LdcfObjclass, DefinitionsReadAndPrint)
{
    const std::pair<const char*, const char*> cases[] = {
        {"( 1.2 )", "1.2:( 1.2 SUP top STRUCTURAL );"},
        {"(1.2 ABSTRACT)", "1.2:( 1.2 ABSTRACT );"},
        {"( 1.2 SUP ( ) auxiliary )", "1.2:( 1.2 AUXILIARY );"},
        {"( 1 MAY ( z $ Y $ z ) MUST x AUXILIARY SUP ( b $ 1.2 ) OBSOLETE DESC 'd e' NAME ( 'n' 'N' ) )",
         "1:( 1 NAME 'n' DESC 'd e' OBSOLETE SUP ( 1.2 $ b ) AUXILIARY MUST x MAY ( Y $ z ) );"
         "n:( 1 NAME 'n' DESC 'd e' OBSOLETE SUP ( 1.2 $ b ) AUXILIARY MUST x MAY ( Y $ z ) );"},
        {"( 1 NAME 'a' NAME 'b' DESC 'c' DESC 'd' SUP e SUP f MUST g MUST h MAY i MAY ( ) )",
         "1:( 1 NAME 'b' DESC 'd' SUP f STRUCTURAL MUST h );b:( 1 NAME 'b' DESC 'd' SUP f STRUCTURAL MUST h );"},
        {"1", "exc_invalid_token_t 1 @1: expected '('" NOT_FOUND "'1'"},
        {"( 1\n$ )", "exc_invalid_token_t 2 @2: " OF KEYWORDS " ')'" NOT_FOUND "'$ )'"},
        {"( 1 SYNTAX 5 )", "exc_invalid_grammar_t 2 @1: " OF KEYWORDS NOT_FOUND "'SYNTAX 5 )'"},
        {"( 1 ABSTRACT ABSTRACT )", KINDS},
        {"( 1 AUXILIARY DESC 'x' STRUCTURAL )", KINDS},
        {"( 1 ) ( 1 )",
         "1:( 1 SUP top STRUCTURAL );exc_invalid_grammar_t 19 @1: duplicate definition of object class '1'"},
        {"( 1 NAME 'a' ABSTRACT ) ( 2 NAME ( 'x' 'A' ) )",
         "1:( 1 NAME 'a' ABSTRACT );a:( 1 NAME 'a' ABSTRACT );"
         "exc_invalid_grammar_t 19 @1: duplicate definition of object class 'A'"},
    };
    for (const auto& [text, result] : cases) {
        EXPECT_EQ(schema_test::read_all<ldcf_objclass>(text), result) << text;
    }
    const ldcf_objclass unnamed = parsed<ldcf_objclass>("( 1.2 )", "file");
    EXPECT_STREQ((unnamed.name() + unnamed->v3_file() + unnamed.xan_string()), "1.2file( 1.2 )");
}

TEST(LdcfObjclass, CompletionFlattensTheTree)
{
    ldcf_schema schema;
    load(schema, "( 11 NAME 'root' MUST a MAY ( b $ c $ 4 ) ) ( 12 NAME 'left' SUP root MUST ( b $ e ) )"
                 "( 13 NAME 'right' SUP 11 AUXILIARY MUST f MAY ( e $ gg ) )"
                 "( 14 NAME 'both' SUP ( left $ RIGHT ) MUST A MAY ( a $ h ) ) ( 15 NAME 'lone' AUXILIARY )");
    schema.complete_nocheck();
    // Name, superclasses, subclasses, MUST, MAY, and the inherited form.
    const char* const cases[][6] = {
        {"top", "", "both left right root", "", "", "( )"},
        {"root", "top", "both left right", "a", "b c d", "( MAY d )"},  // its own text for d is the oid
        {"left", "root top", "both", "a b e", "c d", "( MUST a MAY ( c $ d ) )"},
        {"right", "root top", "both", "a f", "b c d e g", "( MUST a MAY ( b $ c $ d $ g ) )"},
        {"both", "left right root top", "", "a b e f", "c d g h", "( MUST ( b $ e $ f ) MAY ( c $ d $ g ) )"},
        {"lone", "", "", "", "", "( )"},
    };
    for (const auto& c : cases) {
        const ldcf_objclass objclass = schema.object_classes[c[0]];
        EXPECT_EQ(names_of(objclass->superclasses()), c[1]) << c[0];
        EXPECT_EQ(names_of(objclass->subclasses()), c[2]) << c[0];
        EXPECT_EQ(names_of(objclass->complete_must()), c[3]) << c[0];
        EXPECT_EQ(names_of(objclass->complete_may()), c[4]) << c[0];
        EXPECT_STREQ(objclass.v3_string_inherited(), c[5]);
        EXPECT_EQ(objclass->v3_inherited(), std::string(c[5]) != "( )");
    }
    const std::string before = schema_test::described(schema);
    schema.incomplete();
    const ldcf_objclass both = schema.object_classes["both"];
    EXPECT_TRUE(both->state() == ldcf_objclass_state::parsed && both->superclasses().empty() &&
                both->subclasses().empty() && both->complete_must().empty() && both->complete_may().empty());
    schema.complete_nocheck();
    EXPECT_EQ(schema_test::described(schema), before);
}

TEST(LdcfObjclass, FaultsNameTheClassAndWhatIsMissing)
{
    const std::pair<const char*, const char*> cases[] = {
        {"( 11 NAME 'x' MAY m MUST n SUP s )", "exc_invalid_input_t -25: SUP object class 's'" MISSING "'x'"},
        {"( 11 NAME 'x' MUST ( a $ Nil ) MAY m )", "exc_invalid_input_t -25: MUST attribute type 'Nil'" MISSING "'x'"},
        {"( 1.1 MAY ( a $ 9.9 ) )", "exc_invalid_input_t -25: MAY attribute type '9.9'" MISSING "'1.1'"},
        // A class's own fault comes ahead of one in its ancestors.
        {"( 11 NAME 'x' SUP y MAY nil ) ( 12 NAME 'y' SUP y )",
         "exc_invalid_input_t -25: MAY attribute type 'nil'" MISSING "'x'"},
        {"( 11 NAME 'x' SUP x )", CYCLE "'x <= x'"},
        {"( 1.1 SUP 1.1 )", CYCLE "'1.1 <= 1.1'"},
        {"( 11 NAME 'x' SUP y ) ( 12 NAME 'y' SUP z ) ( 13 NAME 'z' SUP X )", CYCLE "'x <= z <= y <= x'"},
        {"( 10 NAME 'w' SUP y ) ( 12 NAME 'y' SUP z ) ( 13 NAME 'z' SUP y )", CYCLE "'y <= z <= y'"},
    };
    for (const auto& [text, fault] : cases) {
        ldcf_schema schema;
        load(schema, text);
        EXPECT_EQ(refused([&] { schema.complete_nocheck(); }), fault);
        schema.incomplete();
        EXPECT_EQ(refused([&] { schema.complete_nocheck(); }), fault);
    }
}

TEST(LdcfObjclass, AClassHasAThousandAncestorsAndNoMore)
{
    std::string classes = "( 1000 ABSTRACT MUST a )";
    for (int i = 1001; i <= 2001; ++i) {
        classes += "( " + std::to_string(i) + " SUP " + std::to_string(i - 1) + " ABSTRACT )";
    }
    ldcf_schema schema;
    load(schema, classes);
    schema.object_classes["2000"]->complete(schema.object_classes, schema.attribute_types);
    EXPECT_EQ(schema.object_classes["2000"]->superclasses().size(), 1000u);
    EXPECT_EQ(names_of(schema.object_classes["2000"]->complete_must()), "a");
    EXPECT_EQ(refused([&] { schema.complete_nocheck(); }),
              "exc_invalid_input_t 0: object class '2001' has more than 1000 superclasses");
}

TEST(LdcfObjclass, TheShippedTreeIsFlatAsAWalkOverItsTextsSays)
{
    ldcf_schema schema, texts;  // the second is never completed
    schema_test::load_shipped(schema);
    schema_test::load_shipped(texts);
    schema.complete();
    struct flat {
        csgl_set<ldcf_objclass> superclasses, subclasses;
        csgl_set<ldcf_attrtype> must, may;
    };
    const std::function<void(const ldcf_objclass&, flat&)> walk = [&](const ldcf_objclass& objclass, flat& sum) {
        for (const csgl_string& text : objclass->must()) {
            sum.must.insert(texts.attribute_types[text]);
        }
        for (const csgl_string& text : objclass->may()) {
            sum.may.insert(texts.attribute_types[text]);
        }
        for (const csgl_string& text : objclass->sup()) {
            sum.superclasses.insert(texts.object_classes[text]);
            walk(texts.object_classes[text], sum);
        }
    };
    std::map<ldcf_objclass, flat> sums;
    for (const auto& entry : texts.object_classes) {
        flat& sum = sums[entry.second];
        walk(entry.second, sum);
        for (const ldcf_attrtype& required : sum.must) {
            sum.may.erase(required);
        }
        for (const ldcf_objclass& superclass : sum.superclasses) {
            sums[superclass].subclasses.insert(entry.second);
        }
    }
    std::size_t deep = 0;
    for (const auto& [key, objclass] : schema.object_classes) {
        const flat& sum = sums[texts.object_classes[key]];
        EXPECT_EQ(names_of(objclass->superclasses()), names_of(sum.superclasses)) << key;
        EXPECT_EQ(names_of(objclass->subclasses()), names_of(sum.subclasses)) << key;
        EXPECT_EQ(names_of(objclass->complete_must()), names_of(sum.must)) << key;
        EXPECT_EQ(names_of(objclass->complete_may()), names_of(sum.may)) << key;
        deep += sum.superclasses.size() > 1 ? 1u : 0u;
    }
    EXPECT_GT(deep, 5u);
}

TEST(LdcfObjclass, EqualityComparesKindNamesAndAttributesOnly)
{
    const auto equal = [](const std::string& other) {
        const std::string parents = "( 21 NAME 'a1' ABSTRACT MUST a ) ( 22 NAME 'a2' ABSTRACT )";
        ldcf_schema one, two;
        load(one, parents + "( 11 NAME ( 'x' 'y' ) DESC 'd' SUP a1 MUST ( a $ b ) MAY c )");
        load(two, parents + "( 11 " + other + " )");
        one.complete_nocheck();
        two.complete_nocheck();
        return one.object_classes["11"].v3_syntax_equal(two.object_classes["11"]);
    };
    EXPECT_TRUE(equal("NAME ( 'X' 'Y' ) DESC 'other' SUP a2 MUST ( a $ b ) MAY c"));
    EXPECT_TRUE(equal("NAME ( 'x' 'y' ) SUP a1 MUST b MAY cc"));  // what it inherits counts as its own
    for (const char* items :
         {"OBSOLETE", "AUXILIARY", "NAME ( 'y' 'x' )", "NAME 'x'", "MUST ( b $ d )", "MAY ( c $ d )"}) {
        EXPECT_FALSE(equal("NAME ( 'x' 'y' ) SUP a1 MUST b MAY c " + std::string(items))) << items;
    }
}
