#include <Modeling/removeSlivers.h>

#include "support/Compare.h"
#include "support/FailingAllocations.h"
#include "support/MeshBuilder.h"
#include "support/MeshChecks.h"
#include "support/Random.h"
#include "support/Threads.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <map>
#include <string>
#include <vector>

using namespace Tessara::Geometry;
using namespace TestSupport;
using Geometry::Mesh::removeSlivers;
using Tessara::Object;

namespace {

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

// Written out once more, so that a fault in the library's own arithmetic does not cancel out.
float3 plus(float3 a, float3 b)
{
    return {a.x + b.x, a.y + b.y, a.z + b.z};
}
float3 minus(float3 a, float3 b)
{
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}
float3 scaled(float3 a, float s)
{
    return {a.x * s, a.y * s, a.z * s};
}
float scalarProduct(float3 a, float3 b)
{
    return a.x * b.x + a.y * b.y + a.z * b.z;
}
float lengthOf(float3 a)
{
    return std::sqrt(a.x * a.x + a.y * a.y + a.z * a.z);
}
float3 directionOf(float3 a)
{
    return lengthOf(a) > 1.1754944e-38f ? scaled(a, 1 / lengthOf(a)) : a;
}
float3 vectorProduct(float3 a, float3 b)
{
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}

/// The operation once more, written plainly: maps, and every fan walked anew. For closed manifold meshes only.
class PlainReference {
public:
    PlainReference(MeshBuilder const& mesh, float ratio)
        : points_(mesh.points)
        , faces_(mesh.faces)
    {
        findNeighbours();
        for (auto const& face : faces_)
            normals_.push_back(normalOf(points_[face[0]], points_[face[1]], points_[face[2]]));
        for (unsigned int face = 0; face != faces_.size(); ++face)
            visit(face, ratio);
        compact();
    }

    MeshBuilder result() const { return MeshBuilder::of(points_, faces_); }

private:
    static float3 normalOf(float3 a, float3 b, float3 c)
    {
        return vectorProduct(directionOf(minus(b, a)), directionOf(minus(c, a)));
    }

    void findNeighbours()
    {
        std::map<std::pair<unsigned int, unsigned int>, unsigned int> faceOf;
        for (unsigned int f = 0; f != faces_.size(); ++f)
            for (unsigned int k = 0; k != 3; ++k)
                faceOf.try_emplace({faces_[f][k], faces_[f][(k + 1) % 3]}, f);
        neighbours_.resize(faces_.size());
        for (unsigned int f = 0; f != faces_.size(); ++f)
            for (unsigned int k = 0; k != 3; ++k)
                neighbours_[f][k] = faceOf.at({faces_[f][(k + 1) % 3], faces_[f][k]});
    }

    unsigned int indexOf(unsigned int face, unsigned int neighbour) const
    {
        return neighbours_[face][0] == neighbour ? 0 : neighbours_[face][1] == neighbour ? 1 : 2;
    }

    using Entered = std::pair<unsigned int, unsigned int>; // a face, and the index by which it was entered

    /// The faces from behind `edge` of `from` around the point at its end, up to and including `to`.
    std::vector<Entered> walk(unsigned int from, unsigned int edge, unsigned int to) const
    {
        std::vector<Entered> entered;
        do {
            unsigned int const face = neighbours_[from][edge];
            unsigned int const index = indexOf(face, from);
            entered.emplace_back(face, index);
            from = face;
            edge = (index + 2) % 3;
        } while (from != to);
        return entered;
    }

    void visit(unsigned int f, float ratio)
    {
        if (faces_[f][0] == kInvalidIndex)
            return;
        float shortest = 3.4028235e+38f, longest = -3.4028235e+38f;
        unsigned int e = 0;
        for (unsigned int k = 0; k != 3; ++k) {
            float const edge = lengthOf(minus(points_[faces_[f][k]], points_[faces_[f][(k + 1) % 3]]));
            if (shortest > edge) {
                shortest = edge;
                e = k;
            }
            longest = std::max(longest, edge);
        }
        if (longest * ratio > shortest && keepsLink(f, e) && keepsOrientation(f, e))
            collapse(f, e);
    }

    bool keepsLink(unsigned int f, unsigned int e) const
    {
        unsigned int const g = neighbours_[f][e];
        auto const ring = [&](std::vector<Entered> fan) {
            fan.pop_back(); // back at its beginning
            std::vector<unsigned int> points;
            for (auto const& [face, j] : fan)
                points.push_back(faces_[face][(j + 1) % 3]);
            std::sort(points.begin(), points.end());
            return points;
        };
        auto const ringA = ring(walk(f, (e + 2) % 3, f));
        auto const ringB = ring(walk(g, (indexOf(g, f) + 2) % 3, g));
        if (ringA.size() == 2 && ringB.size() == 2)
            return false;
        std::vector<unsigned int> shared;
        std::set_intersection(ringA.begin(), ringA.end(), ringB.begin(), ringB.end(), std::back_inserter(shared));
        return shared.size() == 2;
    }

    bool keepsOrientation(unsigned int f, unsigned int e) const
    {
        unsigned int const g = neighbours_[f][e];
        float3 const m = scaled(plus(points_[faces_[f][e]], points_[faces_[f][(e + 1) % 3]]), 0.5f);
        auto fan = walk(f, (e + 2) % 3, g);
        unsigned int const j = fan.back().second;
        fan.pop_back();
        auto other = walk(g, (j + 1) % 3, f);
        other.pop_back();
        fan.insert(fan.end(), other.begin(), other.end());
        return std::all_of(fan.begin(), fan.end(), [&](Entered const& entered) {
            auto const& [h, i] = entered;
            float3 const p0 = points_[faces_[h][i]];
            float3 const p1 = points_[faces_[h][(i + 1) % 3]];
            float3 const p2 = points_[faces_[h][(i + 2) % 3]];
            float3 const inward = vectorProduct(normalOf(p0, p1, p2), directionOf(minus(p2, p1)));
            if (scalarProduct(inward, minus(m, p1)) <= 0)
                return false;
            float3 const turned = vectorProduct(directionOf(minus(p1, m)), directionOf(minus(p2, m)));
            return !(scalarProduct(turned, normals_[h]) <= 0);
        });
    }

    void collapse(unsigned int f, unsigned int e)
    {
        unsigned int const g = neighbours_[f][e];
        unsigned int const a = faces_[f][e], b = faces_[f][(e + 1) % 3];
        points_[a] = scaled(plus(points_[a], points_[b]), 0.5f);
        removedPoints_.push_back(b);
        unsigned int const j = indexOf(g, f);
        unsigned int const x = neighbours_[f][(e + 1) % 3], y = neighbours_[f][(e + 2) % 3];
        unsigned int const s = neighbours_[g][(j + 1) % 3], t = neighbours_[g][(j + 2) % 3];
        for (auto const& [face, index] : walk(g, (j + 2) % 3, f))
            if (face != f)
                std::replace(faces_[face].begin(), faces_[face].end(), b, a);
        auto const glue = [&](unsigned int face, unsigned int from, unsigned int to) {
            *std::find(neighbours_[face].begin(), neighbours_[face].end(), from) = to;
        };
        glue(x, f, y);
        glue(y, f, x);
        glue(t, g, s);
        glue(s, g, t);
        removedFaces_.insert(removedFaces_.end(), {f, g});
        faces_[f][0] = faces_[g][0] = kInvalidIndex;
    }

    void compact()
    {
        std::vector<unsigned int> map(points_.size());
        for (unsigned int p = 0; p != map.size(); ++p)
            map[p] = p;
        for (unsigned int const p : removedPoints_)
            map[p] = kInvalidIndex;
        std::sort(removedPoints_.begin(), removedPoints_.end());
        std::size_t const remaining = points_.size() - removedPoints_.size();
        std::size_t last = points_.size() - 1;
        for (unsigned int const p : removedPoints_) {
            if (p >= remaining)
                break;
            while (map[last] == kInvalidIndex)
                --last;
            map[last] = p;
            points_[p] = points_[last--];
        }
        points_.resize(remaining);
        std::sort(removedFaces_.rbegin(), removedFaces_.rend());
        for (unsigned int const face : removedFaces_) {
            faces_[face] = faces_.back();
            faces_.pop_back();
        }
        for (auto& face : faces_)
            for (unsigned int& corner : face)
                corner = map[corner];
    }

    std::vector<float3> points_;
    std::vector<MeshBuilder::Triangle> faces_;
    std::vector<MeshBuilder::Triangle> neighbours_;
    std::vector<float3> normals_;
    std::vector<unsigned int> removedPoints_, removedFaces_;
};

Orvan::MutablePtr<Object> withoutSlivers(MeshBuilder const& builder, float ratio)
{
    auto mesh = builder.build();
    EXPECT_TRUE(removeSlivers(ratio, *mesh));
    return mesh;
}

/// The places of the directed edges that are no inner manifold edges, in a fixed order.
std::vector<std::array<float, 6>> oddEdges(Object const& mesh)
{
    auto const corners = dataOf<unsigned int>(mesh, sFaceVertex);
    auto const positions = dataOf<float3>(mesh, sPointPosition);
    std::map<std::pair<unsigned int, unsigned int>, int> uses;
    for (std::size_t corner = 0; corner != corners->size; ++corner)
        ++uses[{(*corners)[corner], (*corners)[corner % 3 == 2 ? corner - 2 : corner + 1]}];
    std::vector<std::array<float, 6>> places;
    for (auto const& [edge, count] : uses) {
        auto const opposite = uses.find({edge.second, edge.first});
        if (count == 1 && opposite != uses.end() && opposite->second == 1)
            continue;
        float3 const a = (*positions)[edge.first], b = (*positions)[edge.second];
        places.insert(places.end(), static_cast<std::size_t>(count), {a.x, a.y, a.z, b.x, b.y, b.z});
    }
    std::sort(places.begin(), places.end());
    return places;
}

std::map<std::string, MeshBuilder> closedMeshes()
{
    return {
        {"tetrahedron", MeshBuilder::tetrahedron()},
        {"octahedron", MeshBuilder::sphere(1)},
        {"needles", MeshBuilder::sphere(8).withNeedles(40)},
        {"noise", MeshBuilder::sphere(12).withNoise(0.05f, 3).shuffled(4)},
        {"shuffled needles", MeshBuilder::sphere(10).withNeedles(150, 0.02f).withNoise(0.004f, 1).shuffled(2)},
        {"torus", MeshBuilder::torus(24, 16).withNeedles(60).shuffled(9)},
        {"thin torus", MeshBuilder::torus(100, 3).withNoise(0.01f, 8)},
        {"bipyramid", MeshBuilder::bipyramid(300).withNoise(0.001f, 7)},
        {"equal points", MeshBuilder::sphere(6).withNeedles(30, 0.0f)},
        {"two parts",
            MeshBuilder::sphere(5).withNeedles(9).joinedWith(MeshBuilder::torus(9, 9).withNeedles(5), {9, 0, 0})},
    };
}

}

TEST(RemoveSlivers, agreesWithThePlainReferenceAndKeepsClosedSurfaces)
{
    for (auto const& [name, builder] : closedMeshes())
        for (float const ratio : {0.0f, 0.03f, 0.3f, 0.8f, 2.0f}) {
            SCOPED_TRACE(name + ", ratio " + std::to_string(ratio));
            auto const source = builder.build();
            ASSERT_TRUE(isClosedManifold(*source));
            auto const mesh = withoutSlivers(builder, ratio);
            EXPECT_TRUE(sameContents(*mesh, *PlainReference(builder, ratio).result().build()));
            EXPECT_TRUE(isClosedManifold(*mesh));
            EXPECT_EQ(eulerCharacteristic(*mesh), eulerCharacteristic(*source));
            Counts const before = countsOf(*source), after = countsOf(*mesh);
            EXPECT_EQ(before.faces - after.faces, 2 * (before.points - after.points));
            if (ratio == 0) {
                EXPECT_EQ(after, before);
            }
        }
    EXPECT_EQ(countsOf(*withoutSlivers(MeshBuilder::sphere(8).withNeedles(40), 0.03f)),
        countsOf(*MeshBuilder::sphere(8).build()));
}

TEST(RemoveSlivers, collapsesToTheMidpointAndFillsHolesFromTheEnd)
{
    // One needle at the first edge of an octahedron; the cut point is the last one.
    auto const cut = MeshBuilder::sphere(1).withNeedles(1, 0.25f);
    ASSERT_EQ(cut.points.size(), 7u);
    auto const mesh = withoutSlivers(cut, 0.5f);
    EXPECT_EQ(countsOf(*mesh), (Counts{6, 24, 8}));
    auto const positions = dataOf<float3>(*mesh, sPointPosition);
    long moved = 0;
    for (std::size_t point = 0; point != 6; ++point)
        moved += !((*positions)[point] == cut.points[point]);
    EXPECT_EQ(moved, 1) << "only the start of the edge moves, and points before the hole keep their numbers";
    EXPECT_EQ(*dataOf<unsigned int>(*mesh, sFaceOffset), (Orvan::Array<unsigned int>{0, 3, 6, 9, 12, 15, 18, 21, 24}));
}

TEST(RemoveSlivers, leavesWhatItIsNotMeantFor)
{
    auto const polygons = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 0.01f, 0}, {0, 0.01f, 0}}, {0, 1, 2, 3}, {0, 4});
    auto const mixed = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 0.01f, 0}}, {0, 1, 0, 1, 2, 1}, {0, 2, 6});
    auto const incomplete = MeshBuilder::sphere(4).withNeedles(9).build();
    incomplete->eraseProperty(sFaceOffset);
    auto const otherType = MeshBuilder::sphere(4).withNeedles(9).build();
    addDataProperty<int>(sFaceVertex, sFaceVertexComp, {1, 2, 3}, *otherType);
    auto const empty = MeshBuilder().build();
    auto const open = MeshBuilder::square(1).withNeedles(1).build();
    for (auto const* const mesh : {&polygons, &mixed, &incomplete, &otherType, &empty, &open}) {
        auto const before = deepCopy(**mesh);
        EXPECT_TRUE(removeSlivers(0.9f, **mesh));
        EXPECT_TRUE(sameContents(**mesh, *before));
    }
}

TEST(RemoveSlivers, leavesBoundariesAndNonManifoldPlacesInPlace)
{
    auto const pinched = [] {
        auto mesh = MeshBuilder::sphere(3).withNeedles(4).joinedWith(MeshBuilder::sphere(3).withNeedles(4), {5, 0, 0});
        auto const half = static_cast<unsigned int>(mesh.points.size() / 2);
        for (auto& face : mesh.faces)
            std::replace(face.begin(), face.end(), half, 0u); // both spheres hang on one point
        return mesh;
    };
    std::map<std::string, MeshBuilder> const meshes{
        {"pinched", pinched()},
        {"open", MeshBuilder::sphere(6).withNeedles(30).withoutFace(11)},
        {"square", MeshBuilder::square(9).withNeedles(30)},
        {"twice the same face", MeshBuilder::of({{0, 0, 0}, {1, 0, 0}, {0, 0.01f, 0}}, {{0, 1, 2}, {0, 1, 2}})},
        {"pillow", MeshBuilder::of({{0, 0, 0}, {1, 0, 0}, {0, 0.01f, 0}}, {{0, 1, 2}, {2, 1, 0}})},
        {"faces that reach the edge twice",
            MeshBuilder::of(
                std::vector<float3>(5), {{1, 3, 2}, {3, 0, 2}, {2, 4, 1}, {1, 4, 4}, {0, 4, 0}, {2, 0, 4}})},
        {"faces of one point", MeshBuilder::of({{0, 0, 0}, {1, 0, 0}}, {{0, 0, 0}, {0, 0, 1}, {0, 1, 0}})},
    };
    for (auto const& [name, builder] : meshes) {
        auto const mesh = withoutSlivers(builder, 0.5f);
        EXPECT_TRUE(isValid(*mesh)) << name;
        EXPECT_EQ(oddEdges(*mesh), oddEdges(*builder.build())) << name;
    }
    EXPECT_LT(
        countsOf(*withoutSlivers(meshes.at("pinched"), 0.05f)).faces, countsOf(*meshes.at("pinched").build()).faces)
        << "needles away from the pinched point go";

    Random random(1);
    for (unsigned int run = 0; run != 3000; ++run) {
        MeshBuilder soup =
            run % 2 ? MeshBuilder::sphere(2) : MeshBuilder::of(std::vector<float3>(6 + random.below(20)), {});
        soup = std::move(soup).withNoise(1, run);
        for (std::size_t face = 0; run % 2 == 0 && face != 30; ++face)
            soup.faces.push_back({});
        std::size_t const pointCount = soup.points.size();
        for (auto& face : soup.faces)
            for (unsigned int& corner : face)
                if (run % 2 == 0 || random.below(16) == 0)
                    corner = random.below(pointCount);
        auto const mesh = withoutSlivers(soup, 0.7f);
        EXPECT_TRUE(isValid(*mesh)) << "soup " << run;
        EXPECT_EQ(oddEdges(*mesh), oddEdges(*soup.build())) << "soup " << run;
        // Where nothing is a number every face is a sliver for this ratio and no face turns over: topology alone
        // decides.
        soup.points.assign(pointCount, float3{kNan, kNan, kNan});
        EXPECT_TRUE(isValid(*withoutSlivers(soup, -2))) << "soup " << run << " without positions";
    }
}

TEST(RemoveSlivers, survivesPositionsThatAreNoNumbers)
{
    float const infinity = std::numeric_limits<float>::infinity();
    for (float const odd : {kNan, infinity, -infinity, 3e38f})
        for (float const ratio : {0.1f, -2.0f, kNan, infinity}) {
            auto builder = MeshBuilder::sphere(5).withNeedles(20);
            for (std::size_t point = 0; point < builder.points.size(); point += 3)
                builder.points[point].y = odd;
            EXPECT_TRUE(isClosedManifold(*withoutSlivers(builder, ratio))) << odd << ", ratio " << ratio;
        }
}

TEST(RemoveSlivers, staysLinearAroundAHub)
{
    auto const mesh = withoutSlivers(MeshBuilder::bipyramid(100'000), 0.1f);
    EXPECT_TRUE(isValid(*mesh));
    EXPECT_LT(countsOf(*mesh).faces, 200'000);

    // A star: now the short edges lead to the hub, and every collapse would turn faces of it over.
    auto star = MeshBuilder::bipyramid(40'000);
    for (std::size_t point = 0; point < 40'000; point += 2)
        star.points[point] = scaled(star.points[point], 0.01f);
    EXPECT_TRUE(isValid(*withoutSlivers(star, 0.05f)));
}

TEST(RemoveSlivers, changesNoArrayThatSomebodyElseHolds)
{
    auto const mesh = MeshBuilder::sphere(6).withNeedles(30).build();
    addDataProperty<int>("number", sFaceComp, Orvan::Array<int>(192 + 60), *mesh);
    Object const other = *mesh;
    auto const before = deepCopy(*mesh);
    removeSlivers(0.1f, *mesh);
    EXPECT_LT(countsOf(*mesh).faces, countsOf(other).faces);
    EXPECT_TRUE(sameContents(other, *before));
    EXPECT_EQ(dataOf<int>(*mesh, "number"), dataOf<int>(other, "number")) << "other properties are not touched";
}

TEST(RemoveSlivers, givesTheSameBitsForAnyNumberOfThreadsAndEveryCompiler)
{
    auto const builder = MeshBuilder::sphere(40).withNeedles(500).withNoise(0.002f, 5).shuffled(6);
    expectSameForThreads({1, 2, 8}, [&] { return withoutSlivers(builder, 0.2f); });
    EXPECT_EQ(fingerprint(*withoutSlivers(builder, 0.2f)), 10566543302546679046u) << "unlike other builds";
}

TEST(RemoveSlivers, leavesTheMeshAsItWasWhenMemoryRunsOut)
{
    for (unsigned int const segments : {3u, 36u}) { // on one thread, and in parallel
        auto const builder = MeshBuilder::sphere(segments).withNeedles(5);
        auto const expected = withoutSlivers(builder, 0.1f);
        sweepFailingAllocations([&](Attempt const& attempt) {
            auto const mesh = builder.build();
            Object const other = *mesh;
            auto const before = deepCopy(other);
            bool const isDone = attempt([&] { removeSlivers(0.1f, *mesh); });
            EXPECT_TRUE(sameContents(*mesh, isDone ? *expected : *before));
            EXPECT_TRUE(sameContents(other, *before));
        });
    }
}
