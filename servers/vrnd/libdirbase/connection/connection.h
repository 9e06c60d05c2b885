// The record of one client connection, and of one request on it: the members that are read so far, in their order.
//
// The server's front end makes the records and owns them and their texts.
#pragma once

#include <cstdint>

struct Operation {
    std::int32_t o_opid = 0;  // number of the request on its connection
};

struct Connection {
    Operation* c_ops = nullptr;         // the request in progress, or null
    const char* c_client_ip = nullptr;  // address of the client, or null
    std::int32_t c_connid = 0;          // number of the connection
    std::int16_t c_ssl = 0;             // 1: the transport is secure
    std::int16_t c_bind_state = 0;      // 0 not bound, 1 bound, 2 bound as the root administrator
    std::uint8_t c_audit_flag = 0;      // 1: goes into the audit record
};
