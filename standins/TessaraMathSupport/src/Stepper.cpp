#include <TessaraMathSupport/Stepper.h>

#include <limits>

namespace Tessara::Math {

// Both comparisons are false for NaN.
Stepper::Stepper(float amount, float limit) noexcept
    : remainder_(amount > 0.0f ? amount : 0.0f)
    , limit_(limit > 0.0f ? limit : std::numeric_limits<float>::infinity())
{
}

void Stepper::advance() noexcept
{
    float const next = remainder_ - increment();
    remainder_ = next < remainder_ ? next : 0.0f; // otherwise the steps would never end
    ++stepCount_;
}

}
