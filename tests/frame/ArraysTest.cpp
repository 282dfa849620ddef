#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"

#include "support/Random.h"
#include "support/Threads.h"

#include <OrvanCore/String.h>

#include <gtest/gtest.h>

#include <numeric>
#include <vector>

using namespace Modeling;

TEST(Arrays, offsetsSumUpTheCountsBefore)
{
    for (std::size_t const size :
        {std::size_t{0}, std::size_t{1}, std::size_t{1000}, std::size_t{1001}, std::size_t{40'000}})
        for (int const threads : {1, 8}) {
            auto const countOf = [](std::size_t i) { return static_cast<unsigned int>(i % 7 * (i % 3)); };
            auto const offsets = TestSupport::withThreads(threads, [&] { return offsetsFromCounts(size, countOf); });
            ASSERT_EQ(offsets.size, size + 1);
            unsigned int sum = 0;
            for (std::size_t i = 0; i != size; sum += countOf(i), ++i)
                ASSERT_EQ(offsets[i], sum) << "entry " << i << " of " << size;
            EXPECT_EQ(offsets[size], sum);
        }
}

TEST(Arrays, offsetsBeyond32BitsAreRefused)
{
    auto const sumsTo = [](std::uint64_t total) {
        return [=](std::size_t i) {
            return static_cast<unsigned int>(i == 2 ? total - 0x80000000u : i == 1 ? 0x80000000u : 0u);
        };
    };
    EXPECT_EQ(offsetsFromCounts(3, sumsTo(0xFFFFFFFFu))[3], 0xFFFFFFFFu);
    EXPECT_THROW(offsetsFromCounts(3, sumsTo(0x100000000u)), std::bad_alloc);
    EXPECT_THROW(offsetsFromCounts(5000, sumsTo(0x100000000u)), std::bad_alloc);
}

TEST(Arrays, offsetsAreCompleteInsideACancelledGroup)
{
    tbb::task_group group;
    unsigned int total = 0;
    group.run_and_wait([&] {
        group.cancel();
        total = offsetsFromCounts(10'000, [](std::size_t) { return 2u; })[10'000];
    });
    EXPECT_EQ(total, 20'000u);
}

TEST(Arrays, copiesAndFillsReachEveryElement)
{
    for (std::size_t const size : {std::size_t{0}, std::size_t{5}, std::size_t{1'000'003}}) {
        Orvan::Array<unsigned int> source(size);
        std::iota(source.begin(), source.end(), 7u);
        EXPECT_EQ(copyOfFirst(size, source), source);
        EXPECT_EQ(filledArray(size, 9u), Orvan::Array<unsigned int>(size, 9u));
        EXPECT_EQ(zeroedArray<unsigned int>(size), Orvan::Array<unsigned int>(size));
    }
    Orvan::Array<Orvan::String> const texts(40'000, Orvan::String("longer than what fits into the object itself"));
    EXPECT_EQ(copyOfFirst(30'000, texts), Orvan::Array<Orvan::String>(30'000, texts[0]));
}

TEST(PointCorners, areListedInAscendingOrderForAnyNumberOfThreads)
{
    TestSupport::Random random(5);
    constexpr unsigned int kPoints = 20'000;
    std::vector<unsigned int> faceVertex(100'000);
    for (unsigned int& point : faceVertex)
        point = random.below(4) == 0 ? 17 : random.below(kPoints + 5); // a hub, and points that do not exist
    std::vector<std::vector<unsigned int>> expected(kPoints);
    for (std::size_t corner = 0; corner != faceVertex.size(); ++corner)
        if (faceVertex[corner] < kPoints)
            expected[faceVertex[corner]].push_back(static_cast<unsigned int>(corner));
    for (int const threads : {1, 2, 8}) {
        PointCorners const lists = TestSupport::withThreads(
            threads, [&] { return cornersByPoint(kPoints, faceVertex.data(), faceVertex.size()); });
        ASSERT_EQ(lists.offsets.size, kPoints + 1u);
        for (unsigned int point = 0; point != kPoints; ++point)
            ASSERT_EQ(std::vector<unsigned int>(
                          lists.corners.data + lists.offsets[point], lists.corners.data + lists.offsets[point + 1]),
                expected[point])
                << "point " << point << ", " << threads << " threads";
    }
    EXPECT_EQ(cornersByPoint(0, nullptr, 0).offsets[0], 0u);
}

TEST(VectorMath, normalizesOnlyWhatHasALength)
{
    float const smallest = std::numeric_limits<float>::min();
    float const tooLarge = 1e30f; // its square is infinite
    float const nan = std::numeric_limits<float>::quiet_NaN();
    EXPECT_EQ(safeNormalize({3, 0, 4}), (float3{3 * 0.2f, 0, 4 * 0.2f}));
    EXPECT_EQ(safeNormalize({0, 0, 0}), (float3{0, 0, 0}));
    EXPECT_EQ(safeNormalize({smallest, 0, 0}), (float3{smallest, 0, 0})) << "its square is zero";
    EXPECT_EQ(safeNormalize({tooLarge, 0, 0}), (float3{0, 0, 0}));
    EXPECT_TRUE(std::isnan(safeNormalize({nan, 0, 0}).x));
}
