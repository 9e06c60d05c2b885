// Translation between UTF-8 and the local code page: see code_page.h.
#include "servers/vrnd/libdirbase/base/code_page.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <mutex>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/heap.h"

std::int32_t cfg_xlate = 0;
const char* local_codepage = nullptr;
ldap_iconv_t* iconv_handle_to_utf8 = nullptr;
ldap_iconv_t* iconv_handle_to_local = nullptr;

namespace {

constexpr const char* utf8 = "UTF-8";
constexpr int line_size = 1024;
constexpr std::size_t most_growth = 3;

// What local_codepage points to: the platform may overwrite its own copy at the next setlocale.
char codepage_name[128];

// A conversion under way: a text of a stateful character set must be read to its end before the next one begins.
std::mutex conversion_mutex;

struct close_conversion {
    void operator()(ldap_iconv_t* conversion) const { ldap_iconv_close(conversion); }
};
using conversion_guard = std::unique_ptr<ldap_iconv_t, close_conversion>;

bool available(const conversion_guard& conversion)
{
    return conversion != nullptr && reinterpret_cast<std::intptr_t>(conversion->descriptor) != -1;
}

const char* find_codepage(const char* function)
{
    const char* name = ldap_nl_langinfo(LDAP_NL_CODESET);
    if (name == nullptr)
        debug_error("Error - %s: ldap_nl_langinfo() failed\n", function);
    return name;
}

void report_no_conversion(const char* codepage)
{
    PrintMessage(MSG_COMPONENT_RDBM, MSG_SEVERE, 28, codepage);
}

// Puts a conversion in the place of another, which is closed.
void replace(ldap_iconv_t*& handle, conversion_guard conversion)
{
    ldap_iconv_close(std::exchange(handle, conversion.release()));
}

int open_for_reading()
{
    if (local_codepage != nullptr || iconv_handle_to_utf8 != nullptr)
        return 0;
    const char* codepage = find_codepage("getline_and_xlate");
    if (codepage == nullptr)
        return -1;
    conversion_guard to_utf8(ldap_iconv_open(utf8, codepage));
    if (!available(to_utf8)) {
        debug_error("Error - getline_and_xlate: ldap_iconv_open() failed errno=%d\n", errno);
        report_no_conversion(codepage);
        return -1;
    }
    replace(iconv_handle_to_utf8, std::move(to_utf8));
    return 0;
}

// What is left to convert, and the room for it.
struct progress {
    char* in;
    std::size_t in_left;
    char* out;
    std::size_t out_left;
};

// Converts until the input is used up or a call gets nowhere; returns the result of the last call.
int convert(ldap_iconv_t* conversion, progress& text)
{
    const std::lock_guard<std::mutex> turn(conversion_mutex);
    ldap_iconv(conversion, nullptr, nullptr, nullptr, nullptr);  // the text before may have ended anywhere
    for (;;) {
        const std::size_t before = text.in_left;
        const int rc = ldap_iconv(conversion, &text.in, &text.in_left, &text.out, &text.out_left);
        if (text.in_left == 0 || text.in_left == before)
            return rc;
    }
}

// Both translations; `failure` is their debug text, which takes the result of the conversion.
template <typename Report>
int translate(ldap_iconv_t* conversion, const char* input, char** output, std::size_t* length, Report report)
{
    *output = nullptr;
    *length = 0;
    if (input == nullptr)
        return 0;

    const std::size_t input_size = std::strlen(input) + 1;
    const std::size_t output_size = input_size * most_growth;
    heap_text translated(static_cast<char*>(std::malloc(output_size)));
    if (translated == nullptr) {
        message_no_memory();
        return LDAP_NO_MEMORY;
    }

    progress state = {const_cast<char*>(input), input_size, translated.get(),
                      output_size};  // iconv only reads the input
    const int rc = convert(conversion, state);
    if (rc == -1 || state.in_left != 0) {
        report(rc);
        PrintMessage(MSG_COMPONENT_RDBM, MSG_SEVERE, 29);
    }
    if (state.in_left != 0)
        return -1;
    *output = translated.release();
    *length = output_size - state.out_left;
    return 0;
}

}  // namespace

extern "C" {

void set_cfg_xlate_on(void)
{
    cfg_xlate = 1;
}

int initIconvHandle(void)
{
    if (local_codepage != nullptr)
        return 0;
    const char* found = find_codepage("initIconvHandle");
    if (found == nullptr)
        return -1;
    // A cut name is no character set's, and fails below.
    vrn_strlcpy(codepage_name, found, sizeof codepage_name);

    conversion_guard to_utf8(ldap_iconv_open(utf8, codepage_name));
    conversion_guard to_local(available(to_utf8) ? ldap_iconv_open(codepage_name, utf8) : nullptr);
    if (!available(to_utf8) || !available(to_local)) {
        debug_error("Error - initIconvHandle: ldap_iconv_open() failed, errno=%d\n", errno);
        report_no_conversion(codepage_name);
        return -1;
    }
    replace(iconv_handle_to_utf8, std::move(to_utf8));
    replace(iconv_handle_to_local, std::move(to_local));
    local_codepage = codepage_name;
    return 0;
}

int getline_and_xlate(char* buffer, std::FILE* file)
{
    if (cfg_xlate != 0 && open_for_reading() != 0)
        return -1;
    return std::fgets(buffer, line_size, file) == nullptr ? -1 : 0;
}

int xlate_localcp_to_utf8(const char* input, char** output, std::size_t* length)
{
    return translate(iconv_handle_to_utf8, input, output, length,
                     [](int rc) { debug_error("Error - xlate_localcp_to_utf8(): ldap_iconv() rc=%d\n", rc); });
}

int xlate_utf8_to_localcp(const char* input, char** output, std::size_t* length)
{
    return translate(iconv_handle_to_local, input, output, length,
                     [](int rc) { debug_error("Error - xlate_utf8_to_localcp_imp: ldap_iconv() failed rc=%d\n", rc); });
}

void free_iconv_handle(void)
{
    ldap_iconv_close(std::exchange(iconv_handle_to_utf8, nullptr));
    local_codepage = nullptr;
}

}  // extern "C"
