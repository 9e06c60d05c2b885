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
        const ssize_t got = ::read(file.handle(), chunk.data(), chunk.size());
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got < 0) {
            throw_unusable(path, std::strerror(errno));
        }
        if (got == 0) {
            return text;
        }
        const auto size = static_cast<std::size_t>(got);
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

std::vector<std::string> with_lines_of_input(const std::vector<std::string>& arguments)
{
    std::vector<std::string> texts;
    for (const std::string& argument : arguments) {
        if (argument != standard_input) {
            texts.push_back(argument);
            continue;
        }
        const std::string text = read_text(argument, text_source::any);
        for (std::size_t begin = 0; begin < text.size();) {
            const std::size_t end = std::min(text.find('\n', begin), text.size());
            texts.push_back(text.substr(begin, end - begin));
            begin = end + 1;
        }
    }
    return texts;
}

}  // namespace dirbase_tool
