#include <OrvanCppOpSDK/Job.h>

#include <atomic>

namespace Orvan {

namespace {

    std::atomic<bool> jobCancelled{false};
    static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler sets the flag");

}

bool isJobCancelled() noexcept
{
    return jobCancelled.load(std::memory_order_acquire);
}

void setJobCancelled(bool cancelled) noexcept
{
    jobCancelled.store(cancelled, std::memory_order_release);
}

}
