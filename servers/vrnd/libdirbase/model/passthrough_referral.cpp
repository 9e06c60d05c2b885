// Entries whose password is checked by another server: see passthrough_referral.h.
//
// Values of entries have a zero byte behind them, so they are compared and printed as texts.
#include "servers/vrnd/libdirbase/model/passthrough_referral.h"

#include <algorithm>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/attribute.h"

namespace {

bool is_passthrough_referral(const Entry& entry)
{
    const Attribute* const classes = attr_find(&entry, "objectclass", 0, nullptr);
    return classes != nullptr &&
           std::any_of(classes->a_vals, classes->a_vals + classes->a_numvals,
                       [](const berval* name) { return vrn_strcasecmp(name->bv_val, "xan-ptaReferral") == 0; });
}

// The first value, empty for an attribute that has lost its values.
berval first_value(const Attribute& attr)
{
    static char nothing[] = "";
    return attr.a_numvals == 0 ? berval{0, nothing} : *attr.a_vals[0];
}

bool is_link_attribute(const berval& value)
{
    return is_attr_name_valid(value.bv_val, static_cast<int>(value.bv_len)) ||
           vrn_strcasecmp(value.bv_val, "_DN_") == 0 || vrn_strcasecmp(value.bv_val, "_DISABLE_") == 0;
}

}  // namespace

extern "C" {

int checkPassthroughReferral(const Entry* entry)
{
    if (entry == nullptr || !is_passthrough_referral(*entry)) {
        return LDAP_SUCCESS;
    }
    if (const Attribute* const name = attr_find(entry, "xan-ptaLinkAttribute", 0, nullptr); name != nullptr) {
        const berval value = first_value(*name);
        if (!is_link_attribute(value)) {
            debug_error("Error - checkPassthroughReferral: Invalid value for xan-ptaLinkAttr = %s\n", value.bv_val);
            return LDAP_CONSTRAINT_VIOLATION;
        }
    }
    const Attribute* const link = attr_find(entry, "xan-ptaLinkValue", 0, nullptr);
    if (link != nullptr && first_value(*link).bv_len == 0) {
        debug_error("Error - checkPassthroughReferral: Invalid value for xan-ptaLinkValue");
        return LDAP_CONSTRAINT_VIOLATION;
    }
    return LDAP_SUCCESS;
}

}  // extern "C"
