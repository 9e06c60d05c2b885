// The sibling libraries with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the libraries call

#include <cerrno>
#include <cstring>
#include <numeric>

#include "libraries/libavl/avl.h"
#include "libraries/libber/ber_element.h"
#include "libraries/libber/berval.h"
#include "libraries/libber/ldap_control.h"
#include "libraries/libber/ldap_env.h"
#include "libraries/libber/ldap_result.h"
#include "libraries/libcfg/cfg.h"
#include "libraries/libldif/control_text.h"
#include "libraries/libldif/line64.h"
#include "libraries/libpwd/pwd_format.h"
#include "libraries/libtrace/trace.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "tests/libraries/libber/slow_ber.h"
#include "tests/support/alloc_table.h"
#include "tests/support/log_lines.h"
#include "tests/support/temp_dir.h"

using namespace test_support;
using slow_ber::seq;
using slow_ber::set;

namespace {

TEST(MessageLogAlloc, OutOfMemoryIsReportedWithoutMemoryAndALongLineIsCutAndStillWritten)
{
    const temp_dir folder;
    ASSERT_EQ(set_message_file(folder.path("messages").c_str()), 0);
    ASSERT_EQ(set_debug_file(folder.path("debug").c_str()), 0);
    write_ldap_debug(LDAP_DEBUG_ERROR);
    message_no_memory();  // the C library reads the time zone once
    const std::string text(5000, 'x');

    std::size_t runs = 0;
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        message_no_memory();
        PrintMessage(MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, text.c_str());
        debug_error("Error - %s\n", text.c_str());
        ++runs;

        const alloc_fault_pause pause;
        bool whole = true;
        for (const auto& [name, lines] : {std::pair("messages", 2 * runs + 1), {"debug", runs}}) {
            const std::string log = folder.read(name);
            EXPECT_EQ(lines_of(log).size(), lines);
            EXPECT_TRUE(log.ends_with(std::string(499, 'x') + "\n"));
            whole = whole && log.ends_with(text + "\n");
        }
        EXPECT_EQ(whole, !allocation_failed());
    });
    EXPECT_EQ(points, 4u);  // a text and a line for each of the two long ones
    set_message_sink(nullptr, nullptr);
    set_debug_sink(nullptr, nullptr);
    write_ldap_debug(0);
}

TEST(TraceAlloc, AMessageIsRenderedAndALongTraceLineWrittenWithoutMemoryToo)
{
    const temp_dir folder;
    const std::string text(3000, 'x');
    ASSERT_EQ(ldtr_set_file(folder.path("trace").c_str()), 0);
    trcEvents = LDTR_FLOW;
    ldtr_write(LDTR_FLOW, "once\n");
    std::size_t runs = 0;
    for_each_failing_allocation([&](std::size_t) {
        ldtr_write(LDTR_FLOW, "%s\n", text.c_str());
        char buffer[20];
        const std::size_t length =
            getPrintedMessage(buffer, sizeof buffer, MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, text.c_str());
        ++runs;
        const alloc_fault_pause pause;
        EXPECT_GT(length, 3000u);
        EXPECT_EQ(std::strlen(buffer), sizeof buffer - 1);
        const std::string trace = folder.read("trace");
        EXPECT_EQ(static_cast<std::size_t>(std::count(trace.begin(), trace.end(), '\n')), runs + 1);
    });
    trcEvents = 0;
    ldtr_set_file(nullptr);
}

TEST(AvlAlloc, AnInsertWithoutMemoryLeavesTheTreeAloneAndAWalkWithoutMemoryEndsBeforeItBegins)
{
    std::vector<int> keys(101);  // one more than the walk's first slots
    std::iota(keys.begin(), keys.end(), 0);
    const auto compare = [](const void* wanted, const void* stored, int) {
        return *static_cast<const int*>(wanted) - *static_cast<const int*>(stored);
    };
    const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
        avl_node* root = nullptr;
        std::size_t at = 0;
        for (int& key : keys) {
            const bool refused = ++at == point;
            EXPECT_EQ(avl_insert(&root, &key, compare, avl_dup_error), refused ? -1 : 0);
            EXPECT_EQ(avl_find(root, &key, compare), refused ? nullptr : &key);
        }
        const int stored = point >= 1 && point <= keys.size() ? 100 : 101;
        int walked = 0;
        for (void* data = avl_getfirst(root); data != nullptr; data = avl_getnext()) {
            ++walked;
        }
        EXPECT_EQ(walked, stored == 101 && allocation_failed() ? 0 : stored);
        EXPECT_EQ(avl_free(root, nullptr), stored);
    });
    EXPECT_EQ(points, keys.size() + 2);  // the list of the walk, and its growth
}

TEST(VrnTextAlloc, AFormattedTextAndAnEnvironmentValueAreThereOrNull)
{
    static const std::string long_value(500, '7');
    setenv("DIRBASE_TEST_VALUE", long_value.c_str(), 1);
    expect_outcomes({
        row("ldap_getenv", long_value + " 0", {"(null) " + std::to_string(ENOMEM)},
            [] {
                errno = 0;
                char* const value = ldap_getenv("DIRBASE_TEST_VALUE");
                const int error = errno;
                return tell_freed(value) + tell(" ", error);
            }),
        row("vrn_asprintf", "500 " + long_value, {"-1 (null)", "500 " + long_value},
            [] {
                char* text = nullptr;
                const int length = vrn_asprintf(&text, "%s", long_value.c_str());
                return tell(length, " ") + tell_freed(text);
            }),
    });
}

std::string bytes_of(const berval& value)
{
    return {value.bv_val, value.bv_len};
}

// A written element told by its bytes, or by what remains of it: calls that fail.
calm_text tell_written(BerElement* ber, int printed)
{
    if (ber == nullptr) {
        return "(null)";
    }
    const calm_text told = calm([&] {
        berval* flat = nullptr;
        const int flattened = ber_flatten(ber, &flat);
        calm_text text =
            tell(printed < 0 ? "failed" : "written", " ", flattened, " ", flat == nullptr ? "-" : bytes_of(*flat));
        ber_bvfree(flat);
        return text;
    });
    fber_free(ber, 1);
    return told;
}

TEST(BerAlloc, ElementsAndTheirTexts)
{
    char bytes[] = "\x04\x03"
                   "abc";
    const berval value = {5, bytes};
    const std::string failed = "failed -1 -";
    const std::string whole = "written 0 \x04\x03"
                              "abc";
    const std::string filling(985, 'x');  // leaves no room for the lengths around it
    const std::string longer(3000, 'x');
    std::string long_bytes = slow_ber::text(filling);
    for (int i = 0; i < 9; ++i) {
        long_bytes = seq(long_bytes);
    }
    long_bytes += slow_ber::text(longer);
    const std::string strings = slow_ber::text("x") + slow_ber::text("y");
    std::string all_bytes =
        seq(slow_ber::text("a") + slow_ber::text("o") + slow_ber::text("O") + seq(strings) + set(strings));
    const berval all = {all_bytes.size(), all_bytes.data()};
    const auto reading = [](const berval& from) {
        BerElement ber = {};
        ber_init2(&from, 0, &ber);
        return ber;
    };
    expect_outcomes({
        row("ber_bvdup", bytes,
            [&] {
                berval* const copy = ber_bvdup(&value);
                const calm_text told = copy == nullptr ? "(null)" : calm([&] { return calm_text(bytes_of(*copy)); });
                ber_bvfree(copy);
                return told;
            }),
        row("ber_alloc_t", [] { return tell_made(ber_alloc_t(1), [](BerElement* b) { ber_free(b, 1); }); }),
        row("ber_printf_w", whole, {"(null)", failed},
            [] {
                BerElement* const ber = ber_alloc_t(1);
                return tell_written(ber, ber == nullptr ? -1 : ber_printf_w(ber, "s", "abc"));
            }),
        row("fber_alloc, fber_printf", whole, {"(null)", failed},
            [] {
                BerElement* const ber = fber_alloc();
                return tell_written(ber, ber == nullptr ? -1 : fber_printf(ber, "o", "abc", ber_len_t{3}));
            }),
        // The closing makes the block grow, and so does the text; what has failed once goes on failing.
        row("ber_printf, ber_flatten", "written 0 " + long_bytes, {failed, "written -1 -"},
            [&] {
                BerElement* const ber = ber_alloc();
                const bool written = ber_printf(ber, "{{{{{{{{{s}}}}}}}}}", filling.c_str()) == 0 &&
                                     ber_printf(ber, "s", longer.c_str()) == 0;
                const bool dead = !written && ber_printf(ber, "n") == -1;
                berval* flat = nullptr;
                const int flattened = ber_flatten(ber, &flat);
                ber_free(ber, 1);
                const calm_text told = tell(written ? "written " : dead ? "failed " : "wrong ", flattened, " ");
                const calm_text octets = flat == nullptr ? "-" : calm([&] { return calm_text(bytes_of(*flat)); });
                ber_bvfree(flat);
                return told + octets;
            }),
        row("ber_init", [&] { return tell_made(ber_init(&value), [](BerElement* b) { ber_free(b, 1); }); }),
        row("ber_scanf, all kinds", "11010", {"00101"},
            [&] {
                BerElement ber = reading(all);
                char *a = nullptr, **v = nullptr;
                berval o{}, *O = nullptr, **V = nullptr;
                const bool read = ber_scanf(&ber, "{aoO{v}[V]}", &a, &o, &O, &v, &V) != LBER_ERROR;
                const bool set = a != nullptr && o.bv_val != nullptr && O != nullptr && v != nullptr && V != nullptr;
                const bool none = a == nullptr && o.bv_val == nullptr && O == nullptr && v == nullptr && V == nullptr;
                if (set) {
                    std::free(a), std::free(o.bv_val), ber_bvfree(O), ber_bvecfree(V);
                    std::free(v[0]), std::free(v[1]), std::free(v);
                }
                return tell(read, set, none, ber.ber_ptr == ber.ber_end, ber.ber_ptr == ber.ber_buf);
            }),
        row("ber_scanf_w", "15abc", {"00(null)"},
            [&] {
                BerElement ber = reading(value);
                char* text = nullptr;
                const bool read = ber_scanf_w(&ber, "a", &text) != LBER_ERROR;
                return tell(read, ber.ber_ptr - ber.ber_buf) + tell_freed(text);
            }),
        row("fber_scanf", "15made", {"00(null)"},
            [&] {
                BerElement ber = reading(value);
                berval* text = nullptr;
                const bool read = fber_scanf(&ber, "O", &text) != LBER_ERROR;
                return tell(read, ber.ber_ptr - ber.ber_buf) + tell_made(text, ber_bvfree);
            }),
        row("fber_get_string_len", "153abc", {"000(null)"},
            [&] {
                BerElement ber = reading(value);
                char* text = nullptr;
                ber_len_t length = 99;
                const bool read = fber_get_string_len(&ber, &text, &length) != LBER_ERROR;
                return tell(read, ber.ber_ptr - ber.ber_buf, length) + tell_freed(text);
            }),
    });
}

TEST(ControlAlloc, ControlsAndFiles)
{
    const temp_dir folder;
    const std::string file = folder.write("value", "abc");
    const std::string url = "file://" + file;
    const std::string line = "1.2 true:< " + url;
    char oid[] = "1.2";
    char other_oid[] = "1.3";
    char bytes[] = "ab";
    LDAPControl control = {oid, {2, bytes}, 1};
    LDAPControl bare = {other_oid, {0, nullptr}, 0};
    LDAPControl* controls[] = {&control, &bare, nullptr};
    int base64 = 0;
    int is_url = 0;
    const auto tell_control = [](LDAPControl* made) {
        const calm_text told =
            made == nullptr ? "(null)" : calm([&] { return tell(made->ldctl_oid, " ", bytes_of(made->ldctl_value)); });
        ldap_control_free(made);
        return told;
    };
    const auto tell_file = [](std::int64_t length, berval& target) {
        const calm_text told = calm([&] { return tell(length, " ", std::string_view(target.bv_val, target.bv_len)); });
        if (length >= 0) {
            std::free(target.bv_val);
        }
        return told;
    };
    expect_outcomes({
        row("ldap_copy_control", "1.2 ab", [&] { return tell_control(ldap_copy_control(&control)); }),
        row("ldap_copy_controls", "0 made", {"90 (null)"},
            [&] {
                LDAPControl** copy = nullptr;
                const int copied = ldap_copy_controls(controls, &copy);
                return tell(copied, " ") + tell_made(copy, ldap_controls_free);
            }),
        row("ldap_insert_control", "01", {"10"},
            [&] {
                LDAPControl** const copy = calm([&] {
                    LDAPControl** made = nullptr;
                    ldap_copy_controls(controls, &made);
                    return made;
                });
                LDAPControl** grown = copy;
                const int grew = ldap_insert_control(controls[0], &grown);
                const bool same = grew == LDAP_NO_MEMORY && grown == copy && grown[2] == nullptr;
                const bool longer = grew == LDAP_SUCCESS && grown[2] == controls[0] && grown[3] == nullptr;
                if (longer) {
                    grown[2] = nullptr;
                }
                ldap_controls_free(grown);
                return tell(same, longer);
            }),
        // A control that can't be made is left out.
        row("string2controlarray", "2 made", {"0 (null)", "0 made", "1 made"},
            [] {
                char lines[] = "control: 1.2 true:: YWJj\ncontrol: 1.3 false: x\n";
                LDAPControl** const made = string2controlarray(nullptr, lines);
                int count = 0;
                while (made != nullptr && made[count] != nullptr) {
                    ++count;
                }
                return tell(count, " ") + tell_made(made, ldap_controls_free);
            }),
        row("control2stringarray", "control: 1.2 true: ab\n\ncontrol: 1.3 false",
            [&] { return tell_freed(control2stringarray(controls)); }),
        row("string2control", "1.2 ab",
            [&] { return tell_control(string2control("1.2 true:: YWI=", &base64, &is_url)); }),
        row("string2control, a file", "1.2 abc", {"(null)", "1.2 abc"},
            [&] { return tell_control(string2control(line.c_str(), &base64, &is_url)); }),
        row("control2string", "control: 1.2 true: ab\n", [&] { return tell_freed(control2string(&control)); }),
        row("localfromfile", "3 abc", {"-1 old", "3 abc"},
            [&] {
                char old[] = "old";
                berval target = {3, old};
                return tell_file(localfromfile(file.c_str(), &target), target);
            }),
        row("localfromfile_url", "3 abc", {"-1 old", "3 abc"},
            [&] {
                char old[] = "old";
                berval target = {3, old};
                std::string copy = calm([&] { return url; });
                return tell_file(localfromfile_url(copy.data(), &target), target);
            }),
        row("ldif_type_and_value", "cn: a\n", [] { return tell_freed(ldif_type_and_value("cn", "a", 1)); }),
        row("ldif_type_and_value_or_bvalue", "cn:: Yf8=\n",
            [] { return tell_freed(ldif_type_and_value_or_bvalue("cn", "a", 0, "a\xff", 2)); }),
    });
}

// A configuration with an entry at hand, for as long as one lives.
struct configuration {
    configuration()
    {
        const aes_key_data key = {32, "the key of the server", "salt"};
        char coded[200];
        const unsigned long length = format_password(PWD_AES256, nullptr, &key, "secret", 6, coded, sizeof coded);
        folder.write("conf", "dn: cn=a\ncn: x\ncn: y\nsn: z\npw: " + std::string(coded, length) + "\n");
        cfg = cfg_init(nullptr, 0);
        cfg_set_option(cfg, CFG_OPT_KEY, &key);
        cfg_set_option(cfg, CFG_OPT_FILE, folder.path("conf").c_str());
        cfg_bind_s(cfg, nullptr, nullptr, CFG_AUTH_SIMPLE);
        cfg_search_s(cfg, "", CFG_SCOPE_SUB, "objectclass=*", nullptr, 0, &result);
        entry = cfg_first_entry(cfg, result);
    }
    ~configuration()
    {
        cfg_msgfree(result);
        cfg_unbind(cfg);
    }
    const temp_dir folder;
    cfg_handle* cfg = nullptr;
    cfg_message* result = nullptr;
    cfg_message* entry = nullptr;
};

TEST(CfgAlloc, EachCallSaysSoByTheCodeOfItsHandle)
{
    const configuration at;
    const auto told = [&](const calm_text& made) { return tell(cfg_get_errno(at.cfg), " ", made); };
    cfg_ber* second = nullptr;
    cfg_memfree(cfg_first_attribute(at.cfg, at.entry, &second));
    expect_outcomes({
        row("cfg_init", [] { return tell_made(cfg_init(nullptr, 0), cfg_unbind); }),
        row("cfg_set_option, cfg_bind_s", "0 0 0", {"90 -1 1", "0 90 1"},
            [&] {
                cfg_handle* const cfg = calm([] { return cfg_init(nullptr, 0); });
                const std::string path = calm([&] { return at.folder.path("conf"); });
                const int set = cfg_set_option(cfg, CFG_OPT_FILE, path.c_str());
                const int bound = set == 0 ? cfg_bind_s(cfg, nullptr, nullptr, CFG_AUTH_SIMPLE) : -1;
                cfg_message* none = nullptr;
                const int found = calm([&] { return cfg_search_s(cfg, "", CFG_SCOPE_SUB, "cn=*", nullptr, 0, &none); });
                cfg_msgfree(none);
                cfg_unbind(cfg);
                return tell(set, " ", bound, " ", found);
            }),
        row("cfg_search_s", "0 made", {"90 (null)"},
            [&] {
                cfg_message* made = nullptr;
                cfg_search_s(at.cfg, "cn=A", CFG_SCOPE_BASE, "(sn=Z)", nullptr, 0, &made);
                return told(tell_made(made, cfg_msgfree));
            }),
        row("cfg_get_dn", "0 cn=a", {"90 (null)"}, [&] { return told(tell_freed(cfg_get_dn(at.cfg, at.entry))); }),
        row("cfg_first_attribute", "0 cn +", {"90 (null) -"},
            [&] {
                cfg_ber* cursor = nullptr;
                char* const name = cfg_first_attribute(at.cfg, at.entry, &cursor);
                const calm_text both = told(tell_freed(name) + tell(cursor == nullptr ? " -" : " +"));
                cfg_ber_free(cursor);
                return both;
            }),
        {"cfg_get_values",
         [&] { return told(tell_made(cfg_get_values(at.cfg, at.entry, "CN"), cfg_value_free)); },
         "0 made",
         {"90 (null)"}},
        row("cfg_next_attribute", "0 sn", {"90 (null)"},
            [&] {
                cfg_ber* cursor = nullptr;
                calm([&] { cfg_memfree(cfg_first_attribute(at.cfg, at.entry, &cursor)); });
                const calm_text name = tell_freed(cfg_next_attribute(at.cfg, at.entry, cursor));
                cfg_ber_free(cursor);
                return told(name);
            }),
    });
    cfg_ber_free(second);

    // The lines shrink to what needs no memory.
    const std::string missing = at.folder.path("missing");
    const configuration failed;
    cfg_set_option(failed.cfg, CFG_OPT_FILE, missing.c_str());
    cfg_set_option(failed.cfg, CFG_OPT_DUMP, CFG_OPT_ON);
    cfg_set_option(failed.cfg, CFG_OPT_DUMP_PLACE, CFG_OPT_ON);
    cfg_bind_s(failed.cfg, nullptr, nullptr, CFG_AUTH_SIMPLE);
    quiet_logs logs;
    const auto line = [&](const char* step, bool whole) {
        return std::string("Error - ") + step + ": the file can't be opened" +
               (whole ? " (No such file or directory), file " + missing : "") + ", rc=82\n";
    };
    expect_outcomes({
        row("cfg_perror", line("step", true), {line("step", false)},
            [&] {
                cfg_perror(failed.cfg, "step");
                return logs.take();
            }),
        row("cfg_dump_exception", line("cfg_dump_exception", true), {line("cfg_dump_exception", false)},
            [&] {
                cfg_dump_exception(failed.cfg);
                return logs.take();
            }),
    });
}

TEST(CfgAlloc, AValueThatMemoryLackedForIsNotTakenForADamagedOne)
{
    const configuration at;
    for (const alloc_failures kind : {alloc_failures::one, alloc_failures::all_from_there}) {
        for_each_failing_allocation(
            [&](std::size_t point) {
                char** const values = cfg_get_values(at.cfg, at.entry, "pw");
                const int code = cfg_get_errno(at.cfg);
                const alloc_fault_pause pause;
                if (values != nullptr) {  // the crypto library gets over some failures
                    EXPECT_TRUE(code == LDAP_SUCCESS && std::strcmp(*values, "secret") == 0);
                } else {
                    EXPECT_TRUE(code == LDAP_NO_MEMORY && allocation_failed()) << code << ", allocation " << point;
                }
                cfg_value_free(values);
            },
            kind);
    }
}

TEST(PasswordAlloc, AStoredFormIsMadeTakenBackAndComparedOrNothingIs)
{
    const aes_key_data key = {32, {1, 2, 3}, {4, 5, 6}};
    for (const int method : {PWD_SHA, PWD_CRYPT, PWD_SSHA, PWD_AES256}) {
        SCOPED_TRACE(method);
        char kept[200];
        const unsigned long kept_length = format_password(method, nullptr, &key, "secret", 6, kept, sizeof kept);
        ASSERT_NE(kept_length, 0u);
        const berval stored = {kept_length, kept};
        const berval right = {6, const_cast<char*>("secret")};
        // Some of what the crypto library asks for it can do without.
        const auto or_whole = [&](const char* failed, const char* whole) {
            return method == PWD_CRYPT ? std::vector<std::string>{failed} : std::vector<std::string>{failed, whole};
        };
        expect_outcomes({
            row("format_password", "whole", or_whole("none", "whole"),
                [&] {
                    char buffer[200];
                    const unsigned long length =
                        format_password(method, nullptr, &key, "secret", 6, buffer, sizeof buffer);
                    return tell(length == kept_length ? "whole" : length == 0 ? "none" : "cut");
                }),
            row("verify_password", "0", or_whole("1", "0"),
                [&] { return tell(verify_password(&right, &stored, 1, &key)); }),
        });
        if (method == PWD_AES256) {
            expect_outcomes({
                row("unformat_password", "1 secret", {"0 (null)", "1 secret"},
                    [&] {
                        char* clear = nullptr;
                        unsigned long length = 0;
                        const int result = unformat_password(kept, kept_length, &key, &clear, &length);
                        return tell(result, " ") + tell_freed(clear);
                    }),
            });
        }
    }
    expect_outcomes({
        row("verify_pwd_syntax", "0 0", {"90 0"},
            [] {
                int state = -1;
                const int result = verify_pwd_syntax("secret", "old", 1, 6, 6, 0, 1, 2, &state);
                return tell(result, " ", state);
            }),
    });
}

}  // namespace

#endif
