// One entry of an LDIF file as text: its lines taken apart, and what is wrong with them (RFC 2849).
#pragma once

#include <deque>
#include <string>
#include <string_view>
#include <vector>

#include "tools/dirbase/ldif_faults.h"

struct asyntaxinfo;

namespace dirbase_tool {

struct ldif_entry_text;

// An attribute and a value. Behind the last byte of each stands a byte 0.
struct ldif_line {
    char* type;
    char* value;
    std::size_t length;  // of the value
    std::size_t line;    // where it begins, from 1
    asyntaxinfo* info;   // for whoever looks the type up; null at first
    bool spoilt;         // the value couldn't be read; it is empty
};

// The lines of one entry. The object is used for one entry after the other, and keeps its room.
class ldif_text {
public:
    enum class content {
        nothing,    // comments, and perhaps the version of LDIF
        entry,      // a DN and attributes, or what is meant to be that; perhaps with faults
        change,     // something else to be done than the addition of an entry: a fault, and no lines are given
        too_large,  // an entry beyond entry_limit: the same, but for the DN when it stands at the beginning
    };

    // Takes an entry apart. Lines in comments, the version, and what says that an entry is to be added are passed over;
    // folded lines are joined, Base64 is decoded and the files that URLs name are read.
    //
    //   faults  empty; takes what is wrong. A line that can't be read is left out.
    content parse(const ldif_entry_text& entry, ldif_fault_list& faults);

    // The line that the entry begins with, and its DN: null when there is none.
    std::size_t line() const { return line_; }
    const ldif_line* dn() const { return has_dn_ ? &dn_ : nullptr; }
    std::vector<ldif_line>& lines() { return lines_; }

private:
    content take_lines(std::string_view text, std::size_t number, ldif_fault_list& faults);
    bool join(std::string_view& text, std::size_t& number, std::string_view& joined, ldif_fault_list& faults);
    bool take_apart(std::string_view joined, std::size_t number, ldif_fault_list& faults);
    void read_file(ldif_line& line, ldif_fault_list& faults);
    bool is_about_text(const ldif_line& line, ldif_fault_list& faults);

    std::vector<char> room_;  // texts and values
    std::size_t used_ = 0;
    std::deque<std::string> files_;  // contents of files that URLs name
    std::size_t file_bytes_ = 0;     // of them all
    std::vector<ldif_line> lines_;
    ldif_line dn_ = {};
    bool has_dn_ = false;
    bool is_change_ = false;
    std::size_t line_ = 0;
};

// The lines that tell the faults of an entry.
//
//   source  what the file is called
//   result  what stands behind each fault
std::vector<std::string> lines_of(const ldif_fault_list& faults, const ldif_text& entry, const std::string& source,
                                  const std::string& result = "");

// The DN of an entry as it stands there; empty when there is none.
std::string dn_of(const ldif_text& entry);

// Adds a line of LDIF to a text, folded, the value in Base64 where it has to be.
void append_ldif_line(std::string& text, const char* type, std::string_view value);

}  // namespace dirbase_tool
