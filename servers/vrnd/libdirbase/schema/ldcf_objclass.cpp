// Object classes: parsing, text forms, comparison and copies. Completion stands in ldcf_objclass_complete.cpp.
#include "servers/vrnd/libdirbase/schema/ldcf_objclass.h"

#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"

// Two blanks behind 'SUP': the text has always been so, and message catalogues may match it.
#define OBJCLASS_KEYWORDS "'NAME' 'DESC' 'OBSOLETE' 'SUP'  'ABSTRACT' 'STRUCTURAL' 'AUXILIARY' 'MUST' 'MAY'"

namespace {

constexpr char implied_superclass[] = "top";

[[noreturn]] void throw_duplicate(ldcf_token_factory& factory, const csgl_string& key)
{
    factory.throw_exc(
        ldcf_join("duplicate definition of [p[" LDCF_KIND_OBJECT_CLASS "]p] ", ldcf_quoted_parameter(key)),
        LDCF_MSG_DUPLICATE);
}

const char* kind_form(ldcf_objclass_kind kind)
{
    switch (kind) {
    case ldcf_objclass_kind::structural: return "STRUCTURAL ";
    case ldcf_objclass_kind::abstract_: return "ABSTRACT ";
    case ldcf_objclass_kind::auxiliary: return "AUXILIARY ";
    case ldcf_objclass_kind::not_given: break;
    }
    return "";
}

// The primary names of the types in a complete set that a class's own list doesn't hold.
ldcf_names beyond_own(const csgl_set<ldcf_attrtype>& complete, const ldcf_names& own)
{
    ldcf_names names;
    for (const ldcf_attrtype& attribute : complete) {
        names.insert(attribute.name());
    }
    for (const csgl_string& name : own) {
        names.erase(name);
    }
    return names;
}

}  // namespace

void ldcf_objclass_::set_kind(ldcf_objclass_kind kind)
{
    if (kind_ != ldcf_objclass_kind::not_given) {
        LDCF_THROW_INPUT((oid_, " has too many object class types.", "The type can be only one of the",
                          " [ABSTRACT|STRUCTURAL|AUXILIARY]"),
                         0);
    }
    kind_ = kind;
}

void ldcf_objclass_::read_keyword(ldcf_token_factory& factory, const ldcf_token& token)
{
    if (token.is("NAME")) {
        names_ = ldcf_stream::qdescrs(factory, primary_name_);
    } else if (token.is("DESC")) {
        description_ = ldcf_stream::qdstring(factory);
    } else if (token.is("OBSOLETE")) {
        obsolete_ = true;
    } else if (token.is("SUP")) {
        sup_ = ldcf_stream::oids(factory);
    } else if (token.is("ABSTRACT")) {
        set_kind(ldcf_objclass_kind::abstract_);
    } else if (token.is("STRUCTURAL")) {
        set_kind(ldcf_objclass_kind::structural);
    } else if (token.is("AUXILIARY")) {
        set_kind(ldcf_objclass_kind::auxiliary);
    } else if (token.is("MUST")) {
        must_ = ldcf_stream::oids(factory);
    } else if (token.is("MAY")) {
        may_ = ldcf_stream::oids(factory);
    } else {
        factory.throw_exc(LDCF_EXPECTED_ONE_OF(OBJCLASS_KEYWORDS), LDCF_MSG_EXPECTED_ONE_OF);
    }
}

void ldcf_objclass::parse_v3(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_objclass>& map)
{
    constexpr char with_end[] = LDCF_EXPECTED_ONE_OF(OBJCLASS_KEYWORDS " ')'");
    constexpr unsigned mask = token_descr | token_right_paren;

    [[maybe_unused]] const ldcf_token opening(factory, LDCF_EXPECTED("'('"), token_left_paren, LDCF_MSG_EXPECTED);
    const csgl_string oid = ldcf_stream::oid(factory);
    if (map.count(oid) != 0) {
        throw_duplicate(factory, oid);
    }
    const ldcf_objclass objclass(new ldcf_objclass_(oid));
    ldcf_objclass_& body = *objclass;
    body.v3_file_ = factory.file();
    for (ldcf_token token(factory, with_end, mask, LDCF_MSG_EXPECTED_ONE_OF); !token[token_right_paren];
         token.assign(factory, with_end, mask, LDCF_MSG_EXPECTED_ONE_OF)) {
        body.read_keyword(factory, token);
    }

    if (body.kind_ == ldcf_objclass_kind::not_given) {
        body.kind_ = ldcf_objclass_kind::structural;
    }
    if (body.kind_ == ldcf_objclass_kind::structural && body.sup_.empty()) {
        body.sup_.insert(implied_superclass);
    }
    if (body.primary_name_.empty()) {
        body.primary_name_ = oid;
    }
    for (const csgl_string& name : body.names_) {
        if (map.count(name) != 0) {
            throw_duplicate(factory, name);
        }
    }
    ldcf_enter(map, oid, body.names_, objclass);
}

const csgl_string& ldcf_objclass_::v3_string() const
{
    return v3_string_.get([this] {
        csgl_string text = ldcf_join("( ", oid_, " ");
        text.append(ldcf_stream::qdescrs("NAME", names_, primary_name_.empty() ? oid_ : primary_name_));
        if (!description_.empty()) {
            text.append("DESC '").append(description_).append("' ");
        }
        if (obsolete_) {
            text.append("OBSOLETE ");
        }
        text.append(ldcf_stream::oids("SUP", sup_)).append(kind_form(kind_));
        text.append(ldcf_stream::oids("MUST", must_)).append(ldcf_stream::oids("MAY", may_));
        return text.append(")");
    });
}

const csgl_string& ldcf_objclass_::v3_string_inherited() const
{
    return v3_string_inherited_.get([this] {
        csgl_string text("( ");
        text.append(ldcf_stream::oids("MUST", beyond_own(complete_must_, must_)));
        text.append(ldcf_stream::oids("MAY", beyond_own(complete_may_, may_)));
        return text.append(")");
    });
}

const csgl_string& ldcf_objclass_::xan_string() const
{
    return xan_string_.get([this] { return ldcf_join("( ", oid_, " )"); });
}

bool ldcf_objclass_::v3_inherited() const
{
    if (!inherited_asked_.raised()) {
        if (beyond_own(complete_must_, must_).empty() && beyond_own(complete_may_, may_).empty()) {
            return false;
        }
        inherited_asked_.raise();
    }
    return true;
}

ldcf_objclass ldcf_objclass::clone() const
{
    return ldcf_objclass(new ldcf_objclass_(**this));
}

void ldcf_objclass::replace(ldcf_objclass& other)
{
    other->v3_file_ = get()->v3_file_;
    **this = *other;
}

void ldcf_objclass::retarget(const ldcf_translation<ldcf_objclass>& classes,
                             const ldcf_translation<ldcf_attrtype>& attributes)
{
    ldcf_objclass_& body = **this;
    body.superclasses_ = ldcf_translate(classes, body.superclasses_);
    body.subclasses_ = ldcf_translate(classes, body.subclasses_);
    body.complete_must_ = ldcf_translate(attributes, body.complete_must_);
    body.complete_may_ = ldcf_translate(attributes, body.complete_may_);
}

bool ldcf_objclass::v3_syntax_equal(const ldcf_objclass& other) const
{
    const ldcf_objclass_& a = **this;
    const ldcf_objclass_& b = *other;
    return csgl_str_ci_compare(a.oid_, b.oid_) == 0 && csgl_str_ci_compare(a.primary_name_, b.primary_name_) == 0 &&
           ldcf_names_equal(a.names_, b.names_) && a.obsolete_ == b.obsolete_ && a.kind_ == b.kind_ &&
           ldcf_attrtype_set_equal(a.complete_must_, b.complete_must_) &&
           ldcf_attrtype_set_equal(a.complete_may_, b.complete_may_);
}

bool ldcf_objclass::xan_syntax_equal(const ldcf_objclass& other) const
{
    return csgl_str_ci_compare(oid(), other.oid()) == 0;
}
