// The commands of the groups `dirbase dn` and `dirbase value`. Each writes its results to standard output, one a DN or
// value, and returns its exit status: status_findings when one was refused.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "tools/dirbase/report.h"
#include "tools/dirbase/schema_commands.h"

namespace dirbase_tool {

enum class dn_question { normalize, check, parent };

// Asks one thing of every DN; "-" stands for those on standard input, one a line. With `light`, and for the check, the
// schema isn't used.
int ask_of_dns(const common_options& common, dn_question question, const std::vector<std::string>& dns, bool light);

// Tells whether two DNs are the same.
int compare_dns(const common_options& common, const std::string& first, const std::string& second, bool light);

// Prints the normal form of values of one syntax: the OID of a syntax, or the name of an attribute type whose values
// are meant.
int normalize_values(const common_options& common, const std::string& syntax, const std::vector<std::string>& values);

// Why a DN or a value is refused: the result, what is wrong, and the offset of the byte where it is, if there is one
// place.
struct refusal_words {
    int result = 0;
    std::string words = {};
    std::ptrdiff_t offset = -1;

    // "34 invalidDNSyntax at byte 2: ..."
    std::string text() const;
    // "result", "name", and where they are known "offset" and "reason".
    json as_json() const;
};

// Why a DN is refused, for one that dn_normalize_esc refuses; as a text too.
refusal_words why_dn_is_refused(const std::string& dn);
std::string refusal_of_dn(const std::string& dn);

// What a value of a syntax (base/syntax_codes.h) has to be: "is no ...". Null for a syntax that takes any text, and for
// a DN, which has more to say.
const char* fault_of_syntax(std::uint32_t syntax);

// "invalidDNSyntax", and "34 invalidDNSyntax", for the results that the data model gives (RFC 4511, appendix A); for
// others the name is empty.
std::string result_name(int result);
std::string result_words(int result);

}  // namespace dirbase_tool
