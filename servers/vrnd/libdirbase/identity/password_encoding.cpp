// Password methods, password attributes and the form of the policy response: see password_encoding.h.
#include "servers/vrnd/libdirbase/identity/password_encoding.h"

#include "libraries/libpwd/pwd_format.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/environment.h"
#include "servers/vrnd/libdirbase/base/heap.h"

const password_type g_password_types[3] = {{1, "USERPASSWORD", 12}, {2, "SECRETKEY", 9}, {0, nullptr, 0}};

namespace {

struct method_word {
    const char* word;
    int method;
};
constexpr method_word method_words[] = {
    {"aes256", PWD_AES256}, {"aes192", PWD_AES192}, {"aes128", PWD_AES128}, {"crypt", PWD_CRYPT},
    {"MD5", PWD_MD5},       {"SHA", PWD_SHA},       {"ssha", PWD_SSHA},     {"none", PWD_NONE},
};

}  // namespace

extern "C" {

int convertPWEncryptionMethod(const char* text, int* out)
{
    *out = PWD_AES256;
    for (const method_word& known : method_words) {
        if (vrn_strcasecmp(text, known.word) == 0) {
            *out = known.method;
        }
    }
    return 0;
}

int using_openldap_pwdpolicy_response(void)
{
    static const int form = [] {
        const heap_text value = environment_value("USE_OPENLDAP_PWDPOLICY_CONTROL");
        if (value == nullptr) {
            return 0;
        }
        return vrn_strcasecmp(value.get(), "YES") == 0 ? 1 : 2;
    }();
    return form;
}

}  // extern "C"
