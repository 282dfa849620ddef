#include "FailingAllocations.h"

#include "AllocationHooks.h"
#include "Compare.h"
#include "PropertyBag.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <new>

#include <dlfcn.h>

namespace TestSupport {

namespace {

    constexpr std::int64_t kNever = std::numeric_limits<std::int64_t>::max();

    std::atomic<std::int64_t> allocationsLeft = kNever; // until the one that fails
    std::atomic<bool> failsOnce = false;
    std::atomic<bool> isExhausted = false;
    std::function<void()> const* atNumber = nullptr; // runs instead of a failure
    std::atomic<std::int64_t> liveBlocks = 0;

    bool mustFail()
    {
        if (isExhausted.load(std::memory_order_relaxed))
            return true;
        if (allocationsLeft.load(std::memory_order_relaxed) == kNever)
            return false;
        std::int64_t const left = allocationsLeft.fetch_sub(1);
        if (atNumber) {
            if (left == 0)
                (*atNumber)();
            return false;
        }
        return failsOnce ? left == 0 : left <= 0;
    }

}

void* allocateBlock(std::size_t bytes, std::size_t alignment)
{
    void* const block = mustFail() ? nullptr : systemBlock(bytes, alignment);
    if (!block)
        throw std::bad_alloc();
    std::memset(block, 0xA5, std::min<std::size_t>(bytes, 4096)); // exposes reads of uninitialized memory
    liveBlocks.fetch_add(1, std::memory_order_relaxed);
    return block;
}

void freeBlock(void* block) noexcept
{
    if (block)
        liveBlocks.fetch_sub(1, std::memory_order_relaxed);
    std::free(block);
}

void sweepFailingAllocations(std::function<void(Attempt const&)> const& trial)
{
    // Once without a failure: function-local statics that the first call initializes are not leaks.
    trial([](std::function<void()> const& action) {
        action();
        return true;
    });
    bool hasFailed = true;
    for (bool const once : {true, false})
        for (std::int64_t number = 1; (number == 1 || hasFailed) && !testing::Test::HasFatalFailure(); ++number) {
            SCOPED_TRACE("allocation " + std::to_string(number) + (once ? " fails" : " and all later ones fail"));
            ASSERT_LT(number, 100'000) << "the action never succeeds";
            std::int64_t const before = liveBlocks;
            hasFailed = false;
            trial([&](std::function<void()> const& action) {
                bool isCompleted = false;
                failsOnce = once;
                allocationsLeft = number - 1;
                try {
                    action();
                    isCompleted = true;
                } catch (std::bad_alloc const&) {
                } catch (...) {
                    allocationsLeft = kNever;
                    throw;
                }
                bool const isFailing = allocationsLeft.exchange(kNever) < 0;
                hasFailed = hasFailed || isFailing;
                EXPECT_TRUE(isCompleted || isFailing) << "std::bad_alloc without a failed allocation";
                return isCompleted;
            });
            EXPECT_EQ(liveBlocks, before) << "blocks leaked";
        }
}

ExhaustedMemory::ExhaustedMemory()
{
    isExhausted = true;
}

ExhaustedMemory::~ExhaustedMemory()
{
    isExhausted = false;
}

bool runDuringAllocation(
    std::int64_t number, std::function<void()> const& meanwhile, std::function<void()> const& action)
{
    atNumber = &meanwhile;
    allocationsLeft = number - 1;
    struct Disarm {
        ~Disarm()
        {
            atNumber = nullptr;
            allocationsLeft = kNever;
        }
    } const disarm;
    action();
    return allocationsLeft < 0;
}

void expectAllOrNothing(
    Tessara::Object const& source, std::function<void(Tessara::Object&)> const& edit, char const* mayGrow)
{
    auto const before = deepCopy(source), expected = deepCopy(source);
    edit(*expected);
    for (bool const isShared : {true, false})
        sweepFailingAllocations([&](Attempt const& attempt) {
            Tessara::Object object = isShared ? source : *deepCopy(source);
            bool const isDone = attempt([&] { edit(object); });
            if (!isDone && mayGrow)
                cutToElements(mayGrow, object);
            EXPECT_TRUE(sameContents(object, isDone ? *expected : *before));
            EXPECT_TRUE(sameContents(source, *before)) << "another holder sees a change";
        });
}

}

// Keeps oneTBB from loading its own allocator, so that it calls the functions below, which may fail. It keeps the
// memory of its tasks for later loops, so these blocks are not counted as live.
extern "C" {

void* dlopen(char const* file, int mode) noexcept
{
    static auto const open = reinterpret_cast<decltype(&dlopen)>(dlsym(RTLD_NEXT, "dlopen"));
    return file && std::strstr(file, "libtbbmalloc") ? nullptr : open(file, mode);
}

void* scalable_malloc(std::size_t bytes)
{
    return TestSupport::isExhausted ? nullptr : std::malloc(bytes);
}

void* scalable_aligned_malloc(std::size_t bytes, std::size_t alignment)
{
    return TestSupport::isExhausted ? nullptr : TestSupport::systemBlock(bytes, alignment);
}

void scalable_free(void* block)
{
    std::free(block);
}

void scalable_aligned_free(void* block)
{
    std::free(block);
}
}
