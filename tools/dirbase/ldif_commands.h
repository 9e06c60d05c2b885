// The commands of the group `dirbase ldif`. Each writes its results to standard output and returns its exit status.
#pragma once

#include <string>

#include "tools/dirbase/ldif_entry.h"
#include "tools/dirbase/schema_commands.h"

namespace dirbase_tool {

struct ldif_check_call {
    std::string file;  // "-" is standard input, here and below
    check_options checks;
    std::string rejects;   // file that takes the refused entries; empty for none
    unsigned threads = 0;  // 0: as many as there are processors, at most ldif_most_threads
};
constexpr unsigned ldif_most_threads = 8;

// Checks every entry of an LDIF file as an addition would. Refused entries are findings.
int check_ldif(const common_options& common, const ldif_check_call& call);

enum class ldif_form { text, without_members, ber };

// Writes every entry of an LDIF file in a form of the server. Lines that can't be read are findings.
int print_ldif(const common_options& common, const std::string& file, ldif_form form);

// Prints the changes that turn the entries of one LDIF file into those of another. Differences are findings.
int diff_ldif(const common_options& common, const std::string& before, const std::string& after);

// Loads the schema for commands that work on entries.
void load_for_entries(const common_options& common);

}  // namespace dirbase_tool
