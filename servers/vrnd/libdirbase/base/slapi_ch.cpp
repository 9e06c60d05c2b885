// The allocation and comparison services of plug-ins.
#include "servers/vrnd/libdirbase/base/slapi_ch.h"

#include <cstdlib>
#include <cstring>

extern "C" {

void* slapi_ch_malloc(std::size_t size)
{
    return std::malloc(size);
}

void* slapi_ch_calloc(std::size_t count, std::size_t size)
{
    return std::calloc(count, size);
}

void* slapi_ch_realloc(void* block, std::size_t size)
{
    return std::realloc(block, size);
}

void slapi_ch_free(void* block)
{
    std::free(block);
}

char* slapi_ch_strdup(const char* text)
{
    if (text == nullptr)
        return nullptr;
    const std::size_t size = std::strlen(text) + 1;
    auto* copy = static_cast<char*>(std::malloc(size));
    if (copy != nullptr)
        std::memcpy(copy, text, size);
    return copy;
}

int slapi_ch_strcmp(const char* a, const char* b)
{
    return std::strcmp(a, b);
}

int slapi_ch_strncmp(const char* a, const char* b, std::size_t length)
{
    return std::strncmp(a, b, length);
}

}  // extern "C"
