#include "Values.h"

#include "ElementForms.h"

#include <algorithm>
#include <cstring>

namespace ModelingPython {

using namespace Tessara::Geometry;
using Common::GeoLocation;
using Tessara::Object;
using Tessara::PropertyValue;

namespace {

    template <class T> bool sameElements(T const* a, T const* b, std::uint64_t count)
    {
        if constexpr (kIsViewable<T>) {
            static_assert(std::is_trivially_copyable_v<T>);
            return count == 0 || std::memcmp(static_cast<void const*>(a), b, count * sizeof(T)) == 0;
        } else if constexpr (std::is_same_v<T, GeoLocation>) {
            return std::equal(a, a + count, b, [](GeoLocation const& left, GeoLocation const& right) {
                return left.object == right.object && left.component == right.component && left.element == right.element
                    && sameElements(&left.coordinates, &right.coordinates, 1);
            });
        } else {
            return std::equal(a, a + count, b);
        }
    }

    bool sameObjects(Orvan::Ptr<Object> const& a, Orvan::Ptr<Object> const& b)
    {
        return a == b || (a && b && haveSameContents(*a, *b));
    }

    bool sameValues(PropertyValue const& a, PropertyValue const& b)
    {
        if (a.type() != b.type())
            return false;
        if (auto const* const object = a.get<Orvan::Ptr<Object>>())
            return sameObjects(*object, *b.get<Orvan::Ptr<Object>>());
        if (auto const* const mode = a.get<Common::DataInterpolationMode>())
            return *mode == *b.get<Common::DataInterpolationMode>();
        bool result = a.empty(); // values of unknown types cannot be compared
        visitValue(
            a,
            [&]<class T>(Orvan::Ptr<Orvan::Array<T>> const& left, ElementType<T>) {
                auto const& right = *b.get<Orvan::Ptr<Orvan::Array<T>>>();
                result = left == right
                    || (left && right && left->size == right->size
                        && sameElements(left->data, right->data, left->size));
            },
            [&]<class T>(T const& single, ElementType<T>) { result = sameElements(&single, b.get<T>(), 1); });
        return result;
    }

}

bool haveSameContents(Object const& a, Object const& b)
{
    if (&a == &b)
        return true;
    auto const keys = a.keys();
    return keys->size == b.keys()->size && std::all_of(keys->begin(), keys->end(), [&](Orvan::String const& key) {
        PropertyValue const* const other = b.findProperty(key.view());
        return other && sameValues(*a.findProperty(key.view()), *other);
    });
}

}
