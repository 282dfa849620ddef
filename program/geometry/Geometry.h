#pragma once

#include "Vectors.h"
#include "shell/Report.h"

#include <TessaraGeometry/Records.h>
#include <TessaraGeometry/Validators.h>
#include <TessaraObject/Object.h>

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace ModelingProgram {

using Tessara::Geometry::Common::GeometryType;

GeometryType typeOf(Tessara::Object const& object);
/// "mesh", "strand set", "point cloud", or "object of unknown kind".
std::string nameOf(GeometryType type);

/// Turns an object without points into an empty one of this type and keeps the attributes of its points: a file without
/// points does not determine its type.
void makeEmpty(GeometryType type, Tessara::Object& object);

/// Gives each face, strand, or point of a cloud the number of its source, as a new attribute. Refuses an object that has
/// a property of this name.
/// \param source  where the object comes from: a file in most cases
void numberElements(std::string const& attribute, int number, std::string const& source, Tessara::Object& object);

/// Validates the object with the host's validator for its type.
Tessara::Geometry::GeoValidator::Status validate(Tessara::Object const& object);
/// The same if its type is known.
Tessara::Geometry::GeoValidator::Status validateAs(GeometryType type, Tessara::Object const& object);

struct BoundingBox {
    float3 min;
    float3 max;
};

/// Nullopt if there are no points.
std::optional<BoundingBox> boundingBoxOf(Tessara::Object const& object);

/// The numbers of points, corners, faces and strands, as far as the object has such components.
Json countsOf(Tessara::Object const& object);

struct Property {
    std::string name;
    std::string type; // "float3", "range", ...
    std::string component; // whose elements it belongs to; empty if there is no such component
    std::string range; // through which it belongs to the elements; usually empty
    std::uint64_t length = 0;
    bool isStandard = false;
};

/// Data and range properties, in the order of the object's keys.
std::vector<Property> propertiesOf(Tessara::Object const& object);

/// Removes the non-standard properties of elements and returns their names: for operations that renumber elements and
/// maintain only the standard properties.
std::vector<std::string> dropOtherProperties(Tessara::Object& object);

/// Removes properties whose length no longer matches their component, or whose range was removed, and returns their
/// names.
std::vector<std::string> dropOutdatedProperties(Tessara::Object& object);

/// The properties of `earlier` that `later` lacks.
std::vector<std::string> namesMissingIn(Tessara::Object const& later, Tessara::Object const& earlier);

}
