#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Populate.h>

#include <stdexcept>

namespace Tessara::Geometry {

namespace {

    unsigned int countOf(std::uint64_t elements)
    {
        if (elements >= kDeletedElement) // this one and the next are sentinels
            throw std::length_error("a component holds fewer than 4,294,967,294 elements");
        return static_cast<unsigned int>(elements);
    }

    Orvan::Array<unsigned int> withClosingEntry(Orvan::Array<unsigned int> offsets)
    {
        if (offsets.empty())
            offsets.append(0);
        return offsets;
    }

    template <class T> void addElements(
        char const* component, std::uint64_t count, char const* name, Orvan::Array<T> values, Object& object)
    {
        addComponent(component, countOf(count), object);
        addDataProperty<T>(name, component, std::move(values), object);
    }

}

Orvan::MutablePtr<Object> makeMesh(
    Orvan::Array<Math::float3> positions, Orvan::Array<unsigned int> faceVertex, Orvan::Array<unsigned int> faceOffset)
{
    Orvan::MutablePtr<Object> mesh = createObject();
    Orvan::Array<unsigned int> offsets = withClosingEntry(std::move(faceOffset));
    std::uint64_t const faceCount = offsets.size - 1;
    std::uint64_t const cornerCount = faceVertex.size;
    std::uint64_t const pointCount = positions.size;
    addElements(sPointComp, pointCount, sPointPosition, std::move(positions), *mesh);
    addElements(sFaceVertexComp, cornerCount, sFaceVertex, std::move(faceVertex), *mesh);
    addElements(sFaceComp, faceCount, sFaceOffset, std::move(offsets), *mesh);
    return mesh;
}

Orvan::MutablePtr<Object> makePointCloud(Orvan::Array<Math::float3> positions)
{
    Orvan::MutablePtr<Object> pointCloud = createObject();
    std::uint64_t const pointCount = positions.size;
    addElements(sPointComp, pointCount, sPointPosition, std::move(positions), *pointCloud);
    return pointCloud;
}

Orvan::MutablePtr<Object> makeStrands(Orvan::Array<Math::float3> positions, Orvan::Array<unsigned int> strandOffset)
{
    Orvan::MutablePtr<Object> strands = createObject();
    Orvan::Array<unsigned int> offsets = withClosingEntry(std::move(strandOffset));
    std::uint64_t const strandCount = offsets.size - 1;
    std::uint64_t const pointCount = positions.size;
    addElements(sPointComp, pointCount, sPointPosition, std::move(positions), *strands);
    addElements(sStrandComp, strandCount, sStrandOffset, std::move(offsets), *strands);
    return strands;
}

void addComponent(Orvan::String const& name, unsigned int count, Object& object)
{
    Orvan::MutablePtr<Object> component = createObject();
    populateComponentGeoProperty(count, *component);
    object.setProperty(name, Orvan::Ptr<Object>(std::move(component)));
}

void addRangeProperty(
    Orvan::String const& name, Orvan::String const& target, Orvan::Array<unsigned int> indices, Object& object)
{
    Orvan::MutablePtr<Object> range = createObject();
    populateRangeGeoProperty(Orvan::makePtr<Orvan::Array<unsigned int>>(std::move(indices)), target, *range);
    object.setProperty(name, Orvan::Ptr<Object>(std::move(range)));
}

}
