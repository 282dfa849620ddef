#pragma once

#include <TessaraMathSupport/Export.h>

#include <functional>

namespace CoreGL {

// A logger is a class with the one operation `logStep`, which is told of each finished step: its number from 1, its
// increment, and what remains after it. A line reads "step 3: 0.9, 1.25 remain", with the shortest digits that give the
// same float, in any locale. All loggers may be used from any number of threads at once.

/// Says nothing, and costs nothing.
class NOPLogger {
public:
    void logStep(unsigned int, float, float) const noexcept { }
};

/// Writes a line a step to standard output. Lines of several threads do not mix.
class TESSARAMATHSUPPORT_EXPORT ConsoleLogger {
public:
    void logStep(unsigned int number, float increment, float remainder) const;
};

/// Hands a line a step, without a line end, to the sink of the host program; there is one for the whole process.
/// Without a sink nothing happens.
class TESSARAMATHSUPPORT_EXPORT OrvanLogger {
public:
    /// The text is valid during the call only. What a sink throws reaches the caller of `Stepper::step`.
    using Sink = std::function<void(char const* line)>;

    /// An empty sink ends the output. Sinks are called one call at a time, and when `setSink` returns the old one is no
    /// longer running and will not be called again. A sink must not call `setSink` or log itself.
    static void setSink(Sink sink);

    void logStep(unsigned int number, float increment, float remainder) const;
};

}
