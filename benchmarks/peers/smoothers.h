#pragma once

#include "support/PolygonMesh.h"

#include <memory>

namespace Benchmarks {

/// OpenMesh's smoother of the tangential component, of the first order.
class OpenMeshSmoother {
public:
    explicit OpenMeshSmoother(TestSupport::PolygonMesh const& mesh);
    ~OpenMeshSmoother();
    void smooth(int steps);

private:
    struct Mesh;
    std::unique_ptr<Mesh> mesh_;
};

/// VTK's windowed sinc filter, which moves points along their normals too.
class VtkSmoother {
public:
    explicit VtkSmoother(TestSupport::PolygonMesh const& mesh);
    ~VtkSmoother();
    void smooth(int steps);

private:
    struct Mesh;
    std::unique_ptr<Mesh> mesh_;
};

}
