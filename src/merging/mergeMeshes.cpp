#include <Modeling/copyNonGeoProperties.h>
#include <Modeling/mergeMeshes.h>

#include "MergedComponents.h"
#include "frame/ParallelFor.h"
#include "mergeGeoComponent.h"

#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Validators.h>

#include <algorithm>
#include <array>
#include <atomic>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Modeling::Internal;
using namespace Tessara::Geometry;

namespace {

    MergeInputs filterValidMeshes(MergeInputs const& inputs)
    {
        Orvan::Array<unsigned char> valid(inputs.size, Orvan::kUninitialized);
        // Each input has its own entry.
        parallelFor(tbb::blocked_range<std::size_t>(0, inputs.size, kFaceGrain), [&](auto const& range) {
            for (std::size_t input = range.begin(); input != range.end(); ++input)
                valid[input] = validateMesh(*inputs[input]) ? 1 : 0;
        });
        MergeInputs validInputs;
        validInputs.reserve(inputs.size);
        for (std::uint64_t input = 0; input != inputs.size; ++input)
            if (valid[input])
                validInputs.append(inputs[input]);
        return validInputs;
    }

    struct MeshOffsets {
        std::optional<Offsets> points, corners, faces;

        explicit MeshOffsets(MergeInputs const& inputs)
            : points(computeElementOffsets(inputs, sPointComp))
            , corners(computeElementOffsets(inputs, sFaceVertexComp))
            , faces(computeElementOffsets(inputs, sFaceComp))
        {
        }

        bool fit() const { return points && corners && faces; }
    };

    /// Merges the three components side by side, each into an object of its own. Corners and faces mean places among
    /// the points and corners of all inputs then.
    struct MergedMesh {
        Connectivity faceVertex;
        Connectivity faceOffset;
        Orvan::MutablePtr<Object> points = createObject();
        Orvan::MutablePtr<Object> corners = createObject();
        Orvan::MutablePtr<Object> faces = createObject();
        std::array<std::atomic<bool>, 3> isDone{};
    };

    void mergeComponents(MergePlan const& plan, MeshOffsets const& offsets, MergedMesh& merged, Object& output)
    {
        runTasks(
            [&] {
                populateMesh(*merged.points);
                mergeGeoComponent(plan, sPointComp, *offsets.points, nullptr, *merged.points);
                merged.isDone[0].store(true, std::memory_order_relaxed);
            },
            [&] {
                populateMesh(*merged.corners);
                mergeGeoComponent(plan, sFaceVertexComp, *offsets.corners, &merged.faceVertex, *merged.corners);
                merged.isDone[1].store(true, std::memory_order_relaxed);
            },
            [&] {
                populateMesh(*merged.faces);
                mergeGeoComponent(plan, sFaceComp, *offsets.faces, &merged.faceOffset, *merged.faces);
                merged.isDone[2].store(true, std::memory_order_relaxed);
            },
            [&] { populateMesh(output); });
    }

}

bool mergeMeshes(Orvan::Array<Orvan::Ptr<Object>> const& inputs, Object& output, Orvan::RuntimeServices const*)
{
    MergePlan const plan = planMerge(filterValidMeshes(holdInputs(inputs, output)));
    MeshOffsets const offsets(plan.inputs);
    if (plan.inputs.empty() || !offsets.fit())
        return false;

    unsigned int const cornerCount = (*offsets.corners)[plan.inputs.size];
    MergedMesh merged{
        {sFaceVertex, *offsets.points, std::nullopt, nullptr}, {sFaceOffset, *offsets.corners, cornerCount, nullptr}};
    mergeComponents(plan, offsets, merged, output);
    auto const wasRun = [](std::atomic<bool> const& done) { return done.load(std::memory_order_relaxed); };
    if (!std::all_of(merged.isDone.begin(), merged.isDone.end(), wasRun)) {
        output.eraseAllProperties(); // an enclosing group was cancelled
        return false;
    }

    transferComponentProperties(sPointComp, *merged.points, output);
    transferComponentProperties(sFaceVertexComp, *merged.corners, output);
    transferComponentProperties(sFaceComp, *merged.faces, output);
    bool const hasCorners = finishConnectivity(merged.faceVertex, *offsets.corners, output);
    bool const hasFaces = finishConnectivity(merged.faceOffset, *offsets.faces, output);
    if (!hasCorners || !hasFaces)
        return false;
    copyNonGeoProperties(plan.inputs, output);
    return true;
}

}
