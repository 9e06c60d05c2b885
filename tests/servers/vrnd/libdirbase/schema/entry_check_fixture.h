// What the tests of the checks of an entry share: a schema with each kind of attribute and class, and entries from
// text.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_check.h"
#include "servers/vrnd/libdirbase/schema/ldcf_oc_check.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

namespace entry_test {

constexpr char schema_text[] =
    "attributeTypes { ( 2.5.4.0 NAME 'objectClass' EQUALITY objectIdentifierMatch SYNTAX " ARC "38 )\n"
    "( 2.5.4.3 NAME ( 'cn' 'commonName' )" IGNORE_CASE "( 2.5.4.4 NAME 'sn'" IGNORE_CASE "( 9.1 NAME 'note'" IGNORE_CASE
    "( 9.2 NAME 'serial' EQUALITY caseIgnoreMatch SYNTAX " ARC "15 SINGLE-VALUE )\n"
    "( 9.3 NAME 'owner' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 9.4 NAME 'flag' EQUALITY booleanMatch SYNTAX " ARC "7 ) ( 9.5 NAME 'cert' SYNTAX " ARC "8 )\n"
    "( 9.6 NAME 'ref' EQUALITY caseExactMatch SYNTAX " ARC "15 ) ( 9.7 NAME 'locked'" IGNORE_CASE
    "( 9.8 NAME 'system'" IGNORE_CASE "( 9.9 NAME 'secret'" IGNORE_CASE "( 9.10 NAME 'under_score'" IGNORE_CASE
    "( 2.5.4.1 NAME 'aliasedObjectName' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 9.11 NAME 'aliasedEntryName' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 9.12 NAME 'userPassword'" IGNORE_CASE
    "( 7.1 NAME 'pwdChangedTime' SUP sn ) ( 7.2 NAME 'pwdAccountLockedTime' SUP sn ) ( 7.4 NAME 'pwdReset' SUP sn )\n"
    "( 7.3 NAME 'pwdExpirationWarned' SUP sn ) ( 7.5 NAME 'pwdFailureTime' SUP sn ) ( 7.6 NAME 'pwdHistory' SUP sn )\n"
    "( 7.7 NAME 'pwdGraceUseTime' SUP sn ) ( 7.8 NAME 'pwdGroupPoliceDN' SUP sn )\n"
    "( 7.9 NAME 'pwdIndividualPolicyDN' SUP sn ) }\n"
    "XANattributeTypes { ( 9.7 ACCESS-CLASS RESTRICTED ) ( 9.8 ACCESS-CLASS SYSTEM ) ( 9.9 ACCESS-CLASS CRITICAL ) }\n"
    "objectClasses { ( 2.5.6.0 NAME 'top' ABSTRACT MUST objectClass )\n"
    "( 8.1 NAME 'person' SUP top MUST ( cn $ sn ) MAY ( note $ cert $ owner $ flag $ serial $ userPassword ) )\n"
    "( 8.2 NAME ( 'worker' 'employee' ) SUP person MUST note ) ( 8.3 NAME 'device' SUP top MUST CommonName )\n"
    "( 8.4 NAME 'mark' AUXILIARY MAY ( serial $ UserPassword ) ) ( 8.5 NAME 'alias' SUP top MUST aliasedObjectName )\n"
    "( 8.6 NAME 'aliasObject' AUXILIARY ) ( 8.7 NAME 'referral' SUP top MUST ref )\n"
    "( 8.8 NAME 'extensibleObject' AUXILIARY ) ( 8.9 NAME 'sealed' AUXILIARY MUST UserPassword )\n"
    "( 8.10 NAME 'chief' SUP ( worker $ mark $ device ) MUST serial MAY ( secret $ sn ) ) }\n";

// The active schema for as long as one lives; the mode is put back in the end.
class active_schema : schema_test::relational_store {
public:
    explicit active_schema(const char* text = schema_text)
    {
        const test_support::message_catcher quiet;  // about long names of columns
        ldcf_api_schema_init();
        ldcf_schema_g->parse_str(schema_test::required_text().c_str(), "required");
        ldcf_schema_g->parse_str(text, "home");
        ldcf_schema_g->complete_nocheck();
        EXPECT_EQ(ldcf_api_schema_complete_db_names(), 0);
    }
    ~active_schema()
    {
        ldcf_api_set_schema_check(ldcf_check_strict);
        ldcf_schema_g->clear();
    }
};

// An entry from "name: value" parts with "|" between; "name" alone is an attribute without values, and "dn" the DN.
class text_entry : public model_test::test_entry {
public:
    explicit text_entry(const std::string& text)
    {
        std::istringstream parts(text);
        for (std::string part; std::getline(parts, part, '|');) {
            const std::size_t colon = part.find(": ");
            const std::string name = part.substr(0, colon);
            const bool has_value = colon != std::string::npos;
            const std::string value = has_value ? part.substr(colon + 2) : "";
            if (name == "dn") {
                dn_ = value;
                e_dn = dn_.data();
            } else {
                EXPECT_EQ(merge(name.c_str(), has_value ? std::vector{value} : std::vector<std::string>(), 0, 0), 0);
            }
        }
    }

private:
    std::string dn_;
};

// What the logs received: the debug texts, then the messages as "id(arguments)", with "|" between. The words with which
// most debug texts begin are shown as "E ".
inline std::string told(const test_support::debug_catcher& debug, const test_support::message_catcher& messages)
{
    std::string all;
    for (std::string text : debug.texts()) {
        EXPECT_EQ(text.back(), '\n');
        const std::string beginning = "Error - ldcf_api_schema_check: ";
        text = text.starts_with(beginning) ? "E " + text.substr(beginning.size()) : text;
        all += (all.empty() ? "" : "|") + text.substr(0, text.size() - 1);
    }
    for (const test_support::caught_message& message : messages.messages()) {
        EXPECT_TRUE(message.component == 7 && message.severity == 8);
        all += (all.empty() ? "" : "|") + std::to_string(message.id) + "(";
        for (const std::string& argument : message.arguments) {
            all += (all.back() == '(' ? "" : ",") + argument;
        }
        all += ")";
    }
    return all;
}

}  // namespace entry_test
