#include <Modeling/mergePointClouds.h>

#include "copyNonGeoProperties.h"
#include "host/StagedObject.h"
#include "mergeGeoComponent.h"

#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Validators.h>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Modeling::Internal;
using namespace Tessara::Geometry;

bool mergePointClouds(Orvan::Array<Orvan::Ptr<Object>> const& inputs, Object& output, Orvan::RuntimeServices const*)
{
    MergePlan const plan = planMerge(filterValid<PointCloudValidator>(withoutNulls(inputs)), {sPointComp});
    std::optional<Offsets> const pointOffsets = computeElementOffsets(plan, sPointComp);
    if (plan.inputs.empty() || !pointOffsets)
        return false;

    StagedObject const staged(output);
    populatePointCloud(*staged);
    mergeGeoComponent(plan, sPointComp, *pointOffsets, nullptr, *staged);
    copyNonGeoProperties(plan, *staged);
    staged.publish();
    return true;
}

}
