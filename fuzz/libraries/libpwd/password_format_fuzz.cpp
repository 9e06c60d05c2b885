// Stored passwords of any bytes; and of each method, what it makes: it must come back, and no changed text may.
//
// Input: the method and the bits to flip (a byte each), the place of the flipped byte (two bytes), the value.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <memory>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "libraries/libpwd/pwd_format.h"

using fuzz_support::expect;

namespace {

const aes_key_data key = {32, {1, 2, 3}, {4, 5, 6}};
constexpr int methods[] = {PWD_NONE, PWD_SHA, PWD_MD5, PWD_SSHA, PWD_AES256, PWD_AES192, PWD_AES128};

// Decodes from a block of exactly the text's size.
bool decode(const std::string& stored, std::string& value)
{
    const std::unique_ptr<char[]> block(new char[stored.size()]);
    std::memcpy(block.get(), stored.data(), stored.size());
    char* clear = nullptr;
    unsigned long length = 0;
    const bool decoded = unformat_password(block.get(), stored.size(), &key, &clear, &length) != 0;
    expect(!decoded || (check_format(block.get(), stored.size()) & PWD_TWO_WAY) != 0, "only two-way values decode");
    if (decoded)
        value.assign(clear, length);
    std::free(clear);
    return decoded;
}

bool matches(const std::string& password, const std::string& stored)
{
    const berval given = {password.size(), const_cast<char*>(password.data())};
    const berval kept = {stored.size(), const_cast<char*>(stored.data())};
    return verify_password(&given, &kept, 1, &key) == 0;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string any(reinterpret_cast<const char*>(data), size);
    std::string back;
    decode(any, back);
    const int claimed = check_format(any.data(), any.size());
    if (claimed == PWD_NONE)
        expect(matches(any, any) && !matches(any + "x", any), "a text in the clear matches itself only");
    else if (claimed != PWD_CRYPT)  // there the text chooses the cost
        expect(!matches(any, any), "a stored text is no password");

    if (size < 4)
        return 0;
    const int method = methods[data[0] % std::size(methods)];
    const std::string value = any.substr(4);
    std::string stored(formatted_password_length(method, value.size()), '\0');
    expect(format_password(method, nullptr, &key, value.data(), value.size(), stored.data(), stored.size()) ==
               stored.size(),
           "the length is the one foretold");
    if (method == PWD_NONE)
        return 0;
    expect(check_format(stored.data(), stored.size()) == method, "the prefix tells the method");
    expect(matches(value, stored), "the value matches its stored form");
    expect(decode(stored, back) == ((method & PWD_TWO_WAY) != 0), "two-way values decode");
    expect((method & PWD_TWO_WAY) == 0 || back == value, "and give the value back");

    const std::size_t place = (data[2] * 256u + data[3]) % stored.size();
    const auto flip = static_cast<char>(data[1] == 0 ? 1 : data[1]);
    stored[place] = static_cast<char>(stored[place] ^ flip);
    expect(!decode(stored, back), "a changed text never decodes");
    expect(place <= stored.find('}') || !matches(value, stored), "and matches nothing");
    return 0;
}
