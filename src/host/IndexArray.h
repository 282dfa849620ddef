#pragma once

#include <OrvanCore/Array.h>

#include <cstddef>
#include <cstdint>
#include <span>

namespace Modeling {

/// Indices of points, corners, faces or other elements, or offsets into an array of them.
using IndexArray = Orvan::Array<unsigned int>;

/// Offsets that divide an array into one part per element, as they divide the corners of a mesh into faces. The part of
/// an element runs from its own offset up to but excluding the next one, so there is one more offset than there are
/// elements.
///
/// A view: the offsets must outlive it. Loop bodies capture it by value, like a pointer.
class OffsetView {
public:
    OffsetView(IndexArray const& offsets)
        : offset_(offsets.data)
    {
    }

    unsigned int begin(std::size_t element) const { return offset_[element]; }
    unsigned int end(std::size_t element) const { return offset_[element + 1]; }
    unsigned int size(std::size_t element) const { return end(element) - begin(element); }

    /// The size of a part, or 0 if its offsets decrease or lead beyond the `total` entries of the divided array.
    unsigned int sizeWithin(std::uint64_t total, std::size_t element) const
    {
        return begin(element) <= end(element) && end(element) <= total ? size(element) : 0;
    }

    /// The part of an element in the divided array.
    template <class T> std::span<T> part(std::size_t element, T* values) const
    {
        return {values + begin(element), size(element)};
    }

private:
    unsigned int const* offset_;
};

}
