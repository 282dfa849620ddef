#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"

#include "support/Random.h"
#include "support/Testing.h"

#include <gtest/gtest.h>

using namespace Modeling;

TEST(Arrays, OffsetsFit32BitsAndAreCompleteInsideACancelledGroup)
{
    auto const sumsTo = [](std::uint64_t total) {
        return [=](std::size_t i) {
            return static_cast<unsigned int>(i == 2 ? total - 0x80000000u : i == 1 ? 0x80000000u : 0u);
        };
    };
    EXPECT_EQ(offsetsFromCounts(3, sumsTo(0xFFFFFFFFu))[3], 0xFFFFFFFFu);
    EXPECT_THROW(offsetsFromCounts(3, sumsTo(0x100000000u)), std::bad_alloc);
    EXPECT_THROW(offsetsFromCounts(5000, sumsTo(0x100000000u)), std::bad_alloc);

    tbb::task_group group;
    unsigned int total = 0;
    group.run_and_wait([&] {
        group.cancel();
        total = offsetsFromCounts(10'000, [](std::size_t) { return 2u; })[10'000];
    });
    EXPECT_EQ(total, 20'000u);
}

TEST(PointCorners, AreListedInAscendingOrderForAnyNumberOfThreads)
{
    TestSupport::Random random(5);
    constexpr unsigned int kPoints = 20'000;
    std::vector<unsigned int> faceVertex(100'000);
    std::vector<std::vector<unsigned int>> expected(kPoints), found(kPoints);
    for (unsigned int corner = 0; corner != faceVertex.size(); ++corner) {
        unsigned int const point = random.below(4) == 0 ? 17 : random.below(kPoints + 5); // some do not exist
        faceVertex[corner] = point;
        if (point < kPoints)
            expected[point].push_back(corner);
    }
    for (int const threads : {1, 2, 8}) {
        PointCorners const lists = TestSupport::withThreads(
            threads, [&] { return cornersByPoint(kPoints, faceVertex.data(), faceVertex.size()); });
        for (unsigned int point = 0; point != kPoints; ++point)
            found[point].assign(
                lists.corners.data + lists.offsets[point], lists.corners.data + lists.offsets[point + 1]);
        EXPECT_TRUE(found == expected) << threads << " threads";
    }
    EXPECT_EQ(cornersByPoint(0, nullptr, 0).offsets[0], 0u);
}

TEST(VectorMath, NormalizesOnlyWhatHasALength)
{
    float const smallest = std::numeric_limits<float>::min();
    float const tooLarge = 1e30f; // its square is infinite
    EXPECT_EQ(safeNormalize({3, 0, 4}), (float3{3 * 0.2f, 0, 4 * 0.2f}));
    EXPECT_EQ(safeNormalize({0, 0, 0}), (float3{0, 0, 0}));
    EXPECT_EQ(safeNormalize({smallest, 0, 0}), (float3{smallest, 0, 0})) << "its square is zero";
    EXPECT_EQ(safeNormalize({tooLarge, 0, 0}), (float3{0, 0, 0}));
    EXPECT_TRUE(std::isnan(safeNormalize({std::numeric_limits<float>::quiet_NaN(), 0, 0}).x));
}
