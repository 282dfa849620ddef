#pragma once

#include <cstddef>

namespace TSR::TileTree3D {

/// A view of the values of a cube of `side`³ voxels, x fastest; may be empty.
template <class T, int side, int> class ConstTileData {
public:
    ConstTileData() noexcept = default;
    /// \param firstCoordinate  of the first voxel along all axes: -1 if the tile has a layer all around
    explicit ConstTileData(T const* values, int firstCoordinate = 0) noexcept
        : values_(values)
        , first_(firstCoordinate)
    {
    }

    explicit operator bool() const noexcept { return values_; }
    T operator()(int linearIndex) const noexcept { return values_[linearIndex]; }
    T operator()(int i, int j, int k) const noexcept
    {
        return values_[i - first_ + (j - first_ + (k - first_) * side) * side];
    }
    T const* values() const noexcept { return values_; }

private:
    T const* values_ = nullptr;
    int first_ = 0;
};

/// The same with its own storage. Empty if default-constructed.
template <class T, int side, int> class TileData {
public:
    static constexpr int kVoxelCount = side * side * side;

    TileData() noexcept { } // leaves the storage uninitialized
    /// All values are uninitialized.
    explicit TileData(int firstCoordinate) noexcept
        : first_(firstCoordinate)
        , hasValues_(true)
    {
    }

    explicit operator bool() const noexcept { return hasValues_; }
    T& operator()(int linearIndex) noexcept { return values_[linearIndex]; }
    T operator()(int linearIndex) const noexcept { return values_[linearIndex]; }
    T& operator()(int i, int j, int k) noexcept { return values_[indexOf(i, j, k)]; }
    T operator()(int i, int j, int k) const noexcept { return values_[indexOf(i, j, k)]; }
    T const* values() const noexcept { return values_; }

    /// A view of the current values, valid as long as this object.
    operator ConstTileData<T, side, 0>() const noexcept
    {
        return hasValues_ ? ConstTileData<T, side, 0>(values_, first_) : ConstTileData<T, side, 0>();
    }

    /// For reuse: `reset` leaves the values uninitialized, `clear` leaves none.
    void reset(int firstCoordinate) noexcept
    {
        first_ = firstCoordinate;
        hasValues_ = true;
    }
    void clear() noexcept { hasValues_ = false; }

private:
    int indexOf(int i, int j, int k) const noexcept { return i - first_ + (j - first_ + (k - first_) * side) * side; }

    T values_[kVoxelCount];
    int first_ = 0;
    bool hasValues_ = false;
};

}
