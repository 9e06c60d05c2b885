// The flat records: what a definition's syntax, rules, names and lengths become.
#include <cstdio>
#include <cstdlib>
#include <memory>

#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"
#include "servers/vrnd/libdirbase/schema/ldcf_rdbm.h"
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using test_support::debug_catcher;

namespace {

struct delete_info {
    void operator()(asyntaxinfo* info) const { ldcf_rdbm::delete_asyntaxinfo(info); }
    void operator()(objectclassinfo* info) const { ldcf_rdbm::delete_objectclassinfo(info); }
};

const char* owner(Backend*)
{
    return "longowner";
}

void hang_on_two(asyntaxinfo* info)
{
    EXPECT_NE(info->attr, nullptr);
    EXPECT_EQ(info->index_action, 0);  // not filled yet, and so on
    for (int i = 0; i < 2; ++i) {
        auto* node = static_cast<asyntaxinfo_back_end*>(std::malloc(sizeof(asyntaxinfo_back_end)));
        *node = {info->back_end_list};
        info->back_end_list = node;
    }
}

std::string joined(char* const* names)
{
    std::string text;
    for (; *names != nullptr; ++names) {
        text += (text.empty() ? "" : " ") + std::string(*names);
    }
    return text;
}

std::string column(const rdbm_col_info* info)
{
    return info == nullptr ? "-" : std::string(info->name) + ":" + std::to_string(info->length);
}

// The type with oid 1 of a text, completed, in the store of `rdbm`.
ldcf_attrtype type_of(ldcf_schema& schema, const std::string& definition, const std::string& extended, Backend& rdbm)
{
    schema.parse_str(schema_test::required_text().c_str(), "required");
    schema.parse_str(("attributeTypes:( 1 " + definition + " )" +
                      (extended.empty() ? "" : "XANattributeTypes:( 1 " + extended + " )"))
                         .c_str(),
                     "t");
    const test_support::message_catcher log;  // rules that don't suit their syntax
    g_backends = &rdbm;
    schema.complete_nocheck();
    schema.complete_db_names();
    return schema.attribute_types["1"];
}

// "syntax equality substring ordering", in hexadecimal, of a record without names and lengths that matter.
std::string codes(const std::string& definition)
{
    Backend rdbm{.be_type = "rdbm"};
    ldcf_schema schema;
    const ldcf_attrtype type = type_of(schema, "NAME 'a' " + definition, "", rdbm);
    const asyntaxinfo* info = type.info();
    g_backends = nullptr;
    char text[64];
    std::snprintf(text, sizeof text, "%x %x %x %x", info->syntax, info->equality, info->substring, info->ordering);
    return text;
}

}  // namespace

TEST(LdcfRdbmInfo, NamesTablesAndColumnsComeFromTheDefinition)
{
    struct {
        const char* definition;
        const char* extended;
        const char* expected;  // names|name_length|table|short table|column|truncated column|system column|access class
    } const cases[] = {
        {"NAME ( 'ccc' 'b' 'aa' 'ab' ) SYNTAX " ARC "15", "",
         "b aa ab ccc 1|1|longowner.CCC|longowner.CCC|CCC:240|-|0|1"},
        {"SYNTAX " ARC "15", "", "1|0|longowner.1|longowner.1|1:240|-|0|1"},
        {"NAME 'abcdefghijklmnopq' SYNTAX " ARC "26{241}", "ACCESS-CLASS SENSITIVE",
         "abcdefghijklmnopq 1|17|longowner.ABCDEFGHIJKLMNOPQ|longowner.ABCDEFGHIJKLMNOPQ|ABCDEFGHIJKLMNOPQ:241|"
         "ABCDEFGHIJKLMNO_T:240|0|2"},
        {"NAME 'abcdefghijklmnopqr' SYNTAX " ARC "15{32700}", "ACCESS-CLASS OBJECT",
         "abcdefghijklmnopqr 1|18|longowner.ABCDEFGHIJKLMNOPQR|longowne.ABCDEFGHIJ@|ABCDEFGHIJKLMNOP:32700|"
         "ABCDEFGHIJKLMNO_T:240|0|32"},
        {"NAME 'a' SYNTAX " ARC "12{1000}", "DBNAME ( 'tab' 'creator' ) ACCESS-CLASS SYSTEM",
         "a 1|1|LDAP_ENTRY|-|CREATOR:1000|-|1|16"},
        {"NAME 'a' SYNTAX " ARC "5{70000}", "ACCESS-CLASS RESTRICTED", "a 1|1|longowner.A|longowner.A|A:65535|-|0|8"},
        {"NAME 'a' SYNTAX " ARC "27", "LENGTH 11", "a 1|1|longowner.A|longowner.A|A:11|-|0|1"},
        {"NAME 'a' SYNTAX " ARC "24", "ACCESS-CLASS CRITICAL", "a 1|1|longowner.A|longowner.A|A:240|-|0|4"},
    };
    for (const auto& c : cases) {
        Backend rdbm{.be_type = "rdbm", .be_table_qualifier = owner};
        ldcf_schema schema;
        const ldcf_attrtype type = type_of(schema, c.definition, c.extended, rdbm);
        const asyntaxinfo* info = type.info();
        ASSERT_NE(info, nullptr) << c.definition;
        EXPECT_EQ(type.info(), info);
        std::string text = joined(info->names) + "|" + std::to_string(info->name_length) + "|" + info->table + "|" +
                           (info->short_table == nullptr ? "-" : info->short_table) + "|" + column(info->attr) + "|" +
                           column(info->trunc) + "|" + std::to_string(info->system_column) + "|" +
                           std::to_string(info->access_class);
        std::string expected = c.expected;
        if (const std::size_t at = expected.find('@'); at != expected.npos) {
            char suffix[8];
            unpack_int(ldcf_hash_name("ABCDEFGHIJKLMNOPQR"), suffix);
            expected.replace(at, 1, suffix);
        }
        EXPECT_EQ(text, expected);
        g_backends = nullptr;
    }
}

TEST(LdcfRdbmInfo, SyntaxesAndRulesGiveTheCodesByWhichValuesAreCompared)
{
    const std::pair<const char*, const char*> cases[] = {
        {"SYNTAX " ARC "15", "1 0 0 0"},
        {"EQUALITY caseExactMatch SYNTAX " ARC "15", "2 2 0 0"},
        {"EQUALITY CASEexactMATCH SUBSTR caseexactsubstringsmatch SYNTAX " ARC "15", "2 2 2 0"},
        {"EQUALITY 1.3.6.1.4.1.1466.109.114.1 SYNTAX " ARC "26", "2 2 0 0"},
        {"EQUALITY caseIgnoreMatch ORDERING caseIgnoreOrderingMatch SUBSTR caseIgnoreSubstringsMatch SYNTAX " ARC "15",
         "1 1 1 1"},
        {"SUBSTR caseExactSubstringsMatch SYNTAX " ARC "44", "2 0 2 0"},
        {"ORDERING caseExactOrderingMatch SYNTAX " ARC "15", "2 0 0 2"},
        {"EQUALITY distinguishedNameMatch ORDERING distinguishedNameOrderingMatch SYNTAX " ARC "12", "11 11 0 11"},
        {"SYNTAX " ARC "34", "11 0 0 0"},
        {"EQUALITY bitStringMatch SYNTAX " ARC "6", "201 0 0 0"},
        {"EQUALITY octetStringMatch SYNTAX " ARC "40", "4 1 0 0"},
        {"SYNTAX " ARC "8", "4 0 0 0"},
        {"EQUALITY caseIgnoreMatch SYNTAX " ARC "11", "801 1 0 0"},
        {"EQUALITY telephoneNumberMatch SUBSTR telephoneNumberSubstringsMatch SYNTAX " ARC "50", "9 9 9 0"},
        {"EQUALITY numericStringMatch ORDERING 2.5.13.9 SUBSTR numericStringSubstringsMatch SYNTAX " ARC "36",
         "401 401 401 401"},
        {"EQUALITY booleanMatch SYNTAX " ARC "7", "40 0 0 0"},
        {"EQUALITY 2.5.13.14 ORDERING integerOrderingMatch SYNTAX " ARC "27", "20 20 0 0"},
        {"EQUALITY generalizedTimeMatch ORDERING generalizedTimeOrderingMatch SYNTAX " ARC "24", "80 80 0 80"},
        {"EQUALITY uTCTimeMatch SYNTAX " ARC "53", "100 100 0 0"},
        {"EQUALITY objectIdentifierMatch SYNTAX " ARC "38", "1 1 0 0"},
    };
    for (const auto& [definition, expected] : cases) {
        EXPECT_EQ(codes(definition), expected) << definition;
    }
}

TEST(LdcfRdbmInfo, ProtectionAndIndexesAreTakenOverAndTheBackEndMayAdd)
{
    Backend rdbm{.be_type = "rdbm", .be_fill_attr_info = hang_on_two};
    ldcf_schema schema;
    const ldcf_attrtype type =
        type_of(schema, "NAME 'a' EQUALITY caseIgnoreMatch SYNTAX " ARC "15",
                "REVERSE ENCRYPT AES-192 SECURE-CONNECTION-REQUIRED RETURN-VALUE type-only NONMATCHABLE", rdbm);
    const asyntaxinfo* info = type.info();
    ASSERT_NE(info, nullptr);
    EXPECT_EQ(info->index_action, 1);
    EXPECT_EQ(info->encryption, 134);
    EXPECT_EQ(info->secure_connection + info->return_value + info->non_matchable, 1 + 2 + 1);
    EXPECT_TRUE(info->back_end_list != nullptr && info->back_end_list->next->next == nullptr);
    EXPECT_EQ(info->attr_id, -1);
    EXPECT_EQ(info->attr_class, 9);
    g_srvType = 1;
    rdbm.be_type = "proxy";
    const std::unique_ptr<asyntaxinfo, delete_info> without_tables(ldcf_rdbm::fill_asyntaxinfo(type));
    EXPECT_TRUE(without_tables->table == nullptr && without_tables->short_table == nullptr);
    EXPECT_EQ(without_tables->back_end_list, nullptr);
    g_srvType = 2;
    g_backends = nullptr;
}

TEST(LdcfRdbmInfo, ATypeThatCannotBeStoredHasNoRecord)
{
    const std::pair<const char*, const char*> cases[] = {
        {"SYNTAX " ARC "15{32701}",
         "ldcf_rdbm::fill_asyntaxinfo():attr size 32701 exceed max longvarchar length 32700\n"},
        {"SYNTAX 9.9", "ldcf_rdbm::fill_ayntaxinfo: Invalid syntax: 9.9\n"},
    };
    for (const auto& [definition, told] : cases) {
        Backend rdbm{.be_type = "rdbm"};
        ldcf_schema schema;
        schema.parse_str("ldapSyntaxes:( 9.9 )", "t");
        const ldcf_attrtype type = type_of(schema, std::string("NAME 'a' ") + definition, "", rdbm);
        const debug_catcher debug;
        EXPECT_EQ(type.info(), nullptr);
        EXPECT_TRUE(debug.has(told)) << told;
        g_backends = nullptr;
    }
}

TEST(LdcfRdbmInfo, AClassRecordHoldsItsNamesAndItsOidInUpperCase)
{
    const auto objclass = schema_test::parsed<ldcf_objclass>("( 8.3 NAME ( 'worker' 'Employee-x' ) )");
    const std::unique_ptr<objectclassinfo, delete_info> info(ldcf_rdbm::fill_classinfo(objclass));
    EXPECT_EQ(joined(info->names), "EMPLOYEE-X WORKER 8.3");
}

TEST(LdcfRdbmInfo, ACopyOfATypeMakesItsOwnRecordAndAChangedTypeANewOne)
{
    Backend rdbm{.be_type = "rdbm"};
    ldcf_schema schema;
    ldcf_attrtype type = type_of(schema, "NAME 'a' SYNTAX " ARC "15", "", rdbm);
    const asyntaxinfo* info = type.info();
    const ldcf_attrtype copy = type.clone();
    EXPECT_NE(copy.info(), info);
    auto other = schema_test::parsed<ldcf_attrtype>("( 1 NAME 'b' SYNTAX " ARC "5 )");
    type.replace(other);
    EXPECT_STREQ(type.info()->names[0], "b");
    EXPECT_STREQ(copy.info()->names[0], "a");
    g_backends = nullptr;
}
