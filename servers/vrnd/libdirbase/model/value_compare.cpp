// Comparisons: see value_compare.h.
#include "servers/vrnd/libdirbase/model/value_compare.h"

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string_view>

#include <strings.h>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/short_value_text.h"
#include "servers/vrnd/libdirbase/model/timestamp.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"

static_assert(offsetof(AttrvalsNorm, value) == 8 && offsetof(AttrvalsNorm, stored) == 16);

namespace {

struct free_berval {
    void operator()(berval* value) const noexcept { ber_bvfree(value); }
};
using berval_guard = std::unique_ptr<berval, free_berval>;

template <typename T>
int order_of(const T& a, const T& b)
{
    return a < b ? -1 : (b < a ? 1 : 0);
}

std::string_view text_of(const berval& value)
{
    return value.bv_val == nullptr ? std::string_view("")
                                   : std::string_view(value.bv_val, strnlen(value.bv_val, value.bv_len));
}

int compare_times(const tag_timestamp_struct& a, const tag_timestamp_struct& b)
{
    for (const auto field :
         {&tag_timestamp_struct::year, &tag_timestamp_struct::month, &tag_timestamp_struct::day,
          &tag_timestamp_struct::hour, &tag_timestamp_struct::minute, &tag_timestamp_struct::second}) {
        if (a.*field != b.*field) {
            return order_of(a.*field, b.*field);
        }
    }
    return order_of(a.fraction, b.fraction);
}

// A raw side is replaced by a copy in normal form. False when memory ran out.
bool normalize_side(const berval*& side, berval_guard& copy, std::uint32_t syntax)
{
    copy.reset(ber_bvdup(side));
    if (copy == nullptr || value_normalize_berval(copy.get(), syntax, 0) == LDAP_NO_MEMORY) {
        return false;
    }
    side = copy.get();
    return true;
}

int compare_normal_texts(const berval* a, const berval* b, std::uint32_t syntax, int raw)
{
    berval_guard copy_a;
    berval_guard copy_b;
    if (((raw & 1) != 0 && !normalize_side(a, copy_a, syntax)) ||
        ((raw & 2) != 0 && !normalize_side(b, copy_b, syntax))) {
        debug_error("Error - value_cmp: ber_bvdup() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    return order_of(text_of(*a), text_of(*b));
}

int compare_ignoring_case(std::string_view a, std::string_view b)
{
    const int order = strncasecmp(a.data(), b.data(), std::min(a.size(), b.size()));
    return order != 0 ? order : order_of(a.size(), b.size());
}

int compare_bytes(const berval& a, const berval& b)
{
    const std::size_t common = std::min(a.bv_len, b.bv_len);
    const int order = common == 0 ? 0 : std::memcmp(a.bv_val, b.bv_val, common);
    return order != 0 ? order : order_of(a.bv_len, b.bv_len);
}

int compare_time_texts(const berval& a, const berval& b, std::uint32_t syntax)
{
    int result = LDAP_SUCCESS;
    const auto read = [&](const berval& value) {
        return heap_pointer<tag_timestamp_struct>(str2timestamp(short_value_text(value).c_str(), syntax, &result));
    };
    const auto time_a = read(a);
    const auto time_b = time_a == nullptr ? nullptr : read(b);
    if (time_b == nullptr) {
        debug_error("Error - value_cmp: str2timestamp() failed rc=%d\n", result);
        return result;
    }
    return compare_times(*time_a, *time_b);
}

// The content of a node: it was put there as a T.
template <typename T>
T content_of(const AttrvalsNorm& node)
{
    T content;
    std::memcpy(&content, node.value->bv_val, sizeof content);
    return content;
}

}  // namespace

extern "C" {

int value_cmp(const berval* a, const berval* b, std::uint32_t syntax, int raw)
{
    if (a == nullptr || b == nullptr) {
        debug_error("Error - value_cmp: berval is NULL\n");
        return LDAP_OTHER;
    }
    switch (syntax) {
    case SC_CIS:
    case SC_TEL | SC_CIS:
    case SC_DN | SC_CIS:
    case SC_BIT_STRING | SC_CIS:
    case SC_NUMERIC_STRING | SC_CIS:
    case SC_COUNTRY_STRING | SC_CIS: return compare_normal_texts(a, b, syntax, raw);
    case SC_CES: return order_of(text_of(*a), text_of(*b));
    case SC_BIN: return compare_bytes(*a, *b);
    case SC_INT:
        return order_of(std::strtoll(short_value_text(*a).c_str(), nullptr, 10),
                        std::strtoll(short_value_text(*b).c_str(), nullptr, 10));
    case SC_BOOL: return compare_ignoring_case(text_of(*a), text_of(*b));
    case SC_GT:
    case SC_UTCT: return compare_time_texts(*a, *b, syntax);
    default: return LDAP_INVALID_SYNTAX;
    }
}

int value_cmp_fast(const void* a, const void* b, int /*unused*/)
{
    const auto& first = *static_cast<const AttrvalsNorm*>(a);
    const auto& second = *static_cast<const AttrvalsNorm*>(b);
    switch (first.syntax) {
    case SC_CIS:
    case SC_CES:
    case SC_TEL | SC_CIS:
    case SC_DN | SC_CIS:
    case SC_BIT_STRING | SC_CIS:
    case SC_NUMERIC_STRING | SC_CIS:
    case SC_COUNTRY_STRING | SC_CIS: return std::strcmp(first.value->bv_val, second.value->bv_val);
    case SC_BIN: return order_of(first.value->bv_len, second.value->bv_len);
    case SC_INT:
    case SC_BOOL: return order_of(content_of<std::int32_t>(first), content_of<std::int32_t>(second));
    case SC_GT:
    case SC_UTCT:
        return compare_times(content_of<tag_timestamp_struct>(first), content_of<tag_timestamp_struct>(second));
    default: return LDAP_INVALID_SYNTAX;
    }
}

}  // extern "C"
