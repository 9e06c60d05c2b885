// Files in a folder of the test's own: opening, moving data, copying, renaming, and the streams on top.
#include "servers/vrnd/libcsgl/csgl_file.h"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <climits>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>

#include "tests/servers/vrnd/libcsgl/raised.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

namespace fs = std::filesystem;
using test_support::temp_dir;

namespace {

csgl_file open_file(const std::string& path, int action, int access, int denied = 0)
{
    return {path.c_str(), action_indicator(action), access_requested_indicator(access),
            access_denied_indicator(denied)};
}

// What stands under a name: "-" for nothing.
std::string content(const temp_dir& dir, const std::string& name)
{
    return fs::exists(dir.path(name)) ? dir.read(name) : "-";
}

}  // namespace

TEST(File, ActionsDecideWhatBecomesOfAFile)
{
    const std::string in_the_way = "exc_already_exists_t: already_exists (EEXIST)old";
    const std::string missing = "exc_does_not_exist_t: does_not_exist (ENOENT)-";
    const std::string refused = "exc_invalid_parameter_t: exc_invalid_parameter";
    const auto check = [](int action, int access, int denied, const std::string& of_old, const std::string& of_new) {
        const temp_dir dir;
        const std::string old = dir.write("old", "old");
        std::string text = raised([&] { open_file(old, action, access, denied); });
        EXPECT_EQ(text + content(dir, "old"), of_old) << action << access << denied;
        text = raised([&] { open_file(dir.path("new"), action, access, denied); });
        EXPECT_EQ(text + content(dir, "new"), of_new) << action << access << denied;
    };
    check(1, 2, 0, in_the_way, "");
    check(2, 2, 2, "old", missing);
    check(3, 2, 3, "old", "");
    check(4, 2, 0, "", missing);
    check(5, 2, 0, "", "");
    const int bad[][3] = {{0, 2, 0}, {6, 2, 0}, {-1, 2, 0}, {5, 0, 0}, {5, 4, 0}, {5, 2, 1}, {5, 2, 4}, {5, 2, -1}};
    for (const auto& [action, access, denied] : bad)
        check(action, access, denied, refused + "old", refused + "-");
    const temp_dir dir;
    const mode_t before = umask(0200);
    open_file(dir.path("f"), 5, 3);
    umask(before);
    EXPECT_EQ(fs::status(dir.path("f")).permissions(), fs::perms(0440));
}

TEST(File, ReadsWritesAndMovesWithinItsAccess)
{
    const temp_dir dir;
    const std::string path = dir.write("f", "0123456789");
    char bytes[32] = {};
    csgl_file file = open_file(path, 2, 3);
    EXPECT_EQ(file.seek(-3, csgl_file_from_end), 7u);
    EXPECT_EQ(file.read(bytes, sizeof(bytes)), 3u);
    // The largest size, at the end of the file. On the stack so large a buffer could end beyond the address space:
    // EFAULT.
    EXPECT_EQ(file.read(std::make_unique<char[]>(32).get(), INT_MAX), 0u);
    EXPECT_EQ(file.seek(-4, csgl_file_from_here), 6u);

    csgl_file twin = file;  // shares the position
    file.truncate();
    EXPECT_EQ(twin.write(bytes, 2), 2u);
    EXPECT_EQ(file.seek(0, csgl_file_from_here), 8u);
    file.seek(0, csgl_file_from_start);
    file.append();
    file.write(bytes, 1);
    EXPECT_EQ(dir.read("f"), std::string(6, '\0') + "787");
    fs::resize_file(path, (1ull << 32) + 5);
    EXPECT_EQ(file.size(), 5u);  // cut to 32 bits
    const long now = 5;
    const std::string bad_handle = "exc_invalid_handle_t: invalid_handle (EBADF)";
    const std::string too_big = "exc_assertion_failed_t: assertion failed: size <= INT_MAX";
    const std::string not_there = "exc_not_implemented_t: exc_not_implemented";
    const std::pair<std::string, std::function<void()>> failures[] = {
        {bad_handle, [&] { open_file(path, 2, 1).write(bytes, 1); }},
        {bad_handle, [&] { open_file(path, 2, 2).read(bytes, 1); }},
        {bad_handle, [&] { csgl_file(-1); }},
        {too_big, [&] { file.read(bytes, INT_MAX + 1u); }},
        {too_big, [&] { file.write(bytes, UINT_MAX); }},
        {"exc_invalid_parameter_t: invalid_parameter (EINVAL)", [&] { file.seek(-1, csgl_file_from_start); }},
        {"exc_invalid_parameter_t: exc_invalid_parameter", [&] { file.seek(0, seek_indicator(3)); }},
        {not_there, [&] { file.get_last_mod_time(); }},
        {not_there, [&] { std::ignore = csgl_file::timestamp(now) < csgl_file::timestamp(now); }},
        {"exc_does_not_exist_t: does_not_exist (ENOENT)", [&] { csgl_file::remove(dir.path("none").c_str()); }},
    };
    for (const auto& [expected, action] : failures)
        EXPECT_EQ(raised(action), expected);
}

TEST(File, PathsBecomeAbsoluteByAWorkingDirectoryOfAtMost1024Bytes)
{
    const temp_dir dir;
    const fs::path before = fs::current_path();
    std::string path = fs::canonical(dir.path()).string();
    while (path.size() < 1022)
        path += "/" + std::string(std::min<std::size_t>(200, 1022 - path.size()), 'd');
    path = path.substr(0, 1022) + "/e";
    fs::create_directories(path + "/f");
    fs::current_path(path);
    EXPECT_EQ(csgl_file::canonize("../b").c_str(), path + "/../b");
    fs::current_path(path + "/f");
    EXPECT_EQ(raised([] { csgl_file::canonize("b"); }), "exc_unmapped_t 34: unmapped UNQ error");  // ERANGE
    EXPECT_STREQ(csgl_file::canonize("/a/../b"), "/a/../b");
    fs::current_path(before);
}

// In a folder that holds a "A", b "B", twin and a one file, link to a, again to the folder itself.
TEST(FileRename, NoTwoNamesOfOneFileLoseIt)
{
    const std::string missing = "exc_does_not_exist_t: does_not_exist (ENOENT)";
    // From, to, then what is raised and what stands under the two names.
    // clang-format off
    const std::string cases[][3] = {
        {"a", "b", "-A"}, {"a", "new", "-A"}, {"a", "twin", "-A"}, {"twin", "a", "-A"}, {"again/twin", "a", "-A"},
        {"a", "a", "AA"}, {"a", "./a", "AA"}, {"a", "again/a", "AA"}, {"link", "a", "-A"}, {"a", "link", "-A"},
        {"on", "link", "-A"},
        {"none", "new", missing + "--"}, {"a", "none/a", missing + "A-"}};
    // clang-format on
    for (const auto& [from, to, expected] : cases) {
        const temp_dir dir;
        const std::string source = dir.write("a", "A");
        dir.write("b", "B");
        fs::create_hard_link(source, dir.path("twin"));
        fs::create_symlink("a", dir.path("link"));
        fs::create_symlink("link", dir.path("on"));
        fs::create_symlink(".", dir.path("again"));
        const std::string in_the_way = "exc_already_exists_t: exc_already_exists";
        EXPECT_EQ(raised([&] { csgl_file::rename(source.c_str(), dir.path("b").c_str()); }), in_the_way);
        EXPECT_EQ(raised([&] { csgl_file::copy(source.c_str(), dir.path("b").c_str()); }), in_the_way);
        const std::string text = raised(
            [&, f = dir.path(from), t = dir.path(to)] { csgl_file::rename(f.c_str(), t.c_str(), csgl_file_force); });
        EXPECT_EQ(text + content(dir, from) + content(dir, to), expected) << from << " to " << to;
    }
    // What can't be linked leaves the target alone.
    const temp_dir dir;
    dir.write("b", "B");
    fs::create_directory(dir.path("folder"));
    EXPECT_NE(raised([&] { csgl_file::rename(dir.path("folder").c_str(), dir.path("b").c_str(), csgl_file_force); }),
              "");
    EXPECT_EQ(content(dir, "b"), "B");
}

TEST(OutputFile, KeepsUpTo512BytesBackAndShortWritesRaise)
{
    const temp_dir dir;
    const std::string source = dir.write("source", std::string(20000, 'x'));
    const std::string no_room = "exc_not_enough_disk_t: exc_not_enough_disk";
    const test_support::debug_catcher debug;
    const auto handler = std::signal(SIGXFSZ, SIG_IGN);
    rlimit before = {};
    getrlimit(RLIMIT_FSIZE, &before);
    const rlimit limit = {700, before.rlim_max};  // a write falls short here, and the next one fails
    setrlimit(RLIMIT_FSIZE, &limit);
    {
        csgl_output_file output(dir.path("f").c_str(), csgl_output_truncate);
        output.put_chars('a', 512);
        EXPECT_EQ(dir.read("f").size(), 0u);
        output.put_chars('b', 1);
        EXPECT_EQ(dir.read("f").size(), 512u);
        output.flush_to_disk();
        EXPECT_EQ(dir.read("f").size(), 513u);
        output.put_chars('c', 512);
        EXPECT_EQ(raised([&] { output.flush(); }), no_room);
    }  // the destructor's own failure is only told
    const std::string copy = dir.path("copy");
    EXPECT_EQ(raised([&] { csgl_file::copy(source.c_str(), copy.c_str()); }), no_room);
    setrlimit(RLIMIT_FSIZE, &before);
    std::signal(SIGXFSZ, handler);
    EXPECT_EQ(debug.count(), 1u);
    EXPECT_EQ(dir.read("copy"), std::string(700, 'x'));
    for (const unsigned size : {20000u, 8193u, 8192u, 1u, 0u}) {
        fs::resize_file(source, size);
        csgl_file::copy(source.c_str(), copy.c_str(), csgl_file_force);
        EXPECT_EQ(dir.read("copy"), std::string(size, 'x'));
    }
    csgl_file unwritable = open_file(source, 2, 1);
    csgl_output_file(unwritable, csgl_output_as_is).flush();  // nothing to write
    csgl_output_file(copy.c_str(), csgl_output_truncate).put_chars('y', 3);
    csgl_output_file(copy.c_str(), csgl_output_append).put_chars('z', 1);
    csgl_file file = open_file(copy, 2, 2);
    csgl_output_file(file, csgl_output_append).put_chars('!', 1);
    EXPECT_EQ(dir.read("copy"), "yyyz!");
    EXPECT_EQ(raised([&] { csgl_output_file(copy.c_str(), csgl_output_as_is); }),
              "exc_invalid_parameter_t: exc_invalid_parameter");
}
