#pragma once

#include "MeshTopology.h"

#include <string>
#include <vector>

namespace ModelingProgram {

/// How well the faces of one kind have been cut into triangles.
struct CutFaces {
    std::string corners; // "4", "9 to 16"
    std::uint64_t faceCount = 0;
    Finding fans; // could not be cut, or covered too little: their triangles are the fan from the first corner
    Finding lossy; // the triangles do not cover as much as the face does
    double worstDifference = 0; // of a face's area, as a fraction of it
};

/// Compares triangles with the polygons that they were cut from: areas in the plane of each polygon, in double
/// precision. The kinds are numbers of corners; those that do not occur are left out. The firsts are faces of `polygons`.
/// \pre  `triangles` is what triangulating `polygons` gave; its positions are not looked at
std::vector<CutFaces> checkTriangulation(MeshArrays const& polygons, MeshArrays const& triangles);

}
