// Syntaxes: see ldcf_syntax.h.
#include "servers/vrnd/libdirbase/schema/ldcf_syntax.h"

#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"

const ldcf_names& ldcf_syntax_::names()
{
    static const ldcf_names none;
    return none;
}

const csgl_string& ldcf_syntax_::v3_string() const
{
    return v3_string_.get([this] {
        csgl_string text = ldcf_join("( ", oid_, " ");
        if (!description_.empty()) {
            text.append("DESC '").append(description_).append("' ");
        }
        return text.append(")");
    });
}

const csgl_string& ldcf_syntax_::v3_string_inherited() const
{
    return v3_string_inherited_.get([] { return csgl_string("( )"); });
}

const csgl_string& ldcf_syntax_::xan_string() const
{
    return xan_string_.get([this] { return ldcf_join("( ", oid_, " )"); });
}

void ldcf_syntax::parse_v3(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_syntax>& map)
{
    constexpr char expected[] = LDCF_EXPECTED_ONE_OF("'DESC' ')'");

    [[maybe_unused]] const ldcf_token opening(factory, LDCF_EXPECTED("'('"), token_left_paren, LDCF_MSG_EXPECTED);
    const csgl_string oid = ldcf_stream::oid(factory);
    if (map.count(oid) != 0) {
        factory.throw_exc(ldcf_join("duplicate definition of [p[" LDCF_KIND_SYNTAX "]p] ", ldcf_quoted_parameter(oid)),
                          LDCF_MSG_DUPLICATE);
    }
    ldcf_syntax syntax(new ldcf_syntax_(oid));
    syntax->v3_file_ = factory.file();

    const ldcf_token token(factory, expected, token_descr | token_right_paren, LDCF_MSG_EXPECTED_ONE_OF);
    if (token.is("DESC")) {
        syntax->description_ = ldcf_stream::qdstring(factory);
        [[maybe_unused]] const ldcf_token closing(factory, LDCF_EXPECTED("')'"), token_right_paren, LDCF_MSG_EXPECTED);
    } else if (!token[token_right_paren]) {
        factory.throw_exc(expected, LDCF_MSG_EXPECTED_ONE_OF);
    }
    map[oid] = syntax;
}

ldcf_syntax ldcf_syntax::clone() const
{
    return ldcf_syntax(new ldcf_syntax_(**this));
}

void ldcf_syntax::replace(ldcf_syntax& other)
{
    other->v3_file_ = get()->v3_file_;
    other->xan_file_ = get()->xan_file_;
    **this = *other;
}

bool ldcf_syntax::v3_syntax_equal(const ldcf_syntax& other) const
{
    return csgl_str_ci_compare(oid(), other.oid()) == 0;
}

bool ldcf_syntax::xan_syntax_equal(const ldcf_syntax& other) const
{
    return csgl_str_ci_compare(oid(), other.oid()) == 0;
}
