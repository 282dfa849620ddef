#pragma once

#include <OrvanCore/UntypedTypeRep.h>

#include <algorithm>
#include <cstring>
#include <initializer_list>
#include <limits>
#include <memory>
#include <new>
#include <span>
#include <type_traits>
#include <utility>

namespace Orvan {

/// Asks a sizing operation of `Array` to leave new elements of trivial types uninitialized.
struct Uninitialized { };
inline constexpr Uninitialized kUninitialized{};

/// The runtime's growable array: four plain fields, and the operations that keep them consistent.
///
/// `data` has room for `capacity` elements, of which the first `size` are constructed. If adding n elements exceeds the
/// capacity, it grows to `capacity + max(capacity, n)`. Shrinking only lowers `size`.
/// New elements are value-initialized (zero for numbers) unless `kUninitialized` is passed; elements of types that
/// need a constructor are always constructed. Each `bool` element is a byte.
///
/// Copies are deep. Several threads may read one array, or write different elements of it.
/// \throws std::bad_alloc  from every operation that may grow; the array then holds the same elements as before.
template <class T> class Array {
    static_assert(std::is_nothrow_move_constructible_v<T>, "growing must not fail halfway");
    static constexpr bool kTrivial = std::is_trivially_copyable_v<T> && std::is_trivially_default_constructible_v<T>;

public:
    T* data = nullptr;
    std::uint64_t size = 0;
    std::uint64_t capacity = 0;
    Internal::UntypedTypeRep rep = Internal::UntypedTypeRep::of<T>();

    Array() noexcept = default;

    explicit Array(std::uint64_t count)
        : Array(count, [](T* first, T* last) { std::uninitialized_value_construct(first, last); })
    {
    }

    Array(std::uint64_t count, Uninitialized)
        : Array(count, [](T* first, T* last) { std::uninitialized_default_construct(first, last); })
    {
    }

    Array(std::uint64_t count, T const& value)
        : Array(count, [&](T* first, T* last) { std::uninitialized_fill(first, last, value); })
    {
    }

    explicit Array(std::span<T const> elements)
        : Array(elements.size(), [&](T* first, T*) { constructCopies(elements.data(), elements.size(), first); })
    {
    }

    Array(std::initializer_list<T> elements)
        : Array(std::span<T const>(elements.begin(), elements.size()))
    {
    }

    Array(Array const& other)
        : Array(std::span<T const>(other.data, other.size))
    {
    }

    Array(Array&& other) noexcept { swap(other); }

    /// Reuses the storage if it is large enough and the elements are trivial. Otherwise copies into new storage first,
    /// so that a copy that fails changes nothing.
    Array& operator=(Array const& other)
    {
        if (this == &other)
            return *this;
        if (!kTrivial || capacity < other.size) {
            Array copy(other);
            swap(copy);
        } else {
            size = other.size;
            constructCopies(other.data, other.size, data);
        }
        return *this;
    }

    Array& operator=(Array&& other) noexcept
    {
        Array taken(std::move(other));
        swap(taken);
        return *this;
    }

    ~Array()
    {
        std::destroy_n(data, size);
        rep.deallocate(data, capacity);
    }

    void swap(Array& other) noexcept
    {
        std::swap(data, other.data);
        std::swap(size, other.size);
        std::swap(capacity, other.capacity);
    }

    T& operator[](std::uint64_t index) noexcept { return data[index]; }
    T const& operator[](std::uint64_t index) const noexcept { return data[index]; }
    T* begin() noexcept { return data; }
    T* end() noexcept { return data + size; }
    T const* begin() const noexcept { return data; }
    T const* end() const noexcept { return data + size; }
    bool empty() const noexcept { return size == 0; }

    /// Raises the capacity to exactly `count` if it is lower; never shrinks.
    void reserve(std::uint64_t count)
    {
        if (count > capacity)
            moveTo(count);
    }

    void resize(std::uint64_t count)
    {
        resizeWith(count, [](T* first, T* last) { std::uninitialized_value_construct(first, last); });
    }

    void resize(std::uint64_t count, Uninitialized)
    {
        resizeWith(count, [](T* first, T* last) { std::uninitialized_default_construct(first, last); });
    }

    void append(T element) // by value: it may be an element of this array
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

    friend bool operator==(Array const& a, Array const& b)
    {
        return a.size == b.size && std::equal(a.begin(), a.end(), b.begin());
    }

private:
    /// Owns new storage until its elements are constructed.
    struct Storage {
        Internal::UntypedTypeRep rep;
        std::uint64_t count;
        T* data;

        Storage(Internal::UntypedTypeRep const& elementRep, std::uint64_t elementCount)
            : rep(elementRep)
            , count(elementCount)
            , data(static_cast<T*>(rep.allocate(count)))
        {
        }
        Storage(Storage const&) = delete;
        Storage& operator=(Storage const&) = delete;
        ~Storage() { rep.deallocate(data, count); }

        T* release() noexcept { return std::exchange(data, nullptr); }
    };

    template <class Construct>
    requires std::is_invocable_v<Construct, T*, T*> Array(std::uint64_t count, Construct const& construct)
    {
        Storage storage(rep, count);
        construct(storage.data, storage.data + count);
        data = storage.release();
        size = capacity = count;
    }

    static void constructCopies(T const* source, std::uint64_t count, T* target)
    {
        if constexpr (kTrivial) {
            if (count != 0)
                std::memcpy(static_cast<void*>(target), source, count * sizeof(T));
        } else {
            std::uninitialized_copy_n(source, count, target);
        }
    }

    template <class Construct> void resizeWith(std::uint64_t count, Construct const& construct)
    {
        if (count > size) {
            makeRoomFor(count - size);
            construct(data + size, data + count);
        } else {
            std::destroy(data + count, data + size);
        }
        size = count;
    }

    void makeRoomFor(std::uint64_t added)
    {
        if (capacity - size >= added)
            return;
        std::uint64_t const growth = std::max(capacity, added);
        if (growth > std::numeric_limits<std::uint64_t>::max() - capacity)
            throw std::bad_alloc();
        moveTo(capacity + growth);
    }

    void moveTo(std::uint64_t newCapacity)
    {
        Storage storage(rep, newCapacity);
        if constexpr (kTrivial) {
            constructCopies(data, size, storage.data);
        } else {
            std::uninitialized_move_n(data, size, storage.data);
            std::destroy_n(data, size);
        }
        rep.deallocate(data, capacity);
        data = storage.release();
        capacity = newCapacity;
    }
};

}
