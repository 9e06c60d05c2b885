// The base with every allocation failing in turn: a code for memory or null, a line in the log, and nothing changed.
#include <cerrno>
#include <cstdio>

#include "libraries/libber/ldap_iconv.h"
#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libcsgl/csgl_memory.h"
#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/code_page.h"
#include "servers/vrnd/libdirbase/base/environment.h"
#include "servers/vrnd/libdirbase/base/list.h"
#include "servers/vrnd/libdirbase/base/password_values.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/base/server_instance.h"
#include "servers/vrnd/libdirbase/base/slapi_ch.h"
#include "tests/support/alloc_table.h"
#include "tests/support/temp_dir.h"

using namespace test_support;

namespace {

TEST(ListAlloc, AnAdditionWithoutMemoryLeavesTheListAlone)
{
    int values[3] = {};
    const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
        List<int*> list(1, false);
        ListEntry<int*>* last = nullptr;
        std::size_t at = 0;
        for (int& value : values) {
            const bool refused = ++at == point;
            EXPECT_EQ(list.add(&value), refused ? 90 : 0);
            EXPECT_EQ(list.tail == last, refused);
            EXPECT_EQ(last == nullptr ? list.head : last->next, refused ? nullptr : list.tail);
            last = list.tail;
        }
    });
    EXPECT_EQ(points, 3u);
}

void close_conversions()
{
    free_iconv_handle();
    ldap_iconv_close(iconv_handle_to_local);
    iconv_handle_to_local = nullptr;
}

TEST(CodePageAlloc, ConversionsAreBothOpenedOrNoneIs)
{
    const quiet_logs quiet;
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        const int result = initIconvHandle();
        EXPECT_TRUE(result == 0 || allocation_failed());
        EXPECT_EQ(local_codepage != nullptr, result == 0);
        EXPECT_EQ(iconv_handle_to_utf8 != nullptr, result == 0);
        EXPECT_EQ(iconv_handle_to_local != nullptr, result == 0);
        close_conversions();
    });
    EXPECT_GE(points, 2u);
    for_each_failing_allocation([](std::size_t point) {
        errno = 0;
        ldap_iconv_t* conversion = ldap_iconv_open("UTF-8", "UTF-8");
        EXPECT_EQ(conversion == nullptr, point == 1);  // the record is the first
        EXPECT_TRUE(conversion != nullptr || errno == ENOMEM);
        ldap_iconv_close(conversion);
    });
}

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

TEST(EnvironmentAlloc, OnlyAValueThatMemoryLackedForIsToldToTheLog)
{
    setenv("DIRBASE_TEST_VALUE", "YES", 1);
    unsetenv("DIRBASE_TEST_UNSET");
    int told = 0;
    set_message_sink([](void* count, const message_record& message) { *static_cast<int*>(count) += message.id; },
                     &told);
    message_no_memory();  // the C library reads the time zone once
    const int one = told;
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        told = 0;
        const heap_text value = environment_value("DIRBASE_TEST_VALUE");
        EXPECT_EQ(value == nullptr, allocation_failed());
        errno = ENOMEM;  // of something else
        EXPECT_EQ(environment_value("DIRBASE_TEST_UNSET"), nullptr);
        EXPECT_EQ(told, allocation_failed() ? one : 0);
    });
    EXPECT_EQ(points, 1u);
    set_message_sink(nullptr, nullptr);
}

TEST(CodePageAlloc, TextsAndLinesAreThereOrNoMemoryIsReported)
{
    quiet_logs logs;
    iconv_handle_to_utf8 = ldap_iconv_open("UTF-8", "ISO-8859-1");
    iconv_handle_to_local = ldap_iconv_open("ISO-8859-1", "UTF-8");
    const auto translate = [&](auto* function) {
        return [&logs, function] {
            char* text = nullptr;
            std::size_t length = 99;
            const int result = function("text", &text, &length);
            return tell(result, " ", length, " ") + tell_freed(text) + " " + logs.take();
        };
    };
    const std::string none = "90 0 (null) message 7\n";
    expect_outcomes({
        row("xlate_localcp_to_utf8", "0 5 text ", {none}, translate(xlate_localcp_to_utf8)),
        row("xlate_utf8_to_localcp", "0 5 text ", {none}, translate(xlate_utf8_to_localcp)),
    });
    close_conversions();

    const temp_dir folder;
    const std::string file = folder.write("conf", "line\n");
    cfg_xlate = 1;
    expect_outcomes({
        // The first line opens the conversion. What can't be read is left for the next call.
        row("getline_and_xlate", "0 line\n 1", {"-1 old 0", "0 line\n 1"},
            [&] {
                std::FILE* const in = calm([&] { return std::fopen(file.c_str(), "r"); });
                char line[1024] = "old";
                const int result = getline_and_xlate(line, in);
                const calm_text told = tell(result, " ", line, " ", iconv_handle_to_utf8 != nullptr);
                std::fclose(in);
                close_conversions();
                return told;
            }),
    });
    cfg_xlate = 0;
}

TEST(BaseAlloc, BlocksAndTexts)
{
    expect_outcomes({
        row("slapi_ch_malloc", [] { return tell_made(slapi_ch_malloc(9), slapi_ch_free); }),
        row("slapi_ch_calloc", [] { return tell_made(slapi_ch_calloc(3, 3), slapi_ch_free); }),
        row("slapi_ch_realloc", "new abc", {"old abc"},
            [] {
                char* const old = heap_copy("abc");
                char* const grown = static_cast<char*>(slapi_ch_realloc(old, 5000));
                return tell(grown == nullptr ? "old " : "new ") + tell_freed(grown == nullptr ? old : grown);
            }),
        row("slapi_ch_strdup", "abc", [] { return tell_freed(slapi_ch_strdup("abc")); }),
        row("csgl_allocate_or_null", [] { return tell_made(csgl_allocate_or_null(9), csgl_free); }),
        row("vrn_strerror", "No such file or directory", [] { return tell_freed(vrn_strerror(ENOENT)); }),
    });
}

char** make(std::initializer_list<const char*> from)
{
    char** array = nullptr;
    for (const char* text : from) {
        EXPECT_EQ(charray_add(&array, strdup(text)), 0);
    }
    return array;
}

// The elements by address: a failed call must leave the very same texts.
std::vector<char*> elements(char** array)
{
    std::vector<char*> result;
    for (; array != nullptr && *array != nullptr; ++array) {
        result.push_back(*array);
    }
    return result;
}

calm_text tell_array(char** array)
{
    const calm_text told = calm([&] {
        std::string all;
        for (const char* text : elements(array)) {
            all += std::string(" ") + text;
        }
        return calm_text(array == nullptr ? "(null)" : all);
    });
    charray_free(array);
    return told;
}

TEST(CharrayAlloc, AnAdditionWithoutMemoryGives90AndALineAndChangesNothing)
{
    quiet_logs logs;
    enum class takes { text, other, nothing };
    // A call in front of an array or of none, with what it takes and what the array is when it succeeds.
    const auto addition = [&](auto call, takes taken, bool from_null) {
        return [=, &logs] {
            auto [array, other, text] = calm([&] {
                return std::tuple(from_null ? nullptr : make({"m", "nnn"}), make({"x", "yyy"}), strdup("no"));
            });
            const auto before = calm([&] { return std::pair(elements(array), elements(other)); });
            const int result = call(&array, text, other);
            if (result != 0 || taken != takes::text) {
                std::free(text);
            }
            calm([&] {
                if (result != 0) {
                    EXPECT_EQ(std::pair(elements(array), elements(other)), before);
                }
                if (result == 0 && taken == takes::other) {
                    std::free(other);
                } else {
                    charray_free(other);
                }
            });
            return tell(result, " ") + tell_array(array) + " " + logs.take();
        };
    };
    const auto add = [](char*** array, char* text, char**) { return charray_add(array, text); };
    const auto sorted = [](char*** array, char* text, char**) { return charray_add_sorted_by_len(array, text); };
    const auto merge = [](char*** array, char*, char** other) { return charray_merge(array, other); };
    const auto copy = [](char*** array, char*, char** other) { return charray_merge_copy(array, other); };
    const auto refused = [](bool from_null, const char* function, const char* call = "realloc") {
        return std::string(from_null ? "90 (null)" : "90  m nnn") + " Error - " + function + ": " +
               (from_null ? "malloc" : call) + " failed. Out of memory\n";
    };
    for (const bool null : {false, true}) {
        const std::string old = null ? "0 " : "0  m nnn";
        expect_outcomes({
            row("charray_add", old + " no ", {refused(null, "charray_add")}, addition(add, takes::text, null)),
            row("charray_add_sorted_by_len", null ? "0  no " : "0  m no nnn ",
                {refused(null, "charray_add_sorted_by_len")}, addition(sorted, takes::text, null)),
            row("charray_merge", old + " x yyy ", {refused(null, "charray_merge")},
                addition(merge, takes::other, null)),
            row("charray_merge_copy", old + " x yyy ",
                null ? std::vector{refused(true, "charray_merge")}
                     : std::vector{refused(false, "charray_merge", "malloc"), refused(false, "charray_merge")},
                addition(copy, takes::nothing, null)),
        });
    }
    expect_outcomes({
        row("charray_dup", " m nn",
            [] {
                char** const array = calm([] { return make({"m", "nn"}); });
                const calm_text told = tell_array(charray_dup(array));
                charray_free(array);
                return told;
            }),
        row("str2charray", " a b",
            [] {
                char text[] = "a b";
                return tell_array(str2charray(text, " "));
            }),
    });
    EXPECT_EQ(logs.take().str(), "");
}

TEST(BaseAlloc, AnInstanceThatCanNotBeLookedForIsNotThere)
{
    const quiet_logs quiet;
    const temp_dir folder;
    folder.write("instance-a/xanvrnd.conf", "");
    const std::string directory = folder.path() + "/";
    ASSERT_TRUE(doesInstanceExist("a", directory.c_str()));
    expect_outcomes({
        row("doesInstanceExist", "1", {"0", "1"}, [&] { return tell(doesInstanceExist("a", directory.c_str())); }),
    });
}

TEST(BaseAlloc, PasswordsAreEncodedAndDecodedOrStay)
{
    const quiet_logs quiet;
    aes_key_data key = {32, {1, 2, 3}, {4, 5, 6}};
    g_DirKeyData = &key;
    const auto state = [](const berval& value) {
        if (value.bv_val == nullptr) {
            return "none";
        }
        const int method = check_format(value.bv_val, value.bv_len);
        return method == PWD_AES256 || method == PWD_SSHA                 ? "stored"
               : std::string_view(value.bv_val, value.bv_len) == "secret" ? "clear"
                                                                          : "wrong";
    };
    char clear[] = "secret";
    const berval secret = {6, clear};
    berval stored = {};
    ASSERT_EQ(value_encode_one_value(PWD_AES256, &secret, &stored, nullptr), 0);
    const auto changed = [&](const berval& from, auto call) {
        return [=, &from] {
            berval value = calm([&] { return berval{from.bv_len, strndup(from.bv_val, from.bv_len)}; });
            berval* values[] = {&value, nullptr};
            const int result = call(values);
            const calm_text told = calm([&] { return tell(result, " ", state(value)); });
            std::free(value.bv_val);
            return told;
        };
    };
    expect_outcomes({
        // Without the password library's own memory there is no text, which counts as a success.
        row("value_encode_one_value", "0 stored", {"90 none", "0 none", "0 stored"},
            [&] {
                berval out = {};
                const int result = value_encode_one_value(PWD_AES256, &secret, &out, nullptr);
                const calm_text told = calm([&] { return tell(result, " ", state(out)); });
                std::free(out.bv_val);
                return told;
            }),
        row("value_encode_values", "0 stored", {"90 clear", "0 clear", "0 stored"},
            changed(secret, [](berval** values) { return value_encode_values(PWD_SSHA, values, 1, nullptr); })),
        row("value_decode_values", "0 clear", {"0 stored", "0 clear"}, changed(stored, value_decode_values)),
    });
    std::free(stored.bv_val);
    g_DirKeyData = nullptr;
}

#endif

}  // namespace
