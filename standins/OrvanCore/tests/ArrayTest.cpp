#include "support/FailingAllocations.h"

#include <OrvanCore/Array.h>
#include <OrvanCore/String.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <functional>
#include <limits>
#include <stdexcept>
#include <vector>

using Orvan::Array;
using Orvan::Internal::UntypedTypeRep;

namespace {

// Counts its living instances, and finds out when one is constructed or destroyed twice, or used without being alive.
class Counted {
public:
    Counted(int value = -1)
        : Counted(value, nullptr)
    {
    }
    Counted(Counted const& other)
        : Counted(other.read(), nullptr)
    {
        if (copiesLeft-- == 0)
            throw std::runtime_error("copying fails"); // after the delegated constructor: ends in the destructor
    }
    Counted(Counted&& other) noexcept
        : Counted(other.read(), nullptr)
    {
    }
    Counted& operator=(Counted const&) = delete;
    ~Counted()
    {
        EXPECT_EQ(self_, this);
        self_ = nullptr;
        --living;
    }

    int read() const
    {
        EXPECT_EQ(self_, this);
        return value_;
    }

    static inline int living = 0;
    static inline int copiesLeft = -1;

private:
    Counted(int value, std::nullptr_t)
        : value_(value)
        , self_(this)
    {
        ++living;
    }

    int value_;
    Counted const* self_;
};

std::vector<int> valuesOf(Array<Counted> const& array)
{
    std::vector<int> values;
    for (Counted const& element : array)
        values.push_back(element.read());
    return values;
}

}

TEST(Array, hasItsFourFieldsInOrder)
{
    using Layout = Array<float>;
    EXPECT_EQ(offsetof(Layout, data), 0u);
    EXPECT_EQ(offsetof(Layout, size), 8u);
    EXPECT_EQ(offsetof(Layout, capacity), 16u);
    EXPECT_EQ(offsetof(Layout, rep), 24u);
    EXPECT_EQ(sizeof(Layout), 32u);
    EXPECT_EQ(sizeof(Array<bool>{true, false}[0]), 1u);
}

TEST(Array, growsByItsCapacityOrByWhatIsAdded)
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
        EXPECT_EQ(array.data == before, grown.to <= grown.from) << "shrinking takes no new storage";
    }
}

TEST(Array, initialisesWhatSizingAdds)
{
    Array<int> array{1, 2, 3, 4};
    array.resize(1);
    array.resize(4);
    EXPECT_EQ(array, (Array<int>{1, 0, 0, 0})) << "values from before the shrinking are not seen again";
    array[3] = 7;
    array.resize(3);
    array.resize(4, Orvan::kUninitialized);
    EXPECT_EQ(array[3], 7) << "nothing is written";
    EXPECT_EQ(Array<float>(3), (Array<float>{0.0f, 0.0f, 0.0f}));
    EXPECT_EQ(Array<bool>(2, true), (Array<bool>{true, true}));
    EXPECT_EQ(Array<Orvan::String>(2, Orvan::kUninitialized), (Array<Orvan::String>{"", ""})) << "still constructed";
}

TEST(Array, constructsAndDestroysEachElementOnce)
{
    {
        Array<Counted> array{1, 2, 3};
        for (int i = 4; i < 20; ++i)
            array.append(i);
        array.append(array[0]); // at times with growth under it
        array.resize(5);
        EXPECT_EQ(Counted::living, 5);
        array.resize(7, Orvan::kUninitialized);
        EXPECT_EQ(valuesOf(array), (std::vector<int>{1, 2, 3, 4, 5, -1, -1}));

        Array<Counted> copy(array);
        EXPECT_EQ(Counted::living, 14);
        copy = Array<Counted>(2, Counted(9));
        array = copy;
        array = static_cast<Array<Counted> const&>(array);
        EXPECT_EQ(valuesOf(array), (std::vector<int>{9, 9}));

        Array<Counted> moved(std::move(array));
        EXPECT_TRUE(array.empty() && array.data == nullptr && array.capacity == 0);
        copy.clear();
        EXPECT_EQ(Counted::living, 2);
    }
    EXPECT_EQ(Counted::living, 0);
}

TEST(Array, isAsItWasWhenCopyingAnElementFails)
{
    {
        Array<Counted> const source{1, 2, 3, 4};
        Array<Counted> target{5, 6};
        Counted::copiesLeft = 2;
        EXPECT_THROW(target = source, std::runtime_error);
        Counted::copiesLeft = -1;
        EXPECT_EQ(valuesOf(target), (std::vector<int>{5, 6}));
        EXPECT_EQ(Counted::living, 6);
    }
    EXPECT_EQ(Counted::living, 0);
}

TEST(Array, appendsItsOwnElements)
{
    Array<Orvan::String> array{"a text that is too long for the object itself"};
    for (int i = 0; i < 40; ++i)
        array.append(array[0]);
    EXPECT_EQ(array, Array<Orvan::String>(41, "a text that is too long for the object itself"));
}

TEST(Array, reusesItsStorageWhenAssigned)
{
    Array<int> target{1, 2, 3, 4};
    int const* const storage = target.data;
    target = Array<int>{7, 8}; // moved: takes the other's storage
    EXPECT_NE(target.data, storage);
    target.reserve(4);
    int const* const reserved = target.data;
    Array<int> const source{1, 2, 3};
    target = source;
    EXPECT_EQ(target, source);
    EXPECT_EQ(target.data, reserved);
    EXPECT_EQ(target.capacity, 4u);
    target = Array<int>(5);
    EXPECT_EQ(target, Array<int>(5));
}

TEST(Array, refusesWhatTheAddressSpaceCannotHold)
{
    constexpr std::uint64_t kMost = std::numeric_limits<std::uint64_t>::max();
    for (std::uint64_t const count : {kMost, kMost / 4, kMost / 4 + 1, kMost / 8 + 1}) {
        EXPECT_THROW((void)Array<int>(count), std::bad_alloc);
        Array<int> array{1, 2, 3};
        EXPECT_THROW(array.resize(count), std::bad_alloc);
        EXPECT_THROW(array.resize(count, Orvan::kUninitialized), std::bad_alloc);
        EXPECT_THROW(array.reserve(count), std::bad_alloc);
        EXPECT_EQ(array, (Array<int>{1, 2, 3}));
        EXPECT_EQ(array.capacity, 3u);
    }
}

TEST(Array, isAsItWasWhenAllocationFails)
{
    Array<Orvan::String> const source(3, "a text that is too long for the object itself");
    std::vector<std::function<void(Array<Orvan::String>&)>> const actions{
        [&](auto& array) { array.append(source[0]); },
        [](auto& array) { array.resize(9); },
        [](auto& array) { array.reserve(9); },
        [&](auto& array) { array = source; },
    };
    for (auto const& action : actions)
        TestSupport::sweepFailingAllocations([&](TestSupport::Attempt const& attempt) {
            Array<Orvan::String> array{"x", "y"};
            Orvan::String const* const storage = array.data;
            if (attempt([&] { action(array); }))
                return;
            EXPECT_EQ(array.data, storage);
            EXPECT_EQ(array.capacity, 2u);
            EXPECT_EQ(array, (Array<Orvan::String>{"x", "y"}));
        });
}

TEST(UntypedTypeRep, givesAlignedStorage)
{
    struct alignas(256) Wide {
        std::byte bytes[256];
    };
    for (UntypedTypeRep const rep :
        {UntypedTypeRep::of<char>(), UntypedTypeRep::of<double>(), UntypedTypeRep::of<Wide>()})
        for (std::uint64_t const bytes : {256u, 4096u, 1u << 22, (1u << 22) + 256u}) {
            std::uint64_t const count = bytes / rep.elementSize;
            auto* const block = static_cast<unsigned char*>(rep.allocate(count));
            std::uint64_t const alignment = std::max<std::uint64_t>(rep.elementAlignment, bytes < 4096 ? 16 : 64);
            EXPECT_EQ(reinterpret_cast<std::uintptr_t>(block) % alignment, 0u) << bytes << " bytes";
            block[0] = block[bytes - 1] = 1;
            rep.deallocate(block, count);
        }
    EXPECT_EQ(UntypedTypeRep::of<Wide>().allocate(0), nullptr);
    UntypedTypeRep::of<Wide>().deallocate(nullptr, 0);
}
