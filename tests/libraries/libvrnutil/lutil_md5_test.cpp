// MD5: the test suite of RFC 1321, A.5, in pieces of every size.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <string>
#include <string_view>

#include "libraries/libvrnutil/lutil_md5.h"

TEST(LutilMd5, TheTestSuiteOfTheRfc)
{
    const char* const table[][2] = {
        {"", "d41d8cd98f00b204e9800998ecf8427e"},
        {"a", "0cc175b9c0f1b6a831c399e269772661"},
        {"abc", "900150983cd24fb0d6963f7d28e17f72"},
        {"message digest", "f96b697d7cb7938d525a2f31aaf161d0"},
        {"abcdefghijklmnopqrstuvwxyz", "c3fcd3d76192e4007dfb496cca67e13b"},
        {"ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789", "d174ab98d277d9f5a5611c2c9f419d9f"},
        {"12345678901234567890123456789012345678901234567890123456789012345678901234567890",
         "57edf4a22be3c955ac49da2e2107b67a"},
    };
    for (const auto& [text, expected] : table) {
        for (const std::size_t piece : {1u, 3u, 63u, 64u, 1000u}) {
            lutil_MD5Context context;
            lutil_MD5Init(&context);
            lutil_MD5Update(&context, nullptr, 0);
            for (std::string_view rest = text; !rest.empty(); rest.remove_prefix(std::min(piece, rest.size()))) {
                const auto* bytes = reinterpret_cast<const unsigned char*>(rest.data());
                lutil_MD5Update(&context, bytes, std::min(piece, rest.size()));
            }
            unsigned char digest[16];
            lutil_MD5Final(digest, &context);
            std::string printed;
            for (const unsigned char byte : digest) {
                char pair[3];
                std::snprintf(pair, sizeof pair, "%02x", byte);
                printed += pair;
            }
            EXPECT_EQ(printed, expected) << text << " by " << piece;
        }
    }
}
