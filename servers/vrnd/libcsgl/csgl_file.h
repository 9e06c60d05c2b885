// Files whose every failed system call is an exception, and the output stream on top of them.
//
// A file object belongs to one thread at a time; a duplicate shares its position with the object it was made from. No
// exception of this file carries a message id. Failed system calls raise by exc_t::throw_posix_error: a missing file is
// exc_does_not_exist_t, one that is in the way exc_already_exists_t, a refusal exc_permission_denied_t, and so on. A
// null path is exc_assertion_failed_t. Programs that the process starts inherit none of the handles.
#pragma once

#include <cstdint>

#include "servers/vrnd/libcsgl/csgl_output.h"

// How a path is opened.
enum action_indicator : int {
    csgl_file_create_new = 1,       // make a new file; fails when it exists
    csgl_file_open_existing = 2,    // open an existing file
    csgl_file_open_or_create = 3,   // open, making the file when it is missing
    csgl_file_empty_existing = 4,   // open an existing file and empty it
    csgl_file_empty_or_create = 5,  // open or make the file, and empty it
};

enum access_requested_indicator : int {
    csgl_file_read = 1,
    csgl_file_write = 2,
    csgl_file_read_write = 3,
};

// What others shall be denied: checked (0, 2 or 3) and otherwise without effect on this platform.
enum access_denied_indicator : int {
    csgl_file_deny_none = 0,
    csgl_file_deny_write = 2,
    csgl_file_deny_all = 3,
};

enum seek_indicator : int {
    csgl_file_from_start = 0,
    csgl_file_from_here = 1,
    csgl_file_from_end = 2,
};

// Marks the forms of copy and rename that take a target's place; they act the same whatever it holds.
enum force_indicator : int {
    csgl_file_force = 1,
};

// Where a stream begins: emptied, at the end, or where the file stands.
enum mode_indicator : int {
    csgl_output_truncate = 0,
    csgl_output_append = 1,
    csgl_output_as_is = 2,
};

DIRBASE_EXPORT extern const char* const csgl_file_null_name;  // "/dev/null"

class DIRBASE_EXPORT csgl_file {
public:
    // A file's time. It is not available through this class: asking for it, or comparing two, raises
    // exc_not_implemented_t.
    class DIRBASE_EXPORT timestamp {
    public:
        explicit timestamp(const long& value) : value_(value) {}
        bool operator<(const timestamp& other) const;

    private:
        [[maybe_unused]] std::int64_t value_;
    };

    // Opens a path. A new file has permissions 0640 less the process's mask; an existing one keeps its owner and group,
    // also when it is emptied. An indicator out of range raises exc_invalid_parameter_t before the file is touched.
    csgl_file(const char* path, action_indicator action, access_requested_indicator access,
              access_denied_indicator denied);

    // Hold a duplicate of a handle, so that each object closes its own.
    explicit csgl_file(int handle);
    csgl_file(const csgl_file& other);
    csgl_file& operator=(const csgl_file&) = delete;

    // Closes the handle; a failure to close is ignored.
    ~csgl_file();

    static int duplicate_handle(int handle);

    // The file's size in bytes, cut to 32 bits.
    unsigned size() const;

    // One system call each, with the count of bytes that it moved: 0 from read is the end of the file, and a write may
    // fall short. More than INT_MAX bytes raise exc_assertion_failed_t.
    unsigned read(void* data, unsigned size);
    unsigned write(const void* data, unsigned size);

    // Moves the position by bytes from the start, from here or from the end, and gives the new one.
    unsigned long seek(long offset, seek_indicator from);

    // Empties the file; the position isn't moved.
    void truncate();

    // Moves to the end.
    void append();

    // Waits until the file's content is on its disk (fsync).
    void flush();

    [[noreturn]] timestamp get_last_mod_time() const;

    // A path made absolute by the working directory, of at most 1023 bytes; "." and ".." and links stay.
    static csgl_string canonize(const char* path);

    // Copies a file. The first form refuses an existing target (exc_already_exists_t). A failed copy leaves a partly
    // written target, an empty one when the source can be opened and not read. A file copied onto itself stays as it
    // is.
    static void copy(const char* from, const char* to);
    static void copy(const char* from, const char* to, force_indicator force);

    // Renames a file within a file system. The first form refuses an existing target; the second removes it first, so
    // for a moment no file stands under the target's name. Two names of one file lose the first name and keep the file;
    // a name renamed to itself is left alone. A link at the target that leads nowhere counts as none, and is in the
    // way. Between file systems a forced rename fails with the target gone.
    static void rename(const char* from, const char* to);
    static void rename(const char* from, const char* to, force_indicator force);

    static void remove(const char* path);
    static bool exists(const char* path);

    // The process's standard streams, each over a duplicate of handle 0, 1 or 2, closed at process exit.
    static csgl_file& std_input();
    static csgl_file& std_output();
    static csgl_file& std_error();

private:
    int handle_;
};

// A buffered stream over a file of its own.
class DIRBASE_EXPORT csgl_output_file : public csgl_output_buffer_imp_of_512 {
public:
    // Over a duplicate of a file; any other mode raises exc_invalid_parameter_t.
    csgl_output_file(csgl_file& file, mode_indicator mode);

    // Over a path, made when it is missing, emptied (mode 0) or continued (mode 1).
    csgl_output_file(const char* path, mode_indicator mode);

    // Flushes and closes. A failure here can only be told to the debug log: a writer that must know calls flush first.
    ~csgl_output_file() override;

    // Writes what is in the buffer; a write that falls short raises exc_not_enough_disk_t.
    void flush() override;
    void flush_to_disk();
    unsigned write(void* data, unsigned size) override;

    // Shared streams over the standard streams. Where standard error can't be had, its stream leads to the null device.
    static csgl_output_file& std_output();
    static csgl_output_file& std_error();

private:
    csgl_file file_;
};
