// Tables of calls, each made again and again with its 1st, 2nd, ... allocation failing, by itself and with all behind
// it.
//
//     expect_outcomes({
//         row("dn_upcase", "0 CN=A", {"90 cn=a"}, [] { ... }),
//     });
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <memory>
#include <sstream>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "tests/support/alloc_fault.h"

namespace test_support {

// A text whose memory doesn't count among the allocations of the run.
class calm_text {
public:
    calm_text(const char* text) : calm_text(std::string_view(text)) {}
    calm_text(const std::string& text) : calm_text(std::string_view(text)) {}
    explicit calm_text(std::string_view text)
    {
        const alloc_fault_pause pause;
        text_.assign(text);
    }
    calm_text(const calm_text& other) : calm_text(std::string_view(other.text_)) {}
    calm_text(calm_text&&) noexcept = default;
    calm_text& operator=(const calm_text&) = delete;

    const std::string& str() const { return text_; }
    friend calm_text operator+(const calm_text& a, const calm_text& b)
    {
        const alloc_fault_pause pause;
        return calm_text(a.text_ + b.text_);
    }

private:
    std::string text_;
};

struct outcome_row {
    const char* name;  // of the function
    // Sets up (calm), calls, releases, and tells the result together with what became of the caller's data.
    std::function<calm_text()> call;
    std::string whole = "made";  // what is told while no allocation fails
    // What is told when one has failed: each of these by some run, and nothing else.
    std::vector<std::string> failed = {"(null)"};
};

inline outcome_row row(const char* name, std::function<calm_text()> call)
{
    return {name, std::move(call)};
}
inline outcome_row row(const char* name, std::string whole, std::function<calm_text()> call)
{
    return {name, std::move(call), std::move(whole)};
}
inline outcome_row row(const char* name, std::string whole, std::vector<std::string> failed,
                       std::function<calm_text()> call)
{
    return {name, std::move(call), std::move(whole), std::move(failed)};
}

inline void expect_outcomes(const std::vector<outcome_row>& rows)
{
    for (const outcome_row& each : rows) {
        SCOPED_TRACE(each.name);
        std::vector<bool> told(each.failed.size());
        const auto body = [&](std::size_t point) {
            const calm_text result = [&] {
                try {
                    return each.call();
                } catch (...) {
                    return calm_text("raised");
                }
            }();
            const alloc_fault_pause pause;
            if (!allocation_failed()) {
                EXPECT_EQ(result.str(), each.whole);
                return;
            }
            const auto found = std::find(each.failed.begin(), each.failed.end(), result.str());
            if (found == each.failed.end()) {
                ADD_FAILURE() << result.str() << ", allocation " << point;
            } else {
                told[static_cast<std::size_t>(found - each.failed.begin())] = true;
            }
        };
        for_each_failing_allocation(body, alloc_failures::one);
        for_each_failing_allocation(body, alloc_failures::all_from_there);
        for (std::size_t i = 0; i < told.size(); ++i) {
            EXPECT_TRUE(told[i]) << "never told: " << each.failed[i];
        }
    }
}

// Runs a part of a row whose allocations are neither counted nor made to fail.
template <typename Action>
auto calm(const Action& action)
{
    const alloc_fault_pause pause;
    return action();
}

// The parts of what is told, joined; a null text is "(null)".
template <typename T>
void tell_part(std::ostream& out, const T& part)
{
    if constexpr (std::is_same_v<T, calm_text>) {
        out << part.str();
    } else if constexpr (std::is_same_v<T, std::nullptr_t>) {
        out << "(null)";
    } else if constexpr (std::is_convertible_v<T, const char*>) {
        const char* const text = part;
        out << (text == nullptr ? "(null)" : text);
    } else {
        out << part;
    }
}
template <typename... Parts>
calm_text tell(const Parts&... parts)
{
    const alloc_fault_pause pause;
    std::ostringstream out;
    (tell_part(out, parts), ...);
    return calm_text(out.str());
}

// Has the logs write their lines for as long as one lives, and keeps what they got without a row's memory.
class quiet_logs {
public:
    quiet_logs()
    {
        set_message_sink(
            [](void* logs, const message_record& message) {
                const alloc_fault_pause pause;
                static_cast<quiet_logs*>(logs)->got_ += "message " + std::to_string(message.id) + "\n";
            },
            this);
        set_debug_sink(
            [](void* logs, unsigned, const char* text) {
                const alloc_fault_pause pause;
                static_cast<quiet_logs*>(logs)->got_ += text;
            },
            this);
        write_ldap_debug(LDAP_DEBUG_ERROR);
        message_no_memory();  // the C library reads the time zone once
        take();
    }
    ~quiet_logs()
    {
        write_ldap_debug(0);
        set_debug_sink(nullptr, nullptr);
        set_message_sink(nullptr, nullptr);
    }
    quiet_logs(const quiet_logs&) = delete;
    quiet_logs& operator=(const quiet_logs&) = delete;

    // What came since the last call: debug texts as they are, messages by their numbers.
    calm_text take()
    {
        const alloc_fault_pause pause;
        calm_text text(got_);
        got_.clear();
        return text;
    }

private:
    std::string got_ = std::string(1000, ' ');  // a block from the start on, or its making would look like a leak
};

// A copy on the C heap, made calmly.
inline char* heap_copy(const char* text)
{
    const alloc_fault_pause pause;
    return strdup(text);
}

// Tells a text of malloc and releases it.
inline calm_text tell_freed(char* text)
{
    const std::unique_ptr<char, decltype(&std::free)> owner(text, std::free);
    return tell(text);
}

// "made" or "(null)", and the record is released.
template <typename T, typename Release>
calm_text tell_made(T* record, const Release& release)
{
    if (record != nullptr) {
        release(record);
    }
    return record != nullptr ? "made" : "(null)";
}

}  // namespace test_support
