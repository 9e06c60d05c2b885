// Controls of a request or a response (RFC 4511 section 4.1.11), and the arrays that carry them.
//
// Records, texts, bytes and arrays are blocks of malloc; an array is null-terminated. Nothing here is shared: calls on
// different arrays may run at once.
#pragma once

#include <cstdint>

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"

struct LDAPControl {
    char* ldctl_oid;
    berval ldctl_value;  // bv_val is null when the control has no value
    std::int32_t ldctl_iscritical;
};
