// Any text as a control and as an array of controls. The text of a control reads back as one of the same OID and
// criticality, and from the second time on, with the space of a plain value taken into Base64, of the same value.
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "libraries/libldif/control_text.h"
#include "libraries/libldif/line64.h"

using fuzz_support::expect;

namespace {

struct release {
    void operator()(LDAPControl* control) const { ldap_control_free(control); }
    void operator()(char* text) const { std::free(text); }
};
using heap_control = std::unique_ptr<LDAPControl, release>;

heap_control read_back(const LDAPControl& control)
{
    const std::unique_ptr<char, release> text(control2string(&control));
    char* next = text.get();
    char* type = nullptr;
    char* value = nullptr;
    std::size_t length = 0;
    expect(str_parse_line(str_getline(&next), &type, &value, &length, LDIF_MODE_TOLERANT, nullptr) == LDIF_LINE_OK,
           "a control is a line");
    int base64 = 0;
    int url = 0;
    heap_control again(string2control(value, &base64, &url));
    expect(again != nullptr && url == 0, "it reads back");
    expect(std::strcmp(again->ldctl_oid, control.ldctl_oid) == 0 && again->ldctl_iscritical == control.ldctl_iscritical,
           "as the same control");
    return again;
}

bool names_file(const char* text)
{
    return std::strstr(text, ":<") != nullptr;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const fuzz_support::exact_text text(data, size);
    if (names_file(text.c_str())) {  // no file of this machine is of interest
        return 0;
    }
    int base64 = 0;
    int url = 0;
    const heap_control control(string2control(text.c_str(), &base64, &url));
    // An OID of bytes that no OID has may be taken for a mark or a fold.
    if (control != nullptr && std::strspn(control->ldctl_oid, "0123456789.") == std::strlen(control->ldctl_oid)) {
        const heap_control second = read_back(*control);
        const heap_control third = read_back(*second);
        const heap_control fourth = read_back(*third);
        expect(third->ldctl_value.bv_len == fourth->ldctl_value.bv_len &&
                   (third->ldctl_value.bv_len == 0 ||
                    std::memcmp(third->ldctl_value.bv_val, fourth->ldctl_value.bv_val, third->ldctl_value.bv_len) == 0),
               "with the same value");
    }
    const std::unique_ptr<char, release> copy(strdup(text.c_str()));
    LDAPControl** const array = string2controlarray(nullptr, copy.get());
    const std::unique_ptr<char, release> all(control2stringarray(array));
    expect((all != nullptr) == (array != nullptr && array[0] != nullptr), "an array has a text");
    ldap_controls_free(array);
    return 0;
}
