// Completion of attribute types: supertypes, inheritance, syntax and rules, encryption, lengths, names in the store.
#include <strings.h>

#include "servers/vrnd/libdirbase/schema/ldcf_attrtype.h"
#include "servers/vrnd/libdirbase/schema/ldcf_rdbm.h"
#include "servers/vrnd/libdirbase/schema/ldcf_well_known_oids.h"

namespace {

constexpr int attr_id_cn = -13;
constexpr int attr_id_objectclass = -6;
constexpr int attr_id_userpassword = 22;
constexpr int attr_id_secretkey = 23;

// Attributes of the change log, which the server reads without going through the store's protection.
constexpr const char* change_log_attributes[] = {
    "targetdn", "changetime", "changenumber", "changetype", "changes", "newrdn", "deleteoldrdn", "newsuperior",
};

constexpr const char* never_encrypted_syntaxes[] = {
    ldcf_syntax_dn,
    ldcf_syntax_boolean,
    ldcf_syntax_integer,
    ldcf_syntax_generalized_time,
    ldcf_syntax_utc_time,
    ldcf_syntax_country,
    ldcf_syntax_name_and_optional_uid,
};

struct default_length {
    const char* syntax_oid;
    int length;
};

constexpr default_length default_lengths[] = {
    {ldcf_syntax_telephone, 32}, {ldcf_syntax_binary, 0},  {ldcf_syntax_integer, 11},
    {ldcf_syntax_boolean, 5},    {ldcf_syntax_country, 2},
};
constexpr int length_of_other_syntaxes = 240;

int default_length_of(const csgl_string& syntax_oid)
{
    for (const default_length& known : default_lengths) {
        if (syntax_oid == known.syntax_oid) {
            return known.length;
        }
    }
    return length_of_other_syntaxes;
}

// Lets a reference share the text of the definition that it found, when it says the same to the letter: thousands of
// types name the same few rules and syntaxes.
void share_text(csgl_string& reference, const csgl_string& found)
{
    if (reference == found) {
        reference = found;
    }
}

const csgl_string& name_or_oid(const ldcf_attrtype_& attribute)
{
    return attribute.name().empty() ? attribute.oid() : attribute.name();
}

// The chain of supertypes came back to a type that is being completed. `chain` holds the types from the one asked for
// up to the last whose supertype closes the circle; the message names the circle from its far end.
[[noreturn]] void throw_cycle(const csgl_vector<ldcf_attrtype_*>& chain, const ldcf_attrtype_& met_twice)
{
    csgl_string text = ldcf_join(met_twice.name());
    for (auto link = chain.rbegin(); link != chain.rend(); ++link) {
        text.append(" <= ").append(name_or_oid(**link));
        if (*link == &met_twice) {
            LDCF_THROW_INPUT(("There is a cycle in the supertype specification: ", ldcf_quoted_parameter(text)),
                             LDCF_MSG_ATTRIBUTE_CYCLE);
        }
    }
    // Left behind by an earlier completion that failed: incomplete was due first.
    throw exc_invalid_state_t(__FILE__, __LINE__, "exc_invalid_state", 0);
}

}  // namespace

// Goes up the chain of supertypes in a loop, not by recursion, since a schema may hold a chain of any length; then
// finishes each type on the way back down.
void ldcf_attrtype_::complete(const attribute_map& attributes, const rule_map& rules, const syntax_map& syntaxes)
{
    csgl_vector<ldcf_attrtype_*> chain;
    for (ldcf_attrtype_* current = this; current != nullptr && !current->is_complete();) {
        if (current->primary_name_.empty()) {
            current->primary_name_ = current->oid_;
        }
        if (current->state_ == ldcf_attrtype_state::completing || current->state_ == ldcf_attrtype_state::cycle_found) {
            current->state_ = ldcf_attrtype_state::cycle_found;
            throw_cycle(chain, *current);
        }
        chain.push_back(current);
        current->begin_completion();
        current = current->link_supertype(attributes);
    }
    while (!chain.empty()) {
        chain.back()->finish_completion(rules, syntaxes);
        chain.pop_back();
    }
}

void ldcf_attrtype_::begin_completion()
{
    if (state_ == ldcf_attrtype_state::xan_defined) {
        LDCF_THROW_INPUT(("missing LDAPv3 spec for attribute [p[", oid_, "]p]"), LDCF_MSG_NO_STANDARD_DEFINITION);
    }
    state_ = ldcf_attrtype_state::completing;
    effective_length_ = length_ != 0 ? length_ : syntax_length_;
}

// Finds the supertype and enters this type among its subtypes; null without SUP.
ldcf_attrtype_* ldcf_attrtype_::link_supertype(const attribute_map& attributes)
{
    if (sup_.empty()) {
        return nullptr;
    }
    const ldcf_attrtype found = ldcf_find(attributes, sup_);
    if (!found) {
        LDCF_THROW_INPUT(("[p[SUP attribute type]p] ", ldcf_quoted_parameter(sup_),
                          " not found when processing [p[" LDCF_KIND_ATTRIBUTE_TYPE "]p] ",
                          ldcf_quoted_parameter(primary_name_)),
                         LDCF_MSG_NOT_FOUND);
    }
    share_text(sup_, found.name());
    supertype_ = found;
    found->subtypes_.insert(ldcf_attrtype(this));
    if (usage_ != found->usage_) {
        LDCF_THROW_INPUT(("[p[" LDCF_KIND_ATTRIBUTE_TYPE "]p] ", ldcf_quoted_parameter(primary_name_),
                          " and its supertype ", ldcf_quoted_parameter(name_or_oid(*found)), " have different usages"),
                         LDCF_MSG_USAGE_DIFFERS);
    }
    return found.get();
}

void ldcf_attrtype_::finish_completion(const rule_map& rules, const syntax_map& syntaxes)
{
    if (supertype_) {
        inherit();
    }
    check_match_rules();  // what it finds goes to the message log; the definition stands
    resolve_syntax(syntaxes);
    equality_rule_ = resolve_rule("EQUALITY", equality_, rules);
    ordering_rule_ = resolve_rule("ORDERING", ordering_, rules);
    substr_rule_ = resolve_rule("SUBSTR", substr_, rules);
    check_encryption();
    if (effective_length_ == 0) {
        effective_length_ = default_length_of(syntax_oid_);
    }
    v3_string_inherited_.clear();  // one asked for ahead of time
    state_ = ldcf_attrtype_state::complete;
}

void ldcf_attrtype_::inherit()
{
    const ldcf_attrtype_& from = *supertype_;
    const auto take = [](csgl_string& item, const csgl_string& inherited_item, bool& inherited) {
        if (item.empty() && !inherited_item.empty()) {
            item = inherited_item;
            inherited = true;
        }
    };
    take(equality_, from.equality_, equality_inherited_);
    take(ordering_, from.ordering_, ordering_inherited_);
    take(substr_, from.substr_, substr_inherited_);
    take(syntax_oid_, from.syntax_oid_, syntax_inherited_);
    if (effective_length_ == 0) {
        effective_length_ = from.effective_length_;
    }
}

void ldcf_attrtype_::resolve_syntax(const syntax_map& syntaxes)
{
    if (syntax_oid_.empty()) {
        LDCF_THROW_INPUT(("[p[" LDCF_KIND_ATTRIBUTE_TYPE "]p] ", ldcf_quoted_parameter(primary_name_), " (oid [p[",
                          oid_, "]p]) does not have a syntax"),
                         LDCF_MSG_NO_SYNTAX);
    }
    syntax_ = ldcf_find(syntaxes, syntax_oid_);
    if (!syntax_) {
        LDCF_THROW_INPUT(("[p[" LDCF_KIND_SYNTAX "]p] ", ldcf_quoted_parameter(syntax_oid_),
                          " not found when processing [p[" LDCF_KIND_ATTRIBUTE_TYPE "]p] ",
                          ldcf_quoted_parameter(primary_name_)),
                         LDCF_MSG_NOT_FOUND);
    }
    share_text(syntax_oid_, syntax_.oid());
}

ldcf_matchrule ldcf_attrtype_::resolve_rule(const char* keyword, csgl_string& rule, const rule_map& rules) const
{
    if (rule.empty()) {
        return {};
    }
    ldcf_matchrule found = ldcf_find(rules, rule);
    if (!found) {
        LDCF_THROW_INPUT(("[p[", keyword, " " LDCF_KIND_MATCHING_RULE "]p] ", ldcf_quoted_parameter(rule),
                          " not found when processing [p[" LDCF_KIND_ATTRIBUTE_TYPE "]p] ",
                          ldcf_quoted_parameter(primary_name_)),
                         LDCF_MSG_NOT_FOUND);
    }
    share_text(rule, found.name());
    return found;
}

// Values that the server itself compares, orders or shows must stay readable in the store.
void ldcf_attrtype_::check_encryption()
{
    may_be_encrypted_ = true;  // a completion before this one may have found otherwise
    const bool encrypted = encryption_ != ldcf_encryption::none;
    bool plain_syntax = false;
    for (const char* syntax_oid : never_encrypted_syntaxes) {
        plain_syntax = plain_syntax || syntax_oid_ == syntax_oid;
    }
    if (plain_syntax) {
        may_be_encrypted_ = false;
        if (encrypted) {
            LDCF_THROW_INPUT(("Attribute ", ldcf_quoted_parameter(primary_name_), " cannot be encypted.  Syntax ",
                              ldcf_quoted_parameter(syntax_oid_), " is not allowed to be encrypted."),
                             LDCF_MSG_ENCRYPTED_SYNTAX);
        }
    }

    bool special = attr_class() != ldcf_attr_class_user || attr_id() == attr_id_cn || attr_id() == attr_id_objectclass;
    for (const char* name : change_log_attributes) {
        special = special || strcasecmp(primary_name_, name) == 0;
    }
    if (special) {
        may_be_encrypted_ = false;
        if (encrypted) {
            LDCF_THROW_INPUT(("Attribute ", ldcf_quoted_parameter(primary_name_),
                              " cannot be encypted. Special attributes are not allowed to be encrypted."),
                             LDCF_MSG_ENCRYPTED_SPECIAL);
        }
    }

    if (attr_id() == attr_id_userpassword || attr_id() == attr_id_secretkey) {
        may_be_encrypted_ = false;
        if (encrypted) {
            LDCF_THROW_INPUT(
                ("Password attribute ", ldcf_quoted_parameter(primary_name_), " cannot be encypted in the schema."),
                LDCF_MSG_ENCRYPTED_PASSWORD);
        }
    }
}

void ldcf_attrtype_::incomplete()
{
    const auto give_back = [](csgl_string& item, bool& inherited) {
        if (inherited) {
            item = csgl_string();
            inherited = false;
        }
    };
    give_back(equality_, equality_inherited_);
    give_back(ordering_, ordering_inherited_);
    give_back(substr_, substr_inherited_);
    give_back(syntax_oid_, syntax_inherited_);
    if (csgl_string::compare(primary_name_, oid_) == 0) {
        primary_name_ = csgl_string();
    }
    subtypes_.clear();
    syntax_ = ldcf_syntax();
    equality_rule_ = ldcf_matchrule();
    ordering_rule_ = ldcf_matchrule();
    substr_rule_ = ldcf_matchrule();
    supertype_ = ldcf_attrtype();
    effective_length_ = 0;
    v3_string_inherited_.clear();
    inherited_asked_.clear();
    table_ = csgl_string();
    column_ = csgl_string();
    info_.reset();
    state_ = ldcf_attrtype_state::both_defined;
}

void ldcf_attrtype_::complete_db_names()
{
    if (state_ == ldcf_attrtype_state::db_names_complete) {
        return;
    }
    const char* kind = "table name";
    for (const csgl_string& name : db_names_) {
        if (name.find('-') >= 0) {
            LDCF_THROW_INPUT(
                ("Hyphen is not allowed in [p[", kind, "]p] ", ldcf_quoted_parameter(name), ". Replace it with '_'"),
                0);
        }
        kind = "column name";
    }
    const csgl_string& table_name = db_names_.empty() ? primary_name_ : db_names_.front();
    const csgl_string& column_name = db_names_.empty() ? primary_name_ : db_names_.back();
    column_ = ldcf_rdbm::normalize_column_name(column_name);
    table_ = ldcf_rdbm::normalize_table_name(table_name, static_cast<int>(access_class_),
                                             static_cast<int>(db_names_.size()));
    info_.reset();  // one asked for ahead of time has neither table nor column
    state_ = ldcf_attrtype_state::db_names_complete;
}
