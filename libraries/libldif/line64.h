// Lines of LDIF (RFC 2849): "type: value", "type:: Base64" and "type:< URL", long lines folded.
//
// A text is read in place. The line reader overwrites a fold (a line feed and the white space behind it) by two
// markers, bytes of value 1, so the text keeps its length; the parser drops markers. A marker is never part of a value.
// Lines end in a line feed alone. A carriage return in front of it belongs to the line, and a line of nothing but one
// continues the line before it: whoever reads texts with CR LF takes the carriage returns out first.
//
// Lines are written into room of the caller's, or into new texts. The column limit is 76: a line whose next character
// would stand in column 77 is broken by a line feed and a space, and that character counts as column 1 again. Types are
// never broken. A value is written as it is when all its bytes are safe: 0x02 to 0x7E but for line feed and carriage
// return, and no space, ":" or "<" at the start. Any other goes in Base64 (RFC 4648 section 4).
//
// Everything works on the caller's buffers alone, so any number of threads may call on buffers of their own.
#pragma once

#include <stddef.h>

#include "libraries/dirbase_export.h"

// Modes of the parser.
DIRBASE_NUMBER(int, LDIF_MODE_ENTRY, -1);    // one space behind the mark is passed over, others belong to the value
DIRBASE_NUMBER(int, LDIF_MODE_TOLERANT, 0);  // all spaces behind the mark are passed over
DIRBASE_NUMBER(int, LDIF_MODE_TRIMMED, 1);   // white space at the end is cut off, too

// What the parser gives.
DIRBASE_NUMBER(int, LDIF_LINE_OK, 0);
DIRBASE_NUMBER(int, LDIF_LINE_BAD, -1);    // no ":", or bad Base64
DIRBASE_NUMBER(int, LDIF_LINE_EMPTY, -2);  // no value

// Marks the place of a fold, twice.
DIRBASE_NUMBER(char, ldif_fold_marker, '\x01');

DIRBASE_C_BEGIN

// ---- reading --------------------------------------------------------------------------------------------------------

// Takes the next line off a text, with the lines that continue it.
//
//   next  *next is the position in a zero-terminated text; moves behind the line, and becomes null with the last line
//         when no line feed ends it
//
// Returns the line, zero-terminated in the text; null at the end of the text, on an empty line (the position stays) and
// for a null position.
DIRBASE_EXPORT char* str_getline(char** next);

// Removes the markers from a text in place and adds their number to *removed, unless that is null. Returns the text.
DIRBASE_EXPORT char* str_remove_continued_line_marker(char* text, int* removed);

// Splits a line into type and value, in place. Marks and blanks are looked for where they stand, before folds are taken
// out of type and value: a blank behind a fold belongs to the value.
//
//   type       takes the type, without white space in front of it and spaces behind it; null for a line without ":"
//   value      takes the value, in the line and zero-terminated; a decoded one may hold zero bytes
//   length     takes its length in bytes
//   mode       one of LDIF_MODE_
//   is_url     unless null takes 1 for a line with ":<", whose value is the URL, else 0
//   is_base64  unless null takes 1 for a line with "::", else 0
//
// Returns LDIF_LINE_OK; LDIF_LINE_EMPTY for a line without Base64 and without a value, with value the empty text; or
// LDIF_LINE_BAD, also for a null line, with length 0 and value null (for bad Base64 there is a type). The line is
// changed in any case. The second form does without is_base64.
DIRBASE_EXPORT int str_parse_line_v_or_bv(char* line, char** type, char** value, size_t* length, int mode, int* is_url,
                                          int* is_base64);
DIRBASE_EXPORT int str_parse_line(char* line, char** type, char** value, size_t* length, int mode, int* is_url);

// Decodes Base64 up to the first zero byte, line feed or "=".
//
//   target  takes the bytes and a zero byte behind them; room for the source with its end suffices. May be the source.
//   length  takes the number of bytes, without that zero byte
//
// Returns 0; LDAP_DECODING_ERROR with length 0 when one of the first three characters of a group of four isn't of the
// alphabet, or a group is cut by anything but "=" (the fourth isn't tested: one outside the alphabet counts as "A"; nor
// is what stands behind the first "="); -1 for a null argument.
DIRBASE_EXPORT int base64decode(char* target, const char* source, size_t* length);

// ---- writing --------------------------------------------------------------------------------------------------------

// The room that one line takes at most, in bytes and without a terminator: with Base64, folds and the line feed.
DIRBASE_EXPORT size_t ldif_line_room(size_t type_length, size_t value_length);

// Writes one line with its line feed, without a terminator.
//
//   out     the position, which moves behind the line; there must be room for ldif_line_room bytes
//   type    up to its first ":"
//   value   of `length` bytes; may be null when that is 0
DIRBASE_EXPORT void put_type_and_value(char** out, const char* type, const char* value, size_t length);

// The same for a value in two forms.
//
//   value   the text form, zero-terminated, at most `length` bytes of it; null for none
//   flag    has no effect
//   bvalue  the value's `length` bytes. Null: `value` is written as above. The same pointer as `value`: it goes in
//           Base64, whatever its bytes. Else it goes in Base64 when it isn't safe; when it is, `value` is written, or
//           without one `bvalue`.
DIRBASE_EXPORT void put_type_and_value_or_bvalue(char** out, const char* type, const char* value, int flag,
                                                 const char* bvalue, size_t length);

// The same into a new text, zero-terminated, for the caller to free(); null for a null type and without memory.
DIRBASE_EXPORT char* ldif_type_and_value(const char* type, const char* value, size_t length);
DIRBASE_EXPORT char* ldif_type_and_value_or_bvalue(const char* type, const char* value, int flag, const char* bvalue,
                                                   size_t length);

// Encodes the bytes from start up to stop.
//
//   out     the position, which moves behind the text; there must be room for 4 bytes for each 3 begun, and for 2 at
//           each fold
//   column  of the first character, counted from 1; -1 for no folds
//
// Returns 0, or -1 for a null argument.
DIRBASE_EXPORT int base64encode(char** out, const char* start, const char* stop, int column);

DIRBASE_C_END
