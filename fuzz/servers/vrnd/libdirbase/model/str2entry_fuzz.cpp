// Any text as an entry, with a small schema: what is read is written, and that reads back as an entry with the same
// text and the same values. Without members and in BER it can be written, too.
//
// Input: the flags (a byte), the text.
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "fuzz/support/small_schema.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/entry_ber.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"

using fuzz_support::expect;

namespace {

struct release {
    void operator()(Entry* entry) const { entry_free(entry); }
};
using heap_entry = std::unique_ptr<Entry, release>;

heap_entry read(std::string text, int check_duplicates, int normalize, int trim)
{
    const std::unique_ptr<char[]> block(new char[text.size() + 1]);
    std::memcpy(block.get(), text.c_str(), text.size() + 1);
    return heap_entry(str2entry_memberFix(block.get(), check_duplicates, normalize, trim));
}

std::string written(const Entry& entry)
{
    std::size_t length = 0;
    const char* const text = entry2str(&entry, &length, 1);
    expect(text != nullptr && std::strlen(text) == length, "an entry has a text");
    return text;
}

bool same_values(const Attribute& a, const Attribute& b)
{
    bool same = a.a_numvals == b.a_numvals && std::strcmp(a.a_type, b.a_type) == 0;
    for (std::int64_t i = 0; same && i < a.a_numvals; ++i) {
        same = a.a_vals[i]->bv_len == b.a_vals[i]->bv_len &&
               std::memcmp(a.a_vals[i]->bv_val, b.a_vals[i]->bv_val, a.a_vals[i]->bv_len) == 0;
    }
    return same;
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***)
{
    fuzz_support::load_small_schema();
    initEnt2StrMutex();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0) {
        return 0;
    }
    const fuzz_support::exact_text text(data + 1, size - 1);
    const int check_duplicates = data[0] & 1;
    const int normalize = data[0] >> 1 & 1;
    const heap_entry entry = read(text.c_str(), check_duplicates, normalize, data[0] >> 2 & 1);
    if (entry == nullptr) {
        return 0;
    }
    const std::string first = written(*entry);
    const heap_entry again = read(first, 0, 0, 0);
    expect(again != nullptr, "what is written is read");
    expect(written(*again) == first, "and written alike");
    const Attribute* other = again->e_attrs;
    for (const Attribute* attr = entry->e_attrs; attr != nullptr; attr = attr->a_next) {
        if (attr->a_numvals != 0) {
            expect(other != nullptr && same_values(*attr, *other), "attributes have their values");
            other = other->a_next;
        }
    }
    char* buffer = nullptr;
    std::size_t room = data[0];
    buffer = static_cast<char*>(std::malloc(room));
    std::size_t length = 0;
    expect(entry2str_wo_members_and_pwd_attribs(entry.get(), &length, 1, &buffer, &room) == buffer && length < room,
           "the text is in its buffer");
    std::free(buffer);
    char* ber = nullptr;
    expect(entry2ber(entry.get(), &ber, &length) == 0, "an entry encodes");
    std::free(ber);
    return 0;
}
