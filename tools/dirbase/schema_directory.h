// A schema directory: the folder, its list of schema files, and the way from there into a loaded schema.
//
// schema.list names the files in their loading order, a name a line, relative to the folder. Lines that are blank or
// begin with # don't count. The last file takes the definitions that are added.
//
// A change that was interrupted is taken back or carried to its end before anything is loaded, and the user told
// (ldcf_schema_recover.h). Who may not write to the folder reads the same schema from where it stands.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

namespace dirbase_tool {

// Raises tool_failure: status_unusable when there is no folder, no list, or a file that can't be read;
// status_findings for a fault in schema text. Faults between definitions are the library's exceptions.
class schema_directory {
public:
    // What the folder is opened for. Runs that change one folder take turns, and runs that read it wait for them.
    enum class purpose { read, change };

    // Finds the folder, locks it, reads its list and recovers what an interrupted change has left. A purpose of change
    // fails when that can't be done.
    //
    //   folder  the folder that the command line names; empty for the one in the environment variable DIRBASE_SCHEMA,
    //           or without that the schema that came with the tool
    schema_directory(const std::string& folder, purpose why);
    ~schema_directory();
    schema_directory(const schema_directory&) = delete;
    schema_directory& operator=(const schema_directory&) = delete;

    const std::string& folder() const { return folder_; }

    // A file's name as the list has it, from the path under which it was loaded; any other path as it is.
    std::string name_of(const std::string& path) const;

    // Loads the listed files, then `more` ("-" is standard input), into the active schema and completes it.
    void load(const std::vector<std::string>& more = {}) const;

    // Loads the listed files into an empty schema and completes it, the text of each read from the path that `stand_in`
    // gives for its own.
    void load_other(ldcf_schema& schema, const std::function<std::string(const std::string& path)>& stand_in) const;

private:
    struct listed_file {
        std::string name;
        std::string path;    // under which it is loaded
        std::string source;  // where its text stands: the path, unless a change was interrupted and can't be recovered
    };

    bool lock(purpose why);
    int take_lock(int kind);
    void read_list();
    void recover(purpose why, bool locked);

    std::string folder_;
    std::string list_;
    int lock_handle_ = -1;
    std::vector<listed_file> files_;
};

// Loads a directory, as above, for commands that look names up in it.
void load_for_names(const std::string& folder);

// Parses a schema text; `path` is the home of its definitions, and `source` its name in messages. Raises tool_failure
// with the line for a fault at a place in the text.
void parse_schema_text(ldcf_schema& schema, const std::string& text, const std::string& path,
                       const std::string& source);

}  // namespace dirbase_tool
