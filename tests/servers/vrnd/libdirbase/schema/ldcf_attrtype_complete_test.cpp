// Completion of attribute types: inheritance, cycles, lengths, encryption, and which rules suit which syntax.
#include <functional>
#include <map>

#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using schema_test::names_of;
using schema_test::parsed;
using schema_test::refused;
using test_support::message_catcher;

namespace {

// A schema of the shipped syntaxes and rules and some attribute types; "xan" ahead of one says that it is extended.
void load(ldcf_schema& schema, const std::vector<std::string>& types)
{
    schema.parse_str(schema_test::required_text().c_str(), "required");
    for (const std::string& text : types) {
        schema.parse_str((text[0] == 'x' ? "XANattributeTypes:" + text.substr(3) : "attributeTypes:" + text).c_str(),
                         "t");
    }
}

// The refusal of completing one type of a schema, or all, which is the same again after incomplete.
std::string completed(const std::vector<std::string>& types, const char* first = nullptr)
{
    ldcf_schema schema;
    load(schema, types);
    const auto complete = [&] {
        if (first != nullptr) {
            schema.attribute_types[first]->complete(schema.attribute_types, schema.matching_rules, schema.syntaxes);
        }
        schema.complete();
    };
    const std::string fault = refused(complete);
    schema.incomplete();
    EXPECT_EQ(refused(complete), fault);
    return fault;
}

#define INPUT "exc_invalid_input_t "
#define CYCLE INPUT "-35: There is a cycle in the supertype specification: "

}  // namespace

TEST(LdcfAttrtypeComplete, WhatIsLeftOutIsInheritedAndShownApart)
{
    ldcf_schema schema;
    const std::string rules = "EQUALITY caseIgnoreMatch ORDERING caseIgnoreOrderingMatch ";
    load(schema, {"( 1 NAME 'top' " + rules + "SYNTAX " ARC "15{64} )", "( 2 NAME 'mid' SUP TOP SUBSTR 2.5.13.4 )",
                  "( 3 SUP 2 SYNTAX " ARC "26 )", "( 5 SYNTAX " ARC "15{8} )", "( 6 SYNTAX " ARC "50 )"});
    schema.complete();
    const struct {
        const char* oid;
        std::string standard, inherited;
        bool v3_inherited;
    } cases[] = {
        {"1", "( 1 NAME 'top' " + rules + "SYNTAX " ARC "15{64} )", "( )", false},
        {"2", "( 2 NAME 'mid' SUP TOP SUBSTR 2.5.13.4 )", "( " + rules + "SYNTAX " ARC "15 LENGTH 64 )", true},
        {"3", "( 3 SUP 2 SYNTAX " ARC "26 )", "( " + rules + "SUBSTR 2.5.13.4 LENGTH 64 )", true},
        {"5", "( 5 SYNTAX " ARC "15{8} )", "( )", false},
        {"6", "( 6 SYNTAX " ARC "50 )", "( LENGTH 32 )", true},
    };
    for (const auto& c : cases) {
        const ldcf_attrtype type = schema.attribute_types[c.oid];
        EXPECT_EQ(std::string(type.v3_string()), c.standard);
        EXPECT_EQ(std::string(type.v3_string_inherited()), c.inherited);
        EXPECT_EQ(type->v3_inherited(), c.v3_inherited) << c.oid;
    }
    const ldcf_attrtype low = schema.attribute_types["3"];
    EXPECT_STREQ((low->equality_rule().oid() + "," + low->ordering_rule().oid() + "," + low->substr_rule().oid()),
                 "2.5.13.2,2.5.13.3,2.5.13.4");
    low->complete(schema.attribute_types, {}, {});  // complete already: the empty maps aren't looked at
    schema.incomplete();
    EXPECT_EQ(low->state(), ldcf_attrtype_state::both_defined);
    EXPECT_STREQ((low->equality() + low->substr() + low->name() + low->syntax_oid()), ARC "26");
    EXPECT_FALSE(low->supertype() || low->syntax() || low->equality_rule() || low->ordering_rule() ||
                 low->substr_rule());
    EXPECT_TRUE(schema.attribute_types["2"]->subtypes().empty() && low->effective_length() == 0);
}

TEST(LdcfAttrtypeComplete, FaultsNameTheTypeAndWhatIsWrong)
{
    const std::string a = "( 1 NAME 'a' SYNTAX " ARC "15 ";
    const std::pair<std::vector<std::string>, const char*> cases[] = {
        {{"( 1 NAME 'a' SUP b )"}, INPUT "-25: SUP attribute type 'b' not found when processing attribute type 'a'"},
        {{a + ")", "( 2 NAME 'b' SUP A USAGE dSAOperation )"},
         INPUT "-34: attribute type 'b' and its supertype 'a' have different usages"},
        {{"( 1.3 EQUALITY x )"}, INPUT "-28: attribute type '1.3' (oid 1.3) does not have a syntax"},
        {{"( 1 NAME 'a' EQUALITY x SYNTAX 5.5 )"},
         INPUT "-25: syntax '5.5' not found when processing attribute type 'a'"},
        {{a + "SUBSTR z ORDERING y EQUALITY x )"},
         INPUT "-25: EQUALITY matching rule 'x' not found when processing attribute type 'a'"},
        {{a + "SUBSTR z ORDERING y )"},
         INPUT "-25: ORDERING matching rule 'y' not found when processing attribute type 'a'"},
        {{a + "SUBSTR z )"}, INPUT "-25: SUBSTR matching rule 'z' not found when processing attribute type 'a'"},
        {{"( 1 NAME 'a' SUP a SYNTAX " ARC "15 )"}, CYCLE "'a <= a'"},
        {{"( 1.1 SUP 1.1 )"}, CYCLE "'1.1 <= 1.1'"},
    };
    for (const auto& [types, fault] : cases) {
        EXPECT_EQ(completed(types), fault);
    }
    ldcf_schema schema;
    load(schema, {"( 2 NAME 'b' SUP 1.7 )", "xan( 1.7 LENGTH 3 )"});
    EXPECT_EQ(refused([&] { schema.complete(); }), INPUT "-33: missing LDAPv3 spec for attribute 1.7");
    schema.clear();
    load(schema, {"( 1 NAME 'a' SUP b )"});
    EXPECT_EQ(schema_test::logged_arguments([&] { schema.complete(); }),
              (std::vector<std::string>{"SUP attribute type", "'b'", "attribute type", "'a'"}));

    // A cycle is told from the type that was met twice, also when the first lies outside.
    const std::vector<std::string> circle = {"( 1 NAME 'a' SUP b )", "( 2 NAME 'b' SUP c )", "( 3 NAME 'c' SUP a )",
                                             "( 4 NAME 'x' SUP y )", "( 5 NAME 'y' SUP c )"};
    EXPECT_EQ(completed(circle, "a"), CYCLE "'a <= c <= b <= a'");
    EXPECT_EQ(completed(circle, "b"), CYCLE "'b <= a <= c <= b'");
    EXPECT_EQ(completed(circle, "x"), CYCLE "'c <= b <= a <= c'");
}

TEST(LdcfAttrtypeComplete, AChainOfAnyLengthIsFollowed)
{
    constexpr int first = 1000000, last = first + 100000;
    std::string text = "attributeTypes {";
    for (int i = first; i < last; ++i) {
        text += "( " + std::to_string(i) + " SUP " + std::to_string(i + 1) + " )\n";
    }
    text += "( " + std::to_string(last) + " EQUALITY caseExactMatch SYNTAX " ARC "15{7} ) }";
    ldcf_schema schema;
    load(schema, {});
    schema.parse_str(text.c_str(), "chain");
    schema.complete();  // from the lowest type up
    EXPECT_STREQ(schema.attribute_types["1000000"]->equality(), "caseExactMatch");
    EXPECT_EQ(schema.attribute_types["1000000"]->effective_length(), 7);
}

TEST(LdcfAttrtypeComplete, TheEffectiveLengthIsTheFirstThatIsGiven)
{
    const struct {
        const char* standard;
        const char* extended;
        int length;
    } cases[] = {
        {"SYNTAX " ARC "27", "", 11},
        {"SYNTAX " ARC "27{5}", "", 5},
        {"SYNTAX " ARC "27{5}", "LENGTH 7", 7},
        {"SYNTAX " ARC "27{5}", "LENGTH 0", 5},
        {"SYNTAX " ARC "50", "", 32},
        {"SYNTAX " ARC "5", "", 0},
        {"SYNTAX " ARC "40", "", 240},
        {"SYNTAX " ARC "7", "", 5},
        {"SYNTAX " ARC "11", "", 2},
        {"SUP eighty", "", 80},
        {"SUP eighty SYNTAX " ARC "27", "", 80},  // ahead of the default of the syntax
        {"SUP eighty SYNTAX " ARC "15{9}", "", 9},
        {"SUP eighty", "LENGTH 3", 3},
        {"SUP binary SYNTAX " ARC "27", "", 11},  // the supertype has none
    };
    for (const auto& c : cases) {
        ldcf_schema schema;
        load(schema, {"( 1 NAME 'x' " + std::string(c.standard) + " )", "( 2 NAME 'eighty' SYNTAX " ARC "15{80} )",
                      "( 3 NAME 'binary' SYNTAX " ARC "5 )", "xan( 1 " + std::string(c.extended) + " )"});
        schema.complete();
        EXPECT_EQ(schema.attribute_types["x"]->effective_length(), c.length) << c.standard << " " << c.extended;
    }
}

TEST(LdcfAttrtypeComplete, WhatTheServerReadsItselfIsNotEncrypted)
{
    // The types by the id of the refusal, 0 for none; those of -43 all have the name x.
    std::vector<std::pair<int, std::string>> cases = {
        {0, "'x' SYNTAX " ARC "15"},
        {0, "'x' SYNTAX " ARC "5"},
        {0, "'member' SYNTAX " ARC "15"},
        {-43, "'x' SUP dn"},
        {-44, "'cn' SYNTAX " ARC "15"},
        {-44, "'OBJECTCLASS' SYNTAX " ARC "15"},
        {-44, "'x' SYNTAX " ARC "15 USAGE directoryOperation"},
        {-44, "'aclEntry' SYNTAX " ARC "15"},
        {-47, "'userPassword' SYNTAX " ARC "5"},
        {-47, "'secretKey' SYNTAX " ARC "5"},
    };
    for (const std::string number : {"12", "7", "27", "24", "53", "11", "34"}) {
        cases.emplace_back(-43, "'x' SYNTAX " ARC + number);
    }
    for (const std::string name :
         {"targetDN", "changetime", "changenumber", "changetype", "Changes", "newrdn", "deleteoldrdn", "newsuperior"}) {
        cases.emplace_back(-44, "'" + name + "' SYNTAX " ARC "15");
    }
    for (const auto& [id, type] : cases) {
        const std::string name = type.substr(0, type.find(' '));
        const std::string syntax = type.find(ARC) == type.npos ? ARC "12" : type.substr(type.find(ARC));
        const std::map<int, std::string> faults = {
            {0, ""},
            {-43,
             INPUT "-43: Attribute 'x' cannot be encypted.  Syntax '" + syntax + "' is not allowed to be encrypted."},
            {-44, INPUT "-44: Attribute " + name +
                      " cannot be encypted. Special attributes are not allowed to be encrypted."},
            {-47, INPUT "-47: Password attribute " + name + " cannot be encypted in the schema."},
        };
        const std::string dn = "( 2 NAME 'dn' SYNTAX " ARC "12 )";
        EXPECT_EQ(completed({"( 1 NAME " + type + " )", dn, "xan( 1 ENCRYPT AES-128 )"}), faults.at(id));
        ldcf_schema schema;
        load(schema, {"( 1 NAME " + type + " )", dn, "xan( 1 SECURE-CONNECTION-REQUIRED )"});
        schema.complete();
        EXPECT_EQ(schema.attribute_types["1"]->may_be_encrypted(), id == 0) << type;
    }
}

namespace {

// Whether a word stands in a list of words.
bool in(const std::string& list, const std::string& word)
{
    return (" " + list + " ").find(" " + word + " ") != std::string::npos;
}

// The rows of the table: last arcs of syntaxes, and what EQUALITY, SUBSTR and ORDERING may be.
const char* const rows[][4] = {
    {"12 34", "distinguishedNameMatch uniqueMemberMatch", "", "distinguishedNameOrderingMatch"},
    {"24", "generalizedTimeMatch", "", "generalizedTimeOrderingMatch"},
    {"7", "booleanMatch", "", ""},
    {"27", "integerMatch integerFirstComponentMatch", "", "integerOrderingMatch"},
    {"5 8 9 10 40 23 28", "octetStringMatch caseExactMatch", "", "octetStringOrderingMatch caseExactMatch"},
    {"50 22 52", "telephoneNumberMatch", "telephoneNumberSubstringsMatch", ""},
    {"53", "uTCTimeMatch", "", ""},
    {"38 37 3 16 30 31 35 54", "objectIdentifierMatch objectIdentifierFirstComponentMatch", "", ""},
    {"17", "integerFirstComponentMatch", "", ""},
    {"6", "bitStringMatch", "", ""},
    {"11", "", "", ""},
    {"36", "numericStringMatch", "numericStringSubstringsMatch", "numericStringOrderingMatch"},
};
const char text_syntaxes[] = "15 26 33 39 41 42 43 44 14 21 25 51 49 58";
const char* const exact[] = {"caseExactMatch caseExactIA5Match", "caseExactSubstringsMatch", "caseExactOrderingMatch"};
const char* const ignoring[] = {
    "caseIgnoreMatch caseIgnoreIA5Match caseIgnoreListMatch presentationAddressMatch protocolInformationMatch",
    "caseIgnoreSubstringsMatch caseIgnoreIA5SubstringsMatch caseIgnoreListSubstringsMatch", "caseIgnoreOrderingMatch"};

using three_rules = std::vector<std::string>;  // EQUALITY, SUBSTR, ORDERING by name or oid, or empty
const char* const labels[] = {"EQUALITY", "SUBSTRING", "ORDERING"};

// What the log should say of three rules, by name, under a syntax: the id and the label.
std::string verdict(const std::string& syntax, const three_rules& rules)
{
    if (in(text_syntaxes, syntax)) {
        const bool is_exact = in(exact[0], rules[0]);
        if (rules[0].empty() || (!is_exact && !in(ignoring[0], rules[0]))) {
            return rules[0].empty() ? "" : "46 EQUALITY";
        }
        const auto& own = is_exact ? exact : ignoring;
        const auto& opposite = is_exact ? ignoring : exact;
        for (std::size_t i = 1; i < 3; ++i) {
            if (!rules[i].empty() && !in(own[i], rules[i])) {
                const bool inconsistent =
                    in(opposite[0], rules[i]) || in(opposite[1], rules[i]) || in(opposite[2], rules[i]);
                return (inconsistent ? "49 " : "46 ") + std::string(labels[i]);
            }
        }
        return "";
    }
    for (const auto& row : rows) {
        for (std::size_t i = 0; in(row[0], syntax) && i < 3; ++i) {
            if (!rules[i].empty() && !in(row[i + 1], rules[i])) {
                return "46 " + std::string(labels[i]);
            }
        }
        if (in(row[0], syntax)) {
            return "";
        }
    }
    return rules[0].empty() ? "" : "silent";
}

// What check_match_rules says.
std::string said(const std::string& syntax, const three_rules& rules)
{
    const char* const keywords[] = {"EQUALITY ", "SUBSTR ", "ORDERING "};
    std::string text = "( 1 NAME 'x' SYNTAX " ARC + syntax;
    for (std::size_t i = 0; i < 3; ++i) {
        text += rules[i].empty() ? "" : " " + (keywords[i] + rules[i]);
    }
    const ldcf_attrtype type = parsed<ldcf_attrtype>(text + " )");
    const message_catcher log;
    const int result = type->check_match_rules();
    if (log.count() == 0) {
        return result == 0 ? "" : "silent";
    }
    const test_support::caught_message message = log.messages().front();
    const std::string label = message.arguments[0];
    const std::size_t i = label == labels[0] ? 0 : label == labels[1] ? 1 : 2;
    std::vector<std::string> arguments = {label, rules[i], "x"};
    if (message.id == 46) {
        arguments.push_back(ARC + syntax);
    }
    EXPECT_TRUE(result == 18 && log.count() == 1 && message.component == 4 && message.severity == 2);
    EXPECT_EQ(message.arguments, arguments);
    return std::to_string(message.id) + " " + label;
}

}  // namespace

TEST(LdcfAttrtypeRules, EverySyntaxTakesTheRulesOfItsRowAndNoOthers)
{
    ldcf_schema schema;
    load(schema, {});
    std::map<std::string, std::string> oids = {{"", ""}};
    for (const auto& [key, rule] : schema.matching_rules) {
        oids.emplace(rule.name().c_str(), rule.oid().c_str());
    }
    ASSERT_TRUE(oids["octetStringMatch"] == "2.5.13.17" && oids["uTCTimeMatch"] == "2.5.13.25" && oids.size() > 33);
    for (const auto& [name, oid] : oids) {
        for (int n = 1; n <= 58; ++n) {
            const std::string syntax = std::to_string(n);
            EXPECT_EQ(said(syntax, {name, "", ""}), verdict(syntax, {name, "", ""})) << syntax << name;
            EXPECT_EQ(said(syntax, {oid, "", ""}), verdict(syntax, {name, "", ""})) << syntax << name;
            EXPECT_EQ(said(syntax, {"", name, ""}), verdict(syntax, {"", name, ""})) << syntax << name;
            EXPECT_EQ(said(syntax, {"", "", oid}), verdict(syntax, {"", "", name})) << syntax << name;
        }
        for (const auto& [other, other_oid] : oids) {
            EXPECT_EQ(said("15", {name, other_oid, ""}), verdict("15", {name, other, ""})) << name << other;
            EXPECT_EQ(said("58", {oid, "", other}), verdict("58", {name, "", other})) << name << other;
            EXPECT_EQ(said("36", {name, other, other}), verdict("36", {name, other, other})) << name << other;
        }
    }
    EXPECT_EQ(parsed<ldcf_attrtype>("( 1 EQUALITY x SYNTAX 1.3.77.0.2.8.1 )")->check_match_rules(), 18);
    EXPECT_EQ(parsed<ldcf_attrtype>("( 1 SUBSTR x SYNTAX 1.3.77.0.2.8.1 )")->check_match_rules(), 0);
}

TEST(LdcfAttrtypeRules, UnsuitableRulesAreLoggedAndTheTypeStands)
{
    const message_catcher log;
    ldcf_schema schema;
    load(schema, {"( 2 NAME 'b' EQUALITY caseignorematch SYNTAX " ARC "15 )", "( 3 NAME 'c' SUP b SYNTAX " ARC "27 )"});
    schema.complete();
    ASSERT_EQ(log.count(4, 46), 2u);
    EXPECT_EQ(log.messages()[0].arguments[1], "caseignorematch");  // exact in case
    EXPECT_EQ(log.messages()[1].arguments[2], "c");                // inherited rules count
    EXPECT_STREQ(schema.attribute_types["c"]->equality_rule().name(), "caseIgnoreMatch");
}

TEST(LdcfAttrtypeComplete, TheShippedTypesInheritAsAWalkOverTheirTextsSays)
{
    ldcf_schema schema, texts;  // the second is never completed
    schema_test::load_shipped(schema);
    schema_test::load_shipped(texts);
    schema.complete();
    const auto above = [&](const ldcf_attrtype_& type) { return ldcf_find(texts.attribute_types, type.sup()); };
    using item = const csgl_string& (ldcf_attrtype_::*)() const;
    const std::function<std::string(const ldcf_attrtype_&, item)> walk = [&](const ldcf_attrtype_& type, item of) {
        return (type.*of)().empty() && !type.sup().empty() ? walk(*above(type), of) : std::string((type.*of)());
    };
    const std::map<std::string, int> defaults = {
        {ARC "50", 32}, {ARC "5", 0}, {ARC "27", 11}, {ARC "7", 5}, {ARC "11", 2}};
    const std::function<int(const ldcf_attrtype_&)> length = [&](const ldcf_attrtype_& type) {
        int result = type.length() != 0 ? type.length() : type.syntax_length();
        result = result == 0 && !type.sup().empty() ? length(*above(type)) : result;
        const auto known = defaults.find(walk(type, &ldcf_attrtype_::syntax_oid));
        return result != 0 ? result : known == defaults.end() ? 240 : known->second;
    };
    std::size_t inheriting = 0;
    for (const auto& [key, type] : schema.attribute_types) {
        const ldcf_attrtype_& text = *texts.attribute_types[key];
        for (const item of : {&ldcf_attrtype_::equality, &ldcf_attrtype_::ordering, &ldcf_attrtype_::substr,
                              &ldcf_attrtype_::syntax_oid}) {
            EXPECT_EQ(std::string(((*type).*of)()), walk(text, of)) << key;
        }
        EXPECT_EQ(type->effective_length(), length(text)) << key;
        EXPECT_STREQ(type.v3_string(), text.v3_string());
        csgl_set<ldcf_attrtype> subtypes;
        for (const auto& entry : texts.attribute_types) {
            if (!entry.second->sup().empty() && above(*entry.second).get() == &text) {
                subtypes.insert(entry.second);
            }
        }
        EXPECT_EQ(names_of(type->subtypes()), names_of(subtypes));
        inheriting += text.sup().empty() ? 0u : 1u;
    }
    EXPECT_GT(inheriting, 20u);
}
