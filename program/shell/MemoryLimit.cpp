#include "MemoryLimit.h"

#include "Failure.h"
#include "Report.h"

#include <OrvanCppOpSDK/Job.h>

#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <fstream>
#include <limits>
#include <optional>
#include <sstream>

#include <unistd.h>

namespace ModelingProgram {

namespace fs = std::filesystem;

namespace {

    // The rest is left for allocations until the next cancellation check, and for other programs.
    constexpr double kFractionOfFree = 0.9;

    std::atomic<MemoryLimit const*> limitInForce = nullptr;

    std::uint64_t mostOfFreeMemory()
    {
        return static_cast<std::uint64_t>(static_cast<double>(freeMemory()) * kFractionOfFree);
    }

    /// The number after `word` in the first line that begins with it.
    std::optional<std::uint64_t> numberAfter(std::string_view word, fs::path const& file)
    {
        std::ifstream in(file);
        for (std::string line; std::getline(in, line);) {
            std::istringstream fields(line);
            std::string first;
            std::uint64_t number;
            if (fields >> first && first == word && fields >> number)
                return number;
        }
        return std::nullopt;
    }

    /// Nullopt if there is no such file, or if it says "max".
    std::optional<std::uint64_t> numberIn(fs::path const& file)
    {
        std::uint64_t number;
        return std::ifstream(file) >> number ? std::optional(number) : std::nullopt;
    }

    /// The files of a control group hierarchy.
    struct Hierarchy {
        char const* folder;
        char const* limit;
        char const* usage;
        char const* droppable; // in memory.stat
    };
    constexpr Hierarchy kFirstVersion = {
        "sys/fs/cgroup/memory", "memory.limit_in_bytes", "memory.usage_in_bytes", "total_inactive_file"};
    constexpr Hierarchy kSecondVersion = {"sys/fs/cgroup", "memory.max", "memory.current", "inactive_file"};

    /// The free memory in a control group and its ancestors.
    std::uint64_t freeInGroup(Hierarchy const& hierarchy, fs::path group, fs::path const& root)
    {
        std::uint64_t free = std::numeric_limits<std::uint64_t>::max();
        for (;; group = group.parent_path()) {
            fs::path const folder = root / hierarchy.folder / group.relative_path();
            auto const limit = numberIn(folder / hierarchy.limit), usage = numberIn(folder / hierarchy.usage);
            if (limit && usage) {
                std::uint64_t const droppable = numberAfter(hierarchy.droppable, folder / "memory.stat").value_or(0);
                std::uint64_t const used = *usage - std::min(droppable, *usage);
                free = std::min(free, *limit - std::min(used, *limit));
            }
            if (group == group.parent_path())
                return free;
        }
    }

}

std::uint64_t presentMemory()
{
    std::uint64_t allPages = 0, residentPages = 0;
    std::ifstream("/proc/self/statm") >> allPages >> residentPages;
    return residentPages * static_cast<std::uint64_t>(::sysconf(_SC_PAGESIZE));
}

std::uint64_t freeMemory(fs::path const& root)
{
    constexpr std::uint64_t kKilobyte = 1024;
    std::uint64_t free = numberAfter("MemAvailable:", root / "proc/meminfo")
                             .value_or(std::numeric_limits<std::uint64_t>::max() / kKilobyte)
        * kKilobyte;
    std::ifstream groups(root / "proc/self/cgroup");
    for (std::string line; std::getline(groups, line);) { // "4:memory,cpu:/group", or "0::/group"
        std::size_t const first = line.find(':'), second = line.find(':', first + 1);
        if (second == std::string::npos)
            continue;
        std::string const controllers = "," + line.substr(first + 1, second - first - 1) + ",";
        std::string const group = line.substr(second + 1);
        if (controllers == ",,")
            free = std::min(free, freeInGroup(kSecondVersion, group, root));
        else if (controllers.find(",memory,") != std::string::npos)
            free = std::min(free, freeInGroup(kFirstVersion, group, root));
    }
    return free;
}

MemoryLimit::MemoryLimit(std::uint64_t bytes)
    : isUsers_(bytes != 0)
    , bytes_(isUsers_ ? bytes : presentMemory() + mostOfFreeMemory())
{
    limitInForce = this;
    look();
    watcher_ = std::thread([this] {
        std::unique_lock lock(mutex_);
        while (!over_.wait_for(lock, std::chrono::milliseconds(5), [this] { return isOver_; }))
            look();
    });
}

MemoryLimit::~MemoryLimit()
{
    limitInForce = nullptr;
    {
        std::lock_guard const lock(mutex_);
        isOver_ = true;
    }
    over_.notify_one();
    watcher_.join();
}

void MemoryLimit::look()
{
    if (!wasExceeded_ && presentMemory() > bytes_) {
        wasExceeded_ = true;
        Orvan::setJobCancelled(true);
    }
}

std::string MemoryLimit::limit() const
{
    return fmt::format("{} that {}", formatBytes(bytes_),
        isUsers_ ? "--max-memory allows" : "this machine has free (--max-memory sets another limit)");
}

void MemoryLimit::require(std::uint64_t bytes, std::string const& what, std::string const& advice) const
{
    std::uint64_t const present = presentMemory();
    if (bytes > bytes_ - std::min(present, bytes_))
        throw Failure(ExitCode::OutOfMemory,
            fmt::format("{} would need about {} in addition to the {} in use, which exceeds the {}. {}", what,
                formatBytes(bytes), formatBytes(present), limit(), advice));
}

void MemoryLimit::run(std::function<void()> const& work, std::string const& advice) const
{
    try {
        work();
    } catch (Failure const& failure) {
        if (failure.code != ExitCode::Cancelled || !wasExceeded_)
            throw;
        throw Failure(ExitCode::OutOfMemory,
            fmt::format("stopped: this needs more than the {}; nothing was written. {}", limit(), advice));
    }
}

void requireMemory(std::uint64_t bytes, std::string const& what)
{
    if (MemoryLimit const* const limit = limitInForce)
        limit->require(bytes, what, "Compressed files can hold far more than their size.");
    else if (std::uint64_t const most = mostOfFreeMemory(); bytes > most)
        throw Failure(ExitCode::OutOfMemory,
            fmt::format("{} would need about {}, but only {} are free", what, formatBytes(bytes), formatBytes(most)));
}

void addMemoryLimit(std::uint64_t& bytes, Command& command)
{
    command
        .addOption("--max-memory", bytes,
            "Stop before more memory is used, such as 500MB or 1.5GB; default: most of what is free")
        .valueName("SIZE")
        .bytes();
}

}
