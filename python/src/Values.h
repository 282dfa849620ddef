#pragma once

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraObject/Object.h>

namespace ModelingPython {

/// Calls `visit` with the array, or the single value, that a property holds: with `Orvan::Ptr<Orvan::Array<T>> const&`,
/// which may be null, or with `T const&`. Returns false, with nothing called, for all other values.
template <class VisitArray, class VisitSingle>
bool visitValue(Tessara::PropertyValue const& value, VisitArray&& visitArray, VisitSingle&& visitSingle)
{
    bool visited = false;
    Tessara::Geometry::forEachElementTypeName([&]<class T>(Tessara::Geometry::ElementType<T> type) {
        if (auto const* const array = value.get<Orvan::Ptr<Orvan::Array<T>>>()) {
            visitArray(*array, type);
            visited = true;
        } else if (auto const* const single = value.get<T>()) {
            visitSingle(*single, type);
            visited = true;
        }
    });
    return visited;
}

/// Whether two objects have the same keys, in any order, and values that are equal to the bit: NaN equals the same NaN,
/// and 0 does not equal -0.
bool haveSameContents(Tessara::Object const& a, Tessara::Object const& b);

}
