#pragma once

#include "MeshTopology.h"

#include <string>
#include <vector>

namespace ModelingProgram {

/// The mesh in units in which it is about a million long: the library cuts no face below 5e-5 square units well. They
/// are a power of two of its own, so that nothing rounds.
Tessara::Object inFineUnits(Tessara::Object const& mesh);

/// The mesh with its faces cut into triangles as those of `measured` are, which differs by its unit only. The channels
/// choose the properties of faces and corners to keep.
Tessara::Object triangulatedAs(
    Tessara::Object const& measured, std::string const& channels, Tessara::Object const& mesh);

/// How well the faces of one kind have been cut into triangles.
struct CutFaces {
    std::string corners; // "4", "9 to 16"
    std::uint64_t faceCount = 0;
    Finding fans; // could not be cut, or covered too little: their triangles are the fan from the first corner
    Finding lossy; // the triangles do not cover as much as the face does
    double worstDifference = 0; // of a face's area, as a fraction of it
};

/// Compares triangles with the polygons that they were cut from: areas in the plane of each polygon, in double
/// precision. The kinds are numbers of corners; those that do not occur are left out. The firsts are faces of
/// `polygons`.
/// \pre  `triangles` is what triangulating `polygons` gave; its positions are not looked at
std::vector<CutFaces> checkTriangulation(MeshArrays const& polygons, MeshArrays const& triangles);

}
