#include <TessaraMathSupport/Loggers.h>
#include <TessaraMathSupport/Stepper.h>

#include <gtest/gtest.h>

#include <limits>
#include <thread>

using Tessara::Math::Stepper;

namespace {

constexpr float kInfinity = std::numeric_limits<float>::infinity();
constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();

std::vector<float> incrementsOf(float amount, float limit)
{
    std::vector<float> increments;
    for (Stepper stepper(amount, limit); stepper && increments.size() < 100; stepper.step(CoreGL::NOPLogger()))
        increments.push_back(stepper.increment());
    return increments;
}

template <class Logger> void stepThrough(Stepper stepper, Logger const& logger)
{
    while (stepper)
        stepper.step(logger);
    stepper.step(logger); // none is due: not logged
}

}

TEST(Stepper, SplitsTheAmountAtTheLimit)
{
    struct Case {
        float amount, limit;
        std::vector<float> increments;
    };
    float const smallest = std::numeric_limits<float>::denorm_min();
    for (auto const& [amount, limit, increments] : std::vector<Case>{
             {0.9f, 0.9f, {0.9f}},
             {1.0f, 0.9f, {0.9f, 1.0f - 0.9f}},
             {1.75f, 0.5f, {0.5f, 0.5f, 0.5f, 0.25f}},
             {3 * smallest, smallest, {smallest, smallest, smallest}},
             // The remainders are rounded: 2.7 - 0.9 is just above 1.8, and a tiny fourth step is left over.
             {2.7f, 0.9f, {0.9f, 0.9f, 0.9f, (2.7f - 0.9f) - 0.9f - 0.9f}},
             {kInfinity, kInfinity, {kInfinity}},
             {kInfinity, 0.9f, {0.9f}}, // the first subtraction changes nothing
             {16777218.0f, 0.5f, {0.5f}},
         })
        EXPECT_EQ(incrementsOf(amount, limit), increments) << amount << " by " << limit;
    for (float const nothing : {0.0f, -0.0f, -1.0f, -kInfinity, kNaN})
        EXPECT_EQ(incrementsOf(nothing, 0.9f), std::vector<float>()) << nothing;
    for (float const noLimit : {0.0f, -1.0f, kNaN, kInfinity})
        EXPECT_EQ(incrementsOf(2, noLimit), std::vector<float>{2}) << noLimit;
}

TEST(Stepper, EndsForAnyRoundingOfTheRemainder)
{
    unsigned int maxCount = 0;
    for (float const ulps : {0.5f, 0.51f, 0.75f, 1.0f, 1.49f, 1.5f, 2.5f}) { // of amounts just below 2^24
        unsigned int count = 0;
        for (Stepper stepper(16777215.0f, ulps); stepper; stepper.step(CoreGL::NOPLogger()))
            ++count;
        maxCount = std::max(maxCount, count);
    }
    EXPECT_GT(maxCount, 1u << 24);
    EXPECT_LT(maxCount, 1u << 25);
}

TEST(Loggers, WriteOneLinePerStep)
{
    std::string const expected = "step 1: 0.5, 0.75 remain\nstep 2: 0.5, 0.25 remain\nstep 3: 0.25, 0 remain\n";
    std::string lines;
    testing::internal::CaptureStdout();
    CoreGL::OrvanLogger::setSink([&](char const* line) { lines += std::string(line) + '\n'; });
    stepThrough(Stepper(1.25f, 0.5f), CoreGL::NOPLogger());
    stepThrough(Stepper(1.25f, 0.5f), CoreGL::OrvanLogger());
    EXPECT_EQ(lines, expected);
    float const longest = -std::numeric_limits<float>::min() * 1.0000001f;
    CoreGL::OrvanLogger().logStep(std::numeric_limits<unsigned int>::max(), longest, longest);

    CoreGL::OrvanLogger::setSink(nullptr);
    stepThrough(Stepper(1.25f, 0.5f), CoreGL::OrvanLogger()); // to nobody
    stepThrough(Stepper(1.25f, 0.5f), CoreGL::ConsoleLogger());
    EXPECT_EQ(testing::internal::GetCapturedStdout(), expected);
    EXPECT_EQ(lines, expected + "step 4294967295: -1.1754945e-38, -1.1754945e-38 remain\n");
}

TEST(Loggers, RecoverFromASinkThatThrows)
{
    CoreGL::OrvanLogger::setSink([](char const*) { throw std::runtime_error("full"); });
    Stepper stepper(1.0f, 0.75f);
    EXPECT_THROW(stepper.step(CoreGL::OrvanLogger()), std::runtime_error);
    EXPECT_EQ(stepper.increment(), 0.25f) << "the step is complete nevertheless";
    CoreGL::OrvanLogger::setSink(nullptr);
}

TEST(Loggers, ShareTheSinkBetweenThreads)
{
    int lineCount = 0; // not atomic: sink calls are serialized
    std::vector<std::thread> threads;
    for (int thread = 0; thread < 3; ++thread)
        threads.emplace_back([] { stepThrough(Stepper(100.0f, 0.5f), CoreGL::OrvanLogger()); });
    for (int i = 0; i < 100; ++i)
        CoreGL::OrvanLogger::setSink([&lineCount](char const*) { ++lineCount; });
    for (std::thread& thread : threads)
        thread.join();
    CoreGL::OrvanLogger::setSink(nullptr);
    EXPECT_LE(lineCount, 600);
}
