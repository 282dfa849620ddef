#include "SurfaceBand.h"

#include "NearestPoint.h"
#include "files/WorkMeter.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <memory>
#include <unordered_map>

namespace ModelingProgram {

using TSR::TileTree3D::IJK;
using TSR::TileTree3D::Voxel;

namespace {

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
            // Long triangles are bisected, because the band fills a large part of the bounding box only around small
            // pieces.
            constexpr double kLongest = 16;
            std::size_t longest = 0;
            double lengths[3];
            for (std::size_t side = 0; side != 3; ++side) {
                double3 const along = triangle[(side + 1) % 3].position - triangle[side].position;
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
            result.reserve(voxelCount_);
            for (std::uint64_t const key : keys) {
                stopIfCancelled();
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

        static constexpr int kBlockSide = 8;
        static constexpr double kBytesPerBlock =
            12.0 * kBlockSide * kBlockSide * kBlockSide + 100; // including its entry in the map

    private:
        static constexpr int kBlockVoxels = kBlockSide * kBlockSide * kBlockSide;
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
                auto const [low, high] = std::minmax({t[0].position.*axis, t[1].position.*axis, t[2].position.*axis});
                return std::pair(
                    static_cast<int>(std::ceil(low - halfWidth_)), static_cast<int>(std::floor(high + halfWidth_)));
            };
            auto const [i0, i1] = range(&double3::x);
            auto const [j0, j1] = range(&double3::y);
            auto const [k0, k1] = range(&double3::z);
            for (int k = k0; k <= k1; ++k)
                for (int j = j0; j <= j1; ++j) {
                    stopIfCancelled(); // a wide band has many voxels around one piece
                    for (int i = i0; i <= i1; ++i)
                        offer(t, i, j, k);
                }
        }

        void offer(Triangle const& triangle, int i, int j, int k)
        {
            double3 const p{static_cast<double>(i), static_cast<double>(j), static_cast<double>(k)};
            Corner const nearest = nearestOf(triangle, p);
            double3 const away = nearest.position - p;
            double const distance = dot(away, away);
            if (!(distance <= halfWidth_ * halfWidth_))
                return;
            auto const x = static_cast<unsigned int>(i - lowest_.i), y = static_cast<unsigned int>(j - lowest_.j),
                       z = static_cast<unsigned int>(k - lowest_.k);
            Block& block = blockOf(x / kBlockSide, y / kBlockSide, z / kBlockSide);
            std::size_t const voxel =
                x % kBlockSide + (y % kBlockSide + std::size_t{z % kBlockSide} * kBlockSide) * kBlockSide;
            if (distance < block.distance[voxel]) {
                voxelCount_ += block.distance[voxel] == kFar ? 1u : 0u;
                block.distance[voxel] = distance;
                block.value[voxel] = valueAt(nearest);
            }
        }

        float valueAt(Corner const& corner) const
        {
            if (!value_.distanceTo)
                return static_cast<float>(corner.number);
            double3 const p{
                corner.position.x * voxelSize_, corner.position.y * voxelSize_, corner.position.z * voxelSize_};
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

        IJK lowest_; // lower bound of all voxels
        SurfaceValue const& value_;
        double voxelSize_;
        double halfWidth_;
        std::unordered_map<std::uint64_t, std::unique_ptr<Block>> blocks_;
        Block* last_ = nullptr;
        std::uint64_t lastKey_ = 0;
        std::uint64_t voxelCount_ = 0;
    };

    /// The extent of the band: all of its voxels are at or above `lowest`.
    struct Reach {
        IJK lowest;
        std::array<double, 3> sides; // in voxels
    };

    Reach reachOf(MeshArrays const& mesh, double voxelSize, double halfWidth)
    {
        constexpr double kMostAlong = 1 << 24, kFarthest = 2e9;
        int lowest[3];
        Reach reach;
        for (std::size_t axis = 0; axis != 3; ++axis) {
            double low = std::numeric_limits<double>::infinity(), high = -low;
            for (float3 const& p : *mesh.positions) {
                double const coordinate = (axis == 0 ? p.x : axis == 1 ? p.y : p.z) / voxelSize;
                low = std::min(low, coordinate - halfWidth - 1);
                high = std::max(high, coordinate + halfWidth + 1);
            }
            if (!(high - low < kMostAlong && std::abs(low) < kFarthest && std::abs(high) < kFarthest))
                throw Failure(ExitCode::Refused,
                    "the voxels are too small: there would be more than 16 million of them along the mesh, or more "
                    "than "
                    "2 billion between the origin and the mesh");
            lowest[axis] = static_cast<int>(std::floor(low));
            reach.sides[axis] = high - low;
        }
        reach.lowest = {lowest[0], lowest[1], lowest[2]};
        return reach;
    }

    double3 inVoxels(float3 const& p, double voxelSize)
    {
        return {p.x / voxelSize, p.y / voxelSize, p.z / voxelSize};
    }

}

BandSize estimateBand(MeshArrays const& mesh, double voxelSize, double halfWidth)
{
    if (mesh.faceCount() == 0)
        return {};
    // A band around a planar piece contains its area times the width. It intersects the cubic blocks of side s whose
    // centers are within half the width plus half the block's extent along the normal n, which is s (|nx| + |ny| +
    // |nz|).
    constexpr double kBlockVoxels = Band::kBlockSide * Band::kBlockSide * Band::kBlockSide, kPi = 3.14159265358979;
    double voxels = 0, touched = 0;
    for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
        auto const corners = mesh.corners(face);
        for (std::size_t i = 2; i < corners.size(); ++i) {
            double3 const origin = inVoxels((*mesh.positions)[corners[0]], voxelSize);
            double3 const a = inVoxels((*mesh.positions)[corners[i - 1]], voxelSize) - origin;
            double3 const b = inVoxels((*mesh.positions)[corners[i]], voxelSize) - origin;
            double3 const n = cross(a, b);
            voxels += halfWidth * length(n);
            touched += halfWidth * length(n) + 0.5 * Band::kBlockSide * (std::abs(n.x) + std::abs(n.y) + std::abs(n.z));
        }
    }
    auto const sides = reachOf(mesh, voxelSize, halfWidth).sides;
    double const box = sides[0] * sides[1] * sides[2];
    // A band wider than the surface is about as large as the parallel body of a convex body (Steiner's formula).
    double const meanWidth = std::max(0.0, (sides[0] + sides[1] + sides[2]) / 2 - 3 * (halfWidth + 1));
    auto const around = [&](double width) {
        return width * (voxels / (2 * halfWidth) + 2 * kPi * width * (meanWidth + width * 2 / 3));
    };
    BandSize size;
    size.voxels = std::min(std::max(voxels, around(halfWidth)), box);
    double const blocks = std::min(std::max(touched, around(halfWidth + Band::kBlockSide / 2.0)), box) / kBlockVoxels;
    // An OpenVDB leaf per block, the bytes of the file per voxel (their buffer doubles as it grows), and OpenVDB
    // itself.
    constexpr double kWrittenPerBlock = 2300, kWrittenPerVoxel = 12, kCodecBytes = 32e6;
    size.bytes = kCodecBytes + size.voxels * sizeof(Voxel)
        + std::max(blocks * Band::kBytesPerBlock, blocks * kWrittenPerBlock + size.voxels * kWrittenPerVoxel);
    return size;
}

std::vector<Voxel> voxelsAround(MeshArrays const& mesh, SurfaceValue const& value, double voxelSize, double halfWidth)
{
    constexpr unsigned int kFacesBetweenChecks = 1024;
    if (mesh.faceCount() == 0)
        return {};
    Band band(reachOf(mesh, voxelSize, halfWidth).lowest, value, voxelSize, halfWidth);
    auto const cornerAt = [&](unsigned int point) {
        return Corner{inVoxels((*mesh.positions)[point], voxelSize),
            value.pointNumbers.empty() ? 0 : double{value.pointNumbers[point]}};
    };
    workMeter.begin("faces", mesh.faceCount());
    for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
        if (face % kFacesBetweenChecks == 0) {
            stopIfCancelled();
            workMeter.set(face);
        }
        auto const corners = mesh.corners(face);
        for (std::size_t i = 2; i < corners.size(); ++i)
            band.add({cornerAt(corners[0]), cornerAt(corners[i - 1]), cornerAt(corners[i])});
    }
    return band.voxels();
}

}
