// Any text as a DN, with a small schema: what normalises has a canonical text that normalises to itself and to the same
// upper text, and a chain that the machines find in it once more, one after the other.
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "fuzz/support/small_schema.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"

namespace {

using fuzz_support::expect;

struct release {
    void operator()(ldap_escDN* dn) const { free_ldap_escDN(&dn); }
    void operator()(char* text) const { std::free(text); }
};
using heap_dn = std::unique_ptr<ldap_escDN, release>;

bool same(const char* a, const char* b)
{
    return std::strcmp(a, b) == 0;
}

// Finds the pairs of a canonical text by the machines and compares them with the chain.
void check_chain(const ldap_escDN& dn)
{
    const char* at = dn.canonical;
    for (const ldapDN_elem33* rdn = dn.rdns; rdn != nullptr; rdn = rdn->next) {
        for (const ldapRDN_elem33* pair = rdn->pairs; pair != nullptr; pair = pair->next) {
            const char* last = nullptr;
            int error = 0;
            const char* type = at;
            const char* equals = find_end_attr_type33(&type, &last, &error);
            expect(error == 0 && std::string(type, last + 1) == pair->rdn->type, "the type is found");
            const char* value = equals + 1;
            at = find_end_attr_value33(&value, &last, &error);
            expect(error == 0, "the value is found");
            const std::string text(value, last + 1);
            const std::unique_ptr<char, release> bare(normAttrValue(text.c_str(), &error));
            expect(error == 0 && same(bare.get(), pair->rdn->value), "the value resolves to the bare one");
            expect(*at == (pair->next != nullptr ? '+' : rdn->next != nullptr ? ',' : '\0'), "a separator follows");
            ++at;
        }
    }
}

void check_normalised(const ldap_escDN& dn, ldap_escDN* (*normalize)(const char*))
{
    expect(static_cast<std::size_t>(dn.length) == std::strlen(dn.canonical), "the length is that of the text");
    expect(std::strlen(dn.upper) == std::strlen(dn.canonical), "folding keeps the length");
    if (dn.count != 0) {
        check_chain(dn);
    }
    const heap_dn again(normalize(dn.canonical));
    if (std::strlen(dn.canonical) > dn_longest) {
        expect(again->internal_error == DN_ERR_TOO_LONG, "a text that grew too long is refused");
        return;
    }
    expect(again->result == 0, "the canonical text normalises");
    expect(same(again->canonical, dn.canonical), "to itself");
    expect(same(again->upper, dn.upper), "and to the same upper text");
    expect(compare_ldap_escDN(&dn, again.get()) == 1, "both are equal");
    const heap_dn from_scratch(normalize(dn.scratch));
    expect(std::strlen(dn.scratch) > dn_longest || same(from_scratch->upper, dn.upper),
           "the working text is the same DN");
    const heap_dn parent(ParentDN33(&dn));
    if (parent != nullptr) {
        const std::size_t skipped = std::strlen(dn.canonical) - std::strlen(parent->canonical);
        expect(same(parent->canonical, dn.canonical + skipped), "the parent's text is the end of the DN's");
        expect(same(parent->upper, dn.upper + skipped), "in upper case too");
    }
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***)
{
    fuzz_support::load_small_schema();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const fuzz_support::exact_text text(data, size);
    for (const auto normalize : {dn_normalize_esc, dn_normalize_light_esc}) {
        const heap_dn dn(normalize(text.c_str()));
        expect(dn != nullptr, "there is a record");
        if (dn->result == 0) {
            check_normalised(*dn, normalize);
        } else if (dn->internal_error != DN_ERR_UTF8) {
            expect(dn->internal_error == DN_ERR_TOO_LONG ? dn->canonical == nullptr : same(dn->canonical, ""),
                   "a refused DN has no text");
        }
    }
    return 0;
}
