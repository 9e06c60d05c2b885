// Runs the real program, and keeps schema directories to run it on.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "tests/support/log_lines.h"
#include "tests/support/temp_dir.h"

namespace tool_test {

struct tool_run {
    int status = -1;  // the exit status, or 1000 and the signal that ended the program
    std::string out;
    std::string err;
};

struct run_settings {
    std::string input = {};                  // what standard input holds
    std::string schema_variable = {};        // DIRBASE_SCHEMA; empty: not set
    std::string output_path = {};            // a file or device for standard output in place of tool_run::out
    std::vector<std::string> in_front = {};  // a program and its arguments that run the tool
};

using words = std::vector<std::string>;

// The words of a call with more of them behind.
words joined(words front, const words& more);

// Runs the tool with these arguments and waits for it. All else of the environment is the test's own.
tool_run run_tool(const words& arguments, const run_settings& settings = {});

// The name and content of every file of a folder.
using folder_contents = std::map<std::string, std::string>;

// A copy of the schema that ships, in a folder of its own beside room for other files.
class schema_copy {
public:
    schema_copy();

    std::string folder() const { return dir_.path("schema"); }
    folder_contents contents() const;

    // Writes a file of the schema directory, or beside it; returns the path.
    std::string write_schema(const std::string& name, const std::string& text) const
    {
        return dir_.write("schema/" + name, text);
    }
    std::string write(const std::string& name, const std::string& text) const { return dir_.write(name, text); }
    std::string read_schema(const std::string& name) const { return dir_.read("schema/" + name); }
    std::string path(const std::string& name) const { return dir_.path(name); }

    // dirbase schema COMMAND --schema FOLDER ARGUMENTS
    tool_run run(const std::string& command, const words& arguments = {}, const run_settings& settings = {}) const;

private:
    test_support::temp_dir dir_;
};

// What to put in front of the tool so that permissions count: nothing, or for the superuser a program that runs it as
// somebody else, who is let into the folder of the schema.
words as_common_user(const schema_copy& schema);

// A schema directory whose only file has this text.
class single_file_schema {
public:
    explicit single_file_schema(const std::string& text);
    std::string folder() const { return dir_.path(); }

private:
    test_support::temp_dir dir_;
};

using test_support::lines_of;

}  // namespace tool_test
