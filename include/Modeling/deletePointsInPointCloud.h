#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Deletes points of a point cloud, with their values in all properties. The order of the other points does not change.
///
/// \param indices   Points to delete, in any order. Repeated ones count once; negative ones, and those at or beyond the
///                  number of points, are ignored. May be an array of the cloud.
/// \param object    A point cloud. The count of `sPointComp` and everything that targets it changes, as
///                  `deleteComponents` says; other holders of properties and arrays see no change.
/// \param services  Without effect; may be null.
/// \return          True, also when `indices` is empty or names every point. False, with the object unchanged: it is no
///                  point cloud, or one without points. False for range properties that `deleteComponents` refuses,
///                  with what that says has been done.
/// \throws          std::bad_alloc, with the object as it was. Job cancellation is not looked at.
///
/// Linear in points and indices. Points are marked in parallel, and arrays compacted as `deleteComponents` says. Takes
/// a byte a point beside that.
MODELING_EXPORT bool deletePointsInPointCloud(
    Orvan::Array<unsigned int> const& indices, Tessara::Object& object, Orvan::RuntimeServices const* services);
MODELING_EXPORT bool deletePointsInPointCloud(
    Orvan::Array<long long> const& indices, Tessara::Object& object, Orvan::RuntimeServices const* services);

}
