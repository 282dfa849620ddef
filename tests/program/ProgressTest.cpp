#include "shell/Progress.h"

#include "commands/Steps.h"
#include "files/WorkMeter.h"
#include "shell/ProgressText.h"

#include "program/TemporaryFolder.h"
#include "support/Testing.h"

#include <gmock/gmock.h>

#include <array>
#include <chrono>
#include <future>
#include <regex>
#include <thread>

#include <fcntl.h>
#include <poll.h>
#include <pty.h>
#include <sys/stat.h>
#include <unistd.h>

namespace ModelingProgram {

namespace {

    using namespace TestSupport;
    using testing::AllOf;
    using testing::EndsWith;
    using testing::HasSubstr;
    using testing::Not;

    constexpr char kRemoveLine[] = "\r\x1b[K";

    /// What programs have written to a terminal of this width.
    class Terminal {
    public:
        explicit Terminal(unsigned short columns)
        {
            winsize const size = {24, columns, 0, 0};
            char file[256];
            if (::openpty(&master_, &slave_, file, nullptr, &size) != 0)
                throw std::runtime_error("no terminal");
            name = file;
        }
        Terminal(Terminal const&) = delete;
        Terminal& operator=(Terminal const&) = delete;
        ~Terminal()
        {
            ::close(master_);
            ::close(slave_);
        }

        /// Waits until the text appears, at most this long.
        void await(std::string const& wanted, std::chrono::milliseconds most)
        {
            auto const end = std::chrono::steady_clock::now() + most;
            while (std::chrono::steady_clock::now() < end && (wanted.empty() || text.find(wanted) == text.npos)) {
                pollfd ready = {master_, POLLIN, 0};
                if (::poll(&ready, 1, 20) > 0) {
                    char buffer[4096];
                    ssize_t const count = ::read(master_, buffer, sizeof buffer);
                    text.append(buffer, static_cast<std::size_t>(std::max(count, ssize_t{0})));
                }
            }
        }

        std::string name;
        std::string text;

    private:
        int master_ = -1;
        int slave_ = -1;
    };

    struct Case {
        char const* environment;
        char const* options;
        char const* wanted; // empty for nothing at all
    };

    /// What is printed while a file is written to a pipe that nobody reads before the wanted text appears.
    /// \param file  for the messages instead of the terminal
    std::string shownWhileWriting(
        TemporaryFolder const& folder, Case const& c, unsigned short columns, std::string const& file = {})
    {
        using namespace std::chrono_literals;
        Terminal terminal(columns);
        std::string const out = folder / (std::to_string(folder.entryCount()) + ".vtp");
        EXPECT_EQ(::mkfifo(out.c_str(), 0600), 0);
        std::string const line = std::string(c.environment) + " '" MODELING_PROGRAM "' convert '" MODELING_SAMPLES
            + "/bunny.obj' " + out + " " + c.options + " >/dev/null 2>" + (file.empty() ? terminal.name : file);
        auto ended = std::async(std::launch::async, [&] { return std::system(line.c_str()); });
        int const pipe = ::open(out.c_str(), O_RDONLY);
        terminal.await(c.wanted, *c.wanted == '\0' ? 900ms : 20s);
        char buffer[4096];
        while (::read(pipe, buffer, sizeof buffer) > 0) { }
        ::close(pipe);
        EXPECT_EQ(ended.get(), 0) << line;
        terminal.await({}, 50ms);
        return file.empty() ? terminal.text : contentOf(file);
    }

    /// The widest line that was visible.
    std::size_t widthOf(std::string const& text)
    {
        std::size_t width = 0;
        std::stringstream lines(std::regex_replace(text, std::regex("\x1b\\[[0-9]*[mK]"), ""));
        for (std::string line; std::getline(lines, line, '\r');)
            width = std::max(width, line.size());
        return width;
    }

    PhaseProgress const kReading = {"reading a.ply", WorkMeter::kBytes, 450'000'000, 1'000'000'000, 2, 275e6, 1};

}

TEST(Progress, FitsAnyWidth)
{
    EXPECT_EQ(progressLine(kReading), "reading a.ply: 45 %, 2 s left, 275.0 MB/s");
    EXPECT_EQ(progressBar(kReading, 80, false),
        "reading a.ply  [###############-------------------]  45 %  2 s left  275.0 MB/s");
    EXPECT_EQ(progressBar(kReading, 20, false), "reading a.ply  45 %");
    for (std::size_t columns = 1; columns != 130; ++columns)
        EXPECT_LT(progressBar(kReading, columns, false).size(), columns);
    PhaseProgress const counted = {"subdivide", "faces", 1'234'567, 0, 130, 9500, 1};
    EXPECT_EQ(progressLine(counted), "subdivide: 2 min, 1,234,567 faces, 9,500 faces/s");
    EXPECT_EQ(progressLine({"triangulate", nullptr, 0, 0, 3, 0, 1}), "triangulate: 3 s");
    PhaseProgress const full = {
        "reading \xE7\xBD\x91.ply", WorkMeter::kBytes, 5, 4, 2, 1, 1}; // totals may be too small
    EXPECT_THAT(progressBar(full, 60, false), HasSubstr("  99 %  0 s left"));
}

TEST(Progress, IsShownOnTerminalsOnly)
{
    TemporaryFolder const folder;
    for (unsigned short const columns : std::array<unsigned short, 2>{20, 60}) {
        std::string const bar = shownWhileWriting(folder, {"TERM=xterm", "", "%"}, columns);
        EXPECT_THAT(bar, AllOf(HasSubstr("\rwriting "), EndsWith(kRemoveLine))) << columns;
        EXPECT_LT(widthOf(bar), columns);
        EXPECT_EQ(bar.find("\x1b[32m") != bar.npos, columns == 60);
    }
    EXPECT_THAT(shownWhileWriting(folder, {"NO_COLOR=1 TERM=xterm", "", "%"}, 60), Not(HasSubstr("\x1b[32m")));
    for (Case const& c : {Case{"TERM=dumb", "", "%"}, Case{"TERM=xterm", "--progress plain", "%"}})
        EXPECT_THAT(shownWhileWriting(folder, c, 60),
            AllOf(Not(HasSubstr("\x1b")), testing::StartsWith("modeling: writing "), EndsWith(" %\r\n")));
    for (char const* const options : {"--quiet", "--progress none", "--quiet --progress plain"})
        EXPECT_EQ(shownWhileWriting(folder, {"TERM=xterm", options, ""}, 60), "") << options;
    // In files there are lines, if they are requested.
    EXPECT_EQ(shownWhileWriting(folder, {"TERM=xterm", "", ""}, 60, folder / "messages"), "");
    EXPECT_THAT(shownWhileWriting(folder, {"TERM=xterm", "--progress plain", ""}, 60, folder / "messages"),
        testing::MatchesRegex("modeling: writing .*: [0-9]+ %\n"));
}

TEST(Progress, MakesWayForMessages)
{
    using namespace std::chrono_literals;
    Terminal terminal(60);
    int const old = ::dup(STDERR_FILENO);
    int const slave = ::open(terminal.name.c_str(), O_WRONLY | O_NOCTTY);
    ASSERT_GE(::dup2(slave, STDERR_FILENO), 0);
    {
        Progress const progress(ProgressStyle::Bar);
        beginPhase("reading \x1b[2J");
        workMeter.begin(WorkMeter::kBytes, 1000);
        terminal.await("\r", 400ms);
        EXPECT_EQ(terminal.text, ""); // nothing in the first half second
        workMeter.add(500);
        terminal.await(" 50 %", 20s);
        ::raise(SIGWINCH);
        printMessage("name \x1b[31m\n\xC2\x9B of a file");
        terminal.await("of a file", 20s);
    }
    terminal.await({}, 100ms);
    ::dup2(old, STDERR_FILENO);
    ::close(old);
    ::close(slave);
    EXPECT_THAT(terminal.text, AllOf(HasSubstr("\rreading ?[2J"), HasSubstr("50 %"), Not(HasSubstr("\x1b[2J"))));
    EXPECT_THAT(terminal.text, HasSubstr(std::string(kRemoveLine) + "name ?[31m?? of a file\r\n"));
}

TEST(Progress, KnowsHowMuchIsDone)
{
    TemporaryFolder const folder;
    std::string points;
    while (points.size() < 3'000'000)
        points += "1 2 3\n";
    store(folder / "points.xyz", points);
    workMeter.begin(WorkMeter::kBytes, points.size());
    GeometryFile const cloud = readGeometryFile(folder / "points.xyz");
    EXPECT_GT(workMeter.done(), points.size() * 8 / 10); // the last chunk is not counted
    EXPECT_LE(workMeter.done(), points.size());
    for (char const* const name : {"points.ply", "points.obj", "points.vtp"}) {
        writeGeometryFile(*cloud.object, folder / name);
        EXPECT_EQ(workMeter.done(), std::filesystem::file_size(folder / name)) << name;
    }
    EXPECT_GT(workMeter.total(), 0);

    // Steps of smoothing, and faces of subdivision.
    Progress const progress(ProgressStyle::Lines);
    Report report("test");
    auto const countedBy = [&](std::vector<std::string> const& words) {
        Subject subject{"mesh", MeshBuilder::sphere(8).build()};
        parseStep(words, 1).edit->run(subject, report);
        return std::pair(workMeter.done(), std::uint64_t{arraysOf(*subject.object).faceCount()});
    };
    EXPECT_EQ(countedBy({"smooth", "--amount", "2"}).first, 3); // of 0.9, 0.9 and 0.2
    EXPECT_EQ(workMeter.total(), 3);
    auto const [counted, faces] = countedBy({"subdivide", "--relative", "0.01"});
    EXPECT_EQ(counted, faces);
}

TEST(Subject, IsExaminedOnce)
{
    Subject subject{"mesh", MeshBuilder::sphere(4).build()};
    EXPECT_TRUE(subject.know().shape.volume);
    subject.topology->partCount = 99; // which nobody finds a second time
    EXPECT_EQ(subject.know().topology.partCount, 99);
    Report report("test");
    kTriangulate.create()->run(subject, report); // triangles stay as they are
    ASSERT_TRUE(subject.topology && subject.shape); // the next step takes them over
    EXPECT_EQ(subject.topology->partCount, 99);
    EXPECT_EQ(subject.shape->area, examine(arraysOf(*subject.object)).shape.area);

    Subject quad{"quad", readGeometryFile(MODELING_SAMPLES "/stitch-quad.obj").object};
    EXPECT_EQ(quad.know().topology.quads.count, 1);
    kTriangulate.create()->run(quad, report);
    ASSERT_TRUE(quad.topology && quad.shape);
    EXPECT_EQ(quad.topology->triangleCount, 2);
    EXPECT_EQ(quad.shape->area, examine(arraysOf(*quad.object)).shape.area);

    // What a requirement needs is computed for the report too, since finding the edges takes longer than the rest.
    report.requirements = {"closed"};
    std::filesystem::path const bunny = MODELING_SAMPLES "/bunny.obj";
    EXPECT_TRUE(kSmooth.create()->readSubject({bunny}, report).shape);
    report.isQuiet = true;
    Subject const required = kSmooth.create()->readSubject({bunny}, report);
    EXPECT_TRUE(required.topology && !required.shape);
    for (EditKind const* const kind : {&kTriangulate, &kRemoveSlivers, &kSmooth}) {
        subject.setKnown();
        kind->create()->run(subject, report);
        EXPECT_FALSE(subject.shape) << kind->help.name;
    }
}

}
