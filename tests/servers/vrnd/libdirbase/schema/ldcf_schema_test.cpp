// The schema container: sections, files, the shipped schema, copies, single definitions in and out, the way to disk.
#include <set>

#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"
#include "tests/support/temp_dir.h"

using schema_test::content_of;
using schema_test::described;
using schema_test::load_small;
using schema_test::names_of;
using schema_test::parsed;
using schema_test::refused;
using test_support::temp_dir;

namespace {

using indicator = ldcf_schema::modified_indicator;

// Inserts, erases or replaces a definition, as "insert syntax ( 5 )"; the kinds are syntax, rule, type and class.
void change(ldcf_schema& schema, const std::string& what)
{
    const std::string how = what.substr(0, what.find(' '));
    const std::string text = what.substr(what.find('('));
    const auto act = [&](auto definition) {
        how == "insert"  ? schema.insert(definition)
        : how == "erase" ? schema.erase(definition)
                         : schema.replace(definition);
    };
    switch (what[how.size() + 1]) {
    case 's': act(parsed<ldcf_syntax>(text)); break;
    case 'r': act(parsed<ldcf_matchrule>(text)); break;
    case 't': act(parsed<ldcf_attrtype>(text)); break;
    default: act(parsed<ldcf_objclass>(text)); break;
    }
}

class Schema : public testing::Test {
protected:
    const schema_test::relational_store store_;
    ldcf_schema schema_;
};
using SchemaChange = Schema;
using ShippedSchema = Schema;

#define SECTIONS \
    "expected 'ldapSyntaxes' 'matchingRules' 'attributeTypes' 'XANattributeTypes' 'objectClasses'" NOT_FOUND

}  // namespace

TEST_F(Schema, SectionsComeInAllTheirForms)
{
    // The counts of syntaxes, rules, types and classes, and the fault.
    const std::pair<const char*, const char*> cases[] = {
        {" \n", "0000"},
        {"LDAPSYNTAXES = ( 5 )MatchingRules:(1 SYNTAX 5)", "1100"},
        {"# one\n # two\nattributetypes{( 1 )( 2 ) \n } # three\n xanAttributeTypes:( 1 ) objectClasses { }", "0020"},
        {"ldapSyntaxes { ( 5 ) ( 5.1 ) } ldapSyntaxes:( 6 )", "3000"},
        {"ldapSyntaxes { ( 5 ) # c\n ( 6 ) }", "1000exc_invalid_token_t 2 @1: expected '('  '}'" NOT_FOUND "'# '"},
        {"ldapSyntaxes { ( 5 ) 6 }", "1000exc_invalid_token_t 2 @1: expected '('  '}'" NOT_FOUND "'6 }'"},
        {"ldapSyntaxes ( 5 )", "0000exc_invalid_token_t 2 @1: expected ':' '=' '{'" NOT_FOUND "'( 5 )'"},
        {"ldapSyntaxes:( 5 )( 6 )", "1000exc_invalid_grammar_t 2 @1: " SECTIONS "'( 6 )'"},
        {"\nnameForms { }", "0000exc_invalid_grammar_t 2 @2: " SECTIONS "'nameForms { }'"},
        {"ldapSyntaxes:( 5 )\n# the end", "1000exc_unexpected_end_of_input_t 13 @2: unexpected end of input"},
    };
    for (const auto& [text, result] : cases) {
        ldcf_schema schema;
        const std::string fault = refused([&] { schema.parse_str(text, "test"); });
        std::string counts;
        for (const std::size_t count : {schema.syntaxes.size(), schema.matching_rules.size(),
                                        schema.attribute_types.size(), schema.object_classes.size()}) {
            counts += std::to_string(count);
        }
        EXPECT_EQ(counts + fault, result) << text;
    }
}

TEST_F(Schema, AFileThatIsReadBecomesTheCurrentOne)
{
    const temp_dir dir;
    const std::string first = dir.write("First", "ldapSyntaxes:( 5 )");
    const std::string second = dir.write("first", " \n");
    const std::string faulty = dir.write("faulty", "ldapSyntaxes { ( 6 ) ( 5 ) }");
    schema_.parse(first.c_str());
    EXPECT_STREQ(schema_.current_file, first.c_str());
    EXPECT_STREQ(schema_.syntaxes["5"]->v3_file(), first.c_str());
    schema_.parse(second.c_str());
    EXPECT_EQ(refused([&] { schema_.parse(faulty.c_str()); }),
              "exc_invalid_grammar_t 19 @1: duplicate definition of syntax '5'");
    EXPECT_EQ(refused([&] { schema_.parse(dir.path("none").c_str()); }),
              "exc_does_not_exist_t 0: does_not_exist (ENOENT)");
    EXPECT_STREQ(schema_.current_file, second.c_str());
    EXPECT_EQ(schema_.files.size(), 2u);  // exact names
    EXPECT_EQ(schema_.files[second.c_str()], indicator::flushed);
    EXPECT_EQ(schema_.files["new"], indicator::modified);
    EXPECT_EQ(schema_.syntaxes.count("6"), 1u);  // read ahead of the fault
}

TEST_F(Schema, AFileThatCannotBeReadWholeIsRefused)
{
    const test_support::temp_dir dir;
    const std::string huge = dir.write("huge", "ldapSyntaxes {} #");
    std::filesystem::resize_file(huge, (1ull << 32) + 16);  // a hole; the low 32 bits of its size end ahead of the "#"
    for (const std::string& file : {
             std::string("/sys/devices/system/cpu/online"),  // claims a page and gives a line
             std::string("/proc/self/status"),               // claims nothing and gives lines
             dir.write("zero", std::string("ldapSyntaxes {}\0matchingRules {", 31)),
             huge,
         }) {
        if (std::filesystem::exists(file)) {
            EXPECT_EQ(refused([&] { schema_.parse(file.c_str()); }), "exc_end_of_input_t 0: exc_end_of_input") << file;
        }
    }
    EXPECT_TRUE(schema_.files.empty());
    EXPECT_TRUE(schema_.syntaxes.empty());
}

TEST_F(ShippedSchema, LoadsWithoutALineInTheLog)
{
    const test_support::message_catcher log;
    schema_test::load_shipped(schema_);
    schema_.complete();
    schema_.complete_db_names();
    for (const test_support::caught_message& message : log.messages()) {
        ADD_FAILURE() << message.line;
    }
    const auto definitions = [](const auto& map) {
        std::set<const void*> bodies;
        for (const auto& entry : map) {
            bodies.insert(entry.second.get());
        }
        return bodies.size();
    };
    EXPECT_GE(definitions(schema_.syntaxes), 40u);
    EXPECT_GE(definitions(schema_.matching_rules), 30u);
    EXPECT_GE(definitions(schema_.attribute_types), 250u);
    EXPECT_GE(definitions(schema_.object_classes), 80u);
}

TEST_F(ShippedSchema, EveryFileWrittenAndReadAgainSaysTheSame)
{
    const temp_dir dir;
    std::vector<std::string> files;
    for (const std::string& file : schema_test::shipped_files()) {
        files.push_back(dir.path(std::filesystem::path(file).filename().string()));
        std::filesystem::copy_file(file, files.back());
    }
    // Reads all files, and writes them all again.
    const auto pass = [&](std::string& written) {
        ldcf_schema schema;
        for (const std::string& file : files) {
            schema.parse(file.c_str());
        }
        schema.complete();
        schema.complete_db_names();
        for (const std::string& file : files) {
            schema.flush(file.c_str());
            std::filesystem::rename(file + ".tmp", file);
        }
        written = content_of(dir.path());
        return described(schema);
    };
    std::string written, again;
    const std::string first = pass(written);
    EXPECT_EQ(pass(again), first);
    EXPECT_EQ(again, written);
}

TEST_F(ShippedSchema, TheOrderOfStandardAndExtendedDefinitionsDoesNotMatter)
{
    schema_test::load_shipped(schema_);
    std::string standard = "attributeTypes {\n", extended = "XANattributeTypes {\n";
    for (const auto& [key, type] : schema_.attribute_types) {
        if (key == type.oid()) {
            standard += std::string(type.v3_string()) + "\n";
            extended += std::string(type.xan_string()) + "\n";
        }
    }
    EXPECT_GT(std::count(extended.begin(), extended.end(), ')'), 250);
    const auto load = [&](const std::string& types) {
        ldcf_schema schema;
        schema.parse_str(schema_test::required_text().c_str(), "required");
        schema.parse_str(types.c_str(), "types");
        schema.complete();
        schema.complete_db_names();
        return described(schema);
    };
    EXPECT_EQ(load(standard + "}" + extended + "}"), load(extended + "}" + standard + "}"));
}

TEST_F(Schema, ACopySaysTheSameAndStandsApart)
{
    load_small(schema_);
    schema_.files["other"] = indicator::modified;
    const std::string before = described(schema_);
    ldcf_schema copy;
    EXPECT_EQ(&copy.copy(schema_), &copy);
    EXPECT_EQ(described(copy), before);
    const ldcf_attrtype cn = copy.attribute_types["cn"];
    const ldcf_objclass employee = copy.object_classes["employee"];
    EXPECT_FALSE(cn == schema_.attribute_types["cn"]);
    EXPECT_TRUE(cn == copy.attribute_types["commonName"] && cn == copy.attribute_types["9.3"]);
    EXPECT_TRUE(cn->supertype() == copy.attribute_types["name"] && cn->syntax() == copy.syntaxes[ARC "15"]);
    EXPECT_EQ(copy.attribute_types["name"]->subtypes().count(cn), 1u);
    EXPECT_TRUE(copy.matching_rules["caseIgnoreMatch"]->syntax() == copy.syntaxes[ARC "15"]);
    EXPECT_EQ(employee->superclasses().count(copy.object_classes["person"]), 1u);
    EXPECT_EQ(copy.object_classes["top"]->subclasses().count(employee) + employee->complete_must().count(cn), 2u);
    copy.clear();
    EXPECT_EQ(described(copy), schema_test::nothing);
    EXPECT_EQ(described(schema_), before);
}

TEST_F(SchemaChange, AnInsertedDefinitionIsHomedEnteredAndLinkedAndCanBeErased)
{
    load_small(schema_);
    const std::string before = described(schema_);
    change(schema_, "insert syntax ( 5.5 DESC 'x' )");
    EXPECT_EQ(schema_.files["home"], indicator::modified);
    change(schema_, "insert rule ( 5.6 NAME ( 'r' 's' ) SYNTAX 5.5 )");
    change(schema_, "insert type ( 9.9 NAME ( 'new' 'newer' ) SUP name EQUALITY r SYNTAX 5.5 )");
    change(schema_, "insert class ( 8.9 NAME 'sub' SUP employee MAY new )");
    change(schema_, "insert type ( both NAME ( 'BOTH' 'b' ) SUP name )");  // an oid that is a name too takes one key
    change(schema_, "insert class ( kind NAME 'Kind' )");
    {
        const ldcf_attrtype type = schema_.attribute_types["newer"];
        EXPECT_STREQ((type->v3_file() + type->xan_file() + schema_.syntaxes["5.5"]->xan_file()), "homehome");
        EXPECT_EQ(type->state(), ldcf_attrtype_state::db_names_complete);
        EXPECT_STREQ(type->table(), "NEW");
        EXPECT_TRUE(type->equality_rule() == schema_.matching_rules["s"]);
        EXPECT_EQ(names_of(schema_.attribute_types["name"]->subtypes()), "BOTH cn new sn spare");
        EXPECT_EQ(names_of(schema_.object_classes["top"]->subclasses()), "employee Kind person sub");
        EXPECT_EQ(names_of(schema_.object_classes["sub"]->complete_must()), "cn objectClass sn");
    }
    for (const char* what : {"class ( kind )", "type ( both )", "class ( 8.9 NAME 'SUB' )", "type ( 9.9 NAME 'new' )",
                             "rule ( 5.6 SYNTAX 5 )", "syntax ( 5.5 )"}) {
        schema_.files["home"] = indicator::flushed;
        change(schema_, "erase " + std::string(what));
        EXPECT_EQ(schema_.files["home"], indicator::modified) << what;
    }
    schema_.files["home"] = indicator::flushed;
    EXPECT_EQ(described(schema_), before);

    // One with an extended definition has that at home there too, and it counts as modified when the type goes.
    ldcf_schema request;
    request.parse_str("attributeTypes:( 9.8 NAME 'ext' SUP name ) XANattributeTypes:( ext DBNAME 'e' )", "request");
    schema_.insert(request.attribute_types["ext"]);
    request.clear();
    EXPECT_STREQ(schema_.attribute_types["ext"]->xan_file(), "home");
    schema_.attribute_types["ext"].xan_file("extensions");
    request.parse_str("attributeTypes:( 9.8 )", "request");
    schema_.incomplete();
    schema_.complete();
    schema_.erase(request.attribute_types["9.8"]);
    EXPECT_EQ(schema_.files.count("extensions"), 1u);
}

TEST_F(SchemaChange, RefusalsOfSingleDefinitionsNameTheReason)
{
    const std::string rule = "rule ( 2.5.13.2 NAME 'caseIgnoreMatch' ";
    const std::pair<std::string, const char*> cases[] = {
        {"insert syntax ( " ARC "15 )", "exc_ldap_rc_t(20) -31: syntax '" ARC "15' already exists"},
        {"insert rule ( 7 NAME ( 'x' 'caseignoreMATCH' ) SYNTAX " ARC "15 )",
         "exc_ldap_rc_t(20) -31: matching rule 'caseignoreMATCH' already exists"},
        {"insert type ( 9.1 )", "exc_ldap_rc_t(20) -31: attribute type '9.1' already exists"},
        {"insert type ( 7 NAME 'CN' SUP name )", "exc_ldap_rc_t(20) -31: attribute type 'CN' already exists"},
        {"insert class ( 7 NAME 'Worker' )", "exc_ldap_rc_t(20) -31: object class 'Worker' already exists"},
        {"erase syntax ( 7 )", "exc_ldap_rc_t(16) -26: syntax '7' does not exist"},
        {"erase rule ( 7 SYNTAX 5 )", "exc_ldap_rc_t(16) -26: matching rule '7' does not exist"},
        {"erase type ( 9.5 NAME ( 'spare' 'x' ) )", "exc_ldap_rc_t(16) -26: attribute type 'x' does not exist"},
        {"erase class ( 7 )", "exc_ldap_rc_t(16) -26: object class '7' does not exist"},
        {"erase type ( 9.5 NAME 'sn' )",
         "exc_invalid_input_t -29: attribute type: OID '9.5' and 'sn' do not refer to the same attribute type"},
        {"erase rule ( 2.5.13.2 NAME 'integerMatch' SYNTAX 5 )",
         "exc_invalid_input_t -29: matching rule: OID '2.5.13.2' and 'integerMatch' do not refer to the same matching "
         "rule"},
        {"erase type ( 9.2 )",  // three subtypes and two lists of classes more than expected
         "exc_invalid_state_t -32: attribute type '9.2' can not be deleted; its refcount is 8.  It should be 3"},
        {"erase type ( 9.3 )",
         "exc_invalid_state_t -32: attribute type '9.3' can not be deleted; its refcount is 7.  It should be 5"},
        {"erase class ( 8.2 )",
         "exc_invalid_state_t -32: object class '8.2' can not be deleted; its refcount is 5.  It should be 4"},
        {"erase rule ( 2.5.13.0 SYNTAX 5 )",
         "exc_invalid_state_t -32: matching rule '2.5.13.0' can not be deleted; its refcount is 4.  It should be 3"},
        {"replace syntax ( 7 )", "exc_ldap_rc_t(16) -27: syntax '7' does not exist"},
        {"replace class ( person NAME 'person' )", "exc_ldap_rc_t(16) -27: object class 'person' does not exist"},
        {"replace type ( 7 NAME 'cn' )", "exc_ldap_rc_t(16) -27: attribute type '7' does not exist"},
        {"replace type ( 9.5 NAME ( 'spare' 'SN' ) SUP name )",
         "exc_invalid_input_t -30: attribute type: OID '9.5' and 'SN' do not refer to the same attribute type"},
        {"replace class ( 8.3 NAME 'person' )",
         "exc_invalid_input_t -30: object class: OID '8.3' and 'person' do not refer to the same object class"},
        {"replace type ( 9.5 NAME 'spare' SUP spare )",
         "exc_invalid_input_t -35: There is a cycle in the supertype specification: 'spare <= spare'"},
        {"replace class ( 8.2 NAME 'person' SUP employee )",
         "exc_invalid_input_t -36: There is a cycle in the supertype specification: 'person <= employee <= person'"},
        {"replace " + rule + "OBSOLETE SYNTAX " ARC "15 )",
         "exc_invalid_state_t -38:  Error matching rule 'caseIgnoreMatch' must be provided as ( 2.5.13.2 NAME "
         "'caseIgnoreMatch' SYNTAX " ARC "15 ) was provided as ( 2.5.13.2 NAME 'caseIgnoreMatch' OBSOLETE SYNTAX " ARC
         "15 )"},
    };
    for (const auto& [what, fault] : cases) {
        ldcf_schema schema;
        load_small(schema);
        EXPECT_EQ(refused([&] { change(schema, what); }), fault) << what;
    }
    load_small(schema_);
    EXPECT_EQ(schema_test::logged_arguments([&] { change(schema_, "erase class ( 8.2 )"); }),
              (std::vector<std::string>{"object class", "'8.2'", "5", "4"}));
}

TEST_F(SchemaChange, AReplacedDefinitionIsTheSameBodyWithTheNewText)
{
    // Each with the change of the small schema's text that it amounts to.
    const std::string cases[][3] = {
        {"replace type ( 9.2 NAME 'name' EQUALITY caseExactMatch SYNTAX " ARC "26 )",
         "NAME 'name' EQUALITY caseIgnoreMatch SUBSTR caseIgnoreSubstringsMatch SYNTAX " ARC "15{64}",
         "NAME 'name' EQUALITY caseExactMatch SYNTAX " ARC "26"},
        {"replace type ( 9.5 NAME ( 'other' 'spare' ) DESC 'd' SUP cn )", "NAME 'spare' SUP name",
         "NAME ( 'other' 'spare' ) DESC 'd' SUP cn"},
        {"replace type ( 9.5 SYNTAX " ARC "27 )", "NAME 'spare' SUP name", "SYNTAX " ARC "27"},
        {"replace class ( 8.2 NAME ( 'person' 'human' ) MAY cn )", "NAME 'person' MUST cn MAY ( sn $ name )",
         "NAME ( 'person' 'human' ) MAY cn"},
        {"replace class ( 8.3 NAME 'staff' ABSTRACT )", "NAME ( 'employee' 'worker' ) SUP person MUST sn",
         "NAME 'staff' ABSTRACT"},
    };
    for (const auto& [what, from, to] : cases) {
        ldcf_schema schema, expected;
        load_small(schema);
        described(schema);  // so that every text form has been asked for
        const ldcf_attrtype spare = schema.attribute_types["9.5"];
        change(schema, what);
        EXPECT_TRUE(spare == schema.attribute_types["9.5"]);
        EXPECT_EQ(schema.files["home"], indicator::modified);
        schema.files["home"] = indicator::flushed;
        std::string text = schema_test::small_text;
        load_small(expected, text.replace(text.find(from), from.size(), to));
        EXPECT_EQ(described(schema), described(expected)) << what;
    }
    // Both home files count as modified, wherever the new text came from.
    load_small(schema_);
    schema_.syntaxes[ARC "15"].xan_file("extensions");
    change(schema_, "replace syntax ( " ARC "15 DESC 'new' )");
    EXPECT_STREQ(schema_.syntaxes[ARC "15"].v3_string(), "( " ARC "15 DESC 'new' )");
    EXPECT_TRUE(schema_.files.count("required") + schema_.files.count("extensions") == 2 &&
                schema_.files["home"] == indicator::flushed);
}

// Walks over a map know a definition by the key that is its oid to the letter.
TEST_F(SchemaChange, AReplacementMayWriteTheOidInAnotherCase)
{
    load_small(schema_);
    const std::string kinds[][3] = {{"syntax", "( Mine-OID DESC 'x' )", "( mine-oid DESC 'y' )"},
                                    {"rule", "( Mine-OID NAME 'r' SYNTAX 5 )", "( mine-oid NAME 'r' SYNTAX 5 )"},
                                    {"type", "( Mine-OID NAME 't' SUP name )", "( mine-oid NAME 't' SUP cn )"},
                                    {"class", "( Mine-OID NAME 'c' SUP top )", "( mine-oid NAME 'c' SUP top MAY cn )"}};
    change(schema_, "insert syntax ( 5 )");
    for (const auto& [kind, before, after] : kinds) {
        change(schema_, "insert " + kind + " " + before);
        change(schema_, "replace " + kind + " " + after);
        EXPECT_NE(described(schema_).find(after.substr(0, 10)), std::string::npos) << kind;
        ldcf_schema copy;
        copy.copy(schema_);
        EXPECT_EQ(described(copy), described(schema_)) << kind;
    }
}

TEST_F(Schema, EveryRequiredDefinitionMustBeThere)
{
    // Gives the schema what it is told to be missing, until nothing is.
    EXPECT_EQ(
        refused([&] { schema_.check(); }),
        "exc_does_not_exist_t -37:  Error syntax '1.3.6.1.4.1.1466.115.121.1.10' was not provided; must be provided as "
        "( 1.3.6.1.4.1.1466.115.121.1.10 DESC 'Certificate Pair' )");
    std::string fault;
    std::size_t syntaxes = 0, rules = 0;
    while (fault = refused([&] { schema_.check(); }), !fault.empty() && syntaxes + rules < 100) {
        const bool is_syntax = fault.find("Error syntax") != fault.npos;
        (is_syntax ? syntaxes : rules) += 1;
        schema_.parse_str(((is_syntax ? "ldapSyntaxes:" : "matchingRules:") + fault.substr(fault.find("( "))).c_str(),
                          "");
    }
    EXPECT_EQ(syntaxes, 43u);
    EXPECT_EQ(rules, 31u);
    EXPECT_STREQ(schema_.matching_rules["1.3.77.0.2.4.405"].v3_string(),
                 "( 1.3.77.0.2.4.405 NAME 'distinguishedNameOrderingMatch' SYNTAX " ARC "12 )");
    EXPECT_STREQ(schema_.syntaxes["1.3.77.0.2.8.1"].v3_string(),
                 "( 1.3.77.0.2.8.1 DESC 'XAN Attribute Type Description' )");
}

TEST_F(Schema, AFileIsWrittenSectionBySectionFromWhatIsAtHomeThere)
{
    const temp_dir dir;
    const std::string file = dir.write("home", "old");
    dir.write("home.tmp", std::string(100000, 'x'));
    schema_.parse_str(schema_test::required_text().c_str(), "required");
    schema_.parse_str(("# lost\nldapSyntaxes:( 5.5 )" + std::string(schema_test::small_text)).c_str(), file.c_str());
    schema_.parse_str("XANattributeTypes:( 9.4 LENGTH 5 ) matchingRules:( 5.6 SYNTAX '5.5' )", "other");
    schema_.complete();
    schema_.files[file.c_str()] = indicator::modified;
    schema_.files["required"] = indicator::flushed;
    const std::string text =
        "objectClasses {\n"
        "( 8.1 NAME 'top' ABSTRACT MUST objectClass )\n"
        "( 8.2 NAME 'person' SUP top STRUCTURAL MUST cn MAY ( name $ sn ) )\n"
        "( 8.3 NAME ( 'employee' 'worker' ) SUP person STRUCTURAL MUST sn )\n"
        "}\n\nattributeTypes {\n"
        "( 9.1 NAME 'objectClass' EQUALITY 2.5.13.0 SYNTAX " ARC "38 )\n"
        "( 9.2 NAME 'name' EQUALITY caseIgnoreMatch SUBSTR caseIgnoreSubstringsMatch SYNTAX " ARC "15{64} )\n"
        "( 9.3 NAME ( 'cn' 'commonName' ) SUP name )\n"
        "( 9.4 NAME 'sn' SUP 9.2 )\n"
        "( 9.5 NAME 'spare' SUP name )\n"
        "}\n\nXANattributeTypes {\n"
        "( 9.3 DBNAME ( 'cn' 'cn' ) EQUALITY 16 )\n"
        "}\n\nldapSyntaxes {\n"
        "( 5.5 )\n"
        "}\n\nmatchingRules {\n"
        "}\n\n";
    schema_.flush();
    EXPECT_EQ(content_of(dir.path()), "home.tmp:\n" + text + "home:\nold");
    schema_.attribute_types["cn"].xan_file("");  // an extension without a home goes where the type is at home
    schema_.flush(file.c_str());
    EXPECT_EQ(dir.read("home.tmp"), text);
    schema_.flush_commit();
    schema_.flush();  // nothing is modified any more
    EXPECT_EQ(content_of(dir.path()), "home:\n" + text);
    schema_.files[file.c_str()] = indicator::modified;
    schema_.flush();
    schema_.flush_rollback();
    EXPECT_EQ(content_of(dir.path()), "home:\n" + text);
    EXPECT_EQ(schema_.files[file.c_str()], indicator::flushed);
}
