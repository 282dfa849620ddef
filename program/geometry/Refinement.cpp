#include "Refinement.h"

#include "LargeFaces.h"
#include "shell/Failure.h"
#include "shell/Report.h"

#include <Modeling/subdivisionSteps.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>

namespace ModelingProgram {

using Tessara::Object;

namespace {

    /// The library refines nothing below its own limit; and if points are only as far apart as adjacent floats, faces
    /// never become small enough.
    bool isTooFine(float tolerance, float farthest)
    {
        constexpr float kFinest = std::numeric_limits<float>::epsilon();
        return !(tolerance > 4 * kFinest * farthest);
    }

}

float refinementTolerance(std::optional<float> absolute, std::optional<float> relative,
    std::optional<BoundingBox> const& boundingBox, GuideGrid const* guide)
{
    if (!boundingBox)
        return absolute.value_or(0); // not used for an empty mesh
    BoundingBox const& box = *boundingBox;
    float3 const size{box.max.x - box.min.x, box.max.y - box.min.y, box.max.z - box.min.z};
    float const tolerance = absolute ? *absolute : *relative * std::hypot(size.x, size.y, size.z);

    constexpr float kNear = 0.25f; // closer to the origin, the library's own limit is the coarser one
    float farthest = kNear;
    for (float const coordinate : {box.min.x, box.min.y, box.min.z, box.max.x, box.max.y, box.max.z})
        farthest = std::max(farthest, std::abs(coordinate));
    if (isTooFine(tolerance, farthest) && farthest == kNear)
        throw Failure(ExitCode::Refused,
            fmt::format(
                "a tolerance of {} is too fine: below {} nothing is refined. Use a larger one, or scale the mesh "
                "up.",
                tolerance, kNear * 4 * std::numeric_limits<float>::epsilon()));
    if (isTooFine(tolerance, farthest))
        throw Failure(ExitCode::Refused,
            fmt::format("a tolerance of {} is finer than single precision can distinguish at coordinates of up to {}. "
                        "Use a larger one, or move the mesh to the origin.",
                tolerance, farthest));
    float const scale = guide ? guide->range().leastPositive.value_or(1) : 1;
    if (isTooFine(tolerance * scale, farthest))
        throw Failure(ExitCode::Refused,
            fmt::format("a tolerance of {} times the smallest positive value of grid \"{}\", {}, is finer than single "
                        "precision can distinguish there. Use a larger tolerance or --min-value.",
                tolerance, guide->grid(), scale));
    return tolerance;
}

std::uint64_t countFacesAbove(float tolerance, Object const& refined)
{
    return countLargeFaces(refined, [=](MeshArrays const& mesh, Orvan::Array<bool>& marks) {
        Geometry::Mesh::Internal::markForSubdivision(
            tolerance, mesh.faceCount(), *mesh.positions, *mesh.faceVertex, *mesh.faceOffset, marks);
    });
}

std::string warningOfLargeFaces(std::uint64_t count)
{
    return fmt::format("{} still larger than the tolerance: they reached the limit of 31 steps, which divide edges by "
                       "25 million.",
        count == 1 ? "1 face is" : groupDigits(count) + " faces are");
}

std::string DroppedByRefinement::sentence() const
{
    return fmt::format("dropped {}: {}", fmt::join(names, ", "), reason);
}

std::vector<DroppedByRefinement> droppedByRefinement(Object const& before, Object const& after)
{
    std::map<std::string, std::vector<std::string>> namesByReason;
    for (Property const& property : propertiesOf(before)) {
        if (after.hasProperty(property.name.c_str()))
            continue;
        std::string reason = "refinement replaces faces and corners";
        if (property.component == Tessara::Geometry::sPointComp)
            reason = property.range.empty() && property.type != "range"
                ? fmt::format("values of type {} cannot be interpolated for new points", property.type)
                : "ranges cannot be interpolated for new points";
        namesByReason[reason].push_back(property.name);
    }
    std::vector<DroppedByRefinement> dropped;
    for (auto& [reason, names] : namesByReason)
        dropped.push_back({reason, std::move(names)});
    return dropped;
}

}
