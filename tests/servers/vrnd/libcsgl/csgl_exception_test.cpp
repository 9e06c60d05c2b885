// The exception tree as a whole, foreign codes, and what an exception says and logs.
#include "servers/vrnd/libcsgl/csgl_exception.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <map>
#include <set>
#include <string>
#include <type_traits>
#include <vector>

#include "servers/vrnd/libcsgl/csgl_output.h"
#include "tests/servers/vrnd/libcsgl/raised.h"
#include "tests/support/message_catcher.h"

using test_support::message_catcher;

namespace {

// clang-format off
// Name without exc_ and _t, parent, code; 0 stands for a class without a code of its own.
#define TREE(X) \
    X(logic, , 0) X(invalid_state, logic, 0x20030013) X(state_underflow, invalid_state, 0x20030014) \
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
    X(input, , 0) X(invalid_token, input, 0x20030000) X(invalid_grammar, input, 0x20030001) \
    X(invalid_input, input, 0x20030002) \
    X(runtime, , 0) X(not_enough_resources, runtime, 0) X(not_enough_memory, not_enough_resources, 0x20000001) \
    X(not_enough_disk, not_enough_resources, 0x2003001c) X(not_enough_handles, not_enough_resources, 0x2003001d) \
    X(timing, runtime, 0) X(interrupt, timing, 0x2003001e) X(timeout, timing, 0x20000002) \
    X(object_busy, timing, 0x2003001f) X(would_deadlock, timing, 0x20030020) X(owner_died, runtime, 0x20030021) \
    X(hardware_error, runtime, 0x20030019) \
    X(maybe, , 0) X(end_of_input, maybe, 0x20030024) X(does_not_exist, maybe, 0x20030023) \
    X(already_exists, maybe, 0x20030022) X(permission_denied, maybe, 0x20030025) \
    X(unexpected, , 0x20030026) X(unmapped, , 0) X(ldap_rc, , 0)

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

struct tree_row {
    std::string name, parent;
    long code;
    const std::type_info* type;
    std::set<std::string> caught_by;  // whose handlers catch it
    std::int64_t own_code;            // what its objects carry, or 0
    std::size_t size;
};

template <typename Class>
tree_row row(const char* name, const char* parent, long code)
{
    tree_row result = {name, parent, code, &typeid(Class), {}, 0, sizeof(Class)};
    const auto add = [&](bool is_base, const char* base) { is_base ? void(result.caught_by.insert(base)) : void(); };
#define ADD(base, grandparent, base_code) add(std::is_convertible_v<Class*, exc_##base##_t*>, #base);
    TREE(ADD)
    add(std::is_convertible_v<Class*, exc_t*>, "");
    if constexpr (std::is_constructible_v<Class, const char*, int, const char*, int>) {
        result.own_code = Class("a.cpp", 1, "text", 0).code();
    }
    return result;
}

std::vector<tree_row> tree()
{
#define ROW(name, parent, code) row<exc_##name##_t>(#name, #parent, code),
    return {TREE(ROW)};
}

}  // namespace

TEST(ExceptionTree, EachClassHasItsCodeAndIsCaughtByItsAncestorsAlone)
{
    std::map<std::string, std::set<std::string>> lines = {{"", {""}}};
    for (const tree_row& row : tree()) {
        std::set<std::string>& line = lines[row.name] = lines.at(row.parent);
        line.insert(row.name);
        EXPECT_EQ(row.caught_by, line) << row.name;
        EXPECT_EQ(row.own_code, row.code) << row.name;
        EXPECT_EQ(row.size, sizeof(exc_t)) << row.name;
    }
    EXPECT_EQ(exc_unmapped_t("a.cpp", 1, "text", -77, 0).code(), -77);
    EXPECT_EQ(exc_ldap_rc_t("a.cpp", 1, "text", 20, 0).code(), 20);
}

TEST(ForeignCodes, EachCodeOfTheTreeRaisesItsClassButOne)
{
    std::map<long, const std::type_info*> table;
    for (const tree_row& row : tree()) {
        table[row.code] = row.type;
    }
    table.erase(0x20030002);
    table[0] = &typeid(void);  // nothing is raised
    for (const long code : {1L, -1L, 0x20000003L, 0x20030002L, 0x2003001aL, 0x2003001bL, 0x20030027L, 0x120030013L}) {
        table[code] = &typeid(exc_unmapped_t);
    }
    for (const auto& [code, type] : table) {
        const raised_exception raised = raised_by([c = code] { exc_t::throw_csgl_error("a.cpp", 12, c, "text"); });
        EXPECT_EQ(*raised.type, *type) << std::hex << code << " raised " << raised.type->name();
        EXPECT_EQ(raised.code, code);
        EXPECT_EQ(raised.text, code == 0 ? "" : "text");

        const raised_exception cspl = raised_by([c = code] { exc_t::throw_cspl_error("a.cpp", 12, c); });
        EXPECT_EQ(*cspl.type, code == 0 ? typeid(void) : typeid(exc_unmapped_t));
        EXPECT_EQ(cspl.code, code);
        EXPECT_EQ(cspl.text, code == 0 ? "" : "unmapped CSPL error");
    }
}

TEST(ForeignCodes, ErrnosRaiseTheirClasses)
{
    std::map<int, raised_exception> table = {{0, {}}};
#define ERRNO_ROW(number, name) \
    table[number] = {&typeid(exc_##name##_t), exc_##name##_t::class_code, 12, #name " (" #number ")"};
    ERRNOS(ERRNO_ROW)
    using raiser = void (*)(const char*, int, long);
    const raiser last_error = [](const char* file, int line, long code) {
        errno = static_cast<int>(code);
        exc_t::throw_last_tcpip_error(file, line);
    };
    for (int number = -3; number < 200; ++number) {
        table.try_emplace(number, raised_exception{&typeid(exc_unmapped_t), number, 12, "unmapped UNQ error"});
        for (const raiser raise : {raiser(exc_t::throw_posix_error), raiser(exc_t::throw_tcpip_error), last_error}) {
            const raised_exception raised = raised_by([&] { raise("a.cpp", 12, number); });
            EXPECT_EQ(*raised.type, *table[number].type) << number << " raised " << raised.type->name();
            EXPECT_EQ(raised.code, table[number].code);
            EXPECT_EQ(raised.line, table[number].line);
            EXPECT_EQ(raised.text, table[number].text);
        }
    }
}

TEST(Exception, LogsOnceWhenItIsBuiltAndItsMessageOutlivesIt)
{
    const message_catcher log;
    csgl_message kept;
    try {
        throw exc_ldap_rc_t("a.cpp", 12, "[p[attributetype]p] [p[cn]p] stands there", 20, -31);
    } catch (exc_t& e) {
        const exc_t copy = e;
        kept = copy.message();
    }
    ASSERT_EQ(log.count(4, 31), 1u);
    EXPECT_EQ(log.messages()[0].severity, 8);
    EXPECT_EQ(log.messages()[0].arguments.at(1), "cn");
    EXPECT_STREQ(kept.text(), "attributetype cn stands there");
    EXPECT_EQ(kept.printed(), log.messages()[0].text);

    exc_invalid_token_t("some.schema", 3, "[p[a]p]", 0x40070005);  // catalogue 7, number 5, with its place
    ASSERT_EQ(log.count(7, 5), 1u);
    EXPECT_EQ(log.messages()[1].arguments.at(0), "some.schema");
    EXPECT_EQ(log.messages()[1].arguments.at(1), "3");

    const exc_invalid_token_t silent("a.cpp", 1, "[p[a]p]", 0);
    EXPECT_STREQ(silent.message().text(), "a");
    EXPECT_STREQ(silent.message().printed(), "");
    EXPECT_EQ(log.count(), 2u);
}

TEST(Exception, PrintsItselfWithQuotedTexts)
{
    const auto print = [](const exc_t& exception) {
        csgl_string text;
        csgl_output_str output(text);
        output << exception;
        return std::string(text.c_str());
    };
    EXPECT_EQ(print(exc_invalid_parameter_t("a.cpp", 12, "bad [p[oid]p]", 0)), "exc 'a.cpp' 12 536870912 'bad oid'");
    EXPECT_EQ(print(exc_unmapped_t("o'neil.cpp", -1, "'", -1, 0)), "exc 'o''neil.cpp' -1 18446744073709551615 ''''");
    EXPECT_EQ(print(exc_unmapped_t(nullptr, 0, nullptr, 7, 0)), "exc '' 0 7 ''");
}

TEST(Exception, TheQuietFlagGivesItsLastValue)
{
    const bool before = exc_t::be_quiet(true);
    EXPECT_TRUE(exc_t::be_quiet(false));
    EXPECT_FALSE(exc_t::be_quiet(before));
}
