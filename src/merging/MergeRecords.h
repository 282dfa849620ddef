#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

#include <cstddef>
#include <functional>
#include <optional>
#include <vector>

namespace Modeling::Internal {

/// What the parts of a merge hand to one another. All of it lives for one merge.

using MergeInputs = Orvan::Array<Orvan::Ptr<Tessara::Object>>;
using Offsets = Orvan::Array<unsigned int>;

/// A data property of an input, with its target; or a range property, with the component that it belongs to in the end.
struct GeoProperty {
    Orvan::String name;
    Orvan::String owner;
    Orvan::Ptr<Tessara::Object> property;
};

/// What one input holds, in the order of its keys. Looked up once for all components.
struct InputProperties {
    std::vector<GeoProperty> data;
    std::vector<GeoProperty> ranges;
    std::vector<Orvan::String> others; // keys of what is no geo property
};

/// A data property that is being merged. `property` is that of the first input that qualifies: its default and target
/// are those of the merged one.
struct DataPropertyMergeEntry {
    Orvan::String name;
    Orvan::Ptr<Tessara::Object> property;
    Tessara::PropertyValue mergedData; // Ptr<Array<T>>; stays empty where the default has no listed type
};

/// A range property that is being merged, with the data of the first qualifying input that targets it.
struct RangePropertyMergeEntry {
    Orvan::String name;
    Orvan::Ptr<Orvan::Array<unsigned int>> mergedIndices;
    std::vector<DataPropertyMergeEntry> dependents;
};

/// The inputs that passed validation, whose order is the order of the merged elements.
struct MergePlan {
    MergeInputs inputs;
    std::vector<InputProperties> properties; // one an input
};

/// Looks the properties of those inputs up that are accepted, in parallel.
/// \param accepts  `bool (Tessara::Object const&)`, called from several threads
MergePlan planMerge(MergeInputs const& inputs, std::function<bool(Tessara::Object const&)> const& accepts);
/// The same for inputs that all are accepted.
MergePlan planMerge(MergeInputs const& validInputs);

/// Where the elements of each input begin in the merged component, and as last entry how many there are. Nothing where
/// that does not fit 32 bits.
std::optional<Offsets> computeElementOffsets(MergeInputs const& inputs, Orvan::String const& component);

/// The data properties that target a range in one input, in the order of its keys.
std::vector<DataPropertyMergeEntry> collectDependentDataProperties(
    InputProperties const& input, Orvan::String const& rangeName);

/// The inputs that a validator of the host accepts, each asked on its own.
template <class Validator> MergeInputs filterValid(MergeInputs const& inputs)
{
    MergeInputs valid;
    valid.reserve(inputs.size);
    for (Orvan::Ptr<Tessara::Object> const& input : inputs)
        if (Validator().validate(*input))
            valid.append(input);
    return valid;
}

/// References to the inputs that stay what they are, whatever is written to the output: where that is an input itself,
/// a shallow copy stands for it. Null inputs are left out.
MergeInputs holdInputs(MergeInputs const& inputs, Tessara::Object const& output);

/// Gives an object what the inputs hold beside geometry: of each key the value of the first input that has it, unless
/// the object has the key. (`copyNonGeoProperties`, for inputs whose properties have been looked up.)
void copyOtherProperties(MergePlan const& plan, Tessara::Object& object);

/// A shallow copy to build a result in, and the way back: the output gets all that has changed, or, where memory runs
/// out, nothing.
Orvan::MutablePtr<Tessara::Object> stagedCopy(Tessara::Object const& output);
void publish(Tessara::Object const& staged, Tessara::Object& output);

}
