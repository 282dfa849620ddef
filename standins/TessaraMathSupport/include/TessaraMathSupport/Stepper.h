#pragma once

#include <TessaraMathSupport/Export.h>

namespace Tessara::Math {

/// Splits an amount into increments: `limit` as long as more than that remains, then the remainder.
///
///     for (Stepper stepper(amount, 0.9f); stepper; stepper.step(logger))
///         move(stepper.increment());
///
/// The remainder is computed by subtraction in single precision, so that rounding can add a step: 2.7 by 0.9 takes
/// four. There are always fewer than 2^25 steps:
/// - an amount that is not positive, or NaN, gives no step;
/// - a limit that is not positive, or NaN, limits nothing: the amount is one step;
/// - if the subtraction no longer changes the remainder, because the amount is infinite or millions of times the limit,
///   the current step is the last one, and the rest is dropped.
///
/// Any number of threads may call the const operations at once, but not during `step`.
class TESSARAMATHSUPPORT_EXPORT Stepper {
public:
    Stepper(float amount, float limit) noexcept;

    /// Whether a step is due.
    explicit operator bool() const noexcept { return remainder_ > 0.0f; }

    /// The increment of the step that is due; the same until `step` is called. 0 if none is due.
    float increment() const noexcept { return remainder_ > limit_ ? limit_ : remainder_; }

    /// Completes the step that is due, and logs it (see Loggers.h). Does nothing if none is due. If the logger throws,
    /// the step is complete nevertheless.
    template <class Logger> void step(Logger const& logger)
    {
        if (!*this)
            return;
        float const done = increment();
        advance();
        logger.logStep(stepCount_, done, remainder_);
    }

private:
    void advance() noexcept;

    float remainder_;
    float limit_;
    unsigned int stepCount_ = 0;
};

}
