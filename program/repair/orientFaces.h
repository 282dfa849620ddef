#pragma once

#include "Adjacency.h"
#include "MeshWithSources.h"

#include <array>
#include <cstddef>
#include <span>
#include <vector>

namespace ModelingProgram {

/// The connected components of faces by joined sides, in ascending order of their lowest face.
struct Sheets {
    std::vector<unsigned int> faces; // those of one sheet after those of another, by their distance from the first
    std::vector<std::size_t> starts; // of each sheet, and the end

    std::size_t count() const { return starts.size() - 1; }
    std::span<unsigned int const> facesOf(std::size_t sheet) const
    {
        return std::span(faces).subspan(starts[sheet], starts[sheet + 1] - starts[sheet]);
    }
};

/// Linear, on the calling thread.
Sheets findSheets(MeshArrays const& mesh, Adjacency const& adjacency);

struct Orientation {
    std::vector<unsigned char> isFlipped; // for each face whether its orientation has to be reversed
    std::vector<unsigned int> conflicts; // sides where that is not enough, because the sheet is not orientable
};

/// Finds which faces to flip so that all faces of a sheet have the orientation that most of them have; that of its
/// lowest face if there are as many of both kinds. Conflicts are found as far from the lowest face as possible.
Orientation orientSheets(MeshArrays const& mesh, Adjacency const& adjacency);

/// Reverses the corners of faces, all but the first.
void flipFaces(std::vector<unsigned char> const& isFlipped, MeshWithSources& mesh, Adjacency& adjacency);

/// Turns closed sheets outward, so that their volume is positive. Those inside an odd number of other closed sheets
/// that are oriented inward remain so: they bound cavities. Open sheets remain as they are.
void turnOutward(MeshWithSources& mesh, Adjacency& adjacency);

/// Drops sheets that are copies: open ones in which each face has a twin in another sheet, unless that was dropped too.
/// \return the number of faces that were dropped; if it is not 0, the adjacency must be rebuilt
unsigned int dropCopiedSheets(
    std::vector<std::array<unsigned int, 2>> const& twins, Adjacency const& adjacency, MeshWithSources& mesh);

}
