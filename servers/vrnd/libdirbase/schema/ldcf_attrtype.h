// Attribute types (RFC 4512, section 4.1.2), each with the server's own description of how it is stored and protected.
//
// A type has two texts that may come from two sources in any order: the standard definition and the extended one. They
// meet in one body through the oid. The shape is that of ldcf_syntax.h; besides, a type inherits from its supertype
// what it leaves out, and incomplete takes that away again.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_matchrule.h"
#include "servers/vrnd/libdirbase/schema/ldcf_rdbm.h"

class ldcf_attrtype;
struct ldcf_attrtype_;

// How far a type has come. Parsing into a type needs a state below `completing`.
enum class ldcf_attrtype_state : int {
    not_defined = 0,        // the parser is at work
    v3_defined = 1,         // the standard definition was parsed
    xan_defined = 2,        // the extended definition was parsed
    both_defined = 3,       // both were; also the state after incomplete
    completing = 4,         // complete is at work on this type or on one of its supertypes
    cycle_found = 5,        // a chain of supertypes came back to this type
    complete = 6,           // resolved
    db_names_complete = 7,  // table and column are known
};

enum class ldcf_usage : int {
    user_applications = 0,
    directory_operation = 1,
    distributed_operation = 2,
    dsa_operation = 3,
};

enum class ldcf_access_class : int {
    normal = 0,
    sensitive = 1,
    critical = 2,
    restricted = 3,
    system = 4,
    object = 5,
};

// How values are kept. The numbers are stored values; bit 0x80 marks a two-way method.
enum class ldcf_encryption : int {
    none = 1,
    ssha = 9,
    aes_256 = 133,
    aes_192 = 134,
    aes_128 = 135,
};

// How a protected value is given back.
enum class ldcf_return_value : int {
    cleartext = 0,
    encrypted = 1,
    type_only = 2,
};

// The five indexes that an extended definition may ask for, in the order of its text form.
enum ldcf_index : unsigned {
    ldcf_index_equality,
    ldcf_index_ordering,
    ldcf_index_substr,
    ldcf_index_approx,
    ldcf_index_reverse,
    ldcf_index_count,
};

// The number and the class of an attribute as the back ends know it: -1 and a class for most, a number of its own for
// the well-known ones (ldcf_well_known.cpp).
struct ldcf_attr_identity {
    int attr_id;
    int attr_class;
};

constexpr int ldcf_attr_class_configuration = 2;
constexpr int ldcf_attr_class_user = 9;

class DIRBASE_EXPORT ldcf_attrtype : public csgl_refcounted_pointer_to<ldcf_attrtype_> {
public:
    using csgl_refcounted_pointer_to::csgl_refcounted_pointer_to;

    // Reads one standard definition: a new type, the other half of a type whose extended definition was read before, or
    // an alternate definition of a type of the same source, which must agree with it in all but its names and adds
    // these (a type without a name takes the primary one). Raises the exceptions of the token layer and
    // exc_invalid_state_t for a type that is being completed or complete. A failure enters nothing in the map, but may
    // leave a type that was found there partly filled.
    static void parse_v3(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_attrtype>& map);

    // Reads one extended definition, which names its type by oid or by a name that is known already. Raises the
    // exceptions of the token layer, exc_invalid_grammar_t for a second extended definition of a type and
    // exc_invalid_state_t for a type that is being completed or complete. A failure may leave a type that was found
    // partly filled.
    static void parse_xan(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_attrtype>& map);

    // Reads the value of SYNTAX, as 1.2.3, 1.2.3{64} or either between quotes, into `attribute`. Raises the exceptions
    // of the token layer; the oid may have been set then.
    static void parse_attrtype_syntax(ldcf_attrtype* attribute, ldcf_token_factory& factory);

    // Puts the last token back and fails with the text of a bad SYNTAX.
    [[noreturn]] static void throw_syntax_error(ldcf_token_factory& factory);

    // True when one of a null-terminated array of standard definition texts is that of `attribute`, a name, a numeric
    // oid or "oid." and an oid. A text that can't be read is no match, with a message in the log; only oids and quoted
    // texts in front of NAME make one so. False for a null argument, and when memory ran out.
    static bool attributeTypesContainsAttr(char** definitions, char* attribute);

    const csgl_string& oid() const;
    const csgl_string& name() const;
    const csgl_string& v3_string() const;
    const csgl_string& v3_string_inherited() const;
    const csgl_string& xan_string() const;
    void v3_file(const csgl_string& file);
    void xan_file(const csgl_string& file);

    // The flat record, made when it is first asked for and owned by the type; null when it can't be made
    // (ldcf_rdbm::fill_asyntaxinfo). Readers may ask at the same time.
    asyntaxinfo* info() const;

    // Drops the record, so that it is made anew, and empties the name cache. Readers must be kept out.
    void reset_info() const;

    ldcf_attrtype clone() const;
    void replace(ldcf_attrtype& other);

    // Points a copied type at the copies of its syntax, supertype and subtypes. Its matching rules stay as they are.
    void retarget(const ldcf_translation<ldcf_attrtype>& attributes, const ldcf_translation<ldcf_matchrule>& rules,
                  const ldcf_translation<ldcf_syntax>& syntaxes);

    // Compares complete types; descriptions don't count. Of the extended definitions the oid, the names in the store
    // and the access class do.
    bool v3_syntax_equal(const ldcf_attrtype& other) const;
    bool xan_syntax_equal(const ldcf_attrtype& other) const;
};

struct DIRBASE_EXPORT ldcf_attrtype_ : public csgl_refcounted<ldcf_attrtype_> {
    explicit ldcf_attrtype_(const csgl_string& oid) : oid_(oid) {}

    // The standard definition.
    const csgl_string& oid() const { return oid_; }
    const ldcf_names& names() const { return names_; }
    const csgl_string& name() const { return primary_name_; }
    const csgl_string& description() const { return description_; }
    bool obsolete() const { return obsolete_; }
    const csgl_string& sup() const { return sup_; }
    const csgl_string& equality() const { return equality_; }
    const csgl_string& ordering() const { return ordering_; }
    const csgl_string& substr() const { return substr_; }
    const csgl_string& syntax_oid() const { return syntax_oid_; }
    int syntax_length() const { return syntax_length_; }
    bool single_value() const { return single_value_; }
    bool collective() const { return collective_; }
    bool user_modifiable() const { return user_modifiable_; }
    ldcf_usage usage() const { return usage_; }

    // The extended definition.
    bool has_extended() const { return has_extended_; }
    const csgl_vector<csgl_string>& db_names() const { return db_names_; }
    ldcf_access_class access_class() const { return access_class_; }
    int length() const { return length_; }
    bool has_index(ldcf_index index) const { return has_index_[index]; }
    int index_length(ldcf_index index) const { return index_length_[index]; }
    ldcf_encryption encryption() const { return encryption_; }
    bool secure_connection() const { return secure_connection_; }
    ldcf_return_value return_value() const { return return_value_; }
    bool non_matchable() const { return non_matchable_; }

    // What complete makes.
    const ldcf_matchrule& equality_rule() const { return equality_rule_; }
    const ldcf_matchrule& ordering_rule() const { return ordering_rule_; }
    const ldcf_matchrule& substr_rule() const { return substr_rule_; }
    const ldcf_syntax& syntax() const { return syntax_; }
    const ldcf_attrtype& supertype() const { return supertype_; }
    const csgl_set<ldcf_attrtype>& subtypes() const { return subtypes_; }
    bool equality_inherited() const { return equality_inherited_; }
    bool ordering_inherited() const { return ordering_inherited_; }
    bool substr_inherited() const { return substr_inherited_; }
    bool syntax_inherited() const { return syntax_inherited_; }
    int effective_length() const { return effective_length_; }
    bool may_be_encrypted() const { return may_be_encrypted_; }
    ldcf_attrtype_state state() const { return state_; }
    int attr_id() const { return identity_.attr_id; }
    int attr_class() const { return identity_.attr_class; }

    // What complete_db_names makes: the table and the column in the relational store.
    const csgl_string& table() const { return table_; }
    const csgl_string& column() const { return column_; }

    const csgl_string& v3_file() const { return v3_file_; }
    const csgl_string& xan_file() const { return xan_file_; }

    // The text forms, built once and kept: the standard definition as it was written, what a complete type inherits
    // beyond that, and the extended definition (empty when there is none).
    const csgl_string& v3_string() const;
    const csgl_string& v3_string_inherited() const;
    const csgl_string& xan_string() const;

    // The extended definition of any complete type, defaults filled in; a new text.
    csgl_string xan_string_with_default() const;

    // True when the inherited form has something to say.
    bool v3_inherited() const;

    // Links the type, after its supertypes, to what it refers to, and lets it inherit. Raises exc_invalid_input_t for
    // what is missing or doesn't fit; the type and those on its chain then stay in state `completing` or `cycle_found`,
    // and incomplete must run before another try (else exc_invalid_state_t).
    void complete(const ldcf_map_name_to<ldcf_attrtype>& attributes, const ldcf_map_name_to<ldcf_matchrule>& rules,
                  const ldcf_map_name_to<ldcf_syntax>& syntaxes);

    // Back to what the definitions say.
    void incomplete();

    // Works out table and column, once. Raises exc_invalid_input_t for a hyphen in a DBNAME.
    void complete_db_names();

    // Tells the message log when the matching rules don't suit the syntax or each other; LDAP_SUCCESS when they do,
    // else LDAP_INAPPROPRIATE_MATCHING.
    int check_match_rules() const;

    // Drops a subtype that is being erased.
    void forget_subtype(const ldcf_attrtype& subtype) { subtypes_.erase(subtype); }

private:
    friend class ldcf_attrtype;
    friend class ldcf_attrtype_parser;

    using attribute_map = ldcf_map_name_to<ldcf_attrtype>;
    using rule_map = ldcf_map_name_to<ldcf_matchrule>;
    using syntax_map = ldcf_map_name_to<ldcf_syntax>;

    bool is_complete() const
    {
        return state_ == ldcf_attrtype_state::complete || state_ == ldcf_attrtype_state::db_names_complete;
    }
    DIRBASE_HIDDEN ldcf_attrtype_* link_supertype(const attribute_map& attributes);
    DIRBASE_HIDDEN void begin_completion();
    DIRBASE_HIDDEN void finish_completion(const rule_map& rules, const syntax_map& syntaxes);
    DIRBASE_HIDDEN void inherit();
    DIRBASE_HIDDEN void resolve_syntax(const syntax_map& syntaxes);
    DIRBASE_HIDDEN ldcf_matchrule resolve_rule(const char* keyword, csgl_string& rule, const rule_map& rules) const;
    DIRBASE_HIDDEN void check_encryption();
    DIRBASE_HIDDEN void append_store_form(csgl_string& text) const;

    ldcf_lazy_record<asyntaxinfo, ldcf_rdbm::delete_asyntaxinfo> info_;
    csgl_string v3_file_;
    ldcf_text_cache v3_string_;
    ldcf_reader_flag inherited_asked_;
    ldcf_text_cache v3_string_inherited_;
    csgl_string oid_;
    ldcf_names names_;
    csgl_string primary_name_;
    csgl_string description_;
    bool obsolete_ = false;
    csgl_string sup_;
    csgl_string equality_;
    csgl_string ordering_;
    csgl_string substr_;
    csgl_string syntax_oid_;
    int syntax_length_ = 0;
    bool single_value_ = false;
    bool collective_ = false;
    bool user_modifiable_ = true;
    ldcf_usage usage_ = ldcf_usage::user_applications;
    csgl_string xan_file_;
    ldcf_text_cache xan_string_;
    csgl_vector<csgl_string> db_names_;
    ldcf_access_class access_class_ = ldcf_access_class::normal;
    int length_ = 0;
    bool has_index_[ldcf_index_count] = {};
    int index_length_[ldcf_index_count] = {};
    bool has_extended_ = false;
    ldcf_matchrule equality_rule_;
    ldcf_matchrule ordering_rule_;
    ldcf_matchrule substr_rule_;
    ldcf_syntax syntax_;
    ldcf_attrtype supertype_;
    csgl_set<ldcf_attrtype> subtypes_;
    bool equality_inherited_ = false;
    bool ordering_inherited_ = false;
    bool substr_inherited_ = false;
    bool syntax_inherited_ = false;
    int effective_length_ = 0;
    csgl_string table_;
    csgl_string column_;
    ldcf_attrtype_state state_ = ldcf_attrtype_state::not_defined;
    ldcf_attr_identity identity_ = {-1, ldcf_attr_class_user};
    ldcf_encryption encryption_ = ldcf_encryption::none;
    bool secure_connection_ = false;
    ldcf_return_value return_value_ = ldcf_return_value::cleartext;
    bool non_matchable_ = false;
    bool may_be_encrypted_ = true;
};

inline const csgl_string& ldcf_attrtype::oid() const
{
    return get()->oid();
}
inline const csgl_string& ldcf_attrtype::name() const
{
    return get()->name();
}
inline const csgl_string& ldcf_attrtype::v3_string() const
{
    return get()->v3_string();
}
inline const csgl_string& ldcf_attrtype::v3_string_inherited() const
{
    return get()->v3_string_inherited();
}
inline const csgl_string& ldcf_attrtype::xan_string() const
{
    return get()->xan_string();
}
inline asyntaxinfo* ldcf_attrtype::info() const
{
    return get()->info_.get([this] { return ldcf_rdbm::fill_asyntaxinfo(*this); });
}
inline void ldcf_attrtype::reset_info() const
{
    get()->info_.reset();
}
inline void ldcf_attrtype::xan_file(const csgl_string& file)
{
    get()->xan_file_ = file;
}

// True when two sets hold types of the same primary names.
DIRBASE_EXPORT bool ldcf_attrtype_set_equal(const csgl_set<ldcf_attrtype>& a, const csgl_set<ldcf_attrtype>& b);

// The oid of the type with a name, owned by the type; null when the map lacks the name.
DIRBASE_EXPORT const char* ldcf_attrtype_get_oid(const ldcf_map_name_to<ldcf_attrtype>& map, const char* name);

// Number and class of a type with this home file, primary name and usage.
DIRBASE_EXPORT ldcf_attr_identity ldcf_identify_attribute(const csgl_string& v3_file, const csgl_string& name,
                                                          ldcf_usage usage);

extern "C" {

// See ldcf_attrtype::attributeTypesContainsAttr.
DIRBASE_EXPORT bool attributeTypesContainsAttr(char** definitions, char* attribute);

}  // extern "C"
