#include "Facts.h"

#include "FaceMeasures.h"
#include "files/GeometryBuilder.h"

namespace ModelingProgram {

Json describeTopology(MeshArrays const& mesh, MeshTopology const& topology)
{
    Json values;
    values["triangles"] = topology.triangleCount;
    values["quads"] = topology.quads.count;
    values["polygons"] = topology.polygons.count;
    values["facesBelowThreeCorners"] = topology.facesBelowThreeCorners.count;
    values["facesWithRepeatedPoints"] = topology.facesWithRepeatedPoints.count;
    values["edges"] = topology.edgeCount;
    values["parts"] = topology.partCount;
    values["openEdges"] = topology.boundaryEdges.count;
    values["nonManifoldEdges"] = topology.nonManifoldEdges.count;
    values["windingConflicts"] = topology.windingConflicts.count;
    values["pinchedPoints"] = topology.nonManifoldPoints.count;
    values["isolatedPoints"] = topology.isolatedPoints.count;
    values["closedManifold"] = topology.isClosedManifold();
    values["genus"] = topology.genus ? Json(static_cast<std::uint64_t>(*topology.genus)) : Json();
    auto const slivers = countSlivers(mesh, {0.1f, 0.05f, 0.01f});
    values["sliversBelow0.1"] = slivers[0];
    values["sliversBelow0.05"] = slivers[1];
    values["sliversBelow0.01"] = slivers[2];
    return values;
}

Json describeBox(std::optional<BoundingBox> const& box)
{
    if (!box)
        return {};
    auto const numbersOf = [](float3 const& p) { return Json{numberOf(p.x), numberOf(p.y), numberOf(p.z)}; };
    return {{"min", numbersOf(box->min)}, {"max", numbersOf(box->max)}};
}

Json describeProperties(std::vector<Property> const& properties)
{
    Json list = Json::array();
    for (Property const& property : properties)
        list.push_back(
            {{"name", property.name}, {"type", property.type}, {"component", elementNames(property.component.c_str())},
                {"range", property.range.empty() ? Json() : Json(property.range)}, {"length", property.length},
                {"standard", property.isStandard}});
    return list;
}

}
