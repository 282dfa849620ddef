#pragma once

#include <TessaraObject/Object.h>

#include <vector>

/// Merging once more, written plainly: one step after the other, everything looked up where it is needed.
namespace PlainMerge {

using Inputs = Orvan::Array<Orvan::Ptr<Tessara::Object>>;

enum class Kind { Meshes, PointClouds, Strands };

std::vector<char const*> componentsOf(Kind kind);

bool mergePlainly(Kind kind, Inputs const& inputs, Tessara::Object& output);

}
