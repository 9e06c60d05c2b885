// Language tags: one attribute type in several versions, such as "cn", "cn;lang-en" and "cn;lang-de" (RFC 3866).
//
// The tag is what stands behind the last ";" of an attribute name, at most longest_language_tag bytes. The ending
// ";binary" in any case (RFC 4522) is no tag but part of the name. Tags compare without regard to ASCII case and are
// given in lower case.
//
// Any thread may call these on texts of its own.
#pragma once

#include <stdbool.h>
#include <stddef.h>

#include "libraries/dirbase_export.h"

DIRBASE_NUMBER(size_t, longest_language_tag, 240);
DIRBASE_NUMBER(size_t, language_tag_buffer, longest_language_tag + 1);

// What parse_language_tags is to give.
DIRBASE_NUMBER(int, LANGUAGE_BASE_AND_TAG, 0);
DIRBASE_NUMBER(int, LANGUAGE_TAG, 1);
DIRBASE_NUMBER(int, LANGUAGE_BASE, 2);

DIRBASE_C_BEGIN

// Splits a name at its last ";". A name without a tag gives nothing.
//
//   base      takes a new text for the caller to free(), null when there is no tag; may be null in mode LANGUAGE_TAG
//             only
//   tag       may be null in mode LANGUAGE_BASE only. Else, with `allocate` 0, *tag is a buffer of language_tag_buffer
//             bytes, left alone when there is no tag; with `allocate` 1 *tag takes a new text for the caller to free(),
//             or null.
//
// Returns LDAP_SUCCESS; LDAP_OTHER for another mode or a null name; LDAP_INVALID_SYNTAX for a tag that is too long;
// LDAP_NO_MEMORY. After a failure nothing was given.
DIRBASE_EXPORT int parse_language_tags(const char* name, char** base, char** tag, int mode,
                                       int allocate DIRBASE_DEFAULT(0));

// The same into a buffer of language_tag_buffer bytes (may be null in mode LANGUAGE_BASE), which holds the empty text
// when there is no tag and after a failure. `tag_length`, unless null, takes the length of what it holds.
DIRBASE_EXPORT int parse_language_tags_with_buffer(const char* name, char** base, char* tag, size_t* tag_length,
                                                   int mode);

// Whether a tag is a language tag: "lang-", letters, and then perhaps parts of letters and digits, each behind one
// hyphen; 6 to 240 bytes. 1 or 0, also for null.
DIRBASE_EXPORT int is_valid_language_tag(const char* tag);

// Whether a name ends in such a tag. False for null.
DIRBASE_EXPORT bool contains_valid_language_tag(const char* name);

// The order of two tags: none (a null or empty text) is below all others.
DIRBASE_EXPORT int strtagcmp(const char* a, const char* b);

DIRBASE_C_END

#ifdef __cplusplus

// The tag at the end of a name, of any length and as it is written; null when there is none.
const char* find_language_tag(const char* name);

#endif
