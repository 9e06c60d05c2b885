// Suffixes of back ends: see be_suffix.h.
#include "servers/vrnd/libdirbase/model/be_suffix.h"

#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/backend.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"

namespace {

int is_suffix(const Backend& be, const char* dn)
{
    for (char** suffix = be.be_suffix; suffix != nullptr && *suffix != nullptr; ++suffix) {
        if (std::strcmp(*suffix, dn) == 0) {
            return 1;
        }
    }
    return 0;
}

}  // namespace

int be_issuffix_internal(Backend* be, const char* dn, int normalised)
{
    if (dn == nullptr || *dn == '\0') {
        return 0;
    }
    if (normalised != 0) {
        return is_suffix(*be, dn);
    }
    ldap_escDN* normal = dn_normalize_esc(dn);
    const int rc = normal == nullptr ? static_cast<int>(LDAP_NO_MEMORY) : normal->result;
    if (rc == LDAP_NO_MEMORY) {
        debug_error("Error - be_issuffix_internal: dn_normalize_esc failed. Out of memory\n");
    }
    const int found = rc == LDAP_SUCCESS ? is_suffix(*be, GetDNUpper33(normal)) : 0;
    free_ldap_escDN(&normal);
    return rc == LDAP_NO_MEMORY ? rc : found;
}
