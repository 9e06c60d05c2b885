// What a schema change leaves on disk when its process ends half way, and the way back to a whole schema.
//
// A change writes FILE.tmp beside each file that it rewrites (vote), and then replaces one file after the other
// (commit). While the commit runs the old content of each file that it has come to is kept as FILE.tmp.old. A process
// that is killed in between leaves some of these, and a file that is just being replaced may be missing. From the names
// alone follows which schema is to be loaded, all files of it from before the change or all from after it:
//
//   no FILE.tmp, no FILE.tmp.old      nothing was interrupted
//   FILE.tmp alone, all files there   the commit had not begun: the files are the old schema
//   FILE.tmp.old and any FILE.tmp,    the commit was not through: the old schema, each FILE.tmp.old in the place of
//     or FILE missing                 its file
//   FILE.tmp.old, no FILE.tmp,        the commit was through but for the clearing up: the files are the new schema
//     all files there
//   FILE missing, FILE.tmp alone      nobody kept the old content: the new schema, each FILE.tmp in the place of its
//                                     file, provided that each was written to its end
//   anything else with a file gone    unclear: nothing is touched, and loading will name the file that is missing
//
// The steps of a recovery come in such an order that one which is interrupted itself finds the same verdict again.
//
// A change must not be running: its files look like those of an interrupted one. A server recovers at its start, ahead
// of the first ldcf_api_schema_parse; a tool while it has the directory to itself.
#pragma once

#include <stddef.h>

#include "libraries/dirbase_export.h"

#ifdef __cplusplus

#include "servers/vrnd/libdirbase/schema/ldcf_common.h"

struct ldcf_schema;

// The name of a file's temporary file, and that under which a commit keeps the file's old content.
DIRBASE_EXPORT csgl_string ldcf_temporary_of(const csgl_string& file);
DIRBASE_EXPORT csgl_string ldcf_backup_of(const csgl_string& file);

// What was found beside the files of a schema.
enum class ldcf_leftovers : int {
    none,     // nothing
    unused,   // temporary files of a change that never came to its commit
    undo,     // a commit stopped on its way and is taken back
    finish,   // a commit is carried to its end
    unclear,  // neither schema is whole
};

class DIRBASE_EXPORT ldcf_recovery {
public:
    // Looks at what stands beside the files of one schema, all of them in one call, and changes nothing. A folder under
    // one of the names doesn't count, nor does a name that is itself one of `files`. A file that can't be looked at for
    // another reason than that it isn't there raises the exception of the failed system call.
    explicit ldcf_recovery(const csgl_vector<csgl_string>& files);
    explicit ldcf_recovery(const ldcf_schema& schema);  // beside the files of a schema that is loaded

    ldcf_leftovers found() const { return found_; }

    // True when files have to be moved before the schema stands under their names, or a commit left its old files.
    bool commit_interrupted() const { return found_ == ldcf_leftovers::undo || found_ == ldcf_leftovers::finish; }

    // What was found as a sentence without a full stop, for the administrator; empty for nothing.
    const char* text() const;

    // The files that have something beside them.
    csgl_vector<csgl_string> concerned() const;

    // The path that holds what `file` has to say: another than its own when run() would replace it. So the schema can
    // be read where nothing may be written.
    csgl_string source_of(const csgl_string& file) const;

    // Takes back or carries on, removes what is left over, and tells the debug log each step; nothing is done for
    // `none` and `unclear`. The first step that fails raises its exception; the same verdict holds on the next try.
    void run();

private:
    struct state {
        csgl_string file;
        bool there = false;      // something stands under the file's own name
        bool temporary = false;  // under FILE.tmp
        bool backup = false;     // under FILE.tmp.old
    };

    DIRBASE_HIDDEN ldcf_leftovers judge() const;
    DIRBASE_HIDDEN void put_back();
    DIRBASE_HIDDEN void carry_on();

    csgl_vector<state> states_;
    ldcf_leftovers found_ = ldcf_leftovers::none;
};

#endif

DIRBASE_C_BEGIN

// Recovers the files of a schema, `count` names in `files`, and tells the debug log. Returns 0 when they can be loaded
// now, and 1 when they can't: neither schema is whole, or a step failed, after which it can be tried again.
DIRBASE_EXPORT int ldcf_recover_files(const char* const* files, size_t count);

DIRBASE_C_END
