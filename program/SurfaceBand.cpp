#include "SurfaceBand.h"

#include "Cancellation.h"
#include "Failure.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <memory>
#include <unordered_map>

namespace ModelingProgram {

using Tessara::Math::double3;
using Tessara::Math::float3;
using TSR::TileTree3D::IJK;
using TSR::TileTree3D::Voxel;

namespace {

    /// A corner of a piece of surface, in voxels.
    struct Corner {
        double3 place;
        double number;
    };
    using Triangle = std::array<Corner, 3>;

    double3 operator-(double3 const& a, double3 const& b)
    {
        return {a.x - b.x, a.y - b.y, a.z - b.z};
    }

    double dot(double3 const& a, double3 const& b)
    {
        return a.x * b.x + a.y * b.y + a.z * b.z;
    }

    Corner blend(Corner const& a, Corner const& b, double t)
    {
        auto const between = [t](double from, double to) { return from + t * (to - from); };
        return {{between(a.place.x, b.place.x), between(a.place.y, b.place.y), between(a.place.z, b.place.z)},
            between(a.number, b.number)};
    }

    /// The nearest place of a triangle. Ericson, "Real-Time Collision Detection", 2005, 5.1.5.
    Corner nearestOf(Triangle const& triangle, double3 const& p)
    {
        auto const& [a, b, c] = triangle;
        double3 const ab = b.place - a.place, ac = c.place - a.place;
        double3 const ap = p - a.place, bp = p - b.place, cp = p - c.place;
        double const abA = dot(ab, ap), acA = dot(ac, ap);
        if (abA <= 0 && acA <= 0)
            return a;
        double const abB = dot(ab, bp), acB = dot(ac, bp);
        if (abB >= 0 && acB <= abB)
            return b;
        double const areaC = abA * acB - abB * acA;
        if (areaC <= 0 && abA >= 0 && abB <= 0)
            return blend(a, b, abA / (abA - abB));
        double const abC = dot(ab, cp), acC = dot(ac, cp);
        if (acC >= 0 && abC <= acC)
            return c;
        double const areaB = abC * acA - abA * acC;
        if (areaB <= 0 && acA >= 0 && acC <= 0)
            return blend(a, c, acA / (acA - acC));
        double const areaA = abB * acC - abC * acB;
        double const beyondB = acB - abB, beyondC = abC - acC;
        if (areaA <= 0 && beyondB >= 0 && beyondC >= 0)
            return blend(b, c, beyondB / (beyondB + beyondC));
        double const area = areaA + areaB + areaC, v = areaB / area, w = areaC / area;
        return {{a.place.x + ab.x * v + ac.x * w, a.place.y + ab.y * v + ac.y * w, a.place.z + ab.z * v + ac.z * w},
            a.number + (b.number - a.number) * v + (c.number - a.number) * w};
    }

    class Band {
    public:
        Band(IJK const& lowest, SurfaceValue const& value, double voxelSize, double halfWidth)
            : lowest_(lowest)
            , value_(value)
            , voxelSize_(voxelSize)
            , halfWidth_(halfWidth)
        {
        }

        void add(Triangle const& triangle)
        {
            // Small pieces have small boxes, of which the band fills a large part.
            constexpr double kLongest = 16;
            std::size_t longest = 0;
            double lengths[3];
            for (std::size_t side = 0; side != 3; ++side) {
                double3 const along = triangle[(side + 1) % 3].place - triangle[side].place;
                lengths[side] = dot(along, along);
                if (lengths[side] > lengths[longest])
                    longest = side;
            }
            if (lengths[longest] <= kLongest * kLongest) {
                addPiece(triangle);
                return;
            }
            Corner const &from = triangle[longest], &to = triangle[(longest + 1) % 3],
                         &opposite = triangle[(longest + 2) % 3];
            Corner const middle = blend(from, to, 0.5);
            add({from, middle, opposite});
            add({middle, to, opposite});
        }

        std::vector<Voxel> voxels() const
        {
            std::vector<std::uint64_t> keys;
            keys.reserve(blocks_.size());
            for (auto const& [key, block] : blocks_)
                keys.push_back(key);
            std::sort(keys.begin(), keys.end());
            std::vector<Voxel> result;
            for (std::uint64_t const key : keys) {
                Block const& block = *blocks_.at(key);
                auto const firstOf = [key](
                                         int shift) { return static_cast<int>(key >> shift & kAxisMask) * kBlockSide; };
                int const i = firstOf(0), j = firstOf(kAxisBits), k = firstOf(2 * kAxisBits);
                for (int v = 0; v != kBlockVoxels; ++v)
                    if (block.distance[static_cast<std::size_t>(v)] < kFar)
                        result.push_back({lowest_.i + i + v % kBlockSide, lowest_.j + j + v / kBlockSide % kBlockSide,
                            lowest_.k + k + v / (kBlockSide * kBlockSide), block.value[static_cast<std::size_t>(v)]});
            }
            return result;
        }

    private:
        static constexpr int kBlockSide = 8, kBlockVoxels = kBlockSide * kBlockSide * kBlockSide;
        static constexpr int kAxisBits = 21;
        static constexpr std::uint64_t kAxisMask = (1 << kAxisBits) - 1;
        static constexpr double kFar = std::numeric_limits<double>::infinity();

        struct Block {
            Block() { distance.fill(kFar); }
            std::array<double, kBlockVoxels> distance; // squared, in voxels
            std::array<float, kBlockVoxels> value;
        };

        void addPiece(Triangle const& t)
        {
            auto const range = [&](double double3::*axis) {
                auto const [low, high] = std::minmax({t[0].place.*axis, t[1].place.*axis, t[2].place.*axis});
                return std::pair(
                    static_cast<int>(std::ceil(low - halfWidth_)), static_cast<int>(std::floor(high + halfWidth_)));
            };
            auto const [i0, i1] = range(&double3::x);
            auto const [j0, j1] = range(&double3::y);
            auto const [k0, k1] = range(&double3::z);
            for (int k = k0; k <= k1; ++k)
                for (int j = j0; j <= j1; ++j)
                    for (int i = i0; i <= i1; ++i)
                        offer(t, i, j, k);
        }

        void offer(Triangle const& triangle, int i, int j, int k)
        {
            double3 const p{static_cast<double>(i), static_cast<double>(j), static_cast<double>(k)};
            Corner const nearest = nearestOf(triangle, p);
            double3 const away = nearest.place - p;
            double const distance = dot(away, away);
            if (!(distance <= halfWidth_ * halfWidth_))
                return;
            auto const x = static_cast<unsigned int>(i - lowest_.i), y = static_cast<unsigned int>(j - lowest_.j),
                       z = static_cast<unsigned int>(k - lowest_.k);
            Block& block = blockOf(x / kBlockSide, y / kBlockSide, z / kBlockSide);
            std::size_t const voxel =
                x % kBlockSide + (y % kBlockSide + std::size_t{z % kBlockSide} * kBlockSide) * kBlockSide;
            if (distance < block.distance[voxel]) {
                block.distance[voxel] = distance;
                block.value[voxel] = valueAt(nearest);
            }
        }

        float valueAt(Corner const& corner) const
        {
            if (!value_.distanceTo)
                return static_cast<float>(corner.number);
            double3 const p{corner.place.x * voxelSize_, corner.place.y * voxelSize_, corner.place.z * voxelSize_};
            double3 const away = p - *value_.distanceTo;
            return static_cast<float>(std::sqrt(dot(away, away)));
        }

        Block& blockOf(unsigned int x, unsigned int y, unsigned int z)
        {
            std::uint64_t const key = x | std::uint64_t{y} << kAxisBits | std::uint64_t{z} << 2 * kAxisBits;
            if (!last_ || lastKey_ != key) {
                std::unique_ptr<Block>& block = blocks_[key];
                if (!block)
                    block = std::make_unique<Block>();
                last_ = block.get();
                lastKey_ = key;
            }
            return *last_;
        }

        IJK lowest_; // no voxel lies below
        SurfaceValue const& value_;
        double voxelSize_;
        double halfWidth_;
        std::unordered_map<std::uint64_t, std::unique_ptr<Block>> blocks_;
        Block* last_ = nullptr;
        std::uint64_t lastKey_ = 0;
    };

    /// The lower corner of what the band can reach.
    IJK lowestVoxel(MeshArrays const& mesh, double voxelSize, double halfWidth)
    {
        constexpr double kMostAlong = 1 << 24, kFarthest = 2e9;
        int lowest[3];
        for (int axis = 0; axis != 3; ++axis) {
            double low = std::numeric_limits<double>::infinity(), high = -low;
            for (float3 const& p : *mesh.positions) {
                double const coordinate = (axis == 0 ? p.x : axis == 1 ? p.y : p.z) / voxelSize;
                low = std::min(low, coordinate - halfWidth - 1);
                high = std::max(high, coordinate + halfWidth + 1);
            }
            if (!(high - low < kMostAlong && std::abs(low) < kFarthest && std::abs(high) < kFarthest))
                throw Failure(ExitCode::Refused,
                    "voxels of that size are too small: there would be more than 16 million of them along the mesh, or "
                    "more than 2 billion from the origin to the mesh");
            lowest[axis] = static_cast<int>(std::floor(low));
        }
        return {lowest[0], lowest[1], lowest[2]};
    }

}

std::vector<Voxel> voxelsAround(MeshArrays const& mesh, SurfaceValue const& value, double voxelSize, double halfWidth)
{
    constexpr unsigned int kFacesBetweenLooks = 1024;
    Band band(lowestVoxel(mesh, voxelSize, halfWidth), value, voxelSize, halfWidth);
    auto const cornerAt = [&](unsigned int point) {
        float3 const& p = (*mesh.positions)[point];
        return Corner{{p.x / voxelSize, p.y / voxelSize, p.z / voxelSize},
            value.pointNumbers.empty() ? 0 : double{value.pointNumbers[point]}};
    };
    for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
        if (face % kFacesBetweenLooks == 0)
            stopIfCancelled();
        auto const corners = mesh.corners(face);
        for (std::size_t i = 2; i < corners.size(); ++i)
            band.add({cornerAt(corners[0]), cornerAt(corners[i - 1]), cornerAt(corners[i])});
    }
    return band.voxels();
}

}
