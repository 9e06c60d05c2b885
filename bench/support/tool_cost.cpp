// What a run of the tool costs: see tool_cost.h.
#include "bench/support/tool_cost.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>

#include "bench/support/generated_ldif.h"

namespace bench_support {

namespace {

double seconds_of(const timeval& time)
{
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) * 1e-6;
}

// The most memory that a running program has held so far, in megabytes.
double most_held(pid_t program)
{
    std::ifstream status("/proc/" + std::to_string(program) + "/status");
    for (std::string word; status >> word;) {
        double kilobytes = 0;
        if (word == "VmHWM:" && status >> kilobytes) {
            return kilobytes / 1024;
        }
    }
    return 0;
}

}  // namespace

generated_file::generated_file()
{
    if (const char* given = std::getenv("DIRBASE_BENCH_ENTRIES"); given != nullptr) {
        entries_ = std::strtoul(given, nullptr, 10);
    }
    path_ = (std::filesystem::temp_directory_path() / "dirbase-bench-XXXXXX").string();
    const int handle = mkstemp(path_.data());
    if (handle < 0) {
        throw std::runtime_error("can't make " + path_);
    }
    close(handle);
    generate_ldif(path_, entries_);
    megabytes_ = static_cast<double>(std::filesystem::file_size(path_)) * 1e-6;
}

generated_file::~generated_file()
{
    unlink(path_.c_str());
}

run_cost cost_of_tool(const std::vector<std::string>& arguments, int exit_status)
{
    std::vector<std::string> words = {DIRBASE_TOOL};
    words.insert(words.end(), arguments.begin(), arguments.end());
    words.insert(words.end(), {"--schema", DIRBASE_SOURCE_SCHEMA_DIR});
    std::vector<char*> pointers;
    for (std::string& word : words) {
        pointers.push_back(word.data());
    }
    pointers.push_back(nullptr);
    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    posix_spawn_file_actions_addopen(&files, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    const auto start = std::chrono::steady_clock::now();
    pid_t child = 0;
    const int failed = posix_spawn(&child, pointers[0], &files, nullptr, pointers.data(), environ);
    posix_spawn_file_actions_destroy(&files);
    int status = -1;
    rusage used = {};
    double megabytes = 0;
    pid_t ended = 0;
    while (failed == 0 && (ended = wait4(child, &status, WNOHANG, &used)) == 0) {
        // The most that wait4 tells of counts what this program held when it made the other one.
        megabytes = std::max(megabytes, most_held(child));
        usleep(5000);
    }
    if (failed != 0 || ended != child || !WIFEXITED(status) || WEXITSTATUS(status) != exit_status) {
        throw std::runtime_error(words[0] + " failed");
    }
    const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - start;
    return {wall.count(), seconds_of(used.ru_utime) + seconds_of(used.ru_stime), megabytes};
}

}  // namespace bench_support
