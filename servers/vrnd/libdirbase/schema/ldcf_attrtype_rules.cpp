// Which matching rules suit which syntax: a table of families, and a rule of its own for texts, whose rules must agree
// about case.
#include <algorithm>
#include <iterator>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/schema/ldcf_attrtype.h"
#include "servers/vrnd/libdirbase/schema/ldcf_well_known_oids.h"

namespace {

constexpr int rules_unsuitable = 18;  // LDAP inappropriate matching

constexpr int list_limit = 15;

// A short list of constants, ended by null.
using oid_list = const char* const[list_limit];
struct rule_list {
    const ldcf_known_rule* rules[8];
};

constexpr oid_list text_syntaxes = {
    ldcf_syntax_dir,
    ldcf_syntax_ia5,
    ldcf_syntax_mhs_or_address,
    ldcf_syntax_other_mailbox,
    ldcf_syntax_postal_address,
    ldcf_syntax_protocol_information,
    ldcf_syntax_presentation_address,
    ldcf_syntax_printable,
    ldcf_syntax_delivery_method,
    ldcf_syntax_enhanced_guide,
    ldcf_syntax_guide,
    ldcf_syntax_teletex,
    ldcf_syntax_supported_algorithm,
    ldcf_syntax_substring_assertion,
};

// A family of syntaxes, and what each rule may be when it is given at all.
struct family {
    oid_list syntaxes;
    rule_list equality;
    rule_list substr;
    rule_list ordering;
};

constexpr family families[] = {
    // Names
    {{ldcf_syntax_dn, ldcf_syntax_name_and_optional_uid},
     {{&ldcf_rule_dn, &ldcf_rule_unique_member}},
     {{}},
     {{&ldcf_rule_dn_ordering}}},
    // Times, booleans, integers
    {{ldcf_syntax_generalized_time}, {{&ldcf_rule_generalized_time}}, {{}}, {{&ldcf_rule_generalized_time_ordering}}},
    {{ldcf_syntax_boolean}, {{&ldcf_rule_boolean}}, {{}}, {{}}},
    {{ldcf_syntax_integer}, {{&ldcf_rule_integer, &ldcf_rule_integer_first}}, {{}}, {{&ldcf_rule_integer_ordering}}},
    // Binary values
    {{ldcf_syntax_binary, ldcf_syntax_certificate, ldcf_syntax_certificate_list, ldcf_syntax_certificate_pair,
      ldcf_syntax_octet_string, ldcf_syntax_fax, ldcf_syntax_jpeg},
     {{&ldcf_rule_octet_string, &ldcf_rule_case_exact}},
     {{}},
     {{&ldcf_rule_octet_string_ordering, &ldcf_rule_case_exact}}},
    // Numbers to dial
    {{ldcf_syntax_telephone, ldcf_syntax_facsimile, ldcf_syntax_telex},
     {{&ldcf_rule_telephone}},
     {{&ldcf_rule_telephone_substrings}},
     {{}}},
    {{ldcf_syntax_utc_time}, {{&ldcf_rule_utc_time}}, {{}}, {{}}},
    // Descriptions of schema elements
    {{ldcf_syntax_oid, ldcf_syntax_object_class_description, ldcf_syntax_attribute_type_description,
      ldcf_syntax_content_rule_description, ldcf_syntax_matching_rule_description,
      ldcf_syntax_matching_rule_use_description, ldcf_syntax_name_form_description, ldcf_syntax_syntax_description},
     {{&ldcf_rule_oid, &ldcf_rule_oid_first}},
     {{}},
     {{}}},
    {{ldcf_syntax_structure_rule_description}, {{&ldcf_rule_integer_first}}, {{}}, {{}}},
    // Bits, countries, digits
    {{ldcf_syntax_bit_string}, {{&ldcf_rule_bit_string}}, {{}}, {{}}},
    {{ldcf_syntax_country}, {{}}, {{}}, {{}}},
    {{ldcf_syntax_numeric_string},
     {{&ldcf_rule_numeric_string}},
     {{&ldcf_rule_numeric_string_substrings}},
     {{&ldcf_rule_numeric_string_ordering}}},
};

constexpr rule_list exact_equality{{&ldcf_rule_case_exact, &ldcf_rule_case_exact_ia5}};
constexpr rule_list exact_substr{{&ldcf_rule_case_exact_substrings}};
constexpr rule_list exact_ordering{{&ldcf_rule_case_exact_ordering}};
constexpr rule_list ignoring_equality{{&ldcf_rule_case_ignore, &ldcf_rule_case_ignore_ia5, &ldcf_rule_case_ignore_list,
                                       &ldcf_rule_presentation_address, &ldcf_rule_protocol_information}};
constexpr rule_list ignoring_substr{
    {&ldcf_rule_case_ignore_substrings, &ldcf_rule_case_ignore_ia5_substrings, &ldcf_rule_case_ignore_list_substrings}};
constexpr rule_list ignoring_ordering{{&ldcf_rule_case_ignore_ordering}};

bool holds(const oid_list& list, const csgl_string& oid)
{
    return std::any_of(std::begin(list), std::end(list),
                       [&](const char* candidate) { return candidate != nullptr && oid == candidate; });
}

bool holds(const rule_list& list, const csgl_string& rule)
{
    return std::any_of(std::begin(list.rules), std::end(list.rules), [&](const ldcf_known_rule* candidate) {
        return candidate != nullptr && (rule == candidate->oid || rule == candidate->name);
    });
}

bool empty_or_in(const rule_list& list, const csgl_string& rule)
{
    return rule.empty() || holds(list, rule);
}

enum class verdict { suitable, invalid, inconsistent };

// What is wrong, and with which of the three rules.
struct finding {
    verdict result = verdict::suitable;
    const char* label = nullptr;
    const csgl_string* rule = nullptr;
};

constexpr char equality_label[] = "EQUALITY";
constexpr char substr_label[] = "SUBSTRING";
constexpr char ordering_label[] = "ORDERING";

finding check_family(const family& known, const csgl_string& equality, const csgl_string& substr,
                     const csgl_string& ordering)
{
    if (!empty_or_in(known.equality, equality)) {
        return {verdict::invalid, equality_label, &equality};
    }
    if (!empty_or_in(known.substr, substr)) {
        return {verdict::invalid, substr_label, &substr};
    }
    if (!empty_or_in(known.ordering, ordering)) {
        return {verdict::invalid, ordering_label, &ordering};
    }
    return {};
}

// True for a rule that some EQUALITY rule stands for, of the one case family or the other.
bool in_family(const csgl_string& rule, const rule_list& equality, const rule_list& substr, const rule_list& ordering)
{
    return holds(equality, rule) || holds(substr, rule) || holds(ordering, rule);
}

finding check_text(const csgl_string& equality, const csgl_string& substr, const csgl_string& ordering)
{
    if (equality.empty()) {
        return {};
    }
    const bool exact = holds(exact_equality, equality);
    if (!exact && !holds(ignoring_equality, equality)) {
        return {verdict::invalid, equality_label, &equality};
    }
    const auto unsuitable = [exact](const char* label, const csgl_string& rule) -> finding {
        const bool opposite = exact ? in_family(rule, ignoring_equality, ignoring_substr, ignoring_ordering)
                                    : in_family(rule, exact_equality, exact_substr, exact_ordering);
        return {opposite ? verdict::inconsistent : verdict::invalid, label, &rule};
    };
    if (!empty_or_in(exact ? exact_substr : ignoring_substr, substr)) {
        return unsuitable(substr_label, substr);
    }
    if (!empty_or_in(exact ? exact_ordering : ignoring_ordering, ordering)) {
        return unsuitable(ordering_label, ordering);
    }
    return {};
}

const family* find_family(const csgl_string& syntax_oid)
{
    for (const family& known : families) {
        if (holds(known.syntaxes, syntax_oid)) {
            return &known;
        }
    }
    return nullptr;
}

}  // namespace

int ldcf_attrtype_::check_match_rules() const
{
    if (equality_.empty() && ordering_.empty() && substr_.empty()) {
        return 0;
    }
    const bool text = holds(text_syntaxes, syntax_oid_);
    const family* known = text ? nullptr : find_family(syntax_oid_);
    const bool other = !text && known == nullptr;  // only EQUALITY is looked at, and the message log isn't told
    finding found;
    if (text) {
        found = check_text(equality_, substr_, ordering_);
    } else if (known != nullptr) {
        found = check_family(*known, equality_, substr_, ordering_);
    } else if (!equality_.empty()) {
        found = {verdict::invalid, equality_label, &equality_};
    }

    switch (found.result) {
    case verdict::suitable: return 0;
    case verdict::inconsistent:
        debug_trace(
            "Attribute:%s has inconsistent matching rules for case-sensitivity. EQUALITY:%s SUBSTR:%s ORDERING:%s "
            "for syntax:%s\n",
            primary_name_.c_str(), equality_.c_str(), substr_.c_str(), ordering_.c_str(), syntax_oid_.c_str());
        PrintMessage(MSG_COMPONENT_SCHEMA, MSG_WARNING, LDCF_MSG_RULE_INCONSISTENT, found.label, found.rule->c_str(),
                     primary_name_.c_str());
        break;
    case verdict::invalid:
        debug_trace(
            "Attribute:%s has one or more invalid matching rules EQUALITY:%s SUBSTR:%s ORDERING:%s for syntax:%s\n",
            primary_name_.c_str(), equality_.c_str(), substr_.c_str(), ordering_.c_str(), syntax_oid_.c_str());
        if (!other) {
            PrintMessage(MSG_COMPONENT_SCHEMA, MSG_WARNING, LDCF_MSG_RULE_INVALID, found.label, found.rule->c_str(),
                         primary_name_.c_str(), syntax_oid_.c_str());
        }
        break;
    }
    return rules_unsuitable;
}
