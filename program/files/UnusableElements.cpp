#include "UnusableElements.h"

#include <Modeling/computeDeletedComponentMapping.h>
#include <Modeling/deleteComponents.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <algorithm>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Flags = Orvan::Array<bool>;
using Indices = Orvan::Array<unsigned int>;

namespace {

    bool anyRemains(Flags const& deleted)
    {
        return std::find(deleted.begin(), deleted.end(), false) != deleted.end();
    }

    void deleteElements(Flags const& deleted, char const* component, Tessara::Object& object)
    {
        if (std::find(deleted.begin(), deleted.end(), true) == deleted.end())
            return;
        Indices const remap = Tessara::GeometryAlgorithms::computeDeletedComponentMapping(deleted);
        static_cast<void>(Tessara::GeometryAlgorithms::deleteComponents(remap, component, object));
    }

    /// The offsets of the remaining runs, of which the first begins at `start`. Calls `visit(begin, end)` for each of
    /// them.
    template <class Visit>
    Indices remainingOffsets(unsigned int start, Indices const& offsets, Flags const& deleted, Visit const& visit)
    {
        Indices result{start};
        for (std::uint64_t run = 0; run < deleted.size; ++run) {
            if (deleted[run])
                continue;
            visit(offsets[run], offsets[run + 1]);
            result.append(result[result.size - 1] + (offsets[run + 1] - offsets[run]));
        }
        return result;
    }

}

UnusableElements::UnusableElements(RawGeometry const& geometry)
    : points(geometry.positions.size)
    , faces(geometry.faceOffset.size - 1)
    , strands(geometry.strandOffset.size - (geometry.strandOffset.empty() ? 0 : 1))
{
    std::transform(geometry.positions.begin(), geometry.positions.end(), points.begin(),
        [](Tessara::Math::float3 const& position) { return !isFinite(position); });
    notFinitePoints = static_cast<std::uint64_t>(std::count(points.begin(), points.end(), true));

    for (std::uint64_t face = 0; face < faces.size; ++face) {
        unsigned int const *const begin = geometry.faceVertex.data + geometry.faceOffset[face],
                                  *const end = geometry.faceVertex.data + geometry.faceOffset[face + 1];
        bool const isShort = end - begin < 3;
        faces[face] = isShort || std::any_of(begin, end, [&](unsigned int point) { return points[point]; });
        shortFaces += isShort;
        cellsAtSuchPoints += faces[face] && !isShort;
    }
    for (std::uint64_t strand = 0; strand < strands.size; ++strand) {
        bool* const begin = points.data + geometry.strandOffset[strand];
        bool* const end = points.data + geometry.strandOffset[strand + 1];
        strands[strand] = std::find(begin, end, true) != end;
        cellsAtSuchPoints += strands[strand];
        std::fill(begin, end, strands[strand]);
    }
}

void UnusableElements::deleteFrom(RawGeometry const& geometry, Tessara::Object& object) const
{
    deleteElements(points, sPointComp, object);
    if (!strands.empty()) {
        // Points before the first strand belong to none.
        auto const start =
            static_cast<unsigned int>(std::count(points.data, points.data + geometry.strandOffset[0], false));
        Indices offsets = remainingOffsets(start, geometry.strandOffset, strands, [](unsigned int, unsigned int) {});
        deleteElements(strands, sStrandComp, object);
        addDataProperty(sStrandOffset, sStrandComp, std::move(offsets), object);
    } else if (anyFaceRemains()) {
        Indices const pointRemap = Tessara::GeometryAlgorithms::computeDeletedComponentMapping(points);
        Flags corners(geometry.faceVertex.size, true);
        Indices faceVertex;
        Indices offsets = remainingOffsets(0, geometry.faceOffset, faces, [&](unsigned int begin, unsigned int end) {
            for (unsigned int corner = begin; corner != end; ++corner) {
                corners[corner] = false;
                faceVertex.append(pointRemap[geometry.faceVertex[corner]]);
            }
        });
        deleteElements(corners, sFaceVertexComp, object);
        deleteElements(faces, sFaceComp, object);
        addDataProperty(sFaceVertex, sFaceVertexComp, std::move(faceVertex), object);
        addDataProperty(sFaceOffset, sFaceComp, std::move(offsets), object);
    }
}

std::vector<std::string> UnusableElements::describe() const
{
    std::vector<std::string> sentences;
    auto const tell = [&](char const* what, std::uint64_t count) {
        if (count != 0)
            sentences.push_back(std::string(what) + " are left out: " + std::to_string(count));
    };
    tell("points that are NaN or infinite", notFinitePoints);
    tell(strands.empty() ? "faces at such points" : "polylines at such points, with all of their points,",
        cellsAtSuchPoints);
    tell("faces with fewer than three corners", shortFaces);
    return sentences;
}

bool UnusableElements::anyPointRemains() const
{
    return anyRemains(points);
}

bool UnusableElements::anyFaceRemains() const
{
    return anyRemains(faces);
}

}
