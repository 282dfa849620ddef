#include "MergePlan.h"

#include "frame/Assert.h"
#include "frame/ParallelFor.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>

#include <cstring>
#include <limits>
#include <numeric>
#include <utility>

namespace Modeling::Internal {

using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::PropertyValue;

namespace {

    /// Whether the value holds a reference to an array of `T`. If it is null, `found` stays empty.
    template <class T> bool findArray(PropertyValue const& value, ArrayView& found)
    {
        auto const* const array = value.get<ArrayForm::Of<T>>();
        if (array && *array)
            found = {(*array)->data, (*array)->size, kPlaceOfElementType<T>};
        return array;
    }

    /// The host does not order strings.
    bool isBefore(Orvan::String const& a, Orvan::String const& b)
    {
        return std::strcmp(a.c_str(), b.c_str()) < 0;
    }

    using FindArray = bool (*)(PropertyValue const&, ArrayView&);

    template <class... T> constexpr auto findersOf(ElementTypeList<T...>)
    {
        return std::array<FindArray, sizeof...(T)>{&findArray<T>...};
    }

    constexpr auto kArrayFinders = findersOf(AllElementTypes{});

    /// The strings and prototypes that every look-up needs, created once for all threads.
    struct LookupKeys {
        explicit LookupKeys(std::vector<Orvan::String> const& planned)
            : components(planned)
        {
        }

        std::vector<Orvan::String> const& components;
        Orvan::String noOwner;
        Orvan::String data = sData;
        Orvan::String target = sTarget;
        GeoPropertyClassifier classifier;
    };

    /// Looks up successive inputs. An input with the same properties as the previous one reuses its layout.
    class InputReader {
    public:
        explicit InputReader(LookupKeys const& keys)
            : keys_(keys)
        {
        }

        /// \param names  The keys of the input.
        MergeInput read(Object const& input, Orvan::Array<Orvan::String> const& names)
        {
            MergeInput result;
            result.object = &input;
            for (std::size_t component = 0; component != keys_.components.size(); ++component)
                result.counts[component] = getElementCount(input, keys_.components[component]);
            isNewLayout_ = !layout_ || roles_.size() != names.size;
            roles_.resize(names.size);
            likelyTypes_.resize(names.size, ArrayView::kNoType);
            result.arrays.resize(names.size);
            for (std::size_t property = 0; property != names.size; ++property) {
                update(roles_[property].name, names[property]);
                result.arrays[property] = readProperty(input, likelyTypes_[property], roles_[property]);
                likelyTypes_[property] = result.arrays[property].type;
            }
            if (isNewLayout_)
                layout_ = std::make_shared<PropertyLayout>(roles_);
            result.layout = layout_;
            return result;
        }

    private:
        ArrayView readProperty(Object const& input, unsigned char likelyType, PropertyRole& role)
        {
            PropertyValue const value = input.getProperty(role.name);
            auto const* const object = value.get<Orvan::Ptr<Object>>();
            if (!object || !*object) {
                updateRole(GeoPropertyKind::None, keys_.noOwner, role);
                return {};
            }
            Object const& property = **object;
            GeoPropertyKind const kind = keys_.classifier.kindOf(property);
            if (kind == GeoPropertyKind::Data) {
                PropertyValue const target = property.getProperty(keys_.target);
                auto const* const name = target.get<Orvan::String>();
                updateRole(kind, name ? *name : keys_.noOwner, role);
            } else if (kind == GeoPropertyKind::Range) {
                updateRole(kind, getTargetComponent(input, role.name), role);
            } else {
                updateRole(kind, keys_.noOwner, role);
            }
            return ArrayView::of(property.getProperty(keys_.data), likelyType);
        }

        void updateRole(GeoPropertyKind kind, Orvan::String const& owner, PropertyRole& role)
        {
            update(role.kind, kind);
            update(role.owner, owner);
        }

        template <class Value> void update(Value& known, Value const& seen)
        {
            if (known == seen)
                return;
            known = seen;
            isNewLayout_ = true;
        }

        LookupKeys const& keys_;
        std::shared_ptr<PropertyLayout const> layout_; // of the previous input
        std::vector<PropertyRole> roles_; // as in `layout_`, until the next input is read over them
        std::vector<unsigned char> likelyTypes_; // element types of the previous input's arrays
        bool isNewLayout_ = true;
    };

}

ArrayView ArrayView::of(PropertyValue const& value, unsigned char likelyType)
{
    ArrayView found;
    if (isKnownToBeEmpty(value) || (likelyType != kNoType && kArrayFinders[likelyType](value, found)))
        return found;
    std::any_of(kArrayFinders.begin(), kArrayFinders.end(), [&](FindArray find) { return find(value, found); });
    return found;
}

PropertyLayout::PropertyLayout(std::vector<PropertyRole> const& roles)
    : roles_(roles)
    , byName_(roles.size())
{
    std::iota(byName_.begin(), byName_.end(), 0u);
    std::sort(byName_.begin(), byName_.end(),
        [&](std::uint32_t a, std::uint32_t b) { return isBefore(roles_[a].name, roles_[b].name); });
}

std::optional<std::size_t> PropertyLayout::find(Orvan::String const& name) const
{
    auto index = std::lower_bound(byName_.begin(), byName_.end(), name,
        [&](std::uint32_t candidate, Orvan::String const& sought) { return isBefore(roles_[candidate].name, sought); });
    while (index != byName_.end() && roles_[*index].name != name && !isBefore(name, roles_[*index].name))
        ++index; // names that differ only behind a null character
    if (index == byName_.end() || roles_[*index].name != name)
        return std::nullopt;
    return *index;
}

MergePlan planMerge(MergeInputs const& inputs, std::initializer_list<char const*> components,
    std::function<bool(Object const&)> const& accepts)
{
    MODELING_ASSERT(components.size() <= MergeInput::kMaxComponents);
    MODELING_ASSERT(std::find(inputs.begin(), inputs.end(), nullptr) == inputs.end());
    MergePlan plan{{components.begin(), components.end()}, std::vector<MergeInput>(inputs.size())};
    LookupKeys const keys(plan.components);
    // Each input writes its own entry.
    parallelFor(tbb::blocked_range<std::size_t>(0, inputs.size(), kCoarseGrain), [&](auto const& range) {
        InputReader reader(keys);
        Orvan::Ptr<Orvan::Array<Orvan::String>> nextNames = inputs[range.begin()]->keys();
        for (std::size_t input = range.begin(); input != range.end(); ++input) {
            // Small inputs are scattered in memory. A host can start loading what is under the keys, so they are asked for
            // before the look-ups in the input before.
            if (input + 2 < range.end())
                __builtin_prefetch(inputs[input + 2]);
            auto const names = std::exchange(nextNames, input + 1 != range.end() ? inputs[input + 1]->keys() : nullptr);
            if (accepts(*inputs[input]))
                plan.inputs[input] = reader.read(*inputs[input], *names);
        }
    });
    std::erase_if(plan.inputs, [](MergeInput const& input) { return !input.object; });
    return plan;
}

MergePlan planMerge(MergeInputs const& validInputs, std::initializer_list<char const*> components)
{
    return planMerge(validInputs, components, [](Object const&) { return true; });
}

std::optional<Offsets> computeElementOffsets(MergePlan const& plan, Orvan::String const& component)
{
    auto const planned = std::find(plan.components.begin(), plan.components.end(), component);
    MODELING_ASSERT(planned != plan.components.end());
    auto const index = static_cast<std::size_t>(planned - plan.components.begin());
    std::size_t const inputCount = plan.inputs.size();
    Offsets offsets(inputCount + 1, Orvan::kUninitialized);
    std::uint64_t total = 0;
    for (std::size_t input = 0; input != inputCount; ++input) {
        offsets[input] = static_cast<unsigned int>(total);
        total += plan.inputs[input].counts[index];
        if (total > std::numeric_limits<unsigned int>::max())
            return std::nullopt;
    }
    offsets[inputCount] = static_cast<unsigned int>(total);
    return offsets;
}

MergeInputs withoutNulls(Orvan::Array<Orvan::Ptr<Object>> const& inputs)
{
    MergeInputs objects;
    objects.reserve(inputs.size);
    for (Orvan::Ptr<Object> const& input : inputs)
        if (input)
            objects.push_back(input.get());
    return objects;
}

}
