// Limits of the cost of crypt(3): see crypt_cost.h.
#include "libraries/libpwd/crypt_cost.h"

#include <charconv>
#include <cstddef>

namespace {

constexpr std::string_view digits = "./0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
constexpr std::size_t largest_n = 14;  // logarithm of scrypt's N; with blocks of 4096 bytes, r being 32, that is 64 MB

// A decimal number at the front of the text that is followed by "$".
bool is_number_up_to(unsigned most, std::string_view text)
{
    unsigned number = 0;
    const auto [end, failure] = std::from_chars(text.data(), text.data() + text.size(), number);
    return failure == std::errc() && end != text.data() + text.size() && *end == '$' && number <= most;
}

bool is_digit_up_to(std::size_t most, std::string_view text)
{
    return !text.empty() && digits.find(text[0]) <= most;
}

bool is_fixed(std::string_view)
{
    return true;
}

// SHA-256 and SHA-512 take 5,000 rounds where they name none.
bool is_sha2(std::string_view text)
{
    constexpr std::string_view rounds = "rounds=";
    return !text.starts_with(rounds) || is_number_up_to(1'000'000, text.substr(rounds.size()));
}

bool is_sha1(std::string_view text)
{
    return is_number_up_to(1'000'000, text);
}

// Sun's MD5 takes 4,096 rounds and those that it names.
bool is_sun_md5(std::string_view text)
{
    constexpr std::string_view rounds = ",rounds=";
    return text.starts_with("$") || (text.starts_with(rounds) && is_number_up_to(100'000, text.substr(rounds.size())));
}

// Two digits, the logarithm of the rounds.
bool is_bcrypt(std::string_view text)
{
    return text.size() > 2 && text[2] == '$' && is_number_up_to(14, text);
}

// N, r and p in one, five and five characters: r is 32 and p is 1.
bool is_scrypt(std::string_view text)
{
    return is_digit_up_to(largest_n, text) && text.substr(1).starts_with("U..../....");
}

// The flavour, N less one, and r less one, which is 8 or 32.
bool is_yescrypt(std::string_view text)
{
    return text.starts_with('j') && is_digit_up_to(largest_n - 1, text.substr(1)) &&
           (text.substr(2).starts_with("T$") || text.substr(2).starts_with("5$"));
}

// Extended DES: the last of four characters counts 262,144 rounds each.
bool is_extended_des(std::string_view text)
{
    return text.size() > 3 && text[3] == '.';
}

struct kind {
    std::string_view prefix;
    bool (*is_bearable)(std::string_view behind);
};
constexpr kind kinds[] = {
    {"$1$", is_fixed},    {"$2a$", is_bcrypt},  {"$2b$", is_bcrypt}, {"$2x$", is_bcrypt},    {"$2y$", is_bcrypt},
    {"$3$", is_fixed},    {"$5$", is_sha2},     {"$6$", is_sha2},    {"$7$", is_scrypt},     {"$gy$", is_yescrypt},
    {"$y$", is_yescrypt}, {"$md5", is_sun_md5}, {"$sha1$", is_sha1}, {"_", is_extended_des},
};

}  // namespace

bool crypt_cost_is_bearable(std::string_view setting)
{
    for (const kind& known : kinds) {
        if (setting.starts_with(known.prefix)) {
            return known.is_bearable(setting.substr(known.prefix.size()));
        }
    }
    return !setting.starts_with('$');  // DES, of two characters of salt
}
