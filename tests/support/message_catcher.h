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
    bool complete = true;                // false when memory for the texts above was lacking
};

// Installs a message sink for its lifetime; messages go to standard error again afterwards.
class message_catcher {
public:
    message_catcher();
    ~message_catcher();
    message_catcher(const message_catcher&) = delete;
    message_catcher& operator=(const message_catcher&) = delete;

    // Everything caught so far, in order of arrival; without what there was no memory at all for.
    std::vector<caught_message> messages() const;

    // How many messages came, of all kinds or of one.
    std::size_t count() const;
    std::size_t count(int component, int id) const;

    void clear();

private:
    static void receive(void* context, const message_record& record);

    mutable std::mutex mutex_;
    std::vector<caught_message> caught_;
    std::size_t lost_ = 0;
};

// Installs a debug sink and a level for its lifetime; afterwards debug texts go to standard error again, by the level
// that was set before.
class debug_catcher {
public:
    explicit debug_catcher(unsigned level = LDAP_DEBUG_ERROR);
    ~debug_catcher();
    debug_catcher(const debug_catcher&) = delete;
    debug_catcher& operator=(const debug_catcher&) = delete;

    // The texts caught so far, in order of arrival, with their line feeds; without what memory was lacking for.
    std::vector<std::string> texts() const;

    // How many texts came.
    std::size_t count() const;

    // Whether one of the texts is, or holds, this one.
    bool has(std::string_view text) const;
    bool has_part(std::string_view part) const;

    void clear();

private:
    static void receive(void* context, unsigned level, const char* text);

    mutable std::mutex mutex_;
    std::vector<std::string> caught_;
    std::size_t lost_ = 0;
    unsigned level_before_;
};

}  // namespace test_support
