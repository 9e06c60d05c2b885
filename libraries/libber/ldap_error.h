// Result codes in words.
#pragma once

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// Returns the English text of a result code (libraries/libber/ldap_result.h), "Unknown error" for any other number. The
// text is constant and never null; any thread may ask.
DIRBASE_EXPORT const char* ldap_err2string(int code);

DIRBASE_C_END
