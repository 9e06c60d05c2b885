// The message log: renders a message by the catalogue and hands it to the sink as one line.
//
// A message passes through two texts, the rendered one with its bytes as they are and the line with everything escaped
// that could break it. Both live on the stack while they are short, which covers every message without long arguments,
// so running out of memory can always be reported.
#include "libraries/libmsg/message_log.h"

#include <string_view>

#include "libraries/libmsg/catalogue.h"
#include "libraries/libmsg/log_sink.h"
#include "libraries/libmsg/message_format.h"

namespace {

constinit log_sink<message_sink> sink;

void put_severity(bounded_text& out, int severity)
{
    switch (severity) {
    case MSG_INFORMATION: out.put("INFORMATION"); break;
    case MSG_WARNING: out.put("WARNING"); break;
    case MSG_ERROR: out.put("ERROR"); break;
    case MSG_SEVERE: out.put("SEVERE"); break;
    default:
        out.put("SEVERITY");
        out.put_number(severity);
        break;
    }
}

// What is known of a message without a text: component 5, severity 2, id 143: 'name' 12
void put_unknown_message(bounded_text& out, int component, int severity, int id, const message_argument* arguments,
                         std::size_t count)
{
    out.put("component ");
    out.put_number(component);
    out.put(", severity ");
    out.put_number(severity);
    out.put(", id ");
    out.put_number(id);
    for (std::size_t i = 0; i < count; ++i) {
        const bool is_text = arguments[i].type == message_argument::kind::text;
        out.put(i == 0 ? ": " : " ");
        if (is_text)
            out.put('\'');
        put_argument(out, arguments[i]);
        if (is_text)
            out.put('\'');
    }
}

// The line without its line feed.
void put_message_line(bounded_text& out, const std::timespec& moment, int component, int severity, int id,
                      std::string_view text)
{
    put_local_time(out, moment);
    out.put(' ');
    put_severity(out, severity);
    out.put(' ');
    if (const char* letters = catalogue_component(component); letters != nullptr) {
        out.put(std::string_view(letters));
    } else {
        out.put('C');
        out.put_number(component);
        out.put('-');
    }
    out.put_number(id, 4);
    out.put(' ');
    put_on_one_line(out, text);
}

}  // namespace

extern "C" {

std::size_t getPrintedMessageArguments(char* buffer, std::size_t size, int component, int severity, int id,
                                       const message_argument* arguments, std::size_t count)
{
    if (arguments == nullptr)
        count = 0;
    bounded_text out(buffer, size);
    if (const char* pattern = catalogue_text(component, id); pattern != nullptr)
        put_pattern(out, pattern, arguments, count);
    else
        put_unknown_message(out, component, severity, id, arguments, count);
    return out.finish();
}

void PrintMessageArguments(int component, int severity, int id, const message_argument* arguments, std::size_t count)
{
    const errno_keeper keep;
    if (arguments == nullptr)
        count = 0;

    scratch_text<1024> text_space;
    const built_text text = text_space.fill([&](char* buffer, std::size_t size) {
        return getPrintedMessageArguments(buffer, size, component, severity, id, arguments, count);
    });

    const std::timespec now = current_time();
    scratch_text<1536> line_space;
    const built_text line = line_space.fill([&](char* buffer, std::size_t size) {
        bounded_text out(buffer, size);
        put_message_line(out, now, component, severity, id, text.view());
        return out.finish();
    });

    sink.deliver(line, message_record{component, severity, id, arguments, count, text.data, line.data});
}

void set_message_sink(message_sink function, void* context)
{
    sink.set_function(function, context);
}

int set_message_file(const char* path)
{
    return sink.set_file(path);
}

}  // extern "C"
