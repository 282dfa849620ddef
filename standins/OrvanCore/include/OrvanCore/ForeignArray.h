#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>

#include <cstdint>
#include <type_traits>
#include <utility>

namespace Orvan {

namespace Internal {

    template <class T, class Owner> class ForeignArrayBlock final : public ControlBlock<Array<T>> {
    public:
        ForeignArrayBlock(T const* data, std::uint64_t size, Owner&& owner)
            : ControlBlock<Array<T>>(1) // the owner also refers to the memory
            , owner_(std::move(owner))
        {
            array.data = const_cast<T*>(data); // never written: nobody can make the array mutable
            array.size = array.capacity = size;
        }

        Ptr<Array<T>> clone(Array<T> const& source) const override { return makePtr<Array<T>>(source); }

        void dispose() noexcept override
        {
            array.data = nullptr;
            array.size = array.capacity = 0;
            delete this;
        }

        Array<T> array;

    private:
        Owner owner_;
    };

}

/// A shared array whose elements are in the memory of someone else: an array of another language, a mapped file. The
/// memory is not copied, and it is neither written, nor grown, nor freed.
///
/// The owner of the memory counts as one more reference for as long as the array exists, so that copy on write needs no
/// new rule: `useCount` is at least 2, and `makeMutable` always copies. All a host has to offer is such a count.
///
/// \param data   Aligned for `T`. Nobody may write these elements before `owner` is destroyed.
/// \param owner  Keeps the memory. It is moved in and destroyed with the last reference, on the thread that releases it;
///               its destructor must not throw.
/// \throws std::bad_alloc
template <class T, class Owner> Ptr<Array<T>> makeForeignArray(T const* data, std::uint64_t count, Owner owner)
{
    static_assert(std::is_trivially_copyable_v<T> && std::is_nothrow_destructible_v<Owner>);
    auto* const block = new Internal::ForeignArrayBlock<T, Owner>(data, count, std::move(owner));
    return Internal::FirstReference::make(&block->array, block);
}

}
