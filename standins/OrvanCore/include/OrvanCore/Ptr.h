#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <type_traits>
#include <utility>

namespace Orvan {

template <class T> class Ptr;
template <class T> class MutablePtr;

namespace Internal {

    /// Counts the references to one shared value, and knows how to copy and destroy it.
    template <class T> class ControlBlock {
    public:
        virtual Ptr<T> clone(T const& value) const = 0; ///< A copy of the value, with one reference.
        virtual void dispose() noexcept = 0; ///< Destroys the value and this block.

        /// References that are not a `Ptr` and are never released. With one of them a value always counts as shared.
        std::uint64_t const permanent;
        std::atomic<std::uint64_t> count;

    protected:
        explicit ControlBlock(std::uint64_t permanentReferences = 0)
            : permanent(permanentReferences)
            , count(permanentReferences + 1)
        {
        }
        ~ControlBlock() = default;
    };

    /// Makes the first reference to a value whose control block another header defines.
    struct FirstReference {
        template <class T> static Ptr<T> make(T* value, ControlBlock<T>* control) noexcept
        {
            Ptr<T> reference;
            reference.value_ = value;
            reference.control_ = control;
            return reference;
        }
    };

    /// Contains the value, so that a shared value needs only one allocation.
    template <class T> class InlineControlBlock final : public ControlBlock<T> {
    public:
        template <class... Arguments> explicit InlineControlBlock(Arguments&&... arguments)
            : value(std::forward<Arguments>(arguments)...)
        {
        }

        Ptr<T> clone(T const& source) const override;
        void dispose() noexcept override { delete this; }

        T value;
    };

    template <class T> void retain(ControlBlock<T>* control) noexcept
    {
        if (control)
            control->count.fetch_add(1, std::memory_order_relaxed);
    }

    template <class T> void release(ControlBlock<T>* control) noexcept
    {
        if (!control)
            return;
        std::uint64_t const last = control->permanent + 1; // not read later: another thread may release the block
        if (control->count.fetch_sub(1, std::memory_order_acq_rel) == last)
            control->dispose();
    }

}

/// A reference to a shared, immutable value. Null by default; null has no control block.
///
/// The count is atomic: references to one value may be copied and released on any thread. One `Ptr` must not be written
/// while another thread reads or writes it.
template <class T> class Ptr {
public:
    Ptr() noexcept = default;
    Ptr(std::nullptr_t) noexcept { }
    Ptr(Ptr const& other) noexcept
        : value_(other.value_)
        , control_(other.control_)
    {
        Internal::retain(control_);
    }
    Ptr(Ptr&& other) noexcept
        : value_(std::exchange(other.value_, nullptr))
        , control_(std::exchange(other.control_, nullptr))
    {
    }
    Ptr(MutablePtr<T>&& other) noexcept;
    Ptr& operator=(Ptr other) noexcept
    {
        std::swap(value_, other.value_);
        std::swap(control_, other.control_);
        return *this;
    }
    ~Ptr() { Internal::release(control_); }

    T const* get() const noexcept { return value_; }
    T const& operator*() const noexcept { return *value_; }
    T const* operator->() const noexcept { return value_; }
    explicit operator bool() const noexcept { return value_ != nullptr; }

    /// The number of references; 0 for null. Exact only while no other thread copies or releases one.
    std::uint64_t useCount() const noexcept { return control_ ? control_->count.load(std::memory_order_acquire) : 0; }

    /// Starts loading the value and the count into the caches, without waiting for them.
    void prefetch() const noexcept
    {
        if (!value_)
            return;
        __builtin_prefetch(control_);
        __builtin_prefetch(value_);
        __builtin_prefetch(reinterpret_cast<char const*>(value_ + 1) - 1);
    }

    /// Compares identity, not values.
    friend bool operator==(Ptr const& a, Ptr const& b) noexcept { return a.value_ == b.value_; }

private:
    friend class MutablePtr<T>;
    friend struct Internal::FirstReference;
    template <class U> friend MutablePtr<U> makeMutable(Ptr<U>&& shared);

    T* value_ = nullptr;
    Internal::ControlBlock<T>* control_ = nullptr;
};

/// The only reference to a value, which may therefore be changed. Can be moved into a `Ptr`.
template <class T> class MutablePtr {
public:
    MutablePtr() noexcept = default;
    MutablePtr(std::nullptr_t) noexcept { }
    MutablePtr(MutablePtr&& other) noexcept
        : value_(std::exchange(other.value_, nullptr))
        , control_(std::exchange(other.control_, nullptr))
    {
    }
    MutablePtr& operator=(MutablePtr&& other) noexcept
    {
        MutablePtr taken(std::move(other));
        std::swap(value_, taken.value_);
        std::swap(control_, taken.control_);
        return *this;
    }
    ~MutablePtr() { Internal::release(control_); }

    /// A new value, constructed from the arguments.
    template <class... Arguments> static MutablePtr make(Arguments&&... arguments)
    {
        auto* const control = new Internal::InlineControlBlock<T>(std::forward<Arguments>(arguments)...);
        return MutablePtr(&control->value, control);
    }

    T* get() const noexcept { return value_; }
    T& operator*() const noexcept { return *value_; }
    T* operator->() const noexcept { return value_; }
    explicit operator bool() const noexcept { return value_ != nullptr; }

private:
    friend class Ptr<T>;
    template <class U> friend MutablePtr<U> makeMutable(Ptr<U>&& shared);

    MutablePtr(T* value, Internal::ControlBlock<T>* control) noexcept
        : value_(value)
        , control_(control)
    {
    }

    T* value_ = nullptr;
    Internal::ControlBlock<T>* control_ = nullptr;
};

template <class T> Ptr<T>::Ptr(MutablePtr<T>&& other) noexcept
    : value_(std::exchange(other.value_, nullptr))
    , control_(std::exchange(other.control_, nullptr))
{
}

/// Makes a shared value mutable (copy on write) and sets `shared` to null. Returns the value itself if `shared` was the
/// only reference, otherwise a copy made by the copy constructor of `T`. Returns null for null.
/// \throws  Whatever copying throws, with `shared` unchanged.
template <class T> MutablePtr<T> makeMutable(Ptr<T>&& shared)
{
    if (!shared.control_) {
        shared.value_ = nullptr;
        return {};
    }
    // Acquire: what other threads did before they released their references happens before our edits.
    if (shared.control_->count.load(std::memory_order_acquire) != 1) {
        Ptr<T> copy = shared.control_->clone(*shared.value_);
        shared = std::move(copy);
    }
    return MutablePtr<T>(std::exchange(shared.value_, nullptr), std::exchange(shared.control_, nullptr));
}

template <class T> Ptr<T> Internal::InlineControlBlock<T>::clone(T const& source) const
{
    return MutablePtr<T>::make(source);
}

/// A new shared value, constructed from the arguments.
template <class T, class... Arguments> Ptr<T> makePtr(Arguments&&... arguments)
{
    return MutablePtr<T>::make(std::forward<Arguments>(arguments)...);
}

}
