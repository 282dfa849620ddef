#include "MeshChecks.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Validators.h>

#include <map>
#include <numeric>
#include <set>
#include <span>
#include <utility>
#include <vector>

namespace TestSupport {

using namespace Tessara::Geometry;

namespace {

    using Face = std::span<unsigned int const>;
    using DirectedEdge = std::pair<unsigned int, unsigned int>;

    template <class Visit> void forEachFace(Tessara::Object const& mesh, Visit const& visit)
    {
        auto const corners = dataOf<unsigned int>(mesh, sFaceVertex);
        auto const offsets = dataOf<unsigned int>(mesh, sFaceOffset);
        for (std::size_t face = 0; face + 1 < offsets->size; ++face)
            visit(face, Face(corners->data + (*offsets)[face], corners->data + (*offsets)[face + 1]));
    }

    std::map<DirectedEdge, std::size_t> directedEdges(Tessara::Object const& mesh)
    {
        std::map<DirectedEdge, std::size_t> uses;
        forEachFace(mesh, [&](std::size_t, Face face) {
            for (std::size_t k = 0; k != face.size(); ++k)
                ++uses[{face[k], face[(k + 1) % face.size()]}];
        });
        return uses;
    }

    /// The faces around each point form one closed fan.
    testing::AssertionResult hasSingleFans(Tessara::Object const& mesh)
    {
        // Around a point each face leads from one neighbor to the next; one fan is one cycle through all of them.
        std::map<unsigned int, std::map<unsigned int, unsigned int>> nextNeighbor;
        forEachFace(mesh, [&](std::size_t, Face face) {
            for (std::size_t k = 0; k != face.size(); ++k)
                nextNeighbor[face[k]][face[(k + 1) % face.size()]] = face[(k + face.size() - 1) % face.size()];
        });
        for (auto const& [point, successor] : nextNeighbor) {
            std::size_t steps = 0;
            unsigned int neighbor = successor.begin()->first;
            do {
                neighbor = successor.at(neighbor);
                ++steps;
            } while (neighbor != successor.begin()->first && steps <= successor.size());
            if (steps != successor.size())
                return testing::AssertionFailure() << "more than one fan of faces around point " << point;
        }
        return testing::AssertionSuccess();
    }

    template <class T> void hashArray(Tessara::Object const& mesh, char const* name, std::uint64_t& hash)
    {
        auto const array = dataOf<T>(mesh, name);
        if (!array)
            return; // a point cloud has positions only
        auto const* const bytes = reinterpret_cast<unsigned char const*>(array->data);
        for (std::size_t i = 0; i != array->size * sizeof(T); ++i)
            hash = (hash ^ bytes[i]) * 0x100000001B3u; // FNV-1a
    }

}

Counts countsOf(Tessara::Object const& mesh)
{
    return {
        getElementCount(mesh, sPointComp), getElementCount(mesh, sFaceVertexComp), getElementCount(mesh, sFaceComp)};
}

long eulerCharacteristic(Tessara::Object const& mesh)
{
    std::set<unsigned int> points;
    std::set<DirectedEdge> edges;
    for (auto const& [edge, uses] : directedEdges(mesh)) {
        points.insert(edge.first);
        edges.insert(std::minmax(edge.first, edge.second));
    }
    return static_cast<long>(points.size()) - static_cast<long>(edges.size()) + countsOf(mesh).faces;
}

testing::AssertionResult isClosedManifold(Tessara::Object const& mesh)
{
    if (auto const valid = isValid(mesh); !valid)
        return valid;
    auto const uses = directedEdges(mesh);
    for (auto const& [edge, count] : uses) {
        if (edge.first == edge.second)
            return testing::AssertionFailure() << "a face has point " << edge.first << " twice in a row";
        if (count != 1)
            return testing::AssertionFailure()
                << count << " faces go from point " << edge.first << " to " << edge.second;
        if (!uses.contains({edge.second, edge.first}))
            return testing::AssertionFailure() << "boundary from point " << edge.first << " to " << edge.second;
    }
    return hasSingleFans(mesh);
}

testing::AssertionResult isValid(Tessara::Object const& geometry)
{
    GeoValidator::Status const status = geometry.hasProperty(sFaceComp) ? validateMesh(geometry)
        : geometry.hasProperty(sStrandComp)                             ? StrandValidator().validate(geometry)
                                                                        : PointCloudValidator().validate(geometry);
    if (status)
        return testing::AssertionSuccess();
    return testing::AssertionFailure() << status.message().c_str();
}

std::uint64_t fingerprint(Tessara::Object const& mesh)
{
    std::uint64_t hash = 0xCBF29CE484222325u;
    hashArray<Tessara::Math::float3>(mesh, sPointPosition, hash);
    hashArray<unsigned int>(mesh, sFaceVertex, hash);
    hashArray<unsigned int>(mesh, sFaceOffset, hash);
    return hash;
}

}
