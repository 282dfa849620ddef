#pragma once

#include "support/MeshBuilder.h"

namespace Benchmarks {

// OpenMesh, whose headers are compiled once. Each builds its own mesh from the arrays first.

/// \return the number of half-edges
std::size_t buildOpenMesh(TestSupport::MeshBuilder const& mesh);
/// Uniform √3-subdivision. \return the number of faces
std::size_t refineOpenMesh(TestSupport::MeshBuilder const& mesh, unsigned int steps);
/// Adaptive √3-subdivision by composite rules, until faces fit into twice `tolerance`. \return the number of faces
std::size_t refineOpenMeshAdaptively(TestSupport::MeshBuilder const& mesh, float tolerance);

}
