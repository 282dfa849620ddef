#include "Geometry.h"
#include "shell/Failure.h"

#include "sumOverBlocks.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

#include <fmt/format.h>

#include <algorithm>
#include <limits>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Object;

namespace {

    /// The box around all boxes that are added.
    struct GrowingBox : BoundingBox {
        static constexpr float kFar = std::numeric_limits<float>::infinity();

        GrowingBox()
            : BoundingBox{{kFar, kFar, kFar}, {-kFar, -kFar, -kFar}}
        {
        }
        GrowingBox& operator+=(BoundingBox const& other)
        {
            min = lowerCorner(min, other.min);
            max = upperCorner(max, other.max);
            return *this;
        }
    };

    bool isStandard(Orvan::String const& name)
    {
        constexpr char const* kStandard[] = {sPointPosition, sFaceVertex, sFaceOffset, sStrandOffset};
        return std::any_of(std::begin(kStandard), std::end(kStandard), [&](char const* n) { return name == n; });
    }

    Property describeProperty(Object const& object, Orvan::String const& name)
    {
        Property property;
        property.name = name.view();
        property.component = getTargetComponent(object, name).view();
        property.isStandard = isStandard(name);
        Orvan::String const target = getGeoPropTargetName(object, name);
        if (getRangeGeoProperty(object, target))
            property.range = target.view();
        if (auto const indices = getRangeGeoPropIndices(object, name)) {
            property.type = "range";
            property.length = indices->size;
        } else if (auto const data = getDataGeoProperty(object, name)) {
            property.type = "unknown";
            visitArray(data->getProperty(sData), [&](auto const& values, auto elementType) {
                property.type = elementType.name;
                property.length = values.size;
            });
        }
        return property;
    }

}

GeometryType typeOf(Object const& object)
{
    if (Object::isA(object, *getMeshPrototype()))
        return GeometryType::Mesh;
    if (Object::isA(object, *getStrandPrototype()))
        return GeometryType::Strands;
    return Object::isA(object, *getPointCloudPrototype()) ? GeometryType::PointCloud : GeometryType::None;
}

std::string nameOf(GeometryType type)
{
    switch (type) {
    case GeometryType::Mesh:
        return "mesh";
    case GeometryType::PointCloud:
        return "point cloud";
    case GeometryType::Strands:
        return "strand set";
    case GeometryType::None:
        break;
    }
    return "object of unknown kind";
}

void makeEmpty(GeometryType type, Object& object)
{
    Orvan::MutablePtr<Object> const empty = type == GeometryType::Mesh ? makeMesh({}, {}, {})
        : type == GeometryType::Strands                                ? makeStrands({}, {})
                                                                       : makePointCloud({});
    for (Property const& property : propertiesOf(object))
        if (!property.isStandard && property.component == sPointComp)
            empty->setProperty(property.name.c_str(), object.getProperty(property.name.c_str()));
    object = *empty;
}

void numberElements(std::string const& attribute, int number, std::string const& source, Object& object)
{
    if (object.hasProperty(attribute.c_str()))
        throw Failure(
            ExitCode::Refused, fmt::format("--source-attribute: {} already has a property \"{}\"", source, attribute));
    GeometryType const type = typeOf(object);
    Orvan::String const component = type == GeometryType::Mesh ? sFaceComp
        : type == GeometryType::Strands                        ? sStrandComp
                                                               : sPointComp;
    addDataProperty(
        attribute.c_str(), component, Orvan::Array<int>(getElementCount(object, component), number), object);
}

GeoValidator::Status validateAs(GeometryType type, Object const& object)
{
    switch (type) {
    case GeometryType::Mesh:
        return validateMesh(object);
    case GeometryType::PointCloud:
        return PointCloudValidator().validate(object);
    case GeometryType::Strands:
        return StrandValidator().validate(object);
    case GeometryType::None:
        break;
    }
    return GeoValidator::Status("it lacks the components and standard properties of any kind of geometry");
}

GeoValidator::Status validate(Object const& object)
{
    return validateAs(typeOf(object), object);
}

std::optional<BoundingBox> boundingBoxOf(Object const& object)
{
    auto const positions = dataOf<float3>(object, sPointPosition);
    if (!positions || positions->empty())
        return std::nullopt;
    GrowingBox const all = sumOverBlocks<GrowingBox>(positions->size, [&](std::size_t begin, std::size_t end) {
        GrowingBox box;
        for (std::size_t point = begin; point != end; ++point)
            box += {(*positions)[point], (*positions)[point]};
        return box;
    });
    float3 const& first = (*positions)[0]; // decides which zero is a corner, and whether it is NaN
    return BoundingBox{lowerCorner(first, all.min), upperCorner(first, all.max)};
}

Json countsOf(Object const& object)
{
    Json counts;
    for (auto const& [key, component] :
        {std::pair{"points", sPointComp}, {"corners", sFaceVertexComp}, {"faces", sFaceComp}, {"strands", sStrandComp}})
        if (object.hasProperty(component))
            counts[key] = getElementCount(object, component);
    return counts;
}

std::vector<Property> propertiesOf(Object const& object)
{
    std::vector<Property> properties;
    auto const keys = object.keys();
    for (Orvan::String const& key : *keys)
        if (getDataGeoProperty(object, key) || getRangeGeoProperty(object, key))
            properties.push_back(describeProperty(object, key));
    return properties;
}

std::vector<std::string> dropOtherProperties(Object& object)
{
    std::vector<std::string> dropped;
    for (Property const& property : propertiesOf(object)) {
        if (property.isStandard || property.component.empty())
            continue;
        object.eraseProperty(property.name.c_str());
        dropped.push_back(property.name);
    }
    return dropped;
}

std::vector<std::string> dropOutdatedProperties(Object& object)
{
    std::vector<std::string> dropped;
    auto const dropIf = [&](auto const& isOutdated) {
        for (Property const& property : propertiesOf(object)) {
            if (property.isStandard || !isOutdated(property))
                continue;
            object.eraseProperty(property.name.c_str());
            dropped.push_back(property.name);
        }
    };
    dropIf([&](Property const& property) {
        return property.range.empty() && !property.component.empty()
            && property.length != getElementCount(object, property.component.c_str());
    });
    // The data of a removed range belongs to nothing.
    dropIf([&](Property const& property) {
        return property.component.empty()
            && std::find(dropped.begin(), dropped.end(), getGeoPropTargetName(object, property.name.c_str()).view())
            != dropped.end();
    });
    return dropped;
}

std::vector<std::string> namesMissingIn(Object const& later, Object const& earlier)
{
    std::vector<std::string> names;
    for (Property const& property : propertiesOf(earlier))
        if (!later.hasProperty(property.name.c_str()))
            names.push_back(property.name);
    return names;
}

}
