// Runs the real program: see run_tool.h.
#include "tests/tools/dirbase/run_tool.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <system_error>

namespace fs = std::filesystem;

namespace tool_test {

words joined(words front, const words& more)
{
    front.insert(front.end(), more.begin(), more.end());
    return front;
}

tool_run run_tool(const words& arguments, const run_settings& settings)
{
    const test_support::temp_dir streams;
    const std::string in = streams.write("in", settings.input);
    const std::string out = settings.output_path.empty() ? streams.write("out", "") : settings.output_path;
    const std::string err = streams.write("err", "");

    words call = {"env", "-u", "DIRBASE_SCHEMA"};
    if (!settings.schema_variable.empty()) {
        call.push_back("DIRBASE_SCHEMA=" + settings.schema_variable);
    }
    call = joined(joined(call, settings.in_front), {DIRBASE_TOOL});
    call = joined(call, arguments);

    std::vector<char*> pointers;
    for (std::string& word : call) {
        pointers.push_back(word.data());
    }
    pointers.push_back(nullptr);

    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    posix_spawn_file_actions_addopen(&files, STDIN_FILENO, in.c_str(), O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&files, STDOUT_FILENO, out.c_str(), O_WRONLY | O_NOCTTY, 0);
    posix_spawn_file_actions_addopen(&files, STDERR_FILENO, err.c_str(), O_WRONLY, 0);
    pid_t child = 0;
    const int failed = posix_spawnp(&child, "env", &files, nullptr, pointers.data(), environ);
    posix_spawn_file_actions_destroy(&files);
    if (failed != 0) {
        throw std::system_error(failed, std::generic_category(), "env");
    }
    int status = 0;
    waitpid(child, &status, 0);

    tool_run result;
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : 1000 + WTERMSIG(status);
    result.out = settings.output_path.empty() ? streams.read("out") : "";
    result.err = streams.read("err");
    return result;
}

schema_copy::schema_copy()
{
    fs::copy(DIRBASE_SOURCE_SCHEMA_DIR, folder());
}

folder_contents schema_copy::contents() const
{
    folder_contents contents;
    for (const fs::directory_entry& entry : fs::directory_iterator(folder())) {
        const std::string name = entry.path().filename().string();
        contents[name] = read_schema(name);
    }
    return contents;
}

tool_run schema_copy::run(const std::string& command, const words& arguments, const run_settings& settings) const
{
    return run_tool(joined({"schema", command, "--schema", folder()}, arguments), settings);
}

words as_common_user(const schema_copy& schema)
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

}  // namespace tool_test
