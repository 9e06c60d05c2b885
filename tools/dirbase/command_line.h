// The command line of `dirbase` in its parts: what the groups of commands have in common, and the groups that aren't
// set up in main.cpp.
#pragma once

#include <CLI/CLI.hpp>
#include <functional>
#include <string>
#include <vector>

#include "tools/dirbase/ldif_commands.h"
#include "tools/dirbase/schema_commands.h"

namespace dirbase_tool {

// What a command line comes to. Setting a command up has this called with what the user gave.
using command = std::function<int(message_collector&)>;

// A word of an option, and what it stands for.
template <typename Value>
struct word {
    const char* text;
    Value value;
};

// Accepts the words of a table, in any case.
template <typename Value, std::size_t count>
CLI::IsMember one_of(const word<Value> (&words)[count])
{
    std::vector<std::string> texts;
    for (const word<Value>& candidate : words) {
        texts.emplace_back(candidate.text);
    }
    return CLI::IsMember(texts, CLI::ignore_case);
}

template <typename Value, std::size_t count>
Value value_of(const std::string& text, const word<Value> (&words)[count], Value otherwise)
{
    for (const word<Value>& candidate : words) {
        if (text == candidate.text) {
            return candidate.value;
        }
    }
    return otherwise;
}

// ---- arguments as they are written ----------------------------------------------------------------------------------
//
// The parser gives some arguments a meaning of their own: it takes "[a,b]" apart as a list, ends a command at "++", and
// an option "--name=" takes the next argument for its value. shielded() hides those from it, and the options that
// unshield() was called for hand over what was written. Called for a group, that holds for all below it.

// The arguments behind the name of the program, for CLI::App::parse: the last one first.
std::vector<std::string> shielded(int argc, char** argv);
void unshield(CLI::App& app);

// Accepts any name of a file or folder but the empty one, which a variable that isn't set leaves.
CLI::Validator not_empty();

// ---- setting up -----------------------------------------------------------------------------------------------------

// --version and --help.
void add_flags_of_all(CLI::App& app);

// Says that a word is followed by another. That one comes is looked at later: the parser would tell a wrong word as a
// missing one.
void expect_subcommand(CLI::App& app);

// A command of a group, with the options of every command.
//
//   details  what its help says behind the options; may be empty
CLI::App* add_bare_command(CLI::App& group, const std::string& name, const std::string& description,
                           const std::string& details, common_options& common);

// A command that works on one schema directory.
CLI::App* add_command(CLI::App& group, const std::string& name, const std::string& description,
                      const std::string& details, common_options& common);

// ---- groups about entries -------------------------------------------------------------------------------------------

// What the user gives to their commands.
struct entry_options {
    std::string file;
    std::string form;
    std::string before;
    std::string after;
    ldif_check_call check;
    ldif_search_call search;
    std::string scope;
    std::vector<std::string> filters;
};

// Set up the groups. The options are filled when the command line is parsed, and outlive the command that is chosen.
void add_filter_group(CLI::App& app, common_options& common, entry_options& given, command& chosen);
void add_ldif_group(CLI::App& app, common_options& common, entry_options& given, command& chosen);

}  // namespace dirbase_tool
