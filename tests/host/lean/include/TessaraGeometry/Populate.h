#pragma once

#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

void populateMesh(Object& object);
void populatePointCloud(Object& object);
void populateStrand(Object& object);
void populateTag(Orvan::String const& target, Orvan::Ptr<Orvan::Array<bool>> const& values, Object& tag);
bool populateRangeGeoProperty(
    Orvan::Ptr<Orvan::Array<unsigned int>> indices, Orvan::String const& target, Object& range);

}
