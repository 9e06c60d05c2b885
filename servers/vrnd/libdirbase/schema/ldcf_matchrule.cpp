// Matching rules: see ldcf_matchrule.h.
#include "servers/vrnd/libdirbase/schema/ldcf_matchrule.h"

#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"

namespace {

constexpr char expected_keyword[] = LDCF_EXPECTED_ONE_OF("'NAME' 'DESC' 'OBSOLETE' 'SYNTAX' ')'");

}  // namespace

const csgl_string& ldcf_matchrule_::v3_string() const
{
    return v3_string_.get([this] {
        csgl_string text = ldcf_join("( ", oid_, " ");
        text.append(ldcf_stream::qdescrs("NAME", names_, primary_name_));
        if (!description_.empty()) {
            text.append("DESC '").append(description_).append("' ");
        }
        if (obsolete_) {
            text.append("OBSOLETE ");
        }
        return text.append("SYNTAX ").append(syntax_oid_).append(" )");
    });
}

const csgl_string& ldcf_matchrule_::v3_string_inherited() const
{
    return v3_string_inherited_.get([] { return csgl_string("( )"); });
}

const csgl_string& ldcf_matchrule_::xan_string() const
{
    return xan_string_.get([this] { return ldcf_join("( ", oid_, " )"); });
}

void ldcf_matchrule_::complete(const ldcf_map_name_to<ldcf_syntax>& syntaxes)
{
    if (primary_name_.empty()) {
        primary_name_ = oid_;
    }
    const ldcf_syntax found = ldcf_find(syntaxes, syntax_oid_);
    if (!found) {
        LDCF_THROW_INPUT(("[p[" LDCF_KIND_SYNTAX "]p] ", ldcf_quoted_parameter(syntax_oid_),
                          " not found when processing [p[" LDCF_KIND_MATCHING_RULE "]p] ",
                          ldcf_quoted_parameter(primary_name_)),
                         LDCF_MSG_NOT_FOUND);
    }
    syntax_ = found;
}

void ldcf_matchrule_::incomplete()
{
    syntax_ = ldcf_syntax();
}

void ldcf_matchrule::parse_v3(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_matchrule>& map)
{
    [[maybe_unused]] const ldcf_token opening(factory, LDCF_EXPECTED("'('"), token_left_paren, LDCF_MSG_EXPECTED);
    const csgl_string oid = ldcf_stream::oid(factory);
    if (map.count(oid) != 0) {
        factory.throw_exc(
            ldcf_join("duplicate definition of [p[" LDCF_KIND_MATCHING_RULE "]p] ", ldcf_quoted_parameter(oid)),
            LDCF_MSG_DUPLICATE);
    }
    ldcf_matchrule rule(new ldcf_matchrule_(oid));
    rule->v3_file_ = factory.file();

    for (ldcf_token token(factory, expected_keyword, token_descr | token_right_paren, LDCF_MSG_EXPECTED_ONE_OF);
         !token[token_right_paren];
         token.assign(factory, expected_keyword, token_descr | token_right_paren, LDCF_MSG_EXPECTED_ONE_OF)) {
        if (token.is("NAME")) {
            rule->names_ = ldcf_stream::qdescrs(factory, rule->primary_name_);
        } else if (token.is("DESC")) {
            rule->description_ = ldcf_stream::qdstring(factory);
        } else if (token.is("OBSOLETE")) {
            rule->obsolete_ = true;
        } else if (token.is("SYNTAX")) {
            rule->syntax_oid_ = ldcf_stream::qnoid(factory);
        } else {
            factory.throw_exc(expected_keyword, LDCF_MSG_EXPECTED_ONE_OF);
        }
    }
    if (rule->syntax_oid_.empty()) {
        factory.throw_exc(ldcf_join("[p[" LDCF_KIND_MATCHING_RULE "]p] ", ldcf_quoted_parameter(rule->primary_name_),
                                    " must have a syntax."),
                          LDCF_MSG_RULE_WITHOUT_SYNTAX);
    }
    if (rule->primary_name_.empty()) {
        rule->primary_name_ = oid;
    }
    for (const csgl_string& name : rule->names_) {
        if (map.count(name) != 0) {
            factory.throw_exc(ldcf_join("[p[" LDCF_KIND_MATCHING_RULE "]p] ", ldcf_quoted_parameter(name),
                                        " has already been defined"),
                              LDCF_MSG_ALREADY_DEFINED);
        }
    }
    ldcf_enter(map, oid, rule->names_, rule);
}

ldcf_matchrule ldcf_matchrule::clone() const
{
    return ldcf_matchrule(new ldcf_matchrule_(**this));
}

void ldcf_matchrule::replace(ldcf_matchrule& other)
{
    other->v3_file_ = get()->v3_file_;
    other->xan_file_ = get()->xan_file_;
    **this = *other;
}

void ldcf_matchrule::retarget(const ldcf_translation<ldcf_syntax>& syntaxes)
{
    get()->syntax_ = ldcf_translate(syntaxes, get()->syntax_);
}

bool ldcf_matchrule::v3_syntax_equal(const ldcf_matchrule& other) const
{
    const ldcf_matchrule_& a = **this;
    const ldcf_matchrule_& b = *other;
    return csgl_str_ci_compare(a.oid_, b.oid_) == 0 && csgl_str_ci_compare(a.primary_name_, b.primary_name_) == 0 &&
           ldcf_names_equal(a.names_, b.names_) && a.obsolete_ == b.obsolete_ &&
           csgl_str_ci_compare(a.syntax_oid_, b.syntax_oid_) == 0;
}

bool ldcf_matchrule::xan_syntax_equal(const ldcf_matchrule& other) const
{
    return csgl_str_ci_compare(oid(), other.oid()) == 0;
}
