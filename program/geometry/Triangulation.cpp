#include "Triangulation.h"

#include "Geometry.h"
#include "shell/Failure.h"

#include <Modeling/triangulate.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometryVolume/ChannelParser.h>

#include "frame/grains.h"

#include <fmt/format.h>

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>

#include <algorithm>
#include <array>
#include <cmath>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Object;
using Corners = std::span<unsigned int const>;

namespace {

    constexpr char kSeparators[] = " \t\n\v\f\r,"; // of lists of channels
    constexpr double kLossy = 1e-5; // positions in single precision leave differences of about 1e-7

    /// The difference between the areas of the triangles and of the polygon, as a fraction; 0 for a polygon without
    /// area.
    double differenceOf(Corners polygon, Corners triangles, float3 const* position)
    {
        double3 const whole = areaVector(polygon, position);
        double const squared = dot(whole, whole);
        if (!(squared > 0))
            return 0;
        double covered = 0;
        for (std::size_t corner = 0; corner != triangles.size(); corner += 3)
            covered += std::abs(dot(areaVector(triangles.subspan(corner, 3), position), whole)) / squared;
        return std::abs(covered - 1);
    }

    bool isFan(Corners polygon, Corners triangles)
    {
        for (std::size_t i = 2; i < polygon.size(); ++i) {
            Corners const triangle = triangles.subspan(3 * (i - 2), 3);
            if (triangle[0] != polygon[0] || triangle[1] != polygon[i - 1] || triangle[2] != polygon[i])
                return false;
        }
        return true;
    }

    Corners trianglesOf(MeshArrays const& polygons, unsigned int face, MeshArrays const& triangles, std::size_t& corner)
    {
        std::size_t const cornerCount = polygons.corners(face).size();
        std::size_t const count = cornerCount < 3 ? 0 : 3 * (cornerCount - 2);
        corner += count;
        return Corners(triangles.faceVertex->data + corner - count, count);
    }

    /// Ear clipping may happen to give a fan too, but not for every first corner.
    /// \return for each face whether it becomes a fan again if it starts at its second corner
    std::vector<bool> areFansFromSecondCorner(MeshArrays const& polygons, std::vector<unsigned int> const& faces)
    {
        Orvan::Array<unsigned int> faceVertex;
        Orvan::Array<unsigned int> faceOffset;
        faceOffset.append(0);
        for (unsigned int const face : faces) {
            Corners const corners = polygons.corners(face);
            for (std::size_t i = 0; i != corners.size(); ++i)
                faceVertex.append(corners[(i + 1) % corners.size()]);
            faceOffset.append(static_cast<unsigned int>(faceVertex.size));
        }
        auto const rotated = makeMesh(*polygons.positions, std::move(faceVertex), std::move(faceOffset));
        MeshArrays const before = arraysOf(*rotated);
        Geometry::Mesh::triangulate("*", *rotated);
        MeshArrays const after = arraysOf(*rotated);
        std::vector<bool> areFans;
        std::size_t corner = 0;
        for (unsigned int face = 0; face != faces.size(); ++face)
            areFans.push_back(isFan(before.corners(face), trianglesOf(before, face, after, corner)));
        return areFans;
    }

    struct Kind {
        std::size_t mostCorners;
        char const* name;
    };
    constexpr std::array<Kind, 10> kKinds = {{{2, "up to 2"}, {3, "3"}, {4, "4"}, {5, "5"}, {6, "6"}, {8, "7 to 8"},
        {16, "9 to 16"}, {64, "17 to 64"}, {1024, "65 to 1,024"}, {~std::size_t{0}, "more"}}};

    std::size_t kindOf(Corners polygon)
    {
        std::size_t kind = 0;
        while (polygon.size() > kKinds[kind].mostCorners)
            ++kind;
        return kind;
    }

}

void requireChannelList(std::string const& channels)
{
    if (channels.find_first_not_of(kSeparators) == std::string::npos)
        throw Failure(ExitCode::CommandLine, "--channels: the list has no entry; \"^*\" keeps no properties");
    TSR::Utils::ChannelParser::Status const status = TSR::Utils::ChannelParser().parses(channels.c_str());
    if (!status)
        throw Failure(ExitCode::CommandLine, fmt::format("--channels: {}", status.message().view()));
}

void requireMatchingChannels(std::string const& channels, Object const& mesh)
{
    std::vector<std::string> names;
    for (Property const& property : propertiesOf(mesh))
        if (!property.isStandard && !property.component.empty() && property.component != sPointComp)
            names.push_back(property.name);
    std::size_t start = channels.find_first_not_of(kSeparators);
    while (start != std::string::npos) {
        std::size_t const end = std::min(channels.find_first_of(kSeparators, start), channels.size());
        bool const excludes = channels[start] == '^' || channels[start] == '-';
        std::string const pattern = channels.substr(start + (excludes ? 1 : 0), end - start - (excludes ? 1 : 0));
        start = channels.find_first_not_of(kSeparators, end);
        bool const isPattern = pattern.find_first_of("*?") != std::string::npos;
        if (isPattern && (excludes || pattern.find_first_not_of('*') == std::string::npos))
            continue;
        TSR::Utils::ChannelParser parser;
        static_cast<void>(parser.parses(pattern.c_str()));
        if (std::none_of(
                names.begin(), names.end(), [&](std::string const& name) { return parser.accepts(name.c_str()); }))
            throw Failure(ExitCode::Refused,
                fmt::format("--channels: no property of faces or corners matches \"{}\". There are: {}", pattern,
                    listOf(names)));
    }
}

Object inFineUnits(Object const& mesh)
{
    constexpr int kExponent = 20;
    std::optional<BoundingBox> const box = boundingBoxOf(mesh);
    if (!box)
        return mesh;
    float const size = std::max({box->max.x - box->min.x, box->max.y - box->min.y, box->max.z - box->min.z});
    int const shift = std::isnormal(size) ? kExponent - std::ilogb(size) : 0;
    Orvan::Array<float3> scaled = *dataOf<float3>(mesh, sPointPosition);
    double const scale = std::ldexp(1.0, shift);
    auto const scaledBy = [scale](float coordinate) { return static_cast<float>(coordinate * scale); };
    tbb::parallel_for(
        tbb::blocked_range<std::uint64_t>(0, scaled.size, Modeling::kElementGrain), [&](auto const& points) {
            for (std::uint64_t point = points.begin(); point != points.end(); ++point) {
                float3& p = scaled[point];
                p = {scaledBy(p.x), scaledBy(p.y), scaledBy(p.z)};
            }
        });
    Object fine = mesh;
    addDataProperty(sPointPosition, sPointComp, std::move(scaled), fine);
    return fine;
}

Object triangulatedAs(Object const& measured, std::string const& channels, Object const& mesh)
{
    Object result = measured;
    Geometry::Mesh::triangulate(channels.c_str(), result);
    result.setProperty(sPointPosition, mesh.getProperty(sPointPosition));
    return result;
}

std::vector<CutFaces> checkTriangulation(MeshArrays const& polygons, MeshArrays const& triangles)
{
    std::vector<CutFaces> kinds;
    for (Kind const& kind : kKinds)
        kinds.push_back({kind.name, 0, {}, {}, 0});

    std::vector<unsigned int> fans;
    std::size_t corner = 0;
    for (unsigned int face = 0; face != polygons.faceCount(); ++face) {
        Corners const polygon = polygons.corners(face);
        Corners const cut = trianglesOf(polygons, face, triangles, corner);
        CutFaces& kind = kinds[kindOf(polygon)];
        ++kind.faceCount;
        if (polygon.size() > 3 && isFan(polygon, cut))
            fans.push_back(face);
        double const difference = differenceOf(polygon, cut, polygons.positions->data);
        kind.worstDifference = std::max(kind.worstDifference, difference);
        if (difference > kLossy)
            kind.lossy.add(face);
    }
    std::vector<bool> const areFans = areFansFromSecondCorner(polygons, fans);
    for (std::size_t i = 0; i != fans.size(); ++i)
        if (areFans[i])
            kinds[kindOf(polygons.corners(fans[i]))].fans.add(fans[i]);
    std::erase_if(kinds, [](CutFaces const& kind) { return kind.faceCount == 0; });
    return kinds;
}

}
