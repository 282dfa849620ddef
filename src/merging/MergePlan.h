#pragma once

#include "frame/ElementTypes.h"

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
#include <optional>
#include <utility>
#include <vector>

namespace Modeling::Internal {

/// What a merge has to know of its inputs, looked up once. All of it lives for one merge.
///
/// Nothing here counts as a reference to what the inputs hold: with thousands of small inputs, counting would cost more
/// than copying. The caller's references keep the inputs, and who holds a reference changes nothing.

/// The inputs of a merge. The output may be one of them: nothing is written to it before the merge has been made.
using MergeInputs = std::vector<Tessara::Object const*>;

/// The elements of an array of a listed type, which somebody else holds.
struct HeldArray {
    static constexpr unsigned char kNoType = 255;

    void const* data = nullptr;
    std::uint64_t size = 0;
    unsigned char type = kNoType; // place in `AllElementTypes`

    explicit operator bool() const { return type != kNoType; }

    /// The array in a value. Types are tried in the order of the list, but first the one at the place `likely`.
    static HeldArray in(Tessara::PropertyValue const& value, unsigned char likely);
};

/// What a property is to its input.
struct PropertyRole {
    enum class Kind : unsigned char { Data, Range, Component, Other };

    Orvan::String name;
    Orvan::String owner; // of data its target; of a range the component that it belongs to in the end
    Kind kind = Kind::Other;
};

inline bool isData(PropertyRole const& role)
{
    return role.kind == PropertyRole::Kind::Data;
}

/// The properties of an input in the order of its keys. Inputs of one make share theirs.
class PropertyLayout {
public:
    explicit PropertyLayout(std::vector<PropertyRole> const& roles);

    std::vector<PropertyRole> const& roles() const { return roles_; }
    /// Where a property stands.
    std::optional<std::size_t> find(Orvan::String const& name) const;

private:
    std::vector<PropertyRole> roles_;
    std::vector<std::uint32_t> byName_; // places, by ascending names
};

struct MergeInput {
    static constexpr std::size_t kMostComponents = 3;

    Tessara::Object const* object = nullptr;
    Orvan::Ptr<PropertyLayout> layout;
    std::vector<HeldArray> arrays; // what each property of the layout holds under `sData`
    std::array<unsigned int, kMostComponents> counts{}; // elements of each merged component
};

/// The inputs that passed validation, whose order is the order of the merged elements.
struct MergePlan {
    std::vector<MergeInput> inputs;
};

/// Looks those inputs up that are accepted, in parallel.
/// \param components  those that are merged: up to three
/// \param accepts     `bool (Tessara::Object const&)`, called from several threads
MergePlan planMerge(MergeInputs const& inputs, std::initializer_list<char const*> components,
    std::function<bool(Tessara::Object const&)> const& accepts);
/// The same for inputs that all are accepted.
MergePlan planMerge(MergeInputs const& validInputs, std::initializer_list<char const*> components);

MergeInputs withoutNulls(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs);

/// The inputs that a validator of the host accepts, each asked on its own.
template <class Validator> MergeInputs filterValid(MergeInputs inputs)
{
    std::erase_if(inputs, [](Tessara::Object const* input) { return !Validator().validate(*input); });
    return inputs;
}

/// Calls `visit(input)` for inputs in their order, but for those that have the layout of the one before: what depends on
/// the layout alone has been seen there.
template <class Visit> void forEachLayout(MergePlan const& plan, Visit const& visit)
{
    PropertyLayout const* previous = nullptr;
    for (MergeInput const& input : plan.inputs)
        if (PropertyLayout const* const layout = std::exchange(previous, input.layout.get()); layout != previous)
            visit(input);
}

/// Finds one property in one input after the other.
class PropertyFinder {
public:
    explicit PropertyFinder(Orvan::String const& name)
        : name_(name)
    {
    }

    /// The place of the property among those of the input.
    std::optional<std::size_t> placeIn(MergeInput const& input)
    {
        if (std::exchange(layout_, input.layout.get()) != input.layout.get())
            place_ = layout_->find(name_);
        return place_;
    }

    /// What the property holds under `sData`, if it is of a listed type.
    HeldArray arrayIn(MergeInput const& input)
    {
        std::optional<std::size_t> const place = placeIn(input);
        return place ? input.arrays[*place] : HeldArray();
    }

private:
    Orvan::String const& name_;
    PropertyLayout const* layout_ = nullptr;
    std::optional<std::size_t> place_;
};

}
