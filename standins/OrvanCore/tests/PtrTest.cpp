#include "support/Testing.h"

#include <atomic>
#include <memory>
#include <thread>

using Orvan::makePtr, Orvan::MutablePtr, Orvan::Ptr;
using Ints = Orvan::Array<int>;

TEST(Ptr, CountsItsReferences)
{
    auto const watched = std::make_shared<int>(5);
    using Held = std::shared_ptr<int>;
    Ptr<Held> first = makePtr<Held>(watched);
    {
        Ptr<Held> const second = first;
        Ptr<Held> third = second;
        Ptr<Held> const fourth = std::move(third);
        EXPECT_TRUE(!third && third.useCount() == 0 && fourth == first);
        EXPECT_EQ(first.useCount(), 3u);
        first = static_cast<Ptr<Held> const&>(first);
        EXPECT_EQ(first, second);
        first = nullptr;
        EXPECT_EQ(second.useCount(), 2u);
        EXPECT_EQ(watched.use_count(), 2);
    }
    EXPECT_EQ(watched.use_count(), 1) << "the last release destroys the value";
    first = MutablePtr<Held>::make(watched);
    EXPECT_EQ(watched.use_count(), 2);
    makeMutable(std::move(first)) = nullptr;
    EXPECT_EQ(watched.use_count(), 1);
}

TEST(MakeMutable, MovesAnUnsharedValueAndCopiesASharedOne)
{
    Ptr<Ints> shared = makePtr<Ints>(Ints{1, 2, 3});
    Ints const* const value = shared.get();
    MutablePtr<Ints> only = makeMutable(std::move(shared));
    EXPECT_TRUE(!shared && only.get() == value);
    shared = std::move(only);
    EXPECT_FALSE(only);

    TestSupport::sweepFailingAllocations([](TestSupport::Attempt const& attempt) {
        Ptr<Ints> held = makePtr<Ints>(Ints{9, 2, 3});
        Ptr<Ints> const holder = held;
        MutablePtr<Ints> copy;
        bool const isDone = attempt([&] { copy = makeMutable(std::move(held)); });
        EXPECT_EQ(held == holder, !isDone);
        EXPECT_EQ(holder.useCount(), isDone ? 1u : 2u);
        if (isDone)
            (*copy)[1] = 8;
        EXPECT_EQ(*holder, (Ints{9, 2, 3}));
    });
}

// At most one thread gets the value itself, and all other threads must have finished reading before it writes.
TEST(Ptr, IsCopiedAndReleasedOnManyThreads)
{
    constexpr int kThreads = 3;
    for (int round = 0; round < 300; ++round) {
        Ptr<Ints> shared = makePtr<Ints>(Ints{1, 2, 3});
        Ints const* const value = shared.get();
        std::atomic<int> waiting = kThreads;
        std::atomic<int> owners = 0;
        std::vector<std::thread> threads;
        for (int thread = 0; thread < kThreads; ++thread)
            threads.emplace_back([&waiting, &owners, value, mine = shared]() mutable {
                for (int i = 0; i < 10; ++i)
                    EXPECT_EQ((*Ptr<Ints>(mine))[1], 2);
                // All threads continue at once; relaxed, so that only the reference count orders what follows.
                waiting.fetch_sub(1, std::memory_order_relaxed);
                while (waiting.load(std::memory_order_relaxed) != 0)
                    std::this_thread::yield();
                MutablePtr<Ints> const edited = makeMutable(std::move(mine));
                owners.fetch_add(edited.get() == value, std::memory_order_relaxed);
                EXPECT_EQ(*edited, (Ints{1, 2, 3}));
                (*edited)[1] = 7;
            });
        shared = nullptr;
        for (std::thread& thread : threads)
            thread.join();
        EXPECT_LE(owners, 1);
    }
}
