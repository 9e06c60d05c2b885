// Controls and their arrays: see ldap_control.h.
#include "libraries/libber/ldap_control.h"

#include <cstdlib>
#include <cstring>

#include "libraries/libber/ldap_result.h"

namespace {

std::size_t count_of(LDAPControl* const* controls)
{
    std::size_t count = 0;
    while (controls != nullptr && controls[count] != nullptr) {
        ++count;
    }
    return count;
}

}  // namespace

extern "C" {

void ldap_control_free(LDAPControl* control)
{
    if (control != nullptr) {
        std::free(control->ldctl_oid);
        std::free(control->ldctl_value.bv_val);
    }
    std::free(control);
}

void ldap_controls_free(LDAPControl** controls)
{
    for (LDAPControl** control = controls; control != nullptr && *control != nullptr; ++control) {
        ldap_control_free(*control);
    }
    std::free(controls);
}

LDAPControl* ldap_copy_control(const LDAPControl* control)
{
    if (control == nullptr) {
        return nullptr;
    }
    auto* copy = static_cast<LDAPControl*>(std::calloc(1, sizeof(LDAPControl)));
    if (copy == nullptr) {
        return nullptr;
    }
    copy->ldctl_iscritical = control->ldctl_iscritical;
    bool whole = true;
    if (control->ldctl_oid != nullptr) {
        copy->ldctl_oid = ::strdup(control->ldctl_oid);
        whole = copy->ldctl_oid != nullptr;
    }
    if (whole && control->ldctl_value.bv_val != nullptr) {
        berval* value = ber_bvdup(&control->ldctl_value);
        whole = value != nullptr;
        if (whole) {
            copy->ldctl_value = *value;
        }
        std::free(value);  // the bytes are the copy's now
    }
    if (!whole) {
        ldap_control_free(copy);
        return nullptr;
    }
    return copy;
}

int ldap_copy_controls(LDAPControl* const* controls, LDAPControl*** copy)
{
    if (copy == nullptr) {
        return LDAP_PARAM_ERROR;
    }
    *copy = nullptr;
    if (controls == nullptr) {
        return LDAP_SUCCESS;
    }
    const std::size_t count = count_of(controls);
    auto** array = static_cast<LDAPControl**>(std::calloc(count + 1, sizeof(void*)));
    if (array == nullptr) {
        return LDAP_NO_MEMORY;
    }
    for (std::size_t i = 0; i < count; ++i) {
        array[i] = ldap_copy_control(controls[i]);
        if (array[i] == nullptr) {
            ldap_controls_free(array);
            return LDAP_NO_MEMORY;
        }
    }
    *copy = array;
    return LDAP_SUCCESS;
}

int ldap_insert_control(LDAPControl* control, LDAPControl*** controls)
{
    if (control == nullptr || controls == nullptr) {
        return LDAP_PARAM_ERROR;
    }
    const std::size_t count = count_of(*controls);
    auto** array = static_cast<LDAPControl**>(std::realloc(*controls, (count + 2) * sizeof(void*)));
    if (array == nullptr) {
        return LDAP_NO_MEMORY;
    }
    array[count] = control;
    array[count + 1] = nullptr;
    *controls = array;
    return LDAP_SUCCESS;
}

int ldap_remove_control(LDAPControl* control, LDAPControl*** controls, int free_control)
{
    if (control == nullptr || controls == nullptr) {
        return LDAP_PARAM_ERROR;
    }
    const std::size_t count = count_of(*controls);
    std::size_t place = 0;
    while (place < count && (*controls)[place] != control) {
        ++place;
    }
    if (place == count) {
        return LDAP_PARAM_ERROR;
    }
    std::memmove(*controls + place, *controls + place + 1, (count - place) * sizeof(void*));
    if (count == 1) {
        std::free(*controls);
        *controls = nullptr;
    }
    if (free_control != 0) {
        ldap_control_free(control);
    }
    return LDAP_SUCCESS;
}

}  // extern "C"
