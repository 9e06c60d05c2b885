// Each function of the sibling libraries that allocates, with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the libraries call

#include "libraries/libber/ber_element.h"
#include "libraries/libber/berval.h"
#include "libraries/libber/ldap_control.h"
#include "libraries/libber/ldap_result.h"
#include "libraries/libcfg/cfg.h"
#include "libraries/libldif/control_text.h"
#include "libraries/libldif/line64.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libtrace/trace.h"
#include "tests/support/alloc_table.h"
#include "tests/support/temp_dir.h"

using namespace test_support;

namespace {

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

TEST(BerCallsAlloc, ElementsAndTheirTexts)
{
    char bytes[] = "\x04\x03"
                   "abc";
    const berval value = {5, bytes};
    const std::string failed = "failed -1 -";
    const std::string whole = "written 0 \x04\x03"
                              "abc";
    const auto reading = [&] {
        BerElement ber = {};
        ber_init2(&value, 0, &ber);
        return ber;
    };
    expect_outcomes({
        {"ber_bvdup",
         [&] {
             berval* const copy = ber_bvdup(&value);
             const calm_text told = copy == nullptr ? "(null)" : calm([&] { return calm_text(bytes_of(*copy)); });
             ber_bvfree(copy);
             return told;
         },
         bytes,
         {"(null)"}},
        {"ber_alloc_t",
         [] { return tell_made(ber_alloc_t(1), [](BerElement* b) { ber_free(b, 1); }); },
         "made",
         {"(null)"}},
        {"ber_printf_w",
         [] {
             BerElement* const ber = ber_alloc_t(1);
             return tell_written(ber, ber == nullptr ? -1 : ber_printf_w(ber, "s", "abc"));
         },
         whole,
         {"(null)", failed}},
        {"fber_alloc, fber_printf",
         [] {
             BerElement* const ber = fber_alloc();
             return tell_written(ber, ber == nullptr ? -1 : fber_printf(ber, "o", "abc", ber_len_t{3}));
         },
         whole,
         {"(null)", failed}},
        {"ber_scanf_w",
         [&] {
             BerElement ber = reading();
             char* text = nullptr;
             const bool read = ber_scanf_w(&ber, "a", &text) != LBER_ERROR;
             return tell(read, ber.ber_ptr - ber.ber_buf) + tell_freed(text);
         },
         "15abc",
         {"00(null)"}},
        {"fber_scanf",
         [&] {
             BerElement ber = reading();
             berval* text = nullptr;
             const bool read = fber_scanf(&ber, "O", &text) != LBER_ERROR;
             return tell(read, ber.ber_ptr - ber.ber_buf) + tell_made(text, ber_bvfree);
         },
         "15made",
         {"00(null)"}},
        {"fber_get_string_len",
         [&] {
             BerElement ber = reading();
             char* text = nullptr;
             ber_len_t length = 99;
             const bool read = fber_get_string_len(&ber, &text, &length) != LBER_ERROR;
             return tell(read, ber.ber_ptr - ber.ber_buf, length) + tell_freed(text);
         },
         "153abc",
         {"000(null)"}},
    });
}

TEST(ControlCallsAlloc, ControlsAndFiles)
{
    const temp_dir folder;
    const std::string file = folder.write("value", "abc");
    const std::string url = "file://" + file;
    const std::string line = "1.2 true:< " + url;
    char oid[] = "1.2";
    char bytes[] = "ab";
    const LDAPControl control = {oid, {2, bytes}, 1};
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
        {"ldap_copy_control", [&] { return tell_control(ldap_copy_control(&control)); }, "1.2 ab", {"(null)"}},
        {"string2control",
         [&] { return tell_control(string2control("1.2 true:: YWI=", &base64, &is_url)); },
         "1.2 ab",
         {"(null)"}},
        {"string2control, a file",
         [&] { return tell_control(string2control(line.c_str(), &base64, &is_url)); },
         "1.2 abc",
         {"(null)", "1.2 abc"}},
        {"control2string", [&] { return tell_freed(control2string(&control)); }, "control: 1.2 true: ab\n", {"(null)"}},
        {"localfromfile",
         [&] {
             char old[] = "old";
             berval target = {3, old};
             return tell_file(localfromfile(file.c_str(), &target), target);
         },
         "3 abc",
         {"-1 old", "3 abc"}},
        {"localfromfile_url",
         [&] {
             char old[] = "old";
             berval target = {3, old};
             std::string copy = calm([&] { return url; });
             return tell_file(localfromfile_url(copy.data(), &target), target);
         },
         "3 abc",
         {"-1 old", "3 abc"}},
        {"ldif_type_and_value_or_bvalue",
         [] { return tell_freed(ldif_type_and_value_or_bvalue("cn", "a", 0, "a\xff", 2)); },
         "cn:: Yf8=\n",
         {"(null)"}},
    });
}

// A configuration with an entry at hand, for as long as one lives.
struct configuration {
    configuration()
    {
        folder.write("conf", "dn: cn=a\ncn: x\ncn: y\nsn: z\n");
        cfg = cfg_init(nullptr, 0);
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

TEST(CfgCallsAlloc, EachCallSaysSoByTheCodeOfItsHandle)
{
    const configuration at;
    const auto told = [&](const calm_text& made) { return tell(cfg_get_errno(at.cfg), " ", made); };
    cfg_ber* second = nullptr;
    cfg_memfree(cfg_first_attribute(at.cfg, at.entry, &second));
    expect_outcomes({
        {"cfg_init", [] { return tell_made(cfg_init(nullptr, 0), cfg_unbind); }, "made", {"(null)"}},
        {"cfg_set_option, cfg_bind_s",
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
         },
         "0 0 0",
         {"90 -1 1", "0 90 1"}},
        {"cfg_search_s",
         [&] {
             cfg_message* made = nullptr;
             cfg_search_s(at.cfg, "cn=A", CFG_SCOPE_BASE, "(sn=Z)", nullptr, 0, &made);
             return told(tell_made(made, cfg_msgfree));
         },
         "0 made",
         {"90 (null)"}},
        {"cfg_get_dn", [&] { return told(tell_freed(cfg_get_dn(at.cfg, at.entry))); }, "0 cn=a", {"90 (null)"}},
        {"cfg_first_attribute",
         [&] {
             cfg_ber* cursor = nullptr;
             char* const name = cfg_first_attribute(at.cfg, at.entry, &cursor);
             const calm_text both = told(tell_freed(name) + tell(cursor == nullptr ? " -" : " +"));
             cfg_ber_free(cursor);
             return both;
         },
         "0 cn +",
         {"90 (null) -"}},
        {"cfg_get_values",
         [&] { return told(tell_made(cfg_get_values(at.cfg, at.entry, "CN"), cfg_value_free)); },
         "0 made",
         {"90 (null)"}},
        {"cfg_next_attribute",
         [&] {
             cfg_ber* cursor = nullptr;
             calm([&] { cfg_memfree(cfg_first_attribute(at.cfg, at.entry, &cursor)); });
             const calm_text name = tell_freed(cfg_next_attribute(at.cfg, at.entry, cursor));
             cfg_ber_free(cursor);
             return told(name);
         },
         "0 sn",
         {"90 (null)"}},
    });
    cfg_ber_free(second);
}

TEST(LogCallsAlloc, AMessageIsRenderedAndALongTraceLineWrittenWithoutMemoryToo)
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

}  // namespace

#endif
