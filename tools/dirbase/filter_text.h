// A filter from its text (RFC 4515), read in the way that it takes from a client to a server: the text is parsed,
// encoded as a search request has it, and read from there by the rules of the schema.
//
// The active schema is used: the caller holds the read side of its lock (schema_reader).
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/model/filter.h"
#include "tools/dirbase/report.h"

namespace dirbase_tool {

struct free_filter {
    void operator()(Filter* filter) const noexcept { filter_free(filter); }
};
using filter_pointer = std::unique_ptr<Filter, free_filter>;

enum class filter_verdict {
    defined,
    undefined,  // it can't be evaluated, so it selects nothing
    refused,    // by the rules of an attribute
    no_filter,  // the text isn't one
};

// An element of a filter. Those that are defined have their value in normal form, others as it is written.
struct filter_element {
    std::uint64_t choice = 0;
    filter_verdict verdict = filter_verdict::defined;
    int result = 0;      // of one that is refused: an LDAP result
    std::string reason;  // why it isn't defined; empty for a list, unless that is empty
    std::string remark;  // of one that is defined: that its value isn't of its syntax, and what comes of that
    std::string type;
    std::string value;
    std::vector<std::pair<const char*, std::string>> pieces;  // of a substring filter: "initial", "any", "final"
    std::vector<filter_element> elements;

    // "equality cn = BOB" or "and", without the elements; long values are cut.
    std::string label() const;
    json as_json() const;
};

// The result does not depend on the text any more.
class parsed_filter {
public:
    // Parses and reads a filter. Language tags are taken when they are switched on (set_g_language_tags_enabled).
    explicit parsed_filter(const std::string& text);

    filter_verdict verdict() const { return verdict_; }

    // What a server works with: without the undefined elements of an OR. Null unless it is defined.
    const Filter* filter() const { return filter_.get(); }

    // Its canonical text, with control bytes, and bytes that aren't UTF-8, written as a backslash and two digits; empty
    // unless it is defined.
    const std::string& canonical() const { return canonical_; }

    // What is wrong with the text, and at which of its bytes, or why the filter is refused; empty when nothing is.
    const std::string& fault() const { return fault_; }
    std::size_t offset() const { return offset_; }

    // All elements as written; without a meaning when the text isn't a filter.
    const filter_element& root() const { return root_; }

    // "equality foo = x is undefined: REASON", for each element that isn't defined, and "equality foo = x: REMARK" for
    // each that has one, unless only what is undefined or refused is wanted.
    std::vector<std::string> remarks(bool only_undefined = false) const;

private:
    filter_verdict verdict_ = filter_verdict::no_filter;
    filter_pointer filter_;
    std::string canonical_;
    std::string fault_;
    std::size_t offset_ = 0;
    filter_element root_;
};

}  // namespace dirbase_tool
