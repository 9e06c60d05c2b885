// Preloaded into a program, ends it or fails a call at its n-th system call on the files of one folder.
//
// A library of its own (failing_calls), named in LD_PRELOAD. The environment says what to do:
//
//   FAILING_CALLS_BELOW   the folder; counted are calls on a path below it and on handles that were opened so
//   FAILING_CALLS_WHICH   "all", or "changes" for those that change what stands on disk
//   FAILING_CALLS_AT      the call that is met, from 1; 0 counts none
//   FAILING_CALLS_HOW     "kill-before" or "kill-after": SIGKILL; "EIO", "ENOSPC": the call fails and is not made;
//                         "EROFS-from-here": it and all changes after it fail; "EIO-and-renames": it fails, and so does
//                         every renaming after it
//   FAILING_CALLS_REPORT  a file that takes the call that was met, as "unlink PATH"; it stays as it is when there were
//                         fewer calls
//
// A close that fails has closed the handle, as it does on this platform. Calls that the C library makes by itself
// aren't seen; neither the library nor the tool does its work on schema files through them.
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#define FAILING_CALLS_EXPORT extern "C" __attribute__((visibility("default")))

namespace {

constexpr int handle_limit = 1024;

enum class manner { kill_before, kill_after, fail_once, fail_from_here, fail_and_renames };

const char* setting(const char* name)
{
    const char* value = std::getenv(name);
    return value == nullptr ? "" : value;
}

struct plan {
    const char* below = setting("FAILING_CALLS_BELOW");
    bool only_changes = std::strcmp(setting("FAILING_CALLS_WHICH"), "changes") == 0;
    long at = std::atol(setting("FAILING_CALLS_AT"));
    const char* report = setting("FAILING_CALLS_REPORT");
    manner how = manner::fail_once;
    int error = EIO;

    plan()
    {
        const char* word = setting("FAILING_CALLS_HOW");
        if (std::strcmp(word, "kill-before") == 0) {
            how = manner::kill_before;
        } else if (std::strcmp(word, "kill-after") == 0) {
            how = manner::kill_after;
        } else if (std::strcmp(word, "ENOSPC") == 0) {
            error = ENOSPC;
        } else if (std::strcmp(word, "EROFS-from-here") == 0) {
            how = manner::fail_from_here;
            error = EROFS;
        } else if (std::strcmp(word, "EIO-and-renames") == 0) {
            how = manner::fail_and_renames;
        }
    }
};

const plan& the_plan()
{
    static const plan one;
    return one;
}

std::atomic<long> calls{0};
std::atomic<bool> ours[handle_limit];

bool is_below(const char* path)
{
    const char* folder = the_plan().below;
    return path != nullptr && *folder != '\0' && std::strncmp(path, folder, std::strlen(folder)) == 0;
}

bool is_ours(int handle)
{
    return handle >= 0 && handle < handle_limit && ours[handle];
}

void set_ours(int handle, bool value)
{
    if (handle >= 0 && handle < handle_limit) {
        ours[handle] = value;
    }
}

[[noreturn]] void kill_self()
{
    syscall(SYS_kill, getpid(), SIGKILL);
    for (;;) {
        pause();
    }
}

// What is to become of one counted call.
struct fate {
    bool fails = false;
    bool dies_after = false;
};

fate count(const char* call, const char* path, bool changes)
{
    const plan& p = the_plan();
    if (p.only_changes && !changes) {
        return {};
    }
    const long number = ++calls;
    if (number > p.at && p.at > 0) {
        return {.fails = (p.how == manner::fail_from_here && changes) ||
                         (p.how == manner::fail_and_renames && std::strncmp(call, "rename", 6) == 0)};
    }
    if (number != p.at) {
        return {};
    }
    char line[4096];
    const int length = std::snprintf(line, sizeof line, "%s %s", call, path);
    const long report = syscall(SYS_openat, AT_FDCWD, p.report, O_WRONLY | O_TRUNC, 0);
    syscall(SYS_write, report, line, length);
    syscall(SYS_close, report);
    if (p.how == manner::kill_before) {
        kill_self();
    }
    if (p.how == manner::kill_after) {
        return {.dies_after = true};
    }
    return {.fails = changes || p.how != manner::fail_from_here};
}

template <typename Function>
Function* next_of(const char* name)
{
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

// Makes the call `made` unless it is its fate to fail.
template <typename Made>
auto run(const char* name, const char* path, bool counted, bool changes, Made&& made) -> decltype(made())
{
    if (!counted) {
        return made();
    }
    const fate its = count(name, path, changes);
    if (its.fails) {
        errno = the_plan().error;
        return -1;
    }
    const auto result = made();
    if (its.dies_after) {
        kill_self();
    }
    return result;
}

mode_t mode_argument(int flags, va_list rest)
{
    return (flags & O_CREAT) != 0 ? va_arg(rest, mode_t) : 0;
}

int open_path(const char* name, int folder, const char* path, int flags, mode_t mode)
{
    const bool counted = is_below(path);
    const int handle = run(name, path, counted, (flags & (O_CREAT | O_TRUNC)) != 0,
                           [&] { return static_cast<int>(syscall(SYS_openat, folder, path, flags, mode)); });
    set_ours(handle, counted);
    return handle;
}

}  // namespace

FAILING_CALLS_EXPORT int open(const char* path, int flags, ...)
{
    va_list rest;
    va_start(rest, flags);
    const mode_t mode = mode_argument(flags, rest);
    va_end(rest);
    return open_path("open", AT_FDCWD, path, flags, mode);
}

FAILING_CALLS_EXPORT int open64(const char* path, int flags, ...)
{
    va_list rest;
    va_start(rest, flags);
    const mode_t mode = mode_argument(flags, rest);
    va_end(rest);
    return open_path("open", AT_FDCWD, path, flags, mode);
}

FAILING_CALLS_EXPORT int openat(int folder, const char* path, int flags, ...)
{
    va_list rest;
    va_start(rest, flags);
    const mode_t mode = mode_argument(flags, rest);
    va_end(rest);
    return open_path("openat", folder, path, flags, mode);
}

FAILING_CALLS_EXPORT int close(int handle)
{
    static auto* const next = next_of<int(int)>("close");
    const bool counted = is_ours(handle);
    set_ours(handle, false);
    if (!counted) {
        return next(handle);
    }
    const fate its = count("close", "", false);
    const int result = next(handle);
    if (its.dies_after) {
        kill_self();
    }
    if (its.fails) {
        errno = the_plan().error;
        return -1;
    }
    return result;
}

FAILING_CALLS_EXPORT ssize_t read(int handle, void* data, size_t size)
{
    static auto* const next = next_of<ssize_t(int, void*, size_t)>("read");
    return run("read", "", is_ours(handle), false, [&] { return next(handle, data, size); });
}

FAILING_CALLS_EXPORT ssize_t write(int handle, const void* data, size_t size)
{
    static auto* const next = next_of<ssize_t(int, const void*, size_t)>("write");
    return run("write", "", is_ours(handle), true, [&] { return next(handle, data, size); });
}

FAILING_CALLS_EXPORT int fsync(int handle)
{
    static auto* const next = next_of<int(int)>("fsync");
    return run("fsync", "", is_ours(handle), true, [&] { return next(handle); });
}

FAILING_CALLS_EXPORT int ftruncate(int handle, off_t size)
{
    static auto* const next = next_of<int(int, off_t)>("ftruncate");
    return run("ftruncate", "", is_ours(handle), true, [&] { return next(handle, size); });
}

FAILING_CALLS_EXPORT int flock(int handle, int kind)
{
    static auto* const next = next_of<int(int, int)>("flock");
    return run("flock", "", is_ours(handle), false, [&] { return next(handle, kind); });
}

FAILING_CALLS_EXPORT int stat(const char* path, struct stat* status)
{
    static auto* const next = next_of<int(const char*, struct stat*)>("stat");
    return run("stat", path, is_below(path), false, [&] { return next(path, status); });
}

FAILING_CALLS_EXPORT int lstat(const char* path, struct stat* status)
{
    static auto* const next = next_of<int(const char*, struct stat*)>("lstat");
    return run("lstat", path, is_below(path), false, [&] { return next(path, status); });
}

FAILING_CALLS_EXPORT int fstat(int handle, struct stat* status)
{
    static auto* const next = next_of<int(int, struct stat*)>("fstat");
    return run("fstat", "", is_ours(handle), false, [&] { return next(handle, status); });
}

FAILING_CALLS_EXPORT int rename(const char* from, const char* to)
{
    static auto* const next = next_of<int(const char*, const char*)>("rename");
    return run("rename", from, is_below(from), true, [&] { return next(from, to); });
}

FAILING_CALLS_EXPORT int renameat(int from_folder, const char* from, int to_folder, const char* to)
{
    static auto* const next = next_of<int(int, const char*, int, const char*)>("renameat");
    return run("renameat", from, is_below(from), true, [&] { return next(from_folder, from, to_folder, to); });
}

FAILING_CALLS_EXPORT int link(const char* from, const char* to)
{
    static auto* const next = next_of<int(const char*, const char*)>("link");
    return run("link", from, is_below(from), true, [&] { return next(from, to); });
}

FAILING_CALLS_EXPORT int unlink(const char* path)
{
    static auto* const next = next_of<int(const char*)>("unlink");
    return run("unlink", path, is_below(path), true, [&] { return next(path); });
}

FAILING_CALLS_EXPORT int chown(const char* path, uid_t owner, gid_t group)
{
    static auto* const next = next_of<int(const char*, uid_t, gid_t)>("chown");
    return run("chown", path, is_below(path), true, [&] { return next(path, owner, group); });
}

FAILING_CALLS_EXPORT int fchown(int handle, uid_t owner, gid_t group)
{
    static auto* const next = next_of<int(int, uid_t, gid_t)>("fchown");
    return run("fchown", "", is_ours(handle), true, [&] { return next(handle, owner, group); });
}

FAILING_CALLS_EXPORT int chmod(const char* path, mode_t mode)
{
    static auto* const next = next_of<int(const char*, mode_t)>("chmod");
    return run("chmod", path, is_below(path), true, [&] { return next(path, mode); });
}
