#pragma once

// What most tests need: builders, checks, and the makers and lookups of the host.

#include "Compare.h"
#include "FailingAllocations.h"
#include "MeshBuilder.h"
#include "MeshChecks.h"
#include "PolygonMesh.h"
#include "PropertyBag.h"
#include "Random.h"
#include "Threads.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <map>
#include <string>
#include <vector>

namespace TestSupport {

using namespace Tessara::Geometry;
using Tessara::Object;

inline constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

}
