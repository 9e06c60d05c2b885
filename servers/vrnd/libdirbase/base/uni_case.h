// Upper and lower case of the 16-bit range of Unicode, by constant tables and without a library.
//
// Directory text is stored and compared in the case that these tables give, so they are fixed: they hold the simple
// case mappings of the Unicode Character Database as far as the first servers knew them, not those of the newest
// version. Two properties are kept on purpose. A mapping never changes the number of bytes of a character's UTF-8 form
// (RFC 3629), so text can be folded in place; and the mapped character is at most 128 away, so an entry is a signed
// byte.
//
// Latin to U+01FF is in one table; Greek, Cyrillic, the extensions of Latin and Greek, and full-width Latin are in
// ranges. Every other character maps to itself, Armenian and Georgian among them. The tables are made by
// make_uni_case_tables.py.
//
// Everything here may be used from any thread.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"

// A run of characters with mappings.
typedef struct UniCaseRange UniCaseRange;
struct UniCaseRange {
    int32_t first;        // first character of the run; 0 ends a list of ranges
    int32_t last;         // last character of the run
    const int8_t* table;  // [character - first]: mapped character minus character, 0 without a mapping
};

DIRBASE_C_BEGIN

// The mappings of U+0000 to U+01FF: mapped character minus character, 0 without a mapping.
DIRBASE_EXPORT extern const int8_t UniUpperTable[512];
DIRBASE_EXPORT extern const int8_t UniLowerTable[512];

// The mappings from U+0200: five ranges in rising order, and one whose first character is 0.
DIRBASE_EXPORT extern const UniCaseRange UniUpperRange[6];
DIRBASE_EXPORT extern const UniCaseRange UniLowerRange[6];

// The upper case, or the lower case, of a character. What has no mapping comes back as it is, numbers that are no
// character (negative ones, those above U+FFFF) included.
DIRBASE_EXPORT int32_t UniToupper(int32_t character);
DIRBASE_EXPORT int32_t UniTolower(int32_t character);

// Map a zero-terminated array of characters in place, and return it. Null is returned for null.
DIRBASE_EXPORT int32_t* UniStrupr(int32_t* text);
DIRBASE_EXPORT int32_t* UniStrlwr(int32_t* text);

DIRBASE_C_END
