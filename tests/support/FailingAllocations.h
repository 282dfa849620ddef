#pragma once

#include <TessaraObject/Object.h>

#include <cstdint>
#include <functional>

namespace TestSupport {

// Programs that link this take memory through replaced `operator new`, which can be told to fail.

/// Runs an action; false where it ended in `std::bad_alloc`. Other exceptions pass through.
using Attempt = std::function<bool(std::function<void()> const& action)>;

/// Calls `trial` again and again. Inside the action that the trial hands to its attempt, the n-th allocation fails:
/// once, and in a second trial all from then on; for n = 1, 2, 3 and so on, until the action succeeds. The trial makes
/// its inputs and checks what the action left of them; afterwards, nothing it took may still be taken.
void sweepFailingAllocations(std::function<void(Attempt const&)> const& trial);

/// While one lives, no allocation succeeds on any thread, not those of oneTBB either.
struct ExhaustedMemory {
    ExhaustedMemory();
    ~ExhaustedMemory();
};

/// Runs an action, and `meanwhile` inside its allocation of that number.
/// \return false if the action has fewer allocations
bool runDuringAllocation(
    std::int64_t number, std::function<void()> const& meanwhile, std::function<void()> const& action);

/// Edits copies of an object while allocations fail: each is then as it was, or edited as a whole. Copies share what
/// they hold with the source, which stays as it is, or have it to themselves.
void expectAllOrNothing(Tessara::Object const& source, std::function<void(Tessara::Object&)> const& edit);

}
