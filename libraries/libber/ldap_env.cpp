// Environment look-up of the client library.
#include "libraries/libber/ldap_env.h"

#include <cstdlib>
#include <cstring>

extern "C" char* ldap_getenv(const char* name)
{
    if (name == nullptr) {
        return nullptr;
    }
    const char* value = std::getenv(name);
    return value == nullptr ? nullptr : ::strdup(value);
}
