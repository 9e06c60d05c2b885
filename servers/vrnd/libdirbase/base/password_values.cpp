// Values between the clear and their stored form: see password_values.h.
#include "servers/vrnd/libdirbase/base/password_values.h"

#include <cstdlib>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"

aes_key_data* g_DirKeyData = nullptr;

namespace {

// For password libraries that take their salt from the caller.
constexpr const char* salt = "vrn";

#define LINE_TEXT_OF(line) #line
#define LINE_TEXT(line) LINE_TEXT_OF(line)

}  // namespace

extern "C" {

int value_encode_one_value(int method, const berval* value, berval* out, const aes_key_data* key)
{
    if (out != value) {
        *out = {0, nullptr};
    }
    if (method == PWD_NONE || method == PWD_CRYPT) {
        return LDAP_OTHER;
    }

    const unsigned long size = formatted_password_length(method, value->bv_len) + 1;
    heap_text buffer(static_cast<char*>(std::malloc(size)));
    if (buffer == nullptr) {
        debug_error("Error - value_encode_one_value: memory allocation failed near %s:%s\n", __FILE__,
                    LINE_TEXT(__LINE__));
        return LDAP_NO_MEMORY;
    }
    const unsigned long length = format_password(method, salt, key == nullptr ? g_DirKeyData : key, value->bv_val,
                                                 value->bv_len, buffer.get(), size);
    if (length == 0 || length >= size) {
        return LDAP_SUCCESS;
    }

    if (out == value) {
        wipe_and_free(out->bv_val, out->bv_len);
    }
    buffer.get()[length] = '\0';
    *out = {length, buffer.release()};
    return LDAP_SUCCESS;
}

int value_encode_values(int method, berval** values, int freeOld, const aes_key_data* key)
{
    if (method == PWD_NONE) {
        return LDAP_SUCCESS;
    }
    for (; values != nullptr && *values != nullptr; ++values) {
        berval& value = **values;
        if (check_format(value.bv_val, value.bv_len) != PWD_NONE) {
            continue;
        }
        berval encoded = {};
        const int rc = value_encode_one_value(method, &value, &encoded, key);
        if (rc != LDAP_SUCCESS) {
            return rc;
        }
        if (encoded.bv_val == nullptr) {
            debug_error("Error - value_encode_values: value stays in the clear, no text by method %d\n", method);
            continue;
        }
        if (freeOld != 0) {
            wipe_and_free(value.bv_val, value.bv_len);
        }
        value = encoded;
    }
    return LDAP_SUCCESS;
}

int value_decode_values(berval** values)
{
    for (; values != nullptr && *values != nullptr; ++values) {
        berval& value = **values;
        berval clear = {};
        if ((check_format(value.bv_val, value.bv_len) & PWD_TWO_WAY) != 0 &&
            unformat_password(value.bv_val, value.bv_len, g_DirKeyData, &clear.bv_val, &clear.bv_len) != 0) {
            std::free(value.bv_val);
            value = clear;
        }
    }
    return LDAP_SUCCESS;
}

}  // extern "C"
