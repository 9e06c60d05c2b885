// An LDIF file of any size, read a batch of whole entries at a time.
//
// Entries are parted by empty lines. What is held at once is a batch and the beginning of the next; an entry beyond
// entry_limit is passed by, and put aside in a temporary file for whoever wants it as it stood.
#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

namespace dirbase_tool {

// The largest entry that is looked at, in bytes of its text.
constexpr std::size_t entry_limit = std::size_t{16} << 20;

// How many bytes of results are gathered before they are written, not counting those of the last entry. A batch may
// come to far more, since a short line can name a large file.
constexpr std::size_t results_limit = std::size_t{1} << 20;

struct close_file {
    void operator()(std::FILE* file) const noexcept { std::fclose(file); }
};
using file_pointer = std::unique_ptr<std::FILE, close_file>;

struct ldif_batch {
    std::string text;             // entries with the empty lines behind them, as they stood
    std::size_t taken = 0;        // how many bytes of that take_entry has taken
    std::size_t line = 1;         // number of the first line behind them
    std::uint64_t too_large = 0;  // not 0: the one entry of the batch has so many bytes, and `text` its first ones
    file_pointer aside;           // that entry, from its first byte; null when nobody wants it

    bool is_taken() const { return taken == text.size(); }
};

// An entry of a batch, in its text.
struct ldif_entry_text {
    std::string_view text;   // with the empty lines behind it; the first bytes of one that is beyond the limit
    std::size_t line = 1;    // number of its first line
    std::uint64_t size = 0;  // in bytes, all of them
};

class ldif_reader {
public:
    // Opens a file, "-" for standard input.
    //
    //   put_aside  whether entries beyond the limit are wanted
    //
    // This and next() raise tool_failure with status_unusable for what can't be opened or read.
    ldif_reader(const std::string& path, bool put_aside);
    ~ldif_reader();
    ldif_reader(const ldif_reader&) = delete;
    ldif_reader& operator=(const ldif_reader&) = delete;

    // Reads the next batch; false at the end. The room of the batch is used again.
    bool next(ldif_batch& batch);

    // Whether there is something to read, so that next() begins without waiting for who writes it.
    bool is_ready() const;

    // How far it is: the bytes read, and those of the file, 0 when nobody knows.
    std::uint64_t bytes_read() const { return bytes_read_; }
    std::uint64_t bytes_in_all() const { return bytes_in_all_; }

    // Whether a path leads to the file that is read.
    bool is_file(const std::string& path) const;

private:
    bool read_more(std::string& text);
    void pass_by(ldif_batch& batch);

    std::string source_;
    int handle_;
    bool put_aside_;
    bool at_end_ = false;
    std::string carried_;  // behind the last batch
    std::size_t line_ = 1;
    std::uint64_t bytes_read_ = 0;
    std::uint64_t bytes_in_all_ = 0;
};

// Takes the next entry off a batch; false at its end. A byte-order mark in front of the first entry of the file is no
// part of it.
bool take_entry(ldif_batch& batch, ldif_entry_text& entry);

}  // namespace dirbase_tool
