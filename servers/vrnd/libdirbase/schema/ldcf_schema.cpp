// The schema container: reading, linking, copying. Single definitions go in and out in ldcf_schema_change.cpp, the way
// to disk is ldcf_schema_flush.cpp, the required definitions stand in ldcf_schema_check.cpp.
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

#include <cstring>

#include "servers/vrnd/libcsgl/csgl_file.h"

const char* const LDCF = "ldcf";
const char* const file_suffix = ".tmp";

namespace {

// The readers of the sections, by the keyword in front.
using section_reader = void (*)(ldcf_schema& schema, ldcf_token_factory& factory);
struct section {
    const char* keyword;
    section_reader read;
};

constexpr section sections[] = {
    {"ldapSyntaxes", [](ldcf_schema& s, ldcf_token_factory& f) { ldcf_syntax::parse_v3(f, s.syntaxes); }},
    {"matchingRules", [](ldcf_schema& s, ldcf_token_factory& f) { ldcf_matchrule::parse_v3(f, s.matching_rules); }},
    {"attributeTypes", [](ldcf_schema& s, ldcf_token_factory& f) { ldcf_attrtype::parse_v3(f, s.attribute_types); }},
    {"XANattributeTypes",
     [](ldcf_schema& s, ldcf_token_factory& f) { ldcf_attrtype::parse_xan(f, s.attribute_types); }},
    {"objectClasses", [](ldcf_schema& s, ldcf_token_factory& f) { ldcf_objclass::parse_v3(f, s.object_classes); }},
};

section_reader find_section(const ldcf_token& keyword)
{
    for (const section& known : sections) {
        if (keyword.is(known.keyword)) {
            return known.read;
        }
    }
    return nullptr;
}

// Clones every definition and enters the copies under all keys of the originals; gives the map from old to new.
template <typename T>
ldcf_translation<T> ldcf_schema_copy(ldcf_map_name_to<T>& to, const ldcf_map_name_to<T>& from)
{
    ldcf_translation<T> translation;
    ldcf_for_each_definition(from, [&](const T& definition) { translation[definition] = definition.clone(); });
    for (const auto& [key, definition] : from) {
        to.insert_or_assign(to.end(), key, ldcf_translate(translation, definition));
    }
    return translation;
}

}  // namespace

const char* ldcf_kind_of(const ldcf_syntax&)
{
    return LDCF_KIND_SYNTAX;
}
const char* ldcf_kind_of(const ldcf_matchrule&)
{
    return LDCF_KIND_MATCHING_RULE;
}
const char* ldcf_kind_of(const ldcf_attrtype&)
{
    return LDCF_KIND_ATTRIBUTE_TYPE;
}
const char* ldcf_kind_of(const ldcf_objclass&)
{
    return LDCF_KIND_OBJECT_CLASS;
}

ldcf_schema::~ldcf_schema()
{
    incomplete();
}

void ldcf_schema::parse(const char* file)
{
    csgl_file source(file, csgl_file_open_existing, csgl_file_read, csgl_file_deny_none);
    const unsigned size = source.size();
    csgl_local_array_of<char> text(std::size_t{size} + 1);
    char more = 0;  // of a file that grew, or whose size doesn't fit
    if (source.read(text.get(), size) < size || std::memchr(text.get(), '\0', size) != nullptr ||
        source.read(&more, sizeof more) != 0) {
        throw exc_end_of_input_t(__FILE__, __LINE__, "exc_end_of_input", 0);
    }
    text[size] = '\0';
    parse_str(text.get(), file);

    csgl_string name(file);
    files[name] = modified_indicator::flushed;
    current_file = name;
}

void ldcf_schema::parse_str(const char* text, const char* file)
{
    ldcf_token_factory factory(text, file);
    while (!factory.empty()) {
        ldcf_token token(factory);
        while (token[token_comment]) {
            token.assign(factory);
        }
        parse_section(factory, token);
    }
}

void ldcf_schema::parse_section(ldcf_token_factory& factory, const ldcf_token& keyword)
{
    const section_reader read = find_section(keyword);
    if (read == nullptr) {
        factory.throw_exc(
            LDCF_EXPECTED("'ldapSyntaxes' 'matchingRules' 'attributeTypes' 'XANattributeTypes' 'objectClasses'"),
            LDCF_MSG_EXPECTED_ONE_OF);
    }
    const ldcf_token opening(factory, LDCF_EXPECTED("':' '=' '{'"), token_colon | token_equals | token_left_brace,
                             LDCF_MSG_EXPECTED_ONE_OF);
    if (!opening[token_left_brace]) {
        read(*this, factory);
        return;
    }
    for (;;) {
        const ldcf_token token(factory, LDCF_EXPECTED("'('  '}'"), token_left_paren | token_right_brace,
                               LDCF_MSG_EXPECTED_ONE_OF);
        if (token[token_right_brace]) {
            return;
        }
        factory.return_token();
        read(*this, factory);
    }
}

void ldcf_schema::complete()
{
    complete_nocheck();
    check();
}

void ldcf_schema::complete_nocheck()
{
    ldcf_for_each_definition(matching_rules, [this](const ldcf_matchrule& rule) { rule->complete(syntaxes); });
    ldcf_for_each_definition(attribute_types, [this](const ldcf_attrtype& attribute) {
        attribute->complete(attribute_types, matching_rules, syntaxes);
    });
    ldcf_for_each_definition(
        object_classes, [this](const ldcf_objclass& objclass) { objclass->complete(object_classes, attribute_types); });
}

void ldcf_schema::incomplete() noexcept
{
    ldcf_for_each_definition(matching_rules, [](const ldcf_matchrule& rule) { rule->incomplete(); });
    ldcf_for_each_definition(attribute_types, [](const ldcf_attrtype& attribute) { attribute->incomplete(); });
    ldcf_for_each_definition(object_classes, [](const ldcf_objclass& objclass) { objclass->incomplete(); });
}

void ldcf_schema::complete_db_names()
{
    ldcf_for_each_definition(attribute_types, [](const ldcf_attrtype& attribute) { attribute->complete_db_names(); });
}

ldcf_schema& ldcf_schema::copy(const ldcf_schema& from)
{
    files = from.files;
    current_file = from.current_file;

    const auto syntax_translation = ldcf_schema_copy(syntaxes, from.syntaxes);
    const auto rule_translation = ldcf_schema_copy(matching_rules, from.matching_rules);
    for (const auto& pair : rule_translation) {
        ldcf_matchrule(pair.second).retarget(syntax_translation);
    }
    const auto attribute_translation = ldcf_schema_copy(attribute_types, from.attribute_types);
    for (const auto& pair : attribute_translation) {
        ldcf_attrtype(pair.second).retarget(attribute_translation, rule_translation, syntax_translation);
    }
    const auto class_translation = ldcf_schema_copy(object_classes, from.object_classes);
    for (const auto& pair : class_translation) {
        ldcf_objclass(pair.second).retarget(class_translation, attribute_translation);
    }
    return *this;
}

void ldcf_schema::clear() noexcept
{
    incomplete();
    object_classes.clear();
    attribute_types.clear();
    matching_rules.clear();
    syntaxes.clear();
    files.clear();
    current_file = csgl_string();
}
