#pragma once

namespace TSR::TileTree3D {

/// The values of a cube of voxels, x fastest, of which only copies are given.
template <class T, int side, int> class ConstTileData {
public:
    ConstTileData() = default;
    explicit ConstTileData(T const* values)
        : values_(values)
    {
    }
    operator bool() const { return values_; }
    T operator()(int index) const { return values_[index]; }
    T operator()(int i, int j, int k) const { return values_[i + (j + k * side) * side]; }

private:
    T const* values_ = nullptr;
};

template <class T, int side, int> class TileData {
public:
    TileData() = default;
    explicit TileData(int firstCoordinate)
        : first_(firstCoordinate)
    {
    }
    T& operator()(int i, int j, int k) { return values_[i - first_ + (j - first_ + (k - first_) * side) * side]; }
    T operator()(int i, int j, int k) const { return values_[i - first_ + (j - first_ + (k - first_) * side) * side]; }

private:
    int first_ = 0;
    T values_[side * side * side] = {};
};

}
