#include "MergeRecords.h"

#include "frame/ParallelFor.h"
#include "host/GeoProperties.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

#include <cstdint>
#include <limits>

namespace Modeling::Internal {

using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::PropertyValue;

namespace {

    Orvan::String targetOf(Object const& geoProperty)
    {
        PropertyValue const target = geoProperty.getProperty(sTarget);
        auto const* const name = target.get<Orvan::String>();
        return name ? *name : Orvan::String();
    }

    InputProperties propertiesOf(Object const& input)
    {
        InputProperties properties;
        Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = input.keys();
        properties.data.reserve(keys->size);
        for (Orvan::String const& key : *keys) {
            if (Orvan::Ptr<Object> data = getDataGeoProperty(input, key)) {
                Orvan::String target = targetOf(*data);
                properties.data.push_back({key, std::move(target), std::move(data)});
            } else if (Orvan::Ptr<Object> range = getRangeGeoProperty(input, key)) {
                properties.ranges.push_back({key, getTargetComponent(input, key), std::move(range)});
            } else if (Orvan::Ptr<Object> const object = objectAt(input, key);
                       !object || !Object::isA(*object, *getComponentGeoPropPrototype())) {
                properties.others.push_back(key);
            }
        }
        return properties;
    }

}

MergePlan planMerge(MergeInputs const& inputs, std::function<bool(Object const&)> const& accepts)
{
    std::vector<std::optional<InputProperties>> found(inputs.size);
    // Each input has its own entry.
    parallelFor(tbb::blocked_range<std::size_t>(0, inputs.size, kFaceGrain), [&](auto const& range) {
        for (std::size_t input = range.begin(); input != range.end(); ++input)
            if (accepts(*inputs[input]))
                found[input] = propertiesOf(*inputs[input]);
    });
    MergePlan plan;
    plan.inputs.reserve(inputs.size);
    plan.properties.reserve(inputs.size);
    for (std::size_t input = 0; input != inputs.size; ++input) {
        if (!found[input])
            continue;
        plan.inputs.append(inputs[input]);
        plan.properties.push_back(std::move(*found[input]));
    }
    return plan;
}

MergePlan planMerge(MergeInputs const& validInputs)
{
    return planMerge(validInputs, [](Object const&) { return true; });
}

std::optional<Offsets> computeElementOffsets(MergeInputs const& inputs, Orvan::String const& component)
{
    Offsets offsets(inputs.size + 1, Orvan::kUninitialized);
    std::uint64_t total = 0;
    for (std::uint64_t input = 0; input != inputs.size; ++input) {
        offsets[input] = static_cast<unsigned int>(total);
        total += getElementCount(*inputs[input], component);
        if (total > std::numeric_limits<unsigned int>::max())
            return std::nullopt;
    }
    offsets[inputs.size] = static_cast<unsigned int>(total);
    return offsets;
}

std::vector<DataPropertyMergeEntry> collectDependentDataProperties(
    InputProperties const& input, Orvan::String const& rangeName)
{
    std::vector<DataPropertyMergeEntry> dependents;
    for (GeoProperty const& data : input.data)
        if (data.owner == rangeName)
            dependents.push_back({data.name, data.property, {}});
    return dependents;
}

MergeInputs holdInputs(MergeInputs const& inputs, Object const& output)
{
    MergeInputs held;
    held.reserve(inputs.size);
    for (Orvan::Ptr<Object> const& input : inputs) {
        Orvan::Ptr<Object> reference = input;
        if (!reference)
            continue;
        // Two references: this makes a copy.
        held.append(reference.get() == &output ? Orvan::Ptr<Object>(makeMutable(std::move(reference))) : reference);
    }
    return held;
}

void copyOtherProperties(MergePlan const& plan, Object& object)
{
    for (std::size_t input = 0; input != plan.properties.size(); ++input)
        for (Orvan::String const& key : plan.properties[input].others)
            if (!key.empty() && !object.hasProperty(key))
                object.setProperty(key, plan.inputs[input]->getProperty(key));
}

Orvan::MutablePtr<Object> stagedCopy(Object const& output)
{
    Orvan::MutablePtr<Object> staged = Tessara::createObject();
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = output.keys();
    for (Orvan::String const& key : *keys)
        staged->setProperty(key, output.getProperty(key));
    return staged;
}

void publish(Object const& staged, Object& output)
{
    PreparedWrites writes(output);
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = staged.keys();
    for (Orvan::String const& key : *keys) {
        Orvan::Ptr<Object> const geoProperty = objectAt(staged, key);
        bool const isChanged = geoProperty ? geoProperty != objectAt(output, key) : !output.hasProperty(key);
        if (isChanged)
            writes.setProperty(key, staged.getProperty(key));
    }
    writes.commit();
}

}
