// An LDIF file of any size: see ldif_reader.h.
#include "tools/dirbase/ldif_reader.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "tools/dirbase/report.h"
#include "tools/dirbase/text_file.h"

namespace dirbase_tool {

namespace {

constexpr std::size_t chunk_size = std::size_t{1} << 17;
constexpr std::size_t head_size = std::size_t{1} << 12;  // of an entry that is passed by
constexpr std::size_t none = std::string_view::npos;
constexpr std::string_view byte_order_mark = "\xEF\xBB\xBF";  // of UTF-8 (RFC 3629 section 6)

// Whether the line feed at `at` ends an empty line. A line ends with a line feed, or a carriage return in front of one.
bool ends_empty_line(std::string_view text, std::size_t at)
{
    const std::size_t before = at > 0 && text[at - 1] == '\r' ? at - 1 : at;
    return before == 0 || text[before - 1] == '\n';
}

// The position behind the last empty line, looked for as far as `from`; npos when there is none.
std::size_t behind_last_entry(std::string_view text, std::size_t from)
{
    for (std::size_t at = text.rfind('\n'); at != none && at >= from; at = text.rfind('\n', at - 1)) {
        if (ends_empty_line(text, at)) {
            return at + 1;
        }
        if (at == 0) {
            break;
        }
    }
    return none;
}

std::size_t count_lines(std::string_view text)
{
    return static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n'));
}

// The end of the first entry of a text, with the empty lines behind it.
std::size_t end_of_entry(std::string_view text)
{
    std::size_t end = 0;
    bool begun = false;
    while (end < text.size()) {
        const std::size_t line_feed = text.find('\n', end);
        if (line_feed == none) {
            end = text.size();
            break;
        }
        const bool empty = ends_empty_line(text, line_feed);
        if (begun && !empty && ends_empty_line(text, end - 1)) {
            break;
        }
        begun = begun || !empty;
        end = line_feed + 1;
    }
    return end;
}

void write_aside(std::FILE* file, std::string_view text)
{
    if (file != nullptr && std::fwrite(text.data(), 1, text.size(), file) != text.size()) {
        throw tool_failure(status_unusable, "temporary file", 0, std::strerror(errno));
    }
}

}  // namespace

ldif_reader::ldif_reader(const std::string& path, bool put_aside)
    : source_(source_name(path)),
      handle_(path == standard_input ? STDIN_FILENO : ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY)),
      put_aside_(put_aside)
{
    struct stat status = {};
    if (handle_ < 0 || ::fstat(handle_, &status) != 0) {
        throw tool_failure(status_unusable, source_, 0, std::strerror(errno));
    }
    if (S_ISDIR(status.st_mode)) {
        throw tool_failure(status_unusable, source_, 0, "a directory, where a file is expected");
    }
    if (S_ISREG(status.st_mode)) {
        bytes_in_all_ = static_cast<std::uint64_t>(status.st_size);
    }
}

ldif_reader::~ldif_reader()
{
    if (handle_ > STDIN_FILENO) {
        ::close(handle_);
    }
}

bool ldif_reader::is_file(const std::string& path) const
{
    struct stat own = {};
    struct stat other = {};
    return ::fstat(handle_, &own) == 0 && ::stat(path.c_str(), &other) == 0 && S_ISREG(own.st_mode) &&
           own.st_dev == other.st_dev && own.st_ino == other.st_ino;
}

// Puts the next piece of the file behind a text; false at its end.
bool ldif_reader::read_more(std::string& text)
{
    if (at_end_) {
        return false;
    }
    const std::size_t old_size = text.size();
    text.resize(old_size + chunk_size);
    ssize_t got = 0;
    do {
        got = ::read(handle_, text.data() + old_size, chunk_size);
    } while (got < 0 && errno == EINTR);
    if (got < 0) {
        throw tool_failure(status_unusable, source_, 0, std::strerror(errno));
    }
    text.resize(old_size + static_cast<std::size_t>(got));
    bytes_read_ += static_cast<std::uint64_t>(got);
    at_end_ = got == 0;
    return !at_end_;
}

bool ldif_reader::is_ready() const
{
    pollfd input = {handle_, POLLIN, 0};
    return ::poll(&input, 1, 0) != 0;  // the end, and a failure, are there to be read too
}

bool ldif_reader::next(ldif_batch& batch)
{
    batch.text.clear();
    batch.text.swap(carried_);
    batch.taken = 0;
    batch.line = line_;
    batch.too_large = 0;
    batch.aside.reset();
    for (std::size_t searched = 0;;) {
        const bool more = read_more(batch.text);
        const std::size_t end = more ? behind_last_entry(batch.text, searched) : batch.text.size();
        if (end != none) {
            carried_.assign(batch.text, end);
            batch.text.resize(end);
            line_ += count_lines(batch.text);
            return !batch.text.empty();
        }
        searched = batch.text.size();
        if (batch.text.size() > entry_limit) {
            pass_by(batch);
            return true;
        }
    }
}

// Reads to the end of the entry whose beginning is the batch.
void ldif_reader::pass_by(ldif_batch& batch)
{
    if (put_aside_) {
        batch.aside.reset(std::tmpfile());
        if (batch.aside == nullptr) {
            throw tool_failure(status_unusable, "temporary file", 0, std::strerror(errno));
        }
    }
    std::string piece = std::move(batch.text);
    batch.text = piece.substr(0, head_size);
    batch.too_large = piece.size();
    line_ += count_lines(piece);
    write_aside(batch.aside.get(), piece);
    for (;;) {
        // The last two bytes stay, since an empty line may lie across the border.
        piece.erase(0, piece.size() - std::min<std::size_t>(piece.size(), 2));
        const std::size_t known = piece.size();
        if (!read_more(piece)) {
            return;
        }
        std::size_t end = known;
        do {
            const std::size_t line_feed = piece.find('\n', end);
            end = line_feed == none ? piece.size() + 1 : line_feed + 1;
        } while (end <= piece.size() && !ends_empty_line(piece, end - 1));
        const std::size_t taken = std::min(end, piece.size());
        const std::string_view part = std::string_view(piece).substr(known, taken - known);
        write_aside(batch.aside.get(), part);
        batch.too_large += part.size();
        line_ += count_lines(part);
        if (end <= piece.size()) {
            carried_.assign(piece, end);
            return;
        }
    }
}

bool take_entry(ldif_batch& batch, ldif_entry_text& entry)
{
    if (batch.line == 1 && batch.taken == 0 && batch.text.starts_with(byte_order_mark)) {
        batch.taken = byte_order_mark.size();
    }
    const std::string_view text = std::string_view(batch.text).substr(batch.taken);
    if (text.empty()) {
        return false;
    }
    const std::size_t end = batch.too_large != 0 ? text.size() : end_of_entry(text);
    entry = {text.substr(0, end), batch.line, batch.too_large != 0 ? batch.too_large : end};
    batch.taken += end;
    batch.line += count_lines(entry.text);
    return true;
}

}  // namespace dirbase_tool
