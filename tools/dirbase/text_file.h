// Texts from files and from standard input, read whole and looked at before anything parses them.
#pragma once

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

// The arguments of a call, with the lines of standard input in the place of each "-".
std::vector<std::string> with_lines_of_input(const std::vector<std::string>& arguments);

}  // namespace dirbase_tool
