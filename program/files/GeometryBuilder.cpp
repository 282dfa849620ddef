#include "GeometryBuilder.h"

#include <TessaraGeometry/Names.h>

namespace ModelingProgram {

using namespace Tessara::Geometry;

std::string_view namePrefix(Orvan::String const& component)
{
    if (component == sPointComp)
        return "point:";
    if (component == sFaceComp)
        return "face:";
    if (component == sFaceVertexComp)
        return "corner:";
    return component == sStrandComp ? "strand:" : "";
}

std::string elementNames(Orvan::String const& component)
{
    std::string_view const prefix = namePrefix(component);
    return prefix.empty() ? std::string(component.view()) : std::string(prefix.substr(0, prefix.size() - 1)) + "s";
}

bool isReservedName(std::string_view name)
{
    constexpr std::string_view kReserved[] = {sPointComp, sFaceComp, sFaceVertexComp, sStrandComp, sPointPosition,
        sFaceVertex, sFaceOffset, sStrandOffset, Tessara::Object::kExcludedKeys};
    return std::find(std::begin(kReserved), std::end(kReserved), name) != std::end(kReserved);
}

void GeometryBuilder::expectPoints(std::uint64_t count)
{
    if (count >= kMostElements)
        scanner_.refuse("there are more points than a mesh can hold");
    pointCount_ = count;
    positions_.reserve(count);
}

void GeometryBuilder::makeStrands(Orvan::Array<unsigned int> offsets, Orvan::Array<unsigned int> const& points)
{
    Orvan::Array<Tessara::Math::float3> positions(points.size, Orvan::kUninitialized);
    std::transform(
        points.begin(), points.end(), positions.begin(), [&](unsigned int point) { return positions_[point]; });
    positions_ = std::move(positions);
    strandOffset_ = std::move(offsets);
}

void GeometryBuilder::refuseIndex(char const* element, std::string const& index) const
{
    scanner_.refuse(std::string("a ") + element + " names point " + index + ", but the file has "
        + std::to_string(pointCount_) + " points, counted from 0");
}

GeometryFile GeometryBuilder::finish(std::string format) &&
{
    GeometryFile file{nullptr, std::move(format), std::move(notes_)};
    bool const isMesh = faceCount() != 0;
    if (isMesh)
        file.object = makeMesh(std::move(positions_), std::move(faceVertex_), std::move(faceOffset_));
    else if (!strandOffset_.empty())
        file.object = Tessara::Geometry::makeStrands(std::move(positions_), std::move(strandOffset_));
    else
        file.object = makePointCloud(std::move(positions_));

    for (Property& property : properties_) {
        if (!isMesh && property.component != std::string_view(sPointComp))
            continue;
        std::string name = property.name;
        while (isReservedName(name) || file.object->hasProperty(Orvan::String(name)))
            name.insert(0, namePrefix(property.component));
        file.object->setProperty(Orvan::String(name), Orvan::Ptr<Tessara::Object>(std::move(property.object)));
    }
    return file;
}

}
