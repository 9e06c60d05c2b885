// The definitions that the server relies on: they must be in every schema, and say what they say here.
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"
#include "servers/vrnd/libdirbase/schema/ldcf_well_known_oids.h"

namespace {

#define SYNTAX(last_arc, description) "( " LDCF_SYNTAX_ARC last_arc " DESC '" description "' )"
#define RULE(oid, name, last_arc) "( " oid " NAME '" name "' SYNTAX " LDCF_SYNTAX_ARC last_arc " )"

// clang-format off
// RFC 4517, sections 3.3 and 4.2; the older syntaxes and rules from RFC 2252 and RFC 2256; the server's own.
constexpr char required_definitions[] =
    "objectclasses {} attributetypes {} xanattributetypes {} ldapSyntaxes {"
    SYNTAX("5", "Binary")
    SYNTAX("7", "Boolean")
    SYNTAX("12", "DN")
    SYNTAX("15", "Directory String")
    SYNTAX("24", "Generalized Time")
    SYNTAX("26", "IA5 String")
    SYNTAX("27", "INTEGER")
    SYNTAX("50", "Telephone Number")
    SYNTAX("53", "UTC Time")
    SYNTAX("3", "Attribute Type Description")
    SYNTAX("16", "DIT Content Rule Description")
    SYNTAX("17", "DIT Structure Rule Description")
    SYNTAX("30", "Matching Rule Description")
    SYNTAX("31", "Matching Rule Use Description")
    SYNTAX("35", "Name Form Description")
    SYNTAX("37", "Object Class Description")
    SYNTAX("38", "OID")
    SYNTAX("54", "LDAP Syntax Description")
    "( 1.3.77.0.2.8.1 DESC 'XAN Attribute Type Description' )"
    SYNTAX("6", "Bit String")
    SYNTAX("8", "Certificate")
    SYNTAX("9", "Certificate List")
    SYNTAX("10", "Certificate Pair")
    SYNTAX("11", "Country String")
    SYNTAX("14", "Delivery Method")
    SYNTAX("21", "Enhanced Guide")
    SYNTAX("22", "Facsimile Telephone Number")
    SYNTAX("23", "Fax")
    SYNTAX("25", "Guide")
    SYNTAX("28", "JPEG")
    SYNTAX("33", "MHS OR Address")
    SYNTAX("34", "Name And Optional UID")
    SYNTAX("36", "Numeric String")
    SYNTAX("39", "Other Mailbox")
    SYNTAX("40", "Octet String")
    SYNTAX("41", "Postal Address")
    SYNTAX("42", "Protocol Information")
    SYNTAX("43", "Presentation Address")
    SYNTAX("44", "Printable String")
    SYNTAX("49", "Supported Algorithm")
    SYNTAX("51", "Teletex Terminal Identifier")
    SYNTAX("52", "Telex Number")
    SYNTAX("58", "Substring Assertion")
    "} matchingRules {"
    RULE("2.5.13.0", "objectIdentifierMatch", "38")
    RULE("2.5.13.1", "distinguishedNameMatch", "12")
    RULE("2.5.13.2", "caseIgnoreMatch", "15")
    RULE("2.5.13.14", "integerMatch", "27")
    RULE("2.5.13.20", "telephoneNumberMatch", "50")
    RULE("2.5.13.27", "generalizedTimeMatch", "24")
    RULE("1.3.6.1.4.1.1466.109.114.1", "caseExactIA5Match", "26")
    RULE("1.3.6.1.4.1.1466.109.114.2", "caseIgnoreIA5Match", "26")
    RULE("2.5.13.28", "generalizedTimeOrderingMatch", "24")
    RULE("2.5.13.3", "caseIgnoreOrderingMatch", "15")
    RULE("2.5.13.29", "integerFirstComponentMatch", "27")
    RULE("2.5.13.30", "objectIdentifierFirstComponentMatch", "38")
    RULE("2.5.13.6", "caseExactOrderingMatch", "15")
    RULE("2.5.13.7", "caseExactSubstringsMatch", "58")
    RULE("2.5.13.4", "caseIgnoreSubstringsMatch", "58")
    RULE("1.3.77.0.2.4.405", "distinguishedNameOrderingMatch", "12")
    RULE("2.5.13.21", "telephoneNumberSubstringsMatch", "58")
    RULE("2.5.13.5", "caseExactMatch", "15")
    RULE("1.3.6.1.4.1.1466.109.114.3", "caseIgnoreIA5SubstringsMatch", "58")
    RULE("2.5.13.8", "numericStringMatch", "36")
    RULE("2.5.13.9", "numericStringOrderingMatch", "36")
    RULE("2.5.13.10", "numericStringSubstringsMatch", "58")
    RULE("2.5.13.11", "caseIgnoreListMatch", "41")
    RULE("2.5.13.12", "caseIgnoreListSubstringsMatch", "58")
    RULE("2.5.13.13", "booleanMatch", "7")
    RULE("2.5.13.15", "integerOrderingMatch", "27")
    RULE("2.5.13.16", "bitStringMatch", "6")
    RULE("2.5.13.18", "octetStringOrderingMatch", "40")
    RULE("2.5.13.22", "presentationAddressMatch", "43")
    RULE("2.5.13.23", "uniqueMemberMatch", "34")
    RULE("2.5.13.24", "protocolInformationMatch", "42")
    "}";
// clang-format on

#undef SYNTAX
#undef RULE

const ldcf_schema& required_schema()
{
    struct built_in {
        ldcf_schema schema;
        built_in()
        {
            schema.parse_str(required_definitions, "");
            schema.complete_nocheck();
        }
    };
    static const built_in required;
    return required.schema;
}

// Kinds whose standard form leaves out what they inherit.
template <typename T>
bool inherits(const T&)
{
    return false;
}
bool inherits(const ldcf_attrtype& attribute)
{
    return attribute->v3_inherited();
}
bool inherits(const ldcf_objclass& objclass)
{
    return objclass->v3_inherited();
}

csgl_string parameter(const csgl_string& text)
{
    return ldcf_join("[p[", text, "]p]");
}

[[noreturn]] void throw_differs(const csgl_string& text, int message_id)
{
    throw exc_invalid_state_t(__FILE__, __LINE__, text.c_str(), message_id);
}

template <typename T>
void match_one(const char* kind, const T& required, const T& found)
{
    const csgl_string about = ldcf_join("[p[", kind, "]p] ", ldcf_quoted_parameter(required.name()));
    if (!found.v3_syntax_equal(required)) {
        if (inherits(required) || inherits(found)) {
            throw_differs(ldcf_join(" Error ", about, " must be provided as ", parameter(required.v3_string()),
                                    " with inherited properties or XAN extensions ",
                                    parameter(required.v3_string_inherited()), " was provided as ",
                                    parameter(found.v3_string()), " with inherited properties or XAN extensions ",
                                    parameter(found.v3_string_inherited())),
                          LDCF_MSG_REQUIRED_INHERITED_DIFFERS);
        }
        throw_differs(ldcf_join(" Error ", about, " must be provided as ", parameter(required.v3_string()),
                                " was provided as ", parameter(found.v3_string())),
                      LDCF_MSG_REQUIRED_DIFFERS);
    }
    if (!found.xan_syntax_equal(required)) {
        throw_differs(ldcf_join(" Error the XAN extension for ", about, " must be provided as ",
                                parameter(required.xan_string()), " was provided as ", parameter(found.xan_string())),
                      LDCF_MSG_REQUIRED_EXTENSION_DIFFERS);
    }
}

template <typename T>
void match(const char* kind, const ldcf_map_name_to<T>& required, const ldcf_map_name_to<T>& map)
{
    ldcf_for_each_definition(required, [&](const T& definition) {
        const T found = ldcf_find(map, definition.oid());
        if (!found) {
            const csgl_string text =
                ldcf_join(" Error [p[", kind, "]p] ", ldcf_quoted_parameter(definition.oid()),
                          " was not provided; must be provided as ", parameter(definition.v3_string()));
            throw exc_does_not_exist_t(__FILE__, __LINE__, text.c_str(), LDCF_MSG_REQUIRED_MISSING);
        }
        match_one(kind, definition, found);
    });
}

}  // namespace

void ldcf_schema::check() const
{
    const ldcf_schema& required = required_schema();
    match(LDCF_KIND_SYNTAX, required.syntaxes, syntaxes);
    match(LDCF_KIND_MATCHING_RULE, required.matching_rules, matching_rules);
    match(LDCF_KIND_ATTRIBUTE_TYPE, required.attribute_types, attribute_types);
    match(LDCF_KIND_OBJECT_CLASS, required.object_classes, object_classes);
}
