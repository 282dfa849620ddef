#include "MeshTopology.h"

#include "ClosedFans.h"
#include "Creases.h"
#include "PointBlocks.h"
#include "PointStar.h"
#include "TriangleBatch.h"
#include "connectedComponents.h"
#include "sumOverBlocks.h"

#include <tbb/enumerable_thread_specific.h>
#include <tbb/parallel_for.h>
#include <tbb/parallel_sort.h>

#include <algorithm>
#include <array>
#include <bit>
#include <utility>
#include <vector>

namespace ModelingProgram {

namespace {

    /// Whether some consecutive faces are triangles with three different points.
    bool arePlainTriangles(MeshArrays const& mesh, unsigned int begin, unsigned int end)
    {
        if (!areTriangles(mesh, begin, end))
            return false;
        unsigned int const* corner = mesh.corners(begin).data();
        unsigned int repeats = 0;
        for (unsigned int face = begin; face != end; ++face, corner += 3)
            repeats += static_cast<unsigned int>(corner[0] == corner[1])
                + static_cast<unsigned int>(corner[1] == corner[2]) + static_cast<unsigned int>(corner[2] == corner[0]);
        return repeats == 0;
    }

    bool hasRepeatedPoint(std::span<unsigned int const> corners)
    {
        if (corners.size() == 3)
            return corners[0] == corners[1] || corners[1] == corners[2] || corners[2] == corners[0];
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
        if (hasRepeatedPoint(corners))
            topology.facesWithRepeatedPoints.add(face);
    }

    MeshTopology countFaces(MeshArrays const& mesh)
    {
        return sumOverBlocks<MeshTopology>(mesh.faceCount(), [&](std::size_t blockBegin, std::size_t blockEnd) {
            auto const begin = static_cast<unsigned int>(blockBegin), end = static_cast<unsigned int>(blockEnd);
            MeshTopology topology;
            if (arePlainTriangles(mesh, begin, end))
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
        /// \param creases       may be null
        /// \param lowerInParts  one entry per point, set to a point of the same component that is not higher
        BlockExaminer(MeshArrays const& mesh, CreasesWithNormals const* creases, unsigned int* lowerInParts)
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
            auto const spreads =
                creases_ ? squaredSpreads<kValence>(creases_->normals, around) : std::array<int, kFans>();
            for (std::size_t i = 0; i != indices.size(); ++i)
                if (areClosed[i] != 0) {
                    found_.edgeCount += static_cast<unsigned int>(edgeCounts[i]);
                    lowerInParts_[points[i]] = lowest[i];
                    if (creases_ && spreads[i] >= creases_->smoothSpread)
                        countSharpEdges({around[i], kValence}, points[i]);
                } else
                    examineStar(indices[i]);
        }

        /// Counts the sharp edges to higher points in a closed fan.
        void countSharpEdges(std::span<CornerAtPoint const> around, unsigned int point)
        {
            for (CornerAtPoint const& a : around)
                if (a.next > point)
                    for (CornerAtPoint const& b : around)
                        found_.sharpEdgeCount +=
                            a.next == b.previous && creases_->creases.isSharp(a.face, b.face, true) ? 1u : 0u;
        }

        void examineStar(unsigned int index)
        {
            unsigned int const point = corners_.firstPoint() + index;
            star_.examine(mesh_, corners_.at(index), point, creases_ ? &creases_->creases : nullptr, found_);
            lowerInParts_[point] = point;
        }

        MeshArrays const& mesh_;
        CreasesWithNormals const* creases_;
        unsigned int* lowerInParts_;
        BlockCorners corners_;
        std::array<std::vector<unsigned int>, kMaxValence + 2> byValence_; // the last one is for all above
        PointStar star_;
        MeshTopology found_;
    };

    /// What the points tell, and their components.
    MeshTopology examinePoints(MeshArrays const& mesh, CreasesWithNormals const* creases)
    {
        Orvan::Array<unsigned int> lowerInParts(mesh.pointCount(), Orvan::kUninitialized);
        MeshTopology topology;
        {
            PointBlocks const blocks(mesh);
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
    sharpEdgeCount += other.sharpEdgeCount;
    for (Finding MeshTopology::*const finding : {&MeshTopology::facesBelowThreeCorners, &MeshTopology::quads,
             &MeshTopology::polygons, &MeshTopology::facesWithRepeatedPoints, &MeshTopology::boundaryEdges,
             &MeshTopology::nonManifoldEdges, &MeshTopology::windingConflicts, &MeshTopology::flippedEdges,
             &MeshTopology::nonManifoldPoints, &MeshTopology::isolatedPoints})
        this->*finding += other.*finding;
    return *this;
}

MeshTopology analyzeTopology(MeshArrays const& mesh, CreasesWithNormals const* creases)
{
    MeshTopology topology = countFaces(mesh);
    MeshTopology const atPoints = examinePoints(mesh, creases);
    topology += atPoints;
    topology.partCount = atPoints.partCount;
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
    std::vector<bool> isUsed(mesh.pointCount());
    for (unsigned int face = 0; face != mesh.faceCount(); ++face)
        for (unsigned int const point : mesh.corners(face))
            isUsed[point] = true;
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
