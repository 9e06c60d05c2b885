// Matching rules: how values are compared (RFC 4512, section 4.1.3). The shape is that of ldcf_syntax.h.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_syntax.h"

class DIRBASE_EXPORT ldcf_matchrule_ : public csgl_refcounted<ldcf_matchrule_> {
public:
    explicit ldcf_matchrule_(const csgl_string& oid) : oid_(oid) {}

    const csgl_string& oid() const { return oid_; }
    const ldcf_names& names() const { return names_; }
    const csgl_string& name() const { return primary_name_; }
    const csgl_string& description() const { return description_; }
    bool obsolete() const { return obsolete_; }
    const csgl_string& syntax_oid() const { return syntax_oid_; }
    const ldcf_syntax& syntax() const { return syntax_; }
    const csgl_string& v3_file() const { return v3_file_; }
    const csgl_string& xan_file() const { return xan_file_; }

    const csgl_string& v3_string() const;
    const csgl_string& v3_string_inherited() const;
    const csgl_string& xan_string() const;

    // Links the rule to its syntax; raises exc_invalid_input_t when the map lacks it.
    void complete(const ldcf_map_name_to<ldcf_syntax>& syntaxes);

    // Drops what complete found.
    void incomplete();

private:
    friend class ldcf_matchrule;

    csgl_string v3_file_;
    ldcf_text_cache v3_string_;
    ldcf_text_cache v3_string_inherited_;
    csgl_string oid_;
    ldcf_names names_;
    csgl_string primary_name_;
    csgl_string description_;
    bool obsolete_ = false;
    csgl_string syntax_oid_;
    csgl_string xan_file_;
    ldcf_text_cache xan_string_;
    ldcf_syntax syntax_;
};

class DIRBASE_EXPORT ldcf_matchrule : public csgl_refcounted_pointer_to<ldcf_matchrule_> {
public:
    using csgl_refcounted_pointer_to::csgl_refcounted_pointer_to;

    // Reads "( oid {NAME qdescrs | DESC qdstring | OBSOLETE | SYNTAX qnoid} )", the items in any order and the last of
    // a kind counting, and enters it under its oid and every name. Raises the exceptions of the token layer, after
    // which the map is as it was; an oid or name that the map holds and a missing SYNTAX are exc_invalid_grammar_t.
    static void parse_v3(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_matchrule>& map);

    const csgl_string& oid() const { return get()->oid(); }
    const csgl_string& name() const { return get()->name(); }
    const csgl_string& v3_string() const { return get()->v3_string(); }
    const csgl_string& v3_string_inherited() const { return get()->v3_string_inherited(); }
    const csgl_string& xan_string() const { return get()->xan_string(); }
    void v3_file(const csgl_string& file) { get()->v3_file_ = file; }
    void xan_file(const csgl_string& file) { get()->xan_file_ = file; }

    ldcf_matchrule clone() const;
    void replace(ldcf_matchrule& other);

    // Points a copied rule at the copy of its syntax.
    void retarget(const ldcf_translation<ldcf_syntax>& syntaxes);

    // Descriptions don't count.
    bool v3_syntax_equal(const ldcf_matchrule& other) const;
    bool xan_syntax_equal(const ldcf_matchrule& other) const;
};
