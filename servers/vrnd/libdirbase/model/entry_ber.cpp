// Entries in BER: see entry_ber.h.
#include "servers/vrnd/libdirbase/model/entry_ber.h"

#include <memory>

#include "libraries/libber/ber_element.h"
#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/model/attribute.h"

namespace {

// Until the buffer is handed over, it goes with the element.
struct free_element {
    void operator()(BerElement* ber) const noexcept { ber_free(ber, 1); }
};

}  // namespace

extern "C" int entry2ber(const Entry* entry, char** buffer, std::size_t* length)
{
    if (buffer == nullptr || length == nullptr) {
        return LDAP_OPERATIONS_ERROR;
    }
    *buffer = nullptr;
    *length = 0;
    if (entry == nullptr) {
        return LDAP_OPERATIONS_ERROR;
    }
    std::unique_ptr<BerElement, free_element> ber(ber_alloc());
    if (ber == nullptr) {
        PrintMessage(MSG_COMPONENT_SERVER, MSG_WARNING, 7);
        return LDAP_NO_MEMORY;
    }
    ber->ber_options = 1;
    if (ber_printf_w(ber.get(), "{s{", entry->e_dn) < 0) {
        debug_error("Error - ber2entry: ber_printf failed in file %s near line %d\n", __FILE__, __LINE__);
        return LDAP_OPERATIONS_ERROR;
    }
    for (const Attribute* attr = entry->e_attrs; attr != nullptr; attr = attr->a_next) {
        if (ber_printf_w(ber.get(), "{s[V]}", attr->a_type, attr->a_vals) < 0) {
            debug_error("Error - entry2ber: ber_printf of attribute type failed, type=%s, and values\n", attr->a_type);
            return LDAP_OPERATIONS_ERROR;
        }
    }
    if (ber_printf_w(ber.get(), "}}") < 0) {
        debug_error("Error - entry2ber: ber_printf of end of entry failed\n");
        return LDAP_OPERATIONS_ERROR;
    }
    *buffer = ber->ber_buf;
    *length = static_cast<std::size_t>(ber->ber_ptr - ber->ber_buf);
    ber_free(ber.release(), 0);
    return LDAP_SUCCESS;
}
