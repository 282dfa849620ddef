#pragma once

#include <OrvanCore/UntypedTypeRep.h>

#include <algorithm>
#include <limits>
#include <memory>
#include <new>
#include <type_traits>
#include <utility>

namespace Orvan {

struct Uninitialized { };
inline constexpr Uninitialized kUninitialized{};

template <class T> class Array {
public:
    T* data = nullptr;
    std::uint64_t size = 0;
    std::uint64_t capacity = 0;
    Internal::UntypedTypeRep rep{sizeof(T), alignof(T)};

    Array() noexcept = default;
    explicit Array(std::uint64_t count)
    {
        reserve(count);
        resize(count);
    }
    Array(std::uint64_t count, Uninitialized)
    {
        reserve(count);
        resize(count, kUninitialized);
    }
    Array(Array const& other)
    {
        Array copy;
        copy.reserve(other.size);
        for (T const& element : other)
            copy.append(element);
        swap(copy);
    }
    Array(Array&& other) noexcept { swap(other); }
    Array& operator=(Array other) noexcept
    {
        swap(other);
        return *this;
    }
    ~Array()
    {
        clear();
        rep.deallocate(data, capacity);
    }

    T& operator[](std::uint64_t index) noexcept { return data[index]; }
    T const& operator[](std::uint64_t index) const noexcept { return data[index]; }
    T* begin() noexcept { return data; }
    T* end() noexcept { return data + size; }
    T const* begin() const noexcept { return data; }
    T const* end() const noexcept { return data + size; }
    bool empty() const noexcept { return size == 0; }

    void reserve(std::uint64_t count)
    {
        if (count <= capacity)
            return;
        T* const moved = static_cast<T*>(rep.allocate(count));
        std::uninitialized_move_n(data, size, moved);
        std::destroy_n(data, size);
        rep.deallocate(data, capacity);
        data = moved;
        capacity = count;
    }
    void resize(std::uint64_t count)
    {
        std::uint64_t const before = size;
        resize(count, kUninitialized);
        if constexpr (std::is_trivially_default_constructible_v<T>)
            std::fill(data + std::min(before, count), data + count, T{});
    }
    void resize(std::uint64_t count, Uninitialized)
    {
        if (count > size) {
            makeRoomFor(count - size);
            std::uninitialized_default_construct(data + size, data + count);
        } else {
            std::destroy(data + count, data + size);
        }
        size = count;
    }
    void append(T element)
    {
        makeRoomFor(1);
        ::new (static_cast<void*>(data + size)) T(std::move(element));
        ++size;
    }
    void clear() noexcept
    {
        std::destroy_n(data, size);
        size = 0;
    }
    void swap(Array& other) noexcept
    {
        std::swap(data, other.data);
        std::swap(size, other.size);
        std::swap(capacity, other.capacity);
    }

private:
    void makeRoomFor(std::uint64_t count)
    {
        if (capacity - size >= count)
            return;
        std::uint64_t const growth = std::max(capacity, count);
        if (growth > std::numeric_limits<std::uint64_t>::max() - capacity)
            throw std::bad_alloc();
        reserve(capacity + growth);
    }
};

}
