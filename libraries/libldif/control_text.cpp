// Controls to and from LDIF: see control_text.h.
#include "libraries/libldif/control_text.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <utility>

#include "libraries/libldif/line64.h"
#include "libraries/libmsg/debug_log.h"

namespace {

struct heap_free {
    void operator()(void* block) const noexcept { std::free(block); }
};
using heap_text = std::unique_ptr<char, heap_free>;

struct free_control {
    void operator()(LDAPControl* control) const noexcept
    {
        std::free(control->ldctl_oid);
        std::free(control->ldctl_value.bv_val);
        std::free(control);
    }
};
using control_guard = std::unique_ptr<LDAPControl, free_control>;

struct close_file {
    void operator()(std::FILE* file) const noexcept { std::fclose(file); }
};

constexpr char word_ends[] = " :\n\r";
constexpr char line_ends[] = "\n\r";
constexpr char keyword[] = "control";

enum class value_form { plain, base64, url };

value_form form_of(const char* line)
{
    const char* const colon = std::strchr(line, ':');
    const char mark = colon == nullptr ? '\0' : colon[1];
    return mark == ':' ? value_form::base64 : mark == '<' ? value_form::url : value_form::plain;
}

std::nullptr_t no_memory(int line)
{
    debug_error("string2control: allocation failed %s %d\n", __FILE__, line);
    return nullptr;
}

// The URL behind ":<", which may hold what parts words elsewhere. Ends the text in front of it.
char* take_url(char* text)
{
    char* const mark = std::strstr(text, ":<");
    *mark = '\0';
    char* state = nullptr;
    char* const url = strtok_r(mark + 2, line_ends, &state);
    return url == nullptr ? nullptr : url + std::strspn(url, " ");
}

// Fills the value of a control from its text, which is changed. False when that fails.
bool fill_value(LDAPControl& control, char* text, value_form form)
{
    berval& value = control.ldctl_value;
    if (form == value_form::url) {
        return localfromfile_url(text, &value) >= 0;
    }
    std::size_t length = std::strlen(text);
    if (form == value_form::base64 && base64decode(text, text, &length) != 0) {
        debug_error("string2control: decode base 64 failed %s %d\n", __FILE__, __LINE__);
        return false;
    }
    value.bv_val = static_cast<char*>(std::malloc(length + 1));
    if (value.bv_val == nullptr) {
        no_memory(__LINE__);
        return false;
    }
    std::memcpy(value.bv_val, text, length);
    value.bv_val[length] = '\0';
    value.bv_len = length;
    return true;
}

std::size_t count_of(LDAPControl** array)
{
    std::size_t count = 0;
    while (array != nullptr && array[count] != nullptr) {
        ++count;
    }
    return count;
}

// The control of a stretch of text; null when there is none in it.
LDAPControl* control_of(char* text)
{
    char* type = nullptr;
    char* value = nullptr;
    std::size_t length = 0;
    int is_base64 = 0;
    int is_url = 0;
    if (str_parse_line(text, &type, &value, &length, LDIF_MODE_TOLERANT, &is_url) != LDIF_LINE_OK) {
        return nullptr;
    }
    return string2control(value, &is_base64, &is_url);
}

int hex_digit(char c)
{
    return c >= '0' && c <= '9'   ? c - '0'
           : c >= 'a' && c <= 'f' ? c - 'a' + 10
           : c >= 'A' && c <= 'F' ? c - 'A' + 10
                                  : -1;
}

// Resolves percent escapes in place. False for a bad one, and for a zero byte.
bool unescape(char* text)
{
    char* to = text;
    for (; *text != '\0'; ++text) {
        char c = *text;
        if (c == '%') {
            const int high = hex_digit(text[1]);
            const int low = high < 0 ? -1 : hex_digit(text[2]);
            if (low < 0 || (high == 0 && low == 0)) {
                return false;
            }
            c = static_cast<char>(high * 16 + low);
            text += 2;
        }
        *to++ = c;
    }
    *to = '\0';
    return true;
}

// Whether an OID can stand in a line: one with a blank or a colon would read back as another control, and one with a
// line end would add a line of its sender's choice.
bool is_one_word(const char* oid)
{
    return std::strpbrk(oid, word_ends) == nullptr;
}

// A regular file, opened for reading. Anything else (a pipe would wait for a writer) is null with errno set.
std::FILE* open_regular(const char* path)
{
    const int descriptor = open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
    if (descriptor < 0) {
        return nullptr;
    }
    struct stat status = {};
    std::FILE* file = nullptr;
    if (fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode)) {
        file = fdopen(descriptor, "rb");
    }
    if (file == nullptr) {
        close(descriptor);
    }
    return file;
}

std::int64_t refuse_file(const char* step, const char* path)
{
    debug_error("localfromfile: %s error %s\n", step, path);
    return -1;
}

}  // namespace

extern "C" {

LDAPControl* string2control(const char* line, int* is_base64, int* is_url)
{
    if (is_base64 == nullptr || is_url == nullptr) {
        debug_error("string2control: invalid input data\n");
        return nullptr;
    }
    if (line == nullptr) {
        debug_error("string2control: no input string\n");
        return nullptr;
    }
    const value_form form = form_of(line);
    *is_base64 = form == value_form::base64 ? 1 : 0;
    *is_url = form == value_form::url ? 1 : 0;

    const heap_text copy(strdup(line));
    control_guard control(static_cast<LDAPControl*>(std::calloc(1, sizeof(LDAPControl))));
    if (copy == nullptr || control == nullptr) {
        return no_memory(__LINE__);
    }
    char* const url = form == value_form::url ? take_url(copy.get()) : nullptr;
    char* rest = nullptr;
    const char* const oid = strtok_r(copy.get(), word_ends, &rest);
    if (oid == nullptr) {
        debug_error("string2control: no input string\n");
        return nullptr;
    }
    control->ldctl_oid = strdup(oid);
    if (control->ldctl_oid == nullptr) {
        return no_memory(__LINE__);
    }
    char* value = strtok_r(nullptr, word_ends, &rest);
    if (value != nullptr && (std::strcmp(value, "true") == 0 || std::strcmp(value, "false") == 0)) {
        control->ldctl_iscritical = *value == 't' ? 1 : 0;
        value = strtok_r(nullptr, form == value_form::plain ? line_ends : word_ends, &rest);
    }
    if (form == value_form::url) {
        value = url;
    }
    if (value != nullptr && !fill_value(*control, value, form)) {
        return nullptr;
    }
    return control.release();
}

char* control2string(const LDAPControl* control)
{
    if (control == nullptr || control->ldctl_oid == nullptr || !is_one_word(control->ldctl_oid)) {
        return nullptr;
    }
    const bool has_value = control->ldctl_value.bv_val != nullptr;
    const std::size_t room = sizeof "control:  false" + std::strlen(control->ldctl_oid) +
                             (has_value ? ldif_line_room(0, control->ldctl_value.bv_len) : 0);
    auto* text = static_cast<char*>(std::malloc(room));
    if (text == nullptr) {
        return nullptr;
    }
    char* end = stpcpy(stpcpy(stpcpy(text, "control: "), control->ldctl_oid),
                       control->ldctl_iscritical != 0 ? " true" : " false");
    if (has_value) {
        put_type_and_value(&end, "", control->ldctl_value.bv_val, control->ldctl_value.bv_len);
    }
    *end = '\0';
    return text;
}

LDAPControl** string2controlarray(LDAPControl** array, char* text)
{
    std::size_t found = 0;
    for (const char* at = text; at != nullptr && (at = std::strstr(at, keyword)) != nullptr; at += sizeof keyword - 1) {
        ++found;
    }
    if (found == 0) {
        return array;
    }
    std::size_t count = count_of(array);
    auto** grown = static_cast<LDAPControl**>(std::realloc(array, (count + found + 1) * sizeof(LDAPControl*)));
    if (grown == nullptr) {
        no_memory(__LINE__);
        return array;
    }
    for (char* at = std::strstr(text, keyword); at != nullptr;) {
        char* const next = std::strstr(at + sizeof keyword - 1, keyword);
        const char first = next == nullptr ? '\0' : std::exchange(*next, '\0');
        LDAPControl* const control = control_of(at);
        if (control != nullptr) {
            grown[count++] = control;
        }
        if (next != nullptr) {
            *next = first;
        }
        at = next;
    }
    grown[count] = nullptr;
    return grown;
}

char* control2stringarray(LDAPControl** array)
{
    const std::size_t count = count_of(array);
    heap_text all;
    std::size_t length = 0;
    for (std::size_t i = 0; i < count; ++i) {
        const heap_text one(control2string(array[i]));
        if (one == nullptr) {
            return nullptr;
        }
        const std::size_t added = std::strlen(one.get());
        auto* grown = static_cast<char*>(std::realloc(all.get(), length + added + 2));
        if (grown == nullptr) {
            return nullptr;
        }
        static_cast<void>(all.release());
        all.reset(grown);
        std::memcpy(grown + length, one.get(), added);
        length += added;
        if (i + 1 < count || count == 1) {
            grown[length++] = '\n';
        }
        grown[length] = '\0';
    }
    return all.release();
}

std::int64_t localfromfile(const char* path, berval* target)
{
    if (path == nullptr || target == nullptr) {
        return refuse_file("fopen", "(null)");
    }
    const std::unique_ptr<std::FILE, close_file> file(open_regular(path));
    if (file == nullptr) {
        return refuse_file("fopen", path);
    }
    const long size = std::fseek(file.get(), 0, SEEK_END) == 0 ? std::ftell(file.get()) : -1;
    if (size < 0 || std::fseek(file.get(), 0, SEEK_SET) != 0) {
        return refuse_file("fseek", path);
    }
    const auto length = static_cast<std::size_t>(size);
    heap_text bytes(static_cast<char*>(std::malloc(length == 0 ? 1 : length)));
    if (bytes == nullptr) {
        return refuse_file("malloc", path);
    }
    if (std::fread(bytes.get(), 1, length, file.get()) != length) {
        return refuse_file("fread", path);
    }
    *target = {length, bytes.release()};
    return size;
}

std::int64_t localfromfile_url(char* url, berval* target)
{
    constexpr char scheme[] = "file://";  // with the "/" that the path begins with
    constexpr std::size_t scheme_length = sizeof scheme - 1;
    if (url == nullptr || std::strncmp(url, scheme, scheme_length) != 0 || url[scheme_length] != '/' ||
        !unescape(url + scheme_length)) {
        debug_error("localfromfile_url: %s", "Invalid Syntax");
        return -1;
    }
    return localfromfile(url + scheme_length, target);
}

}  // extern "C"
