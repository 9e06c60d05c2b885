// Stored forms of passwords: a prefix in braces that names the method, and a text behind it (RFC 2307 section 5.3).
//
//     method        stored form
//     1   none      the value itself
//     2   SHA       {SHA}     base64 of SHA-1 (value)
//     3   MD5       {MD5}     base64 of MD5 (value)
//     4   crypt     {crypt}   what crypt(3) makes of the value; new ones are SHA-512 crypt. A stored one that asks for
//                             more than a server can spend on a comparison matches nothing: 1,000,000 rounds of SHA,
//                             cost 14 of bcrypt, 64 MB of scrypt and yescrypt
//     9   SSHA      {SSHA}    base64 of SHA-1 (value, salt) and the salt; new salts are 16 random bytes
//     133 AES-256   {AES256}  base64 of a nonce of 12 random bytes, the AES-GCM cipher text (NIST SP 800-38D), and
//     134 AES-192   {AES192}  a tag of 16 bytes over it and over the prefix as it stands
//     135 AES-128   {AES128}
//
// Bit 128 of a method says that the value can be had back. Prefixes are read in any case; base64 is read in its one
// proper form only (RFC 4648, padded, no stray bits), so a stored value of a two-way method with any bit changed is
// refused.
//
// The functions keep nothing, may be called from any thread, and leave no error behind in the crypto library's queue.
// Where memory runs out the result is that of the failure.
#pragma once

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"

enum password_method DIRBASE_ENUM_INT {
    PWD_NONE = 1,
    PWD_SHA = 2,
    PWD_MD5 = 3,
    PWD_CRYPT = 4,
    PWD_SSHA = 9,
    PWD_AES256 = 133,
    PWD_AES192 = 134,
    PWD_AES128 = 135,
};
DIRBASE_NUMBER(int, PWD_TWO_WAY, 128);

// The prefixes of the two-way methods.
#define AES256_BRACED "{AES256}"
#define AES192_BRACED "{AES192}"
#define AES128_BRACED "{AES128}"

// What the two-way methods encrypt with. The key of each method is derived from it by HKDF with SHA-256 (RFC 5869), so
// methods share no key. The key bytes must be random: a pass phrase is no key.
typedef struct aes_key_data aes_key_data;
struct aes_key_data {
    unsigned long key_length;  // bytes of `key` in use, 16 to 64; a record with any other length encrypts nothing
    unsigned char key[64];
    unsigned char salt[32];  // random, not secret, the same for as long as the key
};

DIRBASE_C_BEGIN

// The method of a stored value by its prefix; 1 for a value without one of the prefixes above. Only the prefix counts:
// a damaged value still has its method, so it is never taken for a password in the clear.
DIRBASE_EXPORT int check_format(const char* value, unsigned long length);

// Length of the stored form of a value of `length` bytes, without a terminator; 0 for an unknown method, or a value too
// long to be encoded (256 MB), and rightly for an empty value by method 1. Exact, as the methods above make all values
// of one length equally long.
DIRBASE_EXPORT unsigned long formatted_password_length(int method, unsigned long length);

// Makes the stored form of a value. The value may hold any bytes (for crypt: no zero byte, and at most 511 bytes).
//
//   salt    a text; not looked at, since salts are random here.
//   key     for two-way methods; others don't look at it.
//   buffer  takes the text, without a terminator.
//   size    bytes of room in buffer.
//
// Returns the length of the stored form, or 0 when there is none: unknown method, no usable key, refused value,
// failure of the crypto library, an empty value by method 1. A length above `size` is the room that it takes: nothing
// was written.
DIRBASE_EXPORT unsigned long format_password(int method, const char* salt, const aes_key_data* key, const char* value,
                                             unsigned long length, char* buffer, unsigned long size);

// Decodes the stored form of a two-way method.
//
//   clear, clear_length  take a new text with a zero byte behind it, for the caller to free(); null and 0 on failure.
//
// Returns 1, or 0: with errno at ENOMEM when memory ran out, as far as the crypto library lets that be seen, and at 0
// when the value is not of a two-way method, was changed since it was made, belongs to another key, or the key is null
// or of a wrong length. The caller wipes what he was given.
DIRBASE_EXPORT int unformat_password(const char* value, unsigned long length, const aes_key_data* key, char** clear,
                                     unsigned long* clear_length);

// Compares a password with a stored value of any method, in a time that doesn't tell how much of them agrees.
//
//   flags  1: the password is in the clear, whatever it looks like; so it must be where a client gives it.
//          0: a password that has a prefix is itself a stored form, and matches the same stored value only.
//   key    for stored values of two-way methods; may be null when there are none.
//
// Returns 0 for a match and 1 otherwise, also where the stored value can't be decoded.
DIRBASE_EXPORT int verify_password(const berval* password, const berval* stored, int flags, const aes_key_data* key);

// Checks a new password against rules. Both passwords are zero-terminated UTF-8; characters are counted, not bytes.
//
//   password     in the clear: one with a prefix above is refused, since there's no telling what it holds.
//   oldPassword  in the clear; null, or one with a prefix, switches the rule on differences off.
//   policyOn     0 lets every password pass.
//   minLength    least number of characters.
//   minAlpha     least number of ASCII letters.
//   minOther     least number of other characters.
//   minDiff      least number of characters that the old password doesn't hold; each place counts.
//   maxRepeat    most places where one character may stand; 0 or below sets no limit.
//   state        takes 0, or what to tell in a password policy response, which is 3 more than the error number of that
//                control: 9 for passwordTooShort (6), 8 for insufficientPasswordQuality (5). May be null.
//
// Returns LDAP_SUCCESS, LDAP_CONSTRAINT_VIOLATION for a password that breaks a rule, or with a state of 0
// LDAP_PARAM_ERROR for a null password and LDAP_NO_MEMORY.
DIRBASE_EXPORT int verify_pwd_syntax(const char* password, const char* oldPassword, int policyOn, long minLength,
                                     long minAlpha, long minOther, long minDiff, long maxRepeat, int* state);

DIRBASE_C_END
