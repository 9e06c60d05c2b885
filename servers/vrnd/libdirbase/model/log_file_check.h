// The paths of log files that configuration entries name.
#pragma once

#include "libraries/dirbase_export.h"

extern "C" {

// Whether two paths are given and equal, byte for byte: links and double slashes aren't looked through.
DIRBASE_EXPORT bool compareFileNames(const char* a, const char* b);

}  // extern "C"
