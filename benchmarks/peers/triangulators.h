#pragma once

#include "support/PolygonMesh.h"

#include <memory>

namespace Benchmarks {

// Meshes of peers with their own ways of triangulating all faces, hidden so that their headers are compiled once.

class CgalTriangulator {
public:
    explicit CgalTriangulator(TestSupport::PolygonMesh const& mesh);
    CgalTriangulator(CgalTriangulator const& other);
    CgalTriangulator& operator=(CgalTriangulator const&) = delete;
    ~CgalTriangulator();

    void triangulate();

private:
    struct Mesh;
    std::unique_ptr<Mesh> mesh_;
};

class VtkTriangulator {
public:
    explicit VtkTriangulator(TestSupport::PolygonMesh const& mesh);
    VtkTriangulator(VtkTriangulator const& other);
    VtkTriangulator& operator=(VtkTriangulator const&) = delete;
    ~VtkTriangulator();

    void triangulate();

private:
    struct Mesh;
    std::unique_ptr<Mesh> mesh_;
};

}
