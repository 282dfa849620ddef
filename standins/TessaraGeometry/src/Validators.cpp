#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include "GeoProps.h"

#include <algorithm>
#include <functional>
#include <string>

namespace Tessara::Geometry {

namespace {

    using GeoValidator::Status;
    using std::to_string;

    Status failure(std::string const& sentence)
    {
        return Status(Orvan::String(sentence));
    }

    std::string quoted(Orvan::String const& text)
    {
        return "\"" + std::string(text.view()) + "\"";
    }

    /// What a validator calls the object, and what the entries of its offset array count.
    struct Wording {
        char const* object;
        char const* indexed;
    };

    struct StandardData {
        std::string name;
        std::string component;
        std::uint64_t length; // that it must have
    };

    Status checkComponent(Object const& object, char const* name)
    {
        Orvan::Ptr<Object> const component = Internal::objectAt(object, name);
        if (component && Object::isA(*component, Internal::componentPrototype()))
            return {};
        return failure("the component " + std::string(name) + " is missing");
    }

    template <class T> Status checkStandardData(Object const& object, StandardData const& wanted)
    {
        char const* const type = std::is_same_v<T, unsigned int> ? "unsigned int" : "float3";
        Orvan::Ptr<Object> const property = getDataGeoProperty(object, wanted.name.c_str());
        if (!property)
            return failure("the data property " + wanted.name + " is missing");
        auto const values = Internal::valueOf<Orvan::Ptr<Orvan::Array<T>>>(*property, sData);
        if (!values || !*values)
            return failure(wanted.name + " does not hold an array of " + type);
        if (!Internal::valueOf<T>(*property, sDefault))
            return failure(wanted.name + " has no sDefault of type " + type);
        auto const target = Internal::valueOf<Orvan::String>(*property, sTarget).value_or("");
        if (target != wanted.component.c_str())
            return failure(wanted.name + " targets " + quoted(target) + " instead of " + wanted.component);
        if ((*values)->size != wanted.length)
            return failure(wanted.name + " has " + to_string((*values)->size) + " entries instead of "
                + to_string(wanted.length) + " for " + to_string(getElementCount(object, wanted.component.c_str()))
                + " elements of " + wanted.component);
        return {};
    }

    /// Offsets start at 0, never fall, and end at `last`.
    Status checkOffsets(
        char const* name, Orvan::Array<unsigned int> const& offsets, std::uint64_t last, Wording const& words)
    {
        if (offsets[0] != 0)
            return failure(std::string(name) + "[0] is " + to_string(offsets[0]) + " instead of 0");
        unsigned int const* const fall = std::adjacent_find(offsets.begin(), offsets.end(), std::greater<>());
        if (fall != offsets.end()) {
            auto const entry = static_cast<std::uint64_t>(fall - offsets.begin()) + 1;
            return failure(std::string(name) + "[" + to_string(entry) + "] is " + to_string(fall[1])
                + ", less than the " + to_string(fall[0]) + " before it");
        }
        if (offsets[offsets.size - 1] != last)
            return failure(std::string(name) + "[" + to_string(offsets.size - 1) + "] is "
                + to_string(offsets[offsets.size - 1]) + ", but the " + words.object + " has " + to_string(last) + " "
                + words.indexed);
        return {};
    }

    Status checkPointIndices(Orvan::Array<unsigned int> const& faceVertex, unsigned int pointCount)
    {
        unsigned int const* const beyond =
            std::find_if(faceVertex.begin(), faceVertex.end(), [=](unsigned int point) { return point >= pointCount; });
        if (beyond == faceVertex.end())
            return {};
        return failure("sFaceVertex[" + to_string(beyond - faceVertex.begin()) + "] is " + to_string(*beyond)
            + ", but the mesh has " + to_string(pointCount) + " points");
    }

    /// The first failure of the checks, which run one after the other up to it.
    template <class... Check> Status firstFailure(Check const&... checks)
    {
        Status status;
        static_cast<void>(((status = checks(), static_cast<bool>(status)) && ...));
        return status;
    }

}

Status validateMesh(Object const& mesh)
{
    unsigned int const pointCount = getElementCount(mesh, sPointComp);
    unsigned int const cornerCount = getElementCount(mesh, sFaceVertexComp);
    std::uint64_t const faceCount = getElementCount(mesh, sFaceComp);
    return firstFailure([&] { return checkComponent(mesh, sPointComp); },
        [&] { return checkComponent(mesh, sFaceVertexComp); }, [&] { return checkComponent(mesh, sFaceComp); },
        [&] {
            return checkStandardData<Math::float3>(mesh, {sPointPosition, sPointComp, pointCount});
        },
        [&] {
            return checkStandardData<unsigned int>(mesh, {sFaceVertex, sFaceVertexComp, cornerCount});
        },
        [&] {
            return checkStandardData<unsigned int>(mesh, {sFaceOffset, sFaceComp, faceCount + 1});
        },
        [&] {
            return checkOffsets(
                sFaceOffset, *dataOf<unsigned int>(mesh, sFaceOffset), cornerCount, {"mesh", "face corners"});
        },
        [&] { return checkPointIndices(*dataOf<unsigned int>(mesh, sFaceVertex), pointCount); });
}

Status PointCloudValidator::validate(Object const& pointCloud)
{
    unsigned int const pointCount = getElementCount(pointCloud, sPointComp);
    return firstFailure([&] { return checkComponent(pointCloud, sPointComp); },
        [&] {
            auto const components = getGeoPropNamesByPrototype(pointCloud, Internal::componentPrototype());
            auto const other =
                std::find_if(components.begin(), components.end(), [](auto const& name) { return name != sPointComp; });
            return other == components.end()
                ? Status()
                : failure("a point cloud has one component, but there is also " + quoted(*other));
        },
        [&] {
            return checkStandardData<Math::float3>(pointCloud, {sPointPosition, sPointComp, pointCount});
        });
}

Status StrandValidator::validate(Object const& strands)
{
    unsigned int const pointCount = getElementCount(strands, sPointComp);
    std::uint64_t const strandCount = getElementCount(strands, sStrandComp);
    return firstFailure([&] { return checkComponent(strands, sPointComp); },
        [&] { return checkComponent(strands, sStrandComp); },
        [&] {
            return checkStandardData<Math::float3>(strands, {sPointPosition, sPointComp, pointCount});
        },
        [&] {
            return checkStandardData<unsigned int>(strands, {sStrandOffset, sStrandComp, strandCount + 1});
        },
        [&] {
            auto const offsets = dataOf<unsigned int>(strands, sStrandOffset);
            // Without strands the points belong to none of them: the one offset may be 0, or their number.
            std::uint64_t const last = strandCount == 0 ? 0 : pointCount;
            if (strandCount == 0 && (*offsets)[0] == pointCount)
                return Status();
            return checkOffsets(sStrandOffset, *offsets, last, {"strand set", "points"});
        });
}

}
