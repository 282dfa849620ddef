#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <utility>

namespace Tessara {
class Object;
}

namespace Orvan {

template <class T> class Array;
template <class T> class Ptr;
template <class T> class MutablePtr;
template <class T> MutablePtr<T> makeMutable(Ptr<T>&& shared);

namespace Internal {

    // What a host holds in a `Ptr`: objects and arrays, and nothing else.
    template <class T> inline constexpr bool kIsHeldByPtr = false;
    template <> inline constexpr bool kIsHeldByPtr<Tessara::Object> = true;
    template <class T> inline constexpr bool kIsHeldByPtr<Array<T>> = true;

    template <class T> class ControlBlock {
    public:
        virtual Ptr<T> clone(T const& value) const = 0;
        virtual void dispose() noexcept = 0;

        std::atomic<std::uint64_t> count = 1;

    protected:
        ~ControlBlock() = default;
    };

    /// A value and its control block. They are one reference of a `Ptr` or `MutablePtr`, which hide how many there are.
    template <class T> class Reference {
        static_assert(kIsHeldByPtr<T>);

    public:
        Reference() = default;
        Reference(T* held, ControlBlock<T>* its) noexcept
            : value(held)
            , control(its)
        {
        }
        Reference(Reference const& other) noexcept
            : Reference(other.value, other.control)
        {
            if (control)
                control->count.fetch_add(1, std::memory_order_relaxed);
        }
        Reference(Reference&& other) noexcept
            : value(std::exchange(other.value, nullptr))
            , control(std::exchange(other.control, nullptr))
        {
        }
        Reference& operator=(Reference other) noexcept
        {
            std::swap(value, other.value);
            std::swap(control, other.control);
            return *this;
        }
        ~Reference()
        {
            if (control && control->count.fetch_sub(1, std::memory_order_acq_rel) == 1)
                control->dispose();
        }

        T* value = nullptr;
        ControlBlock<T>* control = nullptr;
    };

}

template <class T> class Ptr {
public:
    Ptr() noexcept = default;
    Ptr(std::nullptr_t) noexcept { }
    Ptr(MutablePtr<T>&& other) noexcept;

    T const* get() const noexcept { return reference_.value; }
    T const& operator*() const noexcept { return *reference_.value; }
    T const* operator->() const noexcept { return reference_.value; }
    explicit operator bool() const noexcept { return reference_.value; }

private:
    template <class U> friend MutablePtr<U> makeMutable(Ptr<U>&& shared);

    Internal::Reference<T> reference_;
};

template <class T> class MutablePtr {
public:
    MutablePtr() noexcept = default;
    MutablePtr(std::nullptr_t) noexcept { }
    MutablePtr(MutablePtr&&) noexcept = default;
    MutablePtr& operator=(MutablePtr&&) noexcept = default;

    template <class... Arguments> static MutablePtr make(Arguments&&... arguments)
    {
        auto* const owned = new Owned(std::forward<Arguments>(arguments)...);
        return MutablePtr(Internal::Reference<T>(&owned->value, owned));
    }

    T* get() const noexcept { return reference_.value; }
    T& operator*() const noexcept { return *reference_.value; }
    T* operator->() const noexcept { return reference_.value; }
    explicit operator bool() const noexcept { return reference_.value; }

private:
    friend class Ptr<T>;
    template <class U> friend MutablePtr<U> makeMutable(Ptr<U>&& shared);

    class Owned final : public Internal::ControlBlock<T> {
    public:
        template <class... Arguments> explicit Owned(Arguments&&... arguments)
            : value(std::forward<Arguments>(arguments)...)
        {
        }
        Ptr<T> clone(T const& source) const override { return make(source); }
        void dispose() noexcept override { delete this; }

        T value;
    };

    explicit MutablePtr(Internal::Reference<T>&& reference) noexcept
        : reference_(std::move(reference))
    {
    }

    Internal::Reference<T> reference_;
};

template <class T> Ptr<T>::Ptr(MutablePtr<T>&& other) noexcept
    : reference_(std::move(other.reference_))
{
}

template <class T> MutablePtr<T> makeMutable(Ptr<T>&& shared)
{
    Internal::ControlBlock<T> const* const control = shared.reference_.control;
    if (control && control->count.load(std::memory_order_acquire) != 1)
        shared = control->clone(*shared);
    return MutablePtr<T>(std::move(shared.reference_));
}

template <class T, class... Arguments> Ptr<T> makePtr(Arguments&&... arguments)
{
    return MutablePtr<T>::make(std::forward<Arguments>(arguments)...);
}

}
