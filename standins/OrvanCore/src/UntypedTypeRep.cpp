#include <OrvanCore/UntypedTypeRep.h>

#include "BlockCache.h"
#include <OrvanCore/CachedBlocks.h>

#include <algorithm>
#include <bit>
#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <limits>
#include <new>

#include <sys/mman.h>

namespace Orvan {

namespace Internal {

    namespace {

        constexpr std::size_t kHugePage = std::size_t{1} << 21;
        constexpr auto kHugeAlignment = static_cast<std::align_val_t>(kHugePage);
        // For smaller blocks, aligning to huge pages costs more than it gains.
        constexpr std::size_t kHugeBlock = 2 * kHugePage;

        constexpr bool kMayCache = !MODELING_IS_SANITIZED; // reused blocks would hide errors

        constexpr std::size_t kDefaultMebibytes = 256;

        std::size_t mostCachedBytes()
        {
            char const* const mebibytes = std::getenv("ORVAN_CACHED_MEBIBYTES");
            std::size_t const most = mebibytes ? std::strtoull(mebibytes, nullptr, 10) : kDefaultMebibytes;
            return kMayCache ? std::min<std::size_t>(most, std::size_t{1} << 40) << 20 : 0;
        }

        void freeBlocks(BlockCache::GivenUp const& givenUp)
        {
            for (std::size_t i = 0; i != givenUp.count; ++i)
                ::operator delete(givenUp.blocks[i].address, kHugeAlignment);
        }

        /// The only cache. Never destroyed: arrays of other static objects may be freed after it was closed.
        BlockCache& cache()
        {
            alignas(BlockCache) static std::byte storage[sizeof(BlockCache)];
            static BlockCache* const instance = ::new (storage) BlockCache(mostCachedBytes());
            return *instance;
        }

        struct CloseAtExit {
            CloseAtExit() { cache(); }
            ~CloseAtExit()
            {
                BlockCache::GivenUp givenUp;
                cache().close(givenUp);
                freeBlocks(givenUp);
            }
        } closeAtExit;

        std::size_t byteCount(UntypedTypeRep const& rep, std::uint64_t count)
        {
            constexpr std::uint64_t kMaxBytes = std::numeric_limits<std::ptrdiff_t>::max();
            if (rep.elementSize != 0 && count > kMaxBytes / rep.elementSize)
                throw std::bad_alloc();
            return static_cast<std::size_t>(count * rep.elementSize);
        }

        bool isHuge(UntypedTypeRep const& rep, std::size_t bytes)
        {
            return bytes >= kHugeBlock && rep.elementAlignment <= kHugePage;
        }

        /// Rounds up to one of at most eight sizes per power of two, so that blocks of similar size replace each other, or
        /// to huge pages if the block is too large to be kept by default.
        std::size_t sizeOfHugeBlock(std::size_t bytes)
        {
            bool const isKept = bytes <= kDefaultMebibytes << 20;
            std::size_t const step = isKept ? std::max(kHugePage, std::bit_floor(bytes) / 8) : kHugePage;
            return (bytes + step - 1) / step * step;
        }

        void* allocateHuge(std::size_t bytes)
        {
            BlockCache::GivenUp givenUp;
            void* block = cache().take(bytes, givenUp);
            freeBlocks(givenUp);
            if (block)
                return block;
            block = ::operator new(bytes, kHugeAlignment, std::nothrow);
            if (!block) {
                releaseCachedBlocks();
                block = ::operator new(bytes, kHugeAlignment, std::nothrow);
            }
            if (!block)
                throw std::bad_alloc();
            cache().countAllocated(bytes);
            int const savedErrno = errno;
            ::madvise(block, bytes, MADV_HUGEPAGE); // advice only: if it is refused, small pages are used
            errno = savedErrno;
            return block;
        }

        std::align_val_t blockAlignment(UntypedTypeRep const& rep, std::size_t bytes)
        {
            constexpr std::size_t kCacheLine = 64; // less false sharing between threads that write different arrays
            std::size_t const minimum = bytes >= 4096 ? kCacheLine : alignof(std::max_align_t);
            return std::align_val_t{std::max<std::size_t>(rep.elementAlignment, minimum)};
        }

    }

    void* UntypedTypeRep::allocate(std::uint64_t count) const
    {
        std::size_t const bytes = byteCount(*this, count);
        if (bytes == 0)
            return nullptr;
        if (isHuge(*this, bytes))
            return allocateHuge(sizeOfHugeBlock(bytes));
        return ::operator new(bytes, blockAlignment(*this, bytes));
    }

    void UntypedTypeRep::deallocate(void* pointer, std::uint64_t count) const noexcept
    {
        if (!pointer)
            return;
        std::size_t const bytes = static_cast<std::size_t>(count * elementSize);
        if (!isHuge(*this, bytes)) {
            ::operator delete(pointer, blockAlignment(*this, bytes));
            return;
        }
        BlockCache::Block const block{pointer, sizeOfHugeBlock(bytes)};
        if (cache().mayKeep(block)) {
            int const savedErrno = errno;
            ::madvise(pointer, block.bytes, MADV_FREE); // the system may take the memory if it runs short
            errno = savedErrno;
        }
        BlockCache::GivenUp givenUp;
        cache().add(block, givenUp);
        freeBlocks(givenUp);
    }

}

void releaseCachedBlocks() noexcept
{
    Internal::BlockCache::GivenUp givenUp;
    Internal::cache().clear(givenUp);
    Internal::freeBlocks(givenUp);
}

}
