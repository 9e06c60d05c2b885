// The paths of log files that configuration entries name.
#pragma once

#include <stdbool.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// Whether two paths are given and equal, byte for byte: links and double slashes aren't looked through.
DIRBASE_EXPORT bool compareFileNames(const char* a, const char* b);

DIRBASE_C_END
