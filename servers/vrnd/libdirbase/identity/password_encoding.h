// How the configuration names password methods, which attributes hold passwords, and the form of the policy response.
#pragma once

#include "libraries/dirbase_export.h"

// A password attribute; the table's last row is zero.
typedef struct password_type password_type;
struct password_type {
    int number;
    const char* name;
    int length;  // of the name
};

DIRBASE_C_BEGIN

DIRBASE_EXPORT extern const password_type g_password_types[3];

// Puts into *out the number of the encryption method that the configuration names: "aes256", "aes192", "aes128",
// "crypt", "MD5", "SHA", "ssha" or "none", in any case. Any other word, and null, means AES-256. Returns 0.
DIRBASE_EXPORT int convertPWEncryptionMethod(const char* text, int* out);

// Which form the value of the password policy response control has, by the environment variable
// "USE_OPENLDAP_PWDPOLICY_CONTROL": 0 when it is not set, 1 for "YES" in any case, 2 for anything else. The first call
// decides for the life of the process.
DIRBASE_EXPORT int using_openldap_pwdpolicy_response(void);

DIRBASE_C_END
