#include <Modeling/mergeMeshes.h>

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

    struct MeshOffsets {
        std::optional<Offsets> points, corners, faces;

        explicit MeshOffsets(MergePlan const& plan)
            : points(computeElementOffsets(plan, sPointComp))
            , corners(computeElementOffsets(plan, sFaceVertexComp))
            , faces(computeElementOffsets(plan, sFaceComp))
        {
        }

        bool fit() const { return points && corners && faces; }
    };

    /// Each component is merged into an object of its own.
    struct MergedMesh {
        Connectivity faceVertex;
        Connectivity faceOffset;
        Orvan::MutablePtr<Object> points = createObject();
        Orvan::MutablePtr<Object> corners = createObject();
        Orvan::MutablePtr<Object> faces = createObject();
    };

    /// Merges the components concurrently, with face corners and faces rebased to the merged points and corners.
    /// \return  False if an enclosing task group was cancelled.
    bool mergeComponents(MergePlan const& plan, MeshOffsets const& offsets, MergedMesh& merged, Object& output)
    {
        return runTasks(
            [&] {
                populateMesh(*merged.points);
                mergeGeoComponent(plan, sPointComp, *offsets.points, nullptr, *merged.points);
            },
            [&] {
                populateMesh(*merged.corners);
                mergeGeoComponent(plan, sFaceVertexComp, *offsets.corners, &merged.faceVertex, *merged.corners);
            },
            [&] {
                populateMesh(*merged.faces);
                mergeGeoComponent(plan, sFaceComp, *offsets.faces, &merged.faceOffset, *merged.faces);
            },
            [&] { populateMesh(output); });
    }

}

bool mergeMeshes(Orvan::Array<Orvan::Ptr<Object>> const& inputs, Object& output, Orvan::RuntimeServices const*)
{
    MergePlan const plan = planMerge(withoutNulls(inputs), {sPointComp, sFaceVertexComp, sFaceComp},
        [](Object const& input) { return bool(validateMesh(input)); });
    MeshOffsets const offsets(plan);
    if (plan.inputs.empty() || !offsets.fit())
        return false;

    unsigned int const cornerCount = (*offsets.corners)[plan.inputs.size()];
    MergedMesh merged{
        {sFaceVertex, *offsets.points, std::nullopt, nullptr}, {sFaceOffset, *offsets.corners, cornerCount, nullptr}};
    StagedObject const staged(output);
    if (!mergeComponents(plan, offsets, merged, *staged)) {
        output.eraseAllProperties();
        return false;
    }

    transferComponentProperties(sPointComp, *merged.points, *staged);
    transferComponentProperties(sFaceVertexComp, *merged.corners, *staged);
    transferComponentProperties(sFaceComp, *merged.faces, *staged);
    MODELING_ASSERT(getElementCount(*staged, sFaceVertexComp) == cornerCount);
    bool const hasCorners = finishConnectivity(merged.faceVertex, *offsets.corners, *staged);
    bool const hasFaces = finishConnectivity(merged.faceOffset, *offsets.faces, *staged);
    if (hasCorners && hasFaces)
        copyNonGeoProperties(plan, *staged);
    staged.publish();
    return hasCorners && hasFaces;
}

}
