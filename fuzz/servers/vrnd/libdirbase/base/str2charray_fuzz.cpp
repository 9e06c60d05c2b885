// str2charray beside a splitter that looks at one character after the other.
//
// Input: the number of separators (one byte, modulo 8), the separators, the text.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/base/charray.h"

namespace {

std::vector<std::string> split(const std::string& text, const std::string& separators)
{
    std::vector<std::string> parts;
    std::string part;
    for (const char c : text) {
        if (separators.find(c) == std::string::npos) {
            part += c;
        } else if (!part.empty()) {
            parts.push_back(part);
            part.clear();
        }
    }
    if (!part.empty())
        parts.push_back(part);
    return parts;
}

void check(bool holds)
{
    if (!holds)
        std::abort();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0)
        return 0;
    const std::string input(reinterpret_cast<const char*>(data) + 1, size - 1);
    // Both end at the first zero, as C texts do.
    const std::string separators = input.substr(0, data[0] % 8).c_str();
    std::string text = input.size() > data[0] % 8 ? input.substr(data[0] % 8).c_str() : "";
    const std::vector<std::string> expected = split(text, separators);

    char** parts = str2charray(text.data(), separators.c_str());
    check(parts != nullptr);
    std::size_t count = 0;
    for (; parts[count] != nullptr; ++count)
        check(count < expected.size() && expected[count] == parts[count]);
    check(count == expected.size());

    char** copy = charray_dup(parts);
    check((copy == nullptr) == (count == 0));
    for (std::size_t i = 0; i < count; ++i) {
        check(copy[i] != parts[i] && expected[i] == copy[i]);
        check(charray_inlist(copy, parts[i]) == 1);
    }
    charray_free(copy);
    charray_free(parts);
    return 0;
}
