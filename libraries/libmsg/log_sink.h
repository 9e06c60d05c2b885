// Where log lines go: standard error, the end of a file, or a function, behind one mutex. Private to the logs.
//
// The three logs of the process (messages, debug texts, trace) each own one sink as a constant-initialised global that
// is never destroyed, so a line written by a late destructor still finds it. A line goes out as one write(2) to a
// descriptor opened with O_APPEND, which keeps lines of several threads and processes apart; only when the system
// takes less than asked does a second write follow, under the same mutex. Nothing here throws, and no call changes
// errno for its caller.
#pragma once

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include <fcntl.h>
#include <poll.h>
#include <pthread.h>
#include <unistd.h>

#include "libraries/mutex_holder.h"

// Gives errno back its value on the way out: a caller may log first and look at errno afterwards.
class errno_keeper {
public:
    errno_keeper() : saved_(errno) {}
    ~errno_keeper() { errno = saved_; }
    errno_keeper(const errno_keeper&) = delete;
    errno_keeper& operator=(const errno_keeper&) = delete;

private:
    int saved_;
};

// A zero-terminated text in a buffer that may be written to, the terminator included.
struct built_text {
    char* data;
    std::size_t length;

    std::string_view view() const { return {data, length}; }
};

// Text of unknown length in a fixed buffer, on the heap when that is too small, cut when there is no heap left.
template <std::size_t fixed_size>
class scratch_text {
public:
    scratch_text() = default;
    ~scratch_text() { std::free(heap_); }
    scratch_text(const scratch_text&) = delete;
    scratch_text& operator=(const scratch_text&) = delete;

    // Calls write(buffer, size), which fills the buffer in the manner of snprintf and returns the length of the uncut
    // text; calls it a second time when the first buffer was too small. Use once.
    template <typename Writer>
    built_text fill(const Writer& write)
    {
        const std::size_t length = write(fixed_, fixed_size);
        if (length < fixed_size)
            return {fixed_, length};

        heap_ = static_cast<char*>(std::malloc(length + 1));
        if (heap_ == nullptr)
            return {fixed_, std::strlen(fixed_)};  // what fits, which the writer has terminated
        write(heap_, length + 1);
        return {heap_, std::strlen(heap_)};
    }

private:
    char fixed_[fixed_size];
    char* heap_ = nullptr;
};

// The descriptor side of a sink.
class log_output {
public:
    constexpr log_output() = default;
    log_output(const log_output&) = delete;
    log_output& operator=(const log_output&) = delete;

    // Writes a line to wherever the output points. `line` comes without a line feed, which takes its terminator's
    // place.
    void write(const built_text& line)
    {
        const mutex_holder lock(mutex_);
        write_line(line);
    }

    // Points the output at the end of a file, made with permissions 0640 when it is missing. Returns 0 or an errno,
    // after which the output points where it pointed. A null path is EINVAL.
    int set_file(const char* path)
    {
        return set_file(path, [] {});
    }

    void set_standard_error()
    {
        const mutex_holder lock(mutex_);
        point_to(STDERR_FILENO);
    }

protected:
    // As set_file above; what `then` does happens under the same lock.
    template <typename Then>
    int set_file(const char* path, Then then)
    {
        const int opened = open_file(path);
        if (opened < 0)
            return -opened;
        const mutex_holder lock(mutex_);
        point_to(opened);
        then();
        return 0;
    }

    // Returns the descriptor, or an errno negated.
    static int open_file(const char* path)
    {
        const errno_keeper keep;
        if (path == nullptr)
            return -EINVAL;
        int opened;
        do {
            opened = ::open(path, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | O_NOCTTY, 0640);
        } while (opened < 0 && errno == EINTR);
        if (opened >= 0 && opened <= STDERR_FILENO) {  // one of the standard descriptors was closed: leave it so
            const int moved = ::fcntl(opened, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
            const int failure = errno;
            ::close(opened);
            errno = failure;
            opened = moved;
        }
        return opened < 0 ? -errno : opened;
    }

    void point_to(int descriptor)
    {
        const errno_keeper keep;
        if (descriptor_ != STDERR_FILENO)
            ::close(descriptor_);
        descriptor_ = descriptor;
        cut_short_ = false;
    }

    // A failure other than those of a busy descriptor loses the rest of the line: a log has nobody to complain to. The
    // next line begins anew all the same.
    void write_line(const built_text& line)
    {
        const errno_keeper keep;
        line.data[line.length] = '\n';
        if (cut_short_ && write_all("\n") == 0) {
            cut_short_ = false;
        }
        const std::string_view whole(line.data, line.length + 1);
        const std::size_t lost = write_all(whole);
        cut_short_ = cut_short_ || (lost != 0 && lost != whole.size());
    }

    // Returns how many bytes could not be written.
    std::size_t write_all(std::string_view rest)
    {
        while (!rest.empty()) {
            const ssize_t written = ::write(descriptor_, rest.data(), rest.size());
            if (written >= 0) {
                rest.remove_prefix(static_cast<std::size_t>(written));
            } else if (errno == EAGAIN || errno == EWOULDBLOCK) {
                pollfd writable = {descriptor_, POLLOUT, 0};  // a pipe or terminal that somebody made non-blocking
                ::poll(&writable, 1, -1);
            } else if (errno != EINTR) {
                break;
            }
        }
        return rest.size();
    }

    pthread_mutex_t mutex_ = PTHREAD_MUTEX_INITIALIZER;
    int descriptor_ = STDERR_FILENO;
    bool cut_short_ = false;  // the last line isn't whole
};

// A sink that a function may stand in for. Function is the type of a pointer whose first argument is the context.
template <typename Function>
class log_sink : public log_output {
public:
    constexpr log_sink() = default;

    // From here on lines go to the function; a null function means standard error. An open file is closed.
    void set_function(Function function, void* context)
    {
        const mutex_holder lock(mutex_);
        point_to(STDERR_FILENO);
        function_ = function;
        context_ = context;
    }

    int set_file(const char* path)
    {
        return log_output::set_file(path, [this] {
            function_ = nullptr;
            context_ = nullptr;
        });
    }

    // Calls the function with the arguments, or writes the line when there is no function. A function that throws ends
    // the process: it breaks the promise of every logging call above it.
    template <typename... Arguments>
    void deliver(const built_text& line, const Arguments&... arguments) noexcept
    {
        const mutex_holder lock(mutex_);
        if (function_ != nullptr)
            function_(context_, arguments...);
        else
            write_line(line);
    }

private:
    Function function_ = nullptr;
    void* context_ = nullptr;
};
