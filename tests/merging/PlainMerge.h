#pragma once

#include <TessaraObject/Object.h>

/// Merging once more, written plainly: one step after the other, everything looked up where it is needed.
namespace PlainMerge {

using Inputs = Orvan::Array<Orvan::Ptr<Tessara::Object>>;

bool mergeMeshes(Inputs const& inputs, Tessara::Object& output);
bool mergePointClouds(Inputs const& inputs, Tessara::Object& output);
bool mergeStrands(Inputs const& inputs, Tessara::Object& output);

}
