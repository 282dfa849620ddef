#include "MergePlan.h"

#include "frame/ParallelFor.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

#include <numeric>

namespace Modeling::Internal {

using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::PropertyValue;

namespace {

    /// False where the value holds no array of that type.
    template <class T> bool findArray(PropertyValue const& value, HeldArray& found)
    {
        auto const* const array = value.get<ArrayForm::Of<T>>();
        if (array && *array)
            found = {(*array)->data, (*array)->size, kPlaceOfElementType<T>};
        return array;
    }

    using FindArray = bool (*)(PropertyValue const&, HeldArray&);

    template <class... T> constexpr auto findersOf(ElementTypeList<T...>)
    {
        return std::array<FindArray, sizeof...(T)>{&findArray<T>...};
    }

    constexpr auto kArrayFinders = findersOf(AllElementTypes{});

    /// The names and prototypes that every look-up needs, made once.
    struct Vocabulary {
        explicit Vocabulary(std::initializer_list<char const*> componentNames)
            : components(componentNames.begin(), componentNames.end())
        {
        }

        std::vector<Orvan::String> components;
        Orvan::String nobody; // owns what has no owner
        Orvan::String data = sData;
        Orvan::String target = sTarget;
        Orvan::Ptr<Object> dataPrototype = getDataGeoPropPrototype(sGenericDataGeoProp);
        Orvan::Ptr<Object> rangePrototype = getRangeGeoPropPrototype();
        Orvan::Ptr<Object> componentPrototype = getComponentGeoPropPrototype();
    };

    /// Looks inputs up, one after the other: what is as in the input before costs least.
    class InputReader {
    public:
        explicit InputReader(Vocabulary const& words)
            : words_(words)
        {
        }

        MergeInput read(Object const& input)
        {
            MergeInput result;
            result.object = &input;
            for (std::size_t component = 0; component != words_.components.size(); ++component)
                result.counts[component] = getElementCount(input, words_.components[component]);
            Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = input.keys();
            isNewLayout_ = !layout_ || roles_.size() != keys->size;
            roles_.resize(keys->size);
            likelyTypes_.resize(keys->size, HeldArray::kNoType);
            result.arrays.resize(keys->size);
            for (std::size_t place = 0; place != keys->size; ++place) {
                update(roles_[place].name, keys->data[place]);
                result.arrays[place] = readProperty(input, likelyTypes_[place], roles_[place]);
                likelyTypes_[place] = result.arrays[place].type;
            }
            if (isNewLayout_)
                layout_ = Orvan::makePtr<PropertyLayout>(roles_);
            result.layout = layout_;
            return result;
        }

    private:
        HeldArray readProperty(Object const& input, unsigned char likelyType, PropertyRole& role)
        {
            PropertyValue const value = input.getProperty(role.name);
            auto const* const object = value.get<Orvan::Ptr<Object>>();
            if (!object || !*object) {
                updateRole(PropertyRole::Kind::Other, words_.nobody, role);
                return {};
            }
            Object const& property = **object;
            if (Object::isA(property, *words_.dataPrototype)) {
                PropertyValue const target = property.getProperty(words_.target);
                auto const* const name = target.get<Orvan::String>();
                updateRole(PropertyRole::Kind::Data, name ? *name : words_.nobody, role);
            } else if (Object::isA(property, *words_.rangePrototype)) {
                updateRole(PropertyRole::Kind::Range, getTargetComponent(input, role.name), role);
            } else {
                bool const isComponent = Object::isA(property, *words_.componentPrototype);
                updateRole(
                    isComponent ? PropertyRole::Kind::Component : PropertyRole::Kind::Other, words_.nobody, role);
            }
            return HeldArray::in(property.getProperty(words_.data), likelyType);
        }

        void updateRole(PropertyRole::Kind kind, Orvan::String const& owner, PropertyRole& role)
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

        Vocabulary const& words_;
        Orvan::Ptr<PropertyLayout> layout_; // of the input before
        std::vector<PropertyRole> roles_; // those of the layout, and brought up to date while an input is read
        std::vector<unsigned char> likelyTypes_; // of the arrays of the input before
        bool isNewLayout_ = true;
    };

}

HeldArray HeldArray::in(PropertyValue const& value, unsigned char likely)
{
    HeldArray found;
    if (value.empty() || (likely != kNoType && kArrayFinders[likely](value, found)))
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
        [&](std::uint32_t a, std::uint32_t b) { return roles_[a].name < roles_[b].name; });
}

std::optional<std::size_t> PropertyLayout::find(Orvan::String const& name) const
{
    auto const place = std::lower_bound(byName_.begin(), byName_.end(), name,
        [&](std::uint32_t candidate, Orvan::String const& wanted) { return roles_[candidate].name < wanted; });
    if (place == byName_.end() || roles_[*place].name != name)
        return std::nullopt;
    return *place;
}

MergePlan planMerge(MergeInputs const& inputs, std::initializer_list<char const*> components,
    std::function<bool(Object const&)> const& accepts)
{
    Vocabulary const words(components);
    MergePlan plan{std::vector<MergeInput>(inputs.size())};
    // Each input has its own entry.
    parallelFor(tbb::blocked_range<std::size_t>(0, inputs.size(), kFaceGrain), [&](auto const& range) {
        InputReader reader(words);
        for (std::size_t input = range.begin(); input != range.end(); ++input)
            if (accepts(*inputs[input]))
                plan.inputs[input] = reader.read(*inputs[input]);
    });
    std::erase_if(plan.inputs, [](MergeInput const& input) { return !input.object; });
    return plan;
}

MergePlan planMerge(MergeInputs const& validInputs, std::initializer_list<char const*> components)
{
    return planMerge(validInputs, components, [](Object const&) { return true; });
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
