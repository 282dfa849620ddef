#pragma once

#include <atomic>
#include <cstdint>

namespace ModelingProgram {

/// How much of the present phase of work is done. Whoever works adds to it, on any thread and once per chunk of work;
/// whoever shows progress reads it. There is one, because the program works on one thing at a time.
class WorkMeter {
public:
    /// Begins to count from 0.
    /// \param unit   plural and static, such as "faces"; null if nothing is counted
    /// \param total  0 if it is unknown
    void begin(char const* unit, std::uint64_t total = 0) noexcept
    {
        done_.store(0, std::memory_order_relaxed);
        total_.store(total, std::memory_order_relaxed);
        unit_.store(unit, std::memory_order_relaxed);
    }
    void add(std::uint64_t amount) noexcept { done_.fetch_add(amount, std::memory_order_relaxed); }
    void set(std::uint64_t amount) noexcept { done_.store(amount, std::memory_order_relaxed); }

    char const* unit() const noexcept { return unit_.load(std::memory_order_relaxed); }
    std::uint64_t done() const noexcept { return done_.load(std::memory_order_relaxed); }
    std::uint64_t total() const noexcept { return total_.load(std::memory_order_relaxed); }

    static constexpr char kBytes[] = "bytes";

private:
    std::atomic<std::uint64_t> done_ = 0;
    std::atomic<std::uint64_t> total_ = 0;
    std::atomic<char const*> unit_ = nullptr;
};

inline constinit WorkMeter workMeter;

}
