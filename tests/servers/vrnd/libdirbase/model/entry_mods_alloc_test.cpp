// Modification lists, and entries from them and from the configuration, while memory runs out: whole or nothing.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "servers/vrnd/libdirbase/model/entry_cfg.h"
#include "servers/vrnd/libdirbase/model/entry_mods.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "tests/servers/vrnd/libdirbase/model/mods_fixture.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/temp_dir.h"

using namespace model_test;
using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

namespace {

TEST(LdapModsAlloc, ACopyIsWholeOrThereIsNone)
{
    // One without the bit, whose values are bervals all the same: a failure has to release them as such.
    LDAPMod** const array = make_mods({make_mod(0x80, "cn", "a|b"), make_mod(0x82, "sn", "c|d")});
    array[0]->mod_next = array[1];
    array[0]->mod_op = 0;
    const auto result_of = [](const LDAPMod* chain) { return chain != nullptr ? 0 : 90; };
    const std::function<int(LDAPMod**)> copies[] = {
        [&](LDAPMod** copy) { return result_of(*copy = dup_ldmll(array[0])); },
        [&](LDAPMod** copy) { return result_of(*copy = dup_mod(array[0])); },
        [&](LDAPMod** copy) { return duplicateBVMod(array[0], copy); },
        [&](LDAPMod** copy) { return duplicateAllMods(array[0], copy); },
    };
    for (const auto& copy : copies) {
        std::string whole;
        const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
            LDAPMod* made = nullptr;
            const int result = copy(&made);
            const alloc_fault_pause pause;
            EXPECT_EQ(result, allocation_failed() ? 90 : 0);
            const std::string text = text_of_chain(made);
            whole = point == 0 ? text : whole;
            EXPECT_EQ(text.empty() ? "" : whole.substr(0, text.size()), text);  // duplicateAllMods keeps what it made
            for (LDAPMod* mod = made; mod != nullptr; mod = mod->mod_next) {
                mod->mod_op |= LDAP_MOD_BVALUES;
            }
            free_ldmll(made);
        });
        EXPECT_GE(points, 7u);
    }
    array[0]->mod_op = 0x80;
    for_each_failing_allocation([&](std::size_t) {
        mods_guard both(DuplicateMods(array));
        EXPECT_EQ(both == nullptr, allocation_failed());
        LDAPMod** joined_array = both.get();
        if (joined_array != nullptr && modarray_merge(&joined_array, array) == 0) {
            joined_array[2] = nullptr;
        }
        both.release();
        free_ldmarr(joined_array);
    });
    free_ldmarr(array);
}

class EntryModsAlloc : public Model {};

TEST_F(EntryModsAlloc, StatesAreComparedWhollyOrNotAtAll)
{
    test_entry new_state;
    test_entry old_state;
    fill(new_state, "a=1|2;b=3");
    fill(old_state, "b=4;c=5;d=6");
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        LDAPMod** mods = nullptr;
        const int result = diffEntriesToMods(new_state.e_attrs, old_state.e_attrs, &mods);
        const alloc_fault_pause pause;
        EXPECT_EQ(result, allocation_failed() ? 90 : 0);
        EXPECT_EQ(text_of_both(mods), allocation_failed() ? "" : "82 a=1|2; 82 b=3; 1 c; 1 d");
        free_ldmarr(mods);
    });
    EXPECT_EQ(points, 1u + 2 * 3 + 3 * 2 + 2 + 2 * 2 + 1);
}

TEST_F(EntryModsAlloc, AnEntryHasAllItsValuesOrIsNone)
{
    LDAPMod** const mods = make_mods({make_mod(0x80, "cn", "a|b"), make_mod(0x80, "description", "c")});
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        char* const dn = [] {
            const alloc_fault_pause pause;
            return strdup("cn=a,sn=b");
        }();
        Entry* entry = nullptr;
        const int result = LDAPModToEntry(&entry, dn, mods);
        const alloc_fault_pause pause;
        EXPECT_EQ(result, allocation_failed() ? 90 : 0);
        EXPECT_EQ(entry == nullptr, allocation_failed());
        EXPECT_TRUE(entry == nullptr || text_of_attributes(*entry) == "cn=a|b;description=c");
        entry_free(entry);
    });
    EXPECT_GE(points, 15u);
    free_ldmarr(mods);
}

TEST_F(EntryModsAlloc, TheFirstCallThatLacksMemorySaysSoAndWhatItMadeIsGone)
{
    const test_support::temp_dir folder;
    const std::string file =
        folder.write("conf", "dn: cn=A, cn=a name that is longer than what fits without a block\n"
                             "description: a value that is longer than what fits without a block\ncn: x\ncn: y\n");
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        const std::unique_ptr<cfg_handle, decltype(&cfg_unbind)> cfg(cfg_init(nullptr, 0), cfg_unbind);
        if (cfg == nullptr) {
            return;
        }
        cfg_message* result = nullptr;
        entry_guard entry;
        int code = cfg_set_option(cfg.get(), CFG_OPT_FILE, file.c_str());
        code = code == 0 ? cfg_bind_s(cfg.get(), nullptr, nullptr, CFG_AUTH_SIMPLE) : code;
        code = code == 0 ? cfg_search_s(cfg.get(), "", CFG_SCOPE_SUB, "cn=x", nullptr, 0, &result) : code;
        EXPECT_EQ(result == nullptr, code != 0);
        if (code == 0) {
            entry.reset(CFGMessage2Entry(cfg.get(), result));
            code = entry == nullptr ? 90 : 0;
        }
        EXPECT_EQ(code, allocation_failed() ? 90 : 0);
        EXPECT_TRUE(entry == nullptr || (entry->e_dn != nullptr && entry->e_attrs->a_next->a_numvals == 2));
        cfg_msgfree(result);
    });
    EXPECT_GE(points, 50u);
}

}  // namespace

#endif
