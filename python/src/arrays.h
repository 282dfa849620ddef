#pragma once

#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Types.h>

#include <pybind11/numpy.h>

#include <fmt/format.h>

#include <cstring>
#include <memory>
#include <stdexcept>
#include <string>
#include <utility>

namespace ModelingPython {

namespace py = pybind11;

// Arrays from Python. The wrappers in Python convert and check them, so other types and shapes are faults of the caller.

template <class T> using Values = py::array_t<T, py::array::c_style>;

/// One value of the library per entry, or per row of three numbers.
template <class T, class Number> Orvan::Array<T> arrayOf(Values<Number> const& values)
{
    constexpr auto kColumns = static_cast<py::ssize_t>(sizeof(T) / sizeof(Number));
    bool const fits = kColumns == 1 ? values.ndim() == 1 : values.ndim() == 2 && values.shape(1) == kColumns;
    if (!fits)
        throw py::value_error("an array has the wrong shape");
    Orvan::Array<T> result(static_cast<std::uint64_t>(values.shape(0)), Orvan::kUninitialized);
    if (values.size() != 0)
        std::memcpy(
            static_cast<void*>(result.data), values.data(), static_cast<std::size_t>(values.size()) * sizeof(Number));
    if constexpr (std::is_same_v<Number, bool>) { // NumPy can view other bytes as bool
        auto* const byte = reinterpret_cast<unsigned char*>(result.data);
        std::transform(byte, byte + result.size, byte, [](unsigned char value) { return value != 0 ? 1 : 0; });
    }
    return result;
}

inline Orvan::Array<Tessara::Math::float3> pointsOf(Values<float> const& values)
{
    return arrayOf<Tessara::Math::float3>(values);
}

/// A NumPy array that has taken over the memory of these values: of `Number`s, one or three per value.
template <class Number, class T> py::array_t<Number> numbersOf(Orvan::Array<T> values)
{
    constexpr auto kColumns = static_cast<py::ssize_t>(sizeof(T) / sizeof(Number));
    auto held = std::make_unique<Orvan::Array<T>>(std::move(values));
    py::capsule const owner(held.get(), [](void* dying) { delete static_cast<Orvan::Array<T>*>(dying); });
    Orvan::Array<T> const& kept = *held.release();
    auto const* const data = reinterpret_cast<Number const*>(kept.data);
    auto const count = static_cast<py::ssize_t>(kept.size);
    if constexpr (kColumns == 1)
        return py::array_t<Number>(count, data, owner);
    else
        return py::array_t<Number>({count, kColumns}, data, owner);
}

/// Calls `visit(index)` for each index of an array of integers from 0 up to but excluding `count`.
/// \throws IndexError  before which some indices may have been visited
template <class Visit> void forEachIndex(Values<long long> const& indices, unsigned int count, Visit visit)
{
    long long const* const index = indices.data();
    py::ssize_t const size = indices.size();
    for (py::ssize_t i = 0; i != size; ++i) {
        if (index[i] < 0 || index[i] >= count)
            throw py::index_error(
                fmt::format("index {} is out of range: there are {} elements, counted from 0", index[i], count));
        visit(static_cast<unsigned int>(index[i]));
    }
}

/// A mask of elements, from a mask or from indices.
inline Orvan::Array<bool> maskOf(py::array const& selected, unsigned int count)
{
    if (selected.ndim() != 1)
        throw py::value_error("elements need a mask or indices in one dimension");
    if (py::isinstance<Values<bool>>(selected)) {
        if (selected.size() != py::ssize_t{count})
            throw py::index_error(
                fmt::format("the mask has {} entries, but there are {} elements", selected.size(), count));
        return arrayOf<bool>(py::cast<Values<bool>>(selected));
    }
    Orvan::Array<bool> mask(count);
    forEachIndex(py::cast<Values<long long>>(selected), count, [&](unsigned int i) { mask[i] = true; });
    return mask;
}

}
