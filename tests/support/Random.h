#pragma once

#include <TessaraMathSupport/Types.h>

#include <random>

namespace TestSupport {

/// Random numbers that are the same everywhere for one seed.
class Random {
public:
    explicit Random(unsigned int seed)
        : engine_(seed)
    {
    }

    unsigned int below(std::size_t bound) { return static_cast<unsigned int>(engine_() % bound); }
    /// From -1 up to but excluding 1, in steps that single precision holds.
    float coordinate() { return static_cast<float>(below(0x10000)) / 32768.0f - 1.0f; }
    Tessara::Math::float3 point(float reach = 1)
    {
        return {reach * coordinate(), reach * coordinate(), reach * coordinate()};
    }

private:
    std::mt19937 engine_;
};

}
