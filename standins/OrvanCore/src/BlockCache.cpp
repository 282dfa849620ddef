#include "BlockCache.h"

#include <algorithm>

namespace Orvan::Internal {

void BlockCache::shrink(std::size_t mostBytes, std::size_t mostBlocks, GivenUp& givenUp)
{
    std::size_t removed = 0;
    for (; bytes_ > mostBytes || count_ - removed > mostBlocks; ++removed) {
        bytes_ -= blocks_[removed].bytes;
        givenUp.blocks[givenUp.count++] = blocks_[removed];
    }
    std::copy(blocks_.begin() + removed, blocks_.begin() + count_, blocks_.begin());
    count_ -= removed;
}

void* BlockCache::take(std::size_t bytes, GivenUp& givenUp)
{
    std::unique_lock const lock(mutex_, std::try_to_lock);
    if (!lock)
        return nullptr;
    for (std::size_t i = count_; i-- != 0;)
        if (blocks_[i].bytes == bytes) {
            void* const address = blocks_[i].address;
            std::copy(blocks_.begin() + i + 1, blocks_.begin() + count_, blocks_.begin() + i);
            --count_;
            bytes_ -= bytes;
            inUse_ += bytes;
            return address;
        }
    std::size_t const inUse = inUse_ + bytes;
    shrink(std::max<std::size_t>(mostInUse_, inUse) - inUse, kMostBlocks, givenUp);
    return nullptr;
}

void BlockCache::countAllocated(std::size_t bytes)
{
    std::size_t const inUse = inUse_ += bytes;
    std::size_t most = mostInUse_;
    while (most < inUse && !mostInUse_.compare_exchange_weak(most, inUse)) { }
}

void BlockCache::add(Block const& block, GivenUp& givenUp)
{
    inUse_ -= block.bytes;
    std::unique_lock const lock(mutex_, std::try_to_lock);
    if (!lock || !mayKeep(block)) {
        givenUp.blocks[givenUp.count++] = block;
        return;
    }
    shrink(mostBytes_ - block.bytes, kMostBlocks - 1, givenUp);
    blocks_[count_++] = block;
    bytes_ += block.bytes;
}

void BlockCache::clear(GivenUp& givenUp)
{
    std::lock_guard const lock(mutex_);
    shrink(0, 0, givenUp);
}

}
