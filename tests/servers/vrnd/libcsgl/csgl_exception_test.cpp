// The exception tree as a whole, foreign codes, and what an exception says and logs.
#include "servers/vrnd/libcsgl/csgl_exception.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <map>
#include <string>
#include <type_traits>

#include "servers/vrnd/libcsgl/csgl_output.h"
#include "tests/servers/vrnd/libcsgl/raised.h"
#include "tests/support/message_catcher.h"

using test_support::message_catcher;

namespace {

// clang-format off
// Name without exc_ and _t, parent, code; 0 stands for a class without a code of its own.
#define TREE(X) \
    X(logic, any, 0) X(invalid_state, logic, 0x20030013) X(state_underflow, invalid_state, 0x20030014) \
    X(state_overflow, invalid_state, 0x20030015) X(invalid_cast, logic, 0x20030016) \
    X(invalid_operation, logic, 0x20030017) X(invalid_protocol, logic, 0x20030018) \
    X(assertion_failed, logic, 0x20030003) X(precondition_failed, assertion_failed, 0x20030004) \
    X(postcondition_failed, assertion_failed, 0x20030005) X(invariant_failed, assertion_failed, 0x20030006) \
    X(should_not_execute, assertion_failed, 0x20030007) X(not_implemented, assertion_failed, 0x20030008) \
    X(out_of_range, logic, 0x20030009) X(range_underflow, out_of_range, 0x2003000a) \
    X(range_overflow, out_of_range, 0x2003000b) X(invalid_parameter, logic, 0x20000000) \
    X(invalid_parameter_type, invalid_parameter, 0x2003000c) X(domain_underflow, invalid_parameter, 0x2003000d) \
    X(unexpected_end_of_input, domain_underflow, 0x2003000e) X(domain_overflow, invalid_parameter, 0x2003000f) \
    X(invalid_handle, invalid_parameter, 0x20030010) X(invalid_address, invalid_parameter, 0x20030011) \
    X(invalid_name, invalid_parameter, 0x20030012) \
    X(input, any, 0) X(invalid_token, input, 0x20030000) X(invalid_grammar, input, 0x20030001) \
    X(invalid_input, input, 0x20030002) \
    X(runtime, any, 0) X(not_enough_resources, runtime, 0) X(not_enough_memory, not_enough_resources, 0x20000001) \
    X(not_enough_disk, not_enough_resources, 0x2003001c) X(not_enough_handles, not_enough_resources, 0x2003001d) \
    X(timing, runtime, 0) X(interrupt, timing, 0x2003001e) X(timeout, timing, 0x20000002) \
    X(object_busy, timing, 0x2003001f) X(would_deadlock, timing, 0x20030020) X(owner_died, runtime, 0x20030021) \
    X(hardware_error, runtime, 0x20030019) \
    X(maybe, any, 0) X(end_of_input, maybe, 0x20030024) X(does_not_exist, maybe, 0x20030023) \
    X(already_exists, maybe, 0x20030022) X(permission_denied, maybe, 0x20030025) \
    X(unexpected, any, 0x20030026) X(unmapped, any, 0) X(ldap_rc, any, 0)

// Number, class without exc_ and _t.
#define ERRNOS(X) \
    X(EPERM, permission_denied) X(EACCES, permission_denied) X(EROFS, permission_denied) X(ENOENT, does_not_exist) \
    X(ESRCH, does_not_exist) X(ENXIO, does_not_exist) X(ENODEV, does_not_exist) X(EIDRM, does_not_exist) \
    X(EEXIST, already_exists) X(E2BIG, domain_overflow) X(EBADF, invalid_handle) X(EFAULT, invalid_address) \
    X(EINVAL, invalid_parameter) X(EAGAIN, object_busy) X(EBUSY, object_busy) X(ETXTBSY, object_busy) \
    X(EDEADLK, would_deadlock) X(ENOMEM, not_enough_memory) X(ENOSPC, not_enough_disk) X(EDQUOT, not_enough_disk) \
    X(ENFILE, not_enough_handles) X(EMFILE, not_enough_handles) X(ENOLCK, not_enough_handles) \
    X(ENOSYS, not_implemented) X(ENOTSUP, not_implemented) X(EOVERFLOW, range_overflow)
// clang-format on

using exc_any_t = exc_t;

#define CHECK(name, parent, code)                                       \
    static_assert(std::is_base_of_v<exc_##parent##_t, exc_##name##_t>); \
    static_assert(sizeof(exc_##name##_t) == sizeof(exc_t));
TREE(CHECK)

}  // namespace

TEST(ForeignCodes, EachCodeOfTheTreeRaisesItsClassButOne)
{
    std::map<long, std::string> table;
#define NAME(name, parent, code) table[code] = "exc_" #name "_t: text";
    TREE(NAME)
    table[0] = "";
    for (const long code : {1L, -1L, 0x20000003L, 0x20030002L, 0x2003001aL, 0x2003001bL, 0x20030027L, 0x120030013L}) {
        table[code] = "exc_unmapped_t " + std::to_string(code) + ": text";
    }
    for (const auto& [code, expected] : table) {
        EXPECT_EQ(raised([c = code] { exc_t::throw_csgl_error("a.cpp", 12, c, "text"); }), expected) << code;
    }
    EXPECT_EQ(raised([] { exc_t::throw_cspl_error("a.cpp", 12, 7); }), "exc_unmapped_t 7: unmapped CSPL error");
    EXPECT_EQ(raised([] { exc_t::throw_cspl_error("a.cpp", 12, 0); }), "");
}

TEST(ForeignCodes, ErrnosRaiseTheirClasses)
{
    std::map<int, std::string> table = {{0, ""}};
#define ERRNO_ROW(number, name) table[number] = "exc_" #name "_t: " #name " (" #number ")";
    ERRNOS(ERRNO_ROW)
    for (int number = -3; number < 200; ++number) {
        table.try_emplace(number, "exc_unmapped_t " + std::to_string(number) + ": unmapped UNQ error");
        EXPECT_EQ(raised([&] { exc_t::throw_posix_error("a.cpp", 12, number); }), table[number]);
        EXPECT_EQ(raised([&] { exc_t::throw_tcpip_error("a.cpp", 12, number); }), table[number]);
        errno = number;
        EXPECT_EQ(raised([&] { exc_t::throw_last_tcpip_error("a.cpp", 12); }), table[number]);
    }
}

TEST(Exception, LogsOnceWhenItIsBuiltAndItsMessageOutlivesIt)
{
    const message_catcher log;
    const csgl_message kept = exc_t(exc_ldap_rc_t("a.cpp", 12, "[p[attribute]p] [p[cn]p]", 20, -31)).message();
    ASSERT_EQ(log.count(4, 31), 1u);
    EXPECT_EQ(log.messages()[0].severity, 8);
    EXPECT_EQ(kept.printed(), log.messages()[0].text);
    exc_invalid_token_t("a.schema", 3, "text", 0x40070005);
    EXPECT_EQ(log.count(7, 5), 1u);
    exc_invalid_token_t("a.schema", 3, "text", 0);
    EXPECT_EQ(log.count(), 2u);
}

TEST(Exception, PrintsItselfWithQuotedTextsAndIsNotQuietAtFirst)
{
    csgl_string text;
    csgl_output_str output(text);
    output << exc_invalid_parameter_t("a.cpp", 12, "bad [p[oid]p]", 0) << ", "
           << exc_unmapped_t("o'neil.cpp", -1, "'", -1, 0) << ", " << exc_unmapped_t(nullptr, 0, nullptr, 7, 0);
    EXPECT_STREQ(text,
                 "exc 'a.cpp' 12 536870912 'bad oid', exc 'o''neil.cpp' -1 18446744073709551615 '''', exc '' 0 7 ''");
    const bool before = exc_t::be_quiet(true);
    EXPECT_TRUE(exc_t::be_quiet(before));
    EXPECT_FALSE(before);
}
