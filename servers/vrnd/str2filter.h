// Filters from text (RFC 4515), for configuration, replication filters, referral rules and plug-ins.
//
// Of that grammar extensible match is not offered: "cn:=a" is equality on a type "cn:". Elsewhere this reader asks for
// less than the grammar does: a filter without elements needs no parentheses around it, text behind a closing
// parenthesis is passed over, a list may be empty and a NOT may have several elements (the first of which counts),
// white space may stand in front of the elements of a list. "&", "|" and "!" are read inside parentheses only: without
// them, or with a blank in front of the first one, all up to the "=" is taken for a type. There are no blanks around
// "=". The backslash with two hexadecimal digits stands for
// a byte in values that are compared whole; in the pieces of a substring filter it stands for itself.
//
//   normalize  not 0: types and values are normalised by the schema, and there is no filter for an attribute that it
//              doesn't know, but for presence and substrings. A value that its syntax refuses, or that there was no
//              memory for, stays as it is written. The caller holds the read side of the schema lock then.
//              0: types and values stay as they are written, but for the types of presence filters, which
//              attr_normalize puts in their plain form.
//
// Filters are nested FILTER_MAX_DEPTH levels deep at most; a deeper one gives null. Results are new, for filter_free;
// null means that the text isn't a filter, or that memory ran out. Texts are read only. Every function may be called
// from any thread.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/filter.h"

DIRBASE_C_BEGIN

// Parses a filter; null also for a null or empty text.
DIRBASE_EXPORT Filter* str2filter(const char* text, int normalize);

// Parses the elements of a list, which is what stands behind "&", "|" or "!", and makes the filter of this choice
// (LDAP_FILTER_AND, LDAP_FILTER_OR, LDAP_FILTER_NOT).
DIRBASE_EXPORT Filter* str2list(const char* text, uint64_t choice, int normalize);

// Parses what stands between the parentheses of a filter without elements, such as "cn=a*".
DIRBASE_EXPORT Filter* str2simple(const char* text, int normalize);

// Puts the pieces of a text, which "*" parts, into a substring filter. What stands in front of the first "*" becomes
// the initial piece even when it is empty, what stands behind the last one the final piece unless it is empty.
//
//   text    not null
//   filter  not null, and its pieces are null
//   syntax  syntax code of the attribute; with `normalize` the pieces are normalised by it as far as that can be done
//
// Returns LDAP_SUCCESS, or LDAP_NO_MEMORY with what was made before in the filter.
DIRBASE_EXPORT int str2subvals(const char* text, Filter* filter, uint32_t syntax, int normalize);

// The parenthesis that closes the one which the text begins with, or null. A text that begins with neither parenthesis
// gives its first character; for one that begins with a closing parenthesis the answer has no use. A backslash hides
// the character behind it.
DIRBASE_EXPORT const char* find_matching_paren(const char* text);

// Replaces a backslash and two hexadecimal digits by their byte, and a backslash and one by a byte of its value; any
// other backslash stays. A new text for the caller to free(); null without memory and for null. A byte 0 ends it for a
// reader that goes by the terminator.
DIRBASE_EXPORT char* unescape_value(const char* text);

DIRBASE_C_END
