#include "FailingThreads.h"

#include <cerrno>

#include <dlfcn.h>
#include <pthread.h>

namespace TestSupport {

namespace {

    thread_local bool mayCreateThreads = true;

}

NoNewThreads::NoNewThreads()
{
    mayCreateThreads = false;
}

NoNewThreads::~NoNewThreads()
{
    mayCreateThreads = true;
}

}

// Replaces the system's function in the whole program.
extern "C" int pthread_create(
    pthread_t* thread, pthread_attr_t const* attributes, void* (*routine)(void*), void* argument) noexcept
{
    if (!TestSupport::mayCreateThreads)
        return EAGAIN;
    static auto const create = reinterpret_cast<decltype(&pthread_create)>(dlsym(RTLD_NEXT, "pthread_create"));
    return create(thread, attributes, routine, argument);
}
