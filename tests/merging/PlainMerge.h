#pragma once

#include "support/Testing.h"

#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include <set>

/// A plain reference for merging: one step after the other, with every look-up where its result is needed.
namespace PlainMerge {

using namespace TestSupport;
using Orvan::String;
using Inputs = Orvan::Array<Orvan::Ptr<Object>>;
using Offsets = std::vector<unsigned int>;
using Indices = Orvan::Array<unsigned int>;

enum class Kind { Meshes, PointClouds, Strands };

inline std::vector<char const*> componentsOf(Kind kind)
{
    if (kind == Kind::Meshes)
        return {sPointComp, sFaceVertexComp, sFaceComp};
    return kind == Kind::Strands ? std::vector<char const*>{sPointComp, sStrandComp}
                                 : std::vector<char const*>{sPointComp};
}

inline std::vector<String> keysOf(Object const& object)
{
    auto const keys = object.keys();
    return {keys->begin(), keys->end()};
}

/// \param withDefault  Whether the default follows the values; never for the host's record types.
inline void mergeData(Inputs const& inputs, Offsets const& offsets, bool withDefault, String const& name,
    Object const& source, Object& target)
{
    auto const property = getDataGeoProperty(source, name);
    auto const held = property->getProperty(sDefault);
    forEachElementTypeName([&]<class T>(ElementType<T> type) {
        T const* const fallback = held.get<T>();
        if (!fallback)
            return;
        Orvan::Array<T> merged;
        for (std::size_t i = 0; i != inputs.size; ++i) {
            auto const values = dataOf<T>(*inputs[i], name);
            for (std::uint64_t element = 0; element != offsets[i + 1] - offsets[i]; ++element)
                merged.append(values && element < values->size ? (*values)[element] : *fallback);
        }
        if (withDefault && !(type.name[0] >= 'A' && type.name[0] <= 'Z'))
            merged.append(*fallback);
        auto result = makeDataProperty<T>("", Orvan::makePtr<Orvan::Array<T>>(std::move(merged)), *fallback);
        result->setProperty(sTarget, property->getProperty(sTarget));
        target.setProperty(name, Orvan::Ptr<Object>(std::move(result)));
    });
}

inline std::vector<String> dependentsOf(Object const& input, String const& range)
{
    std::vector<String> dependents;
    for (String const& key : keysOf(input))
        if (getDataGeoProperty(input, key) && getGeoPropTargetName(input, key) == range)
            dependents.push_back(key);
    return dependents;
}

/// The length of the shortest dependent.
inline unsigned int valueCountOf(Object const& input, std::vector<String> const& dependents)
{
    std::uint64_t count = kInvalidIndex;
    for (String const& dependent : dependents)
        if (auto const property = getDataGeoProperty(input, dependent))
            visitArray(
                property->getProperty(sData), [&](auto const& values, auto) { count = std::min(count, values.size); });
    return count == kInvalidIndex ? 0 : static_cast<unsigned int>(count);
}

/// \param first  The first input that has the range on this component and data that targets it.
inline void mergeRange(Inputs const& inputs, String const& component, Offsets const& offsets, String const& range,
    Object const& first, Object& target)
{
    std::vector<String> const dependents = dependentsOf(first, range);
    Offsets bases{0};
    for (auto const& input : inputs)
        bases.push_back(bases.back() + valueCountOf(*input, dependents));
    Indices merged(offsets.back());
    bool needsDefault = false;
    for (bool const isOwnPart : {false, true}) // surplus indices are written first
        for (std::size_t i = 0; i != inputs.size; ++i) {
            auto const source = getRangeGeoPropIndices(*inputs[i], range);
            unsigned int const count = offsets[i + 1] - offsets[i];
            bool const isThere = source && !dependentsOf(*inputs[i], range).empty();
            needsDefault = needsDefault || !isThere;
            for (std::uint64_t j = 0; j != (isThere ? source->size : count); ++j)
                if ((j < count) == isOwnPart && offsets[i] + j < merged.size)
                    merged[offsets[i] + j] = isThere ? (*source)[j] + bases[i] : bases.back();
        }
    addRangeProperty(range, component, std::move(merged), target);
    for (String const& dependent : dependents)
        mergeData(inputs, bases, needsDefault, dependent, first, target);
}

/// The component in an object of its own. \return where the elements of each input begin, and the total
inline Offsets mergeComponent(Inputs const& inputs, String const& component, Object& target)
{
    Offsets offsets{0};
    for (auto const& input : inputs)
        offsets.push_back(offsets.back() + getElementCount(*input, component));
    setElementCount(component, offsets.back(), target);
    std::set<String> names;
    for (bool const isRange : {false, true}) {
        names.clear();
        for (auto const& input : inputs)
            for (String const& key : keysOf(*input)) {
                if (isRange && getRangeGeoProperty(*input, key) && getTargetComponent(*input, key) == component
                    && !dependentsOf(*input, key).empty() && names.insert(key).second)
                    mergeRange(inputs, component, offsets, key, *input, target);
                if (!isRange && getDataGeoProperty(*input, key) && getGeoPropTargetName(*input, key) == component
                    && names.insert(key).second)
                    mergeData(inputs, offsets, false, key, *input, target);
            }
    }
    return offsets;
}

/// Adds the base of each input to its elements, and appends the closing entry if these are offsets.
inline void rebase(char const* name, Offsets const& offsets, Offsets const& bases, bool areOffsets, Object& output)
{
    Indices values = *dataOf<unsigned int>(output, name);
    for (std::size_t i = 0; i + 1 < offsets.size(); ++i)
        for (unsigned int element = offsets[i]; element != offsets[i + 1]; ++element)
            values[element] += bases[i];
    if (areOffsets)
        values.append(bases.back());
    replaceIn(name, sData, Orvan::makePtr<Indices>(std::move(values)), output);
}

inline bool mergePlainly(Kind kind, Inputs const& inputs, Object& output)
{
    auto* const populate = kind == Kind::Meshes ? populateMesh
        : kind == Kind::Strands                 ? populateStrand
                                                : populatePointCloud;
    Inputs valid;
    for (auto const& input : inputs)
        if (kind == Kind::Meshes        ? validateMesh(*input)
                : kind == Kind::Strands ? StrandValidator().validate(*input)
                                        : PointCloudValidator().validate(*input))
            valid.append(input);
    if (valid.empty())
        return false;
    populate(output);
    std::vector<Offsets> offsets;
    for (char const* const component : componentsOf(kind)) {
        Object merged;
        populate(merged);
        offsets.push_back(mergeComponent(valid, component, merged));
        for (String const& key : keysOf(merged))
            if (key == component || getTargetComponent(merged, key) == component)
                output.setProperty(key, merged.getProperty(key));
    }
    if (kind == Kind::Meshes) {
        rebase(sFaceVertex, offsets[1], offsets[0], false, output);
        rebase(sFaceOffset, offsets[2], offsets[1], true, output);
    } else if (kind == Kind::Strands) {
        rebase(sStrandOffset, offsets[1], offsets[0], true, output);
    }
    for (auto const& input : valid)
        for (String const& key : keysOf(*input)) {
            auto value = input->getProperty(key);
            auto const* const object = value.get<Orvan::Ptr<Object>>();
            bool const isGeometry = object && *object
                && (getDataGeoProperty(*input, key) || getRangeGeoProperty(*input, key)
                    || Object::isA(**object, *getComponentGeoPropPrototype()));
            if (!key.empty() && !output.hasProperty(key) && !isGeometry)
                output.setProperty(key, std::move(value));
        }
    return true;
}

}
