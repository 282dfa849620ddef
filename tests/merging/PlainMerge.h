#pragma once

#include <TessaraObject/Object.h>

#include <vector>

/// A plain reference: one step after the other, with every look-up where its result is needed.
namespace PlainMerge {

using Inputs = Orvan::Array<Orvan::Ptr<Tessara::Object>>;

enum class Kind { Meshes, PointClouds, Strands };

std::vector<char const*> componentsOf(Kind kind);

bool mergePlainly(Kind kind, Inputs const& inputs, Tessara::Object& output);

}
