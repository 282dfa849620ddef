#include "program/TemporaryFolder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sys/wait.h>

namespace {

using namespace TestSupport;
using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

/// Runs command lines of bash in a folder of their own, in which `modeling` is the program.
class Streams : public testing::Test {
protected:
    Streams()
    {
        for (char const* const name : {"cube.ply", "cylinder.obj"})
            std::filesystem::copy_file(std::filesystem::path(MODELING_SAMPLES) / name, folder / name);
    }

    /// \return the exit code of the last command
    int run(std::string const& line)
    {
        store(folder / "script",
            "modeling() { '" MODELING_PROGRAM "' \"$@\"; }\nexec 2>messages >output\n" + line + "\n");
        int const status = std::system(("cd '" + (folder / "").string() + "' && timeout 60 bash script").c_str());
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

    std::string output() { return contentOf(folder / "output"); }
    std::string messages() { return contentOf(folder / "messages"); }

    TemporaryFolder folder;
};

TEST_F(Streams, AreReadByAllCommandsInAllFormats)
{
    ASSERT_EQ(
        run("modeling triangulate cube.ply a.obj; for e in ply stl glb h5; do modeling convert a.obj a.$e; done; "
            "printf 'OFF\\n3 1 0\\n0 0 0\\n1 0 0\\n0 1 0\\n3 0 1 2\\n' > a.off; printf '0 0 0\\n1 2 3\\n' > a.xyz; "
            "printf 1 > list; modeling make-volume cylinder.obj a.vdb --distance-to 0 0 0 --voxels 9"),
        0);
    for (std::string const extension : {"obj", "ply", "stl", "glb", "h5", "off"}) {
        EXPECT_EQ(run("modeling info a." + extension), 0) << messages();
        std::string const named = output();
        for (char const* const way :
            {"cat a.@ | modeling info -", "modeling info - < a.@", "modeling info <(cat a.@)"}) {
            std::string line = way;
            line.replace(line.find('@'), 1, extension);
            EXPECT_EQ(run(line), 0) << messages();
            EXPECT_EQ(output().substr(output().find(':')), named.substr(named.find(':'))) << line;
        }
    }
    constexpr char const* kLines[] = {
        "cat a.xyz | modeling info - --format xyz",
        "cat a.xyz | modeling convert - - --in-format xyz --format ply | modeling validate -",
        "modeling validate <(cat a.stl)", "mkfifo pipe.h5; cat a.h5 > pipe.h5 & modeling info pipe.h5",
        "modeling merge a.ply <(cat a.obj) -o merged.ply", "cat a.ply | modeling merge a.ply - merged2.obj",
        "modeling subdivide cylinder.obj s.ply --relative 0.1 --volume <(cat a.vdb)",
        "cat list | modeling delete-faces a.ply d.ply --indices -", "modeling add-points a.xyz <(cat a.ply) p.ply",
        "modeling run --do triangulate --print-recipe | modeling run a.ply r.ply --recipe -",
        "cat a.ply | modeling run - - --format obj --do 'triangulate' | modeling info -",
        "{ read -r line; modeling info - --format obj; } < cylinder.obj", // not from its start
    };
    for (char const* const line : kLines)
        EXPECT_EQ(run(line), 0) << line << "\n" << messages();
    EXPECT_EQ(run("modeling info - < a.xyz"), 3);
    EXPECT_EQ(messages(),
        "modeling: /dev/stdin cannot be read: neither its name nor its first bytes tell the format; --format names "
        "it\n");
    EXPECT_EQ(run("TMPDIR=/nowhere; export TMPDIR; cat a.ply | modeling info -"), 3);
    EXPECT_THAT(messages(), HasSubstr("/dev/stdin cannot be read: there is no place for a copy (TMPDIR names"));
}

TEST_F(Streams, HoldGeometryOnly)
{
    for (std::string const format : {"obj", "ply", "h5", "vtp"}) {
        EXPECT_EQ(
            run("modeling convert cube.ply expected." + format + "; modeling convert cube.ply - --format " + format),
            0);
        std::string const text = output();
        EXPECT_TRUE(text.ends_with(contentOf(folder / ("expected." + format)))) << format;
        EXPECT_THAT(messages(), HasSubstr("/dev/stdout")) << format;
    }
    EXPECT_EQ(run("modeling convert cube.ply - --format ply --json --center"), 0);
    EXPECT_THAT(output(), StartsWith("ply\n"));
    EXPECT_THAT(messages(), HasSubstr("\"output\": \"/dev/stdout\""));
    for (char const* const failing : {"modeling convert none.ply - --format ply --json",
             "modeling merge cube.ply none.ply - --format ply --json --require nothing",
             "modeling convert cube.ply -"}) {
        EXPECT_NE(run(failing), 0);
        EXPECT_EQ(output(), "") << failing;
    }
    EXPECT_THAT(messages(), HasSubstr("/dev/stdout cannot be written: --format has to name its format"));
    EXPECT_EQ(run("mkfifo out.ply; cat out.ply > copy.ply & modeling convert cube.ply out.ply && wait; "
                  "modeling convert cube.ply >(cat > other.ply) --format ply; modeling info copy.ply; "
                  "modeling make-volume cylinder.obj - --distance-to 0 0 0 --voxels 9 > a.vdb; "
                  "modeling subdivide cylinder.obj s.ply --relative 0.1 --volume a.vdb"),
        0)
        << messages();
}

TEST_F(Streams, EndWithAMessageIfTheOtherSideDoes)
{
    for (std::string const format : {"ply", "h5", "obj"}) {
        run("modeling subdivide cylinder.obj large.ply --relative 0.003; modeling convert large.ply - --format "
            + format + " | head -c 10; echo ${PIPESTATUS[0]}");
        EXPECT_TRUE(output().ends_with("3\n")) << output();
        EXPECT_THAT(messages(), HasSubstr("/dev/stdout cannot be written: the program that reads it has ended"))
            << format;
    }
    EXPECT_EQ(run("modeling convert cube.ply - --format ply >&-"), 3);
    EXPECT_THAT(messages(), HasSubstr("/dev/stdout cannot be written: Bad file descriptor"));
    EXPECT_EQ(run("modeling info - <&- --format obj"), 0); // an empty file
    for (char const* const signal : {"INT", "TERM", "HUP"}) { // while it waits
        EXPECT_EQ(run("mkfifo pipe; sleep 20 > pipe & env --default-signal=INT,HUP '" MODELING_PROGRAM
                      "' info pipe & sleep 0.5; kill -"
                      + std::string(signal) + " $!; wait $!; code=$?; kill %1; rm pipe; exit $code"),
            6)
            << signal;
        EXPECT_THAT(messages(), HasSubstr("cancelled")) << signal;
    }
}

/// What the HDF5 library does is done in a process of its own.
TEST_F(Streams, CanBeClosedAndSignalsIgnored)
{
    for (char const* const line :
        {"env --ignore-signal=CHLD '" MODELING_PROGRAM "' convert cube.ply a.h5 && modeling info a.h5",
            "modeling convert cube.ply b.h5 <&- && modeling convert b.h5 b.ply <&- && cmp a.h5 b.h5",
            "modeling convert cube.ply c.h5 <&- 2>&- && modeling info c.h5 2>&- && cmp a.h5 c.h5",
            "nohup '" MODELING_PROGRAM "' convert cube.ply d.h5 && cmp a.h5 d.h5"})
        EXPECT_EQ(run(line), 0) << line << "\n" << messages();
    EXPECT_EQ(run("modeling convert cube.ply e.h5 >&-"), 3); // the report is lost
    EXPECT_EQ(contentOf(folder / "e.h5"), contentOf(folder / "a.h5"));
}

}
