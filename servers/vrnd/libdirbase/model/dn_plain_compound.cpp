// DNs with several pairs in an RDN, and the records that they are taken apart into: see dn_plain.h.
#include "servers/vrnd/libdirbase/model/dn_plain.h"

#include <cstdlib>
#include <cstring>
#include <memory>
#include <utility>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/model/dn_chars.h"
#include "servers/vrnd/libdirbase/model/dn_sort.h"

namespace {

struct delete_list {
    void operator()(rdn_type* rdn) const noexcept { rdn_type_delete(rdn); }
    void operator()(rdn_list* list) const noexcept { rdn_list_delete(list); }
    void operator()(dn_list* list) const noexcept { dn_list_delete(list); }
};
template <typename Record>
using guard = std::unique_ptr<Record, delete_list>;

bool at_separator(const char* at)
{
    return dn_chars::is(*at, dn_chars::separator | dn_chars::end);
}

// Passes over a character, or a backslash with what it escapes.
const char* behind_character(const char* at)
{
    return at + (*at == '\\' && at[1] != '\0' ? 2 : 1);
}

// The separator or the end behind the pair at `at`: quotes count at the beginning of a value, and what stands there
// counts as a part of it whatever it is.
const char* end_of_pair(const char* at)
{
    at += std::strcspn(at, "=");
    if (*at == '\0') {
        return at;
    }
    ++at;
    at += std::strspn(at, " \n");
    const char* const first = at;
    if (*first == '"') {
        for (++at; *at != '"'; at = behind_character(at)) {
            if (*at == '\0') {
                return at;
            }
        }
        while (!at_separator(at)) {
            ++at;
        }
        return at;
    }
    while (*at != '\0' && (at == first || !at_separator(at))) {
        at = behind_character(at);
    }
    return at;
}

guard<rdn_type> make_rdn(const char* text, std::size_t length)
{
    const auto* equals = static_cast<const char*>(std::memchr(text, '=', length));
    guard<rdn_type> rdn(equals == nullptr ? nullptr : rdn_type_new());
    if (rdn != nullptr) {
        rdn->type = strndup(text, static_cast<std::size_t>(equals - text));
        rdn->value = strndup(equals + 1, static_cast<std::size_t>(text + length - (equals + 1)));
        if (rdn->type == nullptr || rdn->value == nullptr) {
            rdn.reset();
        }
    }
    return rdn;
}

// Cuts the RDN at `at` into its pairs, moves `at` to the separator behind it, and tells how many pairs there are. Null
// when one of them is none, and without memory.
guard<rdn_list> cut_rdn(const char*& at, std::size_t& count)
{
    guard<rdn_list> pairs;
    rdn_list* last = nullptr;
    for (count = 0; count == 0 || *at == '+'; ++count) {
        at += count == 0 ? 0 : 1;
        const char* const end = end_of_pair(at);
        guard<rdn_type> rdn = make_rdn(at, static_cast<std::size_t>(end - at));
        guard<rdn_list> pair(rdn == nullptr ? nullptr : rdn_list_new());
        if (pair == nullptr) {
            return nullptr;
        }
        pair->rdn = rdn.release();
        rdn_list* const added = pair.get();
        if (last == nullptr) {
            pairs = std::move(pair);
        } else {
            last->next = pair.release();
        }
        last = added;
        at = end;
    }
    return pairs;
}

bool use_short_name(rdn_type& rdn)
{
    const char* const name = dn_attr_get_short_name(rdn.type, nullptr);
    if (name == nullptr) {
        debug_error("Error - rdn_type_init: attribute %s is not defined in the schema\n", rdn.type);
        PrintMessage(MSG_COMPONENT_RDBM, MSG_SEVERE, 13, rdn.type);
        return false;
    }
    char* const copy = strdup(name);
    if (copy == nullptr) {
        return false;
    }
    std::free(std::exchange(rdn.type, copy));
    return true;
}

bool comes_before(const rdn_list& a, const rdn_list& b)
{
    const int types = vrn_strcasecmp(a.rdn->type, b.rdn->type);
    return (types != 0 ? types : vrn_strcasecmp(a.rdn->value, b.rdn->value)) < 0;
}

bool normalize_pairs(guard<rdn_list>& pairs)
{
    for (rdn_list* pair = pairs.get(); pair != nullptr; pair = pair->next) {
        if (!use_short_name(*pair->rdn)) {
            return false;
        }
    }
    pairs.reset(sort_chain(pairs.release(), comes_before));
    return true;
}

// Takes a DN apart and normalises its RDNs. Null when that can't be done.
guard<dn_list> normalized_list(const char* dn)
{
    guard<dn_list> list;
    dn_list* last = nullptr;
    for (const char* at = dn;; ++at) {
        std::size_t count = 0;
        guard<rdn_list> pairs = cut_rdn(at, count);
        if (pairs == nullptr || (count > 1 && !normalize_pairs(pairs))) {
            return nullptr;
        }
        dn_list* const added = dn_list_new();
        if (added == nullptr) {
            return nullptr;
        }
        added->rdns = pairs.release();
        if (last == nullptr) {
            list.reset(added);
        } else {
            last->next = added;
        }
        last = added;
        if (*at == '\0') {
            return list;
        }
    }
}

// Calls a function with each text of a DN in order: types, values, and what stands between.
template <typename Function>
void for_each_text(const dn_list* list, Function&& function)
{
    for (const dn_list* rdns = list; rdns != nullptr; rdns = rdns->next) {
        function(rdns == list ? "" : ",");
        for (const rdn_list* pair = rdns->rdns; pair != nullptr; pair = pair->next) {
            function(pair == rdns->rdns ? "" : "+");
            function(pair->rdn->type);
            function("=");
            function(pair->rdn->value);
        }
    }
}

}  // namespace

extern "C" {

char* dn_normalize_compound_RDN(char* dn)
{
    const guard<dn_list> list(dn == nullptr || *dn == '\0' ? nullptr : normalized_list(dn));
    std::size_t length = 0;
    for_each_text(list.get(), [&](const char* text) { length += std::strlen(text); });
    // A type is replaced by the shortest of the ways to write it, so the text can't have grown.
    if (list != nullptr && length <= std::strlen(dn)) {
        char* out = dn;
        for_each_text(list.get(), [&](const char* text) { out = stpcpy(out, text); });
    }
    return dn;
}

rdn_type* rdn_type_new(void)
{
    return static_cast<rdn_type*>(std::calloc(1, sizeof(rdn_type)));
}

rdn_list* rdn_list_new(void)
{
    return static_cast<rdn_list*>(std::calloc(1, sizeof(rdn_list)));
}

dn_list* dn_list_new(void)
{
    return static_cast<dn_list*>(std::calloc(1, sizeof(dn_list)));
}

rdn_type* rdn_type_init(const char* text)
{
    return make_rdn(text, std::strlen(text)).release();
}

void rdn_type_delete(rdn_type* rdn)
{
    if (rdn != nullptr) {
        std::free(rdn->type);
        std::free(rdn->value);
        std::free(rdn);
    }
}

void rdn_list_delete(rdn_list* list)
{
    while (list != nullptr) {
        rdn_list* const next = list->next;
        rdn_type_delete(list->rdn);
        std::free(std::exchange(list, next));
    }
}

void dn_list_delete(dn_list* list)
{
    while (list != nullptr) {
        dn_list* const next = list->next;
        rdn_list_delete(list->rdns);
        std::free(std::exchange(list, next));
    }
}

}  // extern "C"
