#pragma once

#include "Arrays.h"

#include <algorithm>
#include <cstddef>

namespace Modeling {

/// Scratch memory for one value per corner of a polygon: inside the object, and so on the stack, for up to
/// `kStackCount` corners, otherwise on the heap. Heap memory grows on demand and is reused for later polygons.
template <class T, std::size_t kStackCount = 32> class CornerArray {
public:
    CornerArray() = default;
    CornerArray(CornerArray const&) = delete;
    CornerArray& operator=(CornerArray const&) = delete;

    /// Returns `count` elements with unspecified values. Invalidates what earlier calls returned.
    /// \throws std::bad_alloc  if the heap memory has to grow
    T* take(std::size_t count)
    {
        if (count <= kStackCount)
            return onStack_;
        if (count > onHeap_.size)
            onHeap_ = uninitializedArray<T>(std::max<std::uint64_t>(count, 2 * onHeap_.size));
        return onHeap_.data;
    }

private:
    T onStack_[kStackCount];
    Orvan::Array<T> onHeap_;
};

}
