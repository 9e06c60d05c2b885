// The sheets of syntaxes, matching rules and object classes; that of attribute types stands in describe_attribute.cpp.
#include "tools/dirbase/describe_definition.h"

#include <map>

namespace dirbase_tool {

const char* kind_word(ldcf_objclass_kind kind)
{
    switch (kind) {
    case ldcf_objclass_kind::abstract_: return "ABSTRACT";
    case ldcf_objclass_kind::auxiliary: return "AUXILIARY";
    case ldcf_objclass_kind::structural:
    case ldcf_objclass_kind::not_given: break;
    }
    return "STRUCTURAL";
}

namespace {

// A class and its superclasses, nearest first. The library's own sets have no order that means anything.
std::vector<ldcf_objclass> lineage_of(const ldcf_objclass& objclass, const ldcf_schema& schema)
{
    std::vector<ldcf_objclass> lineage = {objclass};
    csgl_set<ldcf_objclass> seen = {objclass};
    for (std::size_t at = 0; at < lineage.size(); ++at) {
        const ldcf_objclass current = lineage[at];
        for (const csgl_string& name : current->sup()) {
            const ldcf_objclass superclass = ldcf_find(schema.object_classes, name);
            if (seen.insert(superclass).second) {
                lineage.push_back(superclass);
            }
        }
    }
    return lineage;
}

// Where attributes come from: the classes of a lineage that list each one.
using attribute_origins = std::map<ldcf_attrtype, std::vector<std::string>>;

attribute_origins origins_of(const std::vector<ldcf_objclass>& lineage, const ldcf_schema& schema,
                             const ldcf_names& (ldcf_objclass_::*list)() const)
{
    attribute_origins origins;
    for (const ldcf_objclass& objclass : lineage) {
        csgl_set<ldcf_attrtype> counted;  // a list may name one attribute twice, by two of its names
        for (const csgl_string& name : ((*objclass).*list)()) {
            const ldcf_attrtype attribute = ldcf_find(schema.attribute_types, name);
            if (counted.insert(attribute).second) {
                origins[attribute].push_back(text_of(objclass.name()));
            }
        }
    }
    return origins;
}

void add_attributes(definition_sheet& sheet, const std::string& label, const std::string& key,
                    const csgl_set<ldcf_attrtype>& attributes, const attribute_origins& origins)
{
    std::map<csgl_string, ldcf_attrtype, csgl_str_ci_less> sorted;
    std::size_t width = 0;
    for (const ldcf_attrtype& attribute : attributes) {
        sorted[attribute.name()] = attribute;
        width = std::max<std::size_t>(width, attribute.name().length());
    }
    json members = json::array();
    for (const auto& [name, attribute] : sorted) {
        const std::vector<std::string>& classes = origins.at(attribute);
        std::string text = text_of(name);
        text.append(width - text.size() + 2, ' ').append(joined(classes));
        sheet.add_line(label, text);
        members.push_back({{"attribute", text_of(name)}, {"from", classes}});
    }
    if (sorted.empty()) {
        sheet.add_line(label, joined({}));
    }
    sheet.add_member(key, std::move(members));
}

}  // namespace

definition_sheet describe(const ldcf_syntax& syntax, const ldcf_schema& /*schema*/, const schema_directory& directory)
{
    definition_sheet sheet(LDCF_KIND_SYNTAX, text_of(syntax.name()));
    sheet.add("oid", "oid", text_of(syntax.oid()));
    sheet.add("description", "description", text_of(syntax->description()));
    sheet.add("file", "file", directory.name_of(text_of(syntax->v3_file())));
    sheet.add("definition", "definition", text_of(syntax.v3_string()));
    return sheet;
}

definition_sheet describe(const ldcf_matchrule& rule, const ldcf_schema& /*schema*/, const schema_directory& directory)
{
    definition_sheet sheet(LDCF_KIND_MATCHING_RULE, text_of(rule.name()));
    const std::string syntax = text_of(rule->syntax_oid());
    const std::string description = text_of(rule->syntax()->description());
    sheet.add("oid", "oid", text_of(rule.oid()));
    sheet.add("names", "names", names_of(rule));
    sheet.add("description", "description", text_of(rule->description()));
    sheet.add("obsolete", "obsolete", rule->obsolete());
    sheet.add("syntax", description.empty() ? syntax : syntax + " (" + description + ")", "syntax",
              {{"value", syntax}, {"description", description}});
    sheet.add("file", "file", directory.name_of(text_of(rule->v3_file())));
    sheet.add("definition", "definition", text_of(rule.v3_string()));
    return sheet;
}

definition_sheet describe(const ldcf_objclass& objclass, const ldcf_schema& schema, const schema_directory& directory)
{
    const std::vector<ldcf_objclass> lineage = lineage_of(objclass, schema);
    std::vector<std::string> superclasses;
    superclasses.reserve(lineage.size());
    for (const ldcf_objclass& superclass : lineage) {
        superclasses.push_back(text_of(superclass.name()));
    }
    superclasses.erase(superclasses.begin());

    definition_sheet sheet(LDCF_KIND_OBJECT_CLASS, text_of(objclass.name()));
    sheet.add("oid", "oid", text_of(objclass.oid()));
    sheet.add("names", "names", names_of(objclass));
    sheet.add("description", "description", text_of(objclass->description()));
    sheet.add("obsolete", "obsolete", objclass->obsolete());
    sheet.add("class kind", "classKind", std::string(kind_word(objclass->kind())));
    sheet.add("superclasses", "superclasses", superclasses);
    sheet.add("subclasses", "subclasses", sorted_names(objclass->subclasses()));
    add_attributes(sheet, "must", "must", objclass->complete_must(),
                   origins_of(lineage, schema, &ldcf_objclass_::must));
    add_attributes(sheet, "may", "may", objclass->complete_may(), origins_of(lineage, schema, &ldcf_objclass_::may));
    sheet.add("file", "file", directory.name_of(text_of(objclass->v3_file())));
    sheet.add("definition", "definition", text_of(objclass.v3_string()));
    return sheet;
}

}  // namespace dirbase_tool
