#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/String.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Appends points to a point cloud, and values for them to all its properties.
///
/// - Data properties of the 36 scalar, vector, matrix and text types get the property's `sDefault` for the new points,
///   and zeros (matrices too) or empty texts where there is no default of their type. An array of another length than
///   the points had is brought to the new count all the same.
/// - Data properties of the host's record types (`GeometryType`, `GeoLocation`, `FaceEdge`, `GraphTransforms`), and
///   those whose array is null, lose their array: `sData` becomes empty.
/// - Range properties get `kInvalidIndex`, so that new points have no data through them; null indices stay.
///
/// \param positions  Of the new points, in scene units. May be empty, and may be the cloud's own array.
/// \param tag        Name of a boolean property of the object that marks the new points, with an entry for every point:
///                   true for the new ones. What the object had under that name is replaced. Empty for no tag.
/// \param object     A point cloud. Other holders of its properties and arrays see no change.
/// \param services   Without effect; may be null.
/// \return           False, with the object unchanged: it is no point cloud, it has further components, it has no
///                   float3 array of positions for its points, or the new count exceeds 32 bits. False, after all of
///                   the above is done: the tag was named `sPointPosition`, and has replaced the positions.
/// \throws           std::bad_alloc, with the object as it was. Job cancellation is not looked at.
///
/// Linear in the new number of points, in parallel. Each array is copied once, into memory with the capacity that
/// growing it gives; the old ones are let go at the end.
MODELING_EXPORT bool addPointsToPointCloud(Orvan::Array<Tessara::Math::float3> const& positions,
    Orvan::String const& tag, Tessara::Object& object, Orvan::RuntimeServices const* services);

}
