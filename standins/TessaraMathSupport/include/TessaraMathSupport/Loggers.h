#pragma once

#include <TessaraMathSupport/Export.h>

#include <functional>

namespace CoreGL {

// A logger is a class with one operation, `logStep`, which is called after each step with its number, counted from 1,
// its increment, and the remainder. A line reads "step 3: 0.9, 1.25 remain", with the shortest digits that identify the
// float, in any locale. Any number of threads may use a logger at once.

/// Logs nothing, at no cost.
class NOPLogger {
public:
    void logStep(unsigned int, float, float) const noexcept { }
};

/// Writes one line per step to standard output. Lines of different threads are not interleaved.
class TESSARAMATHSUPPORT_EXPORT ConsoleLogger {
public:
    void logStep(unsigned int number, float increment, float remainder) const;
};

/// Passes one line per step, without a line end, to the sink of the host program. There is one sink per process;
/// without it, nothing is logged.
class TESSARAMATHSUPPORT_EXPORT OrvanLogger {
public:
    /// The line is valid only during the call. An exception of the sink reaches the caller of `Stepper::step`.
    using Sink = std::function<void(char const* line)>;

    /// An empty sink turns logging off. Sink calls are serialized. Once `setSink` has returned, the old sink is not
    /// running and will not be called again. A sink must not call `setSink` or a logger.
    static void setSink(Sink sink);

    void logStep(unsigned int number, float increment, float remainder) const;
};

}
