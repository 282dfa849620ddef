#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/String.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Appends points to a point cloud, with values for them in all its properties.
///
/// - Data properties of the 36 scalar, vector, matrix and string types get the property's `sDefault` for the new
///   points. If there is no default of their type, they get zeros (also for matrices) or empty strings. Arrays whose
///   length differs from the old point count are padded in the same way, or trimmed, to the new count.
/// - Data properties of the host's record types (`GeometryType`, `GeoLocation`, `FaceEdge`, `GraphTransforms`), and
///   those whose array is null, lose their array: `sData` becomes empty.
/// - Range properties get `kInvalidIndex`, so that new points refer to no data; null indices stay null.
///
/// \param positions  Positions of the new points, in scene units. May be empty, and may be the cloud's own array.
/// \param tag        Name of a boolean property of the object that marks the new points: one entry per point, true for
///                   the new ones. Replaces any property of that name. Empty for no tag.
/// \param object     A point cloud. Other references to its properties and arrays see no change.
/// \param services   Ignored; may be null.
/// \return           False, with the object unchanged: it is not a point cloud, has other components or no float3 array
///                   of positions for its points, or the new count exceeds 32 bits. False, with all of the above done:
///                   the tag is named `sPointPosition` and has replaced the positions.
/// \throws           std::bad_alloc, with the object unchanged. Job cancellation is ignored.
///
/// Arrays that are not shared and have room for the new points grow in place, so that many calls take time in proportion to
/// the points that they add, and marking them with a tag takes a byte per point besides. Otherwise one array after another is
/// copied, blocks of large ones in parallel, into a new array with room for as many points again; the old arrays are
/// released at the end.
MODELING_EXPORT bool addPointsToPointCloud(Orvan::Array<Tessara::Math::float3> const& positions,
    Orvan::String const& tag, Tessara::Object& object, Orvan::RuntimeServices const* services);

}
