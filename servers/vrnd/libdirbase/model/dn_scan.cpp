// The machines: see dn_scan.h.
#include "servers/vrnd/libdirbase/model/dn_scan.h"

#include <cstring>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/environment.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/oid_prefix.h"
#include "servers/vrnd/libdirbase/model/dn_chars.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"

using dn_chars::is;

namespace {

const char* skip(const char* at, unsigned classes)
{
    while (is(*at, classes)) {
        ++at;
    }
    return at;
}

// What has to be escaped, and what may be.
bool needs_escape(char c, dn_form form)
{
    return is(c, dn_chars::special) || (c == '#' && form == dn_form::structured && older_dn_processing());
}

bool can_escape(char c, dn_form form)
{
    return is(c, dn_chars::special) || (form == dn_form::structured && (c == '#' || c == ' '));
}

// ---- types --------------------------------------------------------------------------------------------------------

// Ends a scan of a type at `at`, where something is wrong; the older form takes the end of the text for an end.
dn_element bad_type(dn_element type, const char* at, int error, dn_form form)
{
    type.next = at;
    if (*at == '\0' && form == dn_form::older) {
        type.end = type.end == nullptr ? at : type.end;
    } else {
        type.error = *at == '\0' ? DN_ERR_SYNTAX : error;
    }
    return type;
}

}  // namespace

dn_element scan_type(const char* at, dn_form form)
{
    dn_element type;
    at = skip(at, dn_chars::blank);
    type.first = at;
    const bool prefixed = has_oid_prefix(at);
    type.numeric = prefixed || is(*at, dn_chars::digit);
    if (type.numeric) {
        at += prefixed ? 4 : 0;
        for (;; ++at) {  // runs of digits, each behind the prefix or a dot but for the first
            if (!is(*at, dn_chars::digit)) {
                if (*at != '\0') {
                    debug_error("Found bad type spec, bad oid %c not digit.\n", *at);
                }
                return bad_type(type, at, DN_ERR_OID, form);
            }
            at = skip(at, dn_chars::digit);
            if (*at != '.') {
                break;
            }
        }
    } else if (is(*at, dn_chars::letter)) {
        at = skip(at, dn_chars::name);
    } else {
        return bad_type(type, at, DN_ERR_SYNTAX, form);
    }
    type.end = at;
    if (*at != '=') {
        at = skip(at, dn_chars::blank);
        if (*at != '=') {
            if (*at != '\0') {
                debug_error("Found bad type spec, bad char %c after type.\n", *at);
            }
            return bad_type(type, at, DN_ERR_SYNTAX, form);
        }
    }
    type.next = at;
    return type;
}

// ---- values -------------------------------------------------------------------------------------------------------

namespace {

// Passes over the escape whose backslash stands at `at`. Null when it is none, with the reason in `error`.
const char* skip_escape(const char* at, dn_form form, int& error)
{
    if (is(at[1], dn_chars::hex)) {
        if (is(at[2], dn_chars::hex)) {
            return at + 3;
        }
        error = DN_ERR_HEX_PAIR;
        return nullptr;
    }
    if (can_escape(at[1], form)) {
        return at + 2;
    }
    error = DN_ERR_ESCAPE;
    return nullptr;
}

dn_element& stop(dn_element& value, const char* at, int error)
{
    value.next = at;
    value.error = error;
    return value;
}

// Behind a closing quote, or a "#" value that a blank ended: only blanks may stand there.
dn_element& scan_behind(dn_element& value, const char* at)
{
    at = skip(at, dn_chars::blank);
    return stop(value, at, is(*at, dn_chars::separator | dn_chars::end) ? 0 : DN_ERR_AFTER_QUOTES);
}

dn_element& scan_quoted(dn_element& value, dn_form form)
{
    const char* at = value.first + 1;
    while (*at != '"') {
        if (*at == '\0') {
            return stop(value, at, DN_ERR_SYNTAX);
        }
        const char* behind = at + 1;
        if (*at == '\\' && (behind = skip_escape(at, form, value.error)) == nullptr) {
            return stop(value, at, value.error);
        }
        at = behind;
    }
    value.end = at + 1;
    return scan_behind(value, at + 1);
}

dn_element& scan_hex_string(dn_element& value)
{
    const char* at = value.first + 1;
    while (is(*at, dn_chars::hex)) {
        if (!is(at[1], dn_chars::hex)) {
            return stop(value, at, DN_ERR_HEX_PAIR);
        }
        at += 2;
    }
    value.end = at;
    if (is(*at, dn_chars::separator | dn_chars::end)) {
        return stop(value, at, 0);
    }
    if (!is(*at, dn_chars::blank)) {
        return stop(value, at, DN_ERR_HEX_STRING);
    }
    return at == value.first + 1 ? stop(value, at, 0) : scan_behind(value, at);
}

dn_element& scan_plain(dn_element& value, dn_form form)
{
    const char* at = value.first;
    const char* kept = at;  // behind the last escape: what a trim must leave alone
    value.bare = true;
    for (;;) {
        while (!is(*at, dn_chars::special | dn_chars::hash | dn_chars::end)) {
            ++at;
        }
        if (is(*at, dn_chars::separator | dn_chars::end)) {
            break;
        }
        if (*at == '\\') {
            kept = skip_escape(at, form, value.error);
            if (kept == nullptr) {
                return stop(value, at, value.error);
            }
            value.bare = false;
            at = kept;
        } else if (needs_escape(*at, form)) {
            return stop(value, at, DN_ERR_SPECIAL);
        } else {
            ++at;
        }
    }
    value.end = at;
    while (value.end != kept && is(value.end[-1], dn_chars::blank)) {
        --value.end;
    }
    return stop(value, at, 0);
}

}  // namespace

dn_element scan_value(const char* at, dn_form form)
{
    dn_element value;
    at = skip(at, dn_chars::blank);
    value.first = value.end = at;
    switch (*at) {
    case '\0': return stop(value, at, form == dn_form::older ? 0 : DN_ERR_EMPTY_VALUE);
    case ',':
    case ';':
    case '+': value.bare = true; return stop(value, at, 0);
    case '"': return scan_quoted(value, form);
    case '#': return scan_hex_string(value);
    default: return scan_plain(value, form);
    }
}

// ---- bare values --------------------------------------------------------------------------------------------------

namespace {

// A value on its way from [at, end) to `out`.
class value_resolver {
public:
    value_resolver(const char* at, const char* end, char* out, dn_form form)
        : at_(at), end_(end), start_(out), out_(out), form_(form)
    {
    }

    dn_resolved run()
    {
        skip_blanks();
        bool good = true;
        if (at_ != end_) {
            good = *at_ == '"' ? quoted() : *at_ == '#' ? hex_string() : plain();
        }
        return {static_cast<std::size_t>(out_ - start_), at_, good ? 0 : DN_ERR_SYNTAX};
    }

private:
    void skip_blanks()
    {
        while (at_ != end_ && is(*at_, dn_chars::blank)) {
            ++at_;
        }
    }

    bool at_pair(const char* digits) const
    {
        return end_ - digits >= 2 && is(digits[0], dn_chars::hex) && is(digits[1], dn_chars::hex);
    }

    // Takes the byte of two digits. A bare value is a text, so none may be 0.
    bool take_pair(const char* digits)
    {
        const char byte = dn_chars::hex_byte(digits);
        if (byte == '\0') {
            return false;
        }
        *out_++ = byte;
        at_ = digits + 2;
        return true;
    }

    // Takes what an escape stands for. A space may be escaped where it would get lost: first or last in the value.
    bool escape(const char* first, bool in_quotes)
    {
        if (at_pair(at_ + 1)) {
            return take_pair(at_ + 1);
        }
        if (end_ - at_ < 2) {
            return false;
        }
        const char* const behind = at_ + 2;
        const bool at_end =
            in_quotes ? behind != end_ && *behind == '"' : behind == end_ || is(*behind, dn_chars::separator);
        const bool space = at_[1] == ' ' && (at_ == first || at_end);
        if (!space && !is(at_[1], dn_chars::special | dn_chars::hash)) {
            return false;
        }
        *out_++ = at_[1];
        at_ = behind;
        return true;
    }

    bool quoted()
    {
        const char* const first = ++at_;
        for (;;) {
            if (at_ == end_) {
                return false;
            }
            if (*at_ == '"') {
                break;
            }
            if (*at_ != '\\') {
                *out_++ = *at_++;
            } else if (!escape(first, true)) {
                return false;
            }
        }
        ++at_;
        skip_blanks();
        return at_ == end_ || is(*at_, dn_chars::separator);
    }

    // "#04", the length in octets, and the octets: the BER form of an OCTET STRING (X.690 section 8.7). The length
    // isn't looked at, since the digits tell it again.
    bool hex_string()
    {
        ++at_;
        if (form_ == dn_form::structured && !ber_header()) {
            return false;
        }
        while (at_ != end_) {
            if (!at_pair(at_) || !take_pair(at_)) {
                return false;
            }
        }
        return true;
    }

    bool ber_header()
    {
        constexpr unsigned long_form = 0x80;
        constexpr unsigned most_octets = 8;
        if (!at_pair(at_) || dn_chars::hex_byte(at_) != 0x04 || !at_pair(at_ + 2)) {
            return false;
        }
        const unsigned length = static_cast<unsigned char>(dn_chars::hex_byte(at_ + 2));
        at_ += 4;
        unsigned octets = (length & long_form) != 0 ? length & ~long_form : 0;
        if (octets > most_octets) {
            return false;
        }
        for (; octets != 0; --octets) {
            if (!at_pair(at_)) {
                return false;
            }
            at_ += 2;
        }
        return true;
    }

    bool plain()
    {
        const char* const first = at_;
        char* kept = out_;  // behind what was escaped last: what a trim must leave alone
        while (at_ != end_) {
            if (*at_ == '\\') {
                if (!escape(first, false)) {
                    return false;
                }
                kept = out_;
            } else if (is(*at_, dn_chars::separator)) {
                while (out_ != kept && is(out_[-1], dn_chars::blank)) {
                    --out_;
                }
                return true;
            } else if (needs_escape(*at_, form_)) {
                return false;
            } else {
                *out_++ = *at_++;
            }
        }
        return true;
    }

    const char* at_;
    const char* end_;
    char* start_;
    char* out_;
    dn_form form_;
};

}  // namespace

dn_resolved resolve_value(const char* at, const char* end, char* out, dn_form form)
{
    return value_resolver(at, end, out, form).run();
}

bool older_dn_processing()
{
    static const bool on = [] {
        const heap_text set = environment_value("VRND_V4_DN_PROCESSING");
        if (set != nullptr) {
            debug_error("WARNING!!! Setting DN processing to V4 style.\n");
            debug_error("V4 DN Processing should only be enabled to correct migration issues.\n");
        }
        return set != nullptr;
    }();
    return on;
}
