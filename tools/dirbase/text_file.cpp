// Texts from files and from standard input: see text_file.h.
#include "tools/dirbase/text_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <vector>

#include "tools/dirbase/report.h"

namespace dirbase_tool {

namespace {

constexpr std::size_t size_limit = std::size_t{1} << 30;
constexpr std::size_t line_limit = std::size_t{1} << 20;
constexpr std::size_t chunk_size = std::size_t{1} << 16;

// An open file; standard input stays open behind it.
class input {
public:
    explicit input(const std::string& path)
        : handle_(path == standard_input ? STDIN_FILENO : ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY))
    {
    }
    ~input()
    {
        if (handle_ > STDIN_FILENO) {
            ::close(handle_);
        }
    }
    input(const input&) = delete;
    input& operator=(const input&) = delete;

    int handle() const { return handle_; }

private:
    int handle_;
};

[[noreturn]] void throw_unusable(const std::string& path, const std::string& text)
{
    throw tool_failure(status_unusable, source_name(path), 0, text);
}

// Reads on, and says how many bytes came: 0 at the end.
std::size_t read_some(const input& file, const std::string& path, std::vector<char>& chunk)
{
    for (;;) {
        const ssize_t got = ::read(file.handle(), chunk.data(), chunk.size());
        if (got >= 0) {
            return static_cast<std::size_t>(got);
        }
        if (errno != EINTR) {
            throw_unusable(path, std::strerror(errno));
        }
    }
}

void check_line(const std::string& line, int number)
{
    const bool is_long = line.size() > line_limit;
    if (is_long || line.find('\0') != std::string::npos) {
        throw tool_failure(status_unusable, source_name(standard_input), number,
                           is_long ? "longer than 1 MiB" : "holds a byte 0");
    }
}

// Hands over the lines of standard input; the last one may lack its end.
void for_each_line(const std::function<void(const std::string&)>& take, const std::function<void()>& before_reading)
{
    const input file(standard_input);
    std::vector<char> chunk(chunk_size);
    std::string text;  // what has been read and not handed over
    std::string line;
    int number = 1;
    for (;;) {
        before_reading();
        const std::size_t searched = text.size();
        const std::size_t got = read_some(file, standard_input, chunk);
        text.append(chunk.data(), got);
        std::size_t begin = 0;
        for (std::size_t end = text.find('\n', searched); end != std::string::npos; end = text.find('\n', begin)) {
            line.assign(text, begin, end - begin);
            line.resize(line.size() - (line.ends_with('\r') ? 1 : 0));
            check_line(line, number++);
            take(line);
            begin = end + 1;
        }
        text.erase(0, begin);
        if (!text.empty() && (got == 0 || text.size() > line_limit)) {
            check_line(text, number);
            take(text);
        }
        if (got == 0) {
            return;
        }
    }
}

}  // namespace

std::string source_name(const std::string& path)
{
    return path == standard_input ? "standard input" : path;
}

std::string read_text(const std::string& path, text_source allowed)
{
    if (allowed == text_source::regular_file) {
        // Looked at ahead of the opening, which would wait for the other end of a pipe.
        struct stat status = {};
        if (::stat(path.c_str(), &status) == 0 && !S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode)) {
            throw_unusable(path, "not a regular file");
        }
    }
    const input file(path);
    struct stat status = {};
    if (file.handle() < 0 || ::fstat(file.handle(), &status) != 0) {
        throw_unusable(path, std::strerror(errno));
    }
    if (S_ISDIR(status.st_mode)) {
        throw_unusable(path, "a directory, where a file is expected");
    }

    std::string text;
    if (status.st_size > 0) {
        text.reserve(std::min(static_cast<std::size_t>(status.st_size), size_limit));
    }
    std::vector<char> chunk(chunk_size);
    for (;;) {
        const std::size_t size = read_some(file, path, chunk);
        if (size == 0) {
            return text;
        }
        if (const void* zero = std::memchr(chunk.data(), 0, size); zero != nullptr) {
            const auto at = static_cast<std::size_t>(static_cast<const char*>(zero) - chunk.data());
            throw_unusable(path, "a binary file: byte " + std::to_string(text.size() + at + 1) + " is NUL");
        }
        if (text.size() + size > size_limit) {
            throw_unusable(path, "larger than 1 GiB, which no schema file is");
        }
        text.append(chunk.data(), size);
    }
}

void for_each_line_or_argument(const std::vector<std::string>& arguments,
                               const std::function<void(const std::string&)>& take,
                               const std::function<void()>& before_reading)
{
    for (const std::string& argument : arguments) {
        if (argument == standard_input) {
            for_each_line(take, before_reading);
        } else {
            take(argument);
        }
    }
}

}  // namespace dirbase_tool
