// Any text as a filter, raw and normalised: what is written from the tree reads as the same tree, where no byte of it
// has a meaning in texts.
//
// Input: bit 0 of the first byte is the flag, the rest is the text.
#include "servers/vrnd/str2filter.h"

#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>

#include "fuzz/support/fuzz_support.h"
#include "fuzz/support/small_schema.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "tests/support/filter_encoding.h"

using fuzz_support::expect;

namespace {

bool is_plain(std::string_view value)
{
    return value.find_first_of(std::string_view("()*\\\0", 5)) == std::string_view::npos;
}

bool is_plain_type(std::string_view type)
{
    return is_plain(type) &&
           (type.empty() || (type.find_first_of("&|!") != 0 && type.find_last_of("<>~") != type.size() - 1));
}

bool is_plain(const Filter& filter)
{
    if (filter_has_list(filter.f_choice)) {
        const Filter* child = filter.f_list;
        while (child != nullptr && is_plain(*child)) {
            child = child->f_next;
        }
        return child == nullptr;
    }
    if (filter_has_ava(filter.f_choice)) {
        const berval& value = filter.f_ava.ava_value;
        return is_plain_type(filter.f_ava.ava_type) && is_plain({value.bv_val, value.bv_len});
    }
    if (filter.f_choice == LDAP_FILTER_PRESENT) {
        return is_plain_type(filter.f_type);
    }
    const filter_substrings& sub = filter.f_sub;
    bool plain = is_plain_type(sub.f_sub_type) && is_plain(sub.f_sub_initial);
    for (char** piece = sub.f_sub_any; piece != nullptr && *piece != nullptr; ++piece) {
        plain = plain && is_plain(*piece);
    }
    return plain && (sub.f_sub_final == nullptr || is_plain(sub.f_sub_final));
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
    const fuzz_support::exact_text text(data + 1, size - 1);
    const filter_guard filter(str2filter(text.c_str(), data[0] & 1));
    if (filter == nullptr) {
        return 0;
    }
    const std::unique_ptr<char, decltype(&std::free)> printed(filter2str(filter.get()), std::free);
    expect(printed != nullptr, "a filter can be written");
    const filter_guard again(str2filter(printed.get(), 0));
    if (is_plain(*filter)) {
        expect(again != nullptr, "what is written is read");
        expect(test_support::ber_of(*again) == test_support::ber_of(*filter), "as the same tree");
    }
    const char* const end = find_matching_paren(text.c_str());
    expect(end == nullptr || end < text.c_str() + std::strlen(text.c_str()), "a parenthesis is in the text");
    std::free(unescape_value(text.c_str()));
    return 0;
}
