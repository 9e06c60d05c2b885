// Modification lists: copies, the way from entries to them and back, and the checks of what they carry.
#include "servers/vrnd/libdirbase/model/entry_mods.h"

#include <map>
#include <random>
#include <tuple>

#include "servers/vrnd/libdirbase/model/log_file_check.h"
#include "servers/vrnd/libdirbase/model/passthrough_referral.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "tests/servers/vrnd/libdirbase/model/active_schema.h"
#include "tests/servers/vrnd/libdirbase/model/mods_fixture.h"
#include "tests/support/message_catcher.h"

using namespace model_test;
using test_support::debug_catcher;
using test_support::message_catcher;

namespace {

TEST(LdapMods, CopiesAreWholeShareNothingAndEndInAZeroByte)
{
    LDAPMod** const array = make_mods({make_mod(0x80, "cn", "a|bc"), make_mod(0x82, "sn", ""),
                                       make_mod(0x81, "mail", nullptr), make_mod(0x80, nullptr, "x")});
    array[0]->mod_bvalues[1]->bv_val[0] = '\0';
    for (int i = 0; i < 3; ++i) {
        array[i]->mod_next = array[i + 1];
    }
    const std::string all = text_of_both(array);
    EXPECT_EQ(all, std::string("80 cn=a|\0c; 82 sn=; 81 mail; 80 (null)=x", 40));

    LDAPMod* const one = dup_mod(array[0]);
    LDAPMod* with_result = nullptr;
    EXPECT_EQ(duplicateBVMod(array[2], &with_result), 0);
    LDAPMod* const chain = dup_ldmll(array[0]);
    LDAPMod* joined_chain = make_mod(0x81, "first", nullptr);
    EXPECT_EQ(duplicateAllMods(array[1], &joined_chain), 0);
    LDAPMod* new_chain = nullptr;
    EXPECT_EQ(duplicateAllMods(array[3], &new_chain), 0);
    mods_guard copies(DuplicateMods(array));
    free_ldmarr(array);

    EXPECT_EQ(text_of_chain(one), std::string("80 cn=a|\0c", 10));  // without the next one
    EXPECT_EQ(text_of_chain(with_result), "81 mail");
    EXPECT_EQ(text_of_chain(chain), all);
    EXPECT_EQ(text_of_chain(joined_chain), "81 first; 82 sn=; 81 mail; 80 (null)=x");
    EXPECT_EQ(text_of_chain(new_chain), "80 (null)=x");
    EXPECT_EQ(text_of_both(copies.get()), all);
    for (const LDAPMod* mod : {one, chain, *copies}) {
        EXPECT_EQ(mod->mod_bvalues[1]->bv_val[2], '\0');
    }
    for (LDAPMod* mod : {one, with_result, chain, joined_chain, new_chain}) {
        free_ldmll(mod);
    }
    LDAPMod** const texts = make_mods({make_mod(2, "cn", "a|bc"), make_mod(1, "sn", nullptr), make_mod(0, "mail", "")});
    copies.reset(DuplicateMods(texts));
    FreeMods(texts);
    EXPECT_EQ(text_of_both(copies.get()), "82 cn=a|bc; 81 sn; 80 mail=");
}

TEST(LdapMods, NullIsHarmless)
{
    free_ldmll(nullptr);
    FreeMods(nullptr);
    LDAPMod source = {};
    LDAPMod* copy = &source;
    EXPECT_TRUE(dup_mod(nullptr) == nullptr && dup_ldmll(nullptr) == nullptr && DuplicateMods(nullptr) == nullptr);
    EXPECT_TRUE(duplicateBVMod(nullptr, &copy) == 80 && copy == nullptr && duplicateBVMod(&source, nullptr) == 80);
    EXPECT_TRUE(duplicateAllMods(nullptr, &copy) == 0 && copy == nullptr && duplicateAllMods(&source, nullptr) == 0);
    EXPECT_TRUE(modarray_merge(nullptr, nullptr) == 80 && diffEntriesToMods(nullptr, nullptr, nullptr) == 80);
}

TEST(LdapMods, JoiningMovesTheRecordsBehindTheOthers)
{
    LDAPMod** array = nullptr;
    EXPECT_TRUE(modarray_merge(&array, nullptr) == 0 && array != nullptr && array[0] == nullptr);
    for (const char* name : {"a", "b"}) {
        LDAPMod** const other = make_mods({make_mod(1, name, nullptr)});
        EXPECT_TRUE(modarray_merge(&array, other) == 0 && modarray_merge(&array, other + 1) == 0);
        std::free(other);
    }
    EXPECT_EQ(text_of(*array[0]) + text_of(*array[1]), "1 a1 b");
    EXPECT_EQ(array[2], nullptr);
    free_ldmarr(array);
}

class EntryMods : public Model {};

TEST_F(EntryMods, ADifferenceReplacesWhatIsNewAndThenDeletesWhatIsGone)
{
    const std::tuple<const char*, const char*, const char*> table[] = {
        {"a=1|2;b=3", "b=3;c=4", "82 a=1|2; 82 b=3; 1 c"},
        {"b=3;a=1", "", "82 b=3; 82 a=1"},
        {"", "b=1;a;cn=2", "1 b; 1 a; 1 cn"},
        {"X=1;sn=2", "x=1;surname=1;x-=2", "82 X=1; 82 sn=2; 1 surname; 1 x-"},
        {"a=;b", "B=1", "82 a=; 82 b"},
        {"", "", ""},
    };
    for (const auto& [new_text, old_text, expected] : table) {
        test_entry new_state;
        test_entry old_state;
        fill(new_state, new_text);
        fill(old_state, old_text);
        LDAPMod** mods = nullptr;
        EXPECT_EQ(diffEntriesToMods(new_state.e_attrs, old_state.e_attrs, &mods), 0);
        ASSERT_NE(mods, nullptr);
        EXPECT_EQ(text_of_both(mods), expected) << new_text << " / " << old_text;
        free_ldmarr(mods);
    }
    test_entry entry;
    fill(entry, "cn=a|b;sn=;mail");
    const mods_guard adds(EntryToLDAPMod(entry.e_attrs));
    EXPECT_EQ(text_of_both(adds.get()), "80 cn=a|b; 80 sn=; 80 mail");
}

TEST_F(EntryMods, TheOldStateWithItsModificationsIsTheNewState)
{
    std::mt19937 random(4711);
    for (int round = 0; round < 300; ++round) {
        std::map<std::string, std::string> states[2];
        test_entry entries[2];
        for (int i = 0; i < 120; ++i) {
            const std::string name = "n" + std::to_string(i * 7 % 60);
            const std::string value = random() % 5 == 0 ? "" : std::to_string(random() % 3);
            if (random() % 3 != 0) {
                fill(entries[i / 60], (random() % 2 == 0 ? "N" : "n") + name.substr(1) + "=" + value);
                states[i / 60].insert_or_assign(name, value);
            }
        }
        LDAPMod** mods = nullptr;
        ASSERT_EQ(diffEntriesToMods(entries[1].e_attrs, entries[0].e_attrs, &mods), 0);
        for (const LDAPMod* mod = *mods; mod != nullptr; mod = mod->mod_next) {
            const std::string name = "n" + std::string(mod->mod_type + 1);
            if (mod->mod_op == LDAP_MOD_DELETE) {
                EXPECT_EQ(states[0].erase(name), 1u) << "a server refuses this delete of " << name;
            } else {
                states[0][name] = joined(mod->mod_bvalues);
            }
        }
        EXPECT_EQ(states[0], states[1]) << round;
        free_ldmarr(mods);
    }
}

TEST_F(EntryMods, ModificationsBecomeAnEntryOrALineThatTellsWhyNot)
{
    const std::tuple<const char*, std::vector<LDAPMod*>, int, const char*> table[] = {
        {"cn=a, sn=b", {make_mod(0x80, "cn", "a|A|b"), make_mod(0x80, "sn", "x")}, 0, "CN=A,SN=B cn=a|b;sn=x"},
        {"sn=b", {make_mod(0x80, "member", "bad"), make_mod(0x80, "cn", "b")}, 0, "SN=B member=;cn=b"},
        {"sn=b", {make_mod(0x80, "sn", "b"), make_mod(0x80, "SN", "c")}, 0, "SN=B sn=b|c"},
        {"nonsense", {}, 0, " "},
        {"sn=b", {make_mod(0x80, "sn", "b"), make_mod(0x80, "cn", nullptr), make_mod(0x80, "cn", nullptr)}, 2, ""},
        {nullptr, {}, 90, ""},
    };
    for (auto [dn, mods, expected, text] : table) {
        const message_catcher messages;
        const debug_catcher log;
        mods.push_back(nullptr);
        Entry* made = nullptr;
        EXPECT_EQ(LDAPModToEntry(&made, dn == nullptr ? nullptr : strdup(dn), mods.data()), expected);
        const entry_guard entry(made);
        EXPECT_EQ(entry == nullptr ? "" : std::string(entry->e_norm_dn) + " " + text_of_attributes(*entry), text);
        EXPECT_TRUE(entry == nullptr || entry->e_dn == std::string(dn));
        EXPECT_EQ(messages.count(MSG_COMPONENT_SERVER, 92), expected == 2 ? 1u : 0u);
        EXPECT_EQ(log.has("Error - LDAPModToEntry: Failed to put LDAPMod **attrs into e->e_attrs\n"), expected == 2);
        const std::string failed = "Error - LDAPModToEntry: CreateEntry failed rc=" + std::to_string(expected) + "\n";
        EXPECT_EQ(log.has(failed), expected != 0);
        std::for_each(mods.begin(), mods.end(), free_ldapmod);
    }
    EXPECT_EQ(LDAPModToEntry(nullptr, strdup("o=b"), nullptr), 80);
}

class PassthroughReferral : public with_active_schema {};

TEST_F(PassthroughReferral, SettingsAreCheckedForItsClassOnly)
{
    const std::string bad_name = "Error - checkPassthroughReferral: Invalid value for xan-ptaLinkAttr = ";
    const std::string bad_value = "Error - checkPassthroughReferral: Invalid value for xan-ptaLinkValue";
    const std::pair<const char*, std::string> table[] = {
        {"objectClass=top|XAN-ptareferral;xan-ptaLinkAttribute=uid;xan-ptaLinkValue=x", ""},
        {"objectClass=xan-ptaReferral;xan-ptaLinkAttribute=_dn_", ""},
        {"objectClass=xan-ptaReferral;xan-ptaLinkAttribute=_Disable_;xan-ptaLinkValue=x", ""},
        {"objectClass=xan-ptaReferral;xan-ptaLinkAttribute=2.5.4.3", ""},
        {"objectClass=xan-ptaReferral", ""},
        {"objectClass=xan-ptaReferral;xan-ptaLinkAttribute=a b;xan-ptaLinkValue=", bad_name + "a b\n"},
        {"objectClass=xan-ptaReferral;xan-ptaLinkAttribute=_DN;xan-ptaLinkValue=x", bad_name + "_DN\n"},
        {"objectClass=xan-ptaReferral;xan-ptaLinkAttribute=;xan-ptaLinkValue=x", bad_name + "\n"},
        {"objectClass=xan-ptaReferral;xan-ptaLinkAttribute=uid;xan-ptaLinkValue=", bad_value},
        {"objectClass=top;xan-ptaLinkAttribute=a b", ""},
        {"xan-ptaLinkAttribute=a b", ""},
    };
    for (const auto& [text, line] : table) {
        const debug_catcher log;
        test_entry entry;
        fill(entry, text);
        EXPECT_EQ(checkPassthroughReferral(&entry), line.empty() ? 0 : 19) << text;
        EXPECT_TRUE(line.empty() ? log.count() == 0 : log.has(line)) << text;
    }
    EXPECT_EQ(checkPassthroughReferral(nullptr), 0);
}

TEST(LogFileCheck, OnlyTwoGivenAndEqualPathsAreEqual)
{
    EXPECT_TRUE(compareFileNames("/a/b", "/a/b"));
    EXPECT_FALSE(compareFileNames("/a/b", "/a/B") || compareFileNames("/a", "/a/") || compareFileNames("/a", nullptr));
    EXPECT_FALSE(compareFileNames(nullptr, "/a") || compareFileNames(nullptr, nullptr));
}

}  // namespace
