// The commands of the groups `dirbase dn` and `dirbase value`. Each writes its results to standard output, one a DN or
// value, and returns its exit status: status_findings when one was refused.
#pragma once

#include <string>
#include <vector>

#include "tools/dirbase/schema_commands.h"

namespace dirbase_tool {

enum class dn_question { normalize, check, parent };

// Asks one thing of every DN; "-" stands for those on standard input, one a line. With `light` the schema isn't used.
int ask_of_dns(const common_options& common, dn_question question, const std::vector<std::string>& dns, bool light);

// Tells whether two DNs are the same.
int compare_dns(const common_options& common, const std::string& first, const std::string& second, bool light);

// Prints the normal form of values of one syntax: the OID of a syntax, or the name of an attribute type whose values
// are meant.
int normalize_values(const common_options& common, const std::string& syntax, const std::vector<std::string>& values);

// Why a DN is refused, for one that dn_normalize_esc refuses: "34 invalidDNSyntax at byte 2: ...".
std::string refusal_of_dn(const std::string& dn);

// "34 invalidDNSyntax", for the results that the data model gives (RFC 4511, appendix A).
std::string result_words(int result);

}  // namespace dirbase_tool
