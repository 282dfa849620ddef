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

/// Limits the memory of the program. During its lifetime a thread polls the memory in use and cancels the job if that
/// exceeds the limit. The work then stops at its next cancellation check and may allocate more until then, so work
/// whose size is known in advance calls `require` first.
class MemoryLimit {
public:
    /// \param bytes  0 for the default: most of the free memory, so that the kernel never has to kill a process
    explicit MemoryLimit(std::uint64_t bytes);
    MemoryLimit(MemoryLimit const&) = delete;
    MemoryLimit& operator=(MemoryLimit const&) = delete;
    ~MemoryLimit();

    /// Refuses work that would exceed the limit.
    /// \param bytes   what the work needs in addition to the memory in use
    /// \param what    start of the message: "a band of 3 million voxels"
    /// \param advice  end of the message: a sentence on how to need less
    void require(std::uint64_t bytes, std::string const& what, std::string const& advice) const;

    /// Runs work. If this limit stops it, the failure says so.
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

/// Refuses work that would exceed the limit in force, or most of the free memory if there is none.
void requireMemory(std::uint64_t bytes, std::string const& what);

/// Adds --max-memory to a command.
void addMemoryLimit(std::uint64_t& bytes, Command& command);

/// The resident memory of the program, in bytes.
std::uint64_t presentMemory();

/// The memory that the program can still allocate: what the machine has available, or less if a control group (version
/// 1 or 2) limits it further. Caches that the kernel can drop count as free.
/// \param root  the directory that contains /proc and /sys; tests pass their own
std::uint64_t freeMemory(std::filesystem::path const& root = "/");

}
