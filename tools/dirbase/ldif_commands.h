// The commands of the group `dirbase ldif`. Each writes its results to standard output and returns its exit status.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "tools/dirbase/ldif_entry.h"
#include "tools/dirbase/schema_commands.h"

namespace dirbase_tool {

struct ldif_check_call {
    std::string file;  // "-" is standard input, here and below
    check_options checks;
    std::string rejects;   // file that takes the refused entries; empty for none
    unsigned threads = 0;  // 0: ldif_threads of ldif_pool.h
};

// Checks every entry of an LDIF file as an addition would. Refused entries are findings.
int check_ldif(const common_options& common, const ldif_check_call& call);

enum class ldif_form { text, without_members, ber };

// Writes every entry of an LDIF file in a form of the server. Lines that can't be read are findings.
int print_ldif(const common_options& common, const std::string& file, ldif_form form);

// Prints the changes that turn the entries of one LDIF file into those of another. Differences are findings.
int diff_ldif(const common_options& common, const std::string& before, const std::string& after);

enum class search_scope { base, one, sub };

struct ldif_search_call {
    std::string file;
    std::optional<std::string> base;  // DN; without one all entries are searched
    search_scope scope = search_scope::sub;
    std::string filter;
    std::vector<std::string> attributes;  // what is printed of an entry; empty for all
    std::size_t limit = 0;                // the number of entries after which the search ends; 0 for none
    bool count_only = false;
    unsigned threads = 0;  // as in ldif_check_call
};

// Prints the entries of an LDIF file that a filter selects, in their order. That there is none is a finding.
int search_ldif(const common_options& common, const ldif_search_call& call);

// Loads the schema for commands that work on entries.
void load_for_entries(const common_options& common);

}  // namespace dirbase_tool
