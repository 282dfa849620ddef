#include "MeshWithSources.h"

#include "frame/ParallelFor.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <cstring>
#include <numeric>
#include <type_traits>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Object;

namespace {

    using Indices = Orvan::Array<unsigned int>;

    Indices countingUp(unsigned int count)
    {
        Indices indices(count, Orvan::kUninitialized);
        std::iota(indices.begin(), indices.end(), 0u);
        return indices;
    }

    bool countsUp(Indices const& indices, unsigned int count)
    {
        if (indices.size != count)
            return false;
        unsigned int index = 0;
        while (index != count && indices[index] == index)
            ++index;
        return index == count;
    }

    template <class T> Orvan::Ptr<Orvan::Array<T>> gathered(Orvan::Array<T> const& values, Indices const& sources)
    {
        auto result = Orvan::makePtr<Orvan::Array<T>>(Orvan::Array<T>(sources.size, Orvan::kUninitialized));
        auto own = makeMutable(std::move(result));
        // Each element writes its own value.
        Modeling::parallelFor(
            tbb::blocked_range<std::size_t>(0, sources.size, Modeling::kElementGrain), [&](auto const& elements) {
                for (std::size_t element = elements.begin(); element != elements.end(); ++element)
                    own->data[element] = values[sources[element]];
            });
        return own;
    }

    void setData(Orvan::String const& name, Tessara::PropertyValue&& data, Object& object)
    {
        Orvan::MutablePtr<Object> property = makeMutable(getDataGeoProperty(object, name));
        property->setProperty(sData, std::move(data));
        object.setProperty(name, Orvan::Ptr<Object>(std::move(property)));
    }

    /// The elements of one component before and after.
    struct Component {
        char const* name;
        Indices const& sources;
        unsigned int oldCount;
    };

    void gatherProperty(Orvan::String const& name, Component const& component, Object& object)
    {
        if (auto const indices = getRangeGeoPropIndices(object, name)) {
            if (indices->size >= component.oldCount)
                setRangeGeoPropIndices(name, gathered(*indices, component.sources), object);
            return;
        }
        auto const property = getDataGeoProperty(object, name);
        if (!property)
            return;
        Tessara::PropertyValue changed;
        visitArray(property->getProperty(sData), [&](auto const& values, auto) {
            if (values.size >= component.oldCount)
                changed = gathered(values, component.sources);
        });
        if (!changed.empty())
            setData(name, std::move(changed), object);
    }

    void gatherProperties(Component const& component, Object& object)
    {
        if (!countsUp(component.sources, component.oldCount))
            for (Orvan::String const& name : getGeoPropNamesByTarget(object, component.name))
                gatherProperty(name, component, object);
        setElementCount(component.name, static_cast<unsigned int>(component.sources.size), object);
    }

    /// Drops points and returns how many of them no face used.
    unsigned int dropPoints(bool dropsUnused, MeshWithSources& mesh)
    {
        unsigned int const count = mesh.arrays.pointCount();
        Orvan::Array<bool> isKept(count, !dropsUnused);
        for (unsigned int const point : *mesh.arrays.faceVertex)
            isKept[point] = true;
        unsigned int unusedCount = 0;
        Indices remap(count, Orvan::kUninitialized);
        Indices kept;
        for (unsigned int point = 0; point != count; ++point) {
            bool const isWelded = point < mesh.keptPoint.size && mesh.keptPoint[point] != point;
            if (!isKept[point] && !isWelded)
                ++unusedCount;
            remap[point] = static_cast<unsigned int>(kept.size);
            if (isKept[point] && !isWelded)
                kept.append(point);
        }
        if (kept.size == count)
            return 0;
        mesh.arrays.positions = gathered(*mesh.arrays.positions, kept);
        mesh.pointSource = std::move(*makeMutable(gathered(mesh.pointSource, kept)));
        editArray(mesh.arrays.faceVertex, [&](Indices& points) {
            for (unsigned int& point : points)
                point = remap[point];
        });
        return unusedCount;
    }

}

std::vector<std::string> propertiesWithLosses(Indices const& keptPoint, Object const& original)
{
    std::vector<std::string> names;
    auto const addIfDifferent = [&](Orvan::String const& name, auto const& values) {
        using Element = std::remove_cvref_t<decltype(values[0])>;
        for (std::size_t point = 0; point < std::min(keptPoint.size, values.size); ++point) {
            Element const &value = values[point], &kept = values[keptPoint[point]];
            bool isEqual = false;
            if constexpr (std::is_trivially_copyable_v<Element>)
                isEqual = std::memcmp(&value, &kept, sizeof(Element)) == 0; // NaN equals itself
            else
                isEqual = value == kept;
            if (!isEqual) {
                names.emplace_back(name.view());
                return;
            }
        }
    };
    for (Orvan::String const& name : getGeoPropNamesByTarget(original, sPointComp)) {
        if (name == sPointPosition)
            continue;
        if (auto const indices = getRangeGeoPropIndices(original, name))
            addIfDifferent(name, *indices);
        else if (auto const property = getDataGeoProperty(original, name))
            visitArray(property->getProperty(sData), [&](auto const& values, auto) { addIfDifferent(name, values); });
    }
    return names;
}

MeshWithSources::MeshWithSources(Object const& mesh)
    : arrays(arraysOf(mesh))
    , pointSource(countingUp(arrays.pointCount()))
    , cornerSource(countingUp(arrays.cornerCount()))
    , faceSource(countingUp(arrays.faceCount()))
    , isFlipped(arrays.faceCount(), false)
{
}

void MeshWithSources::dropFaces(Orvan::Array<bool> const& isDropped)
{
    Indices points, offsets, corners, faces;
    Orvan::Array<bool> flips;
    offsets.reserve(arrays.faceCount() + 1);
    for (unsigned int face = 0; face != arrays.faceCount(); ++face) {
        if (isDropped[face])
            continue;
        offsets.append(static_cast<unsigned int>(points.size));
        for (unsigned int corner = (*arrays.faceOffset)[face]; corner != (*arrays.faceOffset)[face + 1]; ++corner) {
            points.append((*arrays.faceVertex)[corner]);
            corners.append(cornerSource[corner]);
        }
        faces.append(faceSource[face]);
        flips.append(isFlipped[face]);
    }
    offsets.append(static_cast<unsigned int>(points.size));
    arrays.faceVertex = Orvan::makePtr<Indices>(std::move(points));
    arrays.faceOffset = Orvan::makePtr<Indices>(std::move(offsets));
    cornerSource = std::move(corners);
    faceSource = std::move(faces);
    isFlipped = std::move(flips);
}

unsigned int applyRepair(MeshWithSources mesh, bool dropsUnused, Object& object)
{
    MeshArrays const old = arraysOf(object);
    unsigned int const unusedCount = dropPoints(dropsUnused, mesh);
    gatherProperties({sPointComp, mesh.pointSource, old.pointCount()}, object);
    gatherProperties({sFaceVertexComp, mesh.cornerSource, old.cornerCount()}, object);
    gatherProperties({sFaceComp, mesh.faceSource, old.faceCount()}, object);
    setData(sPointPosition, std::move(mesh.arrays.positions), object);
    setData(sFaceVertex, std::move(mesh.arrays.faceVertex), object);
    setData(sFaceOffset, std::move(mesh.arrays.faceOffset), object);
    return unusedCount;
}

}
