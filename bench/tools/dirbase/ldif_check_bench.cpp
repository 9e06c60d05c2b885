// `dirbase ldif check` over a generated file, by one thread and by two.
//
// `entries` are checked in `seconds` of wall time, the schema's loading included; `us_an_entry` is the processor time
// of all threads. `memory_mb` is the most that the program held. The run of two threads also tells how many times
// faster it was than the run of one before it; the goal of that holds on a machine with two processors that are free.
//
// The environment variable DIRBASE_BENCH_ENTRIES gives another number of entries than 100,000.
#include <benchmark/benchmark.h>
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
#include <string>

#include "bench/support/generated_ldif.h"

namespace {

// The file, made for the first who asks and removed in the end.
class generated_file {
public:
    generated_file()
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
        bench_support::generate_ldif(path_, entries_);
    }
    ~generated_file() { unlink(path_.c_str()); }
    generated_file(const generated_file&) = delete;
    generated_file& operator=(const generated_file&) = delete;

    const std::string& path() const { return path_; }
    std::size_t entries() const { return entries_; }

private:
    std::string path_;
    std::size_t entries_ = 100'000;
};

struct run_cost {
    double wall = 0;       // seconds
    double processor = 0;  // seconds, of all threads
    double megabytes = 0;  // the most that was held
};

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

// Runs the tool; it must accept every entry.
run_cost check(const std::string& file, const std::string& threads)
{
    const char* const words[] = {DIRBASE_TOOL, "ldif",          "check",      "--schema", DIRBASE_SOURCE_SCHEMA_DIR,
                                 "--threads",  threads.c_str(), file.c_str(), nullptr};
    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    posix_spawn_file_actions_addopen(&files, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    const auto start = std::chrono::steady_clock::now();
    pid_t child = 0;
    const int failed = posix_spawn(&child, words[0], &files, nullptr, const_cast<char**>(words), environ);
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
    if (failed != 0 || ended != child || status != 0) {
        throw std::runtime_error(std::string(words[0]) + " failed");
    }
    const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - start;
    return {wall.count(), seconds_of(used.ru_utime) + seconds_of(used.ru_stime), megabytes};
}

void BM_LdifCheck(benchmark::State& state)
{
    static const generated_file file;
    static double wall_of_one = 0;
    const std::int64_t threads = state.range(0);
    run_cost cost;
    for (auto _ : state) {
        cost = check(file.path(), std::to_string(threads));
        state.SetIterationTime(cost.wall);
    }
    const auto entries = static_cast<double>(file.entries());
    state.counters["entries"] = entries;
    state.counters["seconds"] = cost.wall;
    state.counters["us_an_entry"] = cost.processor * 1e6 / entries;
    state.counters["memory_mb"] = cost.megabytes;
    state.counters["memory_mb_goal"] = 64;
    if (threads == 1) {
        wall_of_one = cost.wall;
    } else if (wall_of_one > 0) {
        state.counters["speedup"] = wall_of_one / cost.wall;
        state.counters["speedup_goal"] = 1.7;
    }
}
BENCHMARK(BM_LdifCheck)->Arg(1)->Arg(2)->Iterations(1)->UseManualTime()->Unit(benchmark::kMillisecond);

}  // namespace
