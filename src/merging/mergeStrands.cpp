#include <Modeling/mergeStrands.h>

#include "MergedComponents.h"
#include "frame/ParallelFor.h"
#include "mergeGeoComponent.h"

#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Validators.h>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Modeling::Internal;
using namespace Tessara::Geometry;

bool mergeStrands(Orvan::Array<Orvan::Ptr<Object>> const& inputs, Object& output, Orvan::RuntimeServices const*)
{
    MergePlan const plan = planMerge(filterValid<StrandValidator>(withoutNulls(inputs)), {sPointComp, sStrandComp});
    std::optional<Offsets> const pointOffsets = computeElementOffsets(plan, 0);
    std::optional<Offsets> const strandOffsets = computeElementOffsets(plan, 1);
    if (plan.inputs.empty() || !pointOffsets || !strandOffsets)
        return false;

    Connectivity connectivity{sStrandOffset, *pointOffsets, (*pointOffsets)[plan.inputs.size()], nullptr};
    Orvan::MutablePtr<Object> const points = createObject();
    Orvan::MutablePtr<Object> const strands = createObject();
    Orvan::MutablePtr<Object> const staged = stagedCopy(output);
    bool const isMerged = runTasks(
        [&] {
            populateStrand(*points);
            mergeGeoComponent(plan, sPointComp, *pointOffsets, nullptr, *points);
        },
        [&] {
            populateStrand(*strands);
            mergeGeoComponent(plan, sStrandComp, *strandOffsets, &connectivity, *strands);
        },
        [&] { populateStrand(*staged); });
    if (!isMerged)
        return false; // an enclosing task group was cancelled
    transferComponentProperties(sPointComp, *points, *staged);
    transferComponentProperties(sStrandComp, *strands, *staged);
    bool const hasStrands = finishConnectivity(connectivity, *strandOffsets, *staged);
    if (hasStrands)
        copyOtherProperties(plan, *staged);
    publish(*staged, output);
    return hasStrands;
}

}
