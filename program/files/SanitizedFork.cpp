// A process that is forked inherits the locks that other threads hold. The address sanitizer of clang takes the locks of its
// allocator before forks from version 19 on; with those before it, a new process could wait forever for a thread that only
// its parent has. So this does what the later ones do.

#include <pthread.h>

namespace __sanitizer {
void StackDepotLockAll();
void StackDepotUnlockAll();
}

namespace __asan {
void asan_mz_force_lock();
void asan_mz_force_unlock();
}

namespace {

void lock()
{
    __asan::asan_mz_force_lock();
    __sanitizer::StackDepotLockAll();
}

void unlock()
{
    __sanitizer::StackDepotUnlockAll();
    __asan::asan_mz_force_unlock();
}

[[maybe_unused]] int const isRegistered = ::pthread_atfork(lock, unlock, unlock);

}
