// Object classes (RFC 4512, section 4.1.1). The shape is that of ldcf_syntax.h.
//
// Completion flattens the tree: a complete class knows all its ancestors and descendants and every attribute type that
// it requires or permits, its own and inherited alike, so that nobody else walks SUP. There is no extended definition:
// the extended text form says nothing beyond the oid.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_attrtype.h"

class ldcf_objclass;
class ldcf_objclass_;

enum class ldcf_objclass_kind : int {
    not_given = 0,  // only inside the parser
    structural = 1,
    abstract_ = 2,
    auxiliary = 3,
};

enum class ldcf_objclass_state : int {
    parsed = 0,       // texts only
    completing = 1,   // on the call chain of complete
    cycle_found = 2,  // met again while completing
    complete = 3,     // the sets are valid
};

// The most ancestors that a class may have. The flat sets grow with the square of a chain's length, so a schema with
// more would only serve to exhaust the server.
constexpr std::size_t ldcf_superclass_limit = 1000;

class DIRBASE_EXPORT ldcf_objclass : public csgl_refcounted_pointer_to<ldcf_objclass_> {
public:
    using csgl_refcounted_pointer_to::csgl_refcounted_pointer_to;

    // Reads one definition and enters it under its oid and every name. Raises the exceptions of the token layer, after
    // which the map is as it was; an oid or name that the map holds is exc_invalid_grammar_t, a second kind keyword
    // exc_invalid_input_t.
    static void parse_v3(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_objclass>& map);

    const csgl_string& oid() const;
    const csgl_string& name() const;
    const csgl_string& v3_string() const;
    const csgl_string& v3_string_inherited() const;
    const csgl_string& xan_string() const;
    void v3_file(const csgl_string& file);

    // The flat record, made when it is first asked for and owned by the class; null when memory ran out. Readers may
    // ask at the same time.
    objectclassinfo* info() const;

    ldcf_objclass clone() const;
    void replace(ldcf_objclass& other);

    // Points a copied class at the copies of its relatives and attribute types.
    void retarget(const ldcf_translation<ldcf_objclass>& classes, const ldcf_translation<ldcf_attrtype>& attributes);

    // Compares complete classes by what they are called, their kind and their attribute sets; SUP and DESC don't count.
    bool v3_syntax_equal(const ldcf_objclass& other) const;
    bool xan_syntax_equal(const ldcf_objclass& other) const;
};

class DIRBASE_EXPORT ldcf_objclass_ : public csgl_refcounted<ldcf_objclass_> {
public:
    explicit ldcf_objclass_(const csgl_string& oid) : oid_(oid) {}

    const csgl_string& oid() const { return oid_; }
    const ldcf_names& names() const { return names_; }
    const csgl_string& name() const { return primary_name_; }
    const csgl_string& description() const { return description_; }
    bool obsolete() const { return obsolete_; }
    const ldcf_names& sup() const { return sup_; }
    ldcf_objclass_kind kind() const { return kind_; }
    const ldcf_names& must() const { return must_; }
    const ldcf_names& may() const { return may_; }
    const csgl_set<ldcf_objclass>& superclasses() const { return superclasses_; }
    const csgl_set<ldcf_objclass>& subclasses() const { return subclasses_; }
    const csgl_set<ldcf_attrtype>& complete_must() const { return complete_must_; }
    const csgl_set<ldcf_attrtype>& complete_may() const { return complete_may_; }
    ldcf_objclass_state state() const { return state_; }
    const csgl_string& v3_file() const { return v3_file_; }

    const csgl_string& v3_string() const;
    const csgl_string& v3_string_inherited() const;
    const csgl_string& xan_string() const;

    // True when the inherited form has something to say.
    bool v3_inherited() const;

    // Links the class, after its superclasses, to all that it refers to. Raises exc_invalid_input_t for what is
    // missing, for a cycle and for more than ldcf_superclass_limit ancestors; the classes on the chain then stay
    // unfinished, and incomplete must run on all before another try (else exc_invalid_state_t).
    void complete(const ldcf_map_name_to<ldcf_objclass>& classes, const ldcf_map_name_to<ldcf_attrtype>& attributes);

    // Drops what complete made.
    void incomplete();

    // Drops a subclass that is being erased.
    void forget_subclass(const ldcf_objclass& subclass) { subclasses_.erase(subclass); }

private:
    friend class ldcf_objclass;
    class completion;

    DIRBASE_HIDDEN void read_keyword(ldcf_token_factory& factory, const ldcf_token& token);
    DIRBASE_HIDDEN void set_kind(ldcf_objclass_kind kind);
    DIRBASE_HIDDEN void resolve(const ldcf_map_name_to<ldcf_objclass>& classes,
                                const ldcf_map_name_to<ldcf_attrtype>& attributes);
    DIRBASE_HIDDEN void absorb(const ldcf_objclass& superclass);
    DIRBASE_HIDDEN void finish();

    ldcf_lazy_record<objectclassinfo, ldcf_rdbm::delete_objectclassinfo> info_;
    csgl_string v3_file_;
    ldcf_text_cache v3_string_;
    ldcf_reader_flag inherited_asked_;
    ldcf_text_cache v3_string_inherited_;
    ldcf_text_cache xan_string_;
    csgl_string oid_;
    ldcf_names names_;
    csgl_string primary_name_;
    csgl_string description_;
    bool obsolete_ = false;
    ldcf_names sup_;
    ldcf_objclass_kind kind_ = ldcf_objclass_kind::not_given;
    ldcf_names must_;
    ldcf_names may_;
    csgl_set<ldcf_objclass> superclasses_;
    csgl_set<ldcf_objclass> subclasses_;
    csgl_set<ldcf_attrtype> complete_must_;
    csgl_set<ldcf_attrtype> complete_may_;
    ldcf_objclass_state state_ = ldcf_objclass_state::parsed;
};

inline const csgl_string& ldcf_objclass::oid() const
{
    return get()->oid();
}
inline const csgl_string& ldcf_objclass::name() const
{
    return get()->name();
}
inline const csgl_string& ldcf_objclass::v3_string() const
{
    return get()->v3_string();
}
inline const csgl_string& ldcf_objclass::v3_string_inherited() const
{
    return get()->v3_string_inherited();
}
inline const csgl_string& ldcf_objclass::xan_string() const
{
    return get()->xan_string();
}
inline objectclassinfo* ldcf_objclass::info() const
{
    return get()->info_.get([this] { return ldcf_rdbm::fill_classinfo(*this); });
}
inline void ldcf_objclass::v3_file(const csgl_string& file)
{
    get()->v3_file_ = file;
}
