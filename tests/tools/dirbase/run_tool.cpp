// Runs the real program: see run_tool.h.
#include "tests/tools/dirbase/run_tool.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstring>
#include <sstream>
#include <system_error>

namespace fs = std::filesystem;

namespace tool_test {

namespace {

std::vector<char*> pointers_to(std::vector<std::string>& texts)
{
    std::vector<char*> pointers;
    for (std::string& text : texts) {
        pointers.push_back(text.data());
    }
    pointers.push_back(nullptr);
    return pointers;
}

std::vector<std::string> environment_with(const std::string& schema_variable)
{
    constexpr char variable[] = "DIRBASE_SCHEMA=";
    std::vector<std::string> environment;
    for (char** entry = environ; *entry != nullptr; ++entry) {
        if (std::strncmp(*entry, variable, sizeof(variable) - 1) != 0) {
            environment.emplace_back(*entry);
        }
    }
    if (!schema_variable.empty()) {
        environment.push_back(variable + schema_variable);
    }
    return environment;
}

}  // namespace

tool_run run_tool(const std::vector<std::string>& arguments, const run_settings& settings)
{
    const test_support::temp_dir streams;
    const std::string in = streams.write("in", settings.input);
    const std::string out = settings.output_path.empty() ? streams.write("out", "") : settings.output_path;
    const std::string err = streams.write("err", "");

    std::vector<std::string> words = settings.in_front;
    words.emplace_back(DIRBASE_TOOL);
    words.insert(words.end(), arguments.begin(), arguments.end());
    std::vector<std::string> environment = environment_with(settings.schema_variable);

    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    posix_spawn_file_actions_addopen(&files, STDIN_FILENO, in.c_str(), O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&files, STDOUT_FILENO, out.c_str(), O_WRONLY | O_NOCTTY, 0);
    posix_spawn_file_actions_addopen(&files, STDERR_FILENO, err.c_str(), O_WRONLY, 0);
    pid_t child = 0;
    const int failed = posix_spawnp(&child, words.front().c_str(), &files, nullptr, pointers_to(words).data(),
                                    pointers_to(environment).data());
    posix_spawn_file_actions_destroy(&files);
    if (failed != 0) {
        throw std::system_error(failed, std::generic_category(), words.front());
    }
    int status = 0;
    waitpid(child, &status, 0);

    tool_run result;
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : 1000 + WTERMSIG(status);
    result.out = settings.output_path.empty() ? streams.read("out") : "";
    result.err = streams.read("err");
    return result;
}

folder_contents contents_of(const std::string& folder)
{
    folder_contents contents;
    for (const fs::directory_entry& entry : fs::directory_iterator(folder)) {
        std::ifstream in(entry.path(), std::ios::binary);
        contents[entry.path().filename().string()] =
            std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
    }
    return contents;
}

schema_copy::schema_copy()
{
    fs::copy(DIRBASE_SOURCE_SCHEMA_DIR, folder());
}

tool_run schema_copy::run(const std::string& command, const std::vector<std::string>& arguments,
                          const run_settings& settings) const
{
    std::vector<std::string> words = {"schema", command, "--schema", folder()};
    words.insert(words.end(), arguments.begin(), arguments.end());
    return run_tool(words, settings);
}

std::vector<std::string> as_common_user(const schema_copy& schema)
{
    if (geteuid() != 0) {
        return {};
    }
    fs::permissions(schema.path(""), fs::perms(0755));
    return {"setpriv", "--reuid=65534", "--regid=65534", "--clear-groups", "--"};
}

single_file_schema::single_file_schema(const std::string& text)
{
    dir_.write("schema.list", "all\n");
    dir_.write("all", text);
}

std::vector<std::string> lines_of(const std::string& text)
{
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) {
        lines.push_back(line);
    }
    return lines;
}

}  // namespace tool_test
