// Catches what the code under test logs.
//
//     message_catcher messages;                       // from here to the end of the scope
//     EXPECT_EQ(do_it(), LDAP_NO_MEMORY);
//     EXPECT_EQ(messages.count(MSG_COMPONENT_SERVER, 7), 1u);
//
// Everything is copied on arrival. The catchers may be asked while other threads are still logging. A log has one
// sink, so two catchers of one kind can't be alive at the same time.
#pragma once

#include <cstddef>
#include <mutex>
#include <new>
#include <string>
#include <string_view>
#include <vector>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"

namespace test_support {

struct caught_message {
    int component = 0;
    int severity = 0;
    int id = 0;
    std::vector<std::string> arguments;  // as they print: a null text is empty
    std::string text;                    // what the catalogue made of it
    std::string line;                    // the log line without its line feed
};

// What was caught, in order of arrival.
template <typename Entry>
class catcher {
public:
    catcher() { caught_.reserve(256); }
    catcher(const catcher&) = delete;
    catcher& operator=(const catcher&) = delete;

    // How many came, with those that there was no memory at all for.
    std::size_t count() const
    {
        const std::lock_guard<std::mutex> lock(mutex_);
        return caught_.size() + lost_;
    }

    void clear()
    {
        const std::lock_guard<std::mutex> lock(mutex_);
        caught_.clear();
        lost_ = 0;
    }

protected:
    // Calls make(), which may run out of memory, for what is kept.
    template <typename Make>
    void add(const Make& make)
    {
        const std::lock_guard<std::mutex> lock(mutex_);
        try {
            caught_.push_back(make());
        } catch (const std::bad_alloc&) {
            ++lost_;
        }
    }

    std::vector<Entry> all() const
    {
        const std::lock_guard<std::mutex> lock(mutex_);
        return caught_;
    }

    mutable std::mutex mutex_;
    std::vector<Entry> caught_;
    std::size_t lost_ = 0;
};

// Installs a message sink for its lifetime; messages go to standard error again afterwards. A message that comes while
// memory is lacking is kept without its texts.
class message_catcher : public catcher<caught_message> {
public:
    message_catcher() { set_message_sink(&message_catcher::receive, this); }
    ~message_catcher() { set_message_sink(nullptr, nullptr); }

    std::vector<caught_message> messages() const { return all(); }

    using catcher::count;
    std::size_t count(int component, int id) const;

private:
    static void receive(void* context, const message_record& record);
};

// Installs a debug sink and a level for its lifetime; afterwards debug texts go to standard error again, by the level
// that was set before.
class debug_catcher : public catcher<std::string> {
public:
    explicit debug_catcher(unsigned level = LDAP_DEBUG_ERROR);
    ~debug_catcher();

    // The texts with their line feeds; without what memory was lacking for.
    std::vector<std::string> texts() const { return all(); }

    bool has(std::string_view text) const;

private:
    static void receive(void* context, unsigned level, const char* text);

    unsigned level_before_;
};

}  // namespace test_support
