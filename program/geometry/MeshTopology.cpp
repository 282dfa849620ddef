#include "MeshTopology.h"

#include "ClosedFans.h"
#include "Creases.h"
#include "PointBlocks.h"
#include "PointStar.h"
#include "TriangleBatch.h"
#include "connectedComponents.h"
#include "sumOverBlocks.h"

#include "frame/grains.h"

#include <tbb/blocked_range.h>
#include <tbb/enumerable_thread_specific.h>
#include <tbb/parallel_for.h>
#include <tbb/parallel_sort.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <bit>
#include <utility>
#include <vector>

namespace ModelingProgram {

namespace {

    bool hasRepeatedPoint(std::span<unsigned int const> corners)
    {
        std::vector<unsigned int> sorted(corners.begin(), corners.end());
        std::sort(sorted.begin(), sorted.end());
        return std::adjacent_find(sorted.begin(), sorted.end()) != sorted.end();
    }

    void countFace(MeshArrays const& mesh, unsigned int face, MeshTopology& topology)
    {
        std::span<unsigned int const> const corners = mesh.corners(face);
        if (corners.size() < 3)
            topology.facesBelowThreeCorners.add(face);
        else if (corners.size() == 3)
            ++topology.triangleCount;
        else
            (corners.size() == 4 ? topology.quads : topology.polygons).add(face);
        if (corners.size() != 3 && hasRepeatedPoint(corners))
            topology.facesWithRepeatedPoints.add(face);
    }

    /// Without repeated points of triangles, which are found among those that are not closed fans.
    MeshTopology countFaces(MeshArrays const& mesh, bool areAllTriangles)
    {
        if (areAllTriangles) {
            MeshTopology topology;
            topology.triangleCount = mesh.faceCount();
            return topology;
        }
        return sumOverBlocks<MeshTopology>(mesh.faceCount(), [&](std::size_t blockBegin, std::size_t blockEnd) {
            auto const begin = static_cast<unsigned int>(blockBegin), end = static_cast<unsigned int>(blockEnd);
            MeshTopology topology;
            if (areTriangles(mesh, begin, end))
                topology.triangleCount = end - begin;
            else
                for (unsigned int face = begin; face != end; ++face)
                    countFace(mesh, face, topology);
            return topology;
        });
    }

    /// Examines the points of one block after the other, and adds up what it finds.
    class BlockExaminer {
    public:
        /// \param lowerInParts  one entry per point, set to a point of the same component that is not higher
        BlockExaminer(MeshArrays const& mesh, std::span<CreasesWithNormals const> creases, unsigned int* lowerInParts)
            : mesh_(mesh)
            , creases_(creases)
            , lowerInParts_(lowerInParts)
        {
        }

        void examine(PointBlocks const& blocks, unsigned int block)
        {
            blocks.list(block, corners_);
            sortByValence();
            for (std::size_t const valence : {std::size_t{0}, kMaxValence + 1})
                for (unsigned int const index : byValence_[valence])
                    examineStar(index);
            [this]<std::size_t... kSmaller>(std::index_sequence<kSmaller...>)
            {
                (examineFans<kSmaller + 1>(), ...);
            }
            (std::make_index_sequence<kMaxValence>());
        }

        MeshTopology const& found() const { return found_; }

    private:
        static constexpr std::size_t kMaxValence = 16;

        /// So that branches that depend on the valence are predictable.
        void sortByValence()
        {
            for (auto& indices : byValence_)
                indices.clear();
            for (unsigned int index = 0; index != corners_.pointCount(); ++index)
                byValence_[std::min<std::size_t>(corners_.countAt(index), byValence_.size() - 1)].push_back(index);
        }

        /// Examines the points with this many faces.
        template <std::size_t kValence> void examineFans()
        {
            std::span<unsigned int const> const indices = byValence_[kValence];
            for (std::size_t i = 0; i < indices.size(); i += kFans)
                examineFans<kValence>(indices.subspan(i, std::min(kFans, indices.size() - i)));
        }

        /// Examines up to four of them.
        template <std::size_t kValence> void examineFans(std::span<unsigned int const> indices)
        {
            std::array<unsigned int, kFans> points;
            std::array<CornerAtPoint const*, kFans> around;
            for (std::size_t i = 0; i != kFans; ++i) {
                unsigned int const index = indices[std::min(i, indices.size() - 1)];
                points[i] = corners_.firstPoint() + index;
                around[i] = corners_.at(index).data();
            }
            ClosedFans<kValence> const fans(points, around);
            auto const areClosed = fans.areClosed();
            auto const edgeCounts = fans.higherEdgeCounts();
            auto const lowest = fans.lowestPoints();
            for (std::size_t i = 0; i != indices.size(); ++i)
                if (areClosed[i] != 0) {
                    found_.edgeCount += static_cast<unsigned int>(edgeCounts[i]);
                    lowerInParts_[points[i]] = lowest[i];
                } else
                    examineStar(indices[i]);
            for (std::size_t k = 0; k != creases_.size(); ++k) {
                auto const spreads = squaredSpreads<kValence>(creases_[k].normals, around);
                for (std::size_t i = 0; i != indices.size(); ++i)
                    if (areClosed[i] != 0 && spreads[i] >= creases_[k].smoothSpread)
                        found_.sharpEdgeCounts[k] +=
                            countSharpEdges(creases_[k].creases, {around[i], kValence}, points[i]);
            }
        }

        /// The number of sharp edges to higher points in a closed fan.
        static unsigned int countSharpEdges(
            Creases const& creases, std::span<CornerAtPoint const> around, unsigned int point)
        {
            unsigned int count = 0;
            for (CornerAtPoint const& a : around)
                if (a.next > point)
                    for (CornerAtPoint const& b : around)
                        count += a.next == b.previous && creases.isSharp(a.face, b.face, true) ? 1u : 0u;
            return count;
        }

        void examineStar(unsigned int index)
        {
            unsigned int const point = corners_.firstPoint() + index;
            star_.examine(mesh_, corners_.at(index), point, creases_, found_);
            lowerInParts_[point] = point;
        }

        MeshArrays const& mesh_;
        std::span<CreasesWithNormals const> creases_;
        unsigned int* lowerInParts_;
        BlockCorners corners_;
        std::array<std::vector<unsigned int>, kMaxValence + 2> byValence_; // the last one is for all above
        PointStar star_;
        MeshTopology found_;
    };

    /// Also counts the components.
    MeshTopology examineFacesAndPoints(MeshArrays const& mesh, std::span<CreasesWithNormals const> creases)
    {
        Orvan::Array<unsigned int> lowerInParts(mesh.pointCount(), Orvan::kUninitialized);
        MeshTopology topology;
        {
            PointBlocks const blocks(mesh);
            topology = countFaces(mesh, blocks.areAllTriangles());
            tbb::enumerable_thread_specific<BlockExaminer> examiners(mesh, creases, lowerInParts.data);
            // Each thread adds up what it finds, and each point has its own entry of the array.
            tbb::parallel_for(
                0u, blocks.count(), [&](unsigned int block) { examiners.local().examine(blocks, block); });
            for (BlockExaminer const& examiner : examiners)
                topology += examiner.found();
        }
        topology.partCount = countConnectedComponents(mesh, std::move(lowerInParts), topology.isolatedPoints.count);
        return topology;
    }

}

bool MeshTopology::isClosedManifold() const
{
    return !facesBelowThreeCorners && !boundaryEdges && !nonManifoldEdges && !windingConflicts && !nonManifoldPoints;
}

MeshTopology& MeshTopology::operator+=(MeshTopology const& other)
{
    triangleCount += other.triangleCount;
    edgeCount += other.edgeCount;
    for (std::size_t i = 0; i != sharpEdgeCounts.size(); ++i)
        sharpEdgeCounts[i] += other.sharpEdgeCounts[i];
    for (Finding MeshTopology::*const finding : {&MeshTopology::facesBelowThreeCorners, &MeshTopology::quads,
             &MeshTopology::polygons, &MeshTopology::facesWithRepeatedPoints, &MeshTopology::boundaryEdges,
             &MeshTopology::nonManifoldEdges, &MeshTopology::windingConflicts, &MeshTopology::flippedEdges,
             &MeshTopology::nonManifoldPoints, &MeshTopology::isolatedPoints})
        this->*finding += other.*finding;
    return *this;
}

MeshTopology analyzeTopology(MeshArrays const& mesh, std::span<CreasesWithNormals const> creases)
{
    MeshTopology topology = examineFacesAndPoints(mesh, creases);
    if (topology.isClosedManifold()) {
        auto const points = static_cast<std::int64_t>(mesh.pointCount() - topology.isolatedPoints.count);
        std::int64_t const eulerCharacteristic =
            points - static_cast<std::int64_t>(topology.edgeCount) + std::int64_t{mesh.faceCount()};
        topology.genus = static_cast<std::int64_t>(topology.partCount) - eulerCharacteristic / 2;
    }
    return topology;
}

void addPartsAndGenus(MeshTopology const& topology, Json& values)
{
    values["parts"] = topology.partCount;
    values["genus"] = topology.genus ? Json(static_cast<std::uint64_t>(*topology.genus)) : Json();
}

Finding findIsolatedPoints(MeshArrays const& mesh)
{
    Orvan::Array<bool> isUsed(mesh.pointCount());
    // Threads may set the same entry, but all of them set it to true.
    tbb::parallel_for(
        tbb::blocked_range<std::uint64_t>(0, mesh.faceVertex->size, Modeling::kElementGrain), [&](auto const& corners) {
            for (std::uint64_t corner = corners.begin(); corner != corners.end(); ++corner)
                std::atomic_ref(isUsed[(*mesh.faceVertex)[corner]]).store(true, std::memory_order_relaxed);
        });
    Finding isolated;
    for (unsigned int point = 0; point != mesh.pointCount(); ++point)
        if (!isUsed[point])
            isolated.add(point);
    return isolated;
}

std::uint64_t countCoincidentPoints(MeshArrays const& mesh)
{
    // Bits are totally ordered, unlike floats with NaN. Adding 0 turns -0 into 0.
    std::vector<std::array<std::uint32_t, 3>> keys;
    keys.reserve(mesh.pointCount());
    for (float3 const& p : *mesh.positions)
        keys.push_back({std::bit_cast<std::uint32_t>(p.x + 0.0f), std::bit_cast<std::uint32_t>(p.y + 0.0f),
            std::bit_cast<std::uint32_t>(p.z + 0.0f)});
    tbb::parallel_sort(keys.begin(), keys.end());
    return static_cast<std::uint64_t>(keys.end() - std::unique(keys.begin(), keys.end()));
}

}
