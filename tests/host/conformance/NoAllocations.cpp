#include "NoAllocations.h"

#include <cstdlib>
#include <new>

namespace {

thread_local bool isForbidden = false;

}

HostTests::NoAllocations::NoAllocations()
{
    isForbidden = true;
}

HostTests::NoAllocations::~NoAllocations()
{
    isForbidden = false;
}

void* operator new(std::size_t bytes)
{
    void* const block = isForbidden ? nullptr : std::malloc(bytes == 0 ? 1 : bytes);
    if (!block)
        throw std::bad_alloc();
    return block;
}

// Not inlined, because compilers then warn that a pointer from `new` is passed to `free`.
[[gnu::noinline]] void operator delete(void* block) noexcept
{
    std::free(block);
}

[[gnu::noinline]] void operator delete(void* block, std::size_t) noexcept
{
    std::free(block);
}
