#pragma once

#include "ElementLayout.h"

#include <OrvanCore/Array.h>

#include <bit>
#include <cmath>
#include <cstdint>
#include <utility>

namespace ModelingProgram {

/// Equal vectors have equal hashes, also 0 and -0.
template <class T> std::uint64_t hashOf(T const& value)
{
    using Scalar = typename ElementLayout<T>::Scalar;
    using Bits = std::conditional_t<sizeof(Scalar) == 4, std::uint32_t, std::uint64_t>;
    Scalar scalars[ElementLayout<T>::components];
    std::memcpy(scalars, &value, sizeof(T));
    std::uint64_t hash = 0;
    for (Scalar const scalar : scalars) {
        hash = (hash ^ std::bit_cast<Bits>(scalar + Scalar(0))) * 0x9E3779B97F4A7C15u; // -0 + 0 is 0
        hash ^= hash >> 32;
    }
    return hash;
}

/// Numbers distinct vectors in order of first appearance. 0 and -0 are equal.
template <class T> class Welder {
public:
    unsigned int numberOf(T const& value)
    {
        if (2 * values_.size >= slots_.size)
            grow();
        std::uint64_t slot = slotOf(value);
        for (; slots_[slot] != 0; slot = (slot + 1) & (slots_.size - 1)) {
            // Equal bits too: NaN differs from itself, and many of them would all be compared with one another.
            T const& known = values_[slots_[slot] - 1];
            if (known == value || std::memcmp(&known, &value, sizeof(T)) == 0)
                return slots_[slot] - 1;
        }
        values_.append(value);
        slots_[slot] = static_cast<unsigned int>(values_.size);
        return slots_[slot] - 1;
    }

    /// The same for positions. Those that are NaN or infinite are all different: they are left out later, and each one is
    /// counted.
    unsigned int numberOfPosition(T const& position)
    {
        if (std::isfinite(position.x) && std::isfinite(position.y) && std::isfinite(position.z))
            return numberOf(position);
        values_.append(position);
        return static_cast<unsigned int>(values_.size - 1);
    }

    Orvan::Array<T> const& values() const { return values_; }

private:
    std::uint64_t slotOf(T const& value) const { return hashOf(value) & (slots_.size - 1); }

    void grow()
    {
        Orvan::Array<unsigned int> const known = std::move(slots_);
        slots_ = Orvan::Array<unsigned int>(known.empty() ? 1024 : 2 * known.size);
        for (unsigned int const number : known) {
            if (number == 0)
                continue;
            std::uint64_t slot = slotOf(values_[number - 1]);
            while (slots_[slot] != 0)
                slot = (slot + 1) & (slots_.size - 1);
            slots_[slot] = number;
        }
    }

    Orvan::Array<T> values_;
    // Hash table with open addressing: a number plus one, or 0. The size is a power of two, and at most half is in use.
    Orvan::Array<unsigned int> slots_;
};

}
