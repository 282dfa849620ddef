#pragma once

#include "support/MeshBuilder.h"

#include <memory>

namespace Benchmarks {

/// A surface mesh of CGAL, hidden so that its headers are compiled once.
class CgalMesh {
public:
    explicit CgalMesh(TestSupport::MeshBuilder const& mesh);
    CgalMesh(CgalMesh const& other);
    CgalMesh& operator=(CgalMesh const&) = delete;
    ~CgalMesh();

    /// Collapses the needles that CGAL finds when the shortest edge is less than `ratio` times the longest, as often as
    /// that gives new ones.
    void removeNeedles(float ratio);
    std::size_t faceCount() const;

private:
    struct Mesh;
    std::unique_ptr<Mesh> mesh_;
};

}
