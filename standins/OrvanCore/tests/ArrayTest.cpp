#include "support/Testing.h"

#include <cstddef>
#include <cstring>
#include <memory>

using Orvan::Array;
using Orvan::Internal::UntypedTypeRep;
using Texts = Array<Orvan::String>;

static_assert(offsetof(Array<float>, data) == 0 && offsetof(Array<float>, size) == 8
    && offsetof(Array<float>, capacity) == 16 && offsetof(Array<float>, rep) == 24);

constexpr char kLong[] = "a string that is too long to be stored without an allocation";

TEST(Array, GrowsByItsCapacityOrByTheAddedCountAndReusesItsStorage)
{
    Array<int> appended;
    std::vector<std::uint64_t> capacities;
    for (int i = 0; i < 9; ++i) {
        appended.append(i);
        capacities.push_back(appended.capacity);
    }
    EXPECT_EQ(capacities, (std::vector<std::uint64_t>{1, 2, 4, 4, 8, 8, 8, 8, 16}));

    struct Case {
        std::uint64_t from, to, capacity;
    };
    for (Case const& grown : {Case{0, 5, 5}, {5, 6, 10}, {5, 10, 10}, {5, 11, 11}, {5, 5, 5}, {5, 2, 5}, {5, 0, 5}}) {
        Array<int> array(grown.from);
        int const* const before = array.data;
        array.resize(grown.to);
        EXPECT_EQ(array.size, grown.to);
        EXPECT_EQ(array.capacity, grown.capacity) << grown.from << " to " << grown.to;
        EXPECT_EQ(array.data == before, grown.to <= grown.from) << "shrinking does not reallocate";
    }

    Array<int> const source{1, 2, 3};
    int const* const storage = appended.data;
    appended = source;
    EXPECT_TRUE(appended == source && appended.data == storage && appended.capacity == 16);
    appended = Array<int>(5); // a move takes over the storage
    EXPECT_TRUE(appended == Array<int>(5) && appended.data != storage);
}

TEST(Array, InitializesTheElementsThatResizingAdds)
{
    Array<int> array{1, 2, 3, 4};
    array.resize(1);
    array.resize(4);
    EXPECT_EQ(array, (Array<int>{1, 0, 0, 0})) << "values from before the shrinking do not reappear";
    array[3] = 7;
    array.resize(3);
    array.resize(4, Orvan::kUninitialized);
    EXPECT_EQ(array[3], 7) << "nothing is written";
    EXPECT_EQ(Texts(2, Orvan::kUninitialized), (Texts{"", ""})) << "still constructed";
}

TEST(Array, ConstructsAndDestroysEachElementOnce)
{
    auto const watched = std::make_shared<int>(5);
    {
        Array<std::shared_ptr<int>> array{watched, watched, watched};
        for (int i = 0; i < 17; ++i)
            array.append(array[0]); // sometimes this reallocates
        EXPECT_EQ(watched.use_count(), 21);
        array.resize(5);
        array.resize(7, Orvan::kUninitialized);
        EXPECT_EQ(watched.use_count(), 6);
        Array<std::shared_ptr<int>> copy(array);
        EXPECT_EQ(watched.use_count(), 11);
        copy = Array<std::shared_ptr<int>>(2, watched);
        array = copy; // fits the current storage
        array = static_cast<Array<std::shared_ptr<int>> const&>(array);
        EXPECT_EQ(watched.use_count(), 5);
        Array<std::shared_ptr<int>> moved(std::move(array));
        EXPECT_TRUE(array.empty() && array.data == nullptr && array.capacity == 0);
        copy.clear();
        EXPECT_EQ(watched.use_count(), 3);
    }
    EXPECT_EQ(watched.use_count(), 1);
}

TEST(Array, RefusesSizesBeyondTheAddressSpace)
{
    constexpr std::uint64_t kMaxCount = std::numeric_limits<std::uint64_t>::max();
    for (std::uint64_t const count : {kMaxCount, kMaxCount / 4, kMaxCount / 4 + 1, kMaxCount / 8 + 1}) {
        Array<int> array{1, 2, 3};
        EXPECT_THROW((void)Array<int>(count), std::bad_alloc);
        EXPECT_THROW(array.resize(count), std::bad_alloc);
        EXPECT_THROW(array.resize(count, Orvan::kUninitialized), std::bad_alloc);
        EXPECT_THROW(array.reserve(count), std::bad_alloc);
        EXPECT_TRUE(array == (Array<int>{1, 2, 3}) && array.capacity == 3);
    }
}

TEST(Array, IsUnchangedWhenAnAllocationFails)
{
    Texts const source(3, kLong);
    std::vector<std::function<void(Texts&)>> const actions{
        [&](Texts& array) { array.append(source[0]); },
        [](Texts& array) { array.resize(9); },
        [](Texts& array) { array.reserve(9); },
        [&](Texts& array) { array = source; },
    };
    for (auto const& action : actions)
        for (std::uint64_t const capacity : {2u, 4u})
            TestSupport::sweepFailingAllocations([&](TestSupport::Attempt const& attempt) {
                Texts array{"x", "y"};
                array.reserve(capacity);
                Orvan::String const* const storage = array.data;
                if (attempt([&] { action(array); }))
                    return;
                EXPECT_TRUE(array.data == storage && array.capacity == capacity && array == (Texts{"x", "y"}));
            });
}

TEST(UntypedTypeRep, GivesAlignedStorage)
{
    struct alignas(256) Wide {
        std::byte bytes[256];
    };
    for (UntypedTypeRep const rep :
        {UntypedTypeRep::of<char>(), UntypedTypeRep::of<double>(), UntypedTypeRep::of<Wide>()})
        for (std::uint64_t const bytes : {256u, 4096u, 1u << 22, (1u << 22) + 256u}) {
            std::uint64_t const count = bytes / rep.elementSize;
            std::uint64_t const alignment = std::max<std::uint64_t>(rep.elementAlignment, bytes < 4096 ? 16 : 64);
            void* blocks[4]; // several in a row: a single one may be aligned by chance
            for (void*& block : blocks) {
                block = rep.allocate(count);
                EXPECT_EQ(reinterpret_cast<std::uintptr_t>(block) % alignment, 0u) << bytes << " bytes";
                std::memset(block, 1, bytes);
            }
            for (void* const block : blocks)
                rep.deallocate(block, count);
        }
    EXPECT_EQ(UntypedTypeRep::of<Wide>().allocate(0), nullptr);
    UntypedTypeRep::of<Wide>().deallocate(nullptr, 0);
}
