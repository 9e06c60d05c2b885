// Entries while memory runs out: no entry and no text, or the whole.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libldif/control_text.h"
#include "libraries/libldif/line64.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/model/entry_ber.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"
#include "tests/support/alloc_fault.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

namespace {

class EntryTextAlloc : public model_test::Model {};

const std::string text =
    "dn: cn=a,sn=b\ncn: 1\ncn;lang-en: 2\ncn: 3\nmember: cn=x\nmember: cn=y\ntwoWay: p\nunknown: " +
    std::string(3000, 'u') + "\n2.5.4.4;lang-de: x\n";

TEST_F(EntryTextAlloc, AnEntryIsReadWholeOrNotAtAll)
{
    for (const int flag : {0, 1}) {
        for_each_failing_allocation([&](std::size_t) {
            std::vector<char> copy = [] {
                const alloc_fault_pause pause;
                return std::vector<char>(text.c_str(), text.c_str() + text.size() + 1);
            }();
            Entry* entry = str2entry(copy.data(), flag, flag);
            EXPECT_EQ(entry == nullptr, allocation_failed());
            entry_free(entry);
        });
    }
    for_each_failing_allocation([](std::size_t) {
        char dn[] = "dn: no dn\n";
        Entry* entry = str2entry(dn, 0, 0);
        EXPECT_EQ(entry == nullptr, allocation_failed());
        entry_free(entry);
    });
}

TEST_F(EntryTextAlloc, TextsAreWrittenWholeOrNotAtAll)
{
    std::string copy = text;
    Entry* const entry = str2entry(copy.data(), 0, 0);
    message_no_memory();  // the first message finds out about the time zone, and keeps it
    for_each_failing_allocation([&](std::size_t) {
        const auto expect_text = [](const char* made) {
            const alloc_fault_pause pause;
            EXPECT_TRUE(made == nullptr ? allocation_failed() : std::string_view(made).starts_with("0\ndn: cn=a"));
        };
        char* buffer = nullptr;
        std::size_t size = 0;
        expect_text(entry2str_wo_members(entry, nullptr, 1, &buffer, &size, 0));
        EXPECT_EQ(buffer == nullptr, size == 0);
        std::free(buffer);
        expect_text(entry2str(entry, nullptr, 1));
        std::free(std::exchange(ebuf_global, nullptr));
        emaxsize_global = 0;
        char* ber = nullptr;
        std::size_t length = 0;
        const int result = entry2ber(entry, &ber, &length);
        EXPECT_TRUE(result == 0 ? ber != nullptr
                                : ber == nullptr && allocation_failed() && (result == 90 || result == 1));
        std::free(ber);
    });
    entry_free(entry);
}

TEST_F(EntryTextAlloc, ControlsAndLinesAreMadeWholeOrNotAtAll)
{
    for_each_failing_allocation([](std::size_t) {
        char lines[] = "control: 1.2 true:: YWJj\ncontrol: 1.3 false: x\n";
        LDAPControl** array = string2controlarray(nullptr, lines);
        char* all = control2stringarray(array);
        char* line = ldif_type_and_value("cn", "a", 1);
        EXPECT_TRUE(allocation_failed() || (array[1] != nullptr && all != nullptr && line != nullptr));
        std::free(all);
        std::free(line);
        ldap_controls_free(array);
    });
}

}  // namespace

#endif
