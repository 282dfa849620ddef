#include "MeshRequirements.h"

#include "shell/Failure.h"
#include "shell/Report.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>

#include <fmt/format.h>

#include <optional>
#include <type_traits>

namespace ModelingProgram {

namespace {

    std::string describePoint(MeshArrays const& mesh, unsigned int point)
    {
        auto const& p = (*mesh.positions)[point];
        return fmt::format("point {} at ({}, {}, {})", point, p.x, p.y, p.z);
    }

    /// The edge that starts at a corner.
    std::string describeEdge(MeshArrays const& mesh, unsigned int corner)
    {
        return fmt::format("edge of face {} from {} to {}", mesh.faceOf(corner),
            describePoint(mesh, (*mesh.faceVertex)[corner]),
            describePoint(mesh, (*mesh.faceVertex)[mesh.nextCorner(corner)]));
    }

    std::string describeBoundaryEdges(MeshArrays const& mesh, MeshTopology const& topology)
    {
        std::uint64_t const count = topology.boundaryEdges.count;
        std::string sentence = fmt::format("{} of {} {}: {} to one face only. The first is the {}.", groupDigits(count),
            countOf(topology.edgeCount, "edge"), count == 1 ? "is a boundary edge" : "are boundary edges",
            count == 1 ? "it belongs" : "they belong", describeEdge(mesh, topology.boundaryEdges.first));
        std::uint64_t const coincident = countCoincidentPoints(mesh);
        return sentence
            + (coincident == 0 ? std::string(" Fill the holes first.")
                               : fmt::format(" {} at the same position as another point: merge equal points first, and "
                                             "fill the remaining holes.",
                                   coincident == 1 ? "1 point is" : groupDigits(coincident) + " points are"));
    }

}

std::vector<std::string> faultsOfClosedManifold(MeshArrays const& mesh, MeshTopology const& topology)
{
    std::vector<std::string> faults;
    if (topology.boundaryEdges)
        faults.push_back(describeBoundaryEdges(mesh, topology));
    if (Finding const& edges = topology.nonManifoldEdges)
        faults.push_back(
            fmt::format("More than two faces meet at {}. The first is the {}. Separate the sheets or solids "
                        "that meet there.",
                countOf(edges.count, "edge"), describeEdge(mesh, edges.first)));
    if (Finding const& edges = topology.flippedEdges)
        faults.push_back(
            fmt::format("At {} neighboring faces have opposite orientations. The first is the {}. Flip faces "
                        "until all normals point outward.",
                countOf(edges.count, "edge"), describeEdge(mesh, edges.first)));
    if (Finding const& points = topology.nonManifoldPoints)
        faults.push_back(
            fmt::format("The surface is non-manifold at {}: some faces there share only the point. The first "
                        "is {}. Give each sheet its own point.",
                countOf(points.count, "point"), describePoint(mesh, points.first)));
    return faults;
}

std::vector<std::string> faultsOfTriangles(MeshArrays const& mesh, MeshTopology const& topology)
{
    std::vector<std::string> faults;
    if (topology.quads || topology.polygons) {
        unsigned int const first = std::min(topology.quads.first, topology.polygons.first);
        std::uint64_t const count = topology.quads.count + topology.polygons.count;
        faults.push_back(fmt::format("{} more than three corners. The first is face {} with {}. Triangulate the mesh "
                                     "first.",
            countOf(count, "face has", "faces have"), first, groupDigits(mesh.corners(first).size())));
    }
    if (Finding const& faces = topology.facesBelowThreeCorners)
        faults.push_back(fmt::format("{} fewer than three corners. The first is face {}. Remove such faces first.",
            countOf(faces.count, "face has", "faces have"), faces.first));
    // Not reported for meshes with polygons: triangulation may resolve it.
    if (Finding const& faces = topology.facesWithRepeatedPoints; faces && !topology.quads && !topology.polygons)
        faults.push_back(fmt::format("{} a point more than once. The first is face {}. Remove such faces first.",
            countOf(faces.count, "face visits", "faces visit"), faces.first));
    return faults;
}

std::vector<std::string> faultsOfIsolatedPoints(MeshArrays const& mesh, MeshTopology const& topology)
{
    std::vector<std::string> faults;
    if (Finding const& points = topology.isolatedPoints)
        faults.push_back(fmt::format("{} to no face. The first is {}. Remove such points first.",
            countOf(points.count, "point belongs", "points belong"), describePoint(mesh, points.first)));
    return faults;
}

void requireType(GeometryType type, Tessara::Object& object, char const* command, std::string const& source)
{
    if (Tessara::Geometry::getElementCount(object, Tessara::Geometry::sPointComp) == 0)
        makeEmpty(type, object);
    if (typeOf(object) != type)
        throw Failure(ExitCode::Refused,
            fmt::format("{} needs a {}, but {} contains a {}", command, nameOf(type), source, nameOf(typeOf(object))));
}

void requireClosedTriangleMesh(MeshArrays const& mesh, MeshTopology const& topology,
    std::vector<std::string> furtherFaults, char const* command, std::string const& source)
{
    std::vector<std::string> reasons = faultsOfTriangles(mesh, topology);
    for (std::string& reason : faultsOfClosedManifold(mesh, topology))
        reasons.push_back(std::move(reason));
    for (std::string& reason : furtherFaults)
        reasons.push_back(std::move(reason));
    if (!reasons.empty())
        throw Failure(ExitCode::Refused,
            fmt::format("{} needs a closed manifold mesh of triangles, which {} does not contain "
                        "(points and faces are counted from 0):",
                command, source),
            std::move(reasons));
}

std::vector<float> pointNumbers(
    char const* option, std::string const& name, Tessara::Object const& mesh, std::string const& source)
{
    using namespace Tessara::Geometry;
    unsigned int const pointCount = arraysOf(mesh).pointCount();
    auto const visitNumbers = [&](std::string const& property, auto const& visit) {
        auto const data = getDataGeoProperty(mesh, property.c_str());
        if (data && getGeoPropTargetName(mesh, property.c_str()) == sPointComp)
            visitArray(data->getProperty(sData), [&]<class T>(Orvan::Array<T> const& values, auto) {
                if constexpr (std::is_arithmetic_v<T>)
                    if (values.size == pointCount)
                        visit(values);
            });
    };
    std::optional<std::vector<float>> numbers;
    visitNumbers(name, [&](auto const& values) {
        numbers.emplace();
        for (auto const value : values)
            numbers->push_back(static_cast<float>(value));
    });
    if (numbers || pointCount == 0)
        return std::move(numbers).value_or(std::vector<float>());
    std::vector<std::string> present;
    for (Property const& property : propertiesOf(mesh))
        visitNumbers(property.name, [&](auto const&) { present.push_back(property.name); });
    throw Failure(ExitCode::Refused,
        fmt::format("{}: {} has no attribute \"{}\" with one number per point. There are: {}", option, source, name,
            listOf(present)));
}

}
