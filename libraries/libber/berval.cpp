// Counted values: see berval.h.
#include "libraries/libber/berval.h"

#include <cstdlib>

#include "libraries/libber/ber_state.h"

extern "C" {

berval* ber_bvdup(const berval* value)
{
    if (value == nullptr) {
        return nullptr;
    }
    auto* copy = static_cast<berval*>(std::malloc(sizeof(berval)));
    char* bytes = ber_copy_bytes(*value);
    if (copy == nullptr || bytes == nullptr) {
        std::free(copy);
        std::free(bytes);
        return nullptr;
    }
    *copy = {value->bv_val == nullptr ? 0 : value->bv_len, bytes};
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
