#pragma once

#include "Report.h"

#include <chrono>
#include <cstdint>
#include <string>

namespace ModelingProgram {

/// A part of a command during its lifetime: its time is added to the report, and progress shows its title. Phases may be
/// nested; time counts for the innermost one. A phase within one of the same kind of time does not show up in progress.
class Phase {
public:
    /// \param title  the name of the command or step if empty
    /// \param unit, total  as for `WorkMeter::begin`
    Phase(Report& report, double Times::*kind, std::string const& title = {}, char const* unit = nullptr,
        std::uint64_t total = 0);
    Phase(Phase const&) = delete;
    Phase& operator=(Phase const&) = delete;
    ~Phase();

private:
    friend Times timesOf(Report const& report);

    void count(std::chrono::steady_clock::time_point now, Times& times) const;

    Report& report_;
    double Times::*kind_;
    std::string title_;
    Phase* outer_;
    std::chrono::steady_clock::time_point start_;
};

/// The times so far.
Times timesOf(Report const& report);

}
