#pragma once

#include <condition_variable>
#include <mutex>
#include <string>
#include <string_view>
#include <thread>

namespace ModelingProgram {

enum class ProgressStyle {
    None,
    Lines, // one per phase that takes long, and one every few seconds
    Bar // redrawn in place; needs a terminal
};

/// The style for standard error.
/// \param wish  "auto" for a bar if it is a terminal and nothing otherwise, "plain" for lines, "none"
ProgressStyle progressStyleOf(std::string_view wish);

/// Shows the progress of long work on standard error during its lifetime: nothing in the first half second. One thread
/// draws; workers only add to `workMeter`. There is at most one such object.
class Progress {
public:
    explicit Progress(ProgressStyle style);
    Progress(Progress const&) = delete;
    Progress& operator=(Progress const&) = delete;
    /// Removes the bar.
    ~Progress();

private:
    void run();

    ProgressStyle style_;
    std::mutex mutex_;
    std::condition_variable over_;
    bool isOver_ = false;
    std::thread thread_;
};

/// Begins a phase of work, in which nothing is counted until `workMeter.begin` is called. Progress shows the last one.
void beginPhase(std::string const& title);
/// Changes the title of the present phase.
void renamePhase(std::string const& title);
/// Whether anybody looks: counting that costs something can be omitted otherwise.
bool isProgressShown();

/// Prints a line to standard error, in place of the bar if there is one. Control characters, which names in files may
/// contain, become question marks.
void printMessage(std::string_view line);
/// The text without control characters.
std::string printable(std::string_view text);

/// Removes the bar. Async-signal-safe, for handlers that print something or end the process.
void removeProgressBar() noexcept;

}
