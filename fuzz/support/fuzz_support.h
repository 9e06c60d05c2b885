// What the fuzzers share. Linking it also silences the message log and puts a relational back end on the list of back
// ends, so that attribute types get tables.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>

namespace fuzz_support {

// Ends the process with a word about what was violated, which is a finding.
void expect(bool holds, const char* claim);

// A zero-terminated copy of the input in a block of its exact size, so that one byte read too far is seen. A byte 0 in
// the input ends the text.
class exact_text {
public:
    exact_text(const std::uint8_t* data, std::size_t size);
    const char* c_str() const { return text_.get(); }

private:
    std::unique_ptr<char[]> text_;
};

}  // namespace fuzz_support
