#pragma once

#include "Geometry.h"
#include "MeshTopology.h"

namespace ModelingProgram {

// What `modeling info` says about geometry. Pages show the same.

/// How the faces of a mesh are connected, and its slivers.
Json describeTopology(MeshArrays const& mesh, MeshTopology const& topology);

/// Null if there is no box.
Json describeBox(std::optional<BoundingBox> const& box);

Json describeProperties(std::vector<Property> const& properties);

}
