// Arrays of texts, the library's plain form of a list of strings: pointers to text, ended by a null pointer.
//
// Array and texts are blocks of malloc. A null array is the empty list, except where a function says otherwise; an
// array without elements is one too. No array knows its room: each addition counts the elements and makes the array
// fit.
//
// Functions that add return LDAP_SUCCESS, or LDAP_NO_MEMORY when memory ran out, which is told to the debug log; array
// and arguments are then as they were. No text, and no place for an index, may be null. Nothing here locks: the caller
// serialises changes of an array.
#pragma once

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// Appends `text` itself: the array owns it from then on.
DIRBASE_EXPORT int charray_add(char*** array, char* text);

// Inserts `text` itself ahead of the first element that is greater, so that an array filled in this way is ordered: a
// shorter text comes first, texts of equal length are in the order of strcmp, equal ones in the order of arrival.
DIRBASE_EXPORT int charray_add_sorted_by_len(char*** array, char* text);

// Appends the texts of `other` (not null, another array) themselves. After a success the caller releases the array
// `other`, and only the array, with free().
DIRBASE_EXPORT int charray_merge(char*** array, char** other);

// Appends copies of the texts of `other` (not null), which stays the caller's.
DIRBASE_EXPORT int charray_merge_copy(char*** array, char** other);

// Releases the texts and the array.
DIRBASE_EXPORT void charray_free(char** array);

// Returns 1 when an element of `array` (not null) equals `text` by strcasecmp, else 0. `index` receives the index of
// the first such element, or the number of elements when there is none.
DIRBASE_EXPORT int charray_inlist(char** array, const char* text);
DIRBASE_EXPORT int charray_inlist_with_index(char** array, const char* text, int* index);

// Returns a copy of array and texts for the caller to release with charray_free; null when there is no element, and
// when memory ran out, which is not told.
DIRBASE_EXPORT char** charray_dup(char** array);

// Splits `text`, which is overwritten, at each run of the characters of `separators`.
//
// Returns copies of the parts, none of them empty, in a new array for the caller to release with charray_free. A text
// of separators only gives an array without elements. Null when memory ran out, which is not told.
DIRBASE_EXPORT char** str2charray(char* text, const char* separators);

DIRBASE_C_END
