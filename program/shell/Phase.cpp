#include "Phase.h"

#include "Progress.h"
#include "files/WorkMeter.h"

namespace ModelingProgram {

using Clock = std::chrono::steady_clock;

Phase::Phase(Report& report, double Times::*kind, std::string const& title, char const* unit, std::uint64_t total)
    : report_(report)
    , kind_(kind)
    , title_(report.titleOf(title))
    , outer_(std::exchange(report.phase, this))
    , start_(Clock::now())
{
    if (outer_)
        outer_->count(start_, report.times);
    if (outer_ && outer_->kind_ == kind)
        return;
    beginPhase(title_);
    workMeter.begin(unit, total);
}

Phase::~Phase()
{
    Clock::time_point const now = Clock::now();
    count(now, report_.times);
    report_.phase = outer_;
    if (!outer_)
        return;
    outer_->start_ = now;
    if (outer_->kind_ != kind_)
        beginPhase(outer_->title_);
}

void Phase::count(Clock::time_point now, Times& times) const
{
    times.*kind_ += std::chrono::duration<double>(now - start_).count();
}

Times timesOf(Report const& report)
{
    Times times = report.times;
    if (report.phase)
        report.phase->count(Clock::now(), times);
    return times;
}

}
