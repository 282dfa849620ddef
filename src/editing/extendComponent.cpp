#include "extendComponent.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"
#include "host/IndexArray.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>
#include <limits>
#include <type_traits>

namespace Modeling::Internal {

using Tessara::Object;
using Tessara::PropertyValue;
namespace Math = Tessara::Math;
using namespace Tessara::Geometry;

namespace {

    struct Extension {
        Orvan::String const& component;
        std::uint64_t oldCount;
        std::uint64_t newCount;
        NewValues const& given;
    };

    /// A copy of `source`, trimmed or extended to `newCount` elements, with the capacity that appending would give. The
    /// added elements are uninitialized.
    template <class T> Orvan::Array<T> grownCopy(Orvan::Array<T> const& source, std::uint64_t newCount)
    {
        std::uint64_t const added = newCount - std::min(source.size, newCount);
        Orvan::Array<T> copy;
        copy.reserve(added == 0 ? newCount : source.size + std::max(source.size, added));
        copy.resize(newCount, Orvan::kUninitialized);
        std::uint64_t const copied = newCount - added;
        copyElements(source.data, copied, copy.data);
        return copy;
    }

    template <class T> void fillFrom(std::uint64_t first, T const& value, Orvan::Array<T>& array)
    {
        if (first < array.size)
            fillElements(array.data + first, array.size - first, value);
    }

    template <class T>
    Orvan::Array<T> extended(Orvan::Array<T> const& source, Object const& property, std::uint64_t newCount)
    {
        Orvan::Array<T> array = grownCopy(source, newCount);
        PropertyValue const defaultValue = property.getProperty(sDefault);
        T const* const fallback = defaultValue.get<T>();
        fillFrom(source.size, fallback ? *fallback : T{}, array);
        MODELING_ASSERT(array.size == newCount);
        return array;
    }

    /// As `extended`, but the new elements get the given values.
    Orvan::Array<Math::float3> extendedByGiven(
        Orvan::Array<Math::float3> const& source, Object const& property, Extension const& extension)
    {
        std::uint64_t const oldCount = extension.oldCount;
        Orvan::Array<Math::float3> array = source.size < oldCount
            ? extended(source, property, extension.newCount) // some old elements have no value either
            : grownCopy(source, extension.newCount);
        copyElements(extension.given.values.data, extension.newCount - oldCount, array.data + oldCount);
        return array;
    }

    /// The value of `sData` for the new count. Empty if the property has no array of a core type: an array that cannot
    /// be extended is dropped.
    PropertyValue extendedData(Orvan::String const& name, Object const& property, Extension const& extension)
    {
        PropertyValue const data = property.getProperty(sData);
        PropertyValue result;
        bool matched = false;
        forEachElementType<CoreElementTypes, ArrayForm>(
            &data, &matched, [&]<class T>(Orvan::Ptr<Orvan::Array<T>> const& source) {
                if (!source)
                    return false;
                if constexpr (std::is_same_v<T, Math::float3>) {
                    if (name == extension.given.property) {
                        result = Orvan::makePtr<Orvan::Array<T>>(extendedByGiven(*source, property, extension));
                        return true;
                    }
                }
                result = Orvan::makePtr<Orvan::Array<T>>(extended(*source, property, extension.newCount));
                return true;
            });
        return result;
    }

    /// Visits the geo properties of a kind that target the component: `visit(name, property)`.
    template <class Visit> void forEachProperty(
        Object const& object, Object const& prototype, Orvan::String const& component, Visit const& visit)
    {
        Orvan::Array<Orvan::String> const names = getGeoPropNamesByPrototype(object, prototype);
        for (Orvan::String const& name : names)
            if (getGeoPropTargetName(object, name) == component)
                visit(name, objectAt(object, name));
    }

    void prepareData(Extension const& extension, Object const& object, PreparedWrites& writes)
    {
        forEachProperty(object, *getDataGeoPropPrototype(sGenericDataGeoProp), extension.component,
            [&](Orvan::String const& name, Orvan::Ptr<Object> property) {
                PropertyValue data = extendedData(name, *property, extension);
                Orvan::MutablePtr<Object> changed = makeMutable(std::move(property));
                changed->setProperty(sData, std::move(data));
                writes.setProperty(name, Orvan::Ptr<Object>(std::move(changed)));
            });
    }

    void prepareRanges(Extension const& extension, Object const& object, PreparedWrites& writes)
    {
        forEachProperty(object, *getRangeGeoPropPrototype(), extension.component,
            [&](Orvan::String const& name, Orvan::Ptr<Object> property) {
                Orvan::Ptr<IndexArray> const source = getRangeGeoPropIndices(*property);
                if (!source)
                    return;
                IndexArray indices = grownCopy(*source, extension.newCount);
                fillFrom(source->size, kInvalidIndex, indices);
                Orvan::MutablePtr<Object> changed = makeMutable(std::move(property));
                changed->setProperty(sIndices, Orvan::makePtr<IndexArray>(std::move(indices)));
                writes.setProperty(name, Orvan::Ptr<Object>(std::move(changed)));
            });
    }

    /// A boolean data property of the points that is true for the new elements.
    Orvan::MutablePtr<Object> makeTag(Extension const& extension)
    {
        Orvan::Array<bool> isNew = uninitializedArray<bool>(extension.newCount);
        fillElements(isNew.data, extension.oldCount, false);
        fillElements(isNew.data + extension.oldCount, extension.newCount - extension.oldCount, true);
        Orvan::MutablePtr<Object> tag = Tessara::createObject();
        populateTag(sPointComp, Orvan::makePtr<Orvan::Array<bool>>(std::move(isNew)), *tag);
        return tag;
    }

}

bool extendComponent(Orvan::String const& component, std::uint64_t addCount, Orvan::String const& tag,
    NewValues const& given, Object& object)
{
    std::uint64_t const oldCount = getElementCount(object, component);
    if (addCount > std::numeric_limits<unsigned int>::max() - oldCount)
        return false;
    MODELING_ASSERT(given.values.size == addCount);
    Extension const extension{component, oldCount, oldCount + addCount, given};

    // The arguments may be stored in the object itself, so all of them are read before the object changes.
    PreparedWrites writes(object);
    if (!writes.setElementCount(component, static_cast<unsigned int>(extension.newCount)))
        return false;
    prepareData(extension, object, writes);
    prepareRanges(extension, object, writes);
    if (!tag.empty()) // last, so that the tag replaces any other property of that name
        writes.setProperty(tag, Orvan::Ptr<Object>(makeTag(extension)));
    writes.commit();
    return true;
}

}
