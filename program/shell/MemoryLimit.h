#pragma once

#include "CommandLine.h"

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <mutex>
#include <string>
#include <thread>

namespace ModelingProgram {

/// How much memory the program may take. While it lives, a thread watches, and cancels the job once the program takes
/// more. The work then stops at the next place where it looks at that, and may take more until then: so whatever can
/// tell in advance what it will take asks `require` first.
class MemoryLimit {
public:
    /// \param bytes  0 if the user has set no limit: then most of what is free, so that the kernel need not kill anything
    explicit MemoryLimit(std::uint64_t bytes);
    MemoryLimit(MemoryLimit const&) = delete;
    MemoryLimit& operator=(MemoryLimit const&) = delete;
    ~MemoryLimit();

    /// Refuses work that would take the program beyond the limit.
    /// \param bytes   what the work takes, in addition to what the program takes now
    /// \param what    begins the message: "a band of 3 million voxels"
    /// \param advice  ends it: a sentence on what takes less
    void require(std::uint64_t bytes, std::string const& what, std::string const& advice) const;

    /// Runs work, and says so if this limit has ended it.
    void run(std::function<void()> const& work, std::string const& advice) const;

private:
    void look();
    std::string limit() const;

    bool isUsers_;
    std::uint64_t bytes_;
    std::atomic<bool> wasExceeded_ = false;
    std::mutex mutex_;
    std::condition_variable over_;
    bool isOver_ = false;
    std::thread watcher_;
};

/// Adds --max-memory to a command.
void addMemoryLimit(std::uint64_t& bytes, Command& command);

/// The memory that the program takes at present.
std::uint64_t presentMemory();

/// The memory that the program can still take: what the machine has available, and no more than any of the control
/// groups (of either version) that the program is in leaves it. Caches that the kernel can drop count as free.
/// \param root  where the system's files are; tests have files of their own
std::uint64_t freeMemory(std::filesystem::path const& root = "/");

}
