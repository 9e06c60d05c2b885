// Whether an entry in memory satisfies a filter.
//
// The evaluation has three kinds of result (RFC 4511 section 4.5.1.7 has the same three):
//
//     FILTER_TRUE    0    the entry satisfies the filter
//     FILTER_FALSE   -1   it doesn't
//     above 0             that can't be told: an LDAP result
//
// A NOT turns true and false and leaves results above 0; an AND or OR ends with the first of them that it meets.
//
// An assertion on a type without a language tag looks at every version of the attribute, one with a tag at that version
// only. Values are compared in normal form: those of the filter must have been normalised when it was parsed, those of
// the entry are normalised here, on copies. Entry and filter aren't changed.
//
// Any number of threads may test one entry and one filter at a time, without a lock, while nobody changes them and
// each holds the read side of the schema lock (ldcf_api_get_modify_attr_info_lock_g). The depth of a parsed filter
// (FILTER_MAX_DEPTH) is safe.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/entry.h"
#include "servers/vrnd/libdirbase/model/filter.h"

DIRBASE_NUMBER(int, FILTER_TRUE, 0);
DIRBASE_NUMBER(int, FILTER_FALSE, -1);

DIRBASE_C_BEGIN

// Evaluates a filter. The first call in a process asks for the environment variable OC_ALIAS: "YES" in any case has
// equality tests on objectclass take any name of a class, or its OID, for its first name. Without memory to read it the
// variable counts as not set.
//
// Results above 0: LDAP_OPERATIONS_ERROR for an unknown choice, a null argument, and where the attribute or a tree
// can't be searched; LDAP_FILTER_ERROR for a comparison that the attribute's syntax doesn't have; LDAP_NOT_SUPPORTED
// for a comparison of binary values; LDAP_NO_MEMORY.
DIRBASE_EXPORT int test_filter(const Entry* entry, const Filter* filter);

// The filters from `first` on along f_next, joined by LDAP_FILTER_AND or LDAP_FILTER_OR; a list without members is
// false. LDAP_OPERATIONS_ERROR for another choice.
DIRBASE_EXPORT int test_filter_list(const Entry* entry, const Filter* first, uint64_t choice);

// Equality or an ordering. Of an attribute encrypted two ways the decoded values count where there are any, of one
// encrypted one way the assertion is the password in the clear and only the first version is asked; orderings see the
// stored form of either. Where value_cmp can't compare, as with a bad time, the stored value counts as the greater one.
DIRBASE_EXPORT int test_ava_filter(const Entry* entry, const ava* assertion, uint64_t choice);

// FILTER_TRUE when the entry has a version of the attribute, else FILTER_FALSE, also for null arguments and without
// memory to look the name up.
DIRBASE_EXPORT int test_presence_filter(const Entry* entry, const char* type);

// Approximate match: the phonetic codes, from the first word on, are the same.
DIRBASE_EXPORT int test_approx_filter(const Entry* entry, const ava* assertion);

// Substrings: the pieces occur in their order without overlap, the initial one at the start and the final one at the
// end. Bytes are compared; a zero byte ends a value.
//
// LDAP_OPERATIONS_ERROR for a filter of another choice, and, with a line in the debug log, for pieces that exceed the
// pattern space of 1022 bytes: each is counted with one byte more for each of $ * + . [ \ ] ^ in it, and one for "^" or
// "$" or two for what lies between pieces, and must have room for twice its length and 2 before it is added. That is
// told of attributes that are there.
DIRBASE_EXPORT int test_substring_filter(const Entry* entry, const Filter* filter);

// Copies a text with a backslash in front of each of $ * + . [ \ ] ^, which have a meaning in patterns.
//
//   target  room for twice the length of `source`, and a zero byte
DIRBASE_EXPORT void strcpy_special(char* target, const char* source);

// The Soundex code of a text: a letter and three digits, "Z000" for a null text and one without ASCII letters. Vowels,
// H, W and Y part equal digits, and words behind the first one feed the code while it is short. A new text for the
// caller to free(); null without memory.
DIRBASE_EXPORT char* phonetic(const char* text);

// Words are runs of ASCII bytes that aren't white space, punctuation or digits. first_word finds the first one of a
// text, next_word the one behind the word at the position; null when there is none, and for null. word_dup copies the
// word at the position: a new text for the caller to free(), null for null and without memory.
DIRBASE_EXPORT const char* first_word(const char* text);
DIRBASE_EXPORT const char* next_word(const char* text);
DIRBASE_EXPORT char* word_dup(const char* text);

// Prepares the matching of patterns, once, before the first filter is tested. Matching keeps no state, so there is
// nothing to be made, and it may be left out.
DIRBASE_EXPORT void InitRegex(void);

DIRBASE_C_END
