#pragma once

#include "support/MeshBuilder.h"

#include <memory>

namespace Benchmarks {

/// A mesh for CGAL, whose headers are compiled once.
class CgalRefinement {
public:
    explicit CgalRefinement(TestSupport::MeshBuilder const& mesh);
    ~CgalRefinement();

    /// Builds a surface mesh with its half-edges from flat arrays. \return its number of half-edges
    std::size_t buildAdjacency() const;
    /// Uniform √3-subdivision of a copy. \return the number of faces
    std::size_t refine(unsigned int steps) const;

private:
    struct Mesh;
    std::unique_ptr<Mesh> mesh_;
};

}
