// The older normaliser: see dn_plain.h. One machine walks a text with a reading and a writing position.
#include "servers/vrnd/libdirbase/model/dn_plain.h"

#include <cstdlib>
#include <cstring>

#include <strings.h>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/model/dn_chars.h"
#include "servers/vrnd/libdirbase/model/dn_scan.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

using dn_chars::is;

namespace {

bool is_blank(char c)
{
    return c == ' ' || c == '\n';
}

bool is_line_blank(char c)
{
    return is_blank(c) || c == '\r';
}

enum dn_state { DN_BEFORE_TYPE, DN_IN_TYPE, DN_BEFORE_EQUALS, B4Value, DN_IN_VALUE, DN_IN_QUOTES, DN_AFTER_QUOTES };

// The machine. Only in values does a backslash mean anything, but it may stand at the very beginning of one.
class cleaner {
public:
    explicit cleaner(char* text) : start_(text), out_(text) {}

    // Cleans the text; tells whether an RDN has several pairs.
    bool run()
    {
        for (const char* in = start_; *in != '\0'; ++in) {
            const bool escaped = escaped_;
            escaped_ = false;
            step(*in, escaped);
        }
        *out_ = '\0';
        return compound_;
    }

private:
    void copy(char c, dn_state next)
    {
        *out_++ = c;
        state_ = next;
    }

    void step(char c, bool escaped)
    {
        switch (state_) {
        case DN_BEFORE_TYPE:
            if (!is_blank(c)) {
                copy(c, DN_IN_TYPE);
            }
            break;
        case DN_IN_TYPE:
        case DN_BEFORE_EQUALS:
            if (is_blank(c)) {
                state_ = DN_BEFORE_EQUALS;
            } else {
                copy(c, c == '=' ? B4Value : state_);
            }
            break;
        case B4Value:
            if (!is_blank(c)) {
                copy(c, c == '"' ? DN_IN_QUOTES : DN_IN_VALUE);
                escaped_ = c == '\\';
            }
            break;
        case DN_IN_VALUE:
            if (escaped) {
                copy_escaped(c);
            } else if (is(c, dn_chars::separator)) {
                while (out_ != start_ && is_blank(out_[-1])) {
                    --out_;
                }
                end_pair(c, c == ';' ? ',' : c);
            } else {
                copy(c, DN_IN_VALUE);
                escaped_ = c == '\\';
            }
            break;
        case DN_IN_QUOTES:
            if (escaped) {
                copy_escaped(c);
            } else {
                copy(c, c == '"' ? DN_AFTER_QUOTES : DN_IN_QUOTES);
                escaped_ = c == '\\';
            }
            break;
        case DN_AFTER_QUOTES:
            if (is(c, dn_chars::separator)) {
                end_pair(c, c);
            }
            break;
        }
    }

    // A special stays behind its backslash, another character takes its place.
    void copy_escaped(char c)
    {
        if (!is(c, dn_chars::special)) {
            --out_;
        }
        *out_++ = c;
    }

    void end_pair(char c, char written)
    {
        compound_ = compound_ || c == '+';
        copy(written, DN_BEFORE_TYPE);
    }

    char* start_;
    char* out_;
    dn_state state_ = DN_BEFORE_TYPE;
    bool escaped_ = false;  // the character in front was an unescaped backslash
    bool compound_ = false;
};

// Cleans a text that isn't null; tells whether an RDN has several pairs.
bool clean(char* dn)
{
    const bool compound = cleaner(dn).run();
    string_strip_trailing(dn);
    return compound;
}

// "xan-kerberosname", which an old release wrote, has a shorter name since.
void shorten_kerberos_name(char* dn)
{
    constexpr char longer[] = "xan-kerberosname";
    constexpr char shorter[] = "xan-kn";
    constexpr std::size_t longer_length = sizeof(longer) - 1;
    constexpr std::size_t shorter_length = sizeof(shorter) - 1;
    constexpr std::size_t shortest_dn = 18;  // with "=" and a byte of value
    const std::size_t length = std::strlen(dn);
    if (length >= shortest_dn && strncasecmp(dn, longer, longer_length) == 0) {
        std::memcpy(dn, shorter, shorter_length);
        std::memmove(dn + shorter_length, dn + longer_length, length - longer_length + 1);
    }
}

const char* give(const dn_element& element, const char** start, const char** last, int* error)
{
    *start = element.first;
    *error = element.error;
    if (element.error == 0) {
        *last = element.end - 1;
    }
    return element.next;
}

}  // namespace

extern "C" {

// ---- normalising in place -------------------------------------------------------------------------------------------

char* dn_normalize(char* dn)
{
    if (dn == nullptr || *dn == '\0') {
        return dn;
    }
    if (clean(dn)) {
        dn_normalize_compound_RDN(dn);
    }
    shorten_kerberos_name(dn);
    return dn;
}

char* dn_normalize_case(char* dn)
{
    return dn_upcase(dn_normalize(dn));
}

char* dn_normalize_light(char* dn, int upper)
{
    if (dn == nullptr || *dn == '\0') {
        return dn;
    }
    clean(dn);
    return upper != 0 ? dn_upcase(dn) : dn;
}

char* dn_upcase(char* text)
{
    utfToUpper(text);
    return text;
}

int dn_compare(const char* a, const char* b)
{
    const heap_text copy_a(a == nullptr ? nullptr : strdup(a));
    const heap_text copy_b(b == nullptr ? nullptr : strdup(b));
    if (copy_a == nullptr || copy_b == nullptr) {
        return -1;
    }
    return std::strcmp(dn_normalize_case(copy_a.get()), dn_normalize_case(copy_b.get()));
}

char* string_strip_leading(char* text)
{
    const char* first = text;
    while (is_line_blank(*first)) {
        ++first;
    }
    if (first != text) {
        std::memmove(text, first, std::strlen(first) + 1);
    }
    return text;
}

char* string_strip_trailing(char* text)
{
    char* end = text + std::strlen(text);
    while (end != text && is_line_blank(end[-1])) {
        --end;
    }
    const char* backslash = end;  // an odd number of them escapes the blank behind
    while (backslash != text && backslash[-1] == '\\') {
        --backslash;
    }
    if ((end - backslash) % 2 != 0 && *end != '\0') {
        ++end;
    }
    *end = '\0';
    return text;
}

// ---- types and values
// ------------------------------------------------------------------------------------------------

const char* dn_attr_get_short_name(const char* name, int* temporary)
{
    if (temporary != nullptr) {
        *temporary = 0;
    }
    const asyntaxinfo* info = ldcf_api_attr_get_info(name, nullptr);
    if (info == nullptr) {
        return nullptr;
    }
    const char* shortest = info->names[0];
    for (char** other = info->names; *other != nullptr; ++other) {
        if (std::strlen(*other) < std::strlen(shortest)) {
            shortest = *other;
        }
    }
    return shortest;
}

const char* ShortRDNType(const char* name)
{
    const char* const shortest = dn_attr_get_short_name(name, nullptr);
    if (shortest == nullptr) {
        PrintMessage(MSG_COMPONENT_RDBM, MSG_SEVERE, 13, name);
        debug_error("Error - ShortRDNType: attribute %s is not defined in the schema\n", name == nullptr ? "" : name);
    }
    return shortest;
}

char* minAttrValue(const char* value)
{
    const std::size_t length = std::strlen(value);
    auto* const bare = static_cast<char*>(std::malloc(length + 1));
    if (bare != nullptr) {
        bare[resolve_value(value, value + length, bare, dn_form::older).length] = '\0';
    }
    return bare;
}

int hexval(char c)
{
    const int base = c >= 'A' && c <= 'Z' ? 'A' - 10 : c >= 'a' && c <= 'z' ? 'a' - 10 : '0';
    return c - base;
}

const char* find_end_attr_type(const char** start, const char** last, int* error)
{
    return give(scan_type(*start, dn_form::older), start, last, error);
}

const char* find_end_attr_value(const char** start, const char** last, int* error)
{
    return give(scan_value(*start, dn_form::older), start, last, error);
}

}  // extern "C"
