#include <Modeling/triangulate.h>

#include "support/Testing.h"
#include "triangulation/triangulatePolygon.h"

using namespace TestSupport;
using Geometry::Mesh::triangulate;

namespace {

using IndexList = std::vector<unsigned int>;

/// A quad (cut from corner 1 to 3), a face of two corners, and a triangle.
Orvan::MutablePtr<Object> quadTwoCornersTriangle()
{
    return makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, {0, 1, 2, 3, 1, 2, 0, 1, 2}, {0, 4, 6, 9});
}

}

TEST(Triangulate, GivesTrianglesTheValuesOfTheirFacesAndCorners)
{
    auto const mesh = quadTwoCornersTriangle();
    addDataProperty<Orvan::String>("name", sFaceComp, {"quad", "line", "triangle"}, *mesh);
    // The last value remains in memory behind the end.
    auto const shortened = [](Orvan::Array<int> values) { return values.resize(values.size - 1), std::move(values); };
    addDataProperty<int>("short", sFaceComp, shortened({7, 8, 9}), *mesh);
    addDataProperty<double>("corner", sFaceVertexComp, {0, 1, 2, 3, 4, 5, 6, 7, 8}, *mesh);
    addDataProperty<int>("short corner", sFaceVertexComp, shortened({5, 6, 7, 8, 9, 10, 11}), *mesh);
    addDataProperty<Common::GeoLocation>("location", sFaceComp, Orvan::Array<Common::GeoLocation>(3), *mesh);
    addRangeProperty("material", sFaceComp, {2, 0, 1}, *mesh);
    addDataProperty<int>("color", "material", {10, 20, 30}, *mesh);
    addRangeProperty("seam", sFaceVertexComp, {8, 7, 6, 5, 4, 3, 2, 1, 0}, *mesh);
    Object const other = *mesh;
    triangulate("*", *mesh);

    EXPECT_EQ(valuesOf<unsigned int>(*mesh, sFaceVertex), (IndexList{3, 0, 1, 3, 1, 2, 0, 1, 2}));
    EXPECT_EQ(valuesOf<unsigned int>(*mesh, sFaceOffset), (IndexList{0, 3, 6, 9}));
    EXPECT_EQ(countsOf(*mesh), (Counts{4, 9, 3}));
    EXPECT_EQ(valuesOf<Orvan::String>(*mesh, "name"), (std::vector<Orvan::String>{"quad", "quad", "triangle"}));
    EXPECT_EQ(valuesOf<int>(*mesh, "short"), (std::vector<int>{7, 7, 0}));
    EXPECT_EQ(valuesOf<double>(*mesh, "corner"), (std::vector<double>{3, 0, 1, 3, 1, 2, 6, 7, 8}));
    EXPECT_EQ(valuesOf<int>(*mesh, "short corner"), (std::vector<int>{8, 5, 6, 8, 6, 7, 0, 0, 0}));
    EXPECT_EQ(dataOf<Common::GeoLocation>(*mesh, "location"), dataOf<Common::GeoLocation>(other, "location"))
        << "not a core type: is kept as it is";
    auto const material = getRangeGeoPropIndices(*mesh, "material");
    EXPECT_EQ(IndexList(material->begin(), material->end()), (IndexList{2, 2, 1}));
    EXPECT_EQ(dataOf<int>(*mesh, "color"), dataOf<int>(other, "color"));
    auto const seam = getRangeGeoPropIndices(*mesh, "seam");
    EXPECT_EQ(IndexList(seam->begin(), seam->end()), (IndexList{5, 8, 7, 5, 7, 6, 2, 1, 0}));
}

TEST(Triangulate, CutsEachFaceOfMixedOnesAsIfItWereAlone)
{
    PolygonMesh mesh;
    IndexList expected;
    Random random(3);
    Modeling::Internal::PolygonStorage storage;
    for (unsigned int run = 0; run != 600; ++run) { // runs of quads of any length, some of them flat
        unsigned int const cornerCount = run % 3 == 0 ? 3 + random.below(20) : 4;
        std::vector<float3> corners = PolygonMesh::stars(1, cornerCount, cornerCount, run).points;
        if (run % 50 == 0)
            corners.assign(cornerCount, {1, 2, 3});
        auto const firstCorner = static_cast<unsigned int>(mesh.faceVertex.size());
        mesh.addPolygon(corners);
        IndexList triangles(3 * (cornerCount - 2));
        Modeling::Internal::triangulatePolygon(corners, triangles, storage);
        for (unsigned int const corner : triangles)
            expected.push_back(mesh.faceVertex[firstCorner + corner]);
    }
    expectSameForThreads({1, 2, 8}, [&] {
        auto object = mesh.build();
        triangulate("*", *object);
        EXPECT_EQ(valuesOf<unsigned int>(*object, sFaceVertex), expected);
        return object;
    });
}

TEST(Triangulate, RemovesPropertiesThatTheChannelsExcludeAndTheirDependents)
{
    std::map<std::string, std::vector<std::string>> const kept{
        {"*", {"uv", "material", "color", "density"}}, {"", {"density"}},
        {"color uv", {"uv", "density"}}, // the color is removed with its range
        {"* -uv ^-", {"material", "color", "density"}}, // a malformed entry is ignored
    };
    for (auto const& [channels, names] : kept) {
        auto const mesh = quadTwoCornersTriangle();
        addDataProperty<float>("uv", sFaceVertexComp, Orvan::Array<float>(9), *mesh);
        addRangeProperty("material", sFaceComp, {0, 0, 0}, *mesh);
        addDataProperty<int>("color", "material", {1}, *mesh);
        addDataProperty<float>("density", sPointComp, Orvan::Array<float>(4), *mesh);
        triangulate(channels.c_str(), *mesh);
        EXPECT_TRUE(isValid(*mesh));
        std::vector<std::string> left;
        for (char const* const name : {"uv", "material", "color", "density"})
            if (mesh->hasProperty(name))
                left.emplace_back(name);
        EXPECT_EQ(left, names) << channels;
    }
}

TEST(Triangulate, AcceptsOddMeshesAndLeavesIncompleteOnesUnchanged)
{
    auto const points = Orvan::Array<float3>{{0, 0, 0}, {1, 0, 0}, {0, 1, 0}};
    auto const empty = makeMesh({}, {}, {});
    addDataProperty<int>("id", sFaceComp, {}, *empty);
    triangulate("*", *empty);
    EXPECT_EQ(valuesOf<unsigned int>(*empty, sFaceOffset), IndexList{0});
    EXPECT_EQ(countsOf(*empty), (Counts{0, 0, 0}));
    EXPECT_TRUE(dataOf<int>(*empty, "id"));

    // Faces without corners or with one, and offsets that decrease or exceed the corners: no triangles.
    auto const odd = makeMesh(points, {0, 1, 2, 0}, {0, 0, 1, 4, 2, 4000000000u, 0, 3});
    triangulate("*", *odd);
    EXPECT_EQ(valuesOf<unsigned int>(*odd, sFaceVertex), (IndexList{1, 2, 0, 0, 1, 2}));

    std::function<void(Object&)> const edits[] = {
        [](Object& mesh) { mesh.eraseProperty(sFaceVertex); },
        [](Object& mesh) {
            addDataProperty<double>(sPointPosition, sPointComp, {0, 1, 2}, mesh);
        },
        [](Object& mesh) { setElementCount(sFaceComp, 2, mesh); },
        [](Object& mesh) { setElementCount(sPointComp, 4, mesh); },
        [](Object& mesh) { setElementCount(sFaceVertexComp, 4, mesh); },
    };
    for (auto const& makeIncomplete : edits) {
        auto const mesh = makeMesh(points, {0, 1, 2}, {0, 3});
        makeIncomplete(*mesh);
        addDataProperty<int>("id", sFaceComp, {1}, *mesh);
        auto const before = deepCopy(*mesh);
        triangulate("", *mesh);
        EXPECT_TRUE(sameContents(*mesh, *before));
    }
}
