#include "weighCorners.h"

#include "frame/Assert.h"
#include "frame/CornerArray.h"
#include "frame/Lanes.h"

#include <array>
#include <bit>
#include <cstdint>
#include <cstring>
#include <optional>

namespace Modeling::Internal {

namespace {

    constexpr float kLowestWeight = -0.2f; // a point with a lower weight is too far outside
    constexpr std::size_t kCornersPerBlock = 4; // lanes

    /// Four consecutive corners and the edges that start there, relative to a point in the plane. Lanes beyond the last
    /// corner of the polygon repeat corner 0, which comes after it.
    struct CornerBlock {
        Lanes x, y; // vectors from the point to the corners
        Lanes r; // their lengths
        IntLanes hasPoint; // the edges with the point on them
        Lanes startTerm, endTerm; // what the triangle of the point and an edge adds to the weights of the edge's ends
        Lanes weight;
    };
    /// Polygons of up to eight corners have spans of fixed extent, so that their loops are unrolled.
    template <std::size_t kExtent> using Blocks = std::span<CornerBlock, kExtent>;
    using Polygon = std::span<float3 const>;

    constexpr std::size_t blockCountOf(std::size_t cornerCount)
    {
        return (cornerCount + kCornersPerBlock - 1) / kCornersPerBlock;
    }

    /// The lanes that come one after those of `lanes`, of which the last is in `following`.
    Lanes lanesAfter(Lanes lanes, Lanes following)
    {
        Lanes const middle = __builtin_shufflevector(lanes, following, 3, 3, 4, 4);
        return __builtin_shufflevector(lanes, middle, 1, 2, 4, 6);
    }

    /// The lanes that come one before those of `lanes`, of which the first is in `preceding`.
    Lanes lanesBefore(Lanes preceding, Lanes lanes)
    {
        Lanes const middle = __builtin_shufflevector(preceding, lanes, 3, 3, 4, 4);
        return __builtin_shufflevector(middle, lanes, 0, 2, 5, 6);
    }

    /// The lanes that the mask selects, and -0 in the others, which leaves unchanged whatever it is added to.
    Lanes selectTerms(IntLanes mask, Lanes lanes)
    {
        return mask ? lanes : broadcast(-0.0f);
    }

    /// How many corners the lanes of a block have: only the last block may have less than four.
    template <std::size_t kExtent>
    std::size_t cornersIn(std::size_t block, std::size_t cornerCount, Blocks<kExtent> blocks)
    {
        return block + 1 == blocks.size() ? cornerCount - kCornersPerBlock * block : kCornersPerBlock;
    }

    /// The first values, at least one and at most four; the other lanes are -0. Reads value by value: callers have often
    /// just cleared the weights, by stores that a wide load would overlap in part, and have to wait for.
    Lanes loadFirst(std::size_t count, float const volatile* values)
    {
        return Lanes{
            values[0], count > 1 ? values[1] : -0.0f, count > 2 ? values[2] : -0.0f, count > 3 ? values[3] : -0.0f};
    }

    void storeFirst(std::size_t count, Lanes lanes, float* values)
    {
        if (count == kCornersPerBlock)
            return store(lanes, values);
        values[0] = lanes[0];
        if (count > 1)
            values[1] = lanes[1];
        if (count > 2)
            values[2] = lanes[2];
    }

    /// A mask of the first lanes, at most four.
    IntLanes firstLanes(std::size_t count)
    {
        static constexpr std::int32_t kMasks[2 * kCornersPerBlock] = {-1, -1, -1, -1};
        IntLanes mask;
        std::memcpy(&mask, kMasks + kCornersPerBlock - count, sizeof(mask));
        return mask;
    }

    /// Computes the vectors to the corners.
    template <std::size_t kExtent> void viewCorners(Polygon polygon, float3 const& point, Blocks<kExtent> blocks)
    {
        using Pairs = double __attribute__((vector_size(16)));
        for (std::size_t i = 0; i != blocks.size(); ++i) {
            std::size_t const count = cornersIn(i, polygon.size(), blocks);
            double xy[kCornersPerBlock];
            for (std::size_t lane = 0; lane != kCornersPerBlock; ++lane)
                std::memcpy(
                    &xy[lane], &polygon[lane == 0 || lane < count ? kCornersPerBlock * i + lane : 0], sizeof(double));
            auto const front = reinterpret_cast<Lanes>(Pairs{xy[0], xy[1]});
            auto const back = reinterpret_cast<Lanes>(Pairs{xy[2], xy[3]});
            CornerBlock& block = blocks[i];
            block.x = __builtin_shufflevector(front, back, 0, 2, 4, 6) - broadcast(point.x);
            block.y = __builtin_shufflevector(front, back, 1, 3, 5, 7) - broadcast(point.y);
            block.r = squareRoot(block.x * block.x + block.y * block.y);
        }
    }

    /// The first corner for which the rule selects a lane. Lanes that repeat corner 0 come too late to be the first.
    template <std::size_t kExtent, class Rule>
    std::optional<std::size_t> findFirst(Blocks<kExtent> blocks, Rule const& rule)
    {
        IntLanes found{};
        for (CornerBlock const& block : blocks)
            found |= rule(block);
        if (any(found))
            for (std::size_t i = 0; i != blocks.size(); ++i)
                if (unsigned int const bits = bitsOf(rule(blocks[i])))
                    return kCornersPerBlock * i + static_cast<std::size_t>(std::countr_zero(bits));
        return std::nullopt;
    }

    /// Measures the triangles of the point and the edges: in triangles with the angles α and β at the point, a corner at
    /// distance r has the weight 2 (tan(α / 2) + tan(β / 2)) / r.
    template <std::size_t kExtent> void measureTriangles(float areaTolerance, Blocks<kExtent> blocks)
    {
        for (std::size_t i = 0; i != blocks.size(); ++i) {
            CornerBlock& start = blocks[i];
            CornerBlock const& following = blocks[i + 1 == blocks.size() ? 0 : i + 1];
            Lanes const endX = lanesAfter(start.x, following.x), endY = lanesAfter(start.y, following.y);
            Lanes const endR = lanesAfter(start.r, following.r);
            Lanes const area = (endY * start.x - start.y * endX) * 0.5f; // signed
            Lanes const dot = start.y * endY + start.x * endX;
            start.hasPoint = (broadcast(areaTolerance) > abs(area)) & (Lanes{} > dot);
            // Near-flat triangles have no term: the point is on the line through the edge, beyond its ends.
            IntLanes const hasTerm = abs(area) >= broadcast(areaTolerance);
            start.startTerm = selectTerms(hasTerm, (endR - dot / start.r) / area);
            start.endTerm = selectTerms(hasTerm, (start.r - dot / endR) / area);
        }
    }

    /// Weighs the ends of an edge by their distances. \return how many weights are too low
    std::size_t weighEdge(std::size_t edge, std::size_t cornerCount, CornerBlock const* blocks, float* weights)
    {
        std::size_t const next = edge + 1 == cornerCount ? 0 : edge + 1;
        auto const distanceTo = [=](std::size_t corner) {
            return blocks[corner / kCornersPerBlock].r[corner % kCornersPerBlock];
        };
        weights[edge] = distanceTo(next) / (distanceTo(next) + distanceTo(edge));
        weights[next] = 1.0f - weights[edge];
        return std::size_t{kLowestWeight > weights[edge]} + std::size_t{kLowestWeight > weights[next]};
    }

    /// Adds the terms of the triangles to the weights. \return the sum of the weights
    template <std::size_t kExtent> float addTerms(std::size_t cornerCount, float const* weights, Blocks<kExtent> blocks)
    {
        float sum = 0;
        Lanes preceding = broadcast(blocks.back().endTerm[(cornerCount - 1) % kCornersPerBlock]);
        for (std::size_t i = 0; i != blocks.size(); ++i) {
            CornerBlock& block = blocks[i];
            std::size_t const count = cornersIn(i, cornerCount, blocks);
            Lanes const started =
                loadFirst(count, weights + kCornersPerBlock * i) + lanesBefore(preceding, block.endTerm);
            block.weight = selectTerms(firstLanes(count), started + block.startTerm);
            for (std::size_t lane = 0; lane != kCornersPerBlock; ++lane)
                sum += block.weight[lane];
            preceding = block.endTerm;
        }
        return sum;
    }

    /// Writes the weights divided by their sum. \return how many of them are too low
    template <std::size_t kExtent>
    std::size_t normalize(float sum, std::size_t cornerCount, Blocks<kExtent> blocks, float* weights)
    {
        IntLanes tooLow{};
        for (std::size_t i = 0; i != blocks.size(); ++i) {
            std::size_t const count = cornersIn(i, cornerCount, blocks);
            Lanes const weight = blocks[i].weight / sum;
            storeFirst(count, weight, weights + kCornersPerBlock * i);
            tooLow += (broadcast(kLowestWeight) > weight) & firstLanes(count); // -1 for each
        }
        return any(tooLow) ? static_cast<std::size_t>(-(tooLow[0] + tooLow[1] + tooLow[2] + tooLow[3])) : 0;
    }

    template <std::size_t kExtent> PlaceInPolygon weighCornersIn(Blocks<kExtent> blocks, Polygon polygon,
        float3 const& point, float tolerance, float areaTolerance, float* weights)
    {
        viewCorners(polygon, point, blocks);
        auto const corner = findFirst(blocks, [=](CornerBlock const& block) { return broadcast(tolerance) > block.r; });
        if (corner) {
            weights[*corner] = 1.0f;
            return {.isAtCorner = true};
        }
        measureTriangles(areaTolerance, blocks);
        if (auto const edge = findFirst(blocks, [](CornerBlock const& block) { return block.hasPoint; }))
            return {.edge = static_cast<unsigned int>(*edge),
                .tooFarOutside = weighEdge(*edge, polygon.size(), blocks.data(), weights)};
        float const sum = addTerms(polygon.size(), weights, blocks);
        return {.tooFarOutside = normalize(sum, polygon.size(), blocks, weights)};
    }

}

PlaceInPolygon weighCorners(Polygon polygon, float3 const& point, float tolerance, float areaTolerance, float* weights)
{
    MODELING_ASSERT(!polygon.empty());
    auto const weighIn = [&](auto blocks) {
        return weighCornersIn(blocks, polygon, point, tolerance, areaTolerance, weights);
    };
    std::size_t const blockCount = blockCountOf(polygon.size());
    if (blockCount == 1) {
        std::array<CornerBlock, 1> blocks;
        return weighIn(Blocks<1>(blocks));
    }
    if (blockCount == 2) {
        std::array<CornerBlock, 2> blocks;
        return weighIn(Blocks<2>(blocks));
    }
    CornerArray<CornerBlock, 4> blocks;
    return weighIn(Blocks<std::dynamic_extent>(blocks.take(blockCount), blockCount));
}

}
