// Making and releasing BER elements.
#include "libraries/libber/ber_element.h"

#include <cstddef>
#include <cstdlib>

#include "libraries/libber/ber_state.h"

// Callers have the record on their stacks and look at these places.
static_assert(offsetof(BerElement, ber_options) == 0 && offsetof(BerElement, ber_buf) == 8 &&
              offsetof(BerElement, ber_ptr) == 16 && offsetof(BerElement, ber_end) == 24 && sizeof(BerElement) == 848);

namespace {

bool is_readable(const berval* value)
{
    return value != nullptr && (value->bv_val != nullptr || value->bv_len == 0);
}

// Sets all but the starts of open constructions, which are there only as far as something is open.
void set_up(BerElement& ber, int options, unsigned state, char* bytes, std::size_t length)
{
    ber.ber_options = static_cast<std::uint8_t>(options);
    ber.ber_buf = bytes;
    ber.ber_ptr = bytes;
    ber.ber_end = bytes == nullptr ? nullptr : bytes + length;
    ber.ber_state = static_cast<std::uint8_t>(state);
    ber.ber_tag = 0;
    ber.ber_open = 0;
}

}  // namespace

extern "C" {

BerElement* ber_alloc_t(int options)
{
    auto* ber = static_cast<BerElement*>(std::malloc(sizeof(BerElement)));
    if (ber != nullptr) {
        set_up(*ber, options, ber_writes | ber_owns_record | ber_owns_buffer, nullptr, 0);
    }
    return ber;
}

BerElement* ber_alloc(void)
{
    return ber_alloc_t(0);
}

int ber_init2(const berval* value, int options, BerElement* ber)
{
    if (ber == nullptr) {
        return -1;
    }
    set_up(*ber, options, 0, nullptr, 0);
    if (!is_readable(value)) {
        return -1;
    }
    set_up(*ber, options, ber_reads, value->bv_val, value->bv_len);
    return 0;
}

BerElement* ber_init(const berval* value)
{
    if (!is_readable(value)) {
        return nullptr;
    }
    auto* ber = static_cast<BerElement*>(std::malloc(sizeof(BerElement)));
    char* bytes = ber_copy_bytes(*value);
    if (ber == nullptr || bytes == nullptr) {
        std::free(bytes);
        std::free(ber);
        return nullptr;
    }
    set_up(*ber, 0, ber_reads | ber_owns_record | ber_owns_buffer, bytes, value->bv_len);
    return ber;
}

void ber_free(BerElement* ber, int free_buffer)
{
    if (ber == nullptr) {
        return;
    }
    if (free_buffer != 0 && ber_is(*ber, ber_owns_buffer)) {
        std::free(ber->ber_buf);
    }
    if (ber_is(*ber, ber_owns_record)) {
        std::free(ber);
    }
}

int ber_flatten(const BerElement* ber, berval** value)
{
    if (value == nullptr) {
        return -1;
    }
    *value = nullptr;
    if (ber == nullptr || !ber_is(*ber, ber_writes) || ber_is(*ber, ber_has_failed) || ber->ber_open != 0 ||
        ber->ber_tag != 0) {
        return -1;
    }
    const berval written = {static_cast<unsigned long>(ber->ber_ptr - ber->ber_buf), ber->ber_buf};
    *value = ber_bvdup(&written);
    return *value == nullptr ? -1 : 0;
}

BerElement* fber_alloc(void)
{
    return ber_alloc();
}

int fber_init2(const berval* value, int options, BerElement* ber)
{
    return ber_init2(value, options, ber);
}

void fber_free(BerElement* ber, int free_buffer)
{
    ber_free(ber, free_buffer);
}

}  // extern "C"
