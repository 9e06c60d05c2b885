// What a configuration file holds, and looking things up in it. Private to libcfg.
//
// Functions here raise std::bad_alloc when memory runs out; every other failure is a cfg_failure.
#pragma once

#include <cstddef>
#include <cstring>
#include <map>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "libraries/libber/ldap_result.h"

// A result code with what there is to say about it.
struct cfg_failure {
    int code = LDAP_SUCCESS;
    const char* reason = "";  // a literal
    std::size_t line = 0;     // of the file, from 1; 0 for none
    int system_error = 0;     // errno, or 0
};

// A text that may hold a password: its bytes are overwritten before they are released. Where it grows, what it leaves
// behind isn't, so those that read a file make room first.
class wiped_text : public std::string {
public:
    wiped_text() = default;
    wiped_text(wiped_text&&) noexcept = default;
    wiped_text& operator=(wiped_text&&) noexcept = default;
    ~wiped_text()
    {
        resize(capacity());
        explicit_bzero(data(), size());
    }
};

struct cfg_value {
    wiped_text text;  // without zero bytes
    std::size_t line;
};

struct cfg_attribute {
    std::string name;
    std::vector<cfg_value> values;  // one at least
};

struct cfg_entry {
    std::string dn;
    std::vector<cfg_attribute> attributes;                // in the order of the file
    std::unordered_map<std::string, std::size_t> places;  // in `attributes`, by the name in lower case

    const cfg_attribute* find(std::string_view name) const;
    void add(std::string_view name, cfg_value value);
};

// The entries by their keys. A key has the RDNs of a DN from the root down with a zero byte between them, so an entry
// stands right ahead of those below it.
using cfg_tree = std::map<std::string, cfg_entry, std::less<>>;

constexpr char cfg_rdn_end = '\0';

// A to Z as a to z, all other bytes as they are.
std::string to_lower(std::string_view text);

// Makes the key of a DN: in lower case, and without blanks beside separators. A text of blanks, or of nothing, is the
// root, whose key is empty. False for a DN with an RDN that has no type, a backslash or a quotation mark in a type, an
// open quotation mark, a backslash at its end, or a zero byte.
bool make_cfg_key(std::string_view dn, std::string& key);

// A filter of one assertion.
struct cfg_filter {
    std::string attribute;
    bool presence = false;
    std::string value;  // in lower case

    // False for anything else than the forms that cfg_search_s takes.
    bool parse(std::string_view text);
    bool matches(const cfg_entry& entry) const;
};

// Collects the entries of a scope (cfg_scope) that match. LDAP_NO_SUCH_OBJECT when the base isn't there.
cfg_failure search_cfg_tree(const cfg_tree& tree, const std::string& base_key, int scope, const cfg_filter& filter,
                            std::vector<const cfg_entry*>& found);

// Reads a file into an empty tree.
cfg_failure read_cfg_file(const char* path, cfg_tree& tree);
