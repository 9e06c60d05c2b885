// Any text as lines: the reader finds an end, a value ends with a zero byte inside its line, and what is read is
// written and read back as it was.
//
// Input: the mode (a byte), the text.
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "libraries/libldif/line64.h"

using fuzz_support::expect;

namespace {

struct release {
    void operator()(char* text) const { std::free(text); }
};

void check_written(const std::string& type, const std::string& value)
{
    const std::unique_ptr<char, release> line(ldif_type_and_value(type.c_str(), value.data(), value.size()));
    char* next = line.get();
    char* const taken = str_getline(&next);
    expect(taken == line.get() && *next == '\0', "one line is written");
    char* read_type = nullptr;
    char* read = nullptr;
    std::size_t length = 0;
    int url = 0;
    const int result = str_parse_line(taken, &read_type, &read, &length, LDIF_MODE_ENTRY, &url);
    expect(result == (value.empty() ? LDIF_LINE_EMPTY : LDIF_LINE_OK) && url == 0, "it has a value");
    expect(read_type == type && std::string(read, length) == value, "the same");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0) {
        return 0;
    }
    const int mode = data[0] % 3 - 1;
    const fuzz_support::exact_text text(data + 1, size - 1);
    const std::unique_ptr<char, release> copy(strdup(text.c_str()));
    char* next = copy.get();
    while (char* const line = str_getline(&next)) {
        const std::size_t line_length = std::strlen(line);
        expect(next == nullptr || next == line + line_length + 1, "the position is behind the line");
        char* type = nullptr;
        char* value = nullptr;
        std::size_t length = 0;
        int base64 = 0;
        if (str_parse_line_v_or_bv(line, &type, &value, &length, mode, nullptr, &base64) == LDIF_LINE_BAD) {
            expect(value == nullptr && length == 0, "a bad line has no value");
            continue;
        }
        expect(value >= line && value + length <= line + line_length && value[length] == '\0',
               "the value is in the line");
        expect(base64 != 0 || std::strlen(value) == length, "only Base64 brings zero bytes");
        expect(std::strchr(type, ldif_fold_marker) == nullptr, "markers are gone");
        check_written(type, std::string(value, length));
    }
    return 0;
}
