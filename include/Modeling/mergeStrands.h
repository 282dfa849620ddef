#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Joins strand sets into one: points and strands of all inputs in their order, with all properties. What becomes of
/// properties, of invalid inputs and of an output that is an input is as in `mergeMeshes`.
///
/// A strand ends where the next one begins. So points of no strand become the end of the last strand of the inputs in
/// front of them: those in front of the first strand of a later input, and those of a later input without strands. Points
/// in front of the first strand of all stay points of no strand: the first offset is then above 0.
///
/// \param output  Receives the merged strands. Its other keys are kept. If the result is false, it is as it was, but
///                with the merged strands, and without what is no geometry, if the first input has strand offsets
///                whose default is no `unsigned int`.
/// \param runtimeServices  Not looked at; may be null.
/// \return        False if no input is a valid strand set, there would be more than 2^32 - 1 points or strands, or
///                oneTBB skipped part of the work because an enclosing task group was cancelled.
/// \throws        std::bad_alloc, also where the data of a range does not fit 32 bits, with the output as it was. Job
///                cancellation is not looked at.
///
/// Runs in parallel over components, properties, inputs and elements, with the same result for any number of threads.
/// Each byte of the result is written once; beside it next to nothing is taken.
MODELING_EXPORT bool mergeStrands(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs, Tessara::Object& output,
    Orvan::RuntimeServices const* runtimeServices);

}
