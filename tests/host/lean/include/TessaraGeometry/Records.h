#pragma once

#include <OrvanCore/String.h>

namespace Tessara::Geometry {

namespace Common {

    enum class GeometryType : int {};
    enum class DataInterpolationMode : int {};

    class GeoLocation {
    public:
        GeoLocation() = default;
        explicit GeoLocation(char const* place)
            : place_(place)
        {
        }
        Orvan::String const& place() const { return place_; }

    private:
        Orvan::String place_;
    };

}

namespace Mesh {

    struct FaceEdge {
        unsigned int face, edge;
    };

}

namespace Transform {

    struct GraphTransforms {
        double values[32];
    };

}

}
