#pragma once

// What most tests need: builders, checks, and the makers and lookups of the host.

#include "FailingAllocations.h"
#include "MeshBuilder.h"
#include "PolygonMesh.h"
#include "PropertyBag.h"
#include "Random.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>

#include <gtest/gtest.h>
#include <tbb/global_control.h>
#include <tbb/task_arena.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <initializer_list>
#include <limits>
#include <map>
#include <string>
#include <vector>

namespace TestSupport {

using namespace Tessara::Geometry;
using Tessara::Object;

inline constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

/// Runs `work` with that many threads, even if the machine has fewer cores.
template <class Work> auto withThreads(int threads, Work const& work)
{
    tbb::global_control const allowed(tbb::global_control::max_allowed_parallelism, static_cast<std::size_t>(threads));
    return tbb::task_arena(threads).execute(work);
}

/// `make` returns a `MutablePtr<Object>`, which must have the same bits for each number of threads.
template <class Make> void expectSameForThreads(std::initializer_list<int> threadCounts, Make const& make)
{
    auto const expected = withThreads(*threadCounts.begin(), make);
    for (int const threads : threadCounts)
        EXPECT_TRUE(sameContents(*withThreads(threads, make), *expected)) << threads << " threads";
}

}
