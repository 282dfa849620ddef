#include <OrvanCppOpSDK/Job.h>

#include <gtest/gtest.h>

#include <csignal>
#include <thread>

TEST(Job, seesACancellationFromAnotherThread)
{
    EXPECT_FALSE(Orvan::isJobCancelled());
    int reason = 0; // not atomic: the flag must publish it
    std::thread job([&] {
        while (!Orvan::isJobCancelled())
            std::this_thread::yield();
        EXPECT_EQ(reason, 7);
    });
    reason = 7;
    Orvan::setJobCancelled(true);
    job.join();
    Orvan::setJobCancelled(false);
    EXPECT_FALSE(Orvan::isJobCancelled());
}

TEST(Job, canBeCancelledInASignalHandler)
{
    auto* const before = std::signal(SIGUSR1, [](int) { Orvan::setJobCancelled(true); });
    std::raise(SIGUSR1);
    EXPECT_TRUE(Orvan::isJobCancelled());
    Orvan::setJobCancelled(false);
    std::signal(SIGUSR1, before);
}
