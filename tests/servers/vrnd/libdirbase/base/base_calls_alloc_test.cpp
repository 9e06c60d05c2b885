// The small calls of the base that allocate, with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libcsgl/csgl_memory.h"
#include "servers/vrnd/libdirbase/base/password_values.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/base/server_instance.h"
#include "servers/vrnd/libdirbase/base/slapi_ch.h"
#include "tests/support/alloc_table.h"
#include "tests/support/temp_dir.h"

using namespace test_support;

namespace {

TEST(BaseCallsAlloc, BlocksAndTexts)
{
    expect_outcomes({
        {"slapi_ch_malloc", [] { return tell_made(slapi_ch_malloc(9), slapi_ch_free); }, "made", {"(null)"}},
        {"slapi_ch_calloc", [] { return tell_made(slapi_ch_calloc(3, 3), slapi_ch_free); }, "made", {"(null)"}},
        {"slapi_ch_realloc",
         [] {
             char* const old = heap_copy("abc");
             char* const grown = static_cast<char*>(slapi_ch_realloc(old, 5000));
             return tell(grown == nullptr ? "old " : "new ") + tell_freed(grown == nullptr ? old : grown);
         },
         "new abc",
         {"old abc"}},
        {"slapi_ch_strdup", [] { return tell_freed(slapi_ch_strdup("abc")); }, "abc", {"(null)"}},
        {"csgl_allocate_or_null", [] { return tell_made(csgl_allocate_or_null(9), csgl_free); }, "made", {"(null)"}},
        {"vrn_strerror", [] { return tell_freed(vrn_strerror(ENOENT)); }, "No such file or directory", {"(null)"}},
    });
}

TEST(BaseCallsAlloc, AnInstanceThatCanNotBeLookedForIsNotThere)
{
    const quiet_logs quiet;
    const temp_dir folder;
    folder.write("instance-a/xanvrnd.conf", "");
    const std::string directory = folder.path() + "/";
    ASSERT_TRUE(doesInstanceExist("a", directory.c_str()));
    expect_outcomes({
        {"doesInstanceExist", [&] { return tell(doesInstanceExist("a", directory.c_str())); }, "1", {"0", "1"}},
    });
}

TEST(BaseCallsAlloc, PasswordsAreEncodedAndDecodedOrStay)
{
    const quiet_logs quiet;
    aes_key_data key = {32, {1, 2, 3}, {4, 5, 6}};
    g_DirKeyData = &key;
    const auto state = [](const berval& value) {
        return value.bv_val == nullptr                                    ? "none"
               : check_format(value.bv_val, value.bv_len) == PWD_AES256   ? "stored"
               : std::string_view(value.bv_val, value.bv_len) == "secret" ? "clear"
                                                                          : "wrong";
    };
    char clear[] = "secret";
    const berval secret = {6, clear};
    berval stored = {};
    ASSERT_EQ(value_encode_one_value(PWD_AES256, &secret, &stored, nullptr), 0);
    expect_outcomes({
        // Without the password library's own memory there is no text, which counts as a success.
        {"value_encode_one_value",
         [&] {
             berval out = {};
             const int result = value_encode_one_value(PWD_AES256, &secret, &out, nullptr);
             const calm_text told = calm([&] { return tell(result, " ", state(out)); });
             std::free(out.bv_val);
             return told;
         },
         "0 stored",
         {"90 none", "0 none", "0 stored"}},
        {"value_decode_values",
         [&] {
             berval value = calm([&] { return berval{stored.bv_len, strndup(stored.bv_val, stored.bv_len)}; });
             berval* values[] = {&value, nullptr};
             const int result = value_decode_values(values);
             const calm_text told = calm([&] { return tell(result, " ", state(value)); });
             std::free(value.bv_val);
             return told;
         },
         "0 clear",
         {"0 stored", "0 clear"}},
    });
    std::free(stored.bv_val);
    g_DirKeyData = nullptr;
}

}  // namespace

#endif
