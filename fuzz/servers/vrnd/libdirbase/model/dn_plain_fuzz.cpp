// Any text through the checkers, the in-place normaliser and the older machines: a text never grows, and what the
// checker takes it takes after the cleaning too.
#include <cstdlib>
#include <cstring>

#include "fuzz/support/fuzz_support.h"
#include "fuzz/support/small_schema.h"
#include "servers/vrnd/libdirbase/model/dn_check.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"
#include "servers/vrnd/libdirbase/model/dn_suffix.h"

namespace {

using fuzz_support::exact_text;
using fuzz_support::expect;

// The text in a block of its exact size, to be changed.
struct changeable {
    explicit changeable(const char* text) : copy(strdup(text)) {}
    ~changeable() { std::free(copy); }
    changeable(const changeable&) = delete;
    changeable& operator=(const changeable&) = delete;
    char* copy;
};

void check_normalizing(const char* text)
{
    const changeable light(text);
    const changeable full(text);
    dn_normalize_light(light.copy, 0);
    dn_normalize(full.copy);
    expect(std::strlen(light.copy) <= std::strlen(text), "cleaning doesn't make a text longer");
    expect(std::strlen(full.copy) <= std::strlen(light.copy), "nor does sorting");
    // Only an escaped "#" means something else without its backslash, which goes.
    if (dn_check(text, nullptr) == 0 && std::strstr(text, "\\#") == nullptr) {
        expect(dn_check(light.copy, nullptr) == 0, "a DN stays one");
        expect(dn_check(full.copy, nullptr) == 0, "and sorted, too");
    }
}

void check_machines(const char* text)
{
    const char* const end = text + std::strlen(text);
    for (const auto find : {find_end_attr_type, find_end_attr_value}) {
        const char *first = text, *last = nullptr;
        int error = 0;
        const char* next = find(&first, &last, &error);
        expect(text <= first && first <= end && first <= next && next <= end, "what is found is in the text");
        expect(error != 0 || (first <= last + 1 && last < next), "in this order");
    }
    char* bare = minAttrValue(text);
    expect(std::strlen(bare) <= std::strlen(text), "a bare value is no longer");
    std::free(bare);
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***)
{
    fuzz_support::load_small_schema();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const exact_text text(data, size);
    std::size_t offset = 0;
    for (const auto check : {dn_check, rdn_check}) {
        expect(check(text.c_str(), &offset) == 0 || offset <= std::strlen(text.c_str()), "the fault is in the text");
    }
    check_normalizing(text.c_str());
    check_machines(text.c_str());
    char* parent = nullptr;
    expect(dn_get_parent_norm(nullptr, text.c_str(), &parent, 0) == 0, "a parent is looked for");
    expect(parent == nullptr || !dn_type(text.c_str()) || std::strchr(",;", parent[-1]) != nullptr,
           "the parent stands behind a separator");
    return 0;
}
