// Decoding and folding of any bytes, both ways, against the slow implementation of the tests.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "servers/vrnd/libdirbase/base/uni_case.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "tests/servers/vrnd/libdirbase/base/slow_utf8.h"

namespace {

using test_support::slow_character;
using test_support::slow_decode;
using test_support::slow_fold;

void check(bool holds)
{
    if (!holds)
        std::abort();
}

// A copy in a block of exactly its size.
std::unique_ptr<char[]> copy_of(const std::string& text)
{
    std::unique_ptr<char[]> copy(new char[text.size() + 1]);
    std::memcpy(copy.get(), text.c_str(), text.size() + 1);
    return copy;
}

void check_decoding(const std::string& text)
{
    const std::unique_ptr<char[]> copy = copy_of(text);
    for (std::size_t at = 0; at <= text.size(); ++at) {
        const slow_character expected = slow_decode(text, at);
        std::int32_t character = 0;
        check(utf8towc(&character, copy.get() + at) == expected.length);
        check(character == expected.value);
    }
}

void check_folding(const std::string& text, int (*fold)(char*), std::int32_t (*map)(std::int32_t))
{
    std::string expected = text;
    const int result = slow_fold(expected, map);
    const std::unique_ptr<char[]> copy = copy_of(text);
    check(fold(copy.get()) == result);
    check(std::memcmp(copy.get(), expected.c_str(), expected.size() + 1) == 0);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    std::string text(reinterpret_cast<const char*>(data), size);
    text.resize(std::strlen(text.c_str()));
    check_decoding(text);
    check_folding(text, utfToUpper, UniToupper);
    check_folding(text, utfToLower, UniTolower);
    return 0;
}
