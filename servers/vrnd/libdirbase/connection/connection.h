// The record of one client connection, and of one request on it: the members that are read so far, in their order.
//
// The server's front end makes the records and owns them and their texts.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

typedef struct Operation Operation;
struct Operation {
    int32_t o_opid DIRBASE_DEFAULT(0);  // number of the request on its connection
};

typedef struct Connection Connection;
struct Connection {
    Operation* c_ops DIRBASE_DEFAULT(nullptr);         // the request in progress, or null
    const char* c_client_ip DIRBASE_DEFAULT(nullptr);  // address of the client, or null
    int32_t c_connid DIRBASE_DEFAULT(0);               // number of the connection
    int16_t c_ssl DIRBASE_DEFAULT(0);                  // 1: the transport is secure
    int16_t c_bind_state DIRBASE_DEFAULT(0);           // 0 not bound, 1 bound, 2 bound as the root administrator
    uint8_t c_audit_flag DIRBASE_DEFAULT(0);           // 1: goes into the audit record
};

DIRBASE_C_END
