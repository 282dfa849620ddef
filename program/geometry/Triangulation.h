#pragma once

#include "MeshTopology.h"

#include <string>
#include <vector>

namespace ModelingProgram {

/// Refuses a list of channels that cannot be parsed or has no entry.
void requireChannelList(std::string const& channels);
/// Refuses a name or an including pattern that matches no property of faces or corners. Excluding patterns and * may
/// match nothing.
void requireMatchingChannels(std::string const& channels, Tessara::Object const& mesh);

/// The mesh scaled to a length of about a million units, because the library cuts faces below 5e-5 square units poorly.
/// The factor is a power of two, so nothing is rounded.
Tessara::Object inFineUnits(Tessara::Object const& mesh);

/// The mesh with its faces cut into triangles like those of `measured`, which differs from it only in scale. The
/// channels select the properties of faces and corners to keep.
Tessara::Object triangulatedAs(
    Tessara::Object const& measured, std::string const& channels, Tessara::Object const& mesh);

/// How well the faces with some numbers of corners were cut into triangles.
struct CutFaces {
    std::string corners; // "4", "9 to 16"
    std::uint64_t faceCount = 0;
    Finding fans; // could not be cut, or have too little area: their triangles are the fan from the first corner
    Finding lossy; // the area of the triangles differs from that of the face
    double worstDifference = 0; // of a face's area, as a fraction of it
};

/// Compares the areas of triangles and of the polygons that they were cut from, in the plane of each polygon and in
/// double precision. One entry per range of corner numbers that occurs; `Finding::first` is a face of `polygons`.
/// \pre  `triangles` is the result of triangulating `polygons`; its positions are not used
std::vector<CutFaces> checkTriangulation(MeshArrays const& polygons, MeshArrays const& triangles);

}
