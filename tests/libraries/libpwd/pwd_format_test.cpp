// Stored forms of passwords, beside values that other programs made, and against every change of a stored text.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <dlfcn.h>

#include "libraries/libpwd/pwd_format.h"
#include "tests/support/message_catcher.h"

namespace {

constexpr int all_methods[] = {PWD_NONE, PWD_SHA, PWD_MD5, PWD_CRYPT, PWD_SSHA, PWD_AES256, PWD_AES192, PWD_AES128};

// Key bytes from 1 and salt bytes from 100 upwards.
aes_key_data counted_key(unsigned long length = 32)
{
    aes_key_data key = {};
    key.key_length = length;
    for (std::size_t i = 0; i < sizeof key.key; ++i)
        key.key[i] = static_cast<unsigned char>(i + 1);
    for (std::size_t i = 0; i < sizeof key.salt; ++i)
        key.salt[i] = static_cast<unsigned char>(i + 100);
    return key;
}
const aes_key_data test_key = counted_key();

// The stored form, made in a block of exactly its room.
std::string stored_form(int method, const std::string& value, const aes_key_data* key = &test_key)
{
    std::vector<char> buffer(formatted_password_length(method, value.size()));
    const unsigned long length =
        format_password(method, "abc", key, value.data(), value.size(), buffer.data(), buffer.size());
    EXPECT_LE(length, buffer.size());
    return {buffer.data(), length};
}

// The clear text, or "refused".
std::string decoded(const std::string& stored, const aes_key_data* key = &test_key)
{
    char* clear = const_cast<char*>("");
    unsigned long length = 7;
    const int success = unformat_password(stored.data(), stored.size(), key, &clear, &length);
    EXPECT_EQ(clear != nullptr, success != 0);
    if (success == 0) {
        EXPECT_EQ(length, 0u);
        return "refused";
    }
    EXPECT_EQ(clear[length], '\0');
    const std::string result(clear, length);
    std::free(clear);
    return result;
}

bool verified(std::string password, std::string stored, int flags = 1, const aes_key_data* key = &test_key)
{
    const berval given = {password.size(), password.data()};
    const berval kept = {stored.size(), stored.data()};
    return verify_password(&given, &kept, flags, key) == 0;
}

TEST(PwdFormat, AStoredSettingChoosesItsCostWithinLimits)
{
    const auto platform = reinterpret_cast<char* (*)(const char*, const char*)>(dlsym(RTLD_DEFAULT, "crypt"));
    ASSERT_NE(platform, nullptr);
    for (const char* setting : {"ab", "_J9..K0Ay", "$1$abcdefgh$", "$3$", "$5$rounds=1000$abc$", "$6$rounds=1000$abc$",
                                "$2b$04$abcdefghijklmnopqrstuu", "$sha1$1000$abcd$", "$md5,rounds=10$abcd$",
                                "$7$4U..../....abcd$", "$y$j75$abcd$", "$y$j4T$abcd$", "$gy$j4T$abcd$"}) {
        const char* const hash = platform("secret", setting);
        if (hash != nullptr && hash[0] != '*') {  // a kind that the platform was built with
            EXPECT_TRUE(verified("secret", std::string("{crypt}") + hash)) << hash;
            EXPECT_FALSE(verified("Secret", std::string("{crypt}") + hash)) << hash;
        }
    }
    const test_support::debug_catcher debug;
    for (const char* setting :
         {"_...9abcd", "$5$rounds=1000001$a$b", "$6$rounds=4294968296$a$b", "$2b$15$abcdefghijklmnopqrstuu",
          "$sha1$1000001$a$b", "$md5,rounds=100001$a$b", "$7$DU..../....a$b", "$7$CU/.../....a$b", "$7$CU....0....a$b",
          "$y$jCT$a$b", "$y$jBTx$a$b", "$y$j.......$a$b", "$gy$jCT$a$b", "$z$a$b"}) {
        const std::size_t told = debug.count();
        EXPECT_FALSE(verified("secret", std::string("{crypt}") + setting)) << setting;
        EXPECT_EQ(debug.count(), told + 1) << setting;
    }
}

TEST(PwdFormat, ThePrefixAloneTellsTheMethod)
{
    const std::pair<std::string_view, int> table[] = {
        {"{SHA}", 2},         {"{md5}x", 3},      {"{CRYPT}x", 4},    {"{ssha}????", 9},
        {"{AES256}", 133},    {"{aes192}!", 134}, {"{AES128}x", 135}, {"", 1},
        {"secret", 1},        {"{SHA", 1},        {" {SHA}x", 1},     {"{SHA1}x", 1},
        {"{SHA}x {MD5}y", 2}, {"{AES512}x", 1},   {"{", 1},
    };
    for (const auto& [stored, method] : table)
        EXPECT_EQ(check_format(stored.data(), stored.size()), method) << stored;
    EXPECT_EQ(check_format(nullptr, 0), 1);
}

TEST(PwdFormat, ValuesOfOtherProgramsAreVerifiedAndNoOtherPasswordIs)
{
    const std::string with_zero("s\0cret", 6);
    const struct {
        std::string password;
        std::string stored;
    } table[] = {
        {"password", "{SHA}W6ph5Mm5Pz8GgiULbPgzG37mj9g="},
        {"", "{sha}2jmj7l5rSw0yVb/vlWAYkK/YBwk="},
        {"password", "{MD5}X03MO1qnZdYdgyfeuILPmQ=="},
        {"secret", "{SSHA}5en6G6MezRroT3XKqkdPOmY/BfQ="},
        {"secret", "{SSHA}gVK8WC9YyFT1gMsQHTGCgT3sSv5zYWx0"},
        {"secret", "{SSHA}FTtLy4UHGF6CE6rK0obse+lIYuYwMTIzNDU2Nzg5YWJjZGVm"},
        {"rasmuslerdorf", "{crypt}rl.3StKT.4T8M"},
        {"rasmuslerdorf", "{crypt}$1$rasmusle$rISCgZzpwk3UhDidwXvin0"},
        {"Hello world!", "{CRYPT}$6$saltstring$svn8UoSVapNtMuq1ukKS4tPQd8iKwSMHWjl/O817G3uBnIFNjnQJuesI68u4OTLiBFd"
                         "cbYEdFCoEOfaS35inz1"},
        {with_zero, "{AES256}yMnKy8zNzs/Q0dLTzRvVU84/eDH1WeaAN3QBg9fVI+hPnQ=="},
        {with_zero, "{AES192}yMnKy8zNzs/Q0dLTMuvSjYErxzTPm99RFU3btVtUY/s26g=="},
        {with_zero, "{AES128}yMnKy8zNzs/Q0dLTvGFxWxJKg8/eShhsNGoWCAmUs+JJig=="},
        {"in the clear", "in the clear"},
        {"", ""},
    };
    for (const auto& [password, stored] : table) {
        EXPECT_TRUE(verified(password, stored)) << stored;
        EXPECT_FALSE(verified("x" + password, stored)) << stored;
        EXPECT_FALSE(verified(password + '\0', stored)) << stored;
        EXPECT_FALSE(verified("Password", stored)) << stored;
        const int method = check_format(stored.data(), stored.size());
        EXPECT_EQ(decoded(stored), (method & PWD_TWO_WAY) != 0 ? with_zero : "refused");
        // A stolen stored value is no password, unless the caller says that it may be one.
        EXPECT_EQ(verified(stored, stored), method == PWD_NONE) << stored;
        EXPECT_TRUE(verified(stored, stored, 0)) << stored;
    }
}

TEST(PwdFormat, EachMethodTakesBackWhatItMadeInTheLengthItForetoldAndNeverTwiceTheSame)
{
    for (const int method : all_methods) {
        const bool salted = method == PWD_SSHA || method == PWD_CRYPT || (method & PWD_TWO_WAY) != 0;
        for (const std::size_t length : {0u, 1u, 2u, 3u, 16u, 17u, 511u}) {
            const std::string value(length, method == PWD_CRYPT ? 'x' : '\0');
            const std::string stored = stored_form(method, value);
            EXPECT_EQ(stored.size(), formatted_password_length(method, length));
            EXPECT_EQ(check_format(stored.data(), stored.size()), method);
            EXPECT_TRUE(verified(value, stored)) << method << " " << length;
            EXPECT_FALSE(verified(value + "x", stored));
            EXPECT_EQ(decoded(stored), (method & PWD_TWO_WAY) != 0 ? value : "refused");
            EXPECT_EQ(stored_form(method, value) != stored, salted);
        }
    }
    EXPECT_LE(formatted_password_length(PWD_SSHA, 1000), 56u);  // the room that the schema gives such an attribute
}

TEST(PwdFormat, AStoredTextWithAnyBitChangedIsRefused)
{
    for (const int method : {PWD_SHA, PWD_MD5, PWD_SSHA, PWD_AES256, PWD_AES192, PWD_AES128}) {
        const bool two_way = (method & PWD_TWO_WAY) != 0;
        for (const char* value : {"a secret", "a secret.", "a secret.."}) {  // one for each padding
            const std::string stored = stored_form(method, value);
            for (std::size_t bit = 0; bit < stored.size() * 8; ++bit) {
                std::string changed = stored;
                changed[bit / 8] = static_cast<char>(changed[bit / 8] ^ 1 << bit % 8);
                EXPECT_EQ(decoded(changed), "refused") << changed;
                // The prefix of a hash is read in any case.
                EXPECT_FALSE((two_way || bit / 8 > stored.find('}')) && verified(value, changed)) << changed;
            }
            for (std::size_t length = 0; length < stored.size(); ++length)
                EXPECT_FALSE(verified(value, stored.substr(0, length)));
            for (const char* more : {"=", " ", "\n", "A", "AAAA"}) {
                EXPECT_FALSE(verified(value, stored + more));
                EXPECT_FALSE(verified(value, std::string(stored).insert(stored.find('}') + 1, more)));
            }
        }
    }
    for (const char* damaged : {"{crypt}", "{crypt}x", "{crypt}*0", "{crypt}$9$x", "{SSHA}", "{SHA}AAAA"})
        EXPECT_FALSE(verified("", damaged)) << damaged;
    EXPECT_FALSE(verified("", "{crypt}" + std::string(5000, 'x')));
    // Other users of the crypto library find none of these failures in its queue.
    const auto first_error = reinterpret_cast<unsigned long (*)()>(dlsym(RTLD_DEFAULT, "ERR_peek_error"));
    ASSERT_NE(first_error, nullptr);
    EXPECT_EQ(first_error(), 0u);
}

TEST(PwdFormat, AKeyOpensItsOwnValuesOnly)
{
    aes_key_data other_key = test_key;
    other_key.key[31] ^= 1;
    aes_key_data other_salt = test_key;
    other_salt.salt[0] ^= 1;
    const aes_key_data shorter = counted_key(16);
    const aes_key_data longer = counted_key(64);
    const aes_key_data too_short = counted_key(15);
    const aes_key_data too_long = counted_key(65);
    const struct {
        const aes_key_data* key;
        const char* back;  // what it decodes of what it encrypts
    } table[] = {{&other_key, "secret"},  {&other_salt, "secret"}, {&shorter, "secret"}, {&longer, "secret"},
                 {&too_short, "refused"}, {&too_long, "refused"},  {nullptr, "refused"}};
    for (const int method : {PWD_AES256, PWD_AES192, PWD_AES128}) {
        const std::string stored = stored_form(method, "secret");
        for (const auto& [key, back] : table) {
            EXPECT_EQ(decoded(stored, key), "refused");
            EXPECT_FALSE(verified("secret", stored, 1, key));
            EXPECT_EQ(decoded(stored_form(method, "secret", key), key), back);
        }
    }
}

TEST(PwdFormat, WhatCanNotBeMadeHasNoLengthAndWhatDoesNotFitIsNotWritten)
{
    for (const int method : {0, -1, 5, 128, 132, 136}) {
        EXPECT_EQ(formatted_password_length(method, 6), 0u);
        EXPECT_EQ(stored_form(method, "secret"), "");
    }
    EXPECT_EQ(formatted_password_length(PWD_AES256, 0x10000001), 0u);
    EXPECT_EQ(formatted_password_length(PWD_AES256, ~0ul), 0u);
    EXPECT_EQ(stored_form(PWD_CRYPT, std::string("a\0b", 3)), "");
    EXPECT_EQ(stored_form(PWD_CRYPT, std::string(512, 'x')), "");

    for (const int method : all_methods) {
        std::string buffer(200, '#');
        const unsigned long needed = formatted_password_length(method, 6);
        EXPECT_EQ(format_password(method, nullptr, &test_key, "secret", 6, buffer.data(), needed - 1), needed);
        EXPECT_EQ(buffer, std::string(200, '#'));
    }
}

TEST(PwdSyntax, EachRuleCountsCharacters)
{
    struct row {
        const char* password;
        const char* old;
        long length, alpha, other, diff, repeat;
        int rc, state;
    };
    const row table[] = {
        {"secret12", nullptr, 8, 6, 2, 0, 0, 0, 0},
        {"secret1", nullptr, 8, 6, 1, 0, 0, 19, 9},
        {"s\u00E9\u20ACret", nullptr, 6, 4, 2, 0, 0, 0, 0},
        {"s\u00E9\u20ACret", nullptr, 7, 4, 2, 0, 0, 19, 9},
        {"secret12", nullptr, 8, 7, 0, 0, 0, 19, 8},
        {"secret12", nullptr, 8, 0, 3, 0, 0, 19, 8},
        {"abcabca", nullptr, 0, 0, 0, 0, 3, 0, 0},
        {"abcabca", nullptr, 0, 0, 0, 0, 2, 19, 8},
        {"\u00E9\u00E8\u00EA", nullptr, 0, 0, 0, 0, 1, 0, 0},  // three characters that begin with the same byte
        {"secretxx", "secret", 0, 0, 0, 2, 0, 0, 0},
        {"terces12", "secret12", 0, 0, 0, 1, 0, 19, 8},  // places don't matter
        {"Secret12", "secret12", 0, 0, 0, 1, 0, 0, 0},
        {"secret12", nullptr, 0, 0, 0, 9, 0, 0, 0},
        {"secret12", "{SHA}W6ph5Mm5Pz8GgiULbPgzG37mj9g=", 0, 0, 0, 9, 0, 0, 0},
        {"{SHA}W6ph5Mm5Pz8GgiULbPgzG37mj9g=", nullptr, 0, 0, 0, 0, 0, 19, 8},
        {"", nullptr, 0, 0, 0, 0, 0, 0, 0},
        {"\x80\xC3", nullptr, 2, 0, 2, 0, 1, 0, 0},  // no UTF-8, and no step beyond its end
        {nullptr, nullptr, 0, 0, 0, 0, 0, 89, 0},
    };
    for (const row& r : table) {
        int state = -1;
        EXPECT_EQ(verify_pwd_syntax(r.password, r.old, 1, r.length, r.alpha, r.other, r.diff, r.repeat, &state), r.rc)
            << (r.password == nullptr ? "null" : r.password);
        EXPECT_EQ(state, r.state);
        EXPECT_EQ(verify_pwd_syntax(r.password, r.old, 0, r.length, r.alpha, r.other, r.diff, r.repeat, nullptr), 0);
    }
}

}  // namespace
