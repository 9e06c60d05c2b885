// Syntax codes: how a value is held and compared. Every attribute carries one; see also RFC 4517.
#pragma once

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// The bits. A value whose code has one of the two lowest is held as text.
DIRBASE_NUMBER(unsigned, SC_CIS, 0x001);             // text, compared without regard to case
DIRBASE_NUMBER(unsigned, SC_CES, 0x002);             // text, compared exactly
DIRBASE_NUMBER(unsigned, SC_BIN, 0x004);             // bytes
DIRBASE_NUMBER(unsigned, SC_TEL, 0x008);             // number to dial; with SC_CIS
DIRBASE_NUMBER(unsigned, SC_DN, 0x010);              // distinguished name; with SC_CIS
DIRBASE_NUMBER(unsigned, SC_INT, 0x020);             // integer
DIRBASE_NUMBER(unsigned, SC_BOOL, 0x040);            // boolean
DIRBASE_NUMBER(unsigned, SC_GT, 0x080);              // generalized time
DIRBASE_NUMBER(unsigned, SC_UTCT, 0x100);            // UTC time
DIRBASE_NUMBER(unsigned, SC_BIT_STRING, 0x200);      // with SC_CIS
DIRBASE_NUMBER(unsigned, SC_NUMERIC_STRING, 0x400);  // with SC_CIS
DIRBASE_NUMBER(unsigned, SC_COUNTRY_STRING, 0x800);  // with SC_CIS

DIRBASE_C_END
