#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>
#include <TessaraMathSupport/Types.h>

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

    /// What messages call the validated object, and the elements that its offset array refers to.
    struct Wording {
        char const* object;
        char const* indexed;
    };

    /// The object under the name of a component; null if there is none.
    struct Component {
        char const* name;
        Object const* geoProperty;
        unsigned int count = 0;

        Component(Object const& object, char const* componentName)
            : name(componentName)
            , geoProperty(Internal::objectIn(object, name))
        {
            if (geoProperty)
                count = Internal::elementCountOf(*geoProperty);
        }
    };

    Status checkComponent(Component const& component)
    {
        if (component.geoProperty && Object::isA(*component.geoProperty, Internal::componentPrototype()))
            return {};
        return failure("the component " + std::string(component.name) + " is missing");
    }

    struct StandardData {
        char const* name;
        Component const& component;
        std::uint64_t length; // required
    };

    /// \param values  Receives the array if it passes.
    template <class T> Status checkStandardData(
        Object const& object, StandardData const& required, Orvan::Array<T> const** values = nullptr)
    {
        std::string const type = std::is_same_v<T, unsigned int> ? "unsigned int" : "float3";
        Object const* const property = Internal::objectIn(object, required.name);
        if (!property || !Object::isA(*property, Internal::dataPrototype()))
            return failure("the data property " + std::string(required.name) + " is missing");
        auto const* const data = Internal::valueOf<Orvan::Ptr<Orvan::Array<T>>>(*property, sData);
        if (!data || !*data)
            return failure(required.name + (" does not hold an array of " + type));
        if (!Internal::valueOf<T>(*property, sDefault))
            return failure(required.name + (" has no sDefault of type " + type));
        auto const* const target = Internal::valueOf<Orvan::String>(*property, sTarget);
        if (!target || *target != required.component.name)
            return failure(required.name + (" targets " + Internal::quoted(target ? *target : "")) + " instead of "
                + required.component.name);
        if ((*data)->size != required.length)
            return failure(required.name + (" has " + to_string((*data)->size)) + " entries instead of "
                + to_string(required.length) + " for " + to_string(required.component.count) + " elements of "
                + required.component.name);
        if (values)
            *values = data->get();
        return {};
    }

    /// Whether any of `count` entries is wrong. Checks whole blocks without branching, so that the loop is vectorized.
    template <class IsWrong> bool anyWrong(std::uint64_t count, IsWrong const& isWrong)
    {
        constexpr std::uint64_t kBlock = 4096;
        for (std::uint64_t begin = 0; begin < count; begin += kBlock) {
            std::uint64_t const end = std::min(begin + kBlock, count);
            unsigned int wrong = 0;
            for (std::uint64_t i = begin; i != end; ++i)
                wrong |= isWrong(i) ? ~0u : 0u;
            if (wrong != 0)
                return true;
        }
        return false;
    }

    Status checkFirstOffset(char const* name, Orvan::Array<unsigned int> const& offsets)
    {
        return offsets[0] == 0 ? Status()
                               : failure(std::string(name) + "[0] is " + to_string(offsets[0]) + " instead of 0");
    }

    /// Checks that offsets are non-decreasing and end at `last`.
    Status checkOffsets(
        char const* name, Orvan::Array<unsigned int> const& offsets, std::uint64_t last, Wording const& words)
    {
        if (anyWrong(offsets.size - 1, [o = offsets.data](std::uint64_t i) { return o[i] > o[i + 1]; })) {
            unsigned int const* const decrease = std::adjacent_find(offsets.begin(), offsets.end(), std::greater<>());
            auto const entry = static_cast<std::uint64_t>(decrease - offsets.begin()) + 1;
            return failure(std::string(name) + "[" + to_string(entry) + "] is " + to_string(decrease[1])
                + ", less than the " + to_string(decrease[0]) + " before it");
        }
        if (offsets[offsets.size - 1] != last)
            return failure(std::string(name) + "[" + to_string(offsets.size - 1) + "] is "
                + to_string(offsets[offsets.size - 1]) + ", but the " + words.object + " has " + to_string(last) + " "
                + words.indexed);
        return {};
    }

    Status checkPointIndices(Orvan::Array<unsigned int> const& faceVertex, unsigned int pointCount)
    {
        auto const isBeyond = [=](unsigned int point) { return point >= pointCount; };
        auto const isAbove = [last = pointCount - 1, point = faceVertex.data](
                                 std::uint64_t i) { return point[i] > last; };
        if (pointCount != 0 && !anyWrong(faceVertex.size, isAbove))
            return {};
        unsigned int const* const beyond = std::find_if(faceVertex.begin(), faceVertex.end(), isBeyond);
        if (beyond == faceVertex.end())
            return {};
        return failure("sFaceVertex[" + to_string(beyond - faceVertex.begin()) + "] is " + to_string(*beyond)
            + ", but the mesh has " + to_string(pointCount) + " points");
    }

    /// Runs checks in order, up to the first that fails, and returns its failure.
    template <class... Check> Status firstFailure(Check const&... checks)
    {
        Status status;
        static_cast<void>(((status = checks(), static_cast<bool>(status)) && ...));
        return status;
    }

}

Status validateMesh(Object const& mesh)
{
    Component const points(mesh, sPointComp), corners(mesh, sFaceVertexComp), faces(mesh, sFaceComp);
    std::uint64_t const faceCount = faces.count;
    Orvan::Array<unsigned int> const* faceVertex = nullptr;
    Orvan::Array<unsigned int> const* faceOffset = nullptr;
    return firstFailure([&] { return checkComponent(points); }, [&] { return checkComponent(corners); },
        [&] { return checkComponent(faces); },
        [&] {
            return checkStandardData<Math::float3>(mesh, {sPointPosition, points, points.count});
        },
        [&] {
            return checkStandardData<unsigned int>(mesh, {sFaceVertex, corners, corners.count}, &faceVertex);
        },
        [&] {
            return checkStandardData<unsigned int>(mesh, {sFaceOffset, faces, faceCount + 1}, &faceOffset);
        },
        [&] { return checkFirstOffset(sFaceOffset, *faceOffset); },
        [&] {
            return checkOffsets(sFaceOffset, *faceOffset, corners.count, {"mesh", "face corners"});
        },
        [&] { return checkPointIndices(*faceVertex, points.count); });
}

Status PointCloudValidator::validate(Object const& pointCloud)
{
    Component const points(pointCloud, sPointComp);
    return firstFailure([&] { return checkComponent(points); },
        [&] {
            auto const components = getGeoPropNamesByPrototype(pointCloud, Internal::componentPrototype());
            auto const other =
                std::find_if(components.begin(), components.end(), [](auto const& name) { return name != sPointComp; });
            return other == components.end()
                ? Status()
                : failure("a point cloud has one component, but there is also " + Internal::quoted(*other));
        },
        [&] {
            return checkStandardData<Math::float3>(pointCloud, {sPointPosition, points, points.count});
        });
}

Status StrandValidator::validate(Object const& strands)
{
    Component const points(strands, sPointComp), lines(strands, sStrandComp);
    std::uint64_t const strandCount = lines.count;
    Orvan::Array<unsigned int> const* offsets = nullptr;
    return firstFailure([&] { return checkComponent(points); }, [&] { return checkComponent(lines); },
        [&] {
            return checkStandardData<Math::float3>(strands, {sPointPosition, points, points.count});
        },
        [&] {
            return checkStandardData<unsigned int>(strands, {sStrandOffset, lines, strandCount + 1}, &offsets);
        },
        [&] {
            // Points before the first strand belong to none. Without strands these are all points, and the only offset
            // may also be 0.
            if (strandCount == 0 && (*offsets)[0] == 0)
                return Status();
            return checkOffsets(sStrandOffset, *offsets, points.count, {"strand set", "points"});
        });
}

}
