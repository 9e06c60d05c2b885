// Counted values: see berval.h.
#include "libraries/libber/berval.h"

#include <climits>
#include <cstdlib>
#include <cstring>

extern "C" {

berval* ber_bvdup(const berval* value)
{
    if (value == nullptr) {
        return nullptr;
    }
    const unsigned long length = value->bv_val == nullptr ? 0 : value->bv_len;
    if (length == ULONG_MAX) {  // no room for the zero byte
        return nullptr;
    }
    auto* copy = static_cast<berval*>(std::malloc(sizeof(berval)));
    auto* bytes = static_cast<char*>(std::malloc(length + 1));
    if (copy == nullptr || bytes == nullptr) {
        std::free(copy);
        std::free(bytes);
        return nullptr;
    }
    if (length != 0) {
        std::memcpy(bytes, value->bv_val, length);
    }
    bytes[length] = '\0';
    *copy = {length, bytes};
    return copy;
}

void ber_bvfree(berval* value)
{
    if (value != nullptr) {
        std::free(value->bv_val);
    }
    std::free(value);
}

void ber_bvecfree(berval** values)
{
    for (berval** value = values; value != nullptr && *value != nullptr; ++value) {
        ber_bvfree(*value);
    }
    std::free(values);
}

}  // extern "C"
