// Any bytes as the filter of a search request, with a small schema: what is read has a text, and what it is encoded to
// reads as the same.
//
// Input: bit 0 of the first byte switches language tags on, the rest is BER.
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "fuzz/support/small_schema.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/connection/filter_ber.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "tests/support/filter_encoding.h"

using fuzz_support::expect;

namespace {

struct answer {
    filter_guard filter;
    std::string text;
};

answer read(const std::uint8_t* data, std::size_t size)
{
    const std::unique_ptr<char[]> block(new char[size]);
    std::memcpy(block.get(), data, size);
    const berval value = {size, block.get()};
    BerElement ber;
    ber_init2(&value, 0, &ber);
    Filter* filter = nullptr;
    char* text = nullptr;
    char* error_text = nullptr;
    const int result = get_filter(nullptr, &ber, &filter, &text, &error_text);
    answer read{filter_guard(filter), text == nullptr ? "" : text};
    expect((filter == nullptr) == (text == nullptr), "a filter has a text");
    expect(result == 0 || filter == nullptr, "a failure gives no filter");
    expect(result != 0 || error_text == nullptr, "a success has nothing to say");
    expect(ber.ber_end == block.get() + size, "the element has its end back");
    expect(ber.ber_ptr >= block.get() && ber.ber_ptr <= ber.ber_end, "the position is in the element");
    std::free(text);
    std::free(error_text);
    return read;
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***)
{
    fuzz_support::load_small_schema();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0) {
        return 0;
    }
    set_g_language_tags_enabled(data[0] & 1);
    const answer first = read(data + 1, size - 1);
    if (first.filter == nullptr) {
        return 0;
    }
    const std::unique_ptr<char, decltype(&std::free)> printed(filter2str(first.filter.get()), std::free);
    expect(printed != nullptr, "a filter can be written");
    const bool is_ascii =
        first.text.find_first_not_of("\t\n\r !\"#$%&'()*+,-./0123456789:;<=>?@ABCDEFGHIJKLMNOPQRSTUVWXYZ[\\]^_`"
                                     "abcdefghijklmnopqrstuvwxyz{|}~") == std::string::npos;
    const std::string bytes = test_support::ber_of(*first.filter);
    const answer again = read(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
    if (is_ascii) {
        expect(again.filter != nullptr, "what was read can be sent");
        expect(again.text.find('\\') != std::string::npos || again.text == printed.get(),
               "what is normal stays as it is, and both texts are the same where nothing is escaped");
    }
    return 0;
}
