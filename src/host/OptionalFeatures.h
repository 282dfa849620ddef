#pragma once

#include <cstdint>

namespace Modeling {

// What a host may offer beyond its interface. The library asks at compile time, and does without if the answer is no.

/// Whether more than `known` references to a shared array or object exist, so that others would see an edit in place. If
/// the host does not tell how many there are (`useCount`), the answer is yes.
template <class Pointer> bool mayBeShared(Pointer const& pointer, std::uint64_t known)
{
    if constexpr (requires { pointer.useCount(); })
        return pointer.useCount() > known;
    else
        return true;
}

/// Whether a property value is known to hold nothing. If the host does not tell (`empty`), every type has to be tried.
template <class Value> bool isKnownToBeEmpty(Value const& value)
{
    if constexpr (requires { value.empty(); })
        return value.empty();
    else
        return false;
}

}
