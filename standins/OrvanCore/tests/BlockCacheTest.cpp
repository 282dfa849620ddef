#include "../src/BlockCache.h"

#include "support/AllocationHooks.h"
#include "support/Testing.h"

#include <OrvanCore/CachedBlocks.h>

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <thread>

using Orvan::Internal::BlockCache;
using Orvan::Internal::UntypedTypeRep;
using TestSupport::memoryOf;

namespace {

constexpr bool kKeepsBlocks = !MODELING_IS_SANITIZED;

constexpr std::uint64_t kMebibyte = 1 << 20;
constexpr auto kBytes = UntypedTypeRep::of<char>();

/// Addresses that nobody reads.
BlockCache::Block block(std::uintptr_t address, std::size_t bytes)
{
    return {reinterpret_cast<void*>(address), bytes};
}

/// What a step gives up, as addresses.
std::vector<std::uintptr_t> givenUpBy(std::function<void(BlockCache::GivenUp&)> const& step)
{
    BlockCache::GivenUp givenUp;
    step(givenUp);
    std::vector<std::uintptr_t> addresses;
    for (std::size_t i = 0; i != givenUp.count; ++i)
        addresses.push_back(reinterpret_cast<std::uintptr_t>(givenUp.blocks[i].address));
    return addresses;
}

using Addresses = std::vector<std::uintptr_t>;

}

TEST(BlockCache, FindsBlocksOfTheSameSizeAndGivesUpTheOldest)
{
    BlockCache cache(100);
    BlockCache::GivenUp none;
    for (std::size_t const bytes : {40u, 40u, 30u, 200u, 20u})
        cache.countAllocated(bytes);
    auto const add = [&](std::uintptr_t address, std::size_t bytes) {
        return givenUpBy([&](auto& givenUp) { cache.add(block(address, bytes), givenUp); });
    };
    EXPECT_EQ(add(1, 40), Addresses{});
    EXPECT_EQ(add(2, 40), Addresses{});
    EXPECT_EQ(add(3, 200), Addresses{3}) << "larger than the limit";
    EXPECT_EQ(cache.take(40, none), block(2, 0).address) << "the newest, which is in the processor's cache";
    EXPECT_EQ(add(2, 40), Addresses{});
    EXPECT_EQ(add(4, 30), Addresses{1});
    EXPECT_EQ(add(5, 20), Addresses{}) << "90 in all";
    EXPECT_EQ(givenUpBy([&](auto& givenUp) { cache.close(givenUp); }), (Addresses{2, 4, 5}));
    EXPECT_EQ(cache.take(1, none), nullptr);
    EXPECT_EQ(add(6, 1), Addresses{6});
    EXPECT_EQ(none.count, 0u);
}

TEST(BlockCache, NeverHoldsMoreThanHasBeenInUse)
{
    BlockCache cache(1000);
    BlockCache::GivenUp none;
    for (std::size_t const bytes : {60u, 30u, 10u})
        cache.countAllocated(bytes);
    cache.add(block(1, 60), none);
    cache.add(block(2, 30), none);
    EXPECT_EQ(none.count, 0u);
    auto const take = [&](std::size_t bytes) {
        return givenUpBy([&](auto& givenUp) {
            EXPECT_EQ(cache.take(bytes, givenUp), nullptr);
            cache.countAllocated(bytes);
        });
    };
    EXPECT_EQ(take(40), Addresses{1}) << "10 and 40 in use, 30 kept";
    EXPECT_EQ(take(20), Addresses{}) << "100 in all";
    EXPECT_EQ(take(1), Addresses{2});
}

TEST(BlockCache, GivesEachBlockToOneThread)
{
    constexpr std::size_t kCount = 40, kThreads = 4;
    BlockCache cache(1'000'000);
    std::array<std::atomic<int>, kCount + 1> owners{};
    std::atomic<std::size_t> released = 0;
    std::vector<std::thread> threads;
    for (std::size_t thread = 0; thread != kThreads; ++thread)
        threads.emplace_back([&, thread] {
            for (std::size_t turn = 0; turn != 20'000; ++turn) {
                BlockCache::GivenUp givenUp;
                auto held = reinterpret_cast<std::uintptr_t>(cache.take(8, givenUp));
                if (held == 0 && turn < kCount / kThreads) {
                    held = 1 + turn * kThreads + thread; // a new one
                    cache.countAllocated(8);
                }
                if (held == 0)
                    continue;
                EXPECT_EQ(owners[held].fetch_add(1), 0);
                owners[held].fetch_sub(1);
                cache.add(block(held, 8), givenUp);
                released += givenUp.count;
            }
        });
    for (std::thread& thread : threads)
        thread.join();
    BlockCache::GivenUp rest;
    cache.clear(rest);
    EXPECT_LE(rest.count, BlockCache::kMostBlocks);
    EXPECT_LE(rest.count + released, kCount);
}

TEST(UntypedTypeRep, UsesFreedBlocksAgainUntilTheyAreReleased)
{
    if (!kKeepsBlocks)
        GTEST_SKIP() << "a sanitizer replaces the allocation that is counted here";
    bool const keeps = !std::getenv("ORVAN_CACHED_MEBIBYTES");
    Orvan::releaseCachedBlocks();
    auto const memory = memoryOf([] {
        void* const block = kBytes.allocate(40 * kMebibyte);
        std::memset(block, 1, 40 * kMebibyte);
        kBytes.deallocate(block, 40 * kMebibyte);
    });
    EXPECT_EQ(memory.kept > 0, keeps);
    auto const again = memoryOf([] { kBytes.deallocate(kBytes.allocate(39 * kMebibyte), 39 * kMebibyte); });
    EXPECT_EQ(again.peak == 0, keeps) << "of about the same size";
    EXPECT_EQ(memoryOf([] { Orvan::releaseCachedBlocks(); }).kept, -memory.kept);
    EXPECT_EQ(memoryOf([] { kBytes.deallocate(kBytes.allocate(300 * kMebibyte), 300 * kMebibyte); }).kept, 0);
}

TEST(UntypedTypeRep, KeepsNothingIfTheEnvironmentSaysSo)
{
    if (!kKeepsBlocks || std::getenv("ORVAN_CACHED_MEBIBYTES"))
        GTEST_SKIP();
    std::string const self = std::filesystem::read_symlink("/proc/self/exe");
    std::string const command = "ORVAN_CACHED_MEBIBYTES=0 " + self + " --gtest_filter=UntypedTypeRep.Uses* >/dev/null";
    EXPECT_EQ(std::system(command.c_str()), 0);
}
