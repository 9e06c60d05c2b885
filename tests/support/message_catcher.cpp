// The catchers. Their sinks are called by code that may be running out of memory on purpose.
#include "tests/support/message_catcher.h"

#include <algorithm>

#include "libraries/libmsg/message_format.h"

namespace test_support {

namespace {

std::string printed(const message_argument& argument)
{
    if (argument.type == message_argument::kind::text) {
        return argument.text == nullptr ? "" : argument.text;
    }
    char number[40];
    bounded_text out(number, sizeof number);
    put_argument(out, argument);
    out.finish();
    return number;
}

}  // namespace

void message_catcher::receive(void* context, const message_record& record)
{
    static_cast<message_catcher*>(context)->add([&record] {
        caught_message caught = {record.component, record.severity, record.id, {}, {}, {}};
        try {
            for (std::size_t i = 0; i < record.argument_count; ++i) {
                caught.arguments.push_back(printed(record.arguments[i]));
            }
            caught.text = record.text;
            caught.line = record.line;
        } catch (const std::bad_alloc&) {
            // Counted all the same.
        }
        return caught;
    });
}

std::size_t message_catcher::count(int component, int id) const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto hits = std::count_if(caught_.begin(), caught_.end(), [&](const caught_message& message) {
        return message.component == component && message.id == id;
    });
    return static_cast<std::size_t>(hits);
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
    static_cast<debug_catcher*>(context)->add([text] { return std::string(text); });
}

bool debug_catcher::has(std::string_view text) const
{
    const std::lock_guard<std::mutex> lock(mutex_);
    return std::find(caught_.begin(), caught_.end(), text) != caught_.end();
}

}  // namespace test_support
