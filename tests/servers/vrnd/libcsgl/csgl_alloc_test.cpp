// The foundation with every allocation failing in turn: one class of exception, nothing lost, nothing changed.
#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <optional>
#include <string>

#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libcsgl/csgl_file.h"
#include "servers/vrnd/libcsgl/csgl_output.h"
#include "tests/servers/vrnd/libcsgl/raised.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/temp_dir.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;
using test_support::temp_dir;

namespace {

const std::string long_text(100, 'x');

// Runs the action and expects no exception, or the one for memory when an allocation has failed. The action pauses the
// counting around what isn't the foundation's.
void expect_clean(const std::function<void()>& action)
{
    bool refused = false;
    try {
        action();
    } catch (const exc_not_enough_memory_t& e) {
        const alloc_fault_pause pause;
        refused = true;
        EXPECT_STREQ(e.message().text(), "not enough memory");
        EXPECT_STREQ(e.message().printed(), "");
    }
    EXPECT_EQ(refused, allocation_failed());
}

std::ptrdiff_t open_handles()
{
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), std::filesystem::directory_iterator());
}

}  // namespace

TEST(StringAlloc, AFailureLeavesEveryTextAsItWas)
{
    const struct {
        const char* name;
        std::size_t points;
        std::function<void(csgl_string&)> change;
    } cases[] = {
        {"construct", 2, [](csgl_string& s) { s = csgl_string(long_text.c_str()); }},
        {"append", 1, [](csgl_string& s) { s.append(long_text.c_str(), 100); }},
        {"append to a shared text", 2,
         [](csgl_string& s) {
             csgl_string t = s;
             t.append(long_text.c_str());
             s = t;
         }},
        {"assign", 1, [](csgl_string& s) { s.assign(long_text.c_str(), 100); }},
        {"concatenate", 2, [](csgl_string& s) { s = s + long_text.c_str(); }},
        {"stream", 2, [](csgl_string& s) { csgl_output_str(s).really_put_char('x'); }},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string before(31, 'b');  // fills the room inside the body
        const std::size_t points = for_each_failing_allocation([&](std::size_t) {
            std::optional<csgl_string> text;
            {
                const alloc_fault_pause pause;
                text.emplace(before.c_str());
            }
            expect_clean([&] { c.change(*text); });
            const alloc_fault_pause pause;
            EXPECT_EQ(text->c_str() == before, allocation_failed());
            EXPECT_EQ(text->length(), std::string(text->c_str()).size());
        });
        EXPECT_EQ(points, c.points);
    }
}

TEST(ExceptionAlloc, WithoutMemoryForItsMessageAnExceptionIsTheOneForMemory)
{
    const std::size_t points = for_each_failing_allocation(
        [](std::size_t) { expect_clean([] { exc_invalid_token_t("a.cpp", 12, "invalid [p[token]p]", 0); }); });
    EXPECT_EQ(points, 2u);  // body and block
}

TEST(ExceptionAlloc, TheOneForMemoryIsRaisedEvenWithoutMemoryForItsMessage)
{
    const std::size_t points = for_each_failing_allocation([](std::size_t) {
        const auto raise = [] { throw exc_not_enough_memory_t("a.cpp", 12, "not enough memory", 0); };
        EXPECT_TRUE(raises<exc_not_enough_memory_t>("not enough memory", raise));
        const alloc_fault_pause pause;
        EXPECT_EQ(raised_by(raise).line, 12);
    });
    EXPECT_EQ(points, 2u);
}

TEST(FileAlloc, AFailureClosesEveryHandleAndKeepsTheFiles)
{
    const temp_dir dir;
    const std::string a = dir.write("a", "A");
    const std::string b = dir.write("b", "B");
    const std::string twin = dir.path("twin");
    const auto before = open_handles();
    const struct {
        const char* name;
        std::function<void()> action;
    } cases[] = {
        {"canonize", [] { csgl_file::canonize("b"); }},
        {"copy", [&] { csgl_file::copy(a.c_str(), b.c_str(), csgl_file_force); }},
        {"rename to itself", [&] { csgl_file::rename(a.c_str(), (dir.path() + "/./a").c_str(), csgl_file_force); }},
        {"rename of one file", [&] { csgl_file::rename(twin.c_str(), a.c_str(), csgl_file_force); }},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string odd_name = a;
        for_each_failing_allocation([&](std::size_t) {
            {
                const alloc_fault_pause pause;
                std::filesystem::remove(twin);
                std::filesystem::create_hard_link(a, twin);
            }
            expect_clean(c.action);
            const alloc_fault_pause pause;
            EXPECT_EQ(dir.read("a"), "A");
            EXPECT_EQ(open_handles(), before);
        });
    }
}
