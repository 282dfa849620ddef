#include <OrvanCore/UntypedTypeRep.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <limits>
#include <new>

#include <sys/mman.h>

namespace Orvan::Internal {

namespace {

    constexpr std::size_t kHugePage = std::size_t{1} << 21;
    // For smaller blocks, aligning to huge pages costs more than it gains.
    constexpr std::size_t kHugeBlock = 2 * kHugePage;

    std::size_t byteCount(UntypedTypeRep const& rep, std::uint64_t count)
    {
        constexpr std::uint64_t kMaxBytes = std::numeric_limits<std::ptrdiff_t>::max();
        if (rep.elementSize != 0 && count > kMaxBytes / rep.elementSize)
            throw std::bad_alloc();
        return static_cast<std::size_t>(count * rep.elementSize);
    }

    std::align_val_t blockAlignment(UntypedTypeRep const& rep, std::size_t bytes)
    {
        constexpr std::size_t kCacheLine = 64; // less false sharing between threads that write different arrays
        std::size_t const minimum = bytes >= kHugeBlock ? kHugePage
            : bytes >= 4096                             ? kCacheLine
                                                        : alignof(std::max_align_t);
        return std::align_val_t{std::max<std::size_t>(rep.elementAlignment, minimum)};
    }

}

void* UntypedTypeRep::allocate(std::uint64_t count) const
{
    std::size_t const bytes = byteCount(*this, count);
    if (bytes == 0)
        return nullptr;
    void* const block = ::operator new(bytes, blockAlignment(*this, bytes));
    if (bytes >= kHugeBlock) {
        int const savedErrno = errno;
        ::madvise(block, bytes, MADV_HUGEPAGE); // advice only: if it is refused, small pages are used
        errno = savedErrno;
    }
    return block;
}

void UntypedTypeRep::deallocate(void* pointer, std::uint64_t count) const noexcept
{
    if (!pointer)
        return;
    std::size_t const bytes = static_cast<std::size_t>(count * elementSize);
    ::operator delete(pointer, blockAlignment(*this, bytes));
}

}
