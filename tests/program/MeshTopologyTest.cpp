#include "geometry/MeshTopology.h"
#include "geometry/MeshRequirements.h"

#include "support/MeshBuilder.h"

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
        TestSupport::PolygonMesh mesh;
        for (unsigned int p = 0; p != pointCount; ++p)
            mesh.points.push_back({static_cast<float>(p), 0.5f, 0});
        for (auto const& face : faces) {
            mesh.faceVertex.insert(mesh.faceVertex.end(), face.begin(), face.end());
            mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
        }
        return mesh.build();
    }

    Faces const kTetrahedron = {{0, 2, 1}, {0, 1, 3}, {1, 2, 3}, {2, 0, 3}};

    Faces joined(Faces faces, Faces const& others)
    {
        faces.insert(faces.end(), others.begin(), others.end());
        return faces;
    }

    /// Triangles that share only one point.
    Faces looseFan(unsigned int triangles)
    {
        Faces faces;
        for (unsigned int i = 0; i != triangles; ++i)
            faces.push_back({0, 2 * i + 1, 2 * i + 2});
        return faces;
    }

    /// Edges, boundary edges, non-manifold edges, winding conflicts, non-manifold points, isolated points, parts,
    /// genus.
    using Counts = std::vector<long>;
    constexpr long kNone = -1;

    Counts countsOf(Mesh const& mesh)
    {
        MeshTopology const t = analyzeTopology(arraysOf(*mesh));
        auto const counts = {t.edgeCount, t.boundaryEdges.count, t.nonManifoldEdges.count, t.windingConflicts.count,
            t.nonManifoldPoints.count, t.isolatedPoints.count, t.partCount};
        Counts result(counts.begin(), counts.end());
        result.push_back(t.genus.value_or(kNone));
        return result;
    }

}

TEST(MeshTopology, CountsEdgesPointsPartsAndGenus)
{
    struct Case {
        char const* name;
        Mesh mesh;
        Counts expected;
    };
    Faces const byEdge = {{0, 1, 4}, {0, 5, 1}, {1, 5, 4}, {0, 4, 5}};
    Faces const byPoint = {{0, 5, 4}, {0, 4, 6}, {4, 5, 6}, {5, 0, 6}};
    Faces const apart = {{4, 6, 5}, {4, 5, 7}, {5, 6, 7}, {6, 4, 7}};
    Faces const openBox = {{0, 3, 2, 1}, {0, 1, 5, 4}, {1, 2, 6, 5}, {2, 3, 7, 6}, {3, 0, 4, 7}};
    Faces const moebiusStrip = {{0, 1, 3, 2}, {2, 3, 5, 4}, {4, 5, 7, 6}, {6, 7, 0, 1}};
    auto const torus = MeshBuilder::torus(5, 4);
    Case const cases[] = {
        {"nothing", meshOf(0, {}), {0, 0, 0, 0, 0, 0, 0, 0}},
        {"tetrahedron", meshOf(6, kTetrahedron), {6, 0, 0, 0, 0, 2, 1, 0}},
        {"open box", meshOf(8, openBox), {12, 4, 0, 0, 0, 0, 1, kNone}},
        {"tetrahedra with a common edge", meshOf(6, joined(kTetrahedron, byEdge)), {11, 0, 1, 2, 0, 0, 1, kNone}},
        {"tetrahedra with a common point", meshOf(7, joined(kTetrahedron, byPoint)), {12, 0, 0, 0, 1, 0, 1, kNone}},
        {"tetrahedra apart", meshOf(8, joined(kTetrahedron, apart)), {12, 0, 0, 0, 0, 0, 2, 0}},
        {"torus", torus.build(), {60, 0, 0, 0, 0, 0, 1, 1}},
        {"tori apart", MeshBuilder(torus).joinedWith(torus, {9, 0, 0}).build(), {120, 0, 0, 0, 0, 0, 2, 2}},
        {"Moebius strip", meshOf(8, moebiusStrip), {12, 8, 0, 1, 0, 0, 1, kNone}},
        {"hub", MeshBuilder::bipyramid(100'000).build(), {300'000, 0, 0, 0, 0, 0, 1, 0}},
        {"loose fan", meshOf(200'001, looseFan(100'000)), {300'000, 300'000, 0, 0, 1, 0, 1, kNone}},
        {"polygon with a hole, cut open", meshOf(8, {{0, 1, 2, 3, 0, 4, 7, 6, 5, 4}}), {9, 8, 0, 0, 0, 0, 1, kNone}},
        {"polygon that touches itself", meshOf(5, {{0, 1, 2, 0, 3, 4}}), {6, 6, 0, 0, 1, 0, 1, kNone}},
        {"two sides of one triangle", meshOf(3, {{0, 1, 2}, {0, 2, 1}}), {3, 0, 0, 0, 0, 0, 1, 0}},
        {"one triangle twice", meshOf(3, {{0, 1, 2}, {0, 1, 2}}), {3, 0, 0, 3, 0, 0, 1, kNone}},
        {"faces of few points", meshOf(4, {{}, {2}, {0, 1}, {1, 1, 0}}), {1, 0, 0, 0, 0, 1, 2, kNone}},
    };
    for (Case const& c : cases)
        EXPECT_EQ(countsOf(c.mesh), c.expected) << c.name;
}

TEST(MeshTopology, CountsFacesByCorners)
{
    Mesh const mesh = meshOf(6, {{}, {0, 1, 2}, {0, 1, 2, 3}, {0}, {0, 1, 2, 3, 4}, {5, 1, 5, 2}, {2, 2, 2}});
    MeshTopology const t = analyzeTopology(arraysOf(*mesh));
    std::uint64_t const found[] = {t.triangleCount, t.quads.count, t.quads.first, t.polygons.count, t.polygons.first,
        t.facesBelowThreeCorners.count, t.facesWithRepeatedPoints.count, t.facesWithRepeatedPoints.first};
    EXPECT_THAT(found, ElementsAre(2, 2, 2, 1, 4, 2, 2, 5));
}

TEST(MeshRequirements, NamesFaultsWithTheirFirstOccurrence)
{
    auto const faultsOf = [](Mesh const& mesh) {
        MeshArrays const arrays = arraysOf(*mesh);
        MeshTopology const topology = analyzeTopology(arrays);
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
            HasSubstr(
                "3 of 6 edges are boundary edges: they belong to one face only. The first is the edge of face 0 from "
                "point 1 at (1, 0.5, 0) to point 0 at (0, 0.5, 0). Fill the holes first (modeling repair --only "
                "fill).")));
    EXPECT_THAT(faultsOf(meshOf(3, {{0, 1, 2}, {0, 1, 2}})),
        ElementsAre(
            HasSubstr("At 3 edges neighboring faces have opposite orientations. The first is the edge of face 0 "
                      "from point 0")));
    EXPECT_THAT(faultsOf(meshOf(8, {{0, 1, 2, 3}, {0, 3, 2, 1}, {0, 4, 5, 6, 7}, {0, 7, 6, 5, 4}})),
        ElementsAre(HasSubstr("4 faces have more than three corners. The first is face 0 with 4."),
            HasSubstr("non-manifold at 1 point: some faces there share only the point. The first is point 0 at (0, ")));
}

}
