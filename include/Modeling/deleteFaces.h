#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Deletes faces of a mesh, with their corners and every point that no remaining face uses: also points that no face
/// used before. The order of what stays does not change.
///
/// \param deleted  One entry a face; true means that the face goes. May be an array of the mesh.
/// \param mesh     Faces with any number of corners. The counts of `sPointComp`, `sFaceVertexComp` and `sFaceComp`
///                 change, and everything that targets one of them, as `deleteComponents` says. `sFaceVertex` (one
///                 point index a corner) and `sFaceOffset` (face count + 1 entries) are renumbered. Other holders of
///                 properties and arrays see no change.
/// \pre            Every face has corners, offsets do not fall, and indices are in range. Otherwise nothing is read or
///                 written outside the arrays, but entries may come out as sentinels: the offset of a face without
///                 corners follows the corner behind it, and is `kDeletedElement` where that one goes.
/// \return         False, with the mesh unchanged: it is no mesh, the length of `deleted` is not the number of faces,
///                 `sFaceOffset` has not one entry more than that, one of the two index arrays is missing, of another
///                 type, not that of its component or (`sFaceVertex`) shorter than it, or there are no points.
///                 False, without rollback: the mesh has points but no corners, and loses all points; or there is a
///                 range property that `deleteComponents` refuses. Points come first, then corners, then faces, and
///                 what was in front stays done: the two index arrays may then hold old numbers.
/// \throws         std::bad_alloc, with the mesh as it was. Job cancellation is not looked at.
///
/// Linear in points, corners and faces. Used points are marked on the calling thread, arrays are compacted as
/// `deleteComponents` says. Takes 5 bytes a point, and 4 for each point, corner and face that stays.
MODELING_EXPORT bool deleteFaces(Orvan::Array<bool> const& deleted, Tessara::Object& mesh);

}
