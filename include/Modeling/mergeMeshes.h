#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Joins meshes into one: points, corners and faces of all inputs in their order, with all properties.
///
/// The names of all inputs decide which properties there are. Of each name the first input in which it targets the
/// component decides element type, default and target. Inputs without the property, or with one of another type, get
/// the default; arrays that are too long for their component are cut off, those that are too short are filled up with
/// the default. Merged properties have no dependencies, and the interpolation mode 1. What is no geo property of
/// components, ranges or data comes from the first input that has the key.
///
/// A range property comes along with the data that targets it in the first input that has both; data that only later
/// inputs have is lost. The data of each input is cut off to its shortest array, and the indices of an input are raised
/// to where its data begins, `kInvalidIndex` too, which then means something else. Index arrays that are longer than
/// their component run on into the elements of the next input where that has none of its own; those that are shorter
/// leave zeros. Elements of inputs without the range get an index to a default behind all data; data of `GeometryType`,
/// `GeoLocation`, `FaceEdge` and `GraphTransforms` has no such default, so that their index leads out of it.
///
/// \param inputs  Those that the host's validator does not accept are skipped, silently, and so are null ones. The same
///                object may stand in it several times, and the output may be one of them: it counts as what it was
///                before the call.
/// \param output  Receives the merged mesh. Its other keys stay. Where the result is false it is as it was, but: with
///                all keys erased where an enclosing oneTBB group was cancelled; with the merged mesh, and without what
///                is no geometry, where the first input has a connectivity array whose default is no `unsigned int`.
/// \param runtimeServices  Not looked at; may be null.
/// \return        False if no input is valid, there would be more than 2^32 - 1 elements of a component, or oneTBB skipped
///                part of the work because an enclosing task group was cancelled.
/// \throws        std::bad_alloc, also where the data of a range does not fit 32 bits, with the output as it was. Job
///                cancellation is not looked at.
///
/// Runs in parallel over components, properties, inputs and elements, with the same result for any number of threads.
/// Each byte of the result is written once; beside it next to nothing is taken. Inputs may be read by others meanwhile.
MODELING_EXPORT bool mergeMeshes(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs, Tessara::Object& output,
    Orvan::RuntimeServices const* runtimeServices);

}
