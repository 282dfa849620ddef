#include "support/Testing.h"

#include <OrvanCore/ForeignArray.h>

#include <memory>
#include <vector>

using Ints = Orvan::Array<int>;

// Copy on write must never reach memory that belongs to someone else, not even through the last reference.
TEST(ForeignArray, IsReadInPlaceAndCopiedToBeChanged)
{
    auto memory = std::make_shared<std::vector<int>>(std::vector<int>{1, 2, 3});
    std::weak_ptr<std::vector<int>> const watched = memory;
    int const* const data = memory->data();
    Orvan::Ptr<Ints> array = Orvan::makeForeignArray(data, 3, std::move(memory));
    EXPECT_EQ(array->data, data);
    EXPECT_EQ(*array, (Ints{1, 2, 3}));
    EXPECT_EQ(array.useCount(), 2u) << "operations that ask whether an array is shared must see the owner";

    Orvan::Ptr<Ints> const other = array;
    Orvan::MutablePtr<Ints> copy = makeMutable(std::move(array));
    EXPECT_NE(copy->data, data);
    EXPECT_FALSE(watched.expired());
    array = other;
    makeMutable(Orvan::Ptr<Ints>(other))->append(4);
    EXPECT_EQ(*array, (Ints{1, 2, 3}));
}

TEST(ForeignArray, ReleasesItsOwnerWithTheLastReference)
{
    TestSupport::sweepFailingAllocations([](TestSupport::Attempt const& attempt) {
        auto memory = std::make_shared<std::vector<int>>(std::vector<int>{1, 2, 3});
        std::weak_ptr<std::vector<int>> const watched = memory;
        int const* const data = memory->data();
        Orvan::MutablePtr<Ints> changed;
        attempt([&] {
            Orvan::Ptr<Ints> array = Orvan::makeForeignArray(data, 3, std::move(memory));
            changed = makeMutable(std::move(array)); // the last reference: it must copy nevertheless
            (*changed)[0] = 7;
        });
        EXPECT_TRUE(watched.expired());
        EXPECT_TRUE(!changed || *changed == (Ints{7, 2, 3}));
    });
}
