// Texts from files and from standard input, looked at before anything parses them.
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace dirbase_tool {

// The name under which standard input is called.
constexpr char standard_input[] = "-";

// How messages call the source that a command line names.
std::string source_name(const std::string& path);

// What may stand under a path.
enum class text_source {
    regular_file,  // nothing else: a file that the server reads at start, and that a change replaces
    any,           // also "-", a pipe or a device: a file that the user hands over once
};

// The whole content of a file. Raises tool_failure with status_unusable for what can't be opened or read, a folder, a
// file with a byte 0 in it (schema text is ended by one, so the rest would be lost in silence), and one beyond 1 GiB.
std::string read_text(const std::string& path, text_source allowed);

// Hands over the arguments of a call one after the other, with the lines of standard input in the place of each "-". A
// line ends with a line feed, or carriage return and line feed, and only one is held at a time. Raises tool_failure with
// status_unusable for input that can't be read, a byte 0 in it (which would end the line in silence) and a line beyond
// 1 MiB; the lines ahead of it have been handed over.
//
//   take            takes an argument or a line
//   before_reading  is called before more is read, which may mean to wait
void for_each_line_or_argument(const std::vector<std::string>& arguments,
                               const std::function<void(const std::string&)>& take,
                               const std::function<void()>& before_reading);

}  // namespace dirbase_tool
