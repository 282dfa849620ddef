#pragma once

#include <OrvanCore/String.h>
#include <TessaraMathSupport/Types.h>

namespace Tessara::Geometry {

namespace Common {

    enum class GeometryType : int { None = 0, Mesh = 1, PointCloud = 2, Strands = 3 };

    /// How values between elements are interpolated.
    enum class DataInterpolationMode : int { None = 0, Linear = 1 };

    /// A location on geometry: an element of a component of an object, and coordinates within the element.
    struct GeoLocation {
        Orvan::String object;
        Orvan::String component;
        unsigned int element = 0;
        Math::float3 coordinates{};

        friend bool operator==(GeoLocation const&, GeoLocation const&) = default;
    };

}

namespace Mesh {

    /// One edge of a face, from its corner `edge` to the next one.
    struct FaceEdge {
        unsigned int face;
        unsigned int edge;

        friend bool operator==(FaceEdge const&, FaceEdge const&) = default;
    };

}

namespace Transform {

    /// The transforms of a node of a scene graph.
    struct GraphTransforms {
        Math::float4x4 local;
        Math::float4x4 world;

        friend bool operator==(GraphTransforms const&, GraphTransforms const&) = default;
    };

}

}
