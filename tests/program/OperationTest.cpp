#include "commands/Operation.h"

#include "Program.h"
#include "files/OutputFile.h"
#include "geometry/Geometry.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"

#include "program/NamedFilesOnly.h"
#include "support/Testing.h"

#include <OrvanCppOpSDK/Job.h>

#include <gmock/gmock.h>

#include <csignal>
#include <filesystem>

#include <unistd.h>

namespace ModelingProgram {

namespace {

    using namespace Tessara::Geometry;
    using TestSupport::MeshBuilder;

    template <class Action> ExitCode exitCodeOf(Action const& action)
    {
        try {
            action();
        } catch (Failure const& failure) {
            return failure.code;
        }
        return ExitCode::Done;
    }

    struct CancelledJob {
        CancelledJob() { Orvan::setJobCancelled(true); }
        CancelledJob(CancelledJob const&) = delete;
        CancelledJob& operator=(CancelledJob const&) = delete;
        ~CancelledJob() { Orvan::setJobCancelled(false); }
    };

}

TEST(Operation, DropsPropertiesOfElements)
{
    auto const mesh = MeshBuilder::tetrahedron().build();
    addDataProperty<int>("weight", sPointComp, {1, 2, 3, 4}, *mesh);
    addRangeProperty("seams", sFaceVertexComp, {0, 1, 0, 1, 0, 1, 0, 1, 0, 1, 0, 1}, *mesh);
    addDataProperty<float>("texture", "seams", {0.25f, 0.75f}, *mesh);
    addDataProperty<int>("astray", "nowhere", {1}, *mesh);
    mesh->setProperty("author", 7);

    std::vector<Property> const properties = propertiesOf(*mesh);
    auto const texture = std::ranges::find(properties, "texture", &Property::name);
    ASSERT_NE(texture, properties.end());
    EXPECT_EQ(texture->type + " " + texture->component + " " + texture->range,
        std::string("float ") + sFaceVertexComp + " seams");
    EXPECT_EQ(texture->length, 2);

    EXPECT_THAT(dropOtherProperties(*mesh), testing::ElementsAre("weight", "seams", "texture"));
    EXPECT_TRUE(!mesh->hasProperty("texture") && mesh->hasProperty("astray") && mesh->hasProperty("author"));
    EXPECT_TRUE(validate(*mesh));
}

TEST(Operation, EndsAsCancelledIfTheJobIs)
{
    Report report("test");
    auto const exitCodeOfRun = [&](std::function<void()> const& operation) {
        CancelledJob const cancelled;
        return exitCodeOf([&] { runOperation(report, operation); });
    };
    EXPECT_EQ(exitCodeOf([&] { runOperation(report, [] {}); }), ExitCode::Done);
    EXPECT_EQ(exitCodeOfRun([] {}), ExitCode::Cancelled);
    EXPECT_EQ(exitCodeOfRun([] { throw std::runtime_error("job cancelled"); }), ExitCode::Cancelled);
    EXPECT_THROW(exitCodeOfRun([] { throw std::bad_alloc(); }), std::bad_alloc);
    EXPECT_THROW(runOperation(report, [] { throw std::runtime_error("other"); }), std::runtime_error);

    auto const out = std::filesystem::path(testing::TempDir()) / "cancelled.obj";
    std::string const target = out.string();
    char const* const line[] = {"modeling", "remove-slivers", MODELING_SAMPLES "/cylinder.obj", target.c_str()};
    CancelledJob const cancelled;
    EXPECT_EQ(runProgram(4, line), static_cast<int>(ExitCode::Cancelled));
    EXPECT_FALSE(std::filesystem::exists(out));
}

TEST(CancelOnSignalDeathTest, StopsAtTheFirstSignalAndTerminatesAtTheSecond)
{
    testing::FLAGS_gtest_death_test_style = "threadsafe";
    // The process that dies runs the test from the start.
    auto const owner = testing::internal::InDeathTestChild() ? ::getppid() : ::getpid();
    auto const folder = std::filesystem::path(testing::TempDir()) / ("modeling-signals-" + std::to_string(owner));
    std::filesystem::create_directories(folder);
    for (int const signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT}) {
        auto const raise = [&](int times) {
            std::signal(signal, SIG_DFL); // not ignored, as it is in background jobs
            if (times == 2)
                TestSupport::forbidUnnamedFiles(); // others need not be removed
            {
                CancelOnSignal const cancelOnSignal;
                OutputFile const unfinished(folder / "out.obj");
                for (int i = 0; i != times; ++i)
                    std::raise(signal);
            }
            std::exit(Orvan::isJobCancelled() ? 42 : 0);
        };
        bool const isCancelling = signal != SIGQUIT;
        if (isCancelling) {
            EXPECT_EXIT(raise(1), testing::ExitedWithCode(42), "stopping");
        }
        EXPECT_EXIT(raise(2), testing::KilledBySignal(signal), isCancelling ? "stopping" : "");
        EXPECT_TRUE(std::filesystem::is_empty(folder)) << signal;
    }
    std::filesystem::remove_all(folder);
}

TEST(Report, AlignsTablesAndReplacesInvalidBytes)
{
    EXPECT_EQ(groupDigits(0) + " " + groupDigits(999) + " " + groupDigits(1000) + " " + groupDigits(1234567),
        "0 999 1,000 1,234,567");
    EXPECT_EQ(countOf(1, "edge") + ", " + countOf(0, "edge") + ", " + countOf(2, "face has", "faces have"),
        "1 edge, 0 edges, 2 faces have");
    EXPECT_EQ(formatValues({{"before", {{"openEdges", 1000u}, {"genus", nullptr}}}, {"after", {{"openEdges", 2u}}}}),
        "             before   after\n"
        "open edges    1,000       2\n"
        "genus             -       -\n");
    Report report("test");
    report.document["name"] = "a\xFFz";
    EXPECT_NE(toText(report.document).find("a\xEF\xBF\xBDz"), std::string::npos);
}

}
