// Any bytes through Base64 and back, with folds at any column and without; and any text as Base64, in place and not.
//
// Input: the column (a byte), the bytes.
#include <cstring>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "libraries/libldif/line64.h"

using fuzz_support::expect;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0) {
        return 0;
    }
    const int column = data[0] % 90 - 1;
    const std::string bytes(reinterpret_cast<const char*>(data + 1), size - 1);
    std::string text(bytes.size() * 2 + 8, '\0');
    char* out = text.data();
    expect(base64encode(&out, bytes.data(), bytes.data() + bytes.size(), column) == 0, "all bytes encode");
    text.resize(static_cast<std::size_t>(out - text.data()));
    for (std::size_t fold = 0; (fold = text.find("\n ")) != std::string::npos;) {
        expect(column >= 0, "only with a column there are folds");
        text.erase(fold, 2);
    }
    expect(text.size() == (bytes.size() + 2) / 3 * 4, "four characters for three bytes");
    std::size_t length = 0;
    expect(base64decode(text.data(), text.data(), &length) == 0 && std::string(text.data(), length) == bytes,
           "they are back");

    const fuzz_support::exact_text source(data + 1, size - 1);
    std::string target(std::strlen(source.c_str()) + 1, 'x');
    std::string in_place = source.c_str();
    std::size_t again = 0;
    const int result = base64decode(target.data(), source.c_str(), &length);
    expect(base64decode(in_place.data(), in_place.data(), &again) == result && again == length, "in place alike");
    expect(result != 0 || std::memcmp(target.data(), in_place.data(), length + 1) == 0, "the same bytes");
    return 0;
}
