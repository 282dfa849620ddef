#pragma once

#include <TessaraObject/Object.h>

#include <atomic>
#include <functional>

namespace TestSupport {

// Programs that link this allocate through a replaced `operator new`, and create threads through a replaced
// `pthread_create`. Both can be made to fail.

/// Runs an action, which throws nothing but `std::bad_alloc`; false if it did.
using Attempt = std::function<bool(std::function<void()> const& action)>;

/// Calls `trial` repeatedly. Inside the action that the trial passes to its attempt, the n-th allocation fails, for
/// n = 1, 2, 3 and so on, until the action succeeds: first that allocation alone, then all from it on. The trial makes
/// its inputs and checks what the action left of them; blocks that are still allocated after the trial are reported as
/// leaks.
void sweepFailingAllocations(std::function<void(Attempt const&)> const& trial);

/// While one is alive, all allocations fail on all threads, those of oneTBB too.
struct ExhaustedMemory {
    static inline std::atomic<bool> isAlive = false;
    ExhaustedMemory() { isAlive = true; }
    ~ExhaustedMemory() { isAlive = false; }
};

/// While one is alive, the thread that made it cannot create threads.
struct NoNewThreads {
    static inline thread_local bool isAlive = false;
    NoNewThreads() { isAlive = true; }
    ~NoNewThreads() { isAlive = false; }
};

/// Edits copies of an object while allocations fail: each copy is then either edited completely or unchanged. Some
/// copies share their contents with the source, which must not change; others own them. If `mayGrow` names a float3
/// point property, that may be longer than before.
void expectAllOrNothing(
    Tessara::Object const& source, std::function<void(Tessara::Object&)> const& edit, char const* mayGrow = nullptr);

}
