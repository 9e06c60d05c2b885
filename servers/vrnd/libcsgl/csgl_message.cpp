// Messages with markers: see csgl_message.h.
#include "servers/vrnd/libcsgl/csgl_message.h"

#include <algorithm>
#include <cstring>
#include <string_view>
#include <utility>

#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libcsgl/csgl_string.h"

namespace {

constexpr std::string_view parameter_begin = "[p[";
constexpr std::string_view parameter_end = "]p]";
constexpr std::string_view variable_begin = "[v[";
constexpr std::string_view variable_end = "]v]";
constexpr std::string_view variable_name = "=v=VAR=v=";
constexpr char ldap_place[] = "ldap modify";
constexpr char ldap_prefix[] = "ldap modify: ";

// One area of a block being written; it never grows past its end.
class area {
public:
    area(char* begin, char* end) : next_(begin), last_(end - 1) {}

    void put(char c)
    {
        if (next_ < last_) {
            *next_++ = c;
        }
    }
    void put(const char* text)
    {
        for (; *text != '\0'; ++text) {
            put(*text);
        }
    }
    // Ends a text inside the area; the next one starts behind it.
    void end_text()
    {
        if (next_ < last_) {
            *next_++ = '\0';
        }
    }
    void finish() { *next_ = '\0'; }
    char* next() const { return next_; }

private:
    char* next_;
    char* last_;  // always holds a terminator in the end
};

// Skips `marker` at the front of `rest`, if it stands there.
bool skip(std::string_view& rest, std::string_view marker)
{
    if (rest.substr(0, marker.size()) != marker) {
        return false;
    }
    rest.remove_prefix(marker.size());
    return true;
}

unsigned magnitude(int id)
{
    return id < 0 ? 0u - static_cast<unsigned>(id) : static_cast<unsigned>(id);
}

constexpr unsigned has_catalogue = 0x40000000u;

}  // namespace

int csgl_get_catid(int id)
{
    const unsigned v = magnitude(id);
    return (v & has_catalogue) != 0 ? static_cast<int>((v >> 16) & 0x3fff) : MSG_COMPONENT_SCHEMA;
}

int csgl_get_msgid(int id)
{
    const unsigned v = magnitude(id);
    const unsigned number = (v & has_catalogue) != 0 ? v & 0xffff : v;
    return static_cast<int>(id < 0 ? 0u - number : number);
}

csgl_message_::~csgl_message_()
{
    csgl_free(text_);
}

std::size_t csgl_message_::allocation_size(std::size_t n)
{
    for (std::size_t size = 8; size <= 1024; size *= 2) {
        if (n <= size) {
            return size;
        }
    }
    return (n & ~static_cast<std::size_t>(0x3ff)) + 1024;
}

void csgl_message_::init(const char* text, unsigned length, int number, const char* file, int line)
{
    if (!try_init(text, length, number, file, line)) {
        csgl_throw_no_memory(__FILE__, __LINE__);
    }
}

bool csgl_message_::try_init(const char* text, unsigned length, int number, const char* file, int line) noexcept
{
    csgl_free(std::exchange(text_, nullptr));
    number_ = number;
    file_ = file;
    line_ = line;
    parameter_count_ = 0;
    variable_ = nullptr;
    printed_ = nullptr;
    std::fill_n(parameters_, parameter_limit, nullptr);

    const std::size_t file_length = file == nullptr ? 0 : std::strlen(file);
    const std::size_t size = 4 * allocation_size(std::size_t{length} + 1 + file_length);
    text_ = size > 0xffffffffu ? nullptr : static_cast<char*>(csgl_allocate_or_null(size));
    if (text_ == nullptr) {
        return false;
    }
    block_size_ = static_cast<unsigned>(size);
    variable_ = text_ + length + 1;
    printed_ = text_ + 2 * std::size_t{length} + 2;
    *printed_ = '\0';

    const std::size_t used = text == nullptr ? 0 : strnlen(text, length);
    take_apart(text, text + used);
    return true;
}

// Splits the text into the sentence (plain) and the parameters (second area, which receives every byte of the text too,
// so that a parameter's text is whole there). A text that refers to its variable part once always fits its area; one
// that does so more often is cut.
void csgl_message_::take_apart(const char* text, const char* end) noexcept
{
    std::string_view rest(text, static_cast<std::size_t>(end - text));
    area plain(text_, variable_);
    area second(variable_, printed_);

    const bool has_variable = skip(rest, variable_begin);
    if (has_variable) {
        while (!rest.empty() && !skip(rest, variable_end)) {
            second.put(rest.front());
            rest.remove_prefix(1);
        }
        second.end_text();
    }

    const char* parameter = nullptr;  // start of the open parameter
    while (!rest.empty()) {
        if (parameter == nullptr && skip(rest, parameter_begin)) {
            parameter = second.next();
        } else if (parameter != nullptr && skip(rest, parameter_end)) {
            add_parameter(parameter);
            second.end_text();
            parameter = nullptr;
        } else if (skip(rest, variable_begin)) {
            if (skip(rest, variable_name)) {
                skip(rest, variable_end);
                if (has_variable) {
                    add_parameter(variable_);
                    plain.put(variable_);
                }
            }
        } else {
            plain.put(rest.front());
            second.put(rest.front());
            rest.remove_prefix(1);
        }
    }
    plain.finish();
    second.finish();
}

void csgl_message_::add_parameter(const char* start) noexcept
{
    if (parameter_count_ < parameter_limit) {
        parameters_[parameter_count_++] = start;
    }
}

void csgl_message_::log(int severity, int catalogue)
{
    if (number_ == 0) {
        return;
    }
    const auto& p = parameters_;
    if (number_ < 0) {
        const auto id = static_cast<int>(magnitude(number_));
        PrintMessage(catalogue, severity, id, p[0], p[1], p[2], p[3], p[4], p[5], p[6], p[7], p[8], p[9]);
        getPrintedMessage(printed_, block_size_ / 2, catalogue, severity, id, p[0], p[1], p[2], p[3], p[4], p[5], p[6],
                          p[7], p[8], p[9]);
        return;
    }
    const bool over_ldap = file_ == nullptr || *file_ == '\0';
    const char* place = over_ldap ? ldap_place : file_;
    PrintMessage(catalogue, severity, number_, place, line_, p[0], p[1], p[2], p[3], p[4], p[5], p[6], p[7], p[8],
                 p[9]);
    getPrintedMessage(printed_, block_size_ / 2, catalogue, severity, number_, place, line_, p[0], p[1], p[2], p[3],
                      p[4], p[5], p[6], p[7], p[8], p[9]);
    if (over_ldap) {
        char* found = std::strstr(printed_, ldap_prefix);
        printed_ = found == nullptr ? nullptr : found + sizeof(ldap_prefix) - 1;
    }
}

csgl_message::csgl_message(const char* text, int number, const char* file, int line)
    : csgl_refcounted_pointer_to(new csgl_message_)
{
    get()->init(text, csgl_str_length(text), number, file, line);
}

csgl_message csgl_message::make_or_none(const char* text, int number, const char* file, int line) noexcept
{
    csgl_message message;
    if (auto* body = new (std::nothrow) csgl_message_; body != nullptr) {
        csgl_refcounted_pointer_to<csgl_message_>& handle = message;
        handle = csgl_refcounted_pointer_to<csgl_message_>(body);
        if (!body->try_init(text, static_cast<unsigned>(std::strlen(text)), number, file, line)) {
            return {};
        }
    }
    return message;
}
