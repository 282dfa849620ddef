#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <mutex>

namespace Orvan::Internal {

/// Freed blocks of memory that are kept to be allocated again: addresses and sizes only. The caller frees what the cache
/// gives up.
///
/// Any number of threads may use it at once, and none of them waits: while another thread uses the cache, nothing is
/// found and nothing is kept. So a process that is forked in between can go on.
class BlockCache {
public:
    struct Block {
        void* address = nullptr;
        std::size_t bytes = 0;
    };
    static constexpr std::size_t kMostBlocks = 32;
    /// Blocks to be freed, the first `count`.
    struct GivenUp {
        std::array<Block, kMostBlocks + 1> blocks;
        std::size_t count = 0;
    };

    explicit constexpr BlockCache(std::size_t mostBytes)
        : mostBytes_(mostBytes)
    {
    }

    /// Removes the block of exactly that size that was added last. Null if there is none: then the caller is going to
    /// allocate one, and blocks are given up, the oldest first, until all that is allocated does not exceed the most that
    /// has been in use at one time.
    void* take(std::size_t bytes, GivenUp& givenUp);

    /// Tells that the caller has allocated a block.
    void countAllocated(std::size_t bytes);

    /// False if the block is larger than the limit.
    bool mayKeep(Block const& block) const { return block.bytes <= mostBytes_; }

    /// Adds a block that is no longer in use, and gives up the oldest ones beyond the limit, or the block itself.
    void add(Block const& block, GivenUp& givenUp);

    /// Gives up all blocks.
    void clear(GivenUp& givenUp);

    /// Gives up all blocks, and every block that is added later.
    void close(GivenUp& givenUp)
    {
        mostBytes_ = 0;
        clear(givenUp);
    }

private:
    void shrink(std::size_t mostBytes, std::size_t mostBlocks, GivenUp& givenUp);

    std::mutex mutex_;
    std::array<Block, kMostBlocks> blocks_{}; // the oldest first
    std::size_t count_ = 0;
    std::size_t bytes_ = 0; // of all of them
    std::atomic<std::size_t> mostBytes_;
    std::atomic<std::size_t> inUse_ = 0; // bytes of blocks outside of the cache
    std::atomic<std::size_t> mostInUse_ = 0;
};

}
