// The paths of log files that configuration entries name: see log_file_check.h.
#include "servers/vrnd/libdirbase/model/log_file_check.h"

#include <cstring>

extern "C" {

bool compareFileNames(const char* a, const char* b)
{
    return a != nullptr && b != nullptr && std::strcmp(a, b) == 0;
}

}  // extern "C"
