// Instances of the server on this machine: see server_instance.h.
#include "servers/vrnd/libdirbase/base/server_instance.h"

#include <cerrno>

#include <sys/stat.h>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/heap.h"

const char* const dirSeparator = "/";
const char* const configFileName = "xanvrnd.conf";
const char* const instanceSeparator = "-";
const char* const instancePrefix = "instance";

namespace {

bool is_directory(const char* path, bool tell_errno)
{
    struct stat status = {};
    if (stat(path, &status) != 0) {
        const int error = errno;
        if (error == EACCES) {
            debug_trace("Permission denied\n");
        }
        if (tell_errno) {
            debug_trace("errno: %d\n", error);
        }
        return false;
    }
    if (!S_ISDIR(status.st_mode)) {
        debug_trace("isn't directory\n");
        return false;
    }
    return true;
}

bool is_regular_file(const char* path)
{
    struct stat status = {};
    if (stat(path, &status) != 0) {
        return false;
    }
    if (!S_ISREG(status.st_mode)) {
        debug_trace("isn't file\n");
        return false;
    }
    return true;
}

// The texts one behind the other; null, after telling it, when memory ran out.
heap_text joined(const char* a, const char* b, const char* c, const char* d = "")
{
    char* text = nullptr;
    if (vrn_asprintf(&text, "%s%s%s%s", a, b, c, d) < 0) {
        message_no_memory();
    }
    return heap_text(text);
}

}  // namespace

extern "C" {

bool doesInstanceExist(const char* name, const char* directory)
{
    if (name == nullptr || directory == nullptr || !is_directory(directory, false)) {
        return false;
    }
    const heap_text folder = joined(directory, instancePrefix, instanceSeparator, name);
    if (folder == nullptr || !is_directory(folder.get(), true)) {
        return false;
    }
    const heap_text file = joined(folder.get(), dirSeparator, configFileName);
    return file != nullptr && is_regular_file(file.get());
}

bool addServerInstance(const char*, const char*)
{
    return true;
}

bool removeServerInstance(const char*)
{
    return true;
}

char* getInstanceConfigFile(const char*)
{
    return nullptr;
}

char** getServerInstanceList(void)
{
    return nullptr;
}

char* getNewInstanceName(void)
{
    return nullptr;
}

char* getRegConfigFileInstance(const char*)
{
    return nullptr;
}

}  // extern "C"
