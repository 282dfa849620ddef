#include "Selection.h"

#include "files/Scanner.h"
#include "geometry/Geometry.h"
#include "geometry/MeshArrays.h"
#include "shell/Failure.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>

#include <fmt/format.h>

#include <algorithm>
#include <type_traits>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Flags = Orvan::Array<bool>;

namespace {

    /// Picks the elements whose indices a file lists, separated by whitespace; # begins a comment.
    Flags pickByIndices(std::filesystem::path const& file, Pickable const& elements, unsigned int count)
    {
        InputFile const input(file);
        TextScanner in(input, 0, TextScanner::Syntax::Comments);
        Flags picked(count);
        for (in.skipEmptyLines(); !in.atEnd(); in.skipEmptyLines())
            while (!in.atLineEnd()) {
                auto const index = in.number<long long>("an index");
                if (index < 0 || index >= count)
                    in.refuse(fmt::format("index {} is out of range: there are {}, counted from 0", index,
                        countOf(count, elements.singular)));
                picked[static_cast<std::uint64_t>(index)] = true;
            }
        return picked;
    }

    BoundingBox boxOf(std::vector<float> const& corners)
    {
        auto const [x0, x1] = std::minmax(corners[0], corners[3]);
        auto const [y0, y1] = std::minmax(corners[1], corners[4]);
        auto const [z0, z1] = std::minmax(corners[2], corners[5]);
        return {{x0, y0, z0}, {x1, y1, z1}};
    }

    Flags pointsInside(BoundingBox const& box, Tessara::Object const& object)
    {
        auto const positions = dataOf<float3>(object, sPointPosition);
        Flags inside(positions->size);
        std::transform(positions->begin(), positions->end(), inside.begin(), [&](float3 const& p) {
            return p.x >= box.min.x && p.y >= box.min.y && p.z >= box.min.z && p.x <= box.max.x && p.y <= box.max.y
                && p.z <= box.max.z;
        });
        return inside;
    }

    Flags facesInside(BoundingBox const& box, Tessara::Object const& object)
    {
        Flags const pointIsInside = pointsInside(box, object);
        MeshArrays const mesh = arraysOf(object);
        Flags inside(mesh.faceCount());
        for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
            auto const corners = mesh.corners(face);
            inside[face] =
                std::all_of(corners.begin(), corners.end(), [&](unsigned int p) { return pointIsInside[p]; });
        }
        return inside;
    }

    Flags pickByAttribute(std::string const& name, Pickable const& elements, Tessara::Object const& object)
    {
        unsigned int const count = getElementCount(object, elements.component);
        Flags picked;
        auto const property = getDataGeoProperty(object, name.c_str());
        if (property && getGeoPropTargetName(object, name.c_str()) == elements.component)
            visitArray(property->getProperty(sData), [&]<class T>(Orvan::Array<T> const& values, auto) {
                if constexpr (std::is_integral_v<T>)
                    if (values.size == count)
                        for (T const value : values)
                            picked.append(value != T{});
            });
        if (picked.size == count)
            return picked;
        std::vector<std::string> there;
        for (Property const& other : propertiesOf(object))
            if (other.component == elements.component && !other.isStandard)
                there.push_back(fmt::format("{} ({})", other.name, other.type));
        throw Failure(ExitCode::Refused,
            fmt::format("--attribute: the {1} have no boolean or integer attribute \"{0}\". There are: {2}", name,
                elements.plural, listOf(there)));
    }

}

void addSelection(Pickable const& elements, Selection& selection, Command& command)
{
    Command choice = command.addChoice("Selection", fmt::format("Which {} to pick:", elements.plural));
    choice.addOption("--indices", selection.indices, "Those whose indices, counted from 0, are listed in a text file")
        .valueName("FILE");
    choice.addOption("--box", selection.box, "Those inside the box between two corners X0 Y0 Z0 X1 Y1 Z1")
        .valueName("NUMBER")
        .values(6);
    choice.addOption("--attribute", selection.attribute, "Those whose boolean or integer attribute is not zero")
        .valueName("NAME");
    command.addFlag("--invert", selection.isInverted, "Pick the others instead");
}

Flags pickElements(Selection const& selection, Pickable const& elements, Tessara::Object const& object, Report& report)
{
    unsigned int const count = getElementCount(object, elements.component);
    bool const arePoints = Orvan::String(elements.component) == sPointComp;
    Flags picked = !selection.indices.empty() ? pickByIndices(selection.indices, elements, count)
        : !selection.attribute.empty()        ? pickByAttribute(selection.attribute, elements, object)
        : arePoints                           ? pointsInside(boxOf(selection.box), object)
                                              : facesInside(boxOf(selection.box), object);
    if (selection.isInverted)
        std::transform(picked.begin(), picked.end(), picked.begin(), [](bool isPicked) { return !isPicked; });
    auto const pickedCount = static_cast<std::uint64_t>(std::count(picked.begin(), picked.end(), true));
    if (pickedCount == 0 || pickedCount == count)
        report.warn(fmt::format("{} {} is picked", pickedCount == 0 ? "no" : "every", elements.singular));
    report.document["picked"] = pickedCount;
    report.text += fmt::format("picked {} of {}\n\n", groupDigits(pickedCount), countOf(count, elements.singular));
    return picked;
}

}
