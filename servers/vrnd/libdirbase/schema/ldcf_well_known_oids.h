// OIDs of the syntaxes, and OIDs and names of the matching rules, that the server treats by name (RFC 4517, section 3.3
// and 4.2; a few older ones from RFC 2252 and RFC 2256).
#pragma once

#define LDCF_SYNTAX_ARC "1.3.6.1.4.1.1466.115.121.1."

constexpr const char* ldcf_syntax_attribute_type_description = LDCF_SYNTAX_ARC "3";
constexpr const char* ldcf_syntax_binary = LDCF_SYNTAX_ARC "5";
constexpr const char* ldcf_syntax_bit_string = LDCF_SYNTAX_ARC "6";
constexpr const char* ldcf_syntax_boolean = LDCF_SYNTAX_ARC "7";
constexpr const char* ldcf_syntax_certificate = LDCF_SYNTAX_ARC "8";
constexpr const char* ldcf_syntax_certificate_list = LDCF_SYNTAX_ARC "9";
constexpr const char* ldcf_syntax_certificate_pair = LDCF_SYNTAX_ARC "10";
constexpr const char* ldcf_syntax_country = LDCF_SYNTAX_ARC "11";
constexpr const char* ldcf_syntax_dn = LDCF_SYNTAX_ARC "12";
constexpr const char* ldcf_syntax_delivery_method = LDCF_SYNTAX_ARC "14";
constexpr const char* ldcf_syntax_dir = LDCF_SYNTAX_ARC "15";
constexpr const char* ldcf_syntax_content_rule_description = LDCF_SYNTAX_ARC "16";
constexpr const char* ldcf_syntax_structure_rule_description = LDCF_SYNTAX_ARC "17";
constexpr const char* ldcf_syntax_enhanced_guide = LDCF_SYNTAX_ARC "21";
constexpr const char* ldcf_syntax_facsimile = LDCF_SYNTAX_ARC "22";
constexpr const char* ldcf_syntax_fax = LDCF_SYNTAX_ARC "23";
constexpr const char* ldcf_syntax_generalized_time = LDCF_SYNTAX_ARC "24";
constexpr const char* ldcf_syntax_guide = LDCF_SYNTAX_ARC "25";
constexpr const char* ldcf_syntax_ia5 = LDCF_SYNTAX_ARC "26";
constexpr const char* ldcf_syntax_integer = LDCF_SYNTAX_ARC "27";
constexpr const char* ldcf_syntax_jpeg = LDCF_SYNTAX_ARC "28";
constexpr const char* ldcf_syntax_matching_rule_description = LDCF_SYNTAX_ARC "30";
constexpr const char* ldcf_syntax_matching_rule_use_description = LDCF_SYNTAX_ARC "31";
constexpr const char* ldcf_syntax_mhs_or_address = LDCF_SYNTAX_ARC "33";
constexpr const char* ldcf_syntax_name_and_optional_uid = LDCF_SYNTAX_ARC "34";
constexpr const char* ldcf_syntax_name_form_description = LDCF_SYNTAX_ARC "35";
constexpr const char* ldcf_syntax_numeric_string = LDCF_SYNTAX_ARC "36";
constexpr const char* ldcf_syntax_object_class_description = LDCF_SYNTAX_ARC "37";
constexpr const char* ldcf_syntax_oid = LDCF_SYNTAX_ARC "38";
constexpr const char* ldcf_syntax_other_mailbox = LDCF_SYNTAX_ARC "39";
constexpr const char* ldcf_syntax_octet_string = LDCF_SYNTAX_ARC "40";
constexpr const char* ldcf_syntax_postal_address = LDCF_SYNTAX_ARC "41";
constexpr const char* ldcf_syntax_protocol_information = LDCF_SYNTAX_ARC "42";
constexpr const char* ldcf_syntax_presentation_address = LDCF_SYNTAX_ARC "43";
constexpr const char* ldcf_syntax_printable = LDCF_SYNTAX_ARC "44";
constexpr const char* ldcf_syntax_supported_algorithm = LDCF_SYNTAX_ARC "49";
constexpr const char* ldcf_syntax_telephone = LDCF_SYNTAX_ARC "50";
constexpr const char* ldcf_syntax_teletex = LDCF_SYNTAX_ARC "51";
constexpr const char* ldcf_syntax_telex = LDCF_SYNTAX_ARC "52";
constexpr const char* ldcf_syntax_utc_time = LDCF_SYNTAX_ARC "53";
constexpr const char* ldcf_syntax_syntax_description = LDCF_SYNTAX_ARC "54";
constexpr const char* ldcf_syntax_substring_assertion = LDCF_SYNTAX_ARC "58";
constexpr const char* ldcf_syntax_extended_attribute_description = "1.3.77.0.2.8.1";

// A matching rule, which a definition may give by oid or by name.
struct ldcf_known_rule {
    const char* oid;
    const char* name;
};

constexpr ldcf_known_rule ldcf_rule_oid{"2.5.13.0", "objectIdentifierMatch"};
constexpr ldcf_known_rule ldcf_rule_dn{"2.5.13.1", "distinguishedNameMatch"};
constexpr ldcf_known_rule ldcf_rule_case_ignore{"2.5.13.2", "caseIgnoreMatch"};
constexpr ldcf_known_rule ldcf_rule_case_ignore_ordering{"2.5.13.3", "caseIgnoreOrderingMatch"};
constexpr ldcf_known_rule ldcf_rule_case_ignore_substrings{"2.5.13.4", "caseIgnoreSubstringsMatch"};
constexpr ldcf_known_rule ldcf_rule_case_exact{"2.5.13.5", "caseExactMatch"};
constexpr ldcf_known_rule ldcf_rule_case_exact_ordering{"2.5.13.6", "caseExactOrderingMatch"};
constexpr ldcf_known_rule ldcf_rule_case_exact_substrings{"2.5.13.7", "caseExactSubstringsMatch"};
constexpr ldcf_known_rule ldcf_rule_numeric_string{"2.5.13.8", "numericStringMatch"};
constexpr ldcf_known_rule ldcf_rule_numeric_string_ordering{"2.5.13.9", "numericStringOrderingMatch"};
constexpr ldcf_known_rule ldcf_rule_numeric_string_substrings{"2.5.13.10", "numericStringSubstringsMatch"};
constexpr ldcf_known_rule ldcf_rule_case_ignore_list{"2.5.13.11", "caseIgnoreListMatch"};
constexpr ldcf_known_rule ldcf_rule_case_ignore_list_substrings{"2.5.13.12", "caseIgnoreListSubstringsMatch"};
constexpr ldcf_known_rule ldcf_rule_boolean{"2.5.13.13", "booleanMatch"};
constexpr ldcf_known_rule ldcf_rule_integer{"2.5.13.14", "integerMatch"};
constexpr ldcf_known_rule ldcf_rule_integer_ordering{"2.5.13.15", "integerOrderingMatch"};
constexpr ldcf_known_rule ldcf_rule_bit_string{"2.5.13.16", "bitStringMatch"};
constexpr ldcf_known_rule ldcf_rule_octet_string{"2.5.13.17", "octetStringMatch"};
constexpr ldcf_known_rule ldcf_rule_octet_string_ordering{"2.5.13.18", "octetStringOrderingMatch"};
constexpr ldcf_known_rule ldcf_rule_telephone{"2.5.13.20", "telephoneNumberMatch"};
constexpr ldcf_known_rule ldcf_rule_telephone_substrings{"2.5.13.21", "telephoneNumberSubstringsMatch"};
constexpr ldcf_known_rule ldcf_rule_presentation_address{"2.5.13.22", "presentationAddressMatch"};
constexpr ldcf_known_rule ldcf_rule_unique_member{"2.5.13.23", "uniqueMemberMatch"};
constexpr ldcf_known_rule ldcf_rule_protocol_information{"2.5.13.24", "protocolInformationMatch"};
constexpr ldcf_known_rule ldcf_rule_utc_time{"2.5.13.25", "uTCTimeMatch"};
constexpr ldcf_known_rule ldcf_rule_generalized_time{"2.5.13.27", "generalizedTimeMatch"};
constexpr ldcf_known_rule ldcf_rule_generalized_time_ordering{"2.5.13.28", "generalizedTimeOrderingMatch"};
constexpr ldcf_known_rule ldcf_rule_integer_first{"2.5.13.29", "integerFirstComponentMatch"};
constexpr ldcf_known_rule ldcf_rule_oid_first{"2.5.13.30", "objectIdentifierFirstComponentMatch"};
constexpr ldcf_known_rule ldcf_rule_case_exact_ia5{"1.3.6.1.4.1.1466.109.114.1", "caseExactIA5Match"};
constexpr ldcf_known_rule ldcf_rule_case_ignore_ia5{"1.3.6.1.4.1.1466.109.114.2", "caseIgnoreIA5Match"};
constexpr ldcf_known_rule ldcf_rule_case_ignore_ia5_substrings{"1.3.6.1.4.1.1466.109.114.3",
                                                               "caseIgnoreIA5SubstringsMatch"};
constexpr ldcf_known_rule ldcf_rule_dn_ordering{"1.3.77.0.2.4.405", "distinguishedNameOrderingMatch"};
