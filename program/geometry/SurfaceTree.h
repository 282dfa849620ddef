#pragma once

#include "MeshArrays.h"
#include "NearestPoint.h"

#include <span>
#include <vector>

namespace ModelingProgram {

/// Finds distances of points to a surface, whose faces count as the fans of triangles from their first corners: a
/// linear bounding volume hierarchy, which is a binary tree of boxes over the triangles in Morton order (Lauterbach et
/// al., "Fast BVH construction on GPUs", 2009). Building sorts the triangles; a query near the surface takes about
/// logarithmic time.
class SurfaceTree {
public:
    explicit SurfaceTree(MeshArrays const& surface);
    /// Of some faces of the surface.
    SurfaceTree(MeshArrays const& surface, std::span<unsigned int const> faces);

    /// The squared distance to the nearest point of the surface; infinite if there are no triangles.
    double squaredDistance(double3 const& point) const;

private:
    using Corners = std::array<unsigned int, 3>;
    struct Box {
        float3 min, max;
    };

    void addFan(unsigned int face);
    void build();
    void sortTriangles();
    void buildBoxes();
    Box boxOfLeaf(std::size_t leaf) const;
    double squaredDistanceInLeaf(std::size_t leaf, double3 const& point) const;

    MeshArrays surface_;
    std::vector<Corners> triangles_;
    std::vector<Box> boxes_; // node n has the children 2n and 2n + 1; the root is 1
    std::size_t leafCount_ = 0; // a power of two
};

}
