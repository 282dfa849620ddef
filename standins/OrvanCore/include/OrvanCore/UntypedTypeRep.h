#pragma once

#include <OrvanCore/Export.h>

#include <cstdint>

namespace Orvan::Internal {

/// What an array knows of its elements at run time, and the allocator of their storage.
///
/// All operations may be called from any number of threads at once.
struct ORVANCORE_EXPORT UntypedTypeRep {
    std::uint32_t elementSize;
    std::uint32_t elementAlignment;

    /// Storage for `count` elements (not bytes), aligned for them and not initialised; null for no elements.
    /// Large blocks are aligned to huge pages and ask the system for them: fresh memory then costs about a third.
    /// \throws std::bad_alloc  when memory runs out or the byte count exceeds the address space
    void* allocate(std::uint64_t count) const;

    /// Gives back what `allocate` returned for the same count. Null is fine.
    void deallocate(void* pointer, std::uint64_t count) const noexcept;

    template <class T> static constexpr UntypedTypeRep of() noexcept
    {
        return {static_cast<std::uint32_t>(sizeof(T)), static_cast<std::uint32_t>(alignof(T))};
    }
};

}
