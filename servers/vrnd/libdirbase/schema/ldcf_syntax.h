// Syntaxes: what the values of an attribute look like (RFC 4512, section 4.1.5).
//
// The four kinds of definition share one shape: a handle over a counted body whose name ends in "_". Many maps and
// other definitions hold handles on one body, and a change made through one is seen by all. Definitions are built and
// changed by one thread, on a schema that no reader sees; a published definition is only read, by any number of
// threads.
//
// A definition is read from text (parse_v3), linked to what it refers to (complete), and served; incomplete unlinks it.
// Two text forms exist: the standard one, and the extended one that holds what the server adds.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_common.h"
#include "servers/vrnd/libdirbase/schema/ldcf_token.h"

class DIRBASE_EXPORT ldcf_syntax_ : public csgl_refcounted<ldcf_syntax_> {
public:
    explicit ldcf_syntax_(const csgl_string& oid) : oid_(oid) {}

    // A syntax has no names: the empty set stands where the other kinds have theirs.
    static const ldcf_names& names();

    const csgl_string& oid() const { return oid_; }
    const csgl_string& name() const { return oid_; }
    const csgl_string& description() const { return description_; }
    const csgl_string& v3_file() const { return v3_file_; }
    const csgl_string& xan_file() const { return xan_file_; }

    // The standard and the extended text form, and what the standard one leaves out; built once and kept.
    const csgl_string& v3_string() const;
    const csgl_string& v3_string_inherited() const;
    const csgl_string& xan_string() const;

private:
    friend class ldcf_syntax;

    csgl_string v3_file_;
    csgl_string xan_file_;
    ldcf_text_cache v3_string_;
    ldcf_text_cache v3_string_inherited_;
    ldcf_text_cache xan_string_;
    csgl_string oid_;
    csgl_string description_;
};

class DIRBASE_EXPORT ldcf_syntax : public csgl_refcounted_pointer_to<ldcf_syntax_> {
public:
    using csgl_refcounted_pointer_to::csgl_refcounted_pointer_to;

    // Reads "( oid [DESC qdstring] )" and enters it under its oid. Raises the exceptions of the token layer, after
    // which the map is as it was; an oid that the map holds is exc_invalid_grammar_t.
    static void parse_v3(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_syntax>& map);

    const csgl_string& oid() const { return get()->oid(); }
    const csgl_string& name() const { return get()->name(); }
    const csgl_string& v3_string() const { return get()->v3_string(); }
    const csgl_string& v3_string_inherited() const { return get()->v3_string_inherited(); }
    const csgl_string& xan_string() const { return get()->xan_string(); }
    void v3_file(const csgl_string& file) { get()->v3_file_ = file; }
    void xan_file(const csgl_string& file) { get()->xan_file_ = file; }

    // A new body with a copy of every field.
    ldcf_syntax clone() const;

    // Gives `other` this definition's files and then makes this body a copy of the other's, so that every handle on it
    // sees the new definition at once.
    void replace(ldcf_syntax& other);

    // True when two definitions say the same; descriptions don't count, so for syntaxes only the oid does.
    bool v3_syntax_equal(const ldcf_syntax& other) const;
    bool xan_syntax_equal(const ldcf_syntax& other) const;
};
