// Memory of the foundation: see csgl_memory.h.
#include "servers/vrnd/libcsgl/csgl_memory.h"

#include <new>

#include "servers/vrnd/libcsgl/csgl_exception.h"

void csgl_throw_no_memory(const char* file, int line)
{
    throw exc_not_enough_memory_t(file, line, "not enough memory", 0);
}

void* csgl_allocate(std::size_t size, const char* file, int line)
{
    void* block = csgl_allocate_or_null(size);
    if (block == nullptr) {
        csgl_throw_no_memory(file, line);
    }
    return block;
}

void* csgl_allocate_or_null(std::size_t size) noexcept
{
    return ::operator new(size, std::nothrow);
}

void csgl_free(void* block) noexcept
{
    ::operator delete(block);
}
