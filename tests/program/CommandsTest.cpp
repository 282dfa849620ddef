#include "program/TemporaryFolder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <cstring>
#include <sstream>

#include <sys/wait.h>

namespace {

using namespace TestSupport;
using nlohmann::json;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

constexpr char kPlyPoints[] = "property float x\nproperty float y\nproperty float z\n";

std::string plyOf(int vertexCount, std::string const& rest)
{
    return "ply\nformat ascii 1.0\nelement vertex " + std::to_string(vertexCount) + "\n" + kPlyPoints + rest;
}

std::string const kCloud =
    plyOf(7, "property uchar label\nend_header\n0 0 0 0\n1 0 0 3\n2 0 0 0\n3 0 0 1\n4 0 0 0\n5 0 0 0\n6 0 0 1\n");

/// The values at some paths of a document, as a list.
json at(json const& document, std::initializer_list<char const*> places)
{
    json values = json::array();
    for (std::string const place : places)
        values.push_back(document.value(json::json_pointer("/" + place), json()));
    return values;
}

/// Runs the program in a shell, in a folder of its own.
class Commands : public testing::Test {
protected:
    struct Result {
        int exitCode = -1;
        std::string output;
        std::string messages;
    };

    /// Replaces files, unless `replaces` is false.
    Result run(std::string const& arguments, std::string const& output = "stdout", bool replaces = true)
    {
        bool const writes = arguments.find(' ') != std::string::npos && !arguments.starts_with("info ")
            && !arguments.starts_with("validate ");
        int const status = runShell(
            "'" MODELING_PROGRAM "' " + arguments + (writes && replaces ? " -f >" : " >") + output + " 2>stderr");
        return {
            WIFEXITED(status) ? WEXITSTATUS(status) : -1, contentOf(folder / "stdout"), contentOf(folder / "stderr")};
    }

    int runShell(std::string const& line) const
    {
        return std::system(("cd '" + (folder / "").string() + "' && " + line).c_str());
    }

    json runForJson(std::string const& arguments) { return json::parse(run(arguments + " --json").output); }

    bool areEqual(char const* file, char const* other) { return contentOf(folder / file) == contentOf(folder / other); }

    void copySamples(std::initializer_list<char const*> names)
    {
        for (char const* const name : names)
            std::filesystem::copy_file(std::filesystem::path(MODELING_SAMPLES) / name, folder / name);
    }

    TemporaryFolder folder;
};

TEST_F(Commands, RemoveSliversKeepsClosedManifolds)
{
    copySamples({"cylinder.obj"});
    json const done = runForJson("remove-slivers cylinder.obj out.ply --ratio 0.1");
    EXPECT_EQ(
        at(done, {"exitCode", "ratio", "before/slivers", "before/faces", "after/genus"}), json({0, 0.1, 64, 256, 0}));
    EXPECT_LT(done["after"]["faces"], 256);
    EXPECT_FALSE(done["droppedProperties"].empty());
    EXPECT_GT(done["peakMemoryBytes"], 0);
    json const info = runForJson("info out.ply");
    EXPECT_EQ(at(info, {"counts/points", "counts/corners", "counts/faces"}),
        at(done, {"after/points", "after/corners", "after/faces"}));
    EXPECT_EQ(info["topology"]["closedManifold"], true);
    EXPECT_EQ(info["properties"].size(), 3);
    Result const table = run("remove-slivers cylinder.obj again.ply --ratio 0.1 --threads 1");
    EXPECT_THAT(table.output, testing::ContainsRegex("slivers +64 +0\n"));
    EXPECT_TRUE(areEqual("again.ply", "out.ply"));

    json const none = runForJson("remove-slivers cylinder.obj out.obj --ratio 0.01"); // nothing collapses
    EXPECT_TRUE(none["droppedProperties"].empty());
    EXPECT_EQ(run("remove-slivers cylinder.obj cylinder.obj --ratio 0.1").exitCode, 0); // in place
    EXPECT_EQ(runForJson("info cylinder.obj")["counts"], info["counts"]);
}

TEST_F(Commands, RepairMakesWhatOthersAccept)
{
    copySamples({"bunny.obj", "sphere-with-hole.stl"});
    EXPECT_THAT(run("subdivide sphere-with-hole.stl out.ply --relative 0.1").messages,
        AllOf(HasSubstr("(modeling repair --only fill)"), HasSubstr("(modeling repair --only split)")));
    json const done = runForJson("repair sphere-with-hole.stl closed.ply");
    EXPECT_EQ(at(done, {"exitCode", "repairs/filledHoles", "repairs/splitPoints", "after/openEdges", "after/genus"}),
        json({0, 3, 0, 0, 0}));
    EXPECT_EQ(run("subdivide closed.ply out.ply --relative 0.1").exitCode, 0);
    EXPECT_EQ(run("run sphere-with-hole.stl chain.ply --do 'repair; subdivide --relative 0.1'").exitCode, 0);
    EXPECT_TRUE(areEqual("chain.ply", "out.ply"));

    json const none = runForJson("repair bunny.obj out.obj --strict");
    EXPECT_EQ(at(none, {"exitCode", "warnings", "droppedProperties"}), json({0, json::array(), json::array()}));
    for (auto const& [name, count] : none["repairs"].items())
        EXPECT_EQ(count, 0) << name;

    Result const left = run("repair sphere-with-hole.stl out.ply --max-hole 2 --strict");
    EXPECT_EQ(left.exitCode, 8);
    EXPECT_THAT(left.messages, HasSubstr("the result is not a closed manifold: 9 open edges. 3 holes have more edges"));
    EXPECT_EQ(run("repair sphere-with-hole.stl out.ply --only weld,orient --strict").exitCode, 0);
    store(folder / "seam.ply",
        plyOf(5,
            "property float heat\nproperty float age\nelement face 2\nproperty list uchar int "
            "vertex_indices\nend_header\n"
            "0 0 0 1 7\n1 0 0 2 7\n0 1 0 3 7\n0 0 0 4 7\n1 1 0 5 7\n3 0 1 2\n3 1 4 2\n"));
    EXPECT_THAT(run("repair seam.ply out.ply --only weld").messages,
        HasSubstr("warning: points that were merged had different values of heat; those of the lowest are kept"));
    EXPECT_THAT(run("repair bunny.obj out.ply --skip fil").messages,
        HasSubstr("--skip: there is no step \"fil\"; did you mean fill?"));
}

TEST_F(Commands, SmoothMovesPointsAndPinsThem)
{
    copySamples({"bunny.obj", "cylinder.obj"});
    for (auto const& [amount, dropped] : {std::pair{"1", json({"normal"})}, {"0", json::array()}})
        EXPECT_EQ(
            runForJson("smooth cylinder.obj out.obj --amount " + std::string(amount))["droppedProperties"], dropped);
    json const done = runForJson("smooth bunny.obj out.ply --amount 2");
    EXPECT_EQ(done["exitCode"], 0);
    EXPECT_EQ(done["before"]["faces"], done["after"]["faces"]);
    EXPECT_LT(done["after"]["spreadOfEdgeLengths"], done["before"]["spreadOfEdgeLengths"]);
    EXPECT_NEAR(done["after"]["volume"].get<double>() / done["before"]["volume"].get<double>(), 1, 0.02);
    EXPECT_GT(done["meanDisplacement"], 0);

    // A square of four triangles around its only inner point; the boundary moves unless it is pinned.
    store(folder / "square.ply",
        plyOf(6,
            "property uchar locked\nproperty float soft\nelement face 4\nproperty list uchar int vertex_indices\n"
            "end_header\n0 0 0 1 0\n4 0 0 1 0\n4 4 0 1 0\n0 4 0 1 0\n1 1 0 0 0.5\n9 9 9 0 1\n"
            "3 0 1 4\n3 1 2 4\n3 2 3 4\n3 3 0 4\n"));
    Result const refused = run("smooth square.ply out.ply");
    EXPECT_EQ(refused.exitCode, 5);
    EXPECT_THAT(refused.messages, HasSubstr("1 of 6 points in square.ply belongs to no face"));
    for (char const* const pins : {"--pin-boundary", "--pin-attribute locked", "--weights soft"}) {
        json const pinned = runForJson("smooth square.ply out.ply --drop-isolated " + std::string(pins));
        EXPECT_EQ(at(pinned, {"droppedPoints", "pinnedPoints"}), json({1, 4})) << pins;
        EXPECT_EQ(runForJson("info out.ply")["boundingBox"], json({{"min", {0, 0, 0}}, {"max", {4, 4, 0}}})) << pins;
    }
    EXPECT_THAT(run("smooth square.ply out.ply --weights heat --drop-isolated").messages,
        HasSubstr(
            "--weights: square.ply has no attribute \"heat\" with one number per point. There are: locked, soft"));
}

TEST_F(Commands, QuietPrintsOnlyMessages)
{
    copySamples({"cube.ply", "bunny.obj"});
    constexpr char kSmooth[] = "smooth cube.ply out.ply --amount 9 --quiet";
    Result const quiet = run(kSmooth);
    EXPECT_EQ(std::to_string(quiet.exitCode) + quiet.output + quiet.messages, "0"); // the shape is not measured
    EXPECT_EQ(run("smooth cube.ply loud.ply --amount 9").exitCode, 0);
    EXPECT_TRUE(areEqual("out.ply", "loud.ply"));
    Result const strict = run(std::string(kSmooth) + " --strict");
    EXPECT_EQ(strict.exitCode, 8);
    EXPECT_EQ(strict.output, "");
    EXPECT_THAT(strict.messages, HasSubstr("warning: the shape changed"));
    EXPECT_GT(runForJson(kSmooth)["after"]["area"], 0);
    for (char const* const command : {"triangulate", "remove-slivers", "subdivide --relative 0.02"}) {
        EXPECT_EQ(run(command + std::string(" bunny.obj quiet.ply -q")).output, "") << command;
        EXPECT_EQ(run(command + std::string(" bunny.obj loud.ply")).exitCode, 0) << command;
        EXPECT_TRUE(areEqual("quiet.ply", "loud.ply")) << command;
    }
    EXPECT_THAT(run("remove-slivers cube.ply out.ply -q").messages, HasSubstr("needs a closed manifold mesh"));
}

TEST_F(Commands, NamesInFilesCannotControlTheTerminal)
{
    store(folder / "in.ply", plyOf(1, "property float a\x1b[2J\nproperty uchar b\x1b\nend_header\n0 0 0 1 2\n"));
    EXPECT_THAT(run("info in.ply").output, AllOf(Not(HasSubstr("\x1b")), HasSubstr("a?[2J ")));
    EXPECT_THAT(run("convert in.ply out.obj").messages, AllOf(Not(HasSubstr("\x1b")), HasSubstr("\"b?\" (uchar")));
    EXPECT_EQ(runForJson("info in.ply")["properties"][2]["name"], "b\x1b");
}

/// A cube whose sides are cut into n² squares of two triangles each.
std::string cubeOf(int n)
{
    std::string stl = "solid\n";
    for (int side = 0; side != 6; ++side)
        for (int square = 0; square != n * n; ++square)
            for (int triangle = 0; triangle != 2; ++triangle) {
                stl += "facet normal 0 0 0\nouter loop\n";
                for (int corner = 0; corner != 3; ++corner) {
                    int const axis = side / 2, quadCorner = corner == 0 ? 0 : corner + triangle;
                    int place[3];
                    place[axis] = side % 2 * n;
                    int const across = square % n + (quadCorner == 1 || quadCorner == 2 ? 1 : 0);
                    int const along = square / n + (quadCorner >= 2 ? 1 : 0);
                    place[(axis + 1) % 3] = side % 2 ? across : along;
                    place[(axis + 2) % 3] = side % 2 ? along : across;
                    stl += "vertex " + std::to_string(place[0]) + " " + std::to_string(place[1]) + " "
                        + std::to_string(place[2]) + "\n";
                }
                stl += "endloop\nendfacet\n";
            }
    return stl + "endsolid\n";
}

TEST_F(Commands, WarnsIfTheShapeChangesMuch)
{
    copySamples({"cylinder.obj", "bunny.obj"});
    store(folder / "cube.stl", cubeOf(4));
    struct Case {
        char const* arguments;
        char const* warning; // null for none
    };
    constexpr Case kCases[] = {
        {"smooth bunny.obj out.obj --amount 3", nullptr},
        {"smooth cube.stl out.stl", "a point by 3.9 % of the diagonal"},
        {"smooth cube.stl out.stl --pin-sharp 30", nullptr},
        {"remove-slivers cylinder.obj out.obj --ratio 0.1", "the volume by -14 %, a point by 4.3 %"},
        {"subdivide cube.stl out.stl --relative 0.02", "the volume by -5.5 %, the area by -13 %"},
        {"triangulate cube.stl out.stl", nullptr},
    };
    for (Case const& c : kCases) {
        json const done = runForJson(c.arguments);
        ASSERT_EQ(done["exitCode"], 0) << c.arguments;
        EXPECT_THAT(done["warnings"].dump(), HasSubstr(c.warning ? c.warning : "[]")) << c.arguments;
        for (char const* const value :
            {"after/volume", "after/area", "after/foldOvers", "after/largestMoveOverDiagonal"})
            EXPECT_TRUE(at(done, {value})[0].is_number()) << c.arguments << " " << value;
    }
    json const pinned = runForJson("smooth cube.stl out.stl --pin-sharp 30");
    EXPECT_EQ(at(pinned, {"pinnedPoints", "before/volume", "after/volume", "after/area", "after/foldOvers"}),
        json({12 * 3 + 8, 64, 64, 96, 0}));
    std::string const deleteFaces = "delete-faces cube.stl out.stl --box 0 0 0 4 4 0";
    EXPECT_EQ(at(runForJson(deleteFaces), {"before/area", "after/area"}), json({96, 80}));
    EXPECT_THAT(run(deleteFaces).output, testing::ContainsRegex("area +96\\.0 +80\\.0\n"));
}

TEST_F(Commands, TriangulateKeepsTheSelectedChannels)
{
    store(
        folder / "quad.obj", "v 0 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0\nvt 0 0\nvt 1 0\nvt 1 1\nvt 0 1\nf 1/1 2/2 3/3 4/4\n");
    json const done = runForJson("triangulate quad.obj out.obj --check");
    EXPECT_EQ(at(done, {"before/quads", "after/triangles", "keptProperties/0", "check/0/corners", "check/0/lossy"}),
        json({1, 2, "uv", "4", 0}));
    EXPECT_EQ(runForJson("info out.obj")["properties"].size(), 4);
    EXPECT_EQ(runForJson("triangulate quad.obj out.obj --channels '* -uv'")["droppedProperties"], json({"uv"}));

    // A concave face of a few thousandths of a unit: too small for the library in its own units, but not for the
    // program. The other face intersects itself.
    store(folder / "small.obj",
        "v 0.001 0.001 0\nv 0 0.003 0\nv 0 0 0\nv 0.003 0 0\nf 1 2 3 4\n"
        "v 0 0 1\nv 1 1 1\nv 1 0 1\nv 0 2 1\nf 5 6 7 8\n");
    std::string const check = "triangulate small.obj out.ply --check";
    EXPECT_EQ(at(runForJson(check), {"check/0/fans", "check/0/firstLossy"}), json({1, 1}));
    EXPECT_EQ(at(runForJson(check + " --keep-units"), {"check/0/fans"}), json({2}));
    EXPECT_THAT(run(check).output, HasSubstr("1 (first: face 1)"));
}

TEST_F(Commands, StitchLaysTemplatesOnFacesWithAsManyCorners)
{
    copySamples({"stitch-quad.obj", "stitch-quad-rings.obj", "stitch-triangle.obj", "stitch-triangle-rings.obj",
        "stitch-wrong.obj"});
    store(folder / "mesh.obj", "v 0 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0\nv 2 0 1\nv 2 1 1\nf 1 2 3 4\nf 2 5 6 3\nf 1 4 6\n");
    std::string const on = "stitch --on mesh.obj out.obj --template stitch-quad.obj ";
    std::string const rings = on + "stitch-quad-rings.obj", wrong = on + "stitch-wrong.obj";
    EXPECT_EQ(at(runForJson(rings), {"coveredFaces", "otherFaces"}), json({2, 1}));
    EXPECT_EQ(runForJson("info out.obj")["counts"], json({{"points", 2 * 4 * 13}, {"strands", 2 * 4}}));
    std::string const laid = contentOf(folder / "out.obj");
    for (char const* const option : {" --flip", " --normals faces", " --rotate 1"}) {
        EXPECT_EQ(run(rings + option).exitCode, 0);
        EXPECT_NE(contentOf(folder / "out.obj"), laid) << option;
    }
    EXPECT_EQ(run(rings + " --rotate 4 --threads 1").exitCode, 0); // a full turn
    EXPECT_EQ(contentOf(folder / "out.obj"), laid);
    EXPECT_EQ(run("stitch --check --template stitch-triangle.obj stitch-triangle-rings.obj").exitCode, 0);

    EXPECT_EQ(runForJson(wrong)["template"]["messages"].size(), 6);
    EXPECT_THAT(run(wrong).messages,
        AllOf(HasSubstr("vertex: strand 1, control point 1\n"), HasSubstr("strand 2, control point 1\n  - polygon"),
            HasSubstr("points: edge 3\n")));
    EXPECT_EQ(run(wrong + " --allow-faults").exitCode, 0);
    EXPECT_EQ(run("stitch --template stitch-quad.obj stitch-quad-rings.obj").exitCode, 2);
    EXPECT_EQ(run("stitch --check --template mesh.obj stitch-wrong.obj --allow-faults").exitCode, 5);
}

TEST_F(Commands, MergeReportsHowAttributesWereMerged)
{
    copySamples({"cube.ply", "spider.obj"});
    json const done = runForJson("merge cube.ply spider.obj cube.ply -o cube.ply --source-attribute file");
    EXPECT_EQ(at(done, {"exitCode", "after/faces"}), json({0, 6 + 1368 + 6}));
    EXPECT_EQ(done["after"], done["before"]);
    json const everywhere{"normal", "uv", "file"}; // the names of groups and materials are not
    EXPECT_EQ(done["properties"].size(), everywhere.size() + 7);
    for (json const& property : done["properties"]) {
        bool const isEverywhere = std::find(everywhere.begin(), everywhere.end(), property["name"]) != everywhere.end();
        EXPECT_EQ(property["missingIn"], isEverywhere ? json::array() : json({"cube.ply", "cube.ply"})) << property;
    }
    EXPECT_EQ(run("merge -f cube.ply spider.obj -o all.obj").exitCode, 0);
    EXPECT_THAT(contentOf(folder / "all.obj"), AllOf(HasSubstr("mtllib spider.mtl\n"), HasSubstr("\nusemtl Skin\n")));
    store(folder / "a.xyz", "0 0 0\n1 1 1\n");
    store(folder / "b.xyz", "0 0 0 0 0 1\n");
    EXPECT_EQ(
        at(runForJson("merge a.xyz b.xyz out.ply"), {"properties/0/name", "properties/0/missingIn/0", "after/points"}),
        json({"normal", "a.xyz", 3}));
}

TEST_F(Commands, ConvertKeepsWhatBothFormatsHold)
{
    copySamples({"cube.ply", "spider.obj"});
    store(folder / "cloud.ply", kCloud);
    store(folder / "lines.obj", "v 0 0 0\nv 1 0 0\nl 1 2\n");
    json const done = runForJson("convert spider.obj out.ply --threads 1");
    EXPECT_EQ(done["counts"], runForJson("info out.ply")["counts"]);
    EXPECT_EQ(done["counts"], runForJson("info spider.obj")["counts"]);
    EXPECT_THAT(done["warnings"].dump(), HasSubstr("(string, material) is left out: only OBJ and HDF5"));
    EXPECT_THAT(runForJson("convert cloud.ply out.obj")["warnings"].dump(), HasSubstr("label"));
    EXPECT_EQ(run("convert cloud.ply out.ply").exitCode, 0);
    EXPECT_EQ(runForJson("info out.ply")["properties"], runForJson("info cloud.ply")["properties"]);
    EXPECT_THAT(run("convert lines.obj out.vtp").output, AllOf(HasSubstr("strands"), HasSubstr("out.vtp")));
    EXPECT_EQ(run("convert lines.obj out.ply").exitCode, 3);
    EXPECT_THAT(run("convert cube.ply out.stl").messages, HasSubstr("triangles only, but face 0 has 4 corners"));
}

TEST_F(Commands, ReadLenientlyAndCenteredOnRequest)
{
    store(folder / "far.obj",
        "v 500000.125 4100000.5 1\nv 500080 4100000 1\nv nan nan nan\nv 500080 4100060 0\nf 1 2 4\nf 1 2\n");
    store(folder / "near.obj", "v 500700.125 4100000 1\nv 500080 4100000 1\nv 500080 4100060 0\nf 1 2 3\n");
    EXPECT_EQ(run("merge near.obj far.obj out.obj").exitCode, 3);
    json const done = runForJson("merge --lenient --center far.obj near.obj out.obj");
    EXPECT_EQ(at(done, {"center", "after/points", "after/faces"}), json({{500000, 4100000, 0}, 6, 2}));
    EXPECT_EQ(done["warnings"].size(), 2); // one point and one face
    EXPECT_THAT(contentOf(folder / "out.obj"),
        AllOf(HasSubstr("# center 500000 4100000 0 subtracted"), HasSubstr("\nv 0.125 0.5 1\n"),
            HasSubstr("\nv 700.125 0 1\n")));
    for (char const* const extension : {".ply", ".stl", ".vtp"}) {
        std::string const out = std::string("out") + extension;
        EXPECT_THAT(run("merge near.obj --center-at 500000 4100000 -0.5 " + out).output,
            HasSubstr("center 500000 4100000 -0.5 subtracted"));
        EXPECT_THAT(contentOf(folder / out), HasSubstr("center 500000 4100000 -0.5 subtracted"));
    }
    copySamples({"stitch-quad.obj", "stitch-quad-rings.obj"});
    std::string const check = "stitch --check --template stitch-quad.obj stitch-quad-rings.obj";
    EXPECT_EQ(run(check + " --center-at 5 5 5").output, run(check).output); // only the mesh would be translated
}

TEST_F(Commands, PointsAndFacesArePickedAndKeepTheirAttributes)
{
    copySamples({"cube.ply"});
    store(folder / "cloud.ply", kCloud);
    store(folder / "list",
        "\xEF\xBB\xBF"
        "5 0 # twice\n\n5\n");
    for (auto const& [arguments, picked] : {std::pair{"points cloud.ply --indices list", 2},
             {"points cloud.ply --attribute label", 3}, {"points cloud.ply --box 4 9 9 1 -9 -9", 4},
             {"points cloud.ply --box 1 -9 -9 4 9 9 --invert", 3}, {"faces cube.ply --indices list", 2}}) {
        json const done = runForJson("delete-" + std::string(arguments) + " out.ply");
        EXPECT_EQ(done["picked"], picked) << arguments;
        std::string const element(arguments, std::strchr(arguments, ' '));
        EXPECT_EQ(done["before"][element].get<int>() - done["after"][element].get<int>(), picked) << arguments;
        json counts = done["after"];
        for (char const* const measure : {"volume", "area", "foldOvers"})
            counts.erase(measure);
        EXPECT_EQ(runForJson("info out.ply")["counts"], counts) << arguments;
    }
    EXPECT_EQ(runForJson("info out.ply")["properties"].size(), runForJson("info cube.ply")["properties"].size());
    EXPECT_THAT(run("delete-points cloud.ply out.ply --attribute label").output, HasSubstr("picked 3 of 7 points\n"));

    json const added = runForJson("add-points cloud.ply cube.ply both.ply --tag new");
    json const cubePoints = runForJson("info cube.ply")["counts"]["points"];
    EXPECT_EQ(added["after"]["points"].get<int>(), 7 + cubePoints.get<int>());
    EXPECT_EQ(runForJson("delete-points both.ply again.ply --attribute new")["picked"], cubePoints);
    EXPECT_EQ(runForJson("info again.ply")["boundingBox"], runForJson("info cloud.ply")["boundingBox"]);
}

TEST_F(Commands, SubdivideInterpolatesPropertiesOrSaysWhyNot)
{
    store(folder / "tetrahedron.ply",
        plyOf(4,
            "property float heat\nproperty int id\nelement face 4\nproperty list uchar int vertex_indices\n"
            "property float area\nend_header\n1 1 1 1 7\n1 -1 -1 2 7\n-1 1 -1 3 7\n-1 -1 1 4 7\n"
            "3 0 1 2 1\n3 0 3 1 1\n3 0 2 3 1\n3 1 3 2 1\n"));
    json const done = runForJson("subdivide tetrahedron.ply out.ply --tolerance 0.3");
    EXPECT_EQ(at(done, {"exitCode", "tolerance", "after/genus"}), json({0, 0.3, 0}));
    EXPECT_GT(done["after"]["faces"], 12);
    EXPECT_EQ(done["droppedProperties"].size(), 2);
    EXPECT_THAT(done["warnings"].dump(),
        AllOf(HasSubstr("id: values of type int"), HasSubstr("refinement replaces faces and corners")));
    json const info = runForJson("info out.ply");
    EXPECT_EQ(at(info, {"topology/closedManifold", "counts/faces"}), json({true, done["after"]["faces"]}));
    EXPECT_THAT(info["properties"].dump(), AllOf(HasSubstr("heat"), Not(HasSubstr("id"))));

    copySamples({"mixed.obj"});
    EXPECT_EQ(run("subdivide mixed.obj out.obj --relative 0.1").exitCode, 5);
    EXPECT_EQ(runForJson("subdivide mixed.obj out.obj --relative 0.1 --triangulate")["after"]["genus"], 0);

    // The same size relative to the diagonal of √12; in place on a terminal, where faces are counted for the progress.
    run("subdivide tetrahedron.ply again.ply --relative 0.0866025404 --threads 1");
    EXPECT_TRUE(areEqual("again.ply", "out.ply"));
    std::string const line = MODELING_PROGRAM " subdivide tetrahedron.ply tetrahedron.ply --force --tolerance 0.3";
    ASSERT_EQ(runShell("script -qec '" + line + "' typescript >/dev/null"), 0);
    EXPECT_TRUE(areEqual("tetrahedron.ply", "out.ply"));
}

TEST_F(Commands, MakeVolumeGuidesSubdivide)
{
    copySamples({"bunny.obj"});
    json const made =
        runForJson("make-volume bunny.obj guide.vdb --distance-to -3 7.5 0 --from 0.25 --to 3 --voxels 60");
    EXPECT_EQ(at(made, {"exitCode", "output", "volume/smallestValue", "volume/largestValue"}),
        json({0, "guide.vdb", 0.25, 3}));
    run("make-volume bunny.obj again.vdb --distance-to -3 7.5 0 --from 0.25 --to 3 --voxels 60 --threads 1");
    EXPECT_TRUE(areEqual("again.vdb", "guide.vdb"));

    json const guided = runForJson("subdivide bunny.obj guided.ply --relative 0.01 --volume guide.vdb --grid scale");
    json volume = made["volume"];
    volume["coveredFaces"] = 3674;
    EXPECT_EQ(guided["volume"], volume);
    EXPECT_EQ(guided["inputs"][1]["format"], "OpenVDB");
    // Coarse far from the head: fewer faces than without the volume.
    EXPECT_LT(guided["after"]["faces"], runForJson("subdivide bunny.obj out.ply --relative 0.0025")["after"]["faces"]);
    run("subdivide bunny.obj again.ply --relative 0.01 --volume guide.vdb --tile-side 5 --threads 1");
    EXPECT_TRUE(areEqual("again.ply", "guided.ply"));

    store(folder / "square.ply",
        plyOf(4,
            "property short heat\nelement face 1\nproperty list uchar int vertex_indices\nend_header\n"
            "0 0 0 1\n9 0 0 4\n9 9 0 4\n0 9 0 1\n4 0 1 2 3\n"));
    json const heat =
        runForJson("make-volume square.ply heat.vdb --attribute heat --voxel-size 1 --band 1 --grid heat");
    EXPECT_EQ(at(heat, {"volume/grid", "volume/activeVoxels", "volume/largestValue", "volume/background"}),
        json({"heat", 3 * 100 + 4 * 10, 4, 1}));
    Result const away = run("subdivide bunny.obj out.ply --relative 0.1 --volume heat.vdb --min-value 2");
    EXPECT_THAT(away.output, HasSubstr("values from 2 to 4, background 2\n"));

    // A hexagonal cone whose rim surrounds the point of distance 0.
    store(folder / "cap.obj",
        "v 0 0 0\nv 0 0 -10\nv 10 0 0\nv 5 8.66 0\nv -5 8.66 0\nv -10 0 0\nv -5 -8.66 0\nv 5 -8.66 0\n"
        "f 1 3 4\nf 1 4 5\nf 1 5 6\nf 1 6 7\nf 1 7 8\nf 1 8 3\nf 2 4 3\nf 2 5 4\nf 2 6 5\nf 2 7 6\nf 2 8 7\nf 2 3 8\n");
    run("make-volume cap.obj cap.vdb --distance-to 0 0 0 --voxels 20");
    json const cap = runForJson("subdivide cap.obj out.ply --tolerance 0.1 --volume cap.vdb");
    EXPECT_EQ(at(cap, {"exitCode", "after/genus"}), json({0, 0}));
    EXPECT_GT(cap["tooLargeFaces"], 0);
    EXPECT_THAT(cap["warnings"].dump(), HasSubstr(" faces are still larger than the tolerance"));
    EXPECT_EQ(guided["tooLargeFaces"], 0);
}

TEST_F(Commands, FailuresSayWhyAndLeaveFilesUnchanged)
{
    copySamples({"cylinder.obj", "sphere-with-hole.stl", "cube.ply", "spider.obj", "bunny.obj"});
    ASSERT_EQ(run("make-volume bunny.obj tiny.vdb --distance-to 0 0 0 --from 1e-9 --to 1 --voxels 9").exitCode, 0);
    store(folder / "lines.obj", "v 0 0 0\nv 1 0 0\nl 1 2\n");
    store(folder / "cloud.ply", kCloud);
    store(folder / "list", "0 # the first\n 1 2 3 4 5 6 -1\n");
    store(folder / "broken.obj", "v 0 0 0\nf 1 2 3\n");
    store(folder / "tiny.obj", "v 0 0 0\nv 1e-9 0 0\nv 0 1e-9 0\nv 0 0 1e-9\nf 1 3 2\nf 1 2 4\nf 2 3 4\nf 3 1 4\n");
    store(folder / "far.obj", "v -3e38 0 0\nv 3e38 0 0\nv 0 3e38 0\nf 1 2 3\n");
    store(folder / "seams.ply",
        plyOf(3,
            "property float u\nproperty float v\nelement face 1\nproperty list uchar int vertex_indices\n"
            "property list uchar float texcoord\nend_header\n0 0 0 1 2\n1 0 0 1 2\n0 1 0 1 2\n3 0 1 2 6 1 2 3 4 5 "
            "6\n"));
    std::filesystem::create_directory(folder / "folder.obj");
    store(folder / "out.obj", "as it was");

    struct Case {
        char const* arguments;
        int exitCode;
        char const* message;
    };
    constexpr Case kCases[] = {
        {"remove-slivers cube.ply out.obj", 5, "6 faces have more than three corners. The first is face 0 with 4"},
        {"remove-slivers cube.ply out.obj", 5, "are at the same position as another point"},
        {"subdivide sphere-with-hole.stl out.obj --tolerance 1", 5, "9 of 432 edges are boundary edges"},
        {"subdivide lines.obj out.obj --tolerance 1", 5, "lines.obj contains a strand set"},
        {"subdivide cylinder.obj out.obj --relative 1e-9", 5, "finer than single precision"},
        {"subdivide cylinder.obj out.obj --relative 1e-3 --max-memory 1kB", 7, "that --max-memory allows"},
        {"subdivide cylinder.obj out.obj --tolerance 0", 2, "0 is not a positive number"},
        {"merge cube.ply spider.obj out.ply --source-attribute normal", 5, "already has a property"},
        {"triangulate lines.obj out.obj", 5, "lines.obj contains a strand set"},
        {"triangulate cube.ply out.obj --channels '* ^'", 2, "--channels: "},
        {"triangulate cube.ply out.obj --channels ' , '", 2, "--channels: the list has no entry"},
        {"remove-slivers broken.obj out.obj", 3, "broken.obj"},
        {"remove-slivers cylinder.obj out.off", 3, "has to end in .obj, .ply, .stl, .vtp, .glb or .h5"},
        {"remove-slivers cylinder.obj nowhere/out.obj", 3, "there is no folder nowhere"},
        {"remove-slivers cylinder.obj folder.obj", 3, "it is a folder"},
        {"remove-slivers cylinder.obj out.obj --ratio 1.5", 2, "1.5 is not a number from 0 to 1"},
        {"remove-slivers cylinder.obj out.obj --threads 0", 2, "--threads"},
        {"delete-faces cloud.ply out.obj --indices list", 5, "needs a mesh, but cloud.ply contains a point cloud"},
        {"delete-faces cube.ply out.obj --indices list", 3, "list, line 2: index 6 is out of range: there are 6 faces"},
        {"delete-points cloud.ply out.obj --attribute other", 5, "There are: label (uchar)"},
        {"add-points cloud.ply cube.ply out.ply --tag sPointPosition", 5, "would replace the points"},
        {"subdivide bunny.obj out.obj --relative 0.1 --volume tiny.vdb --grid no", 5, "There are: \"scale\" (float)"},
        {"subdivide bunny.obj out.obj --relative 0.1 --volume bunny.obj", 3, "it is not an OpenVDB file"},
        {"subdivide bunny.obj out.obj --relative 0.1 --volume tiny.vdb", 5, "times the smallest positive value"},
        {"make-volume bunny.obj out.vdb --attribute heat", 5, "--attribute: bunny.obj has no attribute \"heat\""},
        {"make-volume seams.ply out.vdb --attribute uv", 5, "with one number per point. There are: none"},
        {"smooth seams.ply out.ply --pin-attribute nope", 5, "--pin-attribute: seams.ply has no attribute \"nope\""},
        {"make-volume bunny.obj out.vdb --distance-to 0 0 0 --voxel-size 1e-9", 5, "too small"},
        {"delete-points cloud.ply out.stl --indices list", 3, "STL files cannot hold point clouds"},
        {"delete-faces cube.ply out.stl --indices list", 3, "STL files hold triangles only, but face 0 has 4 corners"},
        {"delete-faces cube.ply out.glb --indices list", 3, "GLB files hold triangles only, but face 0 has 4 corners"},
        {"merge cube.ply spider.obj out.obj --source-attribute file", 5, "out.obj cannot hold the attribute \"file\""},
        {"add-points cloud.ply cube.ply out.ply --tag x", 5, "PLY files cannot hold an attribute named \"x\""},
        {"triangulate cube.ply out.obj --channels 'nor* normal'", 5, "matches \"nor*\". There are: none"},
        {"triangulate seams.ply out.ply --channels '* ^uv'", 5, "matches \"uv\". There are: corner:uv"},
        {"subdivide tiny.obj out.obj --tolerance 1e-12", 5, "is too fine: below 1.1920929e-07 nothing is refined"},
        {"make-volume far.obj out.vdb --distance-to -3e38 0 0 --from 1 --to 2", 5, "too large for single precision"},
        {"make-volume bunny.obj out.vdb --distance-to 0 0 0 --voxels 100000", 7, "would need about"},
        {"make-volume bunny.obj out.vdb --distance-to 0 0 0 --max-memory 1kB", 7, "that --max-memory allows"},
    };
    for (Case const& c : kCases) {
        Result const result = run(c.arguments);
        EXPECT_EQ(result.exitCode, c.exitCode) << c.arguments << "\n" << result.messages;
        EXPECT_THAT(result.messages, HasSubstr(c.message)) << c.arguments;
        EXPECT_EQ(result.output, "") << c.arguments;
        EXPECT_EQ(contentOf(folder / "out.obj"), "as it was") << c.arguments;
    }
    json const refused = runForJson("remove-slivers cube.ply out.obj");
    EXPECT_EQ(refused["exitCode"], 5);
    EXPECT_EQ(refused["error"]["reasons"].size(), 2);
    for (char const* const line : {"info cylinder.obj", "info cylinder.obj --json", "smooth cylinder.obj new.obj",
             "--help", "smooth --help", "--version"}) {
        Result const result = run(line, "/dev/full");
        EXPECT_EQ(result.exitCode, 3) << line;
        EXPECT_THAT(result.messages, HasSubstr("modeling: cannot write to standard output\n")) << line;
    }
}

TEST_F(Commands, StrictAndRequireHaveTheirExitCodes)
{
    copySamples({"cube.ply", "cylinder.obj", "sphere-with-hole.stl", "bunny.obj"});
    store(folder / "cloud.ply", kCloud);
    store(folder / "isolated.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nv 9 9 9\nvt 0 0\nf 1 2 3\n");
    struct Case {
        char const* arguments;
        int exitCode;
        char const* message;
    };
    constexpr Case kCases[] = {
        {"remove-slivers cylinder.obj out.obj --ratio 0.1 --strict", 8, "the shape changed"},
        {"run cylinder.obj out.obj --do 'remove-slivers --ratio 0.1; smooth --amount 0' --strict", 8, "step 1"},
        {"convert cloud.ply out.obj --strict", 8, "label"}, // the format drops it
        {"convert isolated.obj out.obj --strict", 0, "texture coordinates"}, // only the input has them
        {"smooth bunny.obj out.obj --strict --require closed,manifold,oriented,triangles,no-isolated-points", 0, ""},
        {"smooth cube.ply out.obj --require closed,triangles", 5, "cube.ply does not meet --require closed,triangles"},
        {"run sphere-with-hole.stl out.obj --do smooth --require closed", 5, "9 of 432 edges are boundary edges"},
        {"merge bunny.obj cube.ply out.obj --require triangles", 5, "6 faces have more than three corners"},
        {"convert cloud.ply out.obj --require mesh", 5, "It contains a point cloud."},
        {"validate isolated.obj --require no-isolated-points", 5, "1 point belongs to no face"},
        {"info cube.ply --require closde", 2, "--require: nothing is called \"closde\"; did you mean closed?"},
        {"make-volume cube.ply out.vdb --distance-to 0 0 0 --require point-cloud", 5, "It contains a mesh."},
    };
    for (Case const& c : kCases) {
        Result const result = run(c.arguments);
        EXPECT_EQ(result.exitCode, c.exitCode) << c.arguments << "\n" << result.messages;
        EXPECT_THAT(result.messages, HasSubstr(c.message)) << c.arguments;
    }
    EXPECT_EQ(runForJson("remove-slivers cylinder.obj out.obj --ratio 0.1 --strict")["exitCode"], 8);
}

TEST_F(Commands, InfoDescribesManyFilesInLines)
{
    copySamples({"cube.ply", "bunny.obj"});
    store(folder / "cloud.ply", kCloud);
    store(folder / "broken.obj", "v 0 0 0\nf 1 2 3\n");
    Result const text = run("info cube.ply bunny.obj broken.obj cloud.ply");
    EXPECT_EQ(text.exitCode, 3);
    EXPECT_THAT(text.messages, HasSubstr("modeling: broken.obj"));
    EXPECT_EQ(text.output,
        "cube.ply: mesh, PLY (ascii), 24 points, 24 corners, 6 faces, not a closed manifold\n"
        "bunny.obj: mesh, OBJ, 1,839 points, 11,022 corners, 3,674 faces, closed manifold\n"
        "cloud.ply: point cloud, PLY (ascii), 7 points\n");
    std::istringstream lines(run("info cube.ply broken.obj --json").output);
    std::string first, second;
    std::getline(lines, first);
    std::getline(lines, second);
    EXPECT_EQ(json::parse(first), runForJson("info cube.ply"));
    EXPECT_EQ(json::parse(second)["exitCode"], 3);
}

TEST_F(Commands, FilesAreReplacedOnlyWithForce)
{
    copySamples({"cube.ply", "cylinder.obj"});
    std::filesystem::create_symlink("cylinder.obj", folder / "link.obj");
    std::filesystem::create_symlink("/dev/null", folder / "null.obj");
    std::string const before = contentOf(folder / "cylinder.obj");
    constexpr bool kKeeps = false;
    for (char const* const line : {"smooth cylinder.obj cylinder.obj", "smooth cube.ply link.obj",
             "delete-faces cube.ply cylinder.obj --box 0 0 0 1 1 1", "triangulate cube.ply cylinder.obj",
             "subdivide cylinder.obj cylinder.obj --tolerance 9", "remove-slivers none.obj cylinder.obj"}) {
        Result const kept = run(line, "stdout", kKeeps);
        EXPECT_EQ(kept.exitCode, 3) << line;
        EXPECT_THAT(kept.messages, HasSubstr("cannot be written: the file exists; --force replaces it")) << line;
    }
    EXPECT_THAT(run("merge cube.ply cylinder.obj", "stdout", kKeeps).messages,
        HasSubstr("the last file, cylinder.obj, exists. If it is an input, name the output with -o OUT"));
    EXPECT_EQ(contentOf(folder / "cylinder.obj"), before);
    EXPECT_EQ(run("merge cube.ply cylinder.obj -o all.ply", "stdout", kKeeps).exitCode, 0);
    EXPECT_EQ(run("merge cube.ply cylinder.obj new.ply", "stdout", kKeeps).exitCode, 0);
    EXPECT_TRUE(areEqual("all.ply", "new.ply"));
    EXPECT_EQ(run("smooth cylinder.obj null.obj", "stdout", kKeeps).exitCode, 0);
    EXPECT_EQ(run("smooth cylinder.obj link.obj").exitCode, 0);
    EXPECT_NE(contentOf(folder / "cylinder.obj"), before);

    using std::filesystem::perms;
    std::filesystem::permissions(folder / "new.ply", perms::owner_read);
    EXPECT_THAT(run("smooth cube.ply new.ply").messages, HasSubstr("new.ply cannot be written: it is write-protected"));
    EXPECT_THAT(run("smooth none.obj /proc/a.obj").messages,
        HasSubstr("/proc/a.obj cannot be written")); // checked before reading
    EXPECT_EQ(runShell("ulimit -f 2; '" MODELING_PROGRAM "' smooth cylinder.obj large.obj 2>stderr"), 3 << 8);
    EXPECT_THAT(contentOf(folder / "stderr"), HasSubstr("File too large"));
    for (auto const& entry : std::filesystem::directory_iterator(folder / ""))
        EXPECT_FALSE(entry.path().filename().string().starts_with(".")) << entry;
}

TEST_F(Commands, Hdf5FilesHoldSeveralObjects)
{
    copySamples({"cube.ply", "cylinder.obj"});
    constexpr bool kKeeps = false;
    EXPECT_EQ(run("merge cube.ply -o scan.h5#cube", "stdout", kKeeps).exitCode, 0);
    EXPECT_EQ(run("merge cylinder.obj -o scan.h5#round", "stdout", kKeeps).exitCode, 3);
    EXPECT_EQ(run("merge cylinder.obj -o scan.h5#round --compress 6").exitCode, 0);
    EXPECT_THAT(run("info scan.h5").messages, HasSubstr("scan.h5, /: there are 2 objects: cube, round"));
    EXPECT_EQ(run("merge scan.h5#round -o a.ply").exitCode, 0);
    EXPECT_EQ(run("merge cylinder.obj -o b.ply").exitCode, 0);
    EXPECT_TRUE(areEqual("a.ply", "b.ply"));
    EXPECT_EQ(run("merge cube.ply -o a.ply --compress 1").exitCode, 2);
    EXPECT_EQ(runShell("ulimit -f 2; '" MODELING_PROGRAM "' smooth cylinder.obj large.h5 2>stderr"), 3 << 8);
    EXPECT_THAT(contentOf(folder / "stderr"), HasSubstr("modeling: large.h5 cannot be written: File too large\n"));
}

TEST_F(Commands, EmptyGeometryIsAccepted)
{
    copySamples({"cube.ply", "stitch-quad.obj", "stitch-quad-rings.obj"});
    store(folder / "cloud.ply", kCloud);
    store(folder / "all", "");
    for (std::string const extension : {"obj", "ply", "stl", "glb", "h5", "off", "xyz"}) {
        if (extension == "off")
            store(folder / "empty.off", "OFF\n0 0 0\n");
        else if (extension == "xyz")
            store(folder / "empty.xyz", "");
        else if (extension == "stl" || extension == "glb")
            ASSERT_EQ(run("triangulate empty.ply empty." + extension).exitCode, 0);
        else
            ASSERT_EQ(run("delete-faces cube.ply --indices all --invert empty." + extension).exitCode, 0);
        std::string const file = "empty." + extension;
        for (std::string arguments :
            {"info @", "validate @", "convert @ o.ply", "convert @ o.stl", "merge @ @ -o o.glb", "triangulate @ o.ply",
                "smooth @ o.ply", "remove-slivers @ o.ply", "repair @ o.ply", "subdivide @ o.ply --relative 0.1",
                "subdivide @ o.ply --tolerance 1", "make-volume @ guide.vdb --distance-to 0 0 0 --from 1 --to 2",
                "delete-faces @ o.ply --indices all", "delete-points @ o.ply --indices all", "add-points @ @ o.ply",
                "merge @ cube.ply -o o.ply", "merge @ cloud.ply -o o.ply", "merge @ stitch-quad-rings.obj -o o.obj",
                "merge @ @ -o o.ply", "stitch --template stitch-quad.obj stitch-quad-rings.obj --on @ o.vtp"}) {
            for (auto at = arguments.find('@'); at != std::string::npos; at = arguments.find('@'))
                arguments.replace(at, 1, file);
            Result const result = run(arguments);
            EXPECT_EQ(result.exitCode, 0) << arguments << "\n" << result.messages;
            EXPECT_THAT(result.output, Not(HasSubstr("nan"))) << arguments;
        }
    }
    EXPECT_EQ(run("delete-points cloud.ply none.xyz --indices all").exitCode, 3); // XYZ is not written
    EXPECT_EQ(runForJson("delete-points cloud.ply none.ply --indices all")["picked"], 0);
    EXPECT_EQ(runForJson("delete-points cloud.ply none.ply --indices all --invert")["after"]["points"], 0);
    EXPECT_EQ(runForJson("merge none.ply cloud.ply -o both.ply")["after"]["points"], 7);
    EXPECT_EQ(run("subdivide empty.ply o.ply --tolerance 1 --volume guide.vdb").exitCode, 0);
}

TEST_F(Commands, InfoAndValidateDescribeFiles)
{
    copySamples({"mixed.obj"});
    store(folder / "lines.obj", "v 0 0 0\nv 0.1 0 -2\nl 1 2\n");
    EXPECT_EQ(at(runForJson("info mixed.obj"), {"topology/quads", "topology/genus"}), json({6, 0}));
    EXPECT_EQ(at(runForJson("info lines.obj"), {"inputs/0/kind", "boundingBox/min", "boundingBox/max", "topology"}),
        json({"strand set", {0, 0, -2}, {0.1, 0, 0}, nullptr}));
    EXPECT_THAT(run("info lines.obj").output,
        AllOf(HasSubstr("(0, 0, -2) to (0.1, 0, 0)"), HasSubstr("points"), Not(HasSubstr("Comp"))));
    EXPECT_EQ(run("validate lines.obj").output, "lines.obj contains a valid strand set: 2 points, 1 strand\n");
    EXPECT_EQ(runForJson("validate lines.obj")["valid"], true);
    for (char const* const command : {"", "info ", "validate ", "merge ", "triangulate ", "subdivide ", "make-volume ",
             "smooth ", "remove-slivers ", "repair ", "stitch "})
        EXPECT_EQ(run(command + std::string("--help")).exitCode, 0) << command;
    EXPECT_EQ(run("--version").exitCode, 0);
}

}
