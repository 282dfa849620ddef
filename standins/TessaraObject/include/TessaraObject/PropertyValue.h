#pragma once

#include <cstddef>
#include <memory>
#include <new>
#include <type_traits>
#include <typeinfo>
#include <utility>

namespace Tessara {

class PropertyValue;

/// What a property value can hold. Neither pointers nor arrays, so that a string literal is not stored as a pointer.
template <class T>
concept StorableValue = (!std::is_same_v<T, PropertyValue>)&&(!std::is_pointer_v<T>)&&(!std::is_null_pointer_v<T>)&&(
    !std::is_array_v<T>)&&std::is_copy_constructible_v<T>;

/// What an object stores under a key: either nothing or one value of one type.
///
/// Types are distinguished exactly: `unsigned int` is not `int`, and `T` is not `Orvan::Ptr<Orvan::Array<T>>`. A copy
/// of a held `Ptr` is one more reference, not a deep copy. Values of up to 32 bytes (every `Ptr`, every
/// `Orvan::String`) are stored inline, without an allocation; moving never fails.
class PropertyValue {
    static constexpr std::size_t kInlineBytes = 32;
    template <class T> static constexpr bool kInline = sizeof(T) <= kInlineBytes
        && alignof(T) <= alignof(std::max_align_t) && std::is_nothrow_move_constructible_v<T>;

public:
    PropertyValue() noexcept { }

    template <class T, StorableValue V = std::remove_cvref_t<T>>
    PropertyValue(T&& value) // implicit, for object.setProperty(key, value)
    {
        if constexpr (kInline<V>)
            ::new (static_cast<void*>(storage_)) V(std::forward<T>(value));
        else
            ::new (static_cast<void*>(storage_)) V*(new V(std::forward<T>(value)));
        operations_ = &kOperationsOf<V>;
    }

    PropertyValue(PropertyValue const& other)
    {
        if (other.operations_)
            other.operations_->copy(other.storage_, storage_);
        operations_ = other.operations_;
    }

    PropertyValue(PropertyValue&& other) noexcept { takeFrom(other); }

    PropertyValue& operator=(PropertyValue other) noexcept
    {
        reset();
        takeFrom(other);
        return *this;
    }

    ~PropertyValue() { reset(); }

    bool empty() const noexcept { return operations_ == nullptr; }

    /// The held value if its type is exactly `T`, otherwise null.
    template <class T> T const* get() const noexcept
    {
        // Compared by type, not by address: each shared library may have its own copy of the table.
        if (!operations_ || (operations_ != &kOperationsOf<T> && *operations_->type != typeid(T)))
            return nullptr;
        return static_cast<T const*>(operations_->address(storage_));
    }

    /// The type of the held value, `typeid(void)` if empty.
    std::type_info const& type() const noexcept { return operations_ ? *operations_->type : typeid(void); }

    /// If it holds an `Orvan::Ptr`, starts loading what that refers to into the caches, without waiting for it.
    void prefetch() const noexcept
    {
        if (operations_)
            operations_->prefetch(storage_);
    }

private:
    struct Operations {
        std::type_info const* type;
        void (*copy)(std::byte const* from, std::byte* to);
        void (*move)(std::byte* from, std::byte* to) noexcept; // leaves nothing to destroy in `from`
        void (*destroy)(std::byte* value) noexcept;
        void const* (*address)(std::byte const* value) noexcept;
        void (*prefetch)(std::byte const* value) noexcept;
    };

    template <class T> static T* held(std::byte const* storage) noexcept
    {
        auto* const bytes = const_cast<std::byte*>(storage);
        if constexpr (kInline<T>)
            return std::launder(reinterpret_cast<T*>(bytes));
        else
            return *std::launder(reinterpret_cast<T**>(bytes));
    }

    template <class T> static void copyHeld(std::byte const* from, std::byte* to)
    {
        if constexpr (kInline<T>)
            ::new (static_cast<void*>(to)) T(std::as_const(*held<T>(from)));
        else
            ::new (static_cast<void*>(to)) T*(new T(std::as_const(*held<T>(from))));
    }

    template <class T> static void moveHeld(std::byte* from, std::byte* to) noexcept
    {
        if constexpr (kInline<T>) {
            ::new (static_cast<void*>(to)) T(std::move(*held<T>(from)));
            std::destroy_at(held<T>(from));
        } else {
            ::new (static_cast<void*>(to)) T*(held<T>(from));
        }
    }

    template <class T> static void destroyHeld(std::byte* value) noexcept
    {
        if constexpr (kInline<T>)
            std::destroy_at(held<T>(value));
        else
            delete held<T>(value);
    }

    template <class T> static void const* addressOfHeld(std::byte const* value) noexcept { return held<T>(value); }

    template <class T> static void prefetchHeld(std::byte const* value) noexcept
    {
        if constexpr (requires { held<T>(value)->prefetch(); })
            held<T>(value)->prefetch();
    }

    template <class T> static constexpr Operations kOperationsOf{
        &typeid(T), &copyHeld<T>, &moveHeld<T>, &destroyHeld<T>, &addressOfHeld<T>, &prefetchHeld<T>};

    void takeFrom(PropertyValue& other) noexcept
    {
        if (other.operations_)
            other.operations_->move(other.storage_, storage_);
        operations_ = std::exchange(other.operations_, nullptr);
    }

    void reset() noexcept
    {
        if (operations_)
            std::exchange(operations_, nullptr)->destroy(storage_);
    }

    Operations const* operations_ = nullptr;
    alignas(std::max_align_t) std::byte storage_[kInlineBytes];
};

}
