#include "SurfaceTree.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>
#include <tbb/parallel_sort.h>

#include <algorithm>
#include <bit>
#include <cstdint>
#include <limits>
#include <utility>

namespace ModelingProgram {

namespace {

    constexpr std::size_t kTrianglesPerLeaf = 4;
    constexpr std::size_t kGrain = 1000;
    constexpr float kInfinity = std::numeric_limits<float>::infinity();
    constexpr unsigned int kBitsPerAxis = 21;

    template <class Body> void parallelFor(std::size_t begin, std::size_t end, Body const& body)
    {
        tbb::parallel_for(tbb::blocked_range<std::size_t>(begin, end, kGrain), [&](auto const& range) {
            for (std::size_t i = range.begin(); i != range.end(); ++i)
                body(i);
        });
    }

    /// Inserts two zero bits after each bit of a 21-bit number.
    std::uint64_t spread(std::uint64_t bits)
    {
        bits = (bits | bits << 32) & 0x001f00000000ffffu;
        bits = (bits | bits << 16) & 0x001f0000ff0000ffu;
        bits = (bits | bits << 8) & 0x100f00f00f00f00fu;
        bits = (bits | bits << 4) & 0x10c30c30c30c30c3u;
        return (bits | bits << 2) & 0x1249249249249249u;
    }

    /// The cell of a coordinate along a range; 0 if the coordinate is NaN.
    std::uint64_t cellOf(double coordinate, double low, double high)
    {
        constexpr double kCells = (1 << kBitsPerAxis) - 1;
        double const share = (coordinate - low) / (high - low);
        return share > 0 ? static_cast<std::uint64_t>(std::min(share, 1.0) * kCells) : 0;
    }

    template <class Box> double squaredDistanceTo(Box const& box, double3 const& point)
    {
        auto const outside = [](double low, double high, double at) { return std::max({low - at, at - high, 0.0}); };
        double const x = outside(box.min.x, box.max.x, point.x), y = outside(box.min.y, box.max.y, point.y),
                     z = outside(box.min.z, box.max.z, point.z);
        return x * x + y * y + z * z;
    }

}

SurfaceTree::SurfaceTree(MeshArrays const& surface)
    : surface_(surface)
{
    triangles_.reserve(surface_.cornerCount());
    for (unsigned int face = 0; face != surface_.faceCount(); ++face)
        addFan(face);
    build();
}

SurfaceTree::SurfaceTree(MeshArrays const& surface, std::span<unsigned int const> faces)
    : surface_(surface)
{
    for (unsigned int const face : faces)
        addFan(face);
    build();
}

void SurfaceTree::addFan(unsigned int face)
{
    auto const corners = surface_.corners(face);
    for (std::size_t i = 2; i < corners.size(); ++i)
        triangles_.push_back({corners[0], corners[i - 1], corners[i]});
}

void SurfaceTree::build()
{
    if (triangles_.empty())
        return;
    sortTriangles();
    buildBoxes();
}

void SurfaceTree::sortTriangles()
{
    std::vector<Corners> const unordered = std::move(triangles_);
    Box all{{kInfinity, kInfinity, kInfinity}, {-kInfinity, -kInfinity, -kInfinity}};
    for (float3 const& p : *surface_.positions)
        all = {lowerCorner(all.min, p), upperCorner(all.max, p)};

    std::vector<std::pair<std::uint64_t, unsigned int>> order(unordered.size());
    parallelFor(0, order.size(), [&](std::size_t i) {
        double3 sum{0, 0, 0};
        for (unsigned int const point : unordered[i])
            sum = sum + inDoubles((*surface_.positions)[point]);
        order[i] = {spread(cellOf(sum.x / 3, all.min.x, all.max.x))
                | spread(cellOf(sum.y / 3, all.min.y, all.max.y)) << 1
                | spread(cellOf(sum.z / 3, all.min.z, all.max.z)) << 2,
            static_cast<unsigned int>(i)};
    });
    tbb::parallel_sort(order.begin(), order.end());
    triangles_ = std::vector<Corners>(unordered.size());
    parallelFor(0, order.size(), [&](std::size_t i) { triangles_[i] = unordered[order[i].second]; });
}

SurfaceTree::Box SurfaceTree::boxOfLeaf(std::size_t leaf) const
{
    Box box{{kInfinity, kInfinity, kInfinity}, {-kInfinity, -kInfinity, -kInfinity}};
    std::size_t const end = std::min((leaf + 1) * kTrianglesPerLeaf, triangles_.size());
    for (std::size_t i = leaf * kTrianglesPerLeaf; i < end; ++i)
        for (unsigned int const point : triangles_[i])
            box = {
                lowerCorner(box.min, (*surface_.positions)[point]), upperCorner(box.max, (*surface_.positions)[point])};
    return box;
}

void SurfaceTree::buildBoxes()
{
    leafCount_ = std::bit_ceil((triangles_.size() + kTrianglesPerLeaf - 1) / kTrianglesPerLeaf);
    boxes_.resize(2 * leafCount_);
    parallelFor(0, leafCount_, [&](std::size_t leaf) { boxes_[leafCount_ + leaf] = boxOfLeaf(leaf); });
    // Level by level. Each node writes only itself and reads the level below.
    for (std::size_t level = leafCount_ / 2; level != 0; level /= 2)
        parallelFor(level, 2 * level, [&](std::size_t node) {
            Box const &a = boxes_[2 * node], &b = boxes_[2 * node + 1];
            boxes_[node] = {lowerCorner(a.min, b.min), upperCorner(a.max, b.max)};
        });
}

double SurfaceTree::squaredDistanceInLeaf(std::size_t leaf, double3 const& point) const
{
    double nearest = std::numeric_limits<double>::infinity();
    std::size_t const end = std::min((leaf + 1) * kTrianglesPerLeaf, triangles_.size());
    for (std::size_t i = leaf * kTrianglesPerLeaf; i < end; ++i) {
        auto const cornerAt = [&](std::size_t corner) {
            return Corner{inDoubles((*surface_.positions)[triangles_[i][corner]]), 0};
        };
        double3 const away = nearestOf({cornerAt(0), cornerAt(1), cornerAt(2)}, point).position - point;
        // Some triangles without area give NaN, which `min` ignores here; other triangles share their edges.
        nearest = std::min(nearest, dot(away, away));
    }
    return nearest;
}

double SurfaceTree::squaredDistance(double3 const& point) const
{
    double nearest = std::numeric_limits<double>::infinity();
    if (boxes_.empty())
        return nearest;
    struct Node {
        std::size_t index;
        double distance;
    };
    // Each level replaces a node by its two children, so it adds one open node.
    std::array<Node, std::numeric_limits<std::size_t>::digits> open;
    std::size_t openCount = 0;
    open[openCount++] = {1, squaredDistanceTo(boxes_[1], point)};
    while (openCount != 0) {
        Node const node = open[--openCount];
        if (!(node.distance < nearest))
            continue;
        if (node.index >= leafCount_) {
            nearest = std::min(nearest, squaredDistanceInLeaf(node.index - leafCount_, point));
            continue;
        }
        Node near{2 * node.index, squaredDistanceTo(boxes_[2 * node.index], point)};
        Node far{2 * node.index + 1, squaredDistanceTo(boxes_[2 * node.index + 1], point)};
        if (far.distance < near.distance)
            std::swap(near, far);
        open[openCount++] = far;
        open[openCount++] = near;
    }
    return nearest;
}

}
