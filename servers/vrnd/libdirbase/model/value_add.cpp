// Value arrays: their growth, and appending to them. Normalising and the tree are in value_batch.cpp.
#include "servers/vrnd/libdirbase/model/value_add.h"

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/password_values.h"

namespace {

constexpr std::int64_t doubling_limit = 10001;
constexpr std::int64_t step = 10001;
constexpr std::int64_t most_pointers = std::numeric_limits<std::ptrdiff_t>::max() / std::int64_t{sizeof(berval*)};

std::int64_t count_of(berval** values)
{
    std::int64_t count = 0;
    while (values != nullptr && values[count] != nullptr) {
        ++count;
    }
    return count;
}

// Gives an array room for `capacity` pointers. False when there is no memory for that, with the array as it was.
bool resize(berval*** array, std::int64_t capacity)
{
    if (capacity > most_pointers) {
        return false;
    }
    void* resized = std::realloc(*array, static_cast<std::size_t>(capacity) * sizeof(berval*));
    if (resized == nullptr) {
        return false;
    }
    *array = static_cast<berval**>(resized);
    return true;
}

int no_memory(const char* function, const char* call)
{
    debug_error("Error - %s: %s() failed. Out of memory\n", function, call);
    return LDAP_NO_MEMORY;
}

// Makes room for `added` more values and the terminator. The array is terminated afterwards.
int make_room(const char* function, berval*** array, std::int64_t added, Attribute& attr)
{
    const bool first = *array == nullptr;
    const std::int64_t total = attr.a_numvals + added;
    if (first || attr.a_maxvals < total + 1) {
        const std::int64_t capacity = total < doubling_limit ? 2 * total + 1 : total + step;
        if (!resize(array, capacity)) {
            return no_memory(function, first ? "malloc" : "realloc");
        }
        attr.a_maxvals = capacity;
        (*array)[attr.a_numvals] = nullptr;
    }
    return LDAP_SUCCESS;
}

// Appends copies behind the first `count` values of an array with room for them; all or none.
bool append_copies(berval** array, berval** values, std::int64_t count, std::int64_t added)
{
    for (std::int64_t i = 0; i < added; ++i) {
        array[count + i] = ber_bvdup(values[i]);
        if (array[count + i] == nullptr) {
            while (i-- > 0) {
                ber_bvfree(array[count + i]);
            }
            array[count] = nullptr;
            return false;
        }
    }
    array[count + added] = nullptr;
    return true;
}

// Whether a value is to be decoded before it is looked at.
bool is_decodable(const berval& value)
{
    return value.bv_val != nullptr && (check_format(value.bv_val, value.bv_len) & PWD_TWO_WAY) != 0;
}

struct decoded_values {
    berval** given = nullptr;
    berval** copies = nullptr;
    ~decoded_values() { free_dup_vals(given, copies); }
};

}  // namespace

extern "C" {

int value_add(berval*** array, berval** values, Attribute* attr)
{
    const std::int64_t added = count_of(values);
    const int result = make_room("value_add", array, added, *attr);
    if (result != LDAP_SUCCESS) {
        return result;
    }
    if (!append_copies(*array, values, attr->a_numvals, added)) {
        return no_memory("value_add", "ber_bvdup");
    }
    attr->a_numvals += added;
    if (added != 0) {
        attr_free_normvals(attr);
        attr_free_decodedvals(attr);
    }
    return LDAP_SUCCESS;
}

int value_add_fast(berval*** array, berval** values, std::int64_t old_count, std::int64_t added, std::int64_t* capacity)
{
    std::int64_t room = *capacity <= 0 ? 1 : *capacity;
    while (room < old_count + added + 1 && room <= most_pointers) {
        room *= 2;
    }
    if (!resize(array, room)) {
        return no_memory("value_add_fast", "realloc");
    }
    *capacity = room;
    if (!append_copies(*array, values, old_count, added)) {
        return no_memory("value_add_fast", "ber_bvdup");
    }
    return LDAP_SUCCESS;
}

int value_add_normalize(berval*** array, berval** values, std::uint32_t syntax, Attribute* attr, int drop_duplicates,
                        int decode)
{
    if (attr == nullptr) {
        debug_error("Error - value_add_normalize: NULL attr\n");
        return LDAP_OPERATIONS_ERROR;
    }
    const std::int64_t added = count_of(values);
    int result = make_room("value_add_normalize", array, added, *attr);
    if (result != LDAP_SUCCESS) {
        return result;
    }
    int mode = 0;
    decoded_values decoded;
    if (decode != 0 && attr->a_info != nullptr && (attr->a_info->encryption & PWD_TWO_WAY) != 0) {
        decoded.given = values;
        result = dup_and_decode_vals(values, &decoded.copies);
        if (result != LDAP_SUCCESS) {
            return result;
        }
        values = decoded.copies;
        mode = VALUES_ARE_CLEAR;
    }
    std::int64_t taken = 0;
    result =
        create_normalized_values(mode, &taken, added, attr->a_numvals, values, array, attr, syntax, drop_duplicates);
    attr->a_numvals += taken;
    (*array)[attr->a_numvals] = nullptr;
    if (taken != 0) {
        attr_free_decodedvals(attr);
    }
    return result;
}

int dup_and_decode_vals(berval** values, berval*** copies)
{
    // The array, its terminator, and behind it a record for each value that is decoded.
    const auto count = static_cast<std::size_t>(count_of(values));
    auto* array = static_cast<berval**>(std::calloc(1, (count + 1) * sizeof(berval*) + count * sizeof(berval)));
    *copies = array;
    if (array == nullptr) {
        debug_error("ERROR: dup_and_decode_vals - memory allocation error\n");
        return LDAP_NO_MEMORY;
    }
    auto* record = reinterpret_cast<berval*>(array + count + 1);
    for (std::size_t i = 0; i < count; ++i, ++record) {
        const berval& value = *values[i];
        const bool decoded = is_decodable(value) && unformat_password(value.bv_val, value.bv_len, g_DirKeyData,
                                                                      &record->bv_val, &record->bv_len) != 0;
        array[i] = decoded ? record : values[i];
    }
    return LDAP_SUCCESS;
}

void free_dup_vals(berval** values, berval** copies)
{
    for (std::size_t i = 0; copies != nullptr && copies[i] != nullptr; ++i) {
        if (copies[i] != values[i]) {
            wipe_and_free(copies[i]->bv_val, copies[i]->bv_len);
        }
    }
    std::free(copies);
}

}  // extern "C"
