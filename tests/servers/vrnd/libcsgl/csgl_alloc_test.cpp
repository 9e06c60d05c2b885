// The foundation with every allocation failing in turn: one class of exception, nothing lost, nothing changed.
#include <gtest/gtest.h>

#include <functional>
#include <string>

#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libcsgl/csgl_output.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/expect_clean.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::expect_clean;
using test_support::for_each_failing_allocation;

TEST(StringAlloc, AFailureLeavesEveryTextAsItWas)
{
    const std::string before(31, 'b');  // fills the room inside the body
    const std::string added(100, 'x');
    const std::pair<std::size_t, std::function<void(csgl_string&)>> cases[] = {
        {2, [&](csgl_string& s) { s = csgl_string(added.c_str()); }},
        {1, [&](csgl_string& s) { s.append(added.c_str(), 100); }},
        {2, [&](csgl_string& s) { s = csgl_string(s).append(added.c_str()); }},
        {1, [&](csgl_string& s) { s.assign(added.c_str(), 100); }},
        {2, [&](csgl_string& s) { s = s + added.c_str(); }},
        {2, [&](csgl_string& s) { csgl_output_str(s).really_put_char('x'); }},
    };
    for (const auto& [points, change] : cases) {
        EXPECT_EQ(points, for_each_failing_allocation([&](std::size_t) {
                      csgl_string text = (alloc_fault_pause(), csgl_string(before.c_str()));
                      expect_clean([&] { change(text); });
                      EXPECT_EQ(text == before.c_str(), allocation_failed());
                  }));
    }
}

TEST(ExceptionAlloc, WithoutMemoryForItsMessageAnExceptionIsTheOneForMemory)
{
    EXPECT_EQ(2u, for_each_failing_allocation([](std::size_t) {
                  expect_clean([] { exc_invalid_token_t("a.cpp", 12, "invalid [p[token]p]", 0); });
              }));
    EXPECT_EQ(2u, for_each_failing_allocation([](std::size_t) {  // and that one is raised all the same
                  const exc_not_enough_memory_t e("a.cpp", 12, "a text", 0);
                  EXPECT_STREQ(e.message().text(), allocation_failed() ? "not enough memory" : "a text");
              }));
}
