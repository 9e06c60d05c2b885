// DNs as texts: see dn_suffix.h.
#include "servers/vrnd/libdirbase/model/dn_suffix.h"

#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/model/be_suffix.h"

namespace {

// What follows the first of the characters; null when there is none or nothing follows.
const char* behind(const char* at)
{
    return at == nullptr || *at == '\0' || at[1] == '\0' ? nullptr : at + 1;
}

const char* behind_first_rdn(const char* at)
{
    for (bool quoted = false; *at != '\0'; ++at) {
        if (*at == '\\' && at[1] != '\0') {
            ++at;
        } else if (*at == '"') {
            quoted = !quoted;
        } else if (!quoted && (*at == ',' || *at == ';')) {
            break;
        }
    }
    return behind(at);
}

const char* behind_first_part(const char* name)
{
    const char* at = std::strchr(name, '@');
    return behind(at != nullptr ? at : std::strchr(name, '.'));
}

// The parent within the DN, or null.
int find_parent(Backend* be, const char* dn, bool normalised, const char*& parent)
{
    parent = nullptr;
    if (dn == nullptr || *dn == '\0') {
        return LDAP_SUCCESS;
    }
    const int suffix = be == nullptr ? 0 : be_issuffix_internal(be, dn, normalised ? 1 : 0);
    if (suffix == LDAP_NO_MEMORY) {
        return LDAP_NO_MEMORY;
    }
    if (suffix == 0) {
        parent = dn_type(dn) ? behind_first_rdn(dn) : behind_first_part(dn);
    }
    return LDAP_SUCCESS;
}

int copy_parent(Backend* be, const char* dn, bool normalised, char** parent)
{
    const char* found = nullptr;
    const int rc = find_parent(be, dn, normalised, found);
    *parent = found == nullptr ? nullptr : strdup(found);
    return found != nullptr && *parent == nullptr ? LDAP_NO_MEMORY : rc;
}

heap_text upper_copy(const char* text)
{
    heap_text copy(strdup(text));
    utfToUpper(copy.get());
    return copy;
}

}  // namespace

extern "C" {

bool dn_issuffix(const char* dn, const char* suffix)
{
    if (dn == nullptr || suffix == nullptr) {
        return false;
    }
    const heap_text upper_dn = upper_copy(dn);
    const heap_text upper_suffix = upper_copy(suffix);
    if (upper_dn == nullptr || upper_suffix == nullptr) {
        debug_error("Error - dn_issuffix: strdup() failed. Out of memory\n");
        return false;
    }
    return dn_issuffix_norm(upper_dn.get(), upper_suffix.get());
}

bool dn_issuffix_norm(const char* dn, const char* suffix)
{
    if (dn == nullptr || suffix == nullptr) {
        return false;
    }
    const std::size_t length = std::strlen(dn);
    const std::size_t suffix_length = std::strlen(suffix);
    if (suffix_length > length) {
        return false;
    }
    const char* const tail = dn + (length - suffix_length);
    return (tail == dn || tail[-1] == ',') && std::strcmp(tail, suffix) == 0;
}

bool are_nested_dn(const char* a, const char* b)
{
    return dn_issuffix_norm(a, b) || dn_issuffix_norm(b, a);
}

bool dn_type(const char* text)
{
    return text != nullptr && std::strchr(text, '=') != nullptr;
}

char* dn_parent(Backend* be, const char* dn)
{
    char* parent = nullptr;
    copy_parent(be, dn, false, &parent);
    return parent;
}

char* dn_parent_norm(Backend* be, const char* dn)
{
    char* parent = nullptr;
    copy_parent(be, dn, true, &parent);
    return parent;
}

int dn_get_parent(Backend* be, const char* dn, char** parent)
{
    return copy_parent(be, dn, false, parent);
}

int dn_get_parent_norm(Backend* be, const char* dn, char** parent, int copy)
{
    if (copy != 0) {
        return copy_parent(be, dn, true, parent);
    }
    const char* found = nullptr;
    const int rc = find_parent(be, dn, true, found);
    *parent = const_cast<char*>(found);
    return rc;
}

}  // extern "C"
