#include "PlainMerge.h"

#include "support/PropertyBag.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include <algorithm>
#include <set>

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
    };

    template <class T, class... Others> constexpr bool kIsOneOf = (std::is_same_v<T, Others> || ...);

    std::vector<String> keysOf(Object const& object)
    {
        auto const keys = object.keys();
        return {keys->begin(), keys->end()};
    }

    void mergeData(Inputs const& inputs, Offsets const& offsets, bool withSlot, Entry const& entry, Object& target)
    {
        PropertyValue const held = entry.property->getProperty(sDefault);
        forEachElementTypeName([&]<class T>(ElementType<T>) {
            T const* const fallback = held.get<T>();
            if (!fallback)
                return;
            Orvan::Array<T> merged;
            for (std::size_t i = 0; i != inputs.size; ++i) {
                auto const values = dataOf<T>(*inputs[i], entry.name);
                for (std::uint64_t element = 0; element != offsets[i + 1] - offsets[i]; ++element)
                    merged.append(values && element < values->size ? (*values)[element] : *fallback);
            }
            constexpr bool kIsGeometry =
                kIsOneOf<T, Common::GeometryType, Common::GeoLocation, Mesh::FaceEdge, Transform::GraphTransforms>;
            if (withSlot && !kIsGeometry)
                merged.append(*fallback);
            auto property = makeDataProperty<T>("", Orvan::makePtr<Orvan::Array<T>>(std::move(merged)), *fallback);
            property->setProperty(sTarget, entry.property->getProperty(sTarget));
            target.setProperty(entry.name, Orvan::Ptr<Object>(std::move(property)));
        });
    }

    std::vector<Entry> dependentsOf(Object const& input, String const& range)
    {
        std::vector<Entry> dependents;
        for (String const& key : keysOf(input))
            if (getDataGeoProperty(input, key) && getGeoPropTargetName(input, key) == range)
                dependents.push_back({key, getDataGeoProperty(input, key)});
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
        Inputs const& inputs, String const& component, Offsets const& offsets, String const& range, Object& target)
    {
        std::vector<Entry> dependents;
        for (std::size_t i = 0; dependents.empty(); ++i)
            if (getTargetComponent(*inputs[i], range) == component && getRangeGeoProperty(*inputs[i], range))
                dependents = dependentsOf(*inputs[i], range);
        Offsets bases{0};
        for (auto const& input : inputs)
            bases.push_back(bases.back() + dependentCount(*input, dependents));
        Orvan::Array<unsigned int> merged(offsets.back());
        bool needsSlot = false;
        for (bool const isOwnPart : {false, true}) { // surplus indices are written first
            for (std::size_t i = 0; i != inputs.size; ++i) {
                auto const source = getRangeGeoPropIndices(*inputs[i], range);
                unsigned int const count = offsets[i + 1] - offsets[i];
                bool const isThere = source && !dependentsOf(*inputs[i], range).empty();
                needsSlot = needsSlot || !isThere;
                for (std::uint64_t j = 0; j != (isThere ? source->size : count); ++j)
                    if ((j < count) == isOwnPart && offsets[i] + j < merged.size)
                        merged[offsets[i] + j] = isThere ? (*source)[j] + bases[i] : bases.back();
            }
        }
        addRangeProperty(range, component, std::move(merged), target);
        for (Entry const& dependent : dependents)
            mergeData(inputs, bases, needsSlot, dependent, target);
    }

    Offsets mergeComponent(Inputs const& inputs, String const& component, Object& target)
    {
        Offsets offsets{0};
        for (auto const& input : inputs)
            offsets.push_back(offsets.back() + getElementCount(*input, component));
        setElementCount(component, offsets.back(), target);
        std::set<String> dataNames, rangeNames;
        for (auto const& input : inputs)
            for (String const& key : keysOf(*input)) {
                auto const property = getDataGeoProperty(*input, key);
                if (property && getGeoPropTargetName(*input, key) == component && dataNames.insert(key).second)
                    mergeData(inputs, offsets, false, {key, property}, target);
            }
        for (auto const& input : inputs)
            for (String const& key : keysOf(*input))
                if (getRangeGeoProperty(*input, key) && getTargetComponent(*input, key) == component
                    && !dependentsOf(*input, key).empty() && rangeNames.insert(key).second)
                    mergeRange(inputs, component, offsets, key, target);
        return offsets;
    }

    void transfer(String const& component, Object const& source, Object& output)
    {
        for (String const& key : keysOf(source))
            if (key == component || getTargetComponent(source, key) == component)
                output.setProperty(key, source.getProperty(key));
    }

    /// Adds the base of each input to its elements, and appends the closing entry.
    void rebase(char const* name, Offsets const& offsets, Offsets const& bases, bool isOffsets, Object& output)
    {
        auto values = *dataOf<unsigned int>(output, name);
        for (std::size_t i = 0; i + 1 < offsets.size(); ++i)
            for (unsigned int element = offsets[i]; element != offsets[i + 1]; ++element)
                values[element] += bases[i];
        if (isOffsets)
            values.append(bases.back());
        TestSupport::replaceIn(name, sData, Orvan::makePtr<Orvan::Array<unsigned int>>(std::move(values)), output);
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
                if (!key.empty() && !output.hasProperty(key) && !isGeometry)
                    output.setProperty(key, PropertyValue(value));
            }
    }

    bool isAccepted(Kind kind, Object const& input)
    {
        return bool(kind == Kind::Meshes ? validateMesh(input)
                : kind == Kind::Strands  ? StrandValidator().validate(input)
                                         : PointCloudValidator().validate(input));
    }

}

std::vector<char const*> componentsOf(Kind kind)
{
    if (kind == Kind::Meshes)
        return {sPointComp, sFaceVertexComp, sFaceComp};
    return kind == Kind::Strands ? std::vector<char const*>{sPointComp, sStrandComp}
                                 : std::vector<char const*>{sPointComp};
}

bool mergePlainly(Kind kind, Inputs const& inputs, Object& output)
{
    auto* const populate = kind == Kind::Meshes ? populateMesh
        : kind == Kind::Strands                 ? populateStrand
                                                : populatePointCloud;
    Inputs valid;
    for (auto const& input : inputs)
        if (isAccepted(kind, *input))
            valid.append(input);
    if (valid.empty())
        return false;
    populate(output);
    std::vector<Offsets> offsets;
    for (char const* const component : componentsOf(kind)) {
        Object merged;
        populate(merged);
        offsets.push_back(mergeComponent(valid, component, merged));
        transfer(component, merged, output);
    }
    if (kind == Kind::Meshes) {
        rebase(sFaceVertex, offsets[1], offsets[0], false, output);
        rebase(sFaceOffset, offsets[2], offsets[1], true, output);
    } else if (kind == Kind::Strands) {
        rebase(sStrandOffset, offsets[1], offsets[0], true, output);
    }
    copyTheRest(valid, output);
    return true;
}

}
