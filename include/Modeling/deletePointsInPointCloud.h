#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Deletes points of a point cloud, with their values in all properties. The order of the other points is kept.
///
/// \param indices   Points to delete, in any order. Duplicates, negative indices, and those at or beyond the number of
///                  points are ignored. May be an array of the cloud.
/// \param object    A point cloud. Changes the count of `sPointComp` and all properties that target it, as
///                  `deleteComponents` does. Other references to properties and arrays see no change.
/// \param services  Ignored; may be null.
/// \return          True, also if `indices` is empty or names every point. False, with the object unchanged: it is not
///                  a point cloud, or has no points. False if `deleteComponents` refuses a range property, with the
///                  changes that it documents for that case.
/// \throws          std::bad_alloc, with the object unchanged. Job cancellation is ignored.
///
/// Linear in the number of points and indices. Marks points in parallel, and compacts arrays as `deleteComponents`
/// does. Allocates one more byte per point.
MODELING_EXPORT bool deletePointsInPointCloud(
    Orvan::Array<unsigned int> const& indices, Tessara::Object& object, Orvan::RuntimeServices const* services);
MODELING_EXPORT bool deletePointsInPointCloud(
    Orvan::Array<long long> const& indices, Tessara::Object& object, Orvan::RuntimeServices const* services);

}
