#pragma once

#include "frame/FaceAdjacency.h"

namespace Modeling::Internal {

/// The faces across the edges of each face, as `buildFaceAdjacency` finds them, and as they are changed afterwards. At
/// first they are known only for the faces at marked points; when another face is asked for, those of all faces are
/// found. For one thread at a time.
class PartialAdjacency {
public:
    PartialAdjacency() = default;

    /// \param mesh      triangles; must outlive the adjacency and remain unchanged
    /// \param isMarked  one per point
    /// \param around    the corners at each point
    PartialAdjacency(MeshArrays const& mesh, Orvan::Array<unsigned char> const& isMarked, PointCorners const& around);

    std::array<unsigned int, 3> const& operator[](unsigned int face) const { return known(face); }
    std::array<unsigned int, 3>& operator[](unsigned int face) { return known(face); }

private:
    static constexpr unsigned int kUnknown = 0xFFFFFFFEu; // no face: there are at most a third as many as corners

    std::array<unsigned int, 3>& known(unsigned int face) const
    {
        if (neighbors_.data[face][0] == kUnknown)
            findAll();
        return neighbors_.data[face];
    }

    bool findAtMarked(Orvan::Array<unsigned char> const& isMarked, PointCorners const& around);
    void findAll() const;

    MeshArrays const* mesh_ = nullptr;
    FaceAdjacency neighbors_; // nobody sees that unknown ones are found later
};

}
