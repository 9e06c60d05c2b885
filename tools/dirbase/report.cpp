// What the tool says to its user: see report.h.
#include "tools/dirbase/report.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <new>
#include <utility>

#include "libraries/libldif/line64.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_format.h"

namespace dirbase_tool {

namespace {

// Far beyond every honest message; names in a hostile schema have no limit.
constexpr std::size_t message_limit = 16384;
constexpr std::size_t longest_shown_value = 80;

constexpr int highest_system_error = 200;

// The error of the operating system that an exception stands for; 0 when it stands for none. The library keeps the
// number, or names it behind its own word: "permission_denied (EACCES)".
int system_error_of(const exc_t& exception)
{
    if (dynamic_cast<const exc_unmapped_t*>(&exception) != nullptr) {
        return static_cast<int>(exception.code());
    }
    const std::string text = text_of(exception.message().text());
    const std::size_t blank = text.find(' ');
    if (blank == std::string::npos || text.compare(blank, 3, " (E") != 0 || text.back() != ')') {
        return 0;
    }
    const std::string name = text.substr(blank + 2, text.size() - blank - 3);
    for (int error = 1; error <= highest_system_error; ++error) {
        if (const char* const known = ::strerrorname_np(error); known != nullptr && name == known) {
            return error;
        }
    }
    return 0;
}

bool from_operating_system(const exc_t& exception)
{
    return dynamic_cast<const exc_runtime_t*>(&exception) != nullptr ||
           dynamic_cast<const exc_permission_denied_t*>(&exception) != nullptr;
}

std::string escaped(std::string_view text)
{
    bounded_text measure(nullptr, 0);
    put_on_one_line(measure, text);
    std::string result(measure.finish() + 1, '\0');
    bounded_text out(result.data(), result.size());
    put_on_one_line(out, text);
    result.resize(out.finish());
    return result;
}

bool writes_to_terminal()
{
    static const bool is_terminal = ::isatty(STDOUT_FILENO) != 0;
    return is_terminal;
}

// Line by line.
std::string for_terminal(std::string_view text)
{
    std::string result;
    while (!text.empty()) {
        const std::size_t end = std::min(text.find('\n'), text.size());
        result += escaped(text.substr(0, end));
        result += end < text.size() ? "\n" : "";
        text.remove_prefix(std::min(end + 1, text.size()));
    }
    return result;
}

}  // namespace

std::string tool_failure::message() const
{
    std::string text;
    if (!file_.empty()) {
        text = line_ > 0 ? file_ + ":" + std::to_string(line_) + ": " : file_ + ": ";
    }
    return text + what();
}

tool_failure failure_of(const exc_t& exception, const std::string& about, const std::string& note)
{
    const bool no_memory = dynamic_cast<const exc_not_enough_memory_t*>(&exception) != nullptr;
    const int error = no_memory ? 0 : system_error_of(exception);
    const bool from_system = error != 0 || no_memory || from_operating_system(exception);
    return {from_system ? status_unusable : status_findings, from_system ? about : "", 0,
            error != 0 ? std::strerror(error) : text_of(exception.message().text()), note};
}

std::string on_one_line(std::string_view text)
{
    std::string line = escaped(text.substr(0, message_limit));
    if (message_limit < text.size()) {
        line += "... (" + std::to_string(text.size()) + " bytes)";
    }
    return line;
}

std::string shown(std::string_view text)
{
    return writes_to_terminal() ? on_one_line(text) : std::string(text);
}

std::string shortened(std::string_view value)
{
    if (value.size() <= longest_shown_value) {
        return on_one_line(value);
    }
    std::size_t end = longest_shown_value;
    while (end > longest_shown_value - 4 && (static_cast<unsigned char>(value[end]) & 0xC0) == 0x80) {
        --end;  // not inside a character
    }
    return on_one_line(value.substr(0, end)) + "... (" + std::to_string(value.size()) + " bytes)";
}

bool is_utf8(std::string_view bytes)
{
    for (std::size_t at = 0; at < bytes.size();) {
        const auto first = static_cast<unsigned char>(bytes[at]);
        const std::size_t length = first < 0x80 ? 1 : first < 0xC2 ? 0 : first < 0xE0 ? 2 : first < 0xF0 ? 3 : 4;
        if (length == 0 || first > 0xF4 || length > bytes.size() - at) {
            return false;
        }
        char32_t character = first & (0xFFu >> (length == 1 ? 0 : length + 1));
        for (std::size_t i = 1; i < length; ++i) {
            const auto next = static_cast<unsigned char>(bytes[at + i]);
            if ((next & 0xC0) != 0x80) {
                return false;
            }
            character = character << 6 | (next & 0x3Fu);
        }
        const bool is_overlong = (length == 3 && character < 0x800) || (length == 4 && character < 0x10000);
        if (is_overlong || (character >= 0xD800 && character <= 0xDFFF) || character > 0x10FFFF) {
            return false;
        }
        at += length;
    }
    return true;
}

json json_of_value(std::string_view value)
{
    if (is_utf8(value)) {
        return value;
    }
    std::string text(4 * (value.size() + 2) / 3 + 4, '\0');
    char* end = text.data();
    base64encode(&end, value.data(), value.data() + value.size(), -1);
    text.resize(static_cast<std::size_t>(end - text.data()));
    return {{"base64", std::move(text)}};
}

json json_of_values(const std::vector<std::string>& values)
{
    json members = json::array();
    for (const std::string& value : values) {
        members.push_back(json_of_value(value));
    }
    return members;
}

void tell(std::string_view line)
{
    const std::string text = on_one_line(line) + "\n";
    std::fflush(stdout);
    std::fwrite(text.data(), 1, text.size(), stderr);
}

void write_result(std::string_view text)
{
    static bool has_failed = false;
    std::string safe;
    if (writes_to_terminal()) {
        safe = for_terminal(text);
        text = safe;
    }
    errno = 0;
    if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size() || std::fflush(stdout) != 0) {
        const std::string words = std::strerror(errno);
        throw output_failure(words, std::exchange(has_failed, true));
    }
}

void write_json(const json& value)
{
    write_result(value.dump(2, ' ', false, json::error_handler_t::replace) + "\n");
}

json json_of(const tool_failure& failure)
{
    json error = {{"text", failure.what()}};
    if (!failure.file().empty()) {
        error["file"] = json_of_value(failure.file());
    }
    if (failure.line() > 0) {
        error["line"] = failure.line();
    }
    if (!failure.note().empty()) {
        error["note"] = failure.note();
    }
    return error;
}

message_collector::message_collector(int verbosity) : verbosity_(verbosity)
{
    set_message_sink(&message_collector::receive, this);
    if (verbosity_ > 0) {
        write_ldap_debug(verbosity_ > 1 ? ~0u : LDAP_DEBUG_ERROR);
    }
}

message_collector::~message_collector()
{
    set_message_sink(nullptr, nullptr);
    write_ldap_debug(0);
}

void message_collector::receive(void* context, const message_record& record)
{
    auto* self = static_cast<message_collector*>(context);
    if (self->verbosity_ > 0) {
        std::fprintf(stderr, "%s\n", record.line);
    }
    if (record.severity == MSG_SEVERE) {
        return;
    }
    try {
        const std::lock_guard<std::mutex> guard(self->mutex_);
        if (const auto [text, added] = self->known_.emplace(record.text); added) {
            self->fresh_.push_back(*text);
        }
    } catch (const std::bad_alloc&) {
        // The log must not fail its callers. They will run out of memory themselves soon enough, and say so.
    }
}

std::vector<std::string> message_collector::take_warnings()
{
    const std::lock_guard<std::mutex> guard(mutex_);
    std::vector<std::string> taken;
    taken.swap(fresh_);
    return taken;
}

}  // namespace dirbase_tool
