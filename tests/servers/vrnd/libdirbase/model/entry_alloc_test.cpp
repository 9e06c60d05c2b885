// Entries, their texts and modification lists with every allocation failing in turn: whole, or nothing.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "libraries/libpwd/pwd_format.h"
#include "servers/vrnd/libdirbase/model/entry_ber.h"
#include "servers/vrnd/libdirbase/model/entry_cfg.h"
#include "servers/vrnd/libdirbase/model/entry_mods.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "tests/servers/vrnd/libdirbase/model/mods_fixture.h"
#include "tests/support/alloc_table.h"
#include "tests/support/temp_dir.h"

using namespace model_test;
using namespace test_support;

namespace {

class EntryAlloc : public Model {};

TEST_F(EntryAlloc, Texts)
{
    const quiet_logs quiet;
    static const std::string long_value(3000, 'u');
    const std::string text =
        "dn: cn=a,sn=b\ncn: 1\ncn;lang-en: 2\ncn: 3\nmember: CN=NULL\nmember: cn=y\ntwoWay: p\nunknown: " + long_value +
        "\n2.5.4.4;lang-de: x\n";
    const auto read = [](const std::string& from, auto call) {
        return [&from, call] {
            char* const copy = heap_copy(from.c_str());
            Entry* const made = call(copy);
            std::free(copy);
            return tell_made(made, entry_free);
        };
    };
    const std::string no_dn = "dn: no dn\n";
    expect_outcomes({
        row("str2entry", read(text, [](char* copy) { return str2entry(copy, 0, 0); })),
        row("str2entry, checked", read(text, [](char* copy) { return str2entry(copy, 1, 1); })),
        row("str2entry, a DN that is none", read(no_dn, [](char* copy) { return str2entry(copy, 0, 0); })),
        row("str2entry_memberFix", read(text, [](char* copy) { return str2entry_memberFix(copy, 1, 1, 1); })),
    });

    std::string copy = text;
    const entry_guard entry(str2entry(copy.data(), 0, 0));
    const auto write_global = [&](auto call, int with_id) {
        return [&entry, call, with_id] {
            const calm_text told = tell(call(entry.get(), nullptr, with_id));
            std::free(std::exchange(ebuf_global, nullptr));
            emaxsize_global = 0;
            return told;
        };
    };
    const auto write = [&](auto call) {
        return [&entry, call] {
            char* buffer = nullptr;
            std::size_t size = 0;
            const calm_text told = tell(call(entry.get(), &buffer, &size));
            EXPECT_EQ(buffer == nullptr, size == 0);
            std::free(buffer);
            return told;
        };
    };
    const std::string whole = write_global(entry2str_options, 0)().str();
    EXPECT_TRUE(whole.starts_with("dn: cn=a,sn=b\ncn: 1\n") && whole.size() > text.size());
    // Without a piece of it, up to the name behind.
    const auto without = [](std::string from, const char* piece, const char* next) {
        const std::size_t at = from.find(piece);
        return from.erase(at, from.find(next, at) - at);
    };
    const std::string shorter = without(whole, "member: cn=y", "twoWay:");
    const std::string shortest = without(shorter, "unknown:", "sn;lang-de:");
    // A text may have been whole by the time that memory was lacking.
    expect_outcomes({
        row("entry2str_options", whole, {"(null)", whole}, write_global(entry2str_options, 0)),
        row("entry2str", "0\n" + whole, {"(null)", "0\n" + whole}, write_global(entry2str, 1)),
        row("entry2str_wo_members", "0\n" + shorter, {"(null)", "0\n" + shorter},
            write([](Entry* from, char** buffer, std::size_t* size) {
                return entry2str_wo_members(from, nullptr, 1, buffer, size, 0);
            })),
        row("entry2str_wo_members_and_pwd_attribs", shortest, {"(null)", shortest},
            write([](Entry* from, char** buffer, std::size_t* size) {
                return entry2str_wo_members_and_pwd_attribs(from, nullptr, 0, buffer, size);
            })),
        row("MAKE_SPACE", "0 5124 1 abc", {"90 4 1 abc"},
            [] {
                char* buffer = heap_copy("abc");
                char* cursor = buffer + 1;
                std::size_t size = 4;
                int error = -1;
                MAKE_SPACE(5000, &error, &buffer, &cursor, &size);
                return tell(error, " ", size, " ", cursor - buffer, " ") + tell_freed(buffer);
            }),
        row("entry2ber", "0 1 made", {"1 0 (null)", "90 0 (null)"},
            [&] {
                char* ber = nullptr;
                std::size_t length = 0;
                const int result = entry2ber(entry.get(), &ber, &length);
                return tell(result, " ", length > 3000, " ") + tell_made(ber, std::free);
            }),
    });
}

TEST_F(EntryAlloc, ModificationLists)
{
    // One without the bit, whose values are bervals all the same: a failure has to release them as such.
    LDAPMod** const array = make_mods({make_mod(0x80, "cn", "a|b"), make_mod(0x82, "sn", "c|d")});
    array[0]->mod_next = array[1];
    array[0]->mod_op = 0;
    const auto copied = [&](auto call) {
        return [array, call] {
            LDAPMod* made = nullptr;
            const int result = call(array[0], &made);
            const calm_text told = calm([&] { return tell(result, " ", text_of_chain(made)); });
            for (LDAPMod* mod = made; mod != nullptr; mod = mod->mod_next) {
                mod->mod_op |= LDAP_MOD_BVALUES;
            }
            free_ldmll(made);
            return told;
        };
    };
    const auto from_pointer = [](LDAPMod* (*call)(const LDAPMod*)) {
        return [call](const LDAPMod* mod, LDAPMod** copy) { return (*copy = call(mod)) != nullptr ? 0 : 90; };
    };
    const std::string first = "0 cn=a|b";
    const std::string both = first + "; 82 sn=c|d";
    expect_outcomes({
        row("dup_ldmll", "0 " + both, {"90 "}, copied(from_pointer(dup_ldmll))),
        row("dup_mod", "0 " + first, {"90 "}, copied(from_pointer(dup_mod))),
        row("duplicateBVMod", "0 " + first, {"90 "}, copied(duplicateBVMod)),
        row("duplicateAllMods", "0 " + both, {"90 ", "90 " + first}, copied(duplicateAllMods)),  // keeps what it made
    });
    array[0]->mod_op = 0x80;
    const auto tell_mods = [](LDAPMod** mods) {
        const calm_text told = calm([&] {
            std::string all;
            for (LDAPMod** mod = mods; mod != nullptr && *mod != nullptr; ++mod) {
                all += text_of(**mod) + ";";
            }
            return calm_text(all);
        });
        free_ldmarr(mods);
        return told;
    };
    const std::string four = "80 cn=a|b;82 sn=c|d;";
    expect_outcomes({
        row("DuplicateMods", four, {""}, [&] { return tell_mods(DuplicateMods(array)); }),
        row("modarray_merge", "0 " + four + four, {"90 " + four + four},
            [&] {
                LDAPMod** joined = calm([&] { return DuplicateMods(array); });
                LDAPMod** const other = calm([&] { return DuplicateMods(array); });
                const int result = modarray_merge(&joined, other);
                if (result == 0) {
                    std::free(other);
                }
                return tell(result, " ") + tell_mods(joined) + tell_mods(result == 0 ? nullptr : other);
            }),
    });
    free_ldmarr(array);
}

TEST_F(EntryAlloc, EntriesAndModificationLists)
{
    test_entry new_state;
    test_entry old_state;
    fill(new_state, "a=1|2;b=3");
    fill(old_state, "b=4;c=5;d=6");
    LDAPMod** const mods = make_mods({make_mod(0x80, "cn", "a|b"), make_mod(0x80, "description", "c")});
    expect_outcomes({
        row("diffEntriesToMods", "0 82 a=1|2; 82 b=3; 1 c; 1 d", {"90 "},
            [&] {
                LDAPMod** made = nullptr;
                const int result = diffEntriesToMods(new_state.e_attrs, old_state.e_attrs, &made);
                const calm_text told = calm([&] { return tell(result, " ", text_of_both(made)); });
                free_ldmarr(made);
                return told;
            }),
        row("EntryToLDAPMod", [&] { return tell_made(EntryToLDAPMod(new_state.e_attrs), free_ldmarr); }),
        row("LDAPModToEntry", "0 cn=a|b;description=c", {"90 (null)"},
            [&] {
                char* const dn = heap_copy("cn=a,sn=b");
                Entry* entry = nullptr;
                const int result = LDAPModToEntry(&entry, dn, mods);
                const calm_text told =
                    calm([&] { return tell(result, " ", entry == nullptr ? "(null)" : text_of_attributes(*entry)); });
                entry_free(entry);
                return told;
            }),
    });
    free_ldmarr(mods);
}

TEST_F(EntryAlloc, TheFirstCallThatLacksMemorySaysSoAndWhatItMadeIsGone)
{
    const temp_dir folder;
    const aes_key_data key = {32, "the key of the server", "salt"};
    char coded[200];
    const unsigned long length = format_password(PWD_AES256, nullptr, &key, "secret", 6, coded, sizeof coded);
    const std::string file =
        folder.write("conf", "dn: cn=A, cn=a name that is longer than what fits without a block\n"
                             "description: a value that is longer than what fits without a block\ncn: x\ncn: y\n"
                             "sn: " +
                                 std::string(coded, length) + "\n");
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        const std::unique_ptr<cfg_handle, decltype(&cfg_unbind)> cfg(cfg_init(nullptr, 0), cfg_unbind);
        if (cfg == nullptr) {
            return;
        }
        cfg_message* result = nullptr;
        entry_guard entry;
        int code = cfg_set_option(cfg.get(), CFG_OPT_FILE, file.c_str());
        code = code == 0 ? cfg_set_option(cfg.get(), CFG_OPT_KEY, &key) : code;
        code = code == 0 ? cfg_bind_s(cfg.get(), nullptr, nullptr, CFG_AUTH_SIMPLE) : code;
        code = code == 0 ? cfg_search_s(cfg.get(), "", CFG_SCOPE_SUB, "cn=x", nullptr, 0, &result) : code;
        EXPECT_EQ(result == nullptr, code != 0);
        if (code == 0) {
            entry.reset(CFGMessage2Entry(cfg.get(), result));
            code = entry == nullptr ? 90 : 0;
        }
        EXPECT_TRUE(code == 0 || (code == 90 && allocation_failed())) << code;  // the crypto library gets over some
        const alloc_fault_pause pause;
        EXPECT_TRUE(entry == nullptr ||
                    (entry->e_dn != nullptr && text_of_attributes(*entry) ==
                                                   "description=a value that is longer than what fits without a block;"
                                                   "cn=x|y;sn=secret"));
        cfg_msgfree(result);
    });
    EXPECT_GE(points, 50u);
}

}  // namespace

#endif
