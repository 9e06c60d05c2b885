// What the tool says to its user: see report.h.
#include "tools/dirbase/report.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <new>

#include "libraries/libldif/line64.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_format.h"

namespace dirbase_tool {

namespace {

// Far beyond every honest message; names in a hostile schema have no limit.
constexpr std::size_t message_limit = 16384;
constexpr std::size_t longest_shown_value = 80;

bool from_operating_system(const exc_t& exception)
{
    return dynamic_cast<const exc_runtime_t*>(&exception) != nullptr ||
           dynamic_cast<const exc_permission_denied_t*>(&exception) != nullptr ||
           dynamic_cast<const exc_unmapped_t*>(&exception) != nullptr;
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
    return {no_memory ? status_unusable : status_findings, from_operating_system(exception) ? about : "", 0,
            exception.message().text(), note};
}

std::string on_one_line(std::string_view text)
{
    std::string escaped;
    const std::string_view shown = text.substr(0, message_limit);
    bounded_text measure(nullptr, 0);
    put_on_one_line(measure, shown);
    escaped.resize(measure.finish() + 1);
    bounded_text out(escaped.data(), escaped.size());
    put_on_one_line(out, shown);
    escaped.resize(out.finish());
    if (shown.size() < text.size()) {
        escaped += "... (" + std::to_string(text.size()) + " bytes)";
    }
    return escaped;
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

void tell(std::string_view line)
{
    const std::string text = on_one_line(line) + "\n";
    std::fflush(stdout);
    std::fwrite(text.data(), 1, text.size(), stderr);
}

void write_result(std::string_view text)
{
    errno = 0;
    if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size() || std::fflush(stdout) != 0) {
        throw tool_failure(status_unusable, "standard output", 0, std::strerror(errno));
    }
}

void write_json(const json& value)
{
    write_result(value.dump(2, ' ', false, json::error_handler_t::replace) + "\n");
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
