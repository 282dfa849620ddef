#pragma once

#include "frame/Arrays.h"

#include <algorithm>

namespace Geometry::Mesh::Internal {

/// Adds uninitialized elements, like `resize`, but copies in parallel if the array has to move.
template <class T> void extendArray(std::uint64_t count, Orvan::Array<T>& array)
{
    if (count <= array.capacity)
        return array.resize(count, Orvan::kUninitialized);
    Orvan::Array<T> extended;
    extended.reserve(std::max(count, 2 * array.capacity));
    extended.resize(count, Orvan::kUninitialized);
    Modeling::copyElements(array.data, array.size, extended.data);
    array.swap(extended);
}

}
