#pragma once

#include "support/Testing.h"

#include <algorithm>

// A plain reference for any property bag: one property after the other, each array copied and then edited element by
// element.

namespace PlainEditing {

using Flags = Orvan::Array<bool>;
using Indices = Orvan::Array<unsigned int>;
using Tessara::PropertyValue;
using namespace TestSupport;

inline Indices mapping(Flags const& deleted)
{
    Indices remap;
    unsigned int next = 0;
    for (bool const isDeleted : deleted)
        remap.append(isDeleted ? kDeletedElement : next++);
    return remap;
}

template <class T> Orvan::Array<T> compacted(Orvan::Array<T> array, Indices const& remap)
{
    std::uint64_t newSize = remap.size;
    for (unsigned int i = 0; i != remap.size; ++i) {
        if (remap[i] == i)
            continue;
        if (remap[i] == kDeletedElement)
            --newSize;
        else
            array[remap[i]] = array[i];
    }
    array.resize(newSize);
    return array;
}

/// Returns false if the array is missing or too short.
inline bool compactData(Orvan::String const& name, Indices const& remap, Object& object)
{
    bool isDone = false;
    visitArray(getDataGeoProperty(object, name)->getProperty(sData), [&]<class T>(Orvan::Array<T> const& array, auto) {
        isDone = array.size >= remap.size;
        if (isDone)
            replaceIn(name, sData, Orvan::makePtr<Orvan::Array<T>>(compacted(array, remap)), object);
    });
    return isDone;
}

inline bool deleteRange(Orvan::String const& name, Indices const& remap, Object& object)
{
    auto const held = getRangeGeoPropIndices(object, name);
    bool const hasIndices = held && !held->empty();
    if (hasIndices && held->size < remap.size)
        return true;
    Indices indices = hasIndices ? compacted(*held, remap) : Indices();
    Indices dataRemap;
    for (Orvan::String const& data : getGeoPropNamesByTarget(object, name)) {
        if (!getDataGeoProperty(object, data))
            continue;
        if (!hasIndices || !dataRemap.empty())
            return false;
        Flags dropped;
        visitArray(getDataGeoProperty(object, data)->getProperty(sData),
            [&](auto const& array, auto) { dropped = Flags(array.size, true); });
        for (unsigned int const entry : indices)
            if (entry < dropped.size)
                dropped[entry] = false;
        dataRemap = mapping(dropped);
        if (!compactData(data, dataRemap, object))
            return false;
    }
    if (hasIndices) {
        for (unsigned int& entry : indices)
            if (!dataRemap.empty() && entry != kInvalidIndex)
                entry = dataRemap[entry];
        replaceIn(name, sIndices, Orvan::makePtr<Indices>(indices), object);
    }
    return true;
}

template <class T> Orvan::Ptr<Orvan::Array<T>> extended(Orvan::Array<T> array, std::uint64_t newCount, T const& value)
{
    array.reserve(newCount);
    while (array.size < newCount)
        array.append(value);
    array.resize(newCount);
    return Orvan::makePtr<Orvan::Array<T>>(std::move(array));
}

inline void extendData(Orvan::String const& name, std::uint64_t newCount, Object& object)
{
    PropertyValue result;
    auto const property = getDataGeoProperty(object, name);
    visitArray(property->getProperty(sData), [&]<class T>(Orvan::Array<T> const& array, auto type) {
        char const first = type.name[0];
        if (first >= 'A' && first <= 'Z')
            return; // the host's record types
        PropertyValue const fallback = property->getProperty(sDefault);
        result = extended(array, newCount, fallback.get<T>() ? *fallback.get<T>() : T{});
    });
    replaceIn(name, sData, std::move(result), object);
}

inline bool addPoints(Orvan::Array<float3> const& positions, Orvan::String const& tag, Object& object)
{
    std::uint64_t const oldCount = getElementCount(object, sPointComp), newCount = oldCount + positions.size;
    setElementCount(sPointComp, static_cast<unsigned int>(newCount), object);
    for (Orvan::String const& name : getGeoPropNamesByTarget(object, sPointComp))
        if (getDataGeoProperty(object, name))
            extendData(name, newCount, object);
        else if (auto const indices = getRangeGeoPropIndices(object, name))
            replaceIn(name, sIndices, extended(*indices, newCount, kInvalidIndex), object);
    if (!tag.empty()) {
        Flags isNew(newCount);
        std::fill(isNew.data + oldCount, isNew.data + newCount, true);
        addDataProperty(tag, sPointComp, isNew, object);
    }
    auto const current = dataOf<float3>(object, sPointPosition);
    if (!current)
        return false;
    Orvan::Array<float3> all = *current;
    std::copy(positions.begin(), positions.end(), all.data + oldCount);
    replaceIn(sPointPosition, sData, Orvan::makePtr<Orvan::Array<float3>>(all), object);
    return true;
}

inline bool deleteComponents(Indices const& remap, Orvan::String const& component, Object& object)
{
    unsigned int const count = getElementCount(object, component);
    if (count != remap.size || count == 0)
        return false;
    auto const deletedCount = std::count(remap.begin(), remap.end(), kDeletedElement);
    setElementCount(component, count - static_cast<unsigned int>(deletedCount), object);
    for (Orvan::String const& name : getGeoPropNamesByTarget(object, component))
        if (getDataGeoProperty(object, name))
            compactData(name, remap, object);
        else if (!deleteRange(name, remap, object))
            return false;
    return true;
}

inline bool deleteFaces(Flags const& deleted, Object& mesh)
{
    Indices const offsets = *dataOf<unsigned int>(mesh, sFaceOffset),
                  corners = *dataOf<unsigned int>(mesh, sFaceVertex);
    Flags pointDeleted(getElementCount(mesh, sPointComp), true),
        cornerDeleted(getElementCount(mesh, sFaceVertexComp), true);
    for (unsigned int face = 0; face != deleted.size; ++face)
        for (unsigned int corner = offsets[face]; !deleted[face] && corner < offsets[face + 1]; ++corner)
            cornerDeleted[corner] = pointDeleted[corners[corner]] = false;
    Indices const pointRemap = mapping(pointDeleted);
    Indices cornerRemap = mapping(cornerDeleted);
    if (!deleteComponents(pointRemap, sPointComp, mesh) || !deleteComponents(cornerRemap, sFaceVertexComp, mesh))
        return false;
    Indices faceVertex = *dataOf<unsigned int>(mesh, sFaceVertex);
    for (unsigned int& entry : faceVertex)
        entry = pointRemap[entry];
    replaceIn(sFaceVertex, sData, Orvan::makePtr<Indices>(faceVertex), mesh);
    if (!deleteComponents(mapping(deleted), sFaceComp, mesh))
        return false;
    Indices faceOffset = *dataOf<unsigned int>(mesh, sFaceOffset);
    cornerRemap.append(getElementCount(mesh, sFaceVertexComp)); // for a face without corners at the end
    for (unsigned int& entry : faceOffset)
        entry = cornerRemap[entry];
    faceOffset.append(getElementCount(mesh, sFaceVertexComp));
    replaceIn(sFaceOffset, sData, Orvan::makePtr<Indices>(faceOffset), mesh);
    return true;
}

}
