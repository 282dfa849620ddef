#include "PlainMerge.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include <algorithm>
#include <set>
#include <string>
#include <vector>

namespace PlainMerge {

using namespace Tessara::Geometry;
using Orvan::String;
using Tessara::Object;
using Tessara::PropertyValue;
using Offsets = std::vector<unsigned int>;

namespace {

    struct Entry {
        String name;
        Orvan::Ptr<Object> property;
        PropertyValue merged;
    };

    template <class T, class... Others> constexpr bool kIsOneOf = (std::is_same_v<T, Others> || ...);

    std::vector<String> keysOf(Object const& object)
    {
        auto const keys = object.keys();
        return {keys->begin(), keys->end()};
    }

    template <class Rule> void forDefaultType(Entry const& entry, Rule const& rule)
    {
        PropertyValue const value = entry.property->getProperty(sDefault);
        forEachElementTypeName([&]<class T>(ElementType<T>) {
            if (T const* const held = value.get<T>())
                rule(*held);
        });
    }

    void mergeData(Inputs const& inputs, Offsets const& offsets, bool withSlot, Entry& entry)
    {
        forDefaultType(entry, [&]<class T>(T const& fallback) {
            Orvan::Array<T> merged;
            for (std::size_t i = 0; i != inputs.size; ++i) {
                auto const values = dataOf<T>(*inputs[i], entry.name);
                for (std::uint64_t element = 0; element != offsets[i + 1] - offsets[i]; ++element)
                    merged.append(values && element < values->size ? (*values)[element] : fallback);
            }
            constexpr bool kIsGeometry =
                kIsOneOf<T, Common::GeometryType, Common::GeoLocation, Mesh::FaceEdge, Transform::GraphTransforms>;
            if (withSlot && !kIsGeometry)
                merged.append(fallback);
            entry.merged = Orvan::makePtr<Orvan::Array<T>>(std::move(merged));
        });
    }

    void publish(Entry const& entry, Object& target)
    {
        forDefaultType(entry, [&]<class T>(T const& fallback) {
            auto property = makeDataProperty<T>("", nullptr, fallback);
            property->setProperty(sTarget, entry.property->getProperty(sTarget));
            property->setProperty(sData, PropertyValue(entry.merged));
            target.setProperty(entry.name, Orvan::Ptr<Object>(std::move(property)));
        });
    }

    std::vector<Entry> dependentsOf(Object const& input, String const& range)
    {
        std::vector<Entry> dependents;
        for (String const& key : keysOf(input))
            if (getDataGeoProperty(input, key) && getGeoPropTargetName(input, key) == range)
                dependents.push_back({key, getDataGeoProperty(input, key), {}});
        return dependents;
    }

    unsigned int dependentCount(Object const& input, std::vector<Entry> const& dependents)
    {
        std::uint64_t count = kInvalidIndex;
        for (Entry const& dependent : dependents)
            if (auto const property = getDataGeoProperty(input, dependent.name))
                visitArray(property->getProperty(sData),
                    [&](auto const& values, auto) { count = std::min(count, values.size); });
        return count == kInvalidIndex ? 0 : static_cast<unsigned int>(count);
    }

    void mergeRange(
        Inputs const& inputs, String const& component, Offsets const& offsets, Entry const& range, Object& target)
    {
        std::vector<Entry> dependents;
        for (std::size_t i = 0; dependents.empty(); ++i)
            if (getTargetComponent(*inputs[i], range.name) == component && getRangeGeoProperty(*inputs[i], range.name))
                dependents = dependentsOf(*inputs[i], range.name);
        Offsets bases{0};
        for (auto const& input : inputs)
            bases.push_back(bases.back() + dependentCount(*input, dependents));
        Orvan::Array<unsigned int> merged(offsets.back());
        bool needsSlot = false;
        for (bool const isOwnPart : {false, true}) { // what runs over the own elements is written first
            for (std::size_t i = 0; i != inputs.size; ++i) {
                auto const source = getRangeGeoPropIndices(*inputs[i], range.name);
                unsigned int const count = offsets[i + 1] - offsets[i];
                bool const isThere = source && !dependentsOf(*inputs[i], range.name).empty();
                needsSlot = needsSlot || !isThere;
                for (std::uint64_t j = 0; j != (isThere ? source->size : count); ++j)
                    if ((j < count) == isOwnPart && offsets[i] + j < merged.size)
                        merged[offsets[i] + j] = isThere ? (*source)[j] + bases[i] : bases.back();
            }
        }
        addRangeProperty(range.name, component, std::move(merged), target);
        for (Entry& dependent : dependents) {
            mergeData(inputs, bases, needsSlot, dependent);
            publish(dependent, target);
        }
    }

    Offsets offsetsOf(Inputs const& inputs, String const& component)
    {
        Offsets offsets{0};
        for (auto const& input : inputs)
            offsets.push_back(offsets.back() + getElementCount(*input, component));
        return offsets;
    }

    Offsets mergeComponent(Inputs const& inputs, String const& component, Object& target)
    {
        Offsets offsets = offsetsOf(inputs, component);
        setElementCount(component, offsets.back(), target);
        std::set<String> dataNames, rangeNames;
        for (auto const& input : inputs)
            for (String const& key : keysOf(*input)) {
                auto const property = getDataGeoProperty(*input, key);
                if (!property || getGeoPropTargetName(*input, key) != component || !dataNames.insert(key).second)
                    continue;
                Entry entry{key, property, {}};
                mergeData(inputs, offsets, false, entry);
                publish(entry, target);
            }
        for (auto const& input : inputs)
            for (String const& key : keysOf(*input))
                if (getRangeGeoProperty(*input, key) && getTargetComponent(*input, key) == component
                    && !dependentsOf(*input, key).empty() && rangeNames.insert(key).second)
                    mergeRange(inputs, component, offsets, {key, nullptr, {}}, target);
        return offsets;
    }

    void transfer(String const& component, Object const& source, Object& output)
    {
        for (String const& key : keysOf(source))
            if (key == component || getTargetComponent(source, key) == component)
                output.setProperty(key, source.getProperty(key));
    }

    /// Raises the elements of each input by its base, and appends the closing entry.
    void raise(char const* name, Offsets const& offsets, Offsets const& bases, bool isOffsets, Object& output)
    {
        auto values = *dataOf<unsigned int>(output, name);
        for (std::size_t i = 0; i + 1 < offsets.size(); ++i)
            for (unsigned int element = offsets[i]; element != offsets[i + 1]; ++element)
                values[element] += bases[i];
        if (isOffsets)
            values.append(bases.back());
        auto property = makeMutable(Orvan::Ptr<Object>(*output.getProperty(name).get<Orvan::Ptr<Object>>()));
        property->setProperty(sData, Orvan::makePtr<Orvan::Array<unsigned int>>(std::move(values)));
        output.setProperty(name, Orvan::Ptr<Object>(std::move(property)));
    }

    void copyTheRest(Inputs const& inputs, Object& output)
    {
        for (auto const& input : inputs)
            for (String const& key : keysOf(*input)) {
                PropertyValue const value = input->getProperty(key);
                auto const* const object = value.get<Orvan::Ptr<Object>>();
                bool const isGeometry = object && *object
                    && (getDataGeoProperty(*input, key) || getRangeGeoProperty(*input, key)
                        || Object::isA(**object, *getComponentGeoPropPrototype()));
                if (!output.hasProperty(key) && !isGeometry)
                    output.setProperty(key, PropertyValue(value));
            }
    }

    template <class Validate> Inputs validOnes(Inputs const& inputs, Validate const& validate)
    {
        Inputs valid;
        for (auto const& input : inputs)
            if (validate(*input))
                valid.append(input);
        return valid;
    }

}

bool mergeMeshes(Inputs const& inputs, Object& output)
{
    Inputs const valid = validOnes(inputs, validateMesh);
    if (valid.empty())
        return false;
    populateMesh(output);
    std::vector<Offsets> offsets;
    for (char const* const component : {sPointComp, sFaceVertexComp, sFaceComp}) {
        Object merged;
        populateMesh(merged);
        offsets.push_back(mergeComponent(valid, component, merged));
        transfer(component, merged, output);
    }
    raise(sFaceVertex, offsets[1], offsets[0], false, output);
    raise(sFaceOffset, offsets[2], offsets[1], true, output);
    copyTheRest(valid, output);
    return true;
}

bool mergePointClouds(Inputs const& inputs, Object& output)
{
    Inputs const valid =
        validOnes(inputs, [](Object const& input) { return bool(PointCloudValidator().validate(input)); });
    if (valid.empty())
        return false;
    populatePointCloud(output);
    mergeComponent(valid, sPointComp, output);
    copyTheRest(valid, output);
    return true;
}

bool mergeStrands(Inputs const& inputs, Object& output)
{
    Inputs const valid = validOnes(inputs, [](Object const& input) { return bool(StrandValidator().validate(input)); });
    if (valid.empty())
        return false;
    populateStrand(output);
    std::vector<Offsets> offsets;
    for (char const* const component : {sPointComp, sStrandComp}) {
        Object merged;
        populateStrand(merged);
        offsets.push_back(mergeComponent(valid, component, merged));
        transfer(component, merged, output);
    }
    raise(sStrandOffset, offsets[1], offsets[0], true, output);
    copyTheRest(valid, output);
    return true;
}

}
