#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <mutex>
#include <thread>

namespace ModelingProgram {

/// While it lives, the job is cancelled once the program takes more memory than it may. The operation then stops at the
/// next place where it looks at that; until there it may take more.
class MemoryLimit {
public:
    /// \param bytes  0 for no limit
    explicit MemoryLimit(std::uint64_t bytes);
    MemoryLimit(MemoryLimit const&) = delete;
    MemoryLimit& operator=(MemoryLimit const&) = delete;
    ~MemoryLimit();

    bool wasExceeded() const { return wasExceeded_; }

private:
    void look();

    std::uint64_t bytes_;
    std::atomic<bool> wasExceeded_ = false;
    std::mutex mutex_;
    std::condition_variable over_;
    bool isOver_ = false;
    std::thread watcher_;
};

/// The memory that the program takes at present.
std::uint64_t presentMemory();

}
