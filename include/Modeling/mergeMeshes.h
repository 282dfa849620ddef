#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Merges meshes into one: concatenates points, corners and faces of all inputs in their order, with all properties.
///
/// The merged mesh has the union of the inputs' property names. For each name, the first input in which the property
/// targets the component defines default and target, and the default defines the element type: a property whose default
/// is missing or of none of the forty element types is dropped. Elements of inputs without the property, or with
/// another element type, get the default. Arrays that are too long for their component are trimmed, and those that are
/// too short are padded with the default. Merged properties have no dependencies and interpolation mode 1. Everything
/// that is not a component, data or range property is copied as by `copyNonGeoProperties`.
///
/// A range property is merged together with the data that targets it in the first input that has both; data that only
/// later inputs have is dropped. The data of each input is trimmed to its shortest array, and its indices are rebased
/// to where its data begins. `kInvalidIndex` is rebased too, and so becomes an ordinary index. An index array that is
/// longer than its component overruns into the elements of later inputs whose own index array is too short; elements
/// that get no index at all get 0. Elements of inputs without the range, or without data that targets it, get the index
/// of a default after all data; data of `GeometryType`, `GeoLocation`, `FaceEdge` and `GraphTransforms` has no such
/// default, so that these indices lead past its end.
///
/// \param inputs  Null inputs, and those that the host's validator rejects, are skipped silently. An object may occur
///                more than once, and the output may be one of the inputs: its properties before the call are merged.
/// \param output  Receives the merged mesh; its other keys are kept. If the result is false, it is unchanged with two
///                exceptions. If an enclosing oneTBB task group was cancelled, all its keys are erased. If the default
///                of the first input's `sFaceVertex` or `sFaceOffset` is not an `unsigned int`, it receives the merged
///                mesh, but none of the properties that are not geometry.
/// \param runtimeServices  Ignored; may be null.
/// \return        False if no input is valid, a component would have more than 2^32 - 1 elements, or oneTBB skipped
///                part of the work because an enclosing task group was cancelled.
/// \throws        std::bad_alloc, also if the data of a range does not fit 32 bits, with the output unchanged. Job
///                cancellation is ignored.
///
/// Runs in parallel over components, properties, inputs and elements. The result does not depend on the number of
/// threads. Writes each byte of the result once; temporary memory is small. Other threads may read the inputs
/// meanwhile.
MODELING_EXPORT bool mergeMeshes(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs, Tessara::Object& output,
    Orvan::RuntimeServices const* runtimeServices);

}
