#include "host/GeoProperties.h"
#include "support/AllocationHooks.h"
#include "support/Testing.h"
#include "support/Volumes.h"

#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/deleteComponents.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/mergeStrands.h>
#include <Modeling/removeSlivers.h>
#include <Modeling/smooth.h>
#include <Modeling/subdivide.h>
#include <Modeling/subdivideByVolume.h>
#include <Modeling/triangulate.h>
#include <OrvanCore/CachedBlocks.h>

// What every operation promises: the same bits for any number of threads, no change that another holder of the input can
// see, and an object that is either edited or as it was when memory runs out.

using namespace Tessara::GeometryAlgorithms;
using namespace TestSupport;

namespace {

using Input = Orvan::Ptr<Object>;
using Inputs = Orvan::Array<Input>;
using Indices = Orvan::Array<unsigned int>;
using Run = std::function<bool(Object&)>;

struct Operation {
    std::string name;
    Run run;
    Input large; // runs in parallel
    std::vector<Input> small; // allocations fail one by one
    Inputs read = {}; // by the operation, besides the object that it edits
    char const* mayGrow = nullptr; // as in `expectAllOrNothing`
};

bool triangulate(Object& mesh)
{
    Geometry::Mesh::triangulate("* -drop", mesh);
    return true;
}

bool smooth(Object& mesh)
{
    auto const corners = dataOf<unsigned int>(mesh, sFaceVertex), offsets = dataOf<unsigned int>(mesh, sFaceOffset);
    return Modeling::editGeoPropData<float3>(sPointPosition, mesh, [&](Orvan::Array<float3>& positions) {
        Geometry::Mesh::smooth(3, static_cast<unsigned int>(positions.size),
            static_cast<unsigned int>(offsets->size - 1), *corners, *offsets, nullptr, positions, CoreGL::NOPLogger());
    });
}

template <class Traits> Run subdivideByVolume(float atCenter, float tolerance)
{
    using namespace TSR::TileTree3D;
    auto const field = Field::of(-13, 13, [=](int i, int, int) { return atCenter + 0.5f * float(i) / 10; });
    auto const volume = std::make_shared<Volume<Traits> const>(
        buildVolume<Traits>({.background = 1, .depth = Traits::kUnitDepth, .block = field.block()}));
    return [=](Object& object) {
        LinearSampler<Traits> const sampler(volume->container, volume->channel, volume->topology,
            {.scale = 10, .background = volume->background}, nullptr);
        return Geometry::Mesh::subdivide(sampler, object, tolerance);
    };
}

Run subdivide(float tolerance)
{
    return [=](Object& object) { return Geometry::Mesh::subdivide(tolerance, object); };
}

Input withPointProperty(MeshBuilder const& builder)
{
    auto mesh = builder.build();
    addDataProperty<float3>("carried", sPointComp, Orvan::Array<float3>(builder.points), *mesh);
    return mesh;
}

Input withFaceProperties(PolygonMesh const& polygons)
{
    auto mesh = polygons.build();
    addDataProperty("uv", sFaceVertexComp, Orvan::Array<float>(polygons.faceVertex.size()), *mesh);
    addDataProperty("drop", sFaceComp, Orvan::Array<float>(polygons.faceCount()), *mesh);
    addRangeProperty("range", sFaceComp, Indices(polygons.faceCount()), *mesh);
    return mesh;
}

Input withRandomProperties(Orvan::MutablePtr<Object> object, Random& random)
{
    for (char const* const component : {sPointComp, sFaceVertexComp, sFaceComp, sStrandComp})
        if (object->hasProperty(component))
            addRandomProperties(component, random, *object);
    return object;
}

std::vector<Operation> meshOperations()
{
    using namespace TSR::TileTree3D;
    auto const polygons =
        PolygonMesh::quads(40).withNoise(0.3f, 1).joinedWith(PolygonMesh::stars(500, 3, 50, 2)).build();
    Random random(1);
    for (Orvan::String const component : {sFaceVertexComp, sFaceComp}) {
        addAllTypes(component, random, *polygons);
        addRandomProperties(component, random, *polygons);
    }
    auto const smoothed = MeshBuilder::sphere(40).withNoise(0.01f, 5).shuffled(6).polygons().joinedWith(
        PolygonMesh::stars(2000, 3, 9, 7));
    auto const sphere = MeshBuilder::sphere(12).withNoise(0.01f, 5).shuffled(6);
    Input const icosahedron = MeshBuilder::icosahedron().build();
    return {
        {"removeSlivers", [](Object& mesh) { return Geometry::Mesh::removeSlivers(0.2f, mesh); },
            MeshBuilder::sphere(40).withNeedles(500).withNoise(0.002f, 5).shuffled(6).build(),
            {MeshBuilder::sphere(3).withNeedles(5).build(), MeshBuilder::sphere(36).withNeedles(5).build()}},
        {"smooth", smooth, smoothed.build(), {PolygonMesh::quads(40).withNoise(0.2f, 1).build()}},
        {"triangulate", triangulate, deepCopy(*polygons),
            {withFaceProperties(PolygonMesh::stars(1, 33, 34, 3)),
                withFaceProperties(PolygonMesh::stars(40, 33, 34, 3))}},
        {"subdivide", subdivide(0.02f),
            withPointProperty(MeshBuilder::sphere(12).graded().withNoise(0.01f, 5).shuffled(6)), {}},
        {"subdivide little", subdivide(0.3f), nullptr,
            {withPointProperty(MeshBuilder::tetrahedron()), withPointProperty(MeshBuilder::sphere(2).graded())}, {},
            "carried"},
        {"subdivide by volume", subdivideByVolume<Traits2>(0.6f, 0.1f), sphere.build(), {}},
        {"subdivide by volume with five voxels", subdivideByVolume<Traits5>(0.6f, 0.1f), sphere.build(), {}},
        {"subdivide little by volume", subdivideByVolume<Traits2>(1, 0.5f), nullptr, {icosahedron}},
        {"subdivide little by volume with five voxels", subdivideByVolume<Traits5>(1, 0.5f), nullptr, {icosahedron}},
    };
}

/// On objects with properties of all types.
void addEdits(std::vector<Operation>& operations)
{
    Random random(8);
    auto const mesh = MeshBuilder::sphere(40).withNoise(0.1f, 2).shuffled(3).build();
    for (char const* const component : {sPointComp, sFaceVertexComp, sFaceComp})
        addAllTypes(component, random, *mesh);
    auto const cloud = makePointCloud(randomPositions(30'000, random));
    addAllTypes(sPointComp, random, *cloud);
    Orvan::Array<bool> deleted(getElementCount(*mesh, sFaceComp));
    for (std::size_t face = 0; face != deleted.size; ++face)
        deleted[face] = face / 20 % 2 == 0 || random.below(9) == 0;
    Indices indices(20'000);
    for (unsigned int& index : indices)
        index = random.below(40'000);
    auto const added = dataOf<float3>(*mesh, sPointPosition);
    auto const editPoints = [=](Object& object) {
        return deletePointsInPointCloud(indices, object, nullptr)
            && addPointsToPointCloud(*added, "isNew", object, nullptr);
    };
    operations.push_back({"edit", [=](Object& o) { return deleteFaces(deleted, o); }, deepCopy(*mesh), {}});
    operations.push_back({"edit", editPoints, deepCopy(*cloud), {}});

    std::vector<Input> meshes, clouds;
    for (unsigned int seed = 0; seed != 6; ++seed) {
        meshes.push_back(withRandomProperties(PolygonMesh::soup(6, 4, 1, 4, random).build(), random));
        clouds.push_back(withRandomProperties(makePointCloud(randomPositions(5, random)), random));
    }
    Orvan::Array<float3> const points = randomPositions(2, random);
    Indices const remap{0, kDeletedElement, 1, 2, 3};
    operations.insert(operations.end(),
        {{"addPointsToPointCloud", [=](Object& o) { return addPointsToPointCloud(points, "isNew", o, nullptr); },
             nullptr, clouds},
            {"deletePointsInPointCloud",
                [](Object& o) {
                    return deletePointsInPointCloud(Indices{3, 1}, o, nullptr);
                },
                nullptr, clouds},
            {"deleteComponents", [=](Object& o) { return deleteComponents(remap, sPointComp, o); }, nullptr, clouds},
            {"deleteFaces",
                [](Object& o) {
                    return deleteFaces({false, true, false, true}, o);
                },
                nullptr, meshes}});
}

template <class Merge>
Operation mergeOf(char const* name, Merge const& merge, Inputs const& inputs, bool isLarge = false)
{
    auto output = Tessara::createObject();
    if (!isLarge)
        addComponent(sPointComp, 2, *output);
    Input const target = std::move(output);
    Run const run = [=](Object& object) { return merge(inputs, object, nullptr); };
    return {name, run, isLarge ? target : nullptr, isLarge ? std::vector<Input>{} : std::vector<Input>{target}, inputs};
}

void addMerges(std::vector<Operation>& operations)
{
    Random random(1);
    Inputs meshes;
    for (unsigned int segments : {3u, 40u, 20u}) {
        auto mesh = PolygonMesh::quads(segments).withNoise(0.1f, segments).build();
        addAllTypes(sFaceVertexComp, random, *mesh);
        addRandomProperties(sFaceComp, random, *mesh);
        meshes.append(std::move(mesh));
    }
    operations.push_back(mergeOf("mergeMeshes", mergeMeshes, meshes, true));
    for (int run = 0; run != 3; ++run) {
        Inputs soups, clouds, strands;
        for (int input = 0; input != 2; ++input) {
            soups.append(withRandomProperties(PolygonMesh::soup(6, 4, 1, 4, random).build(), random));
            clouds.append(withRandomProperties(makePointCloud(randomPositions(5, random)), random));
            strands.append(withRandomProperties(makeStrands(randomPositions(5, random), {0, 2, 5}), random));
        }
        operations.push_back(mergeOf("merge small meshes", mergeMeshes, soups));
        operations.push_back(mergeOf("mergePointClouds", mergePointClouds, clouds));
        operations.push_back(mergeOf("mergeStrands", mergeStrands, strands));
    }
}

std::vector<Operation> const& operations()
{
    static std::vector<Operation> const all = [] {
        auto made = meshOperations();
        addEdits(made);
        addMerges(made);
        return made;
    }();
    return all;
}

void expectUnchanged(Inputs const& inputs, std::vector<Orvan::MutablePtr<Object>> const& before)
{
    for (std::size_t i = 0; i != inputs.size; ++i)
        EXPECT_TRUE(sameContents(*inputs[i], *before[i])) << "input " << i;
}

std::vector<Orvan::MutablePtr<Object>> copiesOf(Inputs const& inputs)
{
    std::vector<Orvan::MutablePtr<Object>> copies;
    for (Input const& input : inputs)
        copies.push_back(deepCopy(*input));
    return copies;
}

}

TEST(EveryOperation, GivesTheSameBitsForAnyNumberOfThreadsAndEveryCompiler)
{
    std::map<std::string, std::uint64_t> found; // rows of one name share a fingerprint
    for (Operation const& operation : operations()) {
        SCOPED_TRACE(operation.name);
        auto const result = [&] {
            auto object = Tessara::createObject();
            *object = *operation.large;
            EXPECT_TRUE(operation.run(*object));
            return object;
        };
        if (operation.large) {
            expectSameForThreads({1, 2, 8}, result);
            found[operation.name] ^= fingerprint(*result());
        }
    }
    std::map<std::string, std::uint64_t> const expected{{"removeSlivers", 10566543302546679046u},
        {"smooth", 12051321789703744860u}, {"triangulate", 17233755314226598550u}, {"subdivide", 15911402519549515617u},
        {"subdivide by volume", 12192136266283760578u}, {"subdivide by volume with five voxels", 12192136266283760578u},
        {"mergeMeshes", 4029426161352146075u}, {"edit", 18315343627973384084u}};
    EXPECT_EQ(found, expected) << "unlike other builds";
}

TEST(EveryOperation, ChangesNothingThatIsShared)
{
    for (Operation const& operation : operations()) {
        auto const readBefore = copiesOf(operation.read);
        std::vector<Input> inputs = operation.small;
        if (operation.large)
            inputs.push_back(operation.large);
        for (Input const& input : inputs) {
            auto const before = deepCopy(*input), expected = deepCopy(*input);
            bool const isDone = operation.run(*expected);
            for (Holders const holders : {Holders::Object, Holders::Properties, Holders::Arrays}) {
                SCOPED_TRACE(operation.name + ", holders " + std::to_string(static_cast<int>(holders)));
                auto const object = deepCopy(*input);
                Object const other = held(holders, *object);
                EXPECT_EQ(operation.run(*object), isDone);
                EXPECT_TRUE(sameContents(*object, *expected));
                EXPECT_TRUE(sameContents(other, held(holders, *before))) << "another holder sees a change";
            }
        }
        expectUnchanged(operation.read, readBefore);
    }
}

TEST(EveryOperation, LeavesTheObjectAsItWasWhenMemoryRunsOut)
{
    for (Operation const& operation : operations())
        for (Input const& input : operation.small) {
            SCOPED_TRACE(operation.name);
            auto const readBefore = copiesOf(operation.read);
            expectAllOrNothing(*input, operation.run, operation.mayGrow);
            expectUnchanged(operation.read, readBefore);
        }
}

TEST(EveryOperation, NeedsNoMoreWorkingMemoryThanItsHeaderSays)
{
    struct Sizes {
        double points, corners, faces; // before
        double resultFaces, resultBytes; // bytes that are not shared with the input
    };
    auto const subdivision = [](Sizes const& sizes) { return 105 * sizes.resultFaces - sizes.resultBytes; };
    std::map<std::string, std::function<double(Sizes const&)>> const bounds{
        {"removeSlivers", [](Sizes const& sizes) { return 40 * sizes.faces; }},
        {"smooth", [](Sizes const& sizes) { return 32 * sizes.points + 12 * sizes.corners + 24 * sizes.faces; }},
        {"triangulate", [](Sizes const& sizes) { return 0.01 * sizes.resultBytes; }},
        {"subdivide", subdivision},
        {"subdivide by volume", subdivision},
        {"subdivide by volume with five voxels", subdivision},
        {"mergeMeshes", [](Sizes const& sizes) { return 0.01 * sizes.resultBytes; }},
        {"edit", // of points, in two steps; the result of the first is released
            [](Sizes const& sizes) {
                double const forProperties = 20'000; // small objects for each of 40 or 120
                return 5.5 * sizes.points + 0.3 * (sizes.corners + sizes.faces) + forProperties
                    + (sizes.faces == 0 ? sizes.resultBytes : 0);
            }},
    };
    for (Operation const& operation : operations()) {
        if (!operation.large)
            continue;
        Object object = *operation.large;
        auto const count = [&](char const* component) {
            return static_cast<double>(getElementCount(object, component));
        };
        Sizes sizes{count(sPointComp), count(sFaceVertexComp), count(sFaceComp), 0, 0};
        Orvan::releaseCachedBlocks();
        Memory const memory = memoryOf([&] {
            operation.run(object);
            Orvan::releaseCachedBlocks(); // part of the peak, but not of the result
        });
        sizes.resultFaces = count(sFaceComp);
        sizes.resultBytes = static_cast<double>(memory.kept);
        EXPECT_GT(memory.kept, 0) << operation.name;
        EXPECT_LE(static_cast<double>(memory.peak - memory.kept), bounds.at(operation.name)(sizes)) << operation.name;
    }
}
