// What the tool says to its user: failures, warnings, results, and the exit statuses that go with them.
//
// Results go to standard output, everything else to standard error. Texts that come out of a schema, and values, may hold
// any byte; on standard error, and on a terminal, none of them moves a cursor. Where a result has a line for each, none
// of them begins a new line there.
#pragma once

#include <mutex>
#include <nlohmann/json.hpp>
#include <set>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libcsgl/csgl_string.h"

namespace dirbase_tool {

// The order of the keys in the output is that in which they were entered.
using json = nlohmann::ordered_json;

enum exit_status : int {
    status_yes = 0,
    status_findings = 1,  // the schema, or the change, is refused
    status_unusable = 2,  // a wrong call, input that can't be read, or the operating system fails
};

// Ends a command with a message: "FILE:LINE: TEXT", "FILE: TEXT" with line 0, or TEXT alone without a file.
class tool_failure : public std::runtime_error {
public:
    // note  what else the user may want to know; empty when there is nothing
    tool_failure(exit_status status, std::string file, int line, const std::string& text, std::string note = "")
        : std::runtime_error(text), status_(status), file_(std::move(file)), line_(line), note_(std::move(note))
    {
    }

    exit_status status() const { return status_; }
    const std::string& file() const { return file_; }
    int line() const { return line_; }
    const std::string& note() const { return note_; }

    // The message as it is shown.
    std::string message() const;

private:
    exit_status status_;
    std::string file_;
    int line_;
    std::string note_;
};

// That standard output can't be written. Each further try fails too, which needn't be told again.
class output_failure : public tool_failure {
public:
    output_failure(const std::string& text, bool repeated, std::string note = "")
        : tool_failure(status_unusable, "standard output", 0, text, std::move(note)), repeated_(repeated)
    {
    }

    bool is_repeated() const { return repeated_; }

private:
    bool repeated_;
};

// The failure that an exception of the library means to the user: its text alone. A failure of the operating system
// has that system's words, which don't name what they are about: `about` goes in front of them. These, and memory that
// ran out, are status_unusable.
tool_failure failure_of(const exc_t& exception, const std::string& about = "", const std::string& note = "");

inline std::string text_of(const csgl_string& text)
{
    return {text.c_str(), text.length()};
}

// A text with its control bytes escaped, cut when it is longer than anybody reads.
std::string on_one_line(std::string_view text);

// A text that has a line of standard output for itself: as it is for a file, and on one line for a terminal.
std::string shown(std::string_view text);

// The same as on_one_line for a value in the midst of other words, of which the beginning is enough.
std::string shortened(std::string_view value);

// Whether bytes are well-formed UTF-8.
bool is_utf8(std::string_view bytes);

// A value as JSON: a text, or for bytes that are none {"base64": TEXT}.
json json_of_value(std::string_view value);
json json_of_values(const std::vector<std::string>& values);

// Writes a line to standard error, made safe by on_one_line.
void tell(std::string_view line);

// Writes a result to standard output: as it is, or to a terminal with all control bytes but line feeds escaped. Raises
// output_failure when it can't be written whole.
void write_result(std::string_view text);

// Writes a JSON value and a line feed. In messages bytes that are no UTF-8 come out as U+FFFD; data has json_of_value.
void write_json(const json& value);

// A failure as the member "error" of an object.
json json_of(const tool_failure& failure);

// Takes the message log for its lifetime, of which there is one at a time, and keeps its lines from mixing with the
// tool's.
//
// The library raises what it can't live with; what it only remarks on (a matching rule that doesn't suit its syntax,
// a name cut for the store) is here to be asked for. Exceptions log themselves too, and are told by whoever catches
// them.
class message_collector {
public:
    // verbosity  0 shows nothing; from 1 on the lines of the message log and debug texts about errors go to standard
    // error,
    //            from 2 on all debug texts.
    explicit message_collector(int verbosity);
    ~message_collector();
    message_collector(const message_collector&) = delete;
    message_collector& operator=(const message_collector&) = delete;

    // The remarks that came since the last call, in the order of their first arrival. One that was given by an
    // earlier call isn't given again.
    std::vector<std::string> take_warnings();

private:
    static void receive(void* context, const message_record& record);

    int verbosity_;
    std::mutex mutex_;
    std::set<std::string> known_;
    std::vector<std::string> fresh_;
};

}  // namespace dirbase_tool
