// What a run of the tool `dirbase` costs, and a file for it to work on.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace bench_support {

// A file of generate_ldif, removed in the end. The environment variable DIRBASE_BENCH_ENTRIES gives another number of
// entries than 100,000.
class generated_file {
public:
    generated_file();
    ~generated_file();
    generated_file(const generated_file&) = delete;
    generated_file& operator=(const generated_file&) = delete;

    const std::string& path() const { return path_; }
    double entries() const { return static_cast<double>(entries_); }
    double megabytes() const { return megabytes_; }  // of 1,000,000 bytes

private:
    std::string path_;
    std::size_t entries_ = 100'000;
    double megabytes_ = 0;
};

struct run_cost {
    double wall = 0;       // seconds
    double processor = 0;  // seconds, of all threads
    double megabytes = 0;  // the most that was held
};

// Runs the tool with these arguments, on the schema of the source tree. Raises std::runtime_error unless it ends with
// this exit status.
run_cost cost_of_tool(const std::vector<std::string>& arguments, int exit_status);

}  // namespace bench_support
