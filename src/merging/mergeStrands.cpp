#include <Modeling/copyNonGeoProperties.h>
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
    MergePlan const plan = planMerge(filterValid<StrandValidator>(holdInputs(inputs, output)));
    std::optional<Offsets> const pointOffsets = computeElementOffsets(plan.inputs, sPointComp);
    std::optional<Offsets> const strandOffsets = computeElementOffsets(plan.inputs, sStrandComp);
    if (plan.inputs.empty() || !pointOffsets || !strandOffsets)
        return false;

    Connectivity connectivity{sStrandOffset, *pointOffsets, (*pointOffsets)[plan.inputs.size], nullptr};
    Orvan::MutablePtr<Object> const points = createObject();
    Orvan::MutablePtr<Object> const strands = createObject();
    runTasks(
        [&] {
            populateStrand(*points);
            mergeGeoComponent(plan, sPointComp, *pointOffsets, nullptr, *points);
        },
        [&] {
            populateStrand(*strands);
            mergeGeoComponent(plan, sStrandComp, *strandOffsets, &connectivity, *strands);
        },
        [&] { populateStrand(output); });

    // Whether the tasks were run is not looked at, unlike with meshes: without them there are no strand offsets.
    transferComponentProperties(sPointComp, *points, output);
    transferComponentProperties(sStrandComp, *strands, output);
    if (!finishConnectivity(connectivity, *strandOffsets, output))
        return false;
    copyNonGeoProperties(plan.inputs, output);
    return true;
}

}
