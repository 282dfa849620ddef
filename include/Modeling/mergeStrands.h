#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Merges strand sets into one: concatenates points and strands of all inputs in their order, with all properties.
/// Properties, invalid inputs and an output that is an input are treated as by `mergeMeshes`.
///
/// A strand ends where the next one begins. Points before the first strand of an input, or all its points if it has no
/// strands, are therefore appended to the last strand of the preceding inputs. If no strand precedes them, they still
/// belong to none: the first offset is then above 0.
///
/// \param inputs  As for `mergeMeshes`.
/// \param output  Receives the merged strands; its other keys are kept. If the result is false, it is unchanged with
///                one exception: if the default of the first input's `sStrandOffset` is not an `unsigned int`, it
///                receives the merged strands, but none of the properties that are not geometry.
/// \param runtimeServices  Ignored; may be null.
/// \return        False if no input is a valid strand set, there would be more than 2^32 - 1 points or strands, or
///                oneTBB skipped part of the work because an enclosing task group was cancelled.
/// \throws        std::bad_alloc, also if the data of a range does not fit 32 bits, with the output unchanged. Job
///                cancellation is ignored.
///
/// Runs in parallel over components, properties, inputs and elements. The result does not depend on the number of
/// threads. Writes each byte of the result once; temporary memory is small.
MODELING_EXPORT bool mergeStrands(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs, Tessara::Object& output,
    Orvan::RuntimeServices const* runtimeServices);

}
