#pragma once

#include "EdgeSides.h"
#include "MeshTopology.h"
#include "shell/Report.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace ModelingProgram {

// What an operation has made of a shape. Measured in double precision; sums are taken by blocks of faces in their order,
// so they are the same to the bit for any number of threads. Faces of more than three corners count as the fan of
// triangles from their first corner for the volume, and as what they cover in their plane for the area.

/// A fold-over is an edge of two faces whose normals differ by more than this: the surface lies back on itself there.
/// Edges of thin parts stay below, and triangles that an operation has turned over are beyond.
inline constexpr double kFoldOverDegrees = 150;

struct Shape {
    std::optional<double> volume; // that a closed mesh encloses; negative if its faces look inwards
    double area = 0;
    std::uint64_t foldOvers = 0;
    double diagonal = 0; // of the bounding box
};

/// \param isClosed  whether the mesh is a closed manifold
Shape shapeOf(MeshArrays const& mesh, EdgeSides const& edges, bool isClosed);

struct ExaminedMesh {
    MeshTopology topology;
    Shape shape;
};

/// Both at once, since listing the edges takes longer than either.
ExaminedMesh examine(MeshArrays const& mesh);

/// The numbers of elements, and the shape if the object is a mesh: for operations that leave points where they are.
Json countsAndShape(Tessara::Object const& object);

/// The points at edges whose two faces have normals that differ by more than so many degrees, or that have more than two
/// faces, ascending. Faces without area have no normal, and count for nothing.
std::vector<unsigned int> sharpPoints(MeshArrays const& mesh, EdgeSides const& edges, double degrees);

/// How far the points of `before` have moved at most, in an operation that lets them keep their numbers and may have
/// added more.
double largestMove(MeshArrays const& before, MeshArrays const& after);

/// How far the points of `before` that faces use are from the surface `after` at most, for operations that renumber points.
double largestDistance(MeshArrays const& before, MeshArrays const& after);

/// Shapes before and after an operation, and the largest move or distance.
struct ShapeChange {
    Shape before;
    Shape after;
    double largestMove = 0;
};

/// Adds the rows "volume", "area", "fold overs" and "largest move over diagonal" to the tables of a command.
void addShape(ShapeChange const& change, Json& before, Json& after);

/// Warns if the shape has changed by more than an operation should change it: see the constants in the source.
/// \param advice  a sentence that ends the warning
void warnOfShape(ShapeChange const& change, char const* advice, Report& report);

}
