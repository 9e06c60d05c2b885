// From the chain of a DN to its texts: see dn_esc.h. Lengths are known from the parse, so a text is allocated once, in
// its exact size.
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/model/dn_chars.h"
#include "servers/vrnd/libdirbase/model/dn_esc_records.h"
#include "servers/vrnd/libdirbase/model/dn_scan.h"

namespace {

// How a character of a value is written in the canonical text.
enum class writing { plain, escaped, pair };

writing writing_of(char c, bool first, bool last, bool older)
{
    if (dn_chars::is(c, dn_chars::special)) {
        return writing::escaped;
    }
    if (c == '#') {
        return first || older ? writing::escaped : writing::plain;
    }
    if (dn_chars::is(c, dn_chars::blank) && (first || last)) {
        return c == ' ' ? writing::escaped : writing::pair;
    }
    return writing::plain;
}

// Calls a function with each character of a value and how it is written.
template <typename Function>
void for_each_writing(const char* value, std::size_t length, Function&& function)
{
    const bool older = older_dn_processing();
    for (std::size_t i = 0; i < length; ++i) {
        function(value[i], writing_of(value[i], i == 0, i + 1 == length, older));
    }
}

char* write(char* out, const char* text, std::size_t length)
{
    std::memcpy(out, text, length);
    return out + length;
}

// Whether a text that ends there has a character in more bytes than it takes (RFC 3629 forbids that). Folding would
// write its proper form, be it a comma or a quote, behind the back of the escapes.
bool has_overlong_form(const char* text, std::size_t length)
{
    const auto* const bytes = reinterpret_cast<const unsigned char*>(text);
    for (std::size_t i = 0; i < length; ++i) {
        if (bytes[i] == 0xC0 || bytes[i] == 0xC1 || (bytes[i] == 0xE0 && bytes[i + 1] >= 0x80 && bytes[i + 1] < 0xA0)) {
            return true;
        }
    }
    return false;
}

// Folds so many bytes of a text that ends there to upper case. False when they aren't UTF-8.
bool fold(char* text, std::size_t length)
{
    return !has_overlong_form(text, length) && utfToUpper(text) == 0;
}

char* write_pair(char* out, const ldapRDN_struct33& pair)
{
    out = write(out, pair.type, pair.type_length);
    *out++ = '=';
    return write_escaped(out, pair);
}

// Writes the pair as the upper text has it, with a terminator, and returns the position of that.
char* write_upper_pair(char* out, const ldapRDN_struct33& pair, bool& good)
{
    char* end = write(out, pair.type, pair.type_length);
    *end = '\0';
    good = fold(out, pair.type_length) && good;
    *end++ = '=';
    out = end;
    end = write_escaped(out, pair);
    *end = '\0';
    if ((pair.syntax & SC_CIS) != 0) {
        good = fold(out, pair.escaped_length) && good;
    }
    return end;
}

char* write_upper_pairs(char* out, const ldapRDN_elem33* pairs, bool& good)
{
    for (const ldapRDN_elem33* pair = pairs; pair != nullptr; pair = pair->next) {
        if (pair != pairs) {
            *out++ = '+';
        }
        out = write_upper_pair(out, *pair->rdn, good);
    }
    return out;
}

// The length of the canonical text with a separator behind each pair, the place of the terminator among them.
std::size_t written_length(const ldap_escDN& dn)
{
    std::size_t length = 0;
    for (const ldapDN_elem33* rdn = dn.rdns; rdn != nullptr; rdn = rdn->next) {
        for (const ldapRDN_elem33* pair = rdn->pairs; pair != nullptr; pair = pair->next) {
            length += pair->rdn->type_length + pair->rdn->escaped_length + 2;
        }
    }
    return length;
}

// Writes the canonical text into a block of that length, above 0.
void write_canonical(char* out, const ldap_escDN& dn)
{
    for (const ldapDN_elem33* rdn = dn.rdns; rdn != nullptr; rdn = rdn->next) {
        for (const ldapRDN_elem33* pair = rdn->pairs; pair != nullptr; pair = pair->next) {
            out = write_pair(out, *pair->rdn);
            *out++ = pair->next != nullptr ? '+' : ',';
        }
    }
    out[-1] = '\0';
}

// Puts a new text, or none, in the place of an old one.
char* replace(char*& text, heap_text with)
{
    std::free(text);
    text = with.release();
    return text;
}

heap_text new_text(std::size_t size)
{
    return heap_text(static_cast<char*>(std::malloc(size)));
}

char* no_memory(ldap_escDN& dn)
{
    dn.internal_error = DN_ERR_NO_MEMORY;
    replace(dn.canonical, nullptr);
    replace(dn.upper, nullptr);
    return nullptr;
}

char* build_empty(ldap_escDN& dn)
{
    heap_text canonical(static_cast<char*>(std::calloc(1, 1)));
    heap_text upper(static_cast<char*>(std::calloc(1, 1)));
    if (canonical == nullptr || upper == nullptr) {
        return no_memory(dn);
    }
    replace(dn.upper, std::move(upper));
    return replace(dn.canonical, std::move(canonical));
}

}  // namespace

std::size_t escaped_length_of(const char* value, std::size_t length)
{
    std::size_t result = 0;
    for_each_writing(value, length, [&](char, writing how) {
        result += how == writing::plain ? 1 : how == writing::escaped ? 2 : 3;
    });
    return result;
}

char* write_escaped(char* out, const ldapRDN_struct33& pair)
{
    if (pair.escaped_length == pair.value_length) {
        return write(out, pair.value, pair.value_length);
    }
    for_each_writing(pair.value, pair.value_length, [&](char c, writing how) {
        if (how != writing::plain) {
            *out++ = '\\';
        }
        if (how == writing::pair) {
            *out++ = '0';
            c = c == '\n' ? 'A' : '9';
        }
        *out++ = c;
    });
    return out;
}

extern "C" {

char* BuildDNString33(ldap_escDN* dn)
{
    const std::size_t size = written_length(*dn);
    if (dn->length == 0 || dn->internal_error != 0 || size == 0) {
        return build_empty(*dn);
    }
    heap_text text = new_text(size);
    if (text == nullptr) {
        return no_memory(*dn);
    }
    write_canonical(text.get(), *dn);
    dn->length = static_cast<std::int64_t>(size - 1);
    replace(dn->canonical, std::move(text));
    return dn_upcase_esc(dn) == nullptr ? no_memory(*dn) : dn->canonical;
}

char* dn_upcase_esc(ldap_escDN* dn)
{
    if (dn->internal_error != 0 || dn->canonical == nullptr || dn->rdns == nullptr) {
        return dn->upper;
    }
    const auto length = static_cast<std::size_t>(dn->length);
    heap_text text = new_text(std::max(length, written_length(*dn)) + 2);
    if (text == nullptr) {
        dn->internal_error = DN_ERR_NO_MEMORY;
        return nullptr;
    }
    bool good = true;
    *text = '\0';
    if ((dn->all_case_ignore & SC_CIS) != 0) {
        std::memcpy(text.get(), dn->canonical, length + 1);
        good = fold(text.get(), length);
    } else {
        char* out = text.get();
        for (const ldapDN_elem33* rdn = dn->rdns; rdn != nullptr; rdn = rdn->next) {
            if (rdn->pairs == nullptr) {
                continue;  // the canonical text has nothing of it, either
            }
            if (out != text.get()) {
                *out++ = ',';
            }
            out = write_upper_pairs(out, rdn->pairs, good);
        }
    }
    if (!good) {
        dn->internal_error = DN_ERR_UTF8;
    }
    return replace(dn->upper, std::move(text));
}

void dn_upcaseRDN(const ldapRDN_elem33* pairs, char** out)
{
    bool good = true;
    **out = '\0';
    *out = write_upper_pairs(*out, pairs, good);
}

const char* GetDNString33(const ldap_escDN* dn)
{
    return dn == nullptr ? nullptr : dn->canonical;
}

const char* GetDNUpper33(const ldap_escDN* dn)
{
    return dn == nullptr ? nullptr : dn->upper;
}

}  // extern "C"
