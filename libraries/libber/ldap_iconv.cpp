// Character conversion of the client library.
#include "libraries/libber/ldap_iconv.h"

#include <algorithm>
#include <cerrno>
#include <limits>
#include <new>

#include <langinfo.h>

namespace {

// What iconv_open gives: the platform's own choice of a pointer.
void* const not_available = reinterpret_cast<void*>(-1);  // NOLINT(performance-no-int-to-ptr)

}  // namespace

extern "C" {

ldap_iconv_t* ldap_iconv_open(const char* to, const char* from)
{
    auto* conversion = new (std::nothrow) ldap_iconv_t{not_available};
    if (conversion == nullptr) {
        errno = ENOMEM;
    } else if (to == nullptr || from == nullptr) {
        errno = EINVAL;
    } else {
        conversion->descriptor = iconv_open(to, from);
    }
    return conversion;
}

int ldap_iconv(ldap_iconv_t* conversion, char** in, std::size_t* in_left, char** out, std::size_t* out_left)
{
    if (conversion == nullptr || conversion->descriptor == not_available) {
        errno = EBADF;
        return -1;
    }
    const std::size_t substituted = iconv(conversion->descriptor, in, in_left, out, out_left);
    if (substituted == static_cast<std::size_t>(-1)) {
        return -1;
    }
    return static_cast<int>(std::min<std::size_t>(substituted, std::numeric_limits<int>::max()));
}

int ldap_iconv_close(ldap_iconv_t* conversion)
{
    if (conversion == nullptr) {
        return 0;
    }
    iconv_t descriptor = conversion->descriptor;
    delete conversion;
    return descriptor == not_available ? 0 : iconv_close(descriptor);
}

const char* ldap_nl_langinfo(int item)
{
    if (item != LDAP_NL_CODESET) {
        return nullptr;
    }
    const char* name = nl_langinfo(CODESET);
    return name == nullptr || *name == '\0' ? nullptr : name;
}

}  // extern "C"
