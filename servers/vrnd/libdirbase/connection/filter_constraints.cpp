// What the rules of an attribute permit in filters: see filter_ber.h.
#include <cstdlib>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libpwd/pwd_format.h"
#include "servers/vrnd/libdirbase/connection/filter_ber.h"

namespace {

constexpr std::size_t error_text_size = 1000;

}  // namespace

extern "C" int filter_check_attr_constraints(const Connection* conn, std::uint64_t choice, const asyntaxinfo* info,
                                             char** error_text)
{
    const bool is_presence = choice == LDAP_FILTER_PRESENT;
    if (info == nullptr || (!is_presence && choice != LDAP_FILTER_SUBSTRINGS && !filter_has_ava(choice))) {
        return LDAP_SUCCESS;
    }
    const bool two_way = (info->encryption & PWD_TWO_WAY) != 0;
    const bool is_secure = conn != nullptr && (conn->c_bind_state != 0 || conn->c_ssl != 0 || conn->c_audit_flag != 0);
    int result = LDAP_UNWILLING_TO_PERFORM;
    int message = 0;
    if (two_way && !is_presence && choice != LDAP_FILTER_EQUALITY) {
        message = 157;
    } else if (!two_way && info->encryption != PWD_NONE && !is_presence) {
        message = 158;
    } else if (info->non_matchable != 0) {
        message = 159;
    } else if (info->secure_connection != 0 && !is_secure) {
        message = 160;
        result = LDAP_CONFIDENTIALITY_REQUIRED;
    } else {
        return LDAP_SUCCESS;
    }
    const char* const name = info->names == nullptr || info->names[0] == nullptr ? "null" : info->names[0];
    if (error_text != nullptr) {
        *error_text = static_cast<char*>(std::malloc(error_text_size));
        if (*error_text != nullptr) {
            getPrintedMessage(*error_text, error_text_size, MSG_COMPONENT_OPERATION, MSG_ERROR, message, name);
        }
    }
    return result;
}
