#pragma once

#include <TessaraMathSupport/Export.h>

namespace Tessara::Math {

/// Cuts an amount into steps of at most a limit: increments of `limit` while more than that remains, then what remains.
///
///     for (Stepper stepper(amount, 0.9f); stepper; stepper.step(logger))
///         move(stepper.increment());
///
/// The remainder is found by subtraction in single precision, so the increments of 2.7 by 0.9 are not three but those
/// that rounding gives. It ends after fewer than 2^25 steps in any case:
/// - an amount that is not above 0, or not a number, gives no step;
/// - a limit that is not above 0, or not a number, limits nothing: the amount is one step;
/// - where the subtraction no longer changes the remainder, since the amount is infinite or millions of times the
///   limit, the step at hand is the last one, and the rest is dropped.
///
/// The const operations may be called from any number of threads at once, but not during `step`.
class TESSARAMATHSUPPORT_EXPORT Stepper {
public:
    Stepper(float amount, float limit) noexcept;

    /// Whether a step is due.
    explicit operator bool() const noexcept { return remainder_ > 0.0f; }

    /// The increment of the step that is due; the same until `step` is called. 0 when none is due.
    float increment() const noexcept { return remainder_ > limit_ ? limit_ : remainder_; }

    /// Ends the step that is due, tells the logger (see Loggers.h), and goes to the next. Does nothing when none is
    /// due. When the logger throws, the step is ended all the same.
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
