#include "MeshRequirements.h"

#include "shell/Failure.h"
#include "shell/Report.h"
#include "shell/Suggestion.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>

#include <fmt/format.h>

#include <algorithm>
#include <initializer_list>
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
            + (coincident == 0 ? std::string(" Fill the holes first (modeling repair --only fill).")
                               : fmt::format(" {} at the same position as another point: merge equal points first, and "
                                             "fill the remaining holes (modeling repair --only weld,fill).",
                                   coincident == 1 ? "1 point is" : groupDigits(coincident) + " points are"));
    }

    using Faults = std::vector<std::string>;

    Faults faultsOfBoundary(MeshArrays const& mesh, MeshTopology const& topology)
    {
        return topology.boundaryEdges ? Faults{describeBoundaryEdges(mesh, topology)} : Faults();
    }

    Faults faultsOfEdges(MeshArrays const& mesh, MeshTopology const& topology)
    {
        Finding const& edges = topology.nonManifoldEdges;
        if (!edges)
            return {};
        return {fmt::format("More than two faces meet at {}. The first is the {}. Separate the sheets or solids "
                            "that meet there (modeling repair --only split).",
            countOf(edges.count, "edge"), describeEdge(mesh, edges.first))};
    }

    Faults faultsOfOrientation(MeshArrays const& mesh, MeshTopology const& topology)
    {
        Finding const& edges = topology.flippedEdges;
        if (!edges)
            return {};
        return {fmt::format("At {} neighboring faces have opposite orientations. The first is the {}. Flip faces "
                            "until all normals point outward (modeling repair --only orient).",
            countOf(edges.count, "edge"), describeEdge(mesh, edges.first))};
    }

    Faults faultsOfPoints(MeshArrays const& mesh, MeshTopology const& topology)
    {
        Finding const& points = topology.nonManifoldPoints;
        if (!points)
            return {};
        return {fmt::format("The surface is non-manifold at {}: some faces there share only the point. The first "
                            "is {}. Give each sheet its own point (modeling repair --only split).",
            countOf(points.count, "point"), describePoint(mesh, points.first))};
    }

    using FindFaults = Faults (*)(MeshArrays const&, MeshTopology const&);

    Faults allFaults(std::initializer_list<FindFaults> kinds, MeshArrays const& mesh, MeshTopology const& topology)
    {
        Faults faults;
        for (FindFaults const find : kinds)
            for (std::string& fault : find(mesh, topology))
                faults.push_back(std::move(fault));
        return faults;
    }

    /// A type, or a property of meshes.
    struct Requirement {
        char const* name;
        GeometryType type;
        FindFaults faults; // null for a type
    };

    constexpr Requirement kRequirements[] = {
        {"mesh", GeometryType::Mesh, nullptr},
        {"point-cloud", GeometryType::PointCloud, nullptr},
        {"strands", GeometryType::Strands, nullptr},
        {"closed", GeometryType::Mesh, faultsOfBoundary},
        {"manifold", GeometryType::Mesh,
            [](MeshArrays const& mesh, MeshTopology const& topology) {
                return allFaults({faultsOfEdges, faultsOfPoints}, mesh, topology);
            }},
        {"oriented", GeometryType::Mesh, faultsOfOrientation},
        {"triangles", GeometryType::Mesh, faultsOfTriangles},
        {"no-isolated-points", GeometryType::Mesh, faultsOfIsolatedPoints},
    };

}

std::vector<std::string> requirementNames()
{
    std::vector<std::string> names;
    for (Requirement const& requirement : kRequirements)
        names.emplace_back(requirement.name);
    return names;
}

std::vector<std::string> parseRequirements(std::string const& list)
{
    std::vector<std::string> names;
    std::vector<std::string> const known = requirementNames();
    for (std::size_t start = 0; start < list.size();) {
        std::size_t const end = std::min(list.find(',', start), list.size());
        std::string const name = list.substr(start, end - start);
        if (std::find(known.begin(), known.end(), name) == known.end())
            throw Failure(ExitCode::CommandLine,
                fmt::format("--require: nothing is called \"{}\"{}. There are: {}", name, suggestionFor(name, known),
                    listOf(known)));
        names.push_back(name);
        start = end + 1;
    }
    return names;
}

void requireProperties(std::vector<std::string> const& requirements, Tessara::Object const& object,
    std::string const& source, std::function<MeshTopology const&()> const& findTopology)
{
    if (requirements.empty() || Tessara::Geometry::getElementCount(object, Tessara::Geometry::sPointComp) == 0)
        return;
    MeshTopology const* topology = nullptr;
    std::vector<std::string> missing;
    Faults reasons;
    for (Requirement const& requirement : kRequirements) {
        if (std::find(requirements.begin(), requirements.end(), requirement.name) == requirements.end())
            continue;
        Faults faults;
        if (typeOf(object) != requirement.type)
            faults.push_back(fmt::format("It contains a {}.", nameOf(typeOf(object))));
        else if (requirement.faults) {
            MeshArrays const mesh = arraysOf(object);
            if (!topology)
                topology = &findTopology();
            faults = requirement.faults(mesh, *topology);
        }
        if (!faults.empty())
            missing.emplace_back(requirement.name);
        for (std::string& fault : faults)
            if (std::find(reasons.begin(), reasons.end(), fault) == reasons.end())
                reasons.push_back(std::move(fault));
    }
    if (!missing.empty())
        throw Failure(ExitCode::Refused,
            fmt::format("{} does not meet --require {} (points and faces are counted from 0):", source,
                fmt::join(missing, ",")),
            std::move(reasons));
}

std::vector<std::string> faultsOfClosedManifold(MeshArrays const& mesh, MeshTopology const& topology)
{
    return allFaults({faultsOfBoundary, faultsOfEdges, faultsOfOrientation, faultsOfPoints}, mesh, topology);
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
        faults.push_back(fmt::format("{} fewer than three corners. The first is face {}. Remove such faces first "
                                     "(modeling repair --only degenerate).",
            countOf(faces.count, "face has", "faces have"), faces.first));
    // Not reported for meshes with polygons: triangulation may resolve it.
    if (Finding const& faces = topology.facesWithRepeatedPoints; faces && !topology.quads && !topology.polygons)
        faults.push_back(fmt::format("{} a point more than once. The first is face {}. Remove such faces first "
                                     "(modeling repair --only degenerate).",
            countOf(faces.count, "face visits", "faces visit"), faces.first));
    return faults;
}

std::vector<std::string> faultsOfIsolatedPoints(MeshArrays const& mesh, MeshTopology const& topology)
{
    std::vector<std::string> faults;
    if (Finding const& points = topology.isolatedPoints)
        faults.push_back(fmt::format("{} to no face. The first is {}. Remove such points first (modeling repair --only "
                                     "unused).",
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
