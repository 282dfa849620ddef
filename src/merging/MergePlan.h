#pragma once

#include "frame/ElementTypes.h"
#include "host/GeoPropertyKind.h"
#include "host/IndexArray.h"

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <initializer_list>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

namespace Modeling::Internal {

/// What a merge needs to know about its inputs, looked up once. All of it lives only as long as the merge.
///
/// Nothing here holds references to the inputs' arrays: with thousands of small inputs, counting references would cost
/// more than copying the values. The caller's references keep the inputs alive.

/// The inputs of a merge. The output may be one of them: it is not written until the result is complete.
using MergeInputs = std::vector<Tessara::Object const*>;

/// A non-owning view of an array of any listed element type.
struct ArrayView {
    static constexpr unsigned char kNoType = 255;

    void const* data = nullptr;
    std::uint64_t size = 0;
    unsigned char type = kNoType; // index in `AllElementTypes`

    explicit operator bool() const { return type != kNoType; }

    /// Views the array that a value holds; empty if it holds none of a listed type.
    /// \param likelyType  Index of the type that is tried before the others; `kNoType` if there is none.
    static ArrayView of(Tessara::PropertyValue const& value, unsigned char likelyType = kNoType);
};

/// The role of a property in its input.
struct PropertyRole {
    Orvan::String name;
    Orvan::String owner; // for data, its target; for a range, the component that its chain of targets leads to
    GeoPropertyKind kind = GeoPropertyKind::None;
};

inline bool isData(PropertyRole const& role)
{
    return role.kind == GeoPropertyKind::Data;
}

/// The properties of an input in the order of its keys. Consecutive inputs with equal properties share one layout if
/// the same task has read them.
class PropertyLayout {
public:
    explicit PropertyLayout(std::vector<PropertyRole> const& roles);

    std::vector<PropertyRole> const& roles() const { return roles_; }
    /// The index of a property among the roles.
    std::optional<std::size_t> find(Orvan::String const& name) const;

private:
    std::vector<PropertyRole> roles_;
    std::vector<std::uint32_t> byName_; // indices into `roles_`, in ascending order of names
};

struct MergeInput {
    static constexpr std::size_t kMaxComponents = 3;

    Tessara::Object const* object = nullptr;
    std::shared_ptr<PropertyLayout const> layout;
    std::vector<ArrayView> arrays; // the array under `sData` of each property of the layout
    std::array<unsigned int, kMaxComponents> counts{}; // element count of each component of the plan
};

/// The components to merge, and the accepted inputs in the order of their elements in the result.
struct MergePlan {
    std::vector<Orvan::String> components;
    std::vector<MergeInput> inputs;
};

/// Looks up the accepted inputs, in parallel.
/// \param components  The components to merge, at most `MergeInput::kMaxComponents`.
/// \param accepts     `bool (Tessara::Object const&)`, called from several threads.
/// \pre               No input is null.
MergePlan planMerge(MergeInputs const& inputs, std::initializer_list<char const*> components,
    std::function<bool(Tessara::Object const&)> const& accepts);
/// The same if all inputs are accepted.
MergePlan planMerge(MergeInputs const& validInputs, std::initializer_list<char const*> components);

/// Where the elements of each input begin in a merged array or component; the last entry is the total.
using Offsets = IndexArray;

/// Where the elements of each input begin in a merged component; nullopt if the total does not fit 32 bits.
/// \param component  One of the plan's components.
std::optional<Offsets> computeElementOffsets(MergePlan const& plan, Orvan::String const& component);

MergeInputs withoutNulls(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs);

/// The inputs that one of the host's validators accepts. Each input gets a validator of its own.
template <class Validator> MergeInputs filterValid(MergeInputs inputs)
{
    std::erase_if(inputs, [](Tessara::Object const* input) { return !Validator().validate(*input); });
    return inputs;
}

/// Visits the first input of each run of inputs that share a property layout.
template <class Visit> void forEachLayout(MergePlan const& plan, Visit const& visit)
{
    PropertyLayout const* previous = nullptr;
    for (MergeInput const& input : plan.inputs)
        if (PropertyLayout const* const layout = std::exchange(previous, input.layout.get()); layout != previous)
            visit(input);
}

/// Finds one property in successive inputs. Searches again only if the layout changes.
class PropertyFinder {
public:
    explicit PropertyFinder(Orvan::String const& name)
        : name_(name)
    {
    }

    /// The index of the property among the roles of the input.
    std::optional<std::size_t> indexIn(MergeInput const& input)
    {
        if (std::exchange(layout_, input.layout.get()) != input.layout.get())
            index_ = layout_->find(name_);
        return index_;
    }

    /// The array that the property holds under `sData`.
    ArrayView arrayIn(MergeInput const& input)
    {
        std::optional<std::size_t> const index = indexIn(input);
        return index ? input.arrays[*index] : ArrayView();
    }

private:
    Orvan::String const& name_;
    PropertyLayout const* layout_ = nullptr;
    std::optional<std::size_t> index_;
};

}
