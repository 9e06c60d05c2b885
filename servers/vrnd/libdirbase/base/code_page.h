// Texts between UTF-8, in which the server works, and the local code page, in which its administrator's files and
// terminal are. The local code page is the character set of the program's current locale.
//
// One conversion for each direction serves the whole process. They are opened once, before threads share them, by
// initIconvHandle; after that the translations may be called from any thread: they take turns on a conversion. Opening
// (which the first getline_and_xlate does too) and releasing may not meet a translation.
#pragma once

#include <stddef.h>
#include <stdint.h>
#include <stdio.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/ldap_iconv.h"

DIRBASE_C_BEGIN

// Whether lines that getline_and_xlate reads may need a translation; 0 at start, 1 on.
DIRBASE_EXPORT extern int32_t cfg_xlate;

// Name of the local code page; null until initIconvHandle has found it. The text belongs to this module.
DIRBASE_EXPORT extern const char* local_codepage;

// The two conversions; null until opened. They belong to this module.
DIRBASE_EXPORT extern ldap_iconv_t* iconv_handle_to_utf8;
DIRBASE_EXPORT extern ldap_iconv_t* iconv_handle_to_local;

// Turns cfg_xlate on.
DIRBASE_EXPORT void set_cfg_xlate_on(void);

// Finds the local code page and opens both conversions; nothing is done once local_codepage is set.
//
// Returns 0, or -1 after logging the reason when the platform doesn't tell the code page or offers no conversion for
// it. local_codepage stays null then, so that the next call tries again.
DIRBASE_EXPORT int initIconvHandle(void);

// Reads a line of a configuration file, as it stands there: nothing is translated.
//
//   buffer  at least 1024 bytes; takes the line with its line feed and a terminator. A longer line comes in pieces.
//   file    open for reading.
//
// Returns 0, or -1 at the end of the file or when it can't be read. While cfg_xlate is on, the first call makes sure
// that the conversion to UTF-8 can be had: -1 after logging the reason when it can't, with nothing read.
DIRBASE_EXPORT int getline_and_xlate(char* buffer, FILE* file);

// Translate a zero-terminated text, terminator included. initIconvHandle comes first.
//
//   input   may be null: 0, and no text.
//   output  takes a new text for the caller to free(), or null when there is none.
//   length  takes the number of bytes of the new text, its terminator included, or 0 when there is none.
//
// Return LDAP_SUCCESS; LDAP_NO_MEMORY; or -1 after logging it, when the input is not a text of its code page, holds a
// character that the other one lacks, or grows to more than three times its size.
DIRBASE_EXPORT int xlate_localcp_to_utf8(const char* input, char** output, size_t* length);
DIRBASE_EXPORT int xlate_utf8_to_localcp(const char* input, char** output, size_t* length);

// Closes the conversion to UTF-8 and forgets the local code page, so that the next initIconvHandle opens both
// conversions afresh. The conversion to the local code page goes on working until that call, which closes it.
DIRBASE_EXPORT void free_iconv_handle(void);

DIRBASE_C_END
