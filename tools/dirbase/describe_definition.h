// A sheet for a definition of each kind, taken from a complete schema.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"
#include "tools/dirbase/definition_sheet.h"
#include "tools/dirbase/schema_directory.h"

namespace dirbase_tool {

definition_sheet describe(const ldcf_syntax& syntax, const ldcf_schema& schema, const schema_directory& directory);
definition_sheet describe(const ldcf_matchrule& rule, const ldcf_schema& schema, const schema_directory& directory);
definition_sheet describe(const ldcf_attrtype& attribute, const ldcf_schema& schema, const schema_directory& directory);
definition_sheet describe(const ldcf_objclass& objclass, const ldcf_schema& schema, const schema_directory& directory);

// ABSTRACT, STRUCTURAL or AUXILIARY.
const char* kind_word(ldcf_objclass_kind kind);

// The primary name, then the other names in their order.
template <typename T>
std::vector<std::string> names_of(const T& definition)
{
    std::vector<std::string> names;
    for (const csgl_string& name : definition->names()) {
        const bool primary = csgl_str_ci_compare(name, definition.name()) == 0;
        names.insert(primary ? names.begin() : names.end(), text_of(name));
    }
    return names;
}

// The primary names of some definitions, sorted.
template <typename Handles>
std::vector<std::string> sorted_names(const Handles& handles)
{
    ldcf_names sorted;
    for (const auto& handle : handles) {
        sorted.insert(handle.name());
    }
    std::vector<std::string> names;
    for (const csgl_string& name : sorted) {
        names.push_back(text_of(name));
    }
    return names;
}

}  // namespace dirbase_tool
