#include "FailingAllocations.h"

#include "AllocationHooks.h"
#include "PropertyBag.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <new>

#include <dlfcn.h>
#include <pthread.h>

namespace TestSupport {

namespace {

    constexpr std::int64_t kNever = std::numeric_limits<std::int64_t>::max();

    std::atomic<std::int64_t> allocationsLeft = kNever; // until the one that fails
    std::atomic<bool> failsOnce = false;

    bool maySucceed()
    {
        if (ExhaustedMemory::isAlive.load(std::memory_order_relaxed))
            return false;
        if (allocationsLeft.load(std::memory_order_relaxed) == kNever)
            return true;
        std::int64_t const left = allocationsLeft.fetch_sub(1);
        return failsOnce ? left != 0 : left > 0;
    }

    /// Exposes reads of uninitialized memory.
    void scribble(void* block, std::size_t bytes)
    {
        std::memset(block, 0xA5, std::min<std::size_t>(bytes, 4096));
    }

    [[maybe_unused]] bool const areHooksSet = (mayAllocate = &maySucceed, onAllocated = &scribble, true);

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
            hasFailed = false;
            Attempt const attempt = [&](std::function<void()> const& action) {
                bool isCompleted = true;
                failsOnce = once;
                allocationsLeft = number - 1;
                try {
                    action();
                } catch (std::bad_alloc const&) {
                    isCompleted = false;
                }
                bool const isFailing = allocationsLeft.exchange(kNever) < 0;
                hasFailed = hasFailed || isFailing;
                EXPECT_TRUE(isCompleted || isFailing) << "std::bad_alloc without a failed allocation";
                return isCompleted;
            };
            EXPECT_EQ(memoryOf([&] { trial(attempt); }).kept, 0) << "bytes leaked";
        }
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

void* scalable_aligned_malloc(std::size_t bytes, std::size_t alignment)
{
    return TestSupport::ExhaustedMemory::isAlive ? nullptr : TestSupport::systemBlock(bytes, alignment);
}

void* scalable_malloc(std::size_t bytes)
{
    return scalable_aligned_malloc(bytes, alignof(std::max_align_t));
}

void scalable_free(void* block)
{
    std::free(block);
}

void scalable_aligned_free(void* block)
{
    std::free(block);
}

int pthread_create(
    pthread_t* thread, pthread_attr_t const* attributes, void* (*routine)(void*), void* argument) noexcept
{
    static auto const create = reinterpret_cast<decltype(&pthread_create)>(dlsym(RTLD_NEXT, "pthread_create"));
    return TestSupport::NoNewThreads::isAlive ? EAGAIN : create(thread, attributes, routine, argument);
}
}
