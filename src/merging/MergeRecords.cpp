#include "MergeRecords.h"

#include "frame/ParallelFor.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>

#include <cstdint>
#include <limits>

namespace Modeling::Internal {

using namespace Tessara::Geometry;
using Tessara::Object;

namespace {

    InputProperties propertiesOf(Object const& input)
    {
        InputProperties properties;
        Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = input.keys();
        for (Orvan::String const& key : *keys) {
            if (Orvan::Ptr<Object> data = getDataGeoProperty(input, key))
                properties.data.push_back({key, getGeoPropTargetName(input, key), std::move(data)});
            else if (Orvan::Ptr<Object> range = getRangeGeoProperty(input, key))
                properties.ranges.push_back({key, getTargetComponent(input, key), std::move(range)});
        }
        return properties;
    }

}

MergePlan planMerge(MergeInputs&& validInputs)
{
    MergePlan plan;
    plan.inputs = std::move(validInputs);
    plan.properties.resize(plan.inputs.size);
    // Each input has its own entry.
    parallelFor(tbb::blocked_range<std::size_t>(0, plan.inputs.size, kFaceGrain), [&](auto const& inputs) {
        for (std::size_t input = inputs.begin(); input != inputs.end(); ++input)
            plan.properties[input] = propertiesOf(*plan.inputs[input]);
    });
    return plan;
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
        if (data.target == rangeName)
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

}
