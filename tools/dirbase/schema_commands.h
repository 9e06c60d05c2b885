// The commands of the group `dirbase schema`. Each writes its result to standard output and returns its exit status;
// what goes wrong is raised as tool_failure or an exception of the library.
#pragma once

#include <string>
#include <vector>

#include "tools/dirbase/report.h"

namespace dirbase_tool {

struct common_options {
    std::string schema_folder;  // empty: the environment's, or the schema that came with the tool
    bool as_json = false;
    int verbosity = 0;
};

// Loads the schema and the files after it, and counts what is there.
int check_schema(const common_options& common, const std::vector<std::string>& files, message_collector& log);

// Which text of a definition is printed.
enum class print_form {
    whole,        // the standard definitions and, for attribute types that have one, the extended definition besides
    v3,           // the standard definition alone
    xan,          // the extended definition
    xan_default,  // the extended definition of any attribute type, defaults filled in
    inherited,    // what the standard definition leaves out
};

enum class print_kind { all, syntaxes, matching_rules, attribute_types, object_classes };

// Prints definitions, a line each.
int print_schema(const common_options& common, print_form form, print_kind kind);

// Explains every definition that one of the names or oids leads to.
int show_definitions(const common_options& common, const std::vector<std::string>& names);

// The words of the properties that list_attributes knows.
std::vector<std::string> list_words();

// Prints the attribute types that have a property, by primary name, a line each.
int list_attributes(const common_options& common, const std::string& word);

// Tells how the schema in one directory differs from that in another. Differences are findings.
int diff_schemas(const common_options& common, const std::string& before, const std::string& after);

// Adds, deletes or replaces (`operation`) the one definition that a file holds.
int modify_schema(const common_options& common, const std::string& operation, const std::string& file,
                  message_collector& log);

}  // namespace dirbase_tool
