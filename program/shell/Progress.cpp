#include "Progress.h"

#include "ProgressText.h"
#include "files/WorkMeter.h"

#include <OrvanCppOpSDK/Job.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <system_error>
#include <utility>

#include <sys/ioctl.h>
#include <unistd.h>

// Debian packages no progress bar for C++; those of other origins draw on the thread that works, or cannot print other
// lines in between.

namespace ModelingProgram {

namespace {

    using Clock = std::chrono::steady_clock;

    struct CurrentPhase {
        std::mutex mutex;
        std::string title;
        Clock::time_point start = Clock::now();
        unsigned int number = 0;
    };

    CurrentPhase& currentPhase()
    {
        static CurrentPhase phase;
        return phase;
    }

    // Whoever writes to the terminal holds this, except for handlers of signals.
    std::mutex terminal;
    bool hasBar = false; // since the last message
    std::atomic<bool> isBarVisible = false;
    std::atomic<bool> isShown = false;

    constexpr std::string_view kRemoveLine = "\r\x1b[K";

    void writeToTerminal(std::string_view text) noexcept
    {
        // A failure cannot be reported anywhere.
        [[maybe_unused]] auto const written = ::write(STDERR_FILENO, text.data(), text.size());
    }

    /// \pre  the terminal is locked
    void removeBar()
    {
        isBarVisible = false;
        if (std::exchange(hasBar, false))
            writeToTerminal(kRemoveLine);
    }

    std::size_t terminalColumns()
    {
        constexpr std::size_t kUsual = 80;
        winsize size = {};
        return ::ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col != 0 ? size.ws_col : kUsual;
    }

    bool isInBackground()
    {
        pid_t const group = ::tcgetpgrp(STDERR_FILENO);
        return group > 0 && group != ::getpgrp();
    }

    bool isSet(char const* variable)
    {
        char const* const value = std::getenv(variable);
        return value && *value != '\0';
    }

    PhaseProgress presentPhase()
    {
        CurrentPhase& current = currentPhase();
        std::lock_guard const lock(current.mutex);
        return {current.title, workMeter.unit(), workMeter.done(), workMeter.total(),
            std::chrono::duration<double>(Clock::now() - current.start).count(), 0, current.number};
    }

    /// The mean of the first second, then a moving average of two.
    void updateRate(PhaseProgress const& last, PhaseProgress& phase)
    {
        double const passed = phase.seconds - last.seconds;
        if (phase.seconds < 1 || phase.done < last.done || passed <= 0)
            phase.rate = static_cast<double>(phase.done) / std::max(phase.seconds, 1e-3);
        else
            phase.rate = last.rate
                + (static_cast<double>(phase.done - last.done) / passed - last.rate) * std::min(1.0, passed / 2);
    }

    void drawBar(PhaseProgress const& phase)
    {
        std::lock_guard const lock(terminal);
        if (Orvan::isJobCancelled() || isInBackground()) {
            removeBar();
            return;
        }
        hasBar = true;
        isBarVisible = true;
        writeToTerminal("\r" + progressBar(phase, terminalColumns(), !isSet("NO_COLOR")) + "\x1b[K");
    }

}

ProgressStyle progressStyleOf(std::string_view wish)
{
    if (wish == "plain")
        return ProgressStyle::Lines;
    if (wish == "none" || ::isatty(STDERR_FILENO) == 0)
        return ProgressStyle::None;
    bool const canMoveCursor = isSet("TERM") && std::getenv("TERM") != std::string_view("dumb");
    return canMoveCursor ? ProgressStyle::Bar : ProgressStyle::Lines;
}

Progress::Progress(ProgressStyle style)
    : style_(style)
{
    if (style == ProgressStyle::None)
        return;
    isShown = true;
    try {
        thread_ = std::thread([this] { run(); });
    } catch (std::system_error const&) {
        isShown = false; // the system is short of threads; the work needs none
    }
}

Progress::~Progress()
{
    if (thread_.joinable()) {
        {
            std::lock_guard const lock(mutex_);
            isOver_ = true;
        }
        over_.notify_one();
        thread_.join();
    }
    isShown = false;
    std::lock_guard const lock(terminal);
    removeBar();
}

void Progress::run()
{
    using namespace std::chrono_literals;
    PhaseProgress last;
    double lineSeconds = 0; // of the phase, when its last line was printed
    std::unique_lock lock(mutex_);
    for (auto delay = 500ms; !over_.wait_for(lock, delay, [this] { return isOver_; }); delay = 100ms) {
        PhaseProgress phase = presentPhase();
        bool const isNew = phase.number != last.number;
        updateRate(isNew ? PhaseProgress() : last, phase);
        last = phase;
        constexpr double kFirstLine = 0.5, kInterval = 5; // seconds
        if (style_ == ProgressStyle::Bar && phase.number != 0) {
            drawBar(phase);
        } else if (phase.number != 0) {
            lineSeconds = isNew ? kFirstLine - kInterval : lineSeconds;
            if (phase.seconds < lineSeconds + kInterval)
                continue;
            lineSeconds = phase.seconds;
            printMessage("modeling: " + progressLine(phase));
        }
    }
}

void beginPhase(std::string const& title)
{
    workMeter.begin(nullptr);
    CurrentPhase& phase = currentPhase();
    std::lock_guard const lock(phase.mutex);
    phase.title = printable(title);
    phase.start = Clock::now();
    ++phase.number;
}

void renamePhase(std::string const& title)
{
    CurrentPhase& phase = currentPhase();
    std::lock_guard const lock(phase.mutex);
    phase.title = printable(title);
}

bool isProgressShown()
{
    return isShown;
}

void printMessage(std::string_view line)
{
    std::lock_guard const lock(terminal);
    removeBar();
    std::fputs((printable(line) + "\n").c_str(), stderr);
}

std::string printable(std::string_view text)
{
    std::string result;
    for (std::size_t i = 0; i != text.size(); ++i) {
        auto const byte = static_cast<unsigned char>(text[i]);
        auto const next = static_cast<unsigned char>(i + 1 != text.size() ? text[i + 1] : 0);
        bool const isC1 = byte == 0xC2 && next >= 0x80 && next < 0xA0; // control characters in UTF-8
        result += byte < ' ' || byte == 0x7F || isC1 ? '?' : text[i];
        i += isC1 ? 1 : 0;
    }
    return result;
}

void removeProgressBar() noexcept
{
    if (isBarVisible.exchange(false))
        writeToTerminal(kRemoveLine);
}

}
