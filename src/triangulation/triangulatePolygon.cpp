#include "triangulatePolygon.h"

#include "PolygonPlane.h"
#include "clipSmallPolygon.h"

#include "frame/Assert.h"

#include <TessaraGeometry/Names.h>
#include <TessaraSpatial/SpatialQuery.h>

#include <cmath>
#include <limits>
#include <optional>

namespace Modeling::Internal {

using Tessara::Geometry::kInvalidIndex;
using Tessara::Math::float2;
using namespace Tessara::SpatialQuery;

namespace {

    constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
    constexpr float kInfinity = std::numeric_limits<float>::infinity();

    constexpr std::size_t kBlockSize = 32;

    void writeFan(std::span<unsigned int> triangles)
    {
        for (std::size_t triangle = 0; triangle < triangles.size() / 3; ++triangle) {
            triangles[3 * triangle] = 0;
            triangles[3 * triangle + 1] = static_cast<unsigned int>(triangle + 1);
            triangles[3 * triangle + 2] = static_cast<unsigned int>(triangle + 2);
        }
    }

    struct Box {
        float2 min, max;

        bool contains(float2 const& p) const { return p.x >= min.x && p.x <= max.x && p.y >= min.y && p.y <= max.y; }
        bool overlaps(PolygonStorage::Block const& block) const
        {
            return block.min.x <= max.x && block.max.x >= min.x && block.min.y <= max.y && block.max.y >= min.y;
        }
    };

    /// A polygon whose ears are being clipped.
    class EarClipping {
    public:
        EarClipping(std::span<float3 const> positions, PolygonStorage& storage)
            : positions_(positions)
            , corners_(storage.corners.take(positions.size()), positions.size())
            , blocks_(storage.blocks.take(blockCountOf(positions.size())), blockCountOf(positions.size()))
        {
        }

        /// \return false if no ear is left before the end; the triangles written so far are then useless
        bool run(Quaternion const& rotation, std::span<unsigned int> triangles)
        {
            project(rotation);
            findEars();
            std::size_t const triangleCount = positions_.size() - 2;
            for (std::size_t triangle = 0; triangle != triangleCount; ++triangle) {
                unsigned int const ear = nextEar();
                if (ear == kInvalidIndex)
                    return false;
                unsigned int const previous = corners_[ear].previous;
                unsigned int const next = corners_[ear].next;
                triangles[3 * triangle] = previous;
                triangles[3 * triangle + 1] = ear;
                triangles[3 * triangle + 2] = next;
                clip(ear);
                // All other ears have kept their neighbors, so they are still ears.
                testEar(previous);
                testEar(next);
            }
            return true;
        }

    private:
        static std::size_t blockCountOf(std::size_t cornerCount) { return (cornerCount + kBlockSize - 1) / kBlockSize; }

        std::span<PolygonStorage::Corner> cornersOf(std::size_t block) const
        {
            std::size_t const first = block * kBlockSize;
            return corners_.subspan(first, std::min(kBlockSize, corners_.size() - first));
        }

        void project(Quaternion const& rotation)
        {
            auto const count = static_cast<unsigned int>(positions_.size());
            for (unsigned int i = 0; i != count; ++i) {
                PolygonStorage::Corner& corner = corners_[i];
                corner.projected = rotateAndDropZ<float2>(rotation, positions_[i]);
                corner.previous = (i == 0 ? count : i) - 1;
                corner.next = i + 1 == count ? 0 : i + 1;
                corner.toNext = directionBetween(i, corner.next);
            }
            for (std::size_t block = 0; block != blocks_.size(); ++block) {
                float2 min{kInfinity, kInfinity};
                float2 max{-kInfinity, -kInfinity};
                for (PolygonStorage::Corner const& corner : cornersOf(block)) {
                    float2 const& p = corner.projected;
                    min = {std::min(min.x, p.x), std::min(min.y, p.y)}; // ignores NaN
                    max = {std::max(max.x, p.x), std::max(max.y, p.y)};
                }
                blocks_[block] = {min, max, 0};
            }
        }

        void findEars()
        {
            for (unsigned int i = 0; i != corners_.size(); ++i)
                testEar(i);
        }

        float3 directionBetween(unsigned int start, unsigned int end) const
        {
            return safeNormalize(positions_[end] - positions_[start]);
        }

        void testEar(unsigned int i)
        {
            PolygonStorage::Corner& corner = corners_[i];
            corner.sharpness = isEar(i) ? sharpnessBetween(corners_[corner.previous].toNext, corner.toNext) : kNoEar;
            float& sharpest = blocks_[i / kBlockSize].sharpest;
            sharpest = std::min(sharpest, corner.sharpness);
        }

        bool isEar(unsigned int i) const
        {
            PolygonStorage::Corner const& corner = corners_[i];
            PolygonStorage::Corner const& before = corners_[corner.previous];
            PolygonStorage::Corner const& after = corners_[corner.next];
            return isCounterClockwise(before.projected, corner.projected, after.projected) && !containsOtherCorner(i);
        }

        /// Whether another live corner is inside the triangle at corner i.
        bool containsOtherCorner(unsigned int i) const
        {
            unsigned int const before = corners_[i].previous;
            unsigned int const after = corners_[i].next;
            float2 const& a = corners_[before].projected;
            float2 const& b = corners_[i].projected;
            float2 const& c = corners_[after].projected;
            Box const box{{std::min({a.x, b.x, c.x}), std::min({a.y, b.y, c.y})},
                {std::max({a.x, b.x, c.x}), std::max({a.y, b.y, c.y})}};
            for (std::size_t block = 0; block != blocks_.size(); ++block) {
                if (!box.overlaps(blocks_[block]))
                    continue;
                std::size_t const end = std::min((block + 1) * kBlockSize, corners_.size());
                for (std::size_t other = block * kBlockSize; other != end; ++other) {
                    float2 const& p = corners_[other].projected;
                    if (!box.contains(p) || other == before || other == i || other == after)
                        continue;
                    float u, v, w;
                    if (pointInTriangle(p, a, b, c, u, v, w, nullptr))
                        return true;
                }
            }
            return false;
        }

        /// The sharpest ear, up to `kSharper` in favor of earlier ones; `kInvalidIndex` if there is none.
        unsigned int nextEar()
        {
            unsigned int best = kInvalidIndex;
            float sharpest = kNoEar;
            for (std::size_t block = 0; block != blocks_.size(); ++block) {
                if (!(sharpest > blocks_[block].sharpest + kSharper))
                    continue;
                float sharpestHere = kNoEar;
                std::size_t const end = std::min((block + 1) * kBlockSize, corners_.size());
                for (std::size_t i = block * kBlockSize; i != end; ++i) {
                    float const sharpness = corners_[i].sharpness;
                    if (sharpest > sharpness + kSharper) {
                        sharpest = sharpness;
                        best = static_cast<unsigned int>(i);
                    }
                    sharpestHere = std::min(sharpestHere, sharpness);
                }
                blocks_[block].sharpest = sharpestHere;
            }
            return best;
        }

        void clip(unsigned int ear)
        {
            PolygonStorage::Corner& corner = corners_[ear];
            corners_[corner.previous].next = corner.next;
            corners_[corner.next].previous = corner.previous;
            corners_[corner.previous].toNext = directionBetween(corner.previous, corner.next);
            corner.projected = {kNaN, kNaN};
            corner.sharpness = kNoEar;
        }

        std::span<float3 const> positions_;
        std::span<PolygonStorage::Corner> corners_;
        std::span<PolygonStorage::Block> blocks_;
    };

}

void triangulatePolygon(std::span<float3 const> corners, std::span<unsigned int> triangles, PolygonStorage& storage)
{
    MODELING_ASSERT(corners.size() >= 2 && triangles.size() == 3 * (corners.size() - 2));
    bool isCut = false;
    if (corners.size() > 3)
        if (std::optional<Quaternion> const rotation = findPlane(corners))
            isCut = corners.size() <= kSmallPolygon ? clipSmallPolygon(corners, *rotation, triangles)
                                                    : EarClipping(corners, storage).run(*rotation, triangles);
    if (!isCut)
        writeFan(triangles);
    MODELING_ASSERT(areBelow(corners.size(), triangles.data(), triangles.size()));
}

}
