#pragma once

#include <TessaraMathSupport/Types.h>

#include <random>
#include <ranges>
#include <utility>

namespace TestSupport {

/// Random numbers that depend on the seed only, not on the platform.
class Random {
public:
    explicit Random(unsigned int seed)
        : engine_(seed)
    {
    }

    unsigned int below(std::size_t bound) { return static_cast<unsigned int>(engine_() % bound); }
    /// From -1 up to but excluding 1, exact in single precision.
    float coordinate() { return static_cast<float>(below(0x10000)) / 32768.0f - 1.0f; }
    Tessara::Math::float3 point(float reach = 1)
    {
        return {reach * coordinate(), reach * coordinate(), reach * coordinate()};
    }
    /// Written out, because standard libraries shuffle differently.
    template <class Values> void shuffle(Values& values)
    {
        for (std::size_t i = std::ranges::size(values); i > 1; --i)
            std::swap(values[i - 1], values[below(i)]);
    }

private:
    std::mt19937 engine_;
};

}
