// A process that is forked inherits the locks that other threads hold. Older address sanitizers of clang do not take the locks
// of their allocator before a fork, so that the new process could wait forever for a thread that only its parent has. This does
// it for them. Newer ones do it themselves, and would wait forever if it were done twice.

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
