#pragma once

#include <cstddef>
#include <cstdio>
#include <cstdlib>

/// In debug and sanitizer builds, checks what a caller or an earlier phase guarantees; if it does not hold, prints the
/// condition and its location, and aborts. Other builds do not evaluate the condition. Meant for the entry of an
/// operation and between its phases, not for inner loops. A function that only assertions call is marked
/// [[maybe_unused]].
#ifdef MODELING_ASSERTIONS
#define MODELING_ASSERT(...)                                                                                           \
    ((__VA_ARGS__) ? static_cast<void>(0) : Modeling::Internal::assertionFailed(#__VA_ARGS__, __FILE__, __LINE__))
#else
#define MODELING_ASSERT(...) static_cast<void>(sizeof(!(__VA_ARGS__))) // names that only assertions use count as used
#endif

namespace Modeling {

namespace Internal {

    [[noreturn]] inline void assertionFailed(char const* condition, char const* file, int line)
    {
        std::fprintf(stderr, "%s:%d: assertion failed: %s\n", file, line, condition);
        std::abort();
    }

}

// Conditions that several operations assert.

inline bool isNonDecreasing(unsigned int const* values, std::size_t count)
{
    for (std::size_t i = 1; i < count; ++i) {
        if (values[i] < values[i - 1])
            return false;
    }
    return true;
}

/// Whether `offsets`, with one entry per element and a closing one, begins at 0, never decreases, and ends at `total`.
inline bool areOffsets(unsigned int const* offsets, std::size_t elementCount, std::size_t total)
{
    return offsets[0] == 0 && isNonDecreasing(offsets, elementCount + 1) && offsets[elementCount] == total;
}

inline bool areBelow(std::size_t limit, unsigned int const* values, std::size_t count)
{
    for (std::size_t i = 0; i < count; ++i) {
        if (values[i] >= limit)
            return false;
    }
    return true;
}

}
