// Entries from the configuration.
#include "servers/vrnd/libdirbase/model/entry_cfg.h"

#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "tests/servers/vrnd/libdirbase/model/mods_fixture.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

namespace {

class EntryCfg : public model_test::Model {};

TEST_F(EntryCfg, EveryValueThatCanBeHadIsInTheEntryAndTheOthersAreTold)
{
    const test_support::temp_dir folder;
    const std::string file =
        folder.write("conf", "dn: cn=A, sn=B\ncn: x\nmember: bad\nCN: X\ndescription: {AES256}none\n"
                             "cn: y\nunknown:\n");
    const aes_key_data key = {32, "another key", "salt"};
    cfg_handle* const cfg = cfg_init(nullptr, 0);
    cfg_set_option(cfg, CFG_OPT_FILE, file.c_str());
    cfg_set_option(cfg, CFG_OPT_KEY, &key);
    cfg_message* result = nullptr;
    ASSERT_EQ(cfg_bind_s(cfg, nullptr, nullptr, CFG_AUTH_SIMPLE), 0);
    ASSERT_EQ(cfg_search_s(cfg, "", CFG_SCOPE_SUB, "cn=x", nullptr, 0, &result), 0);

    const test_support::debug_catcher log;
    const entry_guard entry(CFGMessage2Entry(cfg, result));
    ASSERT_NE(entry, nullptr);
    EXPECT_STREQ(entry->e_dn, "cn=A, sn=B");
    EXPECT_EQ(entry->e_norm_dn, nullptr);
    EXPECT_EQ(model_test::text_of_attributes(*entry), "cn=x|y;member=;unknown=");
    EXPECT_TRUE(
        log.has("Error - cfg_get_values: the key doesn't decode a value in line 5 of file " + file + ", rc=84\n"));
    EXPECT_TRUE(log.has("Error - CFGMessage2Entry: attr_merge of member failed rc=34\n"));
    EXPECT_EQ(cfg_get_errno(cfg), 0);
    EXPECT_TRUE(CFGMessage2Entry(cfg, nullptr) == nullptr && CFGMessage2Entry(nullptr, result) == nullptr);
    cfg_msgfree(result);
    cfg_unbind(cfg);
}

}  // namespace
