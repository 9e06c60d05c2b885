// Any bytes as a configuration file, and as a base and a filter to search it by: what was read can be found by its
// names and values, and written out as LDIF it reads as the same.
//
// Input: a line with the base, a line with the filter, then the file.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include <sys/mman.h>
#include <unistd.h>

#include "fuzz/support/fuzz_support.h"
#include "libraries/libcfg/cfg.h"
#include "libraries/libldif/line64.h"

using fuzz_support::expect;

namespace {

template <auto release>
struct release_by {
    template <typename T>
    void operator()(T* object) const
    {
        release(object);
    }
};
using handle = std::unique_ptr<cfg_handle, release_by<cfg_unbind>>;
using message = std::unique_ptr<cfg_message, release_by<cfg_msgfree>>;
using text = std::unique_ptr<char, release_by<cfg_memfree>>;
using value_array = std::unique_ptr<char*, release_by<cfg_value_free>>;
using cursor = std::unique_ptr<cfg_ber, release_by<cfg_ber_free>>;

// Binds to a file with this content. Returns the session only where that went well.
handle bind(std::string_view content)
{
    static const int file = memfd_create("configuration", MFD_CLOEXEC);
    static const std::string path = "/proc/self/fd/" + std::to_string(file);
    expect(ftruncate(file, 0) == 0 &&
               pwrite(file, content.data(), content.size(), 0) == static_cast<ssize_t>(content.size()),
           "the file can be written");
    handle cfg(cfg_init(nullptr, 0));
    expect(cfg_set_option(cfg.get(), CFG_OPT_FILE, path.c_str()) == LDAP_SUCCESS, "the file can be named");
    const int result = cfg_bind_s(cfg.get(), nullptr, nullptr, CFG_AUTH_SIMPLE);
    expect(result == LDAP_SUCCESS || result == LDAP_DECODING_ERROR || result == LDAP_INVALID_DN_SYNTAX ||
               result == LDAP_ALREADY_EXISTS,
           "a file is refused for what is in it");
    return result == LDAP_SUCCESS ? std::move(cfg) : nullptr;
}

message search(cfg_handle* cfg, const std::string& base, int scope, const std::string& filter)
{
    cfg_message* found = nullptr;
    const int result = cfg_search_s(cfg, base.c_str(), scope, filter.c_str(), nullptr, 0, &found);
    expect((result == LDAP_SUCCESS) == (found != nullptr), "a result comes with success");
    return message(found);
}

std::string escaped(std::string_view value)
{
    std::string out;
    for (const char c : value) {
        constexpr char digits[] = "0123456789abcdef";
        const auto byte = static_cast<unsigned char>(c);
        out += {'\\', digits[byte >> 4], digits[byte & 15]};
    }
    return out;
}

std::string ldif(const char* name, const char* value)
{
    char* const made = ldif_type_and_value(name, value, std::strlen(value));
    const std::string line = made;
    std::free(made);
    return line;
}

// Looks an entry up by its name with a filter, which has to find it alone.
void expect_found(cfg_handle* cfg, const std::string& dn, const std::string& filter)
{
    const message found = search(cfg, dn, CFG_SCOPE_BASE, filter);
    expect(found != nullptr && cfg_count_entries(cfg, found.get()) == 1, "an entry is found by its name");
    expect(text(cfg_get_dn(cfg, found.get())).get() == dn, "and is the one of that name");
}

// All that is there, as LDIF.
std::string written(cfg_handle* cfg)
{
    std::string out;
    const message all = search(cfg, "", CFG_SCOPE_SUB, "objectclass=*");
    for (cfg_message* at = cfg_first_entry(cfg, all.get()); at != nullptr; at = cfg_next_entry(cfg, at)) {
        const std::string dn = text(cfg_get_dn(cfg, at)).get();
        out += ldif("dn", dn.c_str());
        expect_found(cfg, dn, "objectclass=*");
        cfg_ber* made = nullptr;
        text name(cfg_first_attribute(cfg, at, &made));
        const cursor position(made);
        for (; name != nullptr; name.reset(cfg_next_attribute(cfg, at, made))) {
            const value_array values(cfg_get_values(cfg, at, name.get()));
            expect(values != nullptr && *values.get() != nullptr, "an attribute has a value");
            for (char** value = values.get(); *value != nullptr; ++value) {
                out += ldif(name.get(), *value);
                expect_found(cfg, dn, std::string(name.get()) + "=" + escaped(*value));
            }
        }
        out += "\n";
    }
    return out;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    std::string_view rest(reinterpret_cast<const char*>(data), size);
    const auto take_line = [&rest] {
        const std::string taken(rest.substr(0, rest.find('\n')));
        rest.remove_prefix(std::min(taken.size() + 1, rest.size()));
        return taken;
    };
    const std::string base = take_line();
    const std::string filter = take_line();
    const handle cfg = bind(rest);
    if (cfg == nullptr) {
        return 0;
    }
    const message below = search(cfg.get(), base, CFG_SCOPE_SUB, filter);
    if (below != nullptr) {
        const message whole = search(cfg.get(), base, CFG_SCOPE_SUB, "objectclass=*");
        expect(cfg_count_entries(cfg.get(), below.get()) <= cfg_count_entries(cfg.get(), whole.get()),
               "a filter chooses among what is there");
    }
    const std::string first = written(cfg.get());
    const handle again = bind(first);
    expect(again != nullptr && written(again.get()) == first, "what was read can be written and read again");
    return 0;
}
