#include "extendComponent.h"

#include "frame/Arrays.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>
#include <limits>
#include <type_traits>

namespace Tessara::GeometryAlgorithms::Internal {

using namespace Modeling;
using namespace Tessara::Geometry;
using IndexArray = Orvan::Array<unsigned int>;

namespace {

    struct Extension {
        Orvan::String const& component;
        std::uint64_t oldCount;
        std::uint64_t newCount;
        NewValues const& given;
    };

    /// An array of `newCount` elements that begins as `source` does, with nothing behind that yet, and with the
    /// capacity that a copy of `source` has after growing.
    template <class T> Orvan::Array<T> grownCopy(Orvan::Array<T> const& source, std::uint64_t newCount)
    {
        std::uint64_t const added = newCount - std::min(source.size, newCount);
        Orvan::Array<T> copy;
        copy.reserve(added == 0 ? newCount : source.size + std::max(source.size, added));
        copy.resize(newCount, Orvan::kUninitialized);
        std::uint64_t const copied = newCount - added;
        if constexpr (std::is_trivially_copyable_v<T>)
            copyElements(source.data, copied, copy.data);
        else
            std::copy_n(source.data, copied, copy.data); // host strings are not for worker threads
        return copy;
    }

    template <class T> void fillFrom(std::uint64_t first, T const& value, Orvan::Array<T>& array)
    {
        if (first >= array.size)
            return;
        if constexpr (std::is_trivially_copyable_v<T>)
            fillElements(array.data + first, array.size - first, value);
        else
            std::fill(array.data + first, array.data + array.size, value);
    }

    template <class T>
    Orvan::Array<T> extended(Orvan::Array<T> const& source, Object const& property, std::uint64_t newCount)
    {
        Orvan::Array<T> array = grownCopy(source, newCount);
        PropertyValue const defaultValue = property.getProperty(sDefault);
        T const* const fallback = defaultValue.get<T>();
        fillFrom(source.size, fallback ? *fallback : T{}, array);
        return array;
    }

    /// The array with the given values at the end, which are written once.
    Orvan::Array<Math::float3> extendedByGiven(
        Orvan::Array<Math::float3> const& source, Object const& property, Extension const& extension)
    {
        std::uint64_t const oldCount = extension.oldCount;
        Orvan::Array<Math::float3> array = source.size < oldCount
            ? extended(source, property, extension.newCount) // some old elements lack a value too
            : grownCopy(source, extension.newCount);
        copyElements(extension.given.values.data, extension.newCount - oldCount, array.data + oldCount);
        return array;
    }

    /// The value of `sData` for the new count. Empty where the property has no array, or one of a type that is not
    /// known to be extended: such arrays are lost, on purpose.
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

    /// Calls `visit(name, property)` for the geo properties of a kind that target the component.
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
                writes.setProperty(name, Orvan::Ptr<Tessara::Object>(std::move(changed)));
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
                writes.setProperty(name, Orvan::Ptr<Tessara::Object>(std::move(changed)));
            });
    }

    /// A boolean property of the points that is true for the new elements.
    Orvan::MutablePtr<Object> makeTag(Extension const& extension)
    {
        Orvan::Array<bool> isNew = uninitializedArray<bool>(extension.newCount);
        fillElements(isNew.data, extension.oldCount, false);
        fillElements(isNew.data + extension.oldCount, extension.newCount - extension.oldCount, true);
        Orvan::MutablePtr<Object> tag = createObject();
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
    Extension const extension{component, oldCount, oldCount + addCount, given};

    // The arguments may lie in the object itself: they are read before its first change.
    PreparedWrites writes(object);
    if (!writes.setElementCount(component, static_cast<unsigned int>(extension.newCount)))
        return false;
    prepareData(extension, object, writes);
    prepareRanges(extension, object, writes);
    if (!tag.empty())
        writes.setProperty(tag,
            Orvan::Ptr<Tessara::Object>(makeTag(extension))); // comes last, so that it replaces whatever has the name
    writes.commit();
    return true;
}

}
