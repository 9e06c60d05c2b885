// Result codes in words.
#include "libraries/libber/ldap_error.h"

#include "libraries/libber/ldap_result.h"

namespace {

// A switch over all enumerators, so that the compiler tells when one gets no text.
const char* text_of(ldap_result code)
{
    switch (code) {
    case LDAP_SUCCESS: return "Success";
    case LDAP_OPERATIONS_ERROR: return "Operations error";
    case LDAP_PROTOCOL_ERROR: return "Protocol error";
    case LDAP_TIMELIMIT_EXCEEDED: return "Time limit exceeded";
    case LDAP_SIZELIMIT_EXCEEDED: return "Size limit exceeded";
    case LDAP_COMPARE_FALSE: return "Compare false";
    case LDAP_COMPARE_TRUE: return "Compare true";
    case LDAP_AUTH_METHOD_NOT_SUPPORTED: return "Authentication method not supported";
    case LDAP_STRONG_AUTH_REQUIRED: return "Stronger authentication required";
    case LDAP_REFERRAL: return "Referral";
    case LDAP_ADMINLIMIT_EXCEEDED: return "Administrative limit exceeded";
    case LDAP_UNAVAILABLE_CRITICAL_EXTENSION: return "Critical extension unavailable";
    case LDAP_CONFIDENTIALITY_REQUIRED: return "Confidentiality required";
    case LDAP_SASL_BIND_IN_PROGRESS: return "SASL bind in progress";
    case LDAP_NO_SUCH_ATTRIBUTE: return "No such attribute";
    case LDAP_UNDEFINED_TYPE: return "Undefined attribute type";
    case LDAP_INAPPROPRIATE_MATCHING: return "Inappropriate matching";
    case LDAP_CONSTRAINT_VIOLATION: return "Constraint violation";
    case LDAP_TYPE_OR_VALUE_EXISTS: return "Attribute or value exists";
    case LDAP_INVALID_SYNTAX: return "Invalid attribute syntax";
    case LDAP_NO_SUCH_OBJECT: return "No such object";
    case LDAP_ALIAS_PROBLEM: return "Alias problem";
    case LDAP_INVALID_DN_SYNTAX: return "Invalid DN syntax";
    case LDAP_IS_LEAF: return "Object is a leaf";
    case LDAP_ALIAS_DEREF_PROBLEM: return "Alias dereferencing problem";
    case LDAP_INAPPROPRIATE_AUTH: return "Inappropriate authentication";
    case LDAP_INVALID_CREDENTIALS: return "Invalid credentials";
    case LDAP_INSUFFICIENT_ACCESS: return "Insufficient access rights";
    case LDAP_BUSY: return "Server is busy";
    case LDAP_UNAVAILABLE: return "Server is unavailable";
    case LDAP_UNWILLING_TO_PERFORM: return "Server is unwilling to perform";
    case LDAP_LOOP_DETECT: return "Loop detected";
    case LDAP_NAMING_VIOLATION: return "Naming violation";
    case LDAP_OBJECT_CLASS_VIOLATION: return "Object class violation";
    case LDAP_NOT_ALLOWED_ON_NONLEAF: return "Not allowed on a non-leaf entry";
    case LDAP_NOT_ALLOWED_ON_RDN: return "Not allowed on the RDN";
    case LDAP_ALREADY_EXISTS: return "Entry already exists";
    case LDAP_NO_OBJECT_CLASS_MODS: return "Object class modifications prohibited";
    case LDAP_AFFECTS_MULTIPLE_DSAS: return "Affects multiple servers";
    case LDAP_OTHER: return "Other error";
    case LDAP_SERVER_DOWN: return "Can't contact the server";
    case LDAP_LOCAL_ERROR: return "Local error";
    case LDAP_ENCODING_ERROR: return "Encoding error";
    case LDAP_DECODING_ERROR: return "Decoding error";
    case LDAP_TIMEOUT: return "Timed out";
    case LDAP_AUTH_UNKNOWN: return "Unknown authentication method";
    case LDAP_FILTER_ERROR: return "Bad search filter";
    case LDAP_USER_CANCELLED: return "Cancelled by the user";
    case LDAP_PARAM_ERROR: return "Bad parameter";
    case LDAP_NO_MEMORY: return "Out of memory";
    case LDAP_CONNECT_ERROR: return "Connection error";
    case LDAP_NOT_SUPPORTED: return "Not supported";
    }
    return "Unknown error";
}

}  // namespace

extern "C" const char* ldap_err2string(int code)
{
    return text_of(static_cast<ldap_result>(code));
}
