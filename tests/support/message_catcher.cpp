// The catchers. Their sinks are called by code that may be running out of memory on purpose: what arrives then is kept
// without its texts, in room reserved before.
#include "tests/support/message_catcher.h"

#include <algorithm>
#include <new>
#include <utility>

#include "libraries/libmsg/message_format.h"

namespace test_support {

namespace {

constexpr std::size_t reserved = 256;

std::string printed(const message_argument& argument)
{
    bounded_text measure(nullptr, 0);
    put_argument(measure, argument);
    std::string text(measure.finish(), '\0');

    bounded_text out(text.data(), text.size() + 1);
    put_argument(out, argument);
    out.finish();
    return text;
}

}  // namespace

message_catcher::message_catcher()
{
    caught_.reserve(reserved);
    set_message_sink(&message_catcher::receive, this);
}

message_catcher::~message_catcher()
{
    set_message_sink(nullptr, nullptr);
}

void message_catcher::receive(void* context, const message_record& record)
{
    caught_message caught;
    caught.component = record.component;
    caught.severity = record.severity;
    caught.id = record.id;
    try {
        for (std::size_t i = 0; i < record.argument_count; ++i)
            caught.arguments.push_back(printed(record.arguments[i]));
        caught.text = record.text;
        caught.line = record.line;
    } catch (const std::bad_alloc&) {
        caught.complete = false;
    }

    auto* self = static_cast<message_catcher*>(context);
    const std::lock_guard<std::mutex> lock(self->mutex_);
    try {
        self->caught_.push_back(std::move(caught));
    } catch (const std::bad_alloc&) {
        ++self->lost_;  // more than were reserved
    }
}

std::vector<caught_message> message_catcher::messages() const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    return caught_;
}

std::size_t message_catcher::count() const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    return caught_.size() + lost_;
}

std::size_t message_catcher::count(int component, int id) const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto hits = std::count_if(caught_.begin(), caught_.end(), [&](const caught_message& message) {
        return message.component == component && message.id == id;
    });
    return static_cast<std::size_t>(hits);
}

void message_catcher::clear()
{
    const std::lock_guard<std::mutex> lock(mutex_);
    caught_.clear();
    lost_ = 0;
}

debug_catcher::debug_catcher(unsigned level) : level_before_(read_ldap_debug())
{
    set_debug_sink(&debug_catcher::receive, this);
    write_ldap_debug(level);
}

debug_catcher::~debug_catcher()
{
    write_ldap_debug(level_before_);
    set_debug_sink(nullptr, nullptr);
}

void debug_catcher::receive(void* context, unsigned /*level*/, const char* text)
{
    auto* self = static_cast<debug_catcher*>(context);
    const std::lock_guard<std::mutex> lock(self->mutex_);
    try {
        self->caught_.emplace_back(text);
    } catch (const std::bad_alloc&) {
        ++self->lost_;
    }
}

std::vector<std::string> debug_catcher::texts() const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    return caught_;
}

std::size_t debug_catcher::count() const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    return caught_.size() + lost_;
}

bool debug_catcher::has(std::string_view text) const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    return std::find(caught_.begin(), caught_.end(), text) != caught_.end();
}

bool debug_catcher::has_part(std::string_view part) const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    return std::any_of(caught_.begin(), caught_.end(),
                       [&](const std::string& text) { return text.find(part) != std::string::npos; });
}

void debug_catcher::clear()
{
    const std::lock_guard<std::mutex> lock(mutex_);
    caught_.clear();
    lost_ = 0;
}

}  // namespace test_support
