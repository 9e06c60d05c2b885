// Files: see csgl_file.h.
#include "servers/vrnd/libcsgl/csgl_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>
#include <string_view>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libcsgl/csgl_exception.h"

const char* const csgl_file_null_name = "/dev/null";

namespace {

constexpr mode_t new_file_permissions = 0640;
constexpr unsigned copy_size = 8192;
constexpr std::size_t working_directory_size = 1025;

[[noreturn]] void throw_invalid_parameter(int line)
{
    throw exc_invalid_parameter_t(__FILE__, line, "exc_invalid_parameter", 0);
}

// Raises the exception for errno when a system call has failed; otherwise gives its result.
template <typename Result>
Result checked(Result result, int line)
{
    if (result < 0) {
        exc_t::throw_posix_error(__FILE__, line, errno);
    }
    return result;
}

void check_size(unsigned size)
{
    if (size > static_cast<unsigned>(INT_MAX)) {
        throw exc_assertion_failed_t(__FILE__, __LINE__, "assertion failed: size <= INT_MAX", 0);
    }
}

const char* not_null(const char* path)
{
    if (path == nullptr) {
        throw exc_assertion_failed_t(__FILE__, __LINE__, "unexpected null pointer", 0);
    }
    return path;
}

int open_flags(action_indicator action, access_requested_indicator access, access_denied_indicator denied)
{
    int flags = O_CLOEXEC;
    switch (action) {
    case csgl_file_create_new: flags |= O_CREAT | O_EXCL; break;
    case csgl_file_open_existing: break;
    case csgl_file_open_or_create: flags |= O_CREAT; break;
    case csgl_file_empty_existing: flags |= O_TRUNC; break;
    case csgl_file_empty_or_create: flags |= O_CREAT | O_TRUNC; break;
    default: throw_invalid_parameter(__LINE__);
    }
    switch (access) {
    case csgl_file_read: flags |= O_RDONLY; break;
    case csgl_file_write: flags |= O_WRONLY; break;
    case csgl_file_read_write: flags |= O_RDWR; break;
    default: throw_invalid_parameter(__LINE__);
    }
    switch (denied) {
    case csgl_file_deny_none:
    case csgl_file_deny_write:
    case csgl_file_deny_all: break;
    default: throw_invalid_parameter(__LINE__);
    }
    return flags;
}

int open_path(const char* path, action_indicator action, access_requested_indicator access,
              access_denied_indicator denied)
{
    const int flags = open_flags(action, access, denied);
    struct stat before {};
    const bool existed = ::stat(not_null(path), &before) == 0;
    const int handle = checked(::open(path, flags, new_file_permissions), __LINE__);
    if (existed) {
        // A file that is emptied and written anew keeps its owner also when the process runs as somebody else; where
        // the process may not do that, nothing is lost.
        [[maybe_unused]] const int ignored = ::fchown(handle, before.st_uid, before.st_gid);
    }
    return handle;
}

void refuse_existing(const char* path)
{
    if (csgl_file::exists(path)) {
        throw exc_already_exists_t(__FILE__, __LINE__, "exc_already_exists", 0);
    }
}

// The last component of a path.
std::string_view base_name(std::string_view path)
{
    return path.substr(path.rfind('/') + 1);
}

bool same_file(const struct stat& a, const struct stat& b)
{
    return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

// True when both paths lead to one file, by whatever links.
bool lead_to_one_file(const char* a, const char* b)
{
    struct stat a_stat {};
    struct stat b_stat {};
    return ::stat(a, &a_stat) == 0 && ::stat(b, &b_stat) == 0 && same_file(a_stat, b_stat);
}

bool same_directory(const char* a, const char* b)
{
    const std::string_view a_name = base_name(a);
    const std::string_view b_name = base_name(b);
    const csgl_string a_directory = csgl_string(a, static_cast<unsigned>(std::strlen(a) - a_name.size())) + ".";
    const csgl_string b_directory = csgl_string(b, static_cast<unsigned>(std::strlen(b) - b_name.size())) + ".";
    struct stat a_stat {};
    struct stat b_stat {};
    return ::stat(a_directory, &a_stat) == 0 && ::stat(b_directory, &b_stat) == 0 && same_file(a_stat, b_stat);
}

// How the two names of a rename stand to each other.
enum class two_names { of_two_files, of_one_file, equal };

bool is_link(const char* path)
{
    struct stat status {};
    return ::lstat(path, &status) == 0 && S_ISLNK(status.st_mode);
}

// A target that is a symbolic link is no second name, for removing it loses no file; but when the source is a link too,
// it might lead to its file through the target.
two_names compare_names(const char* from, const char* to)
{
    if (base_name(from) == base_name(to) && same_directory(from, to)) {
        return two_names::equal;
    }
    struct stat from_stat {};
    struct stat to_stat {};
    const bool one_file = ::stat(from, &from_stat) == 0 && ::lstat(to, &to_stat) == 0 &&
                          (same_file(from_stat, to_stat) || (is_link(from) && lead_to_one_file(from, to)));
    return one_file ? two_names::of_one_file : two_names::of_two_files;
}

}  // namespace

bool csgl_file::timestamp::operator<(const timestamp&) const
{
    throw exc_not_implemented_t(__FILE__, __LINE__, "exc_not_implemented", 0);
}

csgl_file::csgl_file(const char* path, action_indicator action, access_requested_indicator access,
                     access_denied_indicator denied)
    : handle_(open_path(path, action, access, denied))
{
}

csgl_file::csgl_file(int handle) : handle_(duplicate_handle(handle)) {}

csgl_file::csgl_file(const csgl_file& other) : handle_(duplicate_handle(other.handle_)) {}

csgl_file::~csgl_file()
{
    ::close(handle_);
}

int csgl_file::duplicate_handle(int handle)
{
    return checked(::fcntl(handle, F_DUPFD_CLOEXEC, 0), __LINE__);
}

unsigned csgl_file::size() const
{
    struct stat status {};
    checked(::fstat(handle_, &status), __LINE__);
    return static_cast<unsigned>(status.st_size);
}

unsigned csgl_file::read(void* data, unsigned size)
{
    check_size(size);
    return static_cast<unsigned>(checked(::read(handle_, data, size), __LINE__));
}

unsigned csgl_file::write(const void* data, unsigned size)
{
    check_size(size);
    return static_cast<unsigned>(checked(::write(handle_, data, size), __LINE__));
}

unsigned long csgl_file::seek(long offset, seek_indicator from)
{
    int whence = 0;
    switch (from) {
    case csgl_file_from_start: whence = SEEK_SET; break;
    case csgl_file_from_here: whence = SEEK_CUR; break;
    case csgl_file_from_end: whence = SEEK_END; break;
    default: throw_invalid_parameter(__LINE__);
    }
    return static_cast<unsigned long>(checked(::lseek(handle_, offset, whence), __LINE__));
}

void csgl_file::truncate()
{
    checked(::ftruncate(handle_, 0), __LINE__);
}

void csgl_file::append()
{
    seek(0, csgl_file_from_end);
}

void csgl_file::flush()
{
    checked(::fsync(handle_), __LINE__);
}

csgl_file::timestamp csgl_file::get_last_mod_time() const
{
    throw exc_not_implemented_t(__FILE__, __LINE__, "exc_not_implemented", 0);
}

csgl_string csgl_file::canonize(const char* path)
{
    if (*not_null(path) == '/') {
        return path;
    }
    const std::size_t length = std::strlen(path);
    csgl_local_array_of<char> buffer(length + 1 + working_directory_size);
    if (::getcwd(buffer.get(), working_directory_size) == nullptr) {
        exc_t::throw_posix_error(__FILE__, __LINE__, errno);
    }
    char* end = buffer.get() + std::strlen(buffer.get());
    *end++ = '/';
    std::memcpy(end, path, length + 1);
    return buffer.get();
}

void csgl_file::copy(const char* from, const char* to)
{
    refuse_existing(to);
    copy(from, to, csgl_file_force);
}

void csgl_file::copy(const char* from, const char* to, force_indicator)
{
    csgl_file source(from, csgl_file_open_existing, csgl_file_read, csgl_file_deny_none);
    not_null(to);
    if (lead_to_one_file(from, to)) {
        return;  // opening the target would empty the source
    }
    csgl_file target(to, csgl_file_empty_or_create, csgl_file_write, csgl_file_deny_none);
    csgl_local_array_of<char> buffer(copy_size);
    while (const unsigned count = source.read(buffer.get(), copy_size)) {
        if (target.write(buffer.get(), count) != count) {
            throw exc_not_enough_disk_t(__FILE__, __LINE__, "exc_not_enough_disk", 0);
        }
    }
}

void csgl_file::rename(const char* from, const char* to)
{
    refuse_existing(to);
    rename(from, to, csgl_file_force);
}

void csgl_file::rename(const char* from, const char* to, force_indicator)
{
    not_null(from);
    if (exists(to)) {
        switch (compare_names(from, to)) {
        case two_names::equal: return;
        case two_names::of_one_file: remove(from); return;
        case two_names::of_two_files: break;
        }
        struct stat status {};
        checked(::lstat(from, &status), __LINE__);  // what can't be linked leaves the target alone
        if (S_ISDIR(status.st_mode)) {
            exc_t::throw_posix_error(__FILE__, __LINE__, EPERM);
        }
        remove(to);
    }
    checked(::link(from, to), __LINE__);
    checked(::unlink(from), __LINE__);
}

void csgl_file::remove(const char* path)
{
    checked(::unlink(not_null(path)), __LINE__);
}

bool csgl_file::exists(const char* path)
{
    struct stat status {};
    return ::stat(not_null(path), &status) == 0;
}

csgl_file& csgl_file::std_input()
{
    static csgl_file file(STDIN_FILENO);
    return file;
}

csgl_file& csgl_file::std_output()
{
    static csgl_file file(STDOUT_FILENO);
    return file;
}

csgl_file& csgl_file::std_error()
{
    static csgl_file file(STDERR_FILENO);
    return file;
}

csgl_output_file::csgl_output_file(csgl_file& file, mode_indicator mode) : file_(file)
{
    switch (mode) {
    case csgl_output_truncate: file_.truncate(); break;
    case csgl_output_append: file_.append(); break;
    case csgl_output_as_is: break;
    default: throw_invalid_parameter(__LINE__);
    }
}

namespace {

csgl_file open_for_output(const char* path, mode_indicator mode)
{
    switch (mode) {
    case csgl_output_truncate: return {path, csgl_file_empty_or_create, csgl_file_write, csgl_file_deny_none};
    case csgl_output_append: return {path, csgl_file_open_or_create, csgl_file_write, csgl_file_deny_none};
    default: throw_invalid_parameter(__LINE__);
    }
}

}  // namespace

csgl_output_file::csgl_output_file(const char* path, mode_indicator mode) : file_(open_for_output(path, mode))
{
    if (mode == csgl_output_append) {
        file_.append();
    }
}

csgl_output_file::~csgl_output_file()
{
    try {
        csgl_output_file::flush();
    } catch (const exc_t& failure) {
        debug_error("Error - csgl_output_file: flush failed at close: %s\n", failure.message().text());
    }
}

void csgl_output_file::flush()
{
    const auto size = static_cast<unsigned>(current_ - begin_);
    if (size == 0) {
        return;
    }
    if (const unsigned written = write(begin_, size); written != size) {
        std::memmove(begin_, begin_ + written, size - written);  // only the rest is written the next time
        current_ -= written;
        throw exc_not_enough_disk_t(__FILE__, __LINE__, "exc_not_enough_disk", 0);
    }
    current_ = begin_;
}

void csgl_output_file::flush_to_disk()
{
    flush();
    file_.flush();
}

unsigned csgl_output_file::write(void* data, unsigned size)
{
    return file_.write(data, size);
}

csgl_output_file& csgl_output_file::std_output()
{
    static csgl_output_file stream(csgl_file::std_output(), csgl_output_as_is);
    return stream;
}

csgl_output_file& csgl_output_file::std_error()
{
    // Never destroyed: whatever runs last at process exit can still complain.
    static csgl_output_file* const stream = []() -> csgl_output_file* {
        try {
            return new csgl_output_file(csgl_file::std_error(), csgl_output_as_is);
        } catch (...) {  // whatever it was, there is no standard error to tell it to
            return nullptr;
        }
    }();
    if (stream != nullptr) {
        return *stream;
    }
    static csgl_output_file nowhere(csgl_file_null_name, csgl_output_append);
    return nowhere;
}
