// The rules for new passwords: see pwd_format.h.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libpwd/pwd_format.h"
#include "libraries/libpwd/secret_block.h"

namespace {

// States: 3 and the error number of the password policy control.
constexpr int insufficient_quality = 3 + 5;
constexpr int too_short = 3 + 6;

// The characters of a text, in order of their bytes. A character is its bytes as one number: rules only compare them,
// so what is no UTF-8 need not be refused.
class characters {
public:
    explicit characters(const char* text) : block_((std::strlen(text) + 1) * sizeof(std::uint32_t))
    {
        begin_ = reinterpret_cast<std::uint32_t*>(block_.data());  // calloc begins their life
        end_ = begin_;
        if (begin_ == nullptr) {
            return;
        }
        for (const auto* at = reinterpret_cast<const unsigned char*>(text); *at != 0;) {
            std::uint32_t character = *at++;
            if (character >= 0xC0) {
                for (int more = 0; more < 3 && (*at & 0xC0) == 0x80; ++more) {
                    character = character << 8 | *at++;
                }
            }
            *end_++ = character;
        }
        std::sort(begin_, end_);
    }

    explicit operator bool() const { return begin_ != nullptr; }
    const std::uint32_t* begin() const { return begin_; }
    const std::uint32_t* end() const { return end_; }
    long count() const { return end_ - begin_; }

private:
    secret_block block_;
    std::uint32_t* begin_ = nullptr;
    std::uint32_t* end_ = nullptr;
};

bool is_letter(std::uint32_t character)
{
    return (character >= 'A' && character <= 'Z') || (character >= 'a' && character <= 'z');
}

// Places of the character that stands at most of them.
long most_repeated(const characters& text)
{
    long most = 0;
    for (const std::uint32_t* at = text.begin(); at != text.end();) {
        const std::uint32_t* next = std::upper_bound(at, text.end(), *at);
        most = std::max<long>(most, next - at);
        at = next;
    }
    return most;
}

bool is_encoded(const char* password)
{
    return check_format(password, std::strlen(password)) != PWD_NONE;
}

}  // namespace

extern "C" int verify_pwd_syntax(const char* password, const char* oldPassword, int policyOn, long minLength,
                                 long minAlpha, long minOther, long minDiff, long maxRepeat, int* state)
{
    const auto verdict = [state](int new_state, int rc) {
        if (state != nullptr) {
            *state = new_state;
        }
        return rc;
    };
    if (policyOn == 0) {
        return verdict(0, LDAP_SUCCESS);
    }
    if (password == nullptr) {
        return verdict(0, LDAP_PARAM_ERROR);
    }
    if (is_encoded(password)) {
        return verdict(insufficient_quality, LDAP_CONSTRAINT_VIOLATION);
    }

    const bool compare = oldPassword != nullptr && !is_encoded(oldPassword);
    const characters text(password);
    const characters old(compare ? oldPassword : "");
    if (!text || !old) {
        return verdict(0, LDAP_NO_MEMORY);
    }
    if (text.count() < minLength) {
        return verdict(too_short, LDAP_CONSTRAINT_VIOLATION);
    }

    const long letters = std::count_if(text.begin(), text.end(), is_letter);
    const long different = std::count_if(text.begin(), text.end(), [&old](std::uint32_t character) {
        return !std::binary_search(old.begin(), old.end(), character);
    });
    if (letters < minAlpha || text.count() - letters < minOther || (compare && different < minDiff) ||
        (maxRepeat > 0 && most_repeated(text) > maxRepeat)) {
        return verdict(insufficient_quality, LDAP_CONSTRAINT_VIOLATION);
    }
    return verdict(0, LDAP_SUCCESS);
}
