#include <OrvanCppOpSDK/Job.h>

#include <gtest/gtest.h>

#include <csignal>
#include <thread>

// As a host cancels: in a signal handler on another thread than the job's.
TEST(Job, SeesACancellationFromASignalHandler)
{
    EXPECT_FALSE(Orvan::isJobCancelled());
    int reason = 0; // not atomic: the flag must publish it
    std::thread job([&] {
        while (!Orvan::isJobCancelled())
            std::this_thread::yield();
        EXPECT_EQ(reason, 7);
    });
    reason = 7;
    auto* const before = std::signal(SIGUSR1, [](int) { Orvan::setJobCancelled(true); });
    std::raise(SIGUSR1);
    job.join();
    Orvan::setJobCancelled(false);
    EXPECT_FALSE(Orvan::isJobCancelled());
    std::signal(SIGUSR1, before);
}
