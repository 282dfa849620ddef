#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Joins point clouds into one: the points of all inputs in their order, with all properties. What becomes of
/// properties, of invalid inputs and of an output that is an input is as in `mergeMeshes`.
///
/// \param output  Receives the merged cloud. Its other keys stay. Where the result is false it is as it was.
/// \param runtimeServices  Not looked at; may be null.
/// \return        False where no input is a valid point cloud, or there would be more than 2^32 - 1 points.
/// \throws        std::bad_alloc, also where the data of a range does not fit 32 bits, with the output as it was. Job
///                cancellation is not looked at.
///
/// Runs in parallel over properties, inputs and elements, with the same result for any number of threads. Each byte of
/// the result is written once; beside it next to nothing is taken.
MODELING_EXPORT bool mergePointClouds(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs, Tessara::Object& output,
    Orvan::RuntimeServices const* runtimeServices);

}
