// What may be wrong with an entry of an LDIF file: the kinds, their words, and how a fault is told.
#pragma once

#include <array>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "tools/dirbase/report.h"

namespace dirbase_tool {

// In the order in which a summary lists them: the text, the name, the values, the schema.
enum class ldif_fault_kind {
    no_colon,
    bad_type,
    bad_base64,
    bad_url,
    nul_byte,
    fold_at_start,
    bad_version,
    changetype,
    too_large,
    no_dn,
    second_dn,
    bad_dn,
    bad_option,
    bad_value,
    bad_dn_value,
    duplicate_value,
    undefined_attribute,
    single_valued,
    no_objectclass,
    undefined_class,
    no_structural,
    several_structural,
    missing_superior,
    missing_attribute,
    not_allowed,
    alias,
    referral,
    refused,
};
constexpr std::size_t ldif_fault_kinds = static_cast<std::size_t>(ldif_fault_kind::refused) + 1;

// The word by which --json and the summary call a kind, and what it means.
struct ldif_fault_words {
    const char* name;
    const char* meaning;
};
const ldif_fault_words& words_of(ldif_fault_kind kind);

// How many faults there were of each kind.
using ldif_fault_counts = std::array<std::size_t, ldif_fault_kinds>;

struct ldif_fault {
    ldif_fault_kind kind;
    std::size_t line;     // where it is, from 1
    std::string subject;  // the attribute or object class concerned; empty when there is none
    std::string reason;   // without the subject
};

// The faults of one entry. The first ones are kept and the rest is counted: nobody reads a thousand faults of what
// isn't LDIF at all.
class ldif_fault_list {
public:
    static constexpr std::size_t most_kept = 20;

    void add(ldif_fault_kind kind, std::size_t line, std::string_view subject, std::string_view reason);
    void clear();

    bool empty() const { return kept_.empty(); }
    const std::vector<ldif_fault>& kept() const { return kept_; }
    std::size_t left_out() const { return left_out_; }
    const ldif_fault_counts& counts() const { return counts_; }

private:
    std::vector<ldif_fault> kept_;
    std::size_t left_out_ = 0;
    ldif_fault_counts counts_ = {};
};

// A value as a message shows it: in quotes, and cut when it is long.
std::string quoted(std::string_view value);

// "and N more faults in this entry", of those that were counted only.
std::string words_for_left_out(const ldif_fault_list& faults);

// "REASON" or "SUBJECT: REASON".
std::string text_of(const ldif_fault& fault);

// "FILE:LINE: DN: SUBJECT: REASON", on one line; without the DN when the entry has none.
std::string line_of(const ldif_fault& fault, const std::string& source, const std::string& dn);

// DN, subject and reason are cut where line_of cuts: they may be as large as an entry, and there may be many of them.
json json_of(const ldif_fault& fault, const std::string& source, const std::string& dn);

}  // namespace dirbase_tool
