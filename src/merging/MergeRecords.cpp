#include "MergeRecords.h"

#include "host/GeoProperties.h"

#include <cstdint>
#include <limits>

namespace Modeling::Internal {

using Tessara::Object;

DataPropertyMergeEntry dataEntry(MergeInput const& input, Orvan::String const& name)
{
    return {name, objectAt(*input.object, name), {}};
}

std::optional<Offsets> computeElementOffsets(MergePlan const& plan, std::size_t component)
{
    std::size_t const inputCount = plan.inputs.size();
    Offsets offsets(inputCount + 1, Orvan::kUninitialized);
    std::uint64_t total = 0;
    for (std::size_t input = 0; input != inputCount; ++input) {
        offsets[input] = static_cast<unsigned int>(total);
        total += plan.inputs[input].counts[component];
        if (total > std::numeric_limits<unsigned int>::max())
            return std::nullopt;
    }
    offsets[inputCount] = static_cast<unsigned int>(total);
    return offsets;
}

std::vector<DataPropertyMergeEntry> collectDependentDataProperties(
    MergeInput const& input, Orvan::String const& rangeName)
{
    std::vector<DataPropertyMergeEntry> dependents;
    for (PropertyRole const& role : input.layout->roles())
        if (isData(role) && role.owner == rangeName)
            dependents.push_back(dataEntry(input, role.name));
    return dependents;
}

void copyOtherProperties(MergePlan const& plan, Object& object)
{
    forEachLayout(plan, [&](MergeInput const& input) {
        for (PropertyRole const& role : input.layout->roles())
            if (role.kind == PropertyRole::Kind::Other && !role.name.empty() && !object.hasProperty(role.name))
                object.setProperty(role.name, input.object->getProperty(role.name));
    });
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
    for (Orvan::String const& key : *keys)
        writes.setProperty(key, staged.getProperty(key));
    writes.commit();
}

}
