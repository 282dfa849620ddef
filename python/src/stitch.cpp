#include "Bindings.h"
#include "Cancellation.h"
#include "Creation.h"
#include "Errors.h"
#include "Facts.h"
#include "arrays.h"

#include <Modeling/StitchTemplate.h>

#include <pybind11/stl.h>

#include <fmt/format.h>

namespace ModelingPython {

namespace {

    using Tessara::Math::float3;
    using Tessara::Modeling::LocalStrand;
    using Tessara::Modeling::StitchTemplate;

    StitchTemplate makeTemplate(Mesh& polygon, StrandSet& strands, bool strict)
    {
        Orvan::Ptr<Tessara::Object> const mesh = validObjectOf(polygon), set = validObjectOf(strands);
        return withoutLock([&] { return StitchTemplate(*mesh, *set, strict); });
    }

    std::vector<std::string> messagesOf(StitchTemplate const& made)
    {
        constexpr std::string_view kDashes = "---";
        std::vector<std::string> messages;
        std::string_view rest = made.getErrors().view();
        while (rest.starts_with(kDashes)) {
            rest.remove_prefix(kDashes.size());
            std::size_t const end = std::min(rest.find(kDashes), rest.size());
            messages.emplace_back(rest.substr(0, end));
            rest.remove_prefix(std::min(end + kDashes.size(), rest.size()));
        }
        return messages;
    }

    std::uint64_t controlPointCount(StitchTemplate const& made)
    {
        std::uint64_t count = 0;
        for (LocalStrand const& strand : made.getStrands())
            count += strand.controlPoints.size;
        return count;
    }

    py::array_t<float> weightsOf(StitchTemplate const& made)
    {
        auto const columns = static_cast<py::ssize_t>(made.getPolySize()) + 1;
        py::array_t<float> weights({static_cast<py::ssize_t>(controlPointCount(made)), columns});
        float* row = weights.mutable_data();
        for (LocalStrand const& strand : made.getStrands())
            for (Orvan::Array<float> const& point : strand.controlPoints) {
                std::copy(point.begin(), point.end(), row);
                row += columns;
            }
        return weights;
    }

    py::array_t<unsigned int> offsetsOf(StitchTemplate const& made)
    {
        Orvan::Array<unsigned int> offsets;
        std::uint64_t offset = 0;
        offsets.append(0);
        for (LocalStrand const& strand : made.getStrands())
            offsets.append(static_cast<unsigned int>(offset += strand.controlPoints.size));
        return numbersOf<unsigned int>(std::move(offsets));
    }

    /// Per edge, the strands that end on it, and at which of their ends.
    py::list endsOf(StitchTemplate const& made)
    {
        py::list edges;
        for (auto const& ends : made.getEdgeEndpoints()) {
            py::list list;
            for (auto const& [strand, end] : ends)
                list.append(py::make_tuple(strand, end));
            edges.append(list);
        }
        return edges;
    }

    void requireCorners(StitchTemplate const& made, std::uint64_t count, char const* what)
    {
        if (count != made.getPolySize())
            throw py::value_error(
                fmt::format("{} has {} rows, but the template has {} corners", what, count, made.getPolySize()));
    }

    py::array_t<float> lay(StitchTemplate const& made, Values<float> const& polygon, float scale,
        std::optional<Values<float>> const& normals, bool flip)
    {
        auto const corners = pointsOf(polygon);
        requireCorners(made, corners.size, "polygon");
        std::optional<Orvan::Array<float3>> directions;
        if (normals)
            requireCorners(made, directions.emplace(pointsOf(*normals)).size, "normals");
        Orvan::Array<float3> positions(controlPointCount(made));
        float3* position = positions.data;
        for (LocalStrand const& strand : made.getStrands())
            for (Orvan::Array<float> const& weights : strand.controlPoints) {
                if (directions)
                    made.findControlPointPos(corners, weights, scale, *directions, flip, *position++);
                else
                    made.findControlPointPos(corners, weights, scale, flip, *position++);
            }
        return numbersOf<float>(std::move(positions));
    }

}

void bindStitch(py::module_& module)
{
    py::class_<StitchTemplate> stitchTemplate(module, "StitchTemplate");
    defineCreation(stitchTemplate, &makeTemplate);
    stitchTemplate.def_property_readonly("corner_count", &StitchTemplate::getPolySize)
        .def_property_readonly("tolerance", &StitchTemplate::getTol)
        .def_property_readonly("errors", &messagesOf)
        .def_property_readonly("weights", &weightsOf)
        .def_property_readonly("strand_offsets", &offsetsOf)
        .def_property_readonly("edge_ends", &endsOf)
        .def("lay", &lay);
}

}
