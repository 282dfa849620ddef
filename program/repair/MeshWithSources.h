#pragma once

#include "geometry/MeshArrays.h"

#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

#include <string>
#include <utility>
#include <vector>

namespace ModelingProgram {

/// A mesh under repair: its standard arrays and, for each element, the element of the original mesh whose properties it
/// gets. The steps of the repair edit these only; all other properties are gathered once, at the end.
struct MeshWithSources {
    explicit MeshWithSources(Tessara::Object const& mesh);

    MeshArrays arrays;
    Orvan::Array<unsigned int> pointSource;
    Orvan::Array<unsigned int> cornerSource;
    Orvan::Array<unsigned int> faceSource;
    Orvan::Array<bool> isFlipped; // for each face but those added; relative to the original mesh
    Orvan::Array<unsigned int>
        keptPoint; // for each point: the one that it was merged into, or itself; empty without merges

    /// Keeps the faces whose entry is false, in their order.
    void dropFaces(Orvan::Array<bool> const& isDropped);
};

/// Edits an array, after copying it if it is shared.
template <class T, class Edit> void editArray(Orvan::Ptr<Orvan::Array<T>>& shared, Edit const& edit)
{
    Orvan::MutablePtr<Orvan::Array<T>> own = makeMutable(std::move(shared));
    edit(*own);
    shared = std::move(own);
}

/// The properties of points of which some point and the one that it was merged into have different values.
std::vector<std::string> propertiesWithLosses(
    Orvan::Array<unsigned int> const& keptPoint, Tessara::Object const& original);

/// Drops points that were welded and, if `dropsUnused`, those that no face uses, and gives the object the arrays of the
/// mesh and the properties of its elements: data of all element types, and ranges.
/// \param object  the mesh that was repaired; data that does not fit its elements is left as it is
/// \return the number of points that no face used, those that were welded not included
unsigned int applyRepair(MeshWithSources mesh, bool dropsUnused, Tessara::Object& object);

}
