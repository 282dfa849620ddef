#include "MeshTopology.h"
#include "MeshRequirements.h"

#include "support/MeshBuilder.h"

#include <TessaraGeometry/Makers.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace ModelingProgram {

namespace {

    using testing::ElementsAre;
    using testing::HasSubstr;
    using TestSupport::MeshBuilder;
    using Faces = std::vector<std::vector<unsigned int>>;
    using Mesh = Orvan::MutablePtr<Tessara::Object>;

    Mesh meshOf(unsigned int pointCount, Faces const& faces)
    {
        Orvan::Array<Tessara::Math::float3> positions(pointCount);
        for (unsigned int p = 0; p != pointCount; ++p)
            positions[p] = {static_cast<float>(p), 0.5f, 0};
        Orvan::Array<unsigned int> faceVertex;
        Orvan::Array<unsigned int> faceOffset{0};
        for (auto const& face : faces) {
            for (unsigned int const point : face)
                faceVertex.append(point);
            faceOffset.append(static_cast<unsigned int>(faceVertex.size));
        }
        return Tessara::Geometry::makeMesh(std::move(positions), std::move(faceVertex), std::move(faceOffset));
    }

    Faces const kTetrahedron = {{0, 2, 1}, {0, 1, 3}, {1, 2, 3}, {2, 0, 3}};

    Faces joined(Faces faces, Faces const& others)
    {
        faces.insert(faces.end(), others.begin(), others.end());
        return faces;
    }

    Faces moebiusStrip(unsigned int quads)
    {
        Faces faces;
        for (unsigned int i = 0; i + 1 != quads; ++i)
            faces.push_back({2 * i, 2 * i + 1, 2 * i + 3, 2 * i + 2});
        faces.push_back({2 * quads - 2, 2 * quads - 1, 0, 1});
        return faces;
    }

    /// Triangles that have nothing but one point in common.
    Faces looseFan(unsigned int triangles)
    {
        Faces faces;
        for (unsigned int i = 0; i != triangles; ++i)
            faces.push_back({0, 2 * i + 1, 2 * i + 2});
        return faces;
    }

    std::string describe(MeshTopology const& t)
    {
        return "edges " + std::to_string(t.edgeCount) + ", open " + std::to_string(t.openEdges.count) + ", many "
            + std::to_string(t.nonManifoldEdges.count) + ", winding " + std::to_string(t.windingConflicts.count)
            + ", pinched " + std::to_string(t.pinchedPoints.count) + ", isolated "
            + std::to_string(t.isolatedPoints.count) + ", parts " + std::to_string(t.partCount)
            + (t.genus ? ", genus " + std::to_string(*t.genus) : "");
    }

}

TEST(MeshTopology, TellsHowFacesHangTogether)
{
    struct Case {
        char const* name;
        Mesh mesh;
        char const* expected;
    };
    Faces const byEdge = {{0, 1, 4}, {0, 5, 1}, {1, 5, 4}, {0, 4, 5}};
    Faces const byPoint = {{0, 5, 4}, {0, 4, 6}, {4, 5, 6}, {5, 0, 6}};
    Faces const apart = {{4, 6, 5}, {4, 5, 7}, {5, 6, 7}, {6, 4, 7}};
    Faces const openBox = {{0, 3, 2, 1}, {0, 1, 5, 4}, {1, 2, 6, 5}, {2, 3, 7, 6}, {3, 0, 4, 7}};
    constexpr char kMoebius[] = "edges 12, open 8, many 0, winding 1, pinched 0, isolated 0, parts 1";
    constexpr char kHub[] = "edges 300000, open 0, many 0, winding 0, pinched 0, isolated 0, parts 1, genus 0";
    Case const cases[] = {
        {"nothing", meshOf(0, {}), "edges 0, open 0, many 0, winding 0, pinched 0, isolated 0, parts 0, genus 0"},
        {"tetrahedron", meshOf(5, kTetrahedron),
            "edges 6, open 0, many 0, winding 0, pinched 0, isolated 1, parts 1, genus 0"},
        {"open box", meshOf(8, openBox), "edges 12, open 4, many 0, winding 0, pinched 0, isolated 0, parts 1"},
        {"tetrahedra with a common edge", meshOf(6, joined(kTetrahedron, byEdge)),
            "edges 11, open 0, many 1, winding 2, pinched 0, isolated 0, parts 1"},
        {"tetrahedra with a common point", meshOf(7, joined(kTetrahedron, byPoint)),
            "edges 12, open 0, many 0, winding 0, pinched 1, isolated 0, parts 1"},
        {"tetrahedra apart", meshOf(8, joined(kTetrahedron, apart)),
            "edges 12, open 0, many 0, winding 0, pinched 0, isolated 0, parts 2, genus 0"},
        {"torus", MeshBuilder::torus(5, 4).build(),
            "edges 60, open 0, many 0, winding 0, pinched 0, isolated 0, parts 1, genus 1"},
        {"tori apart", MeshBuilder::torus(5, 4).joinedWith(MeshBuilder::torus(5, 4), {9, 0, 0}).build(),
            "edges 120, open 0, many 0, winding 0, pinched 0, isolated 0, parts 2, genus 2"},
        {"Moebius strip", meshOf(8, moebiusStrip(4)), kMoebius},
        {"hub", MeshBuilder::bipyramid(100'000).build(), kHub},
        {"loose fan", meshOf(200'001, looseFan(100'000)),
            "edges 300000, open 300000, many 0, winding 0, pinched 1, isolated 0, parts 1"},
        {"polygon with a hole, cut open", meshOf(8, {{0, 1, 2, 3, 0, 4, 7, 6, 5, 4}}),
            "edges 9, open 8, many 0, winding 0, pinched 0, isolated 0, parts 1"},
        {"polygon that touches itself", meshOf(5, {{0, 1, 2, 0, 3, 4}}),
            "edges 6, open 6, many 0, winding 0, pinched 1, isolated 0, parts 1"},
        {"two sides of one triangle", meshOf(3, {{0, 1, 2}, {0, 2, 1}}),
            "edges 3, open 0, many 0, winding 0, pinched 0, isolated 0, parts 1, genus 0"},
        {"one triangle twice", meshOf(3, {{0, 1, 2}, {0, 1, 2}}),
            "edges 3, open 0, many 0, winding 3, pinched 0, isolated 0, parts 1"},
        {"faces of few points", meshOf(4, {{}, {2}, {0, 1}, {1, 1, 0}}),
            "edges 1, open 0, many 0, winding 0, pinched 0, isolated 1, parts 2"},
    };
    for (Case const& c : cases)
        EXPECT_EQ(describe(analyseTopology(arraysOf(*c.mesh))), c.expected) << c.name;
}

TEST(MeshTopology, CountsFacesByCorners)
{
    Mesh const mesh = meshOf(6, {{}, {0, 1, 2}, {0, 1, 2, 3}, {0}, {0, 1, 2, 3, 4}, {5, 1, 5, 2}, {2, 2, 2}});
    MeshTopology const topology = analyseTopology(arraysOf(*mesh));
    EXPECT_EQ(topology.triangleCount, 2);
    EXPECT_EQ(topology.quads.count, 2);
    EXPECT_EQ(topology.quads.first, 2);
    EXPECT_EQ(topology.polygons.count, 1);
    EXPECT_EQ(topology.polygons.first, 4);
    EXPECT_EQ(topology.facesBelowThreeCorners.count, 2);
    EXPECT_EQ(topology.facesWithRepeatedPoints.count, 2);
    EXPECT_EQ(topology.facesWithRepeatedPoints.first, 5);
}

TEST(MeshRequirements, NamesFaultsWithTheirFirstPlace)
{
    auto const faultsOf = [](Mesh const& mesh) {
        MeshArrays const arrays = arraysOf(*mesh);
        MeshTopology const topology = analyseTopology(arrays);
        std::vector<std::string> faults = faultsOfTriangles(arrays, topology);
        for (std::string const& fault : faultsOfClosedManifold(arrays, topology))
            faults.push_back(fault);
        return faults;
    };
    Faces open = kTetrahedron;
    open[1] = {};
    EXPECT_THAT(faultsOf(meshOf(4, kTetrahedron)), ElementsAre());
    EXPECT_THAT(faultsOf(meshOf(4, open)),
        ElementsAre(HasSubstr("1 face has fewer than three corners. The first is face 1."),
            HasSubstr("3 of 6 edges are open: no other face is on the far side. The first is the edge of face 0 from "
                      "point 1 at (1, 0.5, 0) to point 0 at (0, 0.5, 0). Fill the holes first.")));
    EXPECT_THAT(faultsOf(meshOf(3, {{0, 1, 2}, {0, 1, 2}})),
        ElementsAre(HasSubstr("At 3 edges neighbouring faces look to opposite sides. The first is the edge of face 0 "
                              "from point 0")));
    EXPECT_THAT(faultsOf(meshOf(8, {{0, 1, 2, 3}, {0, 3, 2, 1}, {0, 4, 5, 6, 7}, {0, 7, 6, 5, 4}})),
        ElementsAre(HasSubstr("4 faces have more than three corners. The first is face 0 with 4."),
            HasSubstr("pinched at 1 point: the faces there touch only in the point. The first is point 0 at (0, ")));
}

}
