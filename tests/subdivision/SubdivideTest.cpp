#include <Modeling/subdivide.h>

#include "frame/VectorMath.h"
#include "subdivision/refineMesh.h"
#include "support/Testing.h"

#include <Modeling/subdivisionSteps.h>
#include <OrvanCppOpSDK/Job.h>

#include <tbb/task_group.h>

#include <chrono>
#include <thread>

using namespace Modeling;
using namespace Tessara::Math;
using namespace TestSupport;
using Geometry::Mesh::subdivide;
namespace Steps = Geometry::Mesh::Internal;

namespace {

/// A mesh with a property "carried" on its points, by default their positions.
Orvan::MutablePtr<Object> meshOf(MeshBuilder const& builder, std::vector<float3> const& carried = {})
{
    auto mesh = builder.build();
    addDataProperty<float3>(
        "carried", sPointComp, Orvan::Array<float3>(carried.empty() ? builder.points : carried), *mesh);
    return mesh;
}

Orvan::MutablePtr<Object> refined(MeshBuilder const& builder, float tolerance)
{
    auto mesh = meshOf(builder);
    EXPECT_TRUE(subdivide(tolerance, *mesh));
    return mesh;
}

/// Only the two tips differ from the other points, by one unit in the last place: they stay there however fine the
/// faces get.
MeshBuilder tipsOneFloatApart()
{
    MeshBuilder mesh = MeshBuilder::bipyramid(8).shuffled(1);
    for (float3& point : mesh.points)
        point = {0, 0, point.z == 0 ? 0x1p25f : 0x1p25f - 2};
    return mesh;
}

struct ClosedMesh {
    MeshBuilder builder;
    std::uint64_t refined, marked; // fingerprints
};

std::map<std::string, ClosedMesh> closedMeshes()
{
    return {
        {"tetrahedron", {MeshBuilder::tetrahedron(), 7500093758956781132u, 1925882433916549395u}},
        {"noise", {MeshBuilder::sphere(4).withNoise(0.1f, 3).shuffled(4), 8836986909361035247u, 1991688503786063501u}},
        {"graded", {MeshBuilder::sphere(6).graded(), 97071283589157845u, 9356163269048779337u}},
        {"torus",
            {MeshBuilder::torus(12, 9).withNoise(0.3f, 1).shuffled(9), 8982201963558640406u, 6729791774085565844u}},
        {"needles",
            {MeshBuilder::sphere(3).withNeedles(20, 0.02f).shuffled(2), 8218371230067981736u, 4139327674431853156u}},
        {"bipyramid", {MeshBuilder::bipyramid(60).withNoise(0.01f, 7), 10455697412830630882u, 13446342876449610623u}},
        {"tips one float apart", {tipsOneFloatApart(), 5847461616290469472u, 12612927430442565923u}},
        {"two parts",
            {MeshBuilder::icosahedron().joinedWith(MeshBuilder::torus(5, 4), {9, 0, 0}), 5592784212514565019u,
                10577201515170940087u}},
    };
}

/// Of the mesh and its property "carried".
std::uint64_t fingerprintOf(Object const& mesh, Object const& withValues)
{
    return fingerprint(mesh) ^ 3 * fingerprint(*makeMesh(*dataOf<float3>(withValues, "carried"), {}, {0}));
}

/// Runs passes with any marks by calling the steps.
struct Passes {
    explicit Passes(MeshBuilder const& builder)
        : object(meshOf(builder))
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
    std::uint64_t fingerprint() const { return fingerprintOf(*mesh(), *object); }
    bool isBalanced() const { return Steps::isBalanced(halfEdges, numFaces, faceVertex, faceOffset, faceStates); }
    Orvan::MutablePtr<Object> mesh() const { return makeMesh(positions, faceVertex, faceOffset); }

    Orvan::MutablePtr<Object> object;
    Orvan::Array<float3> positions = *dataOf<float3>(*object, sPointPosition), basePositions = positions;
    Orvan::Array<float3> limitPositions;
    Orvan::Array<unsigned int> faceVertex = *dataOf<unsigned int>(*object, sFaceVertex);
    Orvan::Array<unsigned int> faceOffset = *dataOf<unsigned int>(*object, sFaceOffset);
    unsigned int numPoints = getElementCount(*object, sPointComp), numFaces = getElementCount(*object, sFaceComp);
    unsigned int numFaceVertices = 3 * numFaces;
    Orvan::Array<unsigned char> vertexLevels = Orvan::Array<unsigned char>(numPoints);
    Orvan::Array<unsigned char> faceStates = Orvan::Array<unsigned char>(numFaces);
    Geometry::Mesh::HalfEdgeDataStructure halfEdges{numPoints, numFaces, faceVertex, faceOffset};
};

/// Gives the points of a tetrahedron values of a type that is made of scalars, and checks the mean of the first three.
template <class T, class Scalar> void expectMean(Scalar third)
{
    auto const mesh = MeshBuilder::tetrahedron().build();
    Orvan::Array<T> values(4);
    std::size_t const n = sizeof(T) / sizeof(Scalar);
    for (std::size_t i = 0; i != 4 * n; ++i)
        reinterpret_cast<Scalar*>(values.data)[i] = static_cast<Scalar>(i * i % 37);
    addDataProperty<T>("values", sPointComp, std::move(values), *mesh);
    ASSERT_TRUE(subdivide(0.9f, *mesh));
    auto const refined = dataOf<T>(*mesh, "values");
    ASSERT_EQ(refined->size, 8);
    auto const* const s = reinterpret_cast<Scalar const*>(refined->data);
    for (std::size_t i = 0; i != n; ++i)
        EXPECT_EQ(s[4 * n + i], (s[i] + s[n + i] + s[2 * n + i]) * third) << i;
}

}

TEST(Subdivide, SplitsLargeFacesAndKeepsClosedSurfaces)
{
    for (auto const& [name, closed] : closedMeshes()) {
        std::uint64_t found = 0;
        for (float const tolerance : {0.5f, 0.12f}) {
            SCOPED_TRACE(name + ", tolerance " + std::to_string(tolerance));
            auto const mesh = refined(closed.builder, tolerance);
            EXPECT_TRUE(isClosedManifold(*mesh));
            EXPECT_EQ(countsOf(*mesh).eulerCharacteristic(), countsOf(*closed.builder.build()).eulerCharacteristic());
            Orvan::Array<bool> large(static_cast<std::uint64_t>(countsOf(*mesh).faces));
            Steps::markForSubdivision(tolerance, static_cast<unsigned int>(large.size),
                *dataOf<float3>(*mesh, sPointPosition), *dataOf<unsigned int>(*mesh, sFaceVertex),
                *dataOf<unsigned int>(*mesh, sFaceOffset), large);
            EXPECT_EQ(std::count(large.begin(), large.end(), true) != 0, name == "tips one float apart");
            found = 31 * found + fingerprintOf(*mesh, *mesh);
        }
        EXPECT_EQ(found, closed.refined) << name;
    }
}

TEST(Subdivide, StaysBalancedForAnyMarks)
{
    for (auto const& [name, closed] : closedMeshes()) {
        Passes passes(closed.builder);
        Random random(7);
        std::uint64_t found = 0;
        for (unsigned int pass = 0; pass != 7; ++pass) {
            SCOPED_TRACE(name + ", pass " + std::to_string(pass));
            Orvan::Array<bool> marks(passes.numFaces);
            for (bool& mark : marks)
                mark = random.below(pass == 3 ? 1 : 9) == 0;
            passes.pass(marks);
            EXPECT_TRUE(passes.isBalanced());
            EXPECT_TRUE(isClosedManifold(*passes.mesh()));
            found = 31 * found + passes.fingerprint();
        }
        EXPECT_EQ(found, closed.marked) << name;
    }
}

TEST(Subdivide, FollowsTheAdjacencyThatTheStepsFindAnew)
{
    auto meshes = closedMeshes();
    std::vector<float3> const corners{{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {0, 0, 1}, {-1, 0, 0}, {0, -1, 0}, {0, 0, -1}};
    MeshBuilder const tetrahedron = MeshBuilder::tetrahedron();
    auto const add = [&](char const* name, std::vector<std::array<unsigned int, 3>> const& faces) {
        meshes[name] = {MeshBuilder::of(corners, faces).joinedWith(tetrahedron, {3, 0, 0}), 0, 0};
    };
    add("tetrahedra with a common point",
        {{0, 1, 2}, {0, 2, 3}, {0, 3, 1}, {3, 2, 1}, {0, 4, 5}, {0, 5, 6}, {0, 6, 4}, {6, 5, 4}});
    add("two faces share three edges", {{0, 1, 2}, {2, 1, 0}});
    add("a point twice in a face", {{0, 0, 1}, {1, 0, 2}, {2, 0, 1}});
    add("repeated edges", {{0, 1, 2}, {2, 1, 0}, {0, 1, 3}, {3, 1, 0}});
    add("tetrahedra back to back",
        {{0, 1, 2}, {0, 2, 3}, {0, 3, 1}, {3, 2, 1}, {2, 1, 0}, {3, 2, 0}, {1, 3, 0}, {1, 2, 3}});
    for (auto const& [name, closed] : meshes)
        for (unsigned int const oneOf : {1u, 3u, 20u}) {
            unsigned int pass = 0;
            auto const mark = [&](Orvan::Array<bool>& marks) {
                Random random(++pass);
                for (std::uint64_t face = 0; face != marks.size && pass < (oneOf == 1 ? 5 : 9); ++face)
                    marks[face] = random.below(oneOf) == 0;
            };
            auto const mesh = meshOf(closed.builder);
            ASSERT_TRUE(Steps::refineMesh([&](auto const&, auto& marks) { mark(marks); }, *mesh)) << name;
            unsigned int const passCount = std::exchange(pass, 0);
            Passes steps(closed.builder);
            while (pass != passCount) {
                Orvan::Array<bool> marks(steps.numFaces);
                mark(marks);
                steps.pass(marks);
            }
            EXPECT_EQ(fingerprintOf(*mesh, *mesh), steps.fingerprint()) << name << ", one of " << oneOf;
        }
}

TEST(Subdivide, RelaxesStepByStepOnUniformMeshes)
{
    // By symmetry, a corner of a solid moves along its own direction: to this fraction of its distance from the center
    // in one step, and at the limit.
    struct Solid {
        MeshBuilder mesh;
        float once, limit;
    };
    for (Solid const& solid :
        {Solid{MeshBuilder::tetrahedron(), 7.0f / 27, 1.0f / 6}, Solid{MeshBuilder::sphere(1), 5.0f / 9, 3.0f / 7},
            Solid{MeshBuilder::icosahedron(), 0.792277f, 0.707064f}}) {
        Passes passes(solid.mesh);
        float3 const corner = solid.mesh.points[0];
        EXPECT_LT(length(passes.limitPositions[0] - corner * solid.limit), 2e-6f);
        for (unsigned char pass = 1; pass != 6; ++pass) {
            unsigned int const points = passes.numPoints, faces = passes.numFaces;
            passes.pass(Orvan::Array<bool>(faces, true));
            ASSERT_EQ(passes.numPoints, points + faces);
            // Every edge has flipped.
            EXPECT_EQ(passes.faceStates, Orvan::Array<unsigned char>(3 * faces, 8 * pass & 0xFF));
            if (pass == 1) {
                EXPECT_LT(length(passes.positions[0] - corner * solid.once), 2e-6f);
            }
        }
    }
}

TEST(Subdivide, StepsHandleStatesThatDriversNeverProduce)
{
    // Next to a coarser face nothing is emitted. Balancing does not change such a state if all faces split.
    Passes unbalanced(MeshBuilder::tetrahedron());
    unbalanced.faceStates = {2 << 2 | 2, 2, 2, 2};
    EXPECT_FALSE(unbalanced.isBalanced());
    for (auto const& [mark, expected] :
        std::map<bool, std::uint64_t>{{false, 8358639396607655001u}, {true, 10753806013162789402u}}) {
        unbalanced.pass(Orvan::Array<bool>(unbalanced.numFaces, mark)); // the second pass moves points
        EXPECT_EQ(unbalanced.fingerprint(), expected);
    }

    Passes thirds(MeshBuilder::tetrahedron());
    thirds.faceStates = {1 << 2, 2 << 2 | 2, 1 << 2, 1 << 2};
    thirds.subdivide(Orvan::Array<bool>(4));
    EXPECT_EQ(thirds.numFaces, 6) << "thirds do not follow a finer face";

    Passes fan(MeshBuilder::of(std::vector<float3>(5), {{0, 1, 2}, {0, 1, 3}, {1, 0, 4}}));
    fan.faceStates[1] = 2 << 2; // its neighbor, face 2, has face 0 as a neighbor instead
    EXPECT_FALSE(fan.isBalanced());

    Passes aged(MeshBuilder::tetrahedron());
    aged.vertexLevels[aged.faceVertex[2]] = 5;
    aged.subdivide(Orvan::Array<bool>(4, true));
    EXPECT_EQ(aged.vertexLevels[4], 6) << "one more than its newest corner";

    Passes full(MeshBuilder::tetrahedron());
    full.numPoints = 0xFFFFFFFC;
    EXPECT_THROW(full.subdivide(Orvan::Array<bool>(4, true)), std::bad_alloc);
    EXPECT_EQ(full.numFaces, 4);
    EXPECT_EQ(full.positions.size, 4);

    for (auto const& [tolerance, marked] :
        std::map<float, bool>{{1, false}, {0.99999f, true}, {1.1920929e-7f, false}}) {
        Orvan::Array<bool> marks{false, false, true};
        Steps::markForSubdivision(tolerance, 3, {{0, 0, 0}, {1, 0, 0}, {0, 1, -2}, {kNan, kNan, kNan}, {2, 2, 2}},
            {0, 1, 2, 3, 3, 3, 4, 4, 4}, {0, 3, 6, 9}, marks);
        EXPECT_EQ(marks, (Orvan::Array<bool>{marked, false, true})) << tolerance;
    }
}

TEST(Subdivide, AveragesTypesWithAMeanAndRemovesAllOthers)
{
    expectMean<float>(0.33333334f);
    expectMean<float2x3>(0.33333334f);
    expectMean<double>(0.3333333333333333);
    expectMean<double3>(0.3333333333333333);
    expectMean<double4x4>(0.3333333333333333);

    auto const mesh = MeshBuilder::tetrahedron().build();
    Random random(1);
    for (char const* const component : {sPointComp, sFaceVertexComp, sFaceComp})
        addAllTypes(component, random, *mesh);
    Orvan::Array<float> tooShort(8, 6);
    tooShort.resize(1); // values beyond the end must not show up
    addDataProperty<float>("sPointCompShort", sPointComp, std::move(tooShort), *mesh);
    addRangeProperty("range", sPointComp, {0, 0, 0, 0}, *mesh);
    addDataProperty<float>("of range", "range", {1}, *mesh);
    addDataProperty<float>("of int", "sPointCompint", {1}, *mesh);
    addDataProperty<float>("of what targets int", "of int", {1}, *mesh);
    ASSERT_TRUE(subdivide(0.9f, *mesh));
    std::string kept;
    Orvan::Array<Orvan::String> const names = getGeoPropNamesByTarget(*mesh, sPointComp);
    for (Orvan::String const& name : names)
        kept += std::string(name.view().substr(std::string_view(sPointComp).size())) + " ";
    EXPECT_EQ(kept,
        "tion float double float2 float4 float3 float2x2 float2x3 float3x3 float4x4 double2 double3 double4 double2x2 "
        "double2x3 double3x3 double4x4 Short ");
    EXPECT_EQ(valuesOf<float>(*mesh, "sPointCompShort")[4], 6 * 0.33333334f) << "missing values are zero";
    EXPECT_EQ(getGeoPropNamesByTarget(*mesh, sFaceComp).size, 1);
    EXPECT_EQ(getGeoPropNamesByTarget(*mesh, sFaceVertexComp).size, 1);
    EXPECT_FALSE(mesh->hasProperty("of range") || mesh->hasProperty("of int"));
    EXPECT_TRUE(mesh->hasProperty("of what targets int")) << "removal goes one level deep";

    addDataProperty<float>("sPointCompShort", sPointComp, {1}, *mesh);
    ASSERT_TRUE(subdivide(9, *mesh));
    EXPECT_EQ(valuesOf<float>(*mesh, "sPointCompShort"), (std::vector<float>{1, 0, 0, 0, 0, 0, 0, 0}))
        << "even if nothing splits";
}

TEST(Subdivide, RefusesOpenMeshesAndLeavesSmallFacesAlone)
{
    auto const quad = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, {0, 1, 2, 3, 3, 2, 1, 0}, {0, 4, 8});
    auto const open = MeshBuilder::sphere(3).withoutFace(5).build();
    auto const incomplete = MeshBuilder::sphere(3).build();
    incomplete->eraseProperty(sFaceOffset);
    auto const withOtherPositions = MeshBuilder::sphere(3).build();
    addDataProperty<int>(sPointPosition, sPointComp, {1, 2, 3}, *withOtherPositions);
    for (auto const* const mesh : {&quad, &open, &incomplete, &withOtherPositions}) {
        auto const before = deepCopy(**mesh);
        addDataProperty<int>("number", sPointComp, {1, 2}, **mesh);
        EXPECT_FALSE(subdivide(0.1f, **mesh));
        EXPECT_TRUE(sameContents(**mesh, *before)) << "only data that cannot be refined is removed";
    }
    for (float const tolerance : {0.0f, -1.0f, 1.1920929e-7f, kNan, 1.0f}) {
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

TEST(Subdivide, SurvivesMeshesOutsideOfItsPreconditions)
{
    Random random(1);
    std::uint64_t found = 0;
    for (unsigned int run = 0; run != 150; ++run) {
        MeshBuilder soup = MeshBuilder::sphere(2).withNoise(1, run);
        for (unsigned int change = 0; change != 3; ++change)
            soup.faces[random.below(32)][random.below(3)] = random.below(18);
        // Closed, but not manifold: each face again, with opposite orientation.
        for (std::size_t face = 0; face != 32; ++face)
            soup.faces.push_back({soup.faces[face][2], soup.faces[face][1], soup.faces[face][0]});
        auto const mesh = refined(soup, 0.4f);
        found = 31 * found + fingerprintOf(*mesh, *mesh);
        soup.points[random.below(18)].x = kNan;
        EXPECT_TRUE(isValid(*refined(soup, 0.4f))) << run;
    }
    EXPECT_EQ(found, 15706807112424336335u);
    EXPECT_TRUE(isValid(*refined(MeshBuilder::bipyramid(30'000), 0.4f)));
}

TEST(Subdivide, CanBeCancelledInEveryPass)
{
    auto const builder = MeshBuilder::sphere(6).graded();
    auto const before = meshOf(builder), expected = refined(builder, 0.03f);
    std::uint64_t pointCount = 0; // in the pass that is cancelled
    // \return whether it was cancelled
    auto const isCancelled = [&](Steps::MarkFaces const& mark) {
        auto const mesh = meshOf(builder);
        bool hasThrown = false;
        try {
            EXPECT_TRUE(Steps::refineMesh(mark, *mesh));
            EXPECT_TRUE(sameContents(*mesh, *expected));
        } catch (std::runtime_error const&) {
            hasThrown = true;
            EXPECT_EQ(dataOf<float3>(*mesh, "carried")->size, pointCount) << "grows with each pass";
            cutToElements("carried", *mesh);
            EXPECT_TRUE(sameContents(*mesh, *before));
        }
        Orvan::setJobCancelled(false);
        return hasThrown;
    };
    unsigned int last = 0, pass = 0;
    auto const markAndCancel = [&](Steps::MarkableMesh const& m, Orvan::Array<bool>& marks) {
        Steps::markForSubdivision(0.03f, m.faceCount, m.positions, m.faceVertex, m.faceOffset, marks);
        Orvan::setJobCancelled(pass++ == last);
        pointCount = m.positions.size;
    };
    for (; isCancelled(markAndCancel); pass = 0) // in the first sweep of each pass
        ++last;
    EXPECT_GT(last, 3);
    EXPECT_EQ(last, pass) << "in each pass, even if nothing splits";
}

TEST(Subdivide, LeavesAClosedMeshIfAnEnclosingGroupIsCancelled)
{
    auto const builder = MeshBuilder::sphere(12).graded();
    for (unsigned int delay = 0; delay != 12; ++delay) { // mostly in the middle of a pass
        auto const mesh = meshOf(builder);
        tbb::task_group_context context;
        tbb::task_group group(context);
        std::jthread canceller;
        unsigned int pass = 0;
        auto const mark = [&](Steps::MarkableMesh const& m, Orvan::Array<bool>& marks) {
            Steps::markForSubdivision(0.02f, m.faceCount, m.positions, m.faceVertex, m.faceOffset, marks);
            if (pass++ == 2)
                canceller = std::jthread([&context, delay] {
                    std::this_thread::sleep_for(std::chrono::microseconds(10 * delay));
                    context.cancel_group_execution();
                });
        };
        group.run_and_wait([&] { EXPECT_TRUE(Steps::refineMesh(mark, *mesh)); });
        EXPECT_TRUE(isClosedManifold(*mesh)) << delay;
    }
}
