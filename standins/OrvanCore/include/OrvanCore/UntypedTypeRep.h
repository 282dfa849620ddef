#pragma once

#include <OrvanCore/Export.h>

#include <cstdint>

namespace Orvan::Internal {

/// The size and alignment of an array's elements at run time, and the allocator of their storage.
///
/// All operations may be called from any number of threads at once.
struct ORVANCORE_EXPORT UntypedTypeRep {
    std::uint32_t elementSize;
    std::uint32_t elementAlignment;

    /// Allocates aligned, uninitialized storage for `count` elements (not bytes); null if there are none.
    /// Blocks of 4 MiB or more are aligned for huge pages and request them, which cuts the cost of first touching the
    /// memory to about a third.
    /// \throws std::bad_alloc  also if the byte count exceeds PTRDIFF_MAX
    void* allocate(std::uint64_t count) const;

    /// Frees what `allocate` returned for the same count, or keeps it (CachedBlocks.h). Does nothing for null.
    void deallocate(void* pointer, std::uint64_t count) const noexcept;

    template <class T> static constexpr UntypedTypeRep of() noexcept
    {
        return {static_cast<std::uint32_t>(sizeof(T)), static_cast<std::uint32_t>(alignof(T))};
    }
};

}
