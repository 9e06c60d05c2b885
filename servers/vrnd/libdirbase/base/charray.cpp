// Arrays of texts. What fails half-way leaves no trace: room and copies are made first, and the array changes last.
#include "servers/vrnd/libdirbase/base/charray.h"

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>

#include <strings.h>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/slapi_ch.h"

namespace {

struct charray_deleter {
    void operator()(char** array) const { charray_free(array); }
};
using charray_guard = std::unique_ptr<char*, charray_deleter>;

std::size_t count_of(char* const* array)
{
    std::size_t count = 0;
    if (array != nullptr) {
        while (array[count] != nullptr)
            ++count;
    }
    return count;
}

void report_no_memory(const char* function, const char* call)
{
    debug_error("Error - %s: %s failed. Out of memory\n", function, call);
}

// Makes *array at least `slots` long, the terminator's slot included, for a function of that name. False when memory
// ran out. A null array becomes one whose slots are still to be set, all of them.
bool make_room(char*** array, std::size_t slots, const char* function)
{
    auto* grown = static_cast<char**>(std::realloc(*array, slots * sizeof(char*)));
    if (grown == nullptr) {
        report_no_memory(function, *array == nullptr ? "malloc" : "realloc");
        return false;
    }
    *array = grown;
    return true;
}

// The order of charray_add_sorted_by_len.
int mystrcmp(const char* a, const char* b)
{
    const std::size_t length_a = std::strlen(a);
    const std::size_t length_b = std::strlen(b);
    if (length_a != length_b)
        return length_a < length_b ? -1 : 1;
    return std::strcmp(a, b);
}

// Copies with the terminator, in exactly as many slots; null when memory ran out.
charray_guard deep_copy(char* const* array, std::size_t count, char* (*duplicate)(const char*))
{
    charray_guard copy(static_cast<char**>(std::calloc(count + 1, sizeof(char*))));
    for (std::size_t i = 0; copy && i < count; ++i) {
        copy.get()[i] = duplicate(array[i]);
        if (copy.get()[i] == nullptr)
            copy.reset();
    }
    return copy;
}

char* duplicate_text(const char* text)
{
    return strdup(text);
}

}  // namespace

extern "C" {

int charray_add(char*** array, char* text)
{
    const std::size_t count = count_of(*array);
    if (!make_room(array, count + 2, "charray_add"))
        return LDAP_NO_MEMORY;
    (*array)[count] = text;
    (*array)[count + 1] = nullptr;
    return LDAP_SUCCESS;
}

int charray_add_sorted_by_len(char*** array, char* text)
{
    const std::size_t count = count_of(*array);
    if (!make_room(array, count + 2, "charray_add_sorted_by_len"))
        return LDAP_NO_MEMORY;

    char** place = *array;
    char** end = *array + count;
    while (place != end && mystrcmp(*place, text) <= 0)
        ++place;
    end[1] = nullptr;
    std::memmove(place + 1, place, static_cast<std::size_t>(end - place) * sizeof(char*));
    *place = text;
    return LDAP_SUCCESS;
}

int charray_merge(char*** array, char** other)
{
    const std::size_t count = count_of(*array);
    const std::size_t added = count_of(other);
    if (!make_room(array, count + added + 1, "charray_merge"))
        return LDAP_NO_MEMORY;
    std::memcpy(*array + count, other, (added + 1) * sizeof(char*));  // the terminator comes along
    return LDAP_SUCCESS;
}

int charray_merge_copy(char*** array, char** other)
{
    charray_guard copies = deep_copy(other, count_of(other), slapi_ch_strdup);
    if (!copies) {
        report_no_memory("charray_merge", "malloc");
        return LDAP_NO_MEMORY;
    }
    const int rc = charray_merge(array, copies.get());
    if (rc == LDAP_SUCCESS)
        std::free(copies.release());
    return rc;
}

void charray_free(char** array)
{
    for (char** text = array; text != nullptr && *text != nullptr; ++text)
        std::free(*text);
    std::free(array);
}

int charray_inlist(char** array, const char* text)
{
    int index = 0;
    return charray_inlist_with_index(array, text, &index);
}

int charray_inlist_with_index(char** array, const char* text, int* index)
{
    int at = 0;
    while (array[at] != nullptr && strcasecmp(array[at], text) != 0)
        ++at;
    *index = at;
    return array[at] != nullptr ? 1 : 0;
}

char** charray_dup(char** array)
{
    const std::size_t count = count_of(array);
    return count == 0 ? nullptr : deep_copy(array, count, duplicate_text).release();
}

char** str2charray(char* text, const char* separators)
{
    std::size_t slots = 2;
    for (const char* at = text; (at = std::strpbrk(at, separators)) != nullptr; ++at)
        ++slots;

    charray_guard parts(static_cast<char**>(std::calloc(slots, sizeof(char*))));
    if (!parts)
        return nullptr;
    char* rest = nullptr;
    std::size_t count = 0;
    for (char* part = strtok_r(text, separators, &rest); part != nullptr; part = strtok_r(nullptr, separators, &rest)) {
        parts.get()[count] = strdup(part);
        if (parts.get()[count++] == nullptr)
            return nullptr;
    }
    return parts.release();
}

}  // extern "C"
