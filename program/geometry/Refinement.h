#pragma once

#include "Geometry.h"
#include "GuideGrid.h"

#include <TessaraObject/Object.h>

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace ModelingProgram {

/// The tolerance of a refinement.
/// \param absolute     in model units; if it is missing, `relative` times the diagonal of the bounding box is used
/// \param boundingBox  of the mesh; none for an empty mesh
/// \param guide        scales it; may be null
/// \throws Failure     if single precision cannot represent faces that small
float refinementTolerance(std::optional<float> absolute, std::optional<float> relative,
    std::optional<BoundingBox> const& boundingBox, GuideGrid const* guide);

/// The number of faces of a refined mesh that the tolerance would still split.
std::uint64_t countFacesAbove(float tolerance, Tessara::Object const& refined);
/// A sentence about such faces.
std::string warningOfLargeFaces(std::uint64_t count);

/// Properties that a refinement dropped for one reason.
struct DroppedByRefinement {
    std::string reason;
    std::vector<std::string> names;

    /// "dropped material, uv: refinement replaces faces and corners"
    std::string sentence() const;
};
std::vector<DroppedByRefinement> droppedByRefinement(Tessara::Object const& before, Tessara::Object const& after);

}
