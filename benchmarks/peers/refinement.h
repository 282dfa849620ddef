#pragma once

#include "Inputs.h"

namespace Benchmarks {

/// Peers are not measured on the largest meshes.
inline Sizes withoutLargest(Sizes sizes)
{
    sizes.pop_back();
    return sizes;
}

/// `refine()` takes its mesh from arrays in the time that is measured, and returns a number of faces.
template <class Refine> void measurePeerRefinement(Run& run, Refine const& refine)
{
    std::size_t faces = 0;
    auto const work = [&] { faces = refine(); };
    for (auto _ : run.state)
        work();
    run.reportTimePerElement(faces);
    run.reportWorkingBytes(faces, memoryOf(work).peak);
    run.report("result faces", static_cast<double>(faces));
}

}
