// Settings, helpers and instances of the server.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>
#include <string>
#include <thread>
#include <vector>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/base/server_instance.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

using test_support::debug_catcher;
using test_support::temp_dir;

namespace {

using texts = std::vector<std::string>;

TEST(ServerGlobals, SettingsStartAsInAServerWithoutConfiguration)
{
    EXPECT_EQ(getAliasOptCfg(), 3);
    EXPECT_EQ(getAliasOptGlobal(), 1);
    EXPECT_EQ(get_write_timeout(), 120);
    EXPECT_TRUE(get_allow_anon());
    EXPECT_EQ(g_InternalSearchLimit, -1);

    const debug_catcher debug(LDAP_DEBUG_TRACE);
    set_transactionsEnabled(2);
    set_transactionsEnabled(0);
    EXPECT_EQ(debug.texts(),
              (texts{"g_transactionsEnabled is set to true\n", "g_transactionsEnabled is set to false\n"}));
}

TEST(ServerGlobals, DereferencingIsSetByWordAndOnlyByAKnownOne)
{
    const struct {
        const char* word;
        int rc;
        int value;
    } table[] = {{"Never", 0, 0}, {"SEARCH", 0, 1}, {"find", 0, 2},  {"often", 1, 2},
                 {"", 1, 2},      {nullptr, 1, 2},  {"finds", 1, 2}, {"ALWAYS", 0, 3}};
    for (const auto& [word, rc, value] : table) {
        EXPECT_EQ(updateDerefOpt(word), rc);
        EXPECT_EQ(getAliasOptCfg(), value);
    }
}

TEST(ServerGlobals, ThreadsSetAndReadTheLockedSettings)
{
    initDOSLocks();
    vrn_strerror_init();
    std::vector<std::thread> threads;
    for (int number = 0; number < 4; ++number) {
        threads.emplace_back([number] {
            for (int round = 0; round < 200; ++round) {
                set_allow_anon(static_cast<unsigned char>(number * 2));
                get_allow_anon();
                set_write_timeout(number % 2 == 0 ? -1 : 0x0000000100000001);
                const std::int64_t timeout = get_write_timeout();
                EXPECT_TRUE(timeout == -1 || timeout == 0x0000000100000001) << timeout;
                const int error = 100000 + number;  // its text is made in the platform's one buffer
                char* text = vrn_strerror(error);
                EXPECT_EQ(text, "Unknown error " + std::to_string(error));
                std::free(text);
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    set_allow_anon(0);
    EXPECT_FALSE(get_allow_anon());
    set_allow_anon(1);
    set_write_timeout(120);
}

TEST(ServerGlobals, TextsCompareAsSignedBytes)
{
    const struct {
        const char* a;
        const char* b;
        int order;
    } table[] = {{nullptr, nullptr, 0},  {nullptr, "", -1},      {"", nullptr, 1},   {"", "", 0},
                 {"a", "ab", -'b'},      {"ab", "a", 'b'},       {"abc", "abd", -1}, {"A", "a", 'A' - 'a'},
                 {"\xFF", "a", -1 - 97}, {"\x80", "\x7F", -255}, {"same", "same", 0}};
    for (const auto& [a, b, order] : table)
        EXPECT_EQ(ascii_strcmp(a, b), order) << (a == nullptr ? "null" : a);
}

TEST(ServerGlobals, TheOldListOfClassesGoesAndItsHeadStays)
{
    for (int i = 0; i < 3; ++i) {
        global_oc = new (std::malloc(sizeof(objclass))) objclass{strdup("person"), nullptr, nullptr, global_oc};
        EXPECT_EQ(charray_add(&global_oc->oc_required, strdup("cn")), 0);
    }
    free_objclass_list();  // what is left behind, the leak checker tells
    EXPECT_NE(global_oc, nullptr);
    global_oc = nullptr;
}

TEST(ServerInstance, IsAFolderWithAConfigurationFile)
{
    const temp_dir dir;
    const std::string root = dir.path() + "/";
    dir.write("instance-ldap/xanvrnd.conf", "");
    dir.write("instance-file", "");
    dir.write("instance-/xanvrnd.conf", "");
    dir.write("instance-odd/xanvrnd.conf/x", "");
    dir.write("instance-empty/other.conf", "");
    const struct {
        const char* name;
        std::string directory;
        bool exists;
        texts told;
    } table[] = {
        {"ldap", root, true, {}},
        {"", root, true, {}},
        {"ldap", dir.path(), false, {"errno: 2\n"}},  // no separator is put in between
        {"ldap", root + "none/", false, {}},
        {"ldap", root + "instance-file", false, {"isn't directory\n"}},
        {"file", root, false, {"isn't directory\n"}},
        {"none", root, false, {"errno: 2\n"}},
        {"odd", root, false, {"isn't file\n"}},
        {"empty", root, false, {}},
        {nullptr, root, false, {}},
    };
    for (const auto& row : table) {
        const debug_catcher debug(LDAP_DEBUG_TRACE);
        EXPECT_EQ(doesInstanceExist(row.name, row.directory.c_str()), row.exists) << row.directory;
        EXPECT_EQ(debug.texts(), row.told);
    }
    EXPECT_FALSE(doesInstanceExist("ldap", nullptr));
}

}  // namespace
