#pragma once

#include <cstdint>

namespace Orvan::Internal {

struct UntypedTypeRep {
    std::uint32_t elementSize;
    std::uint32_t elementAlignment;

    void* allocate(std::uint64_t count) const;
    void deallocate(void* pointer, std::uint64_t count) const noexcept;
};

}
