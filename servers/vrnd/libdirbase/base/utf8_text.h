// UTF-8 and characters, and text folded to one case in place.
//
// The forms of one to three bytes are known, so characters up to U+FFFF. Forms of four bytes (RFC 3629 has them above
// U+FFFF) are refused: a folding stops at them. Overlong forms and surrogates, which RFC 3629 forbids, are let through.
//
// Everything here may be used from any thread, on texts that no other thread touches meanwhile.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// Reads the character at the start of a zero-terminated text.
//
//   character  takes the character; may be null when only the length is wanted. Left alone when the result isn't
//              positive.
//   text       may be null. Nothing behind the first byte that doesn't belong to the character is read.
//
// Returns the number of bytes that make the character, 1 to 3, with 1 for the terminator as for any byte below 0x80; 0
// when text is null; -1 for anything else: a stray continuation byte, a missing one, a first byte of 0xF0 and above.
DIRBASE_EXPORT int utf8towc(int32_t* character, const char* text);

// Writes a character from 0 to 0xFFFF as UTF-8, without a terminator; a number beyond that range gives no valid UTF-8.
//
//   target  takes up to three bytes; may be null, and nothing happens.
//
// Returns the number of bytes: 1 to 3, and 0 for a null target, and for character 0 although its zero byte is written.
DIRBASE_EXPORT int wctoutf8(char* target, int32_t character);

// Fold a zero-terminated text in place to the upper or the lower case of uni_case.h. The length stays, since no mapping
// changes the length of a character. An overlong form gets the proper one in its first bytes and keeps the others,
// so an overlong zero ends the text.
//
// Return 0, also for a null or empty text, or -1 at the first bytes that utf8towc refuses: the text in front of them is
// folded, the rest as it was. Callers take that as the end of the folding and not as an error of the text.
DIRBASE_EXPORT int utfToUpper(char* text);
DIRBASE_EXPORT int utfToLower(char* text);

DIRBASE_C_END
