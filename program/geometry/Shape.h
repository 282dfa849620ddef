#pragma once

#include "EdgeSides.h"
#include "MeshTopology.h"
#include "shell/Report.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace ModelingProgram {

// How an operation changed a shape. Measured in double precision; sums are accumulated over fixed blocks of faces in
// order, so they are bitwise identical for any number of threads. Faces with more than three corners count as the fan
// of triangles from their first corner for the volume, and are projected to their plane for the area.

/// A fold-over is an edge with two faces whose normals differ by more than this: the surface folds back on itself
/// there. Edges of thin parts are below this angle, and faces flipped by an operation are above it.
inline constexpr double kFoldOverDegrees = 150;

struct Shape {
    std::optional<double> volume; // enclosed by a closed mesh; negative if its normals point inward
    double area = 0;
    std::uint64_t foldOvers = 0;
    double diagonal = 0; // of the bounding box
};

struct ExaminedMesh {
    MeshTopology topology;
    Shape shape;
    std::uint64_t sliverCount = 0; // faces whose shortest edge is shorter than the given ratio times their longest edge
};

/// All at once, because finding the edges and reading the positions of faces take longest.
ExaminedMesh examine(MeshArrays const& mesh, float sliverRatio = 0);

struct ExaminedMove {
    MeshTopology topology; // before and after
    Shape before;
    Shape after;
};

/// The same as to examine a mesh before and after its points have moved, but its faces are connected only once.
ExaminedMove examineMove(MeshArrays const& before, MeshArrays const& after);

/// The numbers of elements, and the shape: for operations that do not move points.
Json countsAndShape(Tessara::Object const& mesh, Shape const& shape);

/// The points at edges whose two faces have normals that differ by more than `degrees`, or that have more than two
/// faces, in ascending order. Faces without area have no normal and are ignored.
std::vector<unsigned int> sharpPoints(MeshArrays const& mesh, EdgeSides const& edges, double degrees);

/// The largest move of a point of `before`, for operations that keep the numbers of points and may append more.
double largestMove(MeshArrays const& before, MeshArrays const& after);

/// Shapes before and after an operation, and the largest move or distance.
struct ShapeChange {
    Shape before;
    Shape after;
    double largestMove = 0;
};

/// Adds the rows "volume", "area", "fold overs" and "largest move over diagonal" to the tables of a command.
void addShape(ShapeChange const& change, Json& before, Json& after);

/// Warns if the shape changed by more than the thresholds in the source.
/// \param advice  a sentence at the end of the warning
void warnOfShape(ShapeChange const& change, char const* advice, Report& report);

}
