// Files in a folder of the test's own: opening, moving data, copying, renaming, and the streams on top.
#include "servers/vrnd/libcsgl/csgl_file.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "tests/servers/vrnd/libcsgl/raised.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

namespace fs = std::filesystem;
using test_support::debug_catcher;
using test_support::temp_dir;

namespace {

csgl_file open_file(const std::string& path, int action, int access, int denied = 0)
{
    return {path.c_str(), static_cast<action_indicator>(action), static_cast<access_requested_indicator>(access),
            static_cast<access_denied_indicator>(denied)};
}

std::ptrdiff_t open_handles()
{
    return std::distance(fs::directory_iterator("/proc/self/fd"), fs::directory_iterator());
}

// What stands under a name: "-" for nothing.
std::string content(const temp_dir& dir, const std::string& name)
{
    return fs::exists(dir.path(name)) ? dir.read(name) : "-";
}

// Files of this process end at so many bytes while it lives: a write falls short there, and the next one fails.
class file_size_limit {
public:
    explicit file_size_limit(rlim_t size) : handler_(std::signal(SIGXFSZ, SIG_IGN))
    {
        getrlimit(RLIMIT_FSIZE, &before_);
        const rlimit limit = {size, before_.rlim_max};
        setrlimit(RLIMIT_FSIZE, &limit);
    }
    ~file_size_limit()
    {
        setrlimit(RLIMIT_FSIZE, &before_);
        std::signal(SIGXFSZ, handler_);
    }
    file_size_limit(const file_size_limit&) = delete;
    file_size_limit& operator=(const file_size_limit&) = delete;

private:
    rlimit before_ = {};
    void (*handler_)(int);
};

struct working_directory {
    explicit working_directory(const std::string& path) { fs::current_path(path); }
    ~working_directory() { fs::current_path(before); }
    fs::path before = fs::current_path();
};

// What a child process that runs the action and exits leaves in a handle of its own.
std::string child_output(int handle, const std::function<void()>& action)
{
    int ends[2] = {-1, -1};
    EXPECT_EQ(pipe(ends), 0);
    std::fflush(nullptr);
    const pid_t child = fork();
    if (child == 0) {
        dup2(ends[1], handle);
        close(ends[0]);
        close(ends[1]);
        action();
        std::exit(0);
    }
    close(ends[1]);
    std::string text;
    char bytes[4096];
    for (ssize_t count; (count = read(ends[0], bytes, sizeof(bytes))) > 0;) {
        text.append(bytes, static_cast<std::size_t>(count));
    }
    close(ends[0]);
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_EQ(status, 0);
    return text;
}

}  // namespace

TEST(File, ActionsDecideWhatBecomesOfAFile)
{
    const char* in_the_way = "already_exists (EEXIST)";
    const char* missing = "does_not_exist (ENOENT)";
    const struct {
        int action;
        const char *refusal_of_old, *old_content, *refusal_of_new;
    } cases[] = {{1, in_the_way, "old", nullptr},
                 {2, nullptr, "old", missing},
                 {3, nullptr, "old", nullptr},
                 {4, nullptr, "", missing},
                 {5, nullptr, "", nullptr}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.action);
        const temp_dir dir;
        const std::string old = dir.write("old", "old");
        EXPECT_EQ(raised_by([&] { open_file(old, c.action, 2); }).text, c.refusal_of_old ? c.refusal_of_old : "");
        EXPECT_EQ(content(dir, "old"), c.old_content);
        EXPECT_EQ(raised_by([&] { open_file(dir.path("new"), c.action, 2); }).text,
                  c.refusal_of_new ? c.refusal_of_new : "");
        EXPECT_EQ(content(dir, "new"), c.refusal_of_new ? "-" : "");
    }
}

TEST(File, BadIndicatorsAreRefusedBeforeTheFileIsTouched)
{
    const temp_dir dir;
    const std::string old = dir.write("old", "old");
    const int cases[][3] = {{0, 2, 0}, {6, 2, 0}, {-1, 2, 0}, {5, 0, 0}, {5, 4, 0}, {5, 2, 1}, {5, 2, 4}, {5, 2, -1}};
    for (const auto& [action, access, denied] : cases) {
        SCOPED_TRACE(action * 100 + access * 10 + denied);
        for (const std::string& path : {old, dir.path("new")}) {
            EXPECT_TRUE(raises<exc_invalid_parameter_t>("exc_invalid_parameter",
                                                        [&] { open_file(path, action, access, denied); }));
        }
    }
    EXPECT_EQ(content(dir, "old"), "old");
    EXPECT_EQ(content(dir, "new"), "-");
    EXPECT_NO_THROW(open_file(old, 2, 2, 2));
    EXPECT_NO_THROW(open_file(old, 2, 2, 3));
}

TEST(File, NewFilesTakeTheirPermissionsLessTheMask)
{
    const temp_dir dir;
    const mode_t cases[][2] = {{0, 0640}, {022, 0640}, {077, 0600}, {0200, 0440}};
    for (const auto& [mask, expected] : cases) {
        const std::string path = dir.path(std::to_string(mask));
        const mode_t before = umask(mask);
        open_file(path, 5, 3);
        umask(before);
        struct stat status = {};
        ASSERT_EQ(stat(path.c_str(), &status), 0);
        EXPECT_EQ(status.st_mode & 07777, expected);
    }
}

TEST(File, ReadsWritesAndMovesWithinItsAccess)
{
    const temp_dir dir;
    const std::string path = dir.write("f", "0123456789");
    char bytes[32] = {};
    csgl_file read_only = open_file(path, 2, 1);
    csgl_file write_only = open_file(path, 2, 2);
    EXPECT_TRUE(raises<exc_invalid_handle_t>("invalid_handle (EBADF)", [&] { read_only.write(bytes, 1); }));
    EXPECT_TRUE(raises<exc_invalid_handle_t>("invalid_handle (EBADF)", [&] { write_only.read(bytes, 1); }));

    csgl_file file = open_file(path, 2, 3);
    EXPECT_EQ(file.seek(-3, csgl_file_from_end), 7u);
    EXPECT_EQ(file.read(bytes, sizeof(bytes)), 3u);
    EXPECT_EQ(std::string(bytes), "789");
    EXPECT_EQ(file.read(bytes, INT_MAX), 0u);  // the largest size, at the end of the file
    EXPECT_EQ(file.seek(-4, csgl_file_from_here), 6u);
    EXPECT_TRUE(
        raises<exc_invalid_parameter_t>("invalid_parameter (EINVAL)", [&] { file.seek(-1, csgl_file_from_start); }));
    EXPECT_TRUE(raises<exc_invalid_parameter_t>("exc_invalid_parameter",
                                                [&] { file.seek(0, static_cast<seek_indicator>(3)); }));

    csgl_file twin = file;  // shares the position
    file.truncate();
    EXPECT_EQ(file.size(), 0u);
    EXPECT_EQ(twin.write(bytes, 2), 2u);
    EXPECT_EQ(file.seek(0, csgl_file_from_here), 8u);
    EXPECT_EQ(dir.read("f"), std::string(6, '\0') + "78");
    file.seek(0, csgl_file_from_start);
    file.append();
    file.write(bytes, 1);
    file.flush();
    EXPECT_EQ(file.size(), 9u);

    const char* too_big = "assertion failed: size <= INT_MAX";
    EXPECT_TRUE(raises<exc_assertion_failed_t>(too_big, [&] { file.read(bytes, INT_MAX + 1u); }));
    EXPECT_TRUE(raises<exc_assertion_failed_t>(too_big, [&] { file.write(bytes, UINT_MAX); }));

    fs::resize_file(path, (1ull << 32) + 5);
    EXPECT_EQ(file.size(), 5u);  // cut to 32 bits
}

TEST(File, EachObjectClosesItsOwnHandle)
{
    const temp_dir dir;
    const auto before = open_handles();
    {
        const csgl_file first = open_file(dir.path("f"), 1, 3);
        const csgl_file second = first;
        EXPECT_EQ(open_handles(), before + 2);
        EXPECT_TRUE(raises<exc_invalid_handle_t>("invalid_handle (EBADF)", [] { csgl_file(-1); }));
    }
    EXPECT_EQ(open_handles(), before);
}

TEST(File, TimesAreNotAvailable)
{
    const temp_dir dir;
    const csgl_file file = open_file(dir.path("f"), 1, 3);
    const long now = 5;
    EXPECT_TRUE(raises<exc_not_implemented_t>("exc_not_implemented", [&] { file.get_last_mod_time(); }));
    EXPECT_TRUE(raises<exc_not_implemented_t>("exc_not_implemented",
                                              [&] { return csgl_file::timestamp(now) < csgl_file::timestamp(now); }));
}

TEST(File, PathsBecomeAbsoluteByTheWorkingDirectory)
{
    EXPECT_STREQ(csgl_file::canonize("/a/../b"), "/a/../b");
    EXPECT_STREQ(csgl_file::canonize("/"), "/");

    const temp_dir dir;
    std::string path = fs::canonical(dir.path()).string();
    {
        const working_directory here(path);
        EXPECT_EQ(csgl_file::canonize("../b").c_str(), path + "/../b");
        EXPECT_EQ(csgl_file::canonize("").c_str(), path + "/");
    }
    while (path.size() < 1024) {
        path += "/" + std::string(std::min<std::size_t>(200, std::max<std::size_t>(1, 1023 - path.size())), 'd');
    }
    path.resize(1024);  // the longest that is taken
    fs::create_directories(path + "/e");
    {
        const working_directory here(path);
        EXPECT_EQ(csgl_file::canonize("b").c_str(), path + "/b");
    }
    const working_directory here(path + "/e");
    EXPECT_EQ(raised_by([] { csgl_file::canonize("b"); }).code, ERANGE);
    EXPECT_STREQ(csgl_file::canonize("/b"), "/b");
}

TEST(FileCopy, CopiesEveryByteOverWhatIsThere)
{
    const temp_dir dir;
    const std::string to = dir.path("to");
    for (const std::size_t size : {0u, 1u, 8191u, 8192u, 8193u, 100000u}) {
        std::string text(size, '\0');
        std::generate(text.begin(), text.end(), [n = 0u]() mutable { return static_cast<char>(n++ * 31 >> 3); });
        const std::string from = dir.write("from", text);
        csgl_file::copy(from.c_str(), to.c_str(), csgl_file_force);
        EXPECT_EQ(dir.read("to") == text, true) << size;
        EXPECT_TRUE(
            raises<exc_already_exists_t>("exc_already_exists", [&] { csgl_file::copy(from.c_str(), to.c_str()); }));
        fs::remove(to);
        csgl_file::copy(from.c_str(), to.c_str());
        EXPECT_EQ(dir.read("to") == text, true) << size;
    }
    EXPECT_TRUE(raises<exc_does_not_exist_t>(
        "does_not_exist (ENOENT)", [&] { csgl_file::copy(dir.path("none").c_str(), to.c_str(), csgl_file_force); }));
    EXPECT_EQ(dir.read("to").size(), 100000u);
}

TEST(FileCopy, AShortWriteRaisesAndLeavesThePartAndNoHandle)
{
    const temp_dir dir;
    const std::string from = dir.write("from", std::string(20000, 'x'));
    const auto before = open_handles();
    {
        const file_size_limit limit(10000);
        EXPECT_TRUE(raises<exc_not_enough_disk_t>("exc_not_enough_disk",
                                                  [&] { csgl_file::copy(from.c_str(), dir.path("to").c_str()); }));
    }
    EXPECT_EQ(dir.read("to"), std::string(10000, 'x'));
    EXPECT_EQ(open_handles(), before);
}

// Names below one folder that holds: a "A", b "B", twin and a one file, link to a, again to the folder itself.
TEST(FileRename, NoWayOfNamingOneFileTwiceLosesIt)
{
    const struct {
        const char *from, *to;
        bool force;
        const char *raised, *from_after, *to_after;
    } cases[] = {
        {"a", "new", false, "", "-", "A"},
        {"a", "b", false, "exc_already_exists", "A", "B"},
        {"a", "a", false, "exc_already_exists", "A", "A"},
        {"a", "b", true, "", "-", "A"},
        {"a", "new", true, "", "-", "A"},
        {"a", "twin", true, "", "-", "A"},
        {"a", "a", true, "", "A", "A"},
        {"a", "./a", true, "", "A", "A"},
        {"a", "again/a", true, "", "A", "A"},
        {"again/twin", "a", true, "", "-", "A"},
        {"link", "a", true, "", "-", "A"},
        {"a", "link", true, "", "-", "A"},
        {"none", "new", true, "does_not_exist (ENOENT)", "-", "-"},
        {"a", "none/a", true, "does_not_exist (ENOENT)", "A", "-"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.from) + " to " + c.to);
        const temp_dir dir;
        dir.write("a", "A");
        dir.write("b", "B");
        fs::create_hard_link(dir.path("a"), dir.path("twin"));
        fs::create_symlink("a", dir.path("link"));
        fs::create_symlink(".", dir.path("again"));
        const std::string from = dir.path(c.from);
        const std::string to = dir.path(c.to);
        const raised_exception raised = raised_by([&] {
            c.force ? csgl_file::rename(from.c_str(), to.c_str(), csgl_file_force)
                    : csgl_file::rename(from.c_str(), to.c_str());
        });
        EXPECT_EQ(raised.text, c.raised);
        EXPECT_EQ(content(dir, c.from), c.from_after);
        EXPECT_EQ(content(dir, c.to), c.to_after);
        EXPECT_EQ(csgl_file::exists(to.c_str()), std::string(c.to_after) != "-");
    }
}

TEST(File, RemovingWhatIsNotThereRaises)
{
    const temp_dir dir;
    const std::string path = dir.write("f", "");
    csgl_file::remove(path.c_str());
    EXPECT_FALSE(csgl_file::exists(path.c_str()));
    EXPECT_TRUE(raises<exc_does_not_exist_t>("does_not_exist (ENOENT)", [&] { csgl_file::remove(path.c_str()); }));
}

TEST(OutputFile, ModesDecideWhereWritingBegins)
{
    const struct {
        int mode;
        const char *by_path, *by_file;  // what "XX" makes of "0123", the file standing at 2; null: refused
    } cases[] = {{0, "XX", "\1\1XX"},
                 {1, "0123XX", "0123XX"},
                 {2, nullptr, "01XX"},
                 {3, nullptr, nullptr},
                 {-1, nullptr, nullptr}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.mode);
        const temp_dir dir;
        const auto mode = static_cast<mode_indicator>(c.mode);
        const auto check = [&](const char* expected, const std::function<void()>& write) {
            if (expected == nullptr) {
                EXPECT_TRUE(raises<exc_invalid_parameter_t>("exc_invalid_parameter", write));
                return;
            }
            write();
            std::string text = dir.read("f");
            std::replace(text.begin(), text.end(), '\0', '\1');  // emptying doesn't move the position
            EXPECT_EQ(text, expected);
        };
        const std::string path = dir.write("f", "0123");
        check(c.by_path, [&] { csgl_output_file(path.c_str(), mode).put_chars('X', 2); });
        dir.write("f", "0123");
        csgl_file file = open_file(path, 2, 3);
        file.seek(2, csgl_file_from_start);
        check(c.by_file, [&] { csgl_output_file(file, mode).put_chars('X', 2); });
    }
}

TEST(OutputFile, KeepsUpTo512BytesBack)
{
    const temp_dir dir;
    csgl_output_file output(dir.path("f").c_str(), csgl_output_truncate);
    output.put_chars('a', 512);
    EXPECT_EQ(dir.read("f").size(), 0u);
    output.put_chars('b', 1);
    EXPECT_EQ(dir.read("f").size(), 512u);
    output.flush_to_disk();
    EXPECT_EQ(dir.read("f"), std::string(512, 'a') + "b");

    csgl_file unwritable = open_file(dir.path("f"), 2, 1);
    csgl_output_file empty(unwritable, csgl_output_as_is);
    EXPECT_NO_THROW(empty.flush());  // nothing to write
}

TEST(OutputFile, AShortWriteRaisesAndTheDestructorOnlyTells)
{
    const temp_dir dir;
    const debug_catcher debug;
    {
        const file_size_limit limit(300);
        csgl_output_file output(dir.path("f").c_str(), csgl_output_truncate);
        output.put_chars('x', 512);
        EXPECT_TRUE(raises<exc_not_enough_disk_t>("exc_not_enough_disk", [&] { output.flush(); }));
    }
    EXPECT_EQ(dir.read("f"), std::string(300, 'x'));
    EXPECT_TRUE(debug.has_part("csgl_output_file"));

    csgl_output_file full("/dev/full", csgl_output_append);
    full << "x";
    EXPECT_TRUE(raises<exc_not_enough_disk_t>("not_enough_disk (ENOSPC)", [&] { full.flush(); }));
}

TEST(StandardStreams, AreSharedAndStandardOutputIsFlushedAtExit)
{
    EXPECT_EQ(child_output(STDOUT_FILENO,
                           [] {
                               csgl_output_file::std_output() << "one ";
                               csgl_output_file::std_output() << "two";
                           }),
              "one two");
    EXPECT_EQ(child_output(STDERR_FILENO,
                           [] {
                               csgl_output_file::std_error() << "told";
                               csgl_output_file::std_error().flush();
                           }),
              "told");
}

TEST(StandardStreams, WithoutStandardErrorItsStreamLeadsNowhere)
{
    const std::string text = child_output(STDOUT_FILENO, [] {
        close(STDERR_FILENO);
        csgl_output_file& stream = csgl_output_file::std_error();
        stream << "lost";
        stream.flush();
        csgl_output_file::std_output() << (&stream == &csgl_output_file::std_error() ? "same" : "other");
    });
    EXPECT_EQ(text, "same");
}
