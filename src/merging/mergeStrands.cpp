#include <Modeling/mergeStrands.h>

#include "MergedComponents.h"
#include "copyNonGeoProperties.h"
#include "frame/Assert.h"
#include "frame/ParallelFor.h"
#include "host/StagedObject.h"
#include "mergeGeoComponent.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Validators.h>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Modeling::Internal;
using namespace Tessara::Geometry;

namespace {

    /// Each component is merged into an object of its own.
    struct MergedStrands {
        Connectivity strandOffset;
        Orvan::MutablePtr<Object> points = createObject();
        Orvan::MutablePtr<Object> strands = createObject();
    };

    /// Merges the components concurrently, with strands rebased to the merged points.
    /// \return  False if an enclosing task group was cancelled.
    bool mergeComponents(MergePlan const& plan, Offsets const& pointOffsets, Offsets const& strandOffsets,
        MergedStrands& merged, Object& output)
    {
        return runTasks(
            [&] {
                populateStrand(*merged.points);
                mergeGeoComponent(plan, sPointComp, pointOffsets, nullptr, *merged.points);
            },
            [&] {
                populateStrand(*merged.strands);
                mergeGeoComponent(plan, sStrandComp, strandOffsets, &merged.strandOffset, *merged.strands);
            },
            [&] { populateStrand(output); });
    }

}

bool mergeStrands(Orvan::Array<Orvan::Ptr<Object>> const& inputs, Object& output, Orvan::RuntimeServices const*)
{
    MergePlan const plan = planMerge(filterValid<StrandValidator>(withoutNulls(inputs)), {sPointComp, sStrandComp});
    std::optional<Offsets> const pointOffsets = computeElementOffsets(plan, sPointComp);
    std::optional<Offsets> const strandOffsets = computeElementOffsets(plan, sStrandComp);
    if (plan.inputs.empty() || !pointOffsets || !strandOffsets)
        return false;

    unsigned int const pointCount = (*pointOffsets)[plan.inputs.size()];
    MergedStrands merged{{sStrandOffset, *pointOffsets, pointCount, nullptr}};
    StagedObject const staged(output);
    if (!mergeComponents(plan, *pointOffsets, *strandOffsets, merged, *staged))
        return false;

    transferComponentProperties(sPointComp, *merged.points, *staged);
    transferComponentProperties(sStrandComp, *merged.strands, *staged);
    MODELING_ASSERT(getElementCount(*staged, sPointComp) == pointCount);
    bool const hasStrands = finishConnectivity(merged.strandOffset, *strandOffsets, *staged);
    if (hasStrands)
        copyNonGeoProperties(plan, *staged);
    staged.publish();
    return hasStrands;
}

}
