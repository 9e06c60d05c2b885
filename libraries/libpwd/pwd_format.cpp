// Stored forms of passwords, on libcrypto and libcrypt: see pwd_format.h.
//
// This file only puts published pieces together; each of them is a call of one of the two libraries.
#include "libraries/libpwd/pwd_format.h"

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string_view>

#include <crypt.h>
#include <openssl/core_names.h>
#include <openssl/crypto.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/kdf.h>
#include <openssl/params.h>
#include <openssl/rand.h>
#include <strings.h>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libpwd/crypt_cost.h"
#include "libraries/libpwd/secret_block.h"

namespace {

constexpr std::size_t longest_value = 0x10000000;  // lengths of the crypto library are ints, and base64 adds a third
constexpr std::size_t sha1_size = 20;
constexpr std::size_t md5_size = 16;
constexpr std::size_t salt_size = 16;
constexpr std::size_t nonce_size = 12;
constexpr std::size_t tag_size = 16;
constexpr const char* crypt_kind = "$6$";
constexpr std::size_t crypt_length = 3 + 16 + 1 + 86;  // kind, salt, "$", hash

struct format {
    int method;
    std::string_view prefix;
};
constexpr format formats[] = {
    {PWD_SHA, "{SHA}"},          {PWD_MD5, "{MD5}"},          {PWD_CRYPT, "{crypt}"},      {PWD_SSHA, "{SSHA}"},
    {PWD_AES256, AES256_BRACED}, {PWD_AES192, AES192_BRACED}, {PWD_AES128, AES128_BRACED},
};
constexpr format in_the_clear = {PWD_NONE, ""};

// Puts the thread's error queue back as it was: whoever looks there next must not find our failures.
class error_mark {
public:
    error_mark() { ERR_set_mark(); }
    ~error_mark() { ERR_pop_to_mark(); }
    error_mark(const error_mark&) = delete;
    error_mark& operator=(const error_mark&) = delete;
};

template <auto release>
struct release_by {
    template <typename T>
    void operator()(T* object) const
    {
        release(object);
    }
};
using digest_context = std::unique_ptr<EVP_MD_CTX, release_by<EVP_MD_CTX_free>>;
using cipher_context = std::unique_ptr<EVP_CIPHER_CTX, release_by<EVP_CIPHER_CTX_free>>;
using kdf_pointer = std::unique_ptr<EVP_KDF, release_by<EVP_KDF_free>>;
using kdf_context = std::unique_ptr<EVP_KDF_CTX, release_by<EVP_KDF_CTX_free>>;

const unsigned char* bytes_of(std::string_view text)
{
    return reinterpret_cast<const unsigned char*>(text.data());
}

bool same(std::string_view a, std::string_view b)
{
    return a.size() == b.size() && (a.empty() || CRYPTO_memcmp(a.data(), b.data(), a.size()) == 0);
}

// A value as callers give it. One without bytes is empty, and never a null pointer: not every library takes that.
std::string_view view_of(const char* value, unsigned long length)
{
    return value == nullptr || length == 0 ? std::string_view("") : std::string_view(value, length);
}

// The format of a stored value, and of a method; null for an unknown method.
const format& format_of(std::string_view stored)
{
    for (const format& f : formats) {
        if (stored.size() >= f.prefix.size() && strncasecmp(stored.data(), f.prefix.data(), f.prefix.size()) == 0) {
            return f;
        }
    }
    return in_the_clear;
}

const format* format_of(int method)
{
    const format* found =
        std::find_if(std::begin(formats), std::end(formats), [method](const format& f) { return f.method == method; });
    return found != std::end(formats) ? found : method == PWD_NONE ? &in_the_clear : nullptr;
}

// ---- base64 ---------------------------------------------------------------------------------------------------------

constexpr std::size_t base64_length(std::size_t size)
{
    return (size + 2) / 3 * 4;
}

secret_block to_base64(std::string_view bytes)
{
    secret_block text(base64_length(bytes.size()) + 1);  // the library writes a zero byte behind it
    if (text) {
        EVP_EncodeBlock(text.data(), bytes_of(bytes), static_cast<int>(bytes.size()));
    }
    return text;
}

// Decodes, and sets the number of bytes. No block where the text isn't the very one that the bytes are encoded to: the
// library's decoder passes over blanks and stray bits.
secret_block from_base64(std::string_view text, std::size_t& size)
{
    const std::size_t room = text.size() / 4 * 3;
    if (text.empty() || text.size() % 4 != 0 || text.size() > 2 * longest_value) {
        return {};
    }
    secret_block bytes(room);
    if (!bytes ||
        EVP_DecodeBlock(bytes.data(), bytes_of(text), static_cast<int>(text.size())) != static_cast<int>(room)) {
        return {};
    }
    const std::size_t padding = text.ends_with("==") ? 2 : text.ends_with('=') ? 1 : 0;
    size = room - padding;
    secret_block again = to_base64(bytes.view(size));
    if (!again || again.view(text.size()) != text) {
        return {};
    }
    return bytes;
}

// ---- hashes ---------------------------------------------------------------------------------------------------------

// The digest of a value with a salt behind it.
bool digest(const EVP_MD* type, std::string_view value, std::string_view salt, unsigned char* result)
{
    const digest_context context(EVP_MD_CTX_new());
    return context != nullptr && EVP_DigestInit_ex(context.get(), type, nullptr) == 1 &&
           EVP_DigestUpdate(context.get(), value.data(), value.size()) == 1 &&
           EVP_DigestUpdate(context.get(), salt.data(), salt.size()) == 1 &&
           EVP_DigestFinal_ex(context.get(), result, nullptr) == 1;
}

// The text behind the prefix, in base64, of the three hashes.
secret_block hashed(int method, std::string_view value)
{
    unsigned char bytes[sha1_size + salt_size] = {};
    std::size_t size = method == PWD_MD5 ? md5_size : sha1_size;
    std::string_view salt = "";
    if (method == PWD_SSHA) {
        if (RAND_bytes(bytes + sha1_size, salt_size) != 1) {
            return {};
        }
        salt = {reinterpret_cast<const char*>(bytes + sha1_size), salt_size};
        size += salt_size;
    }
    if (!digest(method == PWD_MD5 ? EVP_md5() : EVP_sha1(), value, salt, bytes)) {
        return {};
    }
    return to_base64({reinterpret_cast<const char*>(bytes), size});
}

bool matches_hash(int method, std::string_view password, std::string_view text)
{
    const std::size_t hash_size = method == PWD_MD5 ? md5_size : sha1_size;
    std::size_t size = 0;
    secret_block stored = from_base64(text, size);
    if (!stored || (method == PWD_SSHA ? size < hash_size : size != hash_size)) {
        return false;
    }
    secret_block computed(EVP_MAX_MD_SIZE);
    return computed &&
           digest(method == PWD_MD5 ? EVP_md5() : EVP_sha1(), password, stored.view(size).substr(hash_size),
                  computed.data()) &&
           CRYPTO_memcmp(computed.data(), stored.data(), hash_size) == 0;
}

// What crypt makes of a value by a setting, which is a salt or a whole hash; no block when it refuses.
secret_block crypted(std::string_view value, const char* setting)
{
    secret_block phrase(value.size() + 1);
    secret_block work(sizeof(crypt_data));
    secret_block result(CRYPT_OUTPUT_SIZE);
    if (!phrase || !work || !result || value.find('\0') != value.npos) {
        return {};
    }
    std::memcpy(phrase.data(), value.data(), value.size());
    const char* hash = crypt_rn(phrase.text(), setting, work.data(), sizeof(crypt_data));
    if (hash == nullptr) {
        return {};
    }
    std::memcpy(result.data(), hash, strnlen(hash, CRYPT_OUTPUT_SIZE - 1));
    return result;
}

secret_block newly_crypted(std::string_view value)
{
    char setting[CRYPT_GENSALT_OUTPUT_SIZE] = {};
    if (crypt_gensalt_rn(crypt_kind, 0, nullptr, 0, setting, sizeof setting) == nullptr) {
        return {};
    }
    return crypted(value, setting);
}

bool matches_crypt(std::string_view password, std::string_view text)
{
    if (text.empty() || text.size() >= CRYPT_OUTPUT_SIZE || text.find('\0') != text.npos) {
        return false;
    }
    if (!crypt_cost_is_bearable(text)) {
        debug_error(
            "Error - verify_password: a {crypt} value of unknown kind, or of more rounds or memory than is borne\n");
        return false;
    }
    char setting[CRYPT_OUTPUT_SIZE] = {};
    std::memcpy(setting, text.data(), text.size());
    secret_block hash = crypted(password, setting);
    return hash && same(hash.text(), text);
}

// ---- two-way methods ------------------------------------------------------------------------------------------------

constexpr bool is_two_way(int method)
{
    return (method & PWD_TWO_WAY) != 0;
}

bool is_usable(const aes_key_data* key)
{
    return key != nullptr && key->key_length >= 16 && key->key_length <= sizeof key->key;
}

const EVP_CIPHER* cipher_of(int method)
{
    return method == PWD_AES256 ? EVP_aes_256_gcm() : method == PWD_AES192 ? EVP_aes_192_gcm() : EVP_aes_128_gcm();
}

// The method's own key: HKDF over the key record, with the format's name as purpose.
bool derive_key(const aes_key_data& key, const format& f, unsigned char* derived, std::size_t size)
{
    const kdf_pointer kdf(EVP_KDF_fetch(nullptr, "HKDF", nullptr));
    const kdf_context context(kdf == nullptr ? nullptr : EVP_KDF_CTX_new(kdf.get()));
    char hash[] = "SHA256";
    const OSSL_PARAM parameters[] = {
        OSSL_PARAM_construct_utf8_string(OSSL_KDF_PARAM_DIGEST, hash, 0),
        OSSL_PARAM_construct_octet_string(OSSL_KDF_PARAM_KEY, const_cast<unsigned char*>(key.key), key.key_length),
        OSSL_PARAM_construct_octet_string(OSSL_KDF_PARAM_SALT, const_cast<unsigned char*>(key.salt), sizeof key.salt),
        OSSL_PARAM_construct_octet_string(OSSL_KDF_PARAM_INFO, const_cast<char*>(f.prefix.data()), f.prefix.size()),
        OSSL_PARAM_construct_end(),
    };
    return context != nullptr && EVP_KDF_derive(context.get(), derived, size, parameters) == 1;
}

// A cipher context with its key and nonce, after the prefix has gone into the tag.
cipher_context begin_cipher(const aes_key_data& key, const format& f, std::string_view prefix,
                            const unsigned char* nonce, bool encrypt)
{
    const EVP_CIPHER* cipher = cipher_of(f.method);
    const auto key_size = static_cast<std::size_t>(EVP_CIPHER_get_key_length(cipher));
    secret_block derived(key_size);
    cipher_context context(EVP_CIPHER_CTX_new());
    int ignored = 0;
    if (!derived || context == nullptr || !derive_key(key, f, derived.data(), key_size) ||
        EVP_CipherInit_ex(context.get(), cipher, nullptr, derived.data(), nonce, encrypt ? 1 : 0) != 1 ||
        EVP_CipherUpdate(context.get(), nullptr, &ignored, bytes_of(prefix), static_cast<int>(prefix.size())) != 1) {
        context.reset();
    }
    return context;
}

// The text behind the prefix: base64 of nonce, cipher text and tag.
secret_block encrypted(const aes_key_data& key, const format& f, std::string_view value)
{
    secret_block bytes(nonce_size + value.size() + tag_size);
    if (!bytes || RAND_bytes(bytes.data(), nonce_size) != 1) {
        return {};
    }
    unsigned char* text = bytes.data() + nonce_size;
    const cipher_context context = begin_cipher(key, f, f.prefix, bytes.data(), true);
    int written = 0;
    int rest = 0;
    if (context == nullptr ||
        EVP_CipherUpdate(context.get(), text, &written, bytes_of(value), static_cast<int>(value.size())) != 1 ||
        EVP_CipherFinal_ex(context.get(), text + written, &rest) != 1 ||
        EVP_CIPHER_CTX_ctrl(context.get(), EVP_CTRL_AEAD_GET_TAG, tag_size, text + value.size()) != 1) {
        return {};
    }
    return to_base64(bytes.view(nonce_size + value.size() + tag_size));
}

// The value in a block with a zero byte behind it, and its length; no block when the tag doesn't fit.
secret_block decrypted(const aes_key_data& key, const format& f, std::string_view stored, std::size_t& length)
{
    const std::string_view prefix = stored.substr(0, f.prefix.size());
    std::size_t size = 0;
    secret_block bytes = from_base64(stored.substr(prefix.size()), size);
    if (!bytes || size < nonce_size + tag_size) {
        return {};
    }
    length = size - nonce_size - tag_size;
    unsigned char* text = bytes.data() + nonce_size;
    secret_block value(length + 1);
    const cipher_context context = begin_cipher(key, f, prefix, bytes.data(), false);
    int written = 0;
    int rest = 0;
    if (!value || context == nullptr ||
        EVP_CipherUpdate(context.get(), value.data(), &written, text, static_cast<int>(length)) != 1 ||
        EVP_CIPHER_CTX_ctrl(context.get(), EVP_CTRL_AEAD_SET_TAG, tag_size, text + length) != 1 ||
        EVP_CipherFinal_ex(context.get(), value.data() + written, &rest) != 1) {
        return {};
    }
    return value;
}

// ---- all methods ----------------------------------------------------------------------------------------------------

// The stored form of a value behind its prefix, zero-terminated.
secret_block encoded(const format& f, const aes_key_data* key, std::string_view value)
{
    if (is_two_way(f.method)) {
        return encrypted(*key, f, value);
    }
    if (f.method == PWD_CRYPT) {
        return newly_crypted(value);
    }
    return hashed(f.method, value);
}

}  // namespace

extern "C" {

int check_format(const char* value, unsigned long length)
{
    return format_of(view_of(value, length)).method;
}

unsigned long formatted_password_length(int method, unsigned long length)
{
    const format* f = format_of(method);
    if (f == nullptr || length > longest_value) {
        return 0;
    }
    switch (method) {
    case PWD_NONE: return length;
    case PWD_CRYPT: return f->prefix.size() + crypt_length;
    case PWD_MD5: return f->prefix.size() + base64_length(md5_size);
    case PWD_SHA: return f->prefix.size() + base64_length(sha1_size);
    case PWD_SSHA: return f->prefix.size() + base64_length(sha1_size + salt_size);
    default: return f->prefix.size() + base64_length(nonce_size + length + tag_size);
    }
}

unsigned long format_password(int method, const char*, const aes_key_data* key, const char* value, unsigned long length,
                              char* buffer, unsigned long size)
{
    const format* f = format_of(method);
    const unsigned long wanted = formatted_password_length(method, length);
    if (wanted == 0 || (is_two_way(method) && !is_usable(key))) {
        return 0;
    }
    if (wanted > size) {
        return wanted;
    }
    const std::string_view given = view_of(value, length);
    if (method == PWD_NONE) {
        std::memcpy(buffer, given.data(), given.size());
        return given.size();
    }
    const error_mark mark;
    secret_block text = encoded(*f, key, given);
    if (!text || f->prefix.size() + std::strlen(text.text()) != wanted) {
        debug_error("Error - format_password: method %d failed\n", method);
        return 0;
    }
    std::memcpy(buffer, f->prefix.data(), f->prefix.size());
    std::memcpy(buffer + f->prefix.size(), text.data(), wanted - f->prefix.size());
    return wanted;
}

int unformat_password(const char* value, unsigned long length, const aes_key_data* key, char** clear,
                      unsigned long* clear_length)
{
    *clear = nullptr;
    *clear_length = 0;
    errno = 0;
    const std::string_view stored = view_of(value, length);
    const format& f = format_of(stored);
    if (!is_two_way(f.method) || !is_usable(key)) {
        return 0;
    }
    const error_mark mark;
    std::size_t size = 0;
    secret_block text = decrypted(*key, f, stored, size);
    if (!text) {
        const bool starved = errno == ENOMEM;  // set by the allocator, whoever called it
        debug_error("Error - unformat_password: %s\n",
                    starved ? "memory ran out" : "value can't be decoded with this key");
        errno = starved ? ENOMEM : 0;
        return 0;
    }
    *clear = text.release();
    *clear_length = size;
    return 1;
}

int verify_password(const berval* password, const berval* stored, int flags, const aes_key_data* key)
{
    const std::string_view given = view_of(password->bv_val, password->bv_len);
    const std::string_view kept = view_of(stored->bv_val, stored->bv_len);
    const format& f = format_of(kept);
    const std::string_view text = kept.substr(f.prefix.size());
    const error_mark mark;
    bool match = false;
    if (((flags & 1) == 0 && format_of(given).method != PWD_NONE) || f.method == PWD_NONE) {
        match = same(given, kept);
    } else if (f.method == PWD_CRYPT) {
        match = matches_crypt(given, text);
    } else if (!is_two_way(f.method)) {
        match = matches_hash(f.method, given, text);
    } else if (is_usable(key)) {
        std::size_t size = 0;
        secret_block clear = decrypted(*key, f, kept, size);
        match = clear && same(given, clear.view(size));
    }
    return match ? 0 : 1;
}

}  // extern "C"
