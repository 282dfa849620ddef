#include "RunProgram.h"
#include "TemporaryFolder.h"
#include "geometry/Facts.h"
#include "geometry/Histograms.h"
#include "page/DrawnGeometry.h"
#include "shell/ShellWords.h"
#include "support/Testing.h"

#include <TessaraGeometry/Makers.h>

#include <gmock/gmock.h>

#include <fstream>
#include <numeric>
#include <sstream>

namespace {

using namespace ModelingProgram;
using namespace TestSupport;
using namespace Tessara::Geometry;
using testing::ElementsAre;
using testing::HasSubstr;

std::string textOfPage(std::filesystem::path const& file)
{
    std::ostringstream text;
    text << std::ifstream(file, std::ios::binary).rdbuf();
    return text.str();
}

/// The document of a page, and the bytes of a block.
Json documentOfPage(std::string const& page)
{
    std::string const tag = "id=\"data\">";
    std::size_t const begin = page.find(tag) + tag.size();
    return Json::parse(page.substr(begin, page.find("</script>", begin) - begin));
}

std::string decodedBlock(std::string const& page, Json const& array)
{
    std::string const tag = "id=\"" + array["block"].get<std::string>() + "\">";
    std::size_t const begin = page.find(tag) + tag.size();
    std::string const digits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string bytes;
    unsigned int bits = 0, count = 0;
    for (std::size_t i = begin; page[i] != '<' && page[i] != '='; ++i) {
        bits = bits << 6 | static_cast<unsigned int>(digits.find(page[i]));
        count += 6;
        if (count >= 8)
            bytes += static_cast<char>(bits >> (count -= 8) & 0xFF);
    }
    return bytes;
}

/// A square of n by n quads.
Orvan::MutablePtr<Tessara::Object> gridOfQuads(unsigned int n)
{
    Orvan::Array<Tessara::Math::float3> points;
    Orvan::Array<unsigned int> corners, offsets{0};
    for (unsigned int j = 0; j <= n; ++j)
        for (unsigned int i = 0; i <= n; ++i)
            points.append({static_cast<float>(i), static_cast<float>(j), 0});
    for (unsigned int j = 0; j != n; ++j)
        for (unsigned int i = 0; i != n; ++i) {
            unsigned int const p = j * (n + 1) + i;
            for (unsigned int const corner : {p, p + 1, p + n + 2, p + n + 1})
                corners.append(corner);
            offsets.append(static_cast<unsigned int>(corners.size));
        }
    return makeMesh(std::move(points), std::move(corners), std::move(offsets));
}

TEST(Page, HoldsTheArraysBitForBit)
{
    TemporaryFolder const folder;
    store(folder / "a.ply",
        "ply\nformat ascii 1.0\nelement vertex 4\nproperty float x\nproperty float y\nproperty float z\n"
        "property uchar tag\nelement face 1\nproperty list uchar int vertex_indices\nend_header\n"
        "0 0 0.1 1\n1 0 0 2\n1 1 0 3\n0 1 0 250\n4 0 1 2 3\n");
    Result const result =
        run({"page", (folder / "a.html").string(), (folder / "a.ply").string(), "--title", "</title>"});
    ASSERT_EQ(result.exitCode, 0) << result.messages;
    std::string const page = textOfPage(folder / "a.html");
    Json const document = documentOfPage(page);
    EXPECT_EQ(document["title"], "</title>");
    Json const& view = document["views"][0];
    std::string const positions = decodedBlock(page, view["arrays"]["positions"]);
    ASSERT_EQ(positions.size(), 4 * sizeof(float3));
    float z = 0;
    std::memcpy(&z, positions.data() + 8, sizeof(z));
    EXPECT_EQ(z, 0.1f);
    EXPECT_EQ(decodedBlock(page, view["attributes"][0]["array"]), "\x01\x02\x03\xFA");
    EXPECT_EQ(decodedBlock(page, view["arrays"]["triangles"]).size(), 6 * sizeof(unsigned int));
    EXPECT_EQ(decodedBlock(page, view["arrays"]["boundaryEdges"]).size(), 8 * sizeof(unsigned int));
    EXPECT_EQ(view["facts"]["topology"]["openEdges"], 4);
    EXPECT_THAT(page, HasSubstr("default-src 'none'"));
}

TEST(Page, CommandsShowBeforeAndAfter)
{
    TemporaryFolder const folder;
    std::string const page = (folder / "a.html").string(), out = (folder / "a b.obj").string();
    Result const result = run({"run", MODELING_SAMPLES "/mixed.obj", out, "--do", "triangulate", "--page", page, "-q"});
    ASSERT_EQ(result.exitCode, 0) << result.messages;
    Json const document = documentOfPage(textOfPage(page));
    ASSERT_EQ(document["views"].size(), 2u);
    EXPECT_EQ(document["views"][0]["role"], "before");
    EXPECT_EQ(document["views"][0]["facts"]["counts"]["faces"], 6);
    EXPECT_EQ(document["views"][1]["name"], out);
    EXPECT_EQ(document["views"][1]["facts"]["counts"]["faces"], 12);
    EXPECT_THAT(document["run"]["commandLine"].get<std::string>(), HasSubstr("'" + out + "'"));
    EXPECT_GT(document["run"]["peakMemoryBytes"].get<double>(), 0);
    EXPECT_EQ(run({"convert", MODELING_SAMPLES "/mixed.obj", (folder / "c.obj").string(), "--page", page}).exitCode, 3);
    EXPECT_FALSE(std::filesystem::exists(folder / "c.obj")) << "refused before any work";
    EXPECT_EQ(run({"page", out, MODELING_SAMPLES "/mixed.obj", "--force"}).exitCode, 3) << "not a name of a page";
}

TEST(Page, LargeGeometryIsDrawnWithFewerElements)
{
    auto mesh = gridOfQuads(60);
    DrawnGeometry const all = chooseDrawn(*mesh, 7200, true);
    EXPECT_TRUE(all.notes.empty());
    EXPECT_EQ(all.triangles->size, 3 * 7200u);
    EXPECT_EQ(all.boundaryEdges.size, 2 * 240u);
    EXPECT_FALSE(all.points);

    DrawnGeometry const few = chooseDrawn(*mesh, 1000, true);
    ASSERT_EQ(few.notes.size(), 1u);
    EXPECT_GT(few.cells->size, 300u);
    EXPECT_LE(few.cells->size, 1000u);
    EXPECT_EQ(few.corners->size, 3 * few.cells->size);
    for (std::uint64_t i = 0; i != few.corners->size; ++i) {
        EXPECT_LT((*few.cornerPoints)[i], few.points->size);
        EXPECT_EQ((*few.cells)[i / 3], (*few.corners)[i] / 4) << "a corner of its face";
    }
    for (unsigned int const point : few.boundaryEdges)
        EXPECT_LT(point, few.points->size);
}

TEST(Page, HistogramsCountFacesAndTheirEdges)
{
    auto const grid = gridOfQuads(2);
    Histograms const found = measureHistograms(arraysOf(*grid));
    std::size_t const one = -Histograms::kLowestExponent * Histograms::kBinsPerOctave; // lengths from 1 to 2^0.25
    EXPECT_EQ(found.edgeLengths[one], 16u);
    EXPECT_EQ(std::accumulate(found.edgeLengths.begin(), found.edgeLengths.end(), 0u), 16u);
    EXPECT_EQ(found.qualities.back(), 4u);

    auto const odd = makeMesh({{0, 0, 0}, {0, 0, 0}, {3, 0, 0}, {NAN, 0, 0}}, {0, 1, 2, 0, 2, 3}, {0, 3, 6});
    Histograms const few = measureHistograms(arraysOf(*odd));
    EXPECT_EQ(few.zeroEdges, 1u);
    EXPECT_EQ(few.qualities[0], 1u) << "the face with a point that is not a number does not count";
}

TEST(Page, CommandLinesAreQuoted)
{
    EXPECT_EQ(quotedCommand({"modeling", "a b.obj", "--do", "it's", ""}), "modeling 'a b.obj' --do 'it'\\''s' ''");
}

}
