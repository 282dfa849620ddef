#include "MemoryLimit.h"

#include <OrvanCppOpSDK/Job.h>

#include <chrono>
#include <fstream>

#include <unistd.h>

namespace ModelingProgram {

std::uint64_t presentMemory()
{
    std::uint64_t allPages = 0, residentPages = 0;
    std::ifstream("/proc/self/statm") >> allPages >> residentPages;
    return residentPages * static_cast<std::uint64_t>(::sysconf(_SC_PAGESIZE));
}

MemoryLimit::MemoryLimit(std::uint64_t bytes)
    : bytes_(bytes)
{
    if (bytes_ == 0)
        return;
    look();
    watcher_ = std::thread([this] {
        std::unique_lock lock(mutex_);
        while (!over_.wait_for(lock, std::chrono::milliseconds(5), [this] { return isOver_; }))
            look();
    });
}

MemoryLimit::~MemoryLimit()
{
    if (!watcher_.joinable())
        return;
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

}
