#include <Modeling/subdivide.h>

#include "PlainSubdivision.h"

#include "subdivision/refineMesh.h"

#include "support/Compare.h"
#include "support/FailingAllocations.h"
#include "support/MeshChecks.h"
#include "support/Random.h"
#include "support/Threads.h"

#include <Modeling/subdivisionSteps.h>
#include <OrvanCppOpSDK/Job.h>
#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometryVolume/Canceller.h>

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cstring>
#include <map>
#include <new>
#include <string>
#include <thread>

using namespace Tessara::Geometry;
using namespace TestSupport;
using Geometry::Mesh::subdivide;
using Tessara::Object;
namespace Steps = Geometry::Mesh::Internal;

namespace {

/// A mesh with a property "carried" on its points that starts out as their positions.
Orvan::MutablePtr<Object> meshOf(MeshBuilder const& builder, std::vector<float3> const& carried)
{
    auto mesh = builder.build();
    addDataProperty<float3>("carried", sPointComp, Orvan::Array<float3>(carried), *mesh);
    return mesh;
}

Orvan::MutablePtr<Object> meshOf(MeshBuilder const& builder)
{
    return meshOf(builder, builder.points);
}

Orvan::MutablePtr<Object> refined(MeshBuilder const& builder, float tolerance)
{
    auto mesh = meshOf(builder);
    EXPECT_TRUE(subdivide(tolerance, *mesh));
    return mesh;
}

/// Moved onto a grid on which sums of coordinates are exact, whatever their order.
MeshBuilder onGrid(MeshBuilder mesh)
{
    for (float3& p : mesh.points)
        p = {std::round(p.x * 256) / 256, std::round(p.y * 256) / 256, std::round(p.z * 256) / 256};
    return mesh;
}

/// The same surface with small faces on one side.
MeshBuilder graded(MeshBuilder mesh)
{
    for (float3& p : mesh.points) {
        float const squared = p.x * p.x + p.y * p.y + (p.z + 0.5f) * (p.z + 0.5f);
        p = {p.x / squared, p.y / squared, (p.z + 0.5f) / squared};
    }
    return mesh;
}

std::map<std::string, MeshBuilder> closedMeshes()
{
    return {
        {"tetrahedron", MeshBuilder::tetrahedron()},
        {"noise", MeshBuilder::sphere(4).withNoise(0.1f, 3).shuffled(4)},
        {"graded", graded(MeshBuilder::icosphere(2))},
        {"torus", MeshBuilder::torus(12, 9).withNoise(0.3f, 1).shuffled(9)},
        {"needles", MeshBuilder::sphere(3).withNeedles(20, 0.02f).shuffled(2)},
        {"bipyramid", MeshBuilder::bipyramid(60).withNoise(0.01f, 7)},
        {"two parts", MeshBuilder::icosahedron().joinedWith(MeshBuilder::torus(5, 4), {9, 0, 0})},
    };
}

/// Passes with any marks, through the steps themselves.
struct Passes {
    explicit Passes(MeshBuilder const& builder)
        : object(meshOf(builder))
        , positions(*dataOf<float3>(*object, sPointPosition))
        , basePositions(positions)
        , vertexLevels(positions.size)
        , faceVertex(*dataOf<unsigned int>(*object, sFaceVertex))
        , faceOffset(*dataOf<unsigned int>(*object, sFaceOffset))
        , faceStates(faceOffset.size - 1)
        , numPoints(static_cast<unsigned int>(positions.size))
        , numFaceVertices(static_cast<unsigned int>(faceVertex.size))
        , numFaces(static_cast<unsigned int>(faceStates.size))
        , halfEdges(numPoints, numFaces, faceVertex, faceOffset)
    {
        Steps::computePositionsInfinity(halfEdges, numPoints, positions, limitPositions);
    }

    void subdivide(Orvan::Array<bool> const& marks)
    {
        Steps::subdivide(marks, halfEdges, numPoints, numFaceVertices, numFaces, basePositions, limitPositions,
            vertexLevels, faceVertex, faceOffset, faceStates, *object);
    }

    void pass(Orvan::Array<bool> const& marks)
    {
        subdivide(marks);
        halfEdges = {numPoints, numFaces, faceVertex, faceOffset};
        Steps::computePositions(
            halfEdges, numPoints, basePositions, limitPositions, vertexLevels, faceStates, positions);
    }

    bool isBalanced() const { return Steps::isBalanced(halfEdges, numFaces, faceVertex, faceOffset, faceStates); }
    auto mesh() const { return makeMesh(positions, faceVertex, faceOffset); }

    Orvan::MutablePtr<Object> object;
    Orvan::Array<float3> positions, basePositions, limitPositions;
    Orvan::Array<unsigned char> vertexLevels;
    Orvan::Array<unsigned int> faceVertex, faceOffset;
    Orvan::Array<unsigned char> faceStates;
    unsigned int numPoints, numFaceVertices, numFaces;
    Geometry::Mesh::HalfEdgeDataStructure halfEdges;
};

/// Six times the volume inside.
double volumeOf(Object const& mesh)
{
    auto const points = dataOf<float3>(mesh, sPointPosition);
    auto const corners = dataOf<unsigned int>(mesh, sFaceVertex);
    double volume = 0;
    for (std::size_t c = 0; c != corners->size; c += 3) {
        float3 const p = (*points)[(*corners)[c]], q = (*points)[(*corners)[c + 1]], r = (*points)[(*corners)[c + 2]];
        volume += p.x * (q.y * r.z - q.z * r.y) + p.y * (q.z * r.x - q.x * r.z) + p.z * (q.x * r.y - q.y * r.x);
    }
    return volume;
}

/// The places of the faces, whatever their numbers.
std::vector<std::array<float, 9>> placesOf(Object const& mesh)
{
    auto const points = dataOf<float3>(mesh, sPointPosition);
    auto const corners = dataOf<unsigned int>(mesh, sFaceVertex);
    std::vector<std::array<float, 9>> places;
    for (std::size_t c = 0; c != corners->size; c += 3) {
        std::array<float, 9> place{};
        for (std::size_t first = 0; first != 3; ++first) {
            std::array<float, 9> turned{};
            for (std::size_t k = 0; k != 3; ++k)
                std::memcpy(&turned[3 * k], &(*points)[(*corners)[c + (first + k) % 3]], sizeof(float3));
            place = first == 0 ? turned : std::min(place, turned);
        }
        places.push_back(place);
    }
    std::sort(places.begin(), places.end());
    return places;
}

float largestDifference(float3 a, float3 b)
{
    return std::max({std::abs(a.x - b.x), std::abs(a.y - b.y), std::abs(a.z - b.z)});
}

/// What a run that did not come to its end has to leave: the mesh as it was, and "carried" at least as long.
void expectAsBefore(Object const& mesh, Object const& before)
{
    auto const carried = dataOf<float3>(mesh, "carried"), carriedBefore = dataOf<float3>(before, "carried");
    ASSERT_TRUE(carried);
    ASSERT_GE(carried->size, carriedBefore->size);
    EXPECT_EQ(std::memcmp(carried->data, carriedBefore->data, carriedBefore->size * sizeof(float3)), 0);
    Object const mine = mesh, other = before;
    auto const standardOf = [](Object object) {
        object.eraseProperty("carried");
        return object;
    };
    EXPECT_TRUE(sameContents(standardOf(mine), standardOf(other)));
}

}

TEST(Subdivide, agreesWithThePlainReferenceAndKeepsClosedSurfaces)
{
    for (auto const& [name, builder] : closedMeshes())
        for (float const tolerance : {0.5f, 0.15f, 0.09f}) {
            SCOPED_TRACE(name + ", tolerance " + std::to_string(tolerance));
            auto const mesh = refined(builder, tolerance);
            PlainSubdivision plain(builder, builder.points);
            plain.run(tolerance);
            EXPECT_TRUE(sameContents(*mesh, *meshOf(MeshBuilder::of(plain.positions, plain.faces), plain.values)));
            auto const source = builder.build();
            EXPECT_TRUE(isClosedManifold(*mesh));
            EXPECT_EQ(eulerCharacteristic(*mesh), eulerCharacteristic(*source));
            EXPECT_GT(volumeOf(*mesh) * volumeOf(*source), 0) << "turned inside out";
            for (std::size_t f = 0; f != plain.faces.size(); ++f)
                if (plain.isLarge(plain.faces[f], tolerance)) {
                    EXPECT_TRUE(plain.states[f] & 1) << "face " << f << " is large, but was not even asked to split";
                }
        }
}

TEST(Subdivide, agreesWithThePlainReferenceForAnyMarks)
{
    for (auto const& [name, builder] : closedMeshes()) {
        Passes passes(builder);
        PlainSubdivision plain(builder, builder.points);
        Random random(7);
        for (unsigned int pass = 0; pass != 7; ++pass) {
            SCOPED_TRACE(name + ", pass " + std::to_string(pass));
            std::vector<bool> marks;
            for (unsigned int face = 0; face != passes.numFaces; ++face)
                marks.push_back(random.below(pass == 3 ? 1 : 9) == 0);
            Orvan::Array<bool> flags(marks.size());
            std::copy(marks.begin(), marks.end(), flags.data);
            passes.pass(flags);
            plain.pass(marks);
            EXPECT_TRUE(sameContents(*passes.mesh(), *MeshBuilder::of(plain.positions, plain.faces).build()));
            EXPECT_TRUE(std::equal(plain.states.begin(), plain.states.end(), passes.faceStates.begin()));
            EXPECT_EQ(*dataOf<float3>(*passes.object, "carried"), Orvan::Array<float3>(plain.values));
            EXPECT_TRUE(passes.isBalanced());
            EXPECT_TRUE(isClosedManifold(*passes.mesh()));
        }
    }
}

TEST(Subdivide, takesSolidsToWhereTheFormulasSay)
{
    // One step at all points of one valence: (1 - β) p + β m; and the limit (1 - γ) p + γ m. For these solids the mean m of
    // the neighbours is a multiple of p.
    struct Case {
        MeshBuilder mesh;
        double beta, gamma, mean;
    };
    double const fifth = (4 - 2 * std::cos(2 * std::acos(-1.0) / 5)) / 9;
    Case const cases[] = {{MeshBuilder::tetrahedron(), 5.0 / 9, 5.0 / 8, -1.0 / 3},
        {MeshBuilder::sphere(1), 4.0 / 9, 4.0 / 7, 0},
        {MeshBuilder::icosahedron(), fifth, 3 * fifth / (3 * fifth + 1), std::sqrt(0.2)}};
    for (auto const& [mesh, beta, gamma, mean] : cases) {
        Passes passes(mesh);
        std::size_t const points = mesh.points.size(), faces = mesh.faces.size();
        passes.pass(Orvan::Array<bool>(faces, true));
        EXPECT_EQ(passes.numFaces, 3 * faces);
        EXPECT_EQ(passes.numPoints, points + faces);
        EXPECT_EQ(passes.faceStates, Orvan::Array<unsigned char>(3 * faces, 2 << 2)) << "every edge has turned over";
        for (std::size_t v = 0; v != points; ++v) {
            auto const scaled = [&](double s) {
                auto const f = static_cast<float>(s);
                return float3{mesh.points[v].x * f, mesh.points[v].y * f, mesh.points[v].z * f};
            };
            EXPECT_LT(largestDifference(passes.positions[v], scaled(1 - beta + beta * mean)), 1e-6f);
            EXPECT_LT(largestDifference(passes.limitPositions[v], scaled(1 - gamma + gamma * mean)), 1e-6f);
        }
        EXPECT_LT(
            largestDifference(passes.positions[points], (*dataOf<float3>(*passes.object, "carried"))[points]), 1e-6f)
            << "the middle of the first face";
    }
}

TEST(Subdivide, stepsKeepToTheirRules)
{
    // A third of a face sits at the limit at first: its point is younger than its step, and the exponent wraps.
    Passes passes(MeshBuilder::tetrahedron());
    passes.pass({true, false, false, false});
    EXPECT_EQ(passes.numFaces, 6);
    EXPECT_EQ(passes.faceStates, (Orvan::Array<unsigned char>{0, 0, 0, 4, 4, 4}));
    EXPECT_EQ(passes.positions[4], passes.limitPositions[4]);
    // The gate of one third turns over: the face in front writes both sides.
    passes.pass({true, false, false, false, false, false});
    EXPECT_EQ(passes.numFaces, 8);
    EXPECT_EQ(passes.faceStates, (Orvan::Array<unsigned char>{0, 0, 4, 4, 4, 4, 8, 8}));
    EXPECT_LT(largestDifference(passes.positions[4], passes.basePositions[4]), 1e-6f);

    // Beside a coarser face nothing is written; the balance leaves such a state alone when all have split.
    Passes unbalanced(MeshBuilder::tetrahedron());
    unbalanced.faceStates = {2 << 2 | 2, 2, 2, 2};
    EXPECT_FALSE(unbalanced.isBalanced());
    unbalanced.subdivide(Orvan::Array<bool>(4));
    EXPECT_EQ(unbalanced.numFaces, 12);
    EXPECT_EQ(unbalanced.numPoints, 8);

    Passes full(MeshBuilder::tetrahedron());
    full.numPoints = 0xFFFFFFFC;
    EXPECT_THROW(full.subdivide(Orvan::Array<bool>(4, true)), std::bad_alloc);
    EXPECT_EQ(full.numFaces, 4);
    EXPECT_EQ(full.positions.size, 4);

    float const nan = std::numeric_limits<float>::quiet_NaN();
    for (auto const& [tolerance, marked] :
        std::map<float, bool>{{1, false}, {0.99999f, true}, {1.1920929e-7f, false}, {0, false}, {-1, false}}) {
        Orvan::Array<bool> marks{false, false, true};
        Steps::markForSubdivision(tolerance, 3, {{0, 0, 0}, {1, 0, 0}, {0, 1, -2}, {nan, nan, nan}, {2, 2, 2}},
            {0, 1, 2, 3, 3, 3, 4, 4, 4}, {0, 3, 6, 9}, marks);
        EXPECT_EQ(marks, (Orvan::Array<bool>{marked, false, true})) << tolerance;
    }
}

TEST(Subdivide, averagesTheTypesThatHaveAMeanAndDropsAllOthers)
{
    auto const mesh = MeshBuilder::tetrahedron().build();
    forEachElementTypeName([&]<class T>(ElementType<T> type) {
        addDataProperty<T>(type.name, sPointComp, Orvan::Array<T>(4), *mesh);
        addDataProperty<T>((std::string("face ") + type.name).c_str(), sFaceComp, Orvan::Array<T>(4), *mesh);
    });
    auto const fill = [&]<class T, class Scalar>(char const* name) {
        Orvan::Array<T> values(4);
        for (std::size_t scalar = 0; scalar != values.size * sizeof(T) / sizeof(Scalar); ++scalar)
            reinterpret_cast<Scalar*>(values.data)[scalar] = static_cast<Scalar>(scalar * scalar % 37);
        addDataProperty<T>(name, sPointComp, std::move(values), *mesh);
    };
    auto const check = [&]<class T, class Scalar>(char const* name) {
        auto const values = dataOf<T>(*mesh, name);
        ASSERT_TRUE(values) << name;
        ASSERT_EQ(values->size, 8) << name;
        constexpr std::size_t kScalars = sizeof(T) / sizeof(Scalar);
        auto const* const scalars = reinterpret_cast<Scalar const*>(values->data);
        for (std::size_t scalar = 0; scalar != kScalars; ++scalar) { // the first face is that of points 0, 1 and 2
            Scalar const sum = scalars[scalar] + scalars[kScalars + scalar] + scalars[2 * kScalars + scalar];
            EXPECT_EQ(scalars[4 * kScalars + scalar],
                sum
                    * (sizeof(Scalar) == 4 ? static_cast<Scalar>(0.33333334f)
                                           : static_cast<Scalar>(0.3333333333333333)))
                << name;
        }
    };
    auto const forEachAveraged = [](auto const& visit) {
        using namespace Tessara::Math;
        visit.template operator()<float, float>("float");
        visit.template operator()<float2, float>("float2");
        visit.template operator()<float3, float>("float3");
        visit.template operator()<float4, float>("float4");
        visit.template operator()<float2x2, float>("float2x2");
        visit.template operator()<float2x3, float>("float2x3");
        visit.template operator()<float3x3, float>("float3x3");
        visit.template operator()<float4x4, float>("float4x4");
        visit.template operator()<double, double>("double");
        visit.template operator()<double2, double>("double2");
        visit.template operator()<double3, double>("double3");
        visit.template operator()<double4, double>("double4");
        visit.template operator()<double2x2, double>("double2x2");
        visit.template operator()<double2x3, double>("double2x3");
        visit.template operator()<double3x3, double>("double3x3");
        visit.template operator()<double4x4, double>("double4x4");
    };
    forEachAveraged(fill);
    addRangeProperty("range", sPointComp, {0, 0, 0, 0}, *mesh);
    addDataProperty<float>("of range", "range", {1}, *mesh);
    addDataProperty<float>("of int", "int", {1}, *mesh);
    addDataProperty<float>("of what targets int", "of int", {1}, *mesh);
    addDataProperty<float>("of corners", sFaceVertexComp, Orvan::Array<float>(12), *mesh);
    addDataProperty<float>("astray", "nowhere", {1}, *mesh);
    EXPECT_TRUE(subdivide(0.9f, *mesh));
    forEachAveraged(check);
    EXPECT_EQ(getGeoPropNamesByTarget(*mesh, sPointComp).size, 17) << "those and the positions";
    EXPECT_EQ(getGeoPropNamesByTarget(*mesh, sFaceComp).size, 1);
    EXPECT_EQ(getGeoPropNamesByTarget(*mesh, sFaceVertexComp).size, 1);
    for (char const* const name : {"range", "of range", "of int", "of corners"})
        EXPECT_FALSE(mesh->hasProperty(name)) << name;
    for (char const* const name : {"astray", "of what targets int"})
        EXPECT_TRUE(mesh->hasProperty(name)) << name;
}

TEST(Subdivide, keepsConstantAndLinearAttributes)
{
    auto const builder = graded(MeshBuilder::icosphere(2));
    auto const mesh = meshOf(builder);
    Orvan::Array<double> linear;
    for (float3 const& p : builder.points)
        linear.append(2.0 * p.x - p.y + 0.5 * p.z + 3);
    addDataProperty<double>("linear", sPointComp, std::move(linear), *mesh);
    addDataProperty<float>("constant", sPointComp, Orvan::Array<float>(builder.points.size(), 7.0f), *mesh);
    ASSERT_TRUE(subdivide(0.05f, *mesh));
    auto const places = dataOf<float3>(*mesh, "carried"); // not smoothed, as the other two
    ASSERT_GT(places->size, 2 * builder.points.size());
    for (std::size_t v = 0; v != places->size; ++v) {
        float3 const p = (*places)[v];
        EXPECT_NEAR((*dataOf<double>(*mesh, "linear"))[v], 2.0 * p.x - p.y + 0.5 * p.z + 3, 1e-5);
        EXPECT_NEAR((*dataOf<float>(*mesh, "constant"))[v], 7.0f, 1e-5f);
    }
}

TEST(Subdivide, doesNotDependOnNumbers)
{
    auto const builder = onGrid(graded(MeshBuilder::icosphere(2)));
    auto const expected = placesOf(*refined(builder, 0.06f));
    for (unsigned int const seed : {1u, 2u})
        EXPECT_TRUE(placesOf(*refined(MeshBuilder(builder).shuffled(seed), 0.06f)) == expected);
}

TEST(Subdivide, refusesOpenMeshesAndLeavesSmallFacesAlone)
{
    auto const quad = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, {0, 1, 2, 3, 3, 2, 1, 0}, {0, 4, 8});
    auto const open = MeshBuilder::sphere(3).withoutFace(5).build();
    auto const incomplete = MeshBuilder::sphere(3).build();
    incomplete->eraseProperty(sFaceOffset);
    for (auto const* const mesh : {&quad, &open, &incomplete}) {
        auto const before = deepCopy(**mesh);
        addDataProperty<int>("number", sPointComp, {1, 2}, **mesh);
        EXPECT_FALSE(subdivide(0.1f, **mesh));
        EXPECT_TRUE(sameContents(**mesh, *before)) << "only what cannot follow is gone";
    }
    float const nan = std::numeric_limits<float>::quiet_NaN();
    for (float const tolerance : {0.0f, -1.0f, 1.1920929e-7f, nan, 1.0f}) {
        auto const mesh = refined(MeshBuilder::sphere(3), tolerance);
        EXPECT_TRUE(sameContents(*mesh, *meshOf(MeshBuilder::sphere(3)))) << tolerance;
    }
    auto isolated = MeshBuilder::sphere(3);
    isolated.points.push_back({1, 2, 3});
    for (float const tolerance : {1.0f, 0.1f})
        EXPECT_TRUE(
            std::isnan((*dataOf<float3>(*refined(isolated, tolerance), sPointPosition))[isolated.points.size() - 1].x));
    auto const pointsOnly = MeshBuilder::of({{1, 2, 3}}, {});
    EXPECT_TRUE(sameContents(*refined(pointsOnly, 0.1f), *meshOf(pointsOnly)));
}

TEST(Subdivide, survivesWhatItIsNotMeantFor)
{
    Random random(1);
    for (unsigned int run = 0; run != 300; ++run) {
        MeshBuilder soup = MeshBuilder::sphere(2).withNoise(1, run);
        for (auto& face : soup.faces)
            for (unsigned int& corner : face)
                if (random.below(30) == 0)
                    corner = random.below(soup.points.size());
        for (std::size_t face = soup.faces.size();
             face-- != 0;) { // closed, but not manifold: each face once more, turned
            auto const [a, b, c] = soup.faces[face];
            soup.faces.push_back({c, b, a});
        }
        soup.points[random.below(soup.points.size())].x = std::numeric_limits<float>::quiet_NaN();
        auto const mesh = soup.build();
        EXPECT_TRUE(subdivide(0.4f, *mesh));
        EXPECT_TRUE(isValid(*mesh)) << run;
    }
    EXPECT_TRUE(isValid(*refined(MeshBuilder::bipyramid(30'000), 0.4f)));
}

TEST(Subdivide, givesTheSameBitsForAnyNumberOfThreadsAndEveryCompiler)
{
    auto const builder = graded(MeshBuilder::icosphere(3)).withNoise(0.01f, 5).shuffled(6);
    expectSameForThreads({1, 2, 8}, [&] { return refined(builder, 0.02f); });
    EXPECT_EQ(fingerprint(*refined(builder, 0.02f)), 10570202878098447737u) << "unlike other builds";
}

TEST(Subdivide, canBeCancelledInEverySweep)
{
    struct CancelledJob {
        ~CancelledJob() { Orvan::setJobCancelled(false); }
    };
    auto const builder = graded(MeshBuilder::icosphere(2));
    auto const before = meshOf(builder);
    unsigned int passes = 0;
    bool isDone = false;
    for (unsigned int last = 0; !isDone; ++last) { // in the first sweep of each pass
        CancelledJob const guard;
        auto const mesh = meshOf(builder);
        unsigned int pass = 0;
        auto const mark = [&](Steps::MarkableMesh const& m, Orvan::Array<bool>& marks) {
            Steps::markForSubdivision(0.03f, m.faceCount, m.positions, m.faceVertex, m.faceOffset, marks);
            Orvan::setJobCancelled(pass++ == last);
        };
        try {
            isDone = Steps::refineMesh(mark, *mesh);
            passes = pass;
        } catch (std::runtime_error const&) {
            expectAsBefore(*mesh, *before);
        }
    }
    EXPECT_GT(passes, 3);

    TSR::Canceller::resetCallCount();
    auto const expected = refined(builder, 0.03f);
    std::uint64_t const calls = TSR::Canceller::callCount();
    for (std::uint64_t call = 1; call <= calls; call += 1 + calls / 40) { // in later sweeps, as near as threads meet
        CancelledJob const guard;
        auto const mesh = meshOf(builder);
        std::atomic<bool> isOver = false;
        TSR::Canceller::resetCallCount();
        std::thread canceller([&] {
            while (TSR::Canceller::callCount() < call && !isOver) { }
            Orvan::setJobCancelled(true);
        });
        try {
            EXPECT_TRUE(subdivide(0.03f, *mesh));
            EXPECT_TRUE(sameContents(*mesh, *expected));
        } catch (std::runtime_error const&) {
            expectAsBefore(*mesh, *before);
        }
        isOver = true;
        canceller.join();
    }
}

TEST(Subdivide, leavesTheMeshAsItWasWhenMemoryRunsOut)
{
    for (auto const& builder : {MeshBuilder::tetrahedron(), graded(MeshBuilder::icosphere(1))}) {
        auto const expected = refined(builder, 0.3f);
        sweepFailingAllocations([&](Attempt const& attempt) {
            auto const mesh = meshOf(builder);
            Object const other = *mesh;
            auto const before = deepCopy(other);
            if (attempt([&] { subdivide(0.3f, *mesh); }))
                EXPECT_TRUE(sameContents(*mesh, *expected));
            else
                expectAsBefore(*mesh, *before);
            EXPECT_TRUE(sameContents(other, *before)) << "other holders";
        });
    }
}
