#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Merges point clouds into one: concatenates the points of all inputs in their order, with all properties. Properties,
/// invalid inputs and an output that is an input are treated as by `mergeMeshes`.
///
/// \param inputs  As for `mergeMeshes`.
/// \param output  Receives the merged cloud; its other keys are kept. If the result is false, it is unchanged.
/// \param runtimeServices  Ignored; may be null.
/// \return        False if no input is a valid point cloud, or there would be more than 2^32 - 1 points.
/// \throws        std::bad_alloc, also if the data of a range does not fit 32 bits, with the output unchanged. Job
///                cancellation is ignored.
///
/// Runs in parallel over properties, inputs and elements. The result does not depend on the number of threads. Writes
/// each byte of the result once; temporary memory is small.
MODELING_EXPORT bool mergePointClouds(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs, Tessara::Object& output,
    Orvan::RuntimeServices const* runtimeServices);

}
