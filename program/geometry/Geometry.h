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
/// "mesh", "strand set", "point cloud", or "object of no known kind".
std::string nameOf(GeometryType type);

/// Makes an object without points an empty one of that type, with the attributes that its points had: a file without points
/// does not tell what it is.
void makeEmpty(GeometryType type, Tessara::Object& object);

/// The verdict of the host's validator for the kind of the object.
Tessara::Geometry::GeoValidator::Status validate(Tessara::Object const& object);

struct BoundingBox {
    float3 min;
    float3 max;
};

/// Nothing where there are no points.
std::optional<BoundingBox> boundingBoxOf(Tessara::Object const& object);

/// The numbers of points, corners, faces and strands, as far as the object has such components.
Json countsOf(Tessara::Object const& object);

struct Property {
    std::string name;
    std::string type; // "float3", "range", ...
    std::string component; // whose elements it belongs to; empty where that leads nowhere
    std::string range; // that it belongs to its elements through; mostly empty
    std::uint64_t length = 0;
    bool isStandard = false;
};

/// Data and ranges, in the order of the object's keys.
std::vector<Property> propertiesOf(Tessara::Object const& object);

/// Removes what belongs to elements and is not standard, and returns the names: for operations that renumber elements
/// and take only the standard properties along.
std::vector<std::string> dropOtherProperties(Tessara::Object& object);

/// Removes what no longer has a value for each element of its component, or whose range is gone, and returns the names.
std::vector<std::string> dropOutdatedProperties(Tessara::Object& object);

/// The properties of `earlier` that `later` has not got.
std::vector<std::string> namesMissingIn(Tessara::Object const& later, Tessara::Object const& earlier);

}
