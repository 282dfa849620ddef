// operationReference FOLDER SEED: runs the operations of the library on random objects with properties of all element types, and
// writes arguments and results to FOLDER. The tests of the Python package call its functions with the same arguments and
// compare.
//
// FOLDER/cases.json is a list of calls: "function" of the package, its "arguments" and "options", and either "result" or the
// "members" of the instance that it makes, as [name, arguments or null for an attribute, options, result]. Objects are names of
// HDF5 files, arrays have their type and their bits, and null as the result of a function means that it refuses.

#include "files/GeometryFile.h"
#include "geometry/Geometry.h"
#include "support/MeshBuilder.h"
#include "support/PropertyBag.h"
#include "support/Volumes.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/StitchTemplate.h>
#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/computeDeletedComponentMapping.h>
#include <Modeling/copyNonGeoProperties.h>
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
#include <Modeling/subdivisionSteps.h>
#include <Modeling/triangulate.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Validators.h>
#include <TessaraGeometryVolume/VolumeBuilder.h>
#include <TessaraMathSupport/Loggers.h>

#include <nlohmann/json.hpp>

#include <bit>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <span>

namespace {

using namespace Tessara::Geometry;
using namespace Tessara::GeometryAlgorithms;
using namespace TestSupport;
using Json = nlohmann::ordered_json;
using Tessara::Object;
using Input = Orvan::Ptr<Object>;
using Inputs = Orvan::Array<Input>;
using Positions = Orvan::Array<float3>;
using Indices = Orvan::Array<unsigned int>;

std::filesystem::path folder;
Json cases = Json::array();

// -- Arguments and results

template <class T> Json listOf(Orvan::Array<T> const& values)
{
    Json list = Json::array();
    for (T const& value : values)
        list.push_back(value);
    return list;
}

Json jsonOf(Object const& object)
{
    static int number = 0;
    std::string const name = std::to_string(number++) + ".h5";
    ModelingProgram::writeGeometryFile(object, folder / name);
    return {{"file", name}};
}

Json jsonOf(std::span<float const> values, std::vector<std::size_t> const& shape)
{
    std::vector<unsigned int> bits;
    for (float const value : values)
        bits.push_back(std::bit_cast<unsigned int>(value));
    return {{"float32", bits}, {"shape", shape}};
}

Json jsonOf(Positions const& points)
{
    return jsonOf({points.empty() ? nullptr : &points.data->x, 3 * points.size}, {points.size, 3});
}

Json jsonOf(Orvan::Array<float> const& values)
{
    return jsonOf({values.data, values.size}, {values.size});
}

Json jsonOf(Indices const& values)
{
    return {{"uint32", listOf(values)}, {"shape", {values.size}}};
}

Json jsonOf(Orvan::Array<bool> const& values)
{
    return {{"bool", listOf(values)}, {"shape", {values.size}}};
}

void add(char const* function, Json arguments, Json options, Json result)
{
    cases.push_back({{"function", function}, {"arguments", std::move(arguments)}, {"options", std::move(options)},
        {"result", std::move(result)}});
}

void addMembers(char const* function, Json arguments, Json options, Json members)
{
    cases.push_back({{"function", function}, {"arguments", std::move(arguments)}, {"options", std::move(options)},
        {"members", std::move(members)}});
}

/// A call of a function that edits a copy of the object; `edit` returns false if it refuses.
template <class Edit> void addEdit(char const* function, Input const& object, Json more, Json options, Edit const& edit)
{
    auto const result = Orvan::MutablePtr<Object>::make(*object); // what it shares, a file shares too
    Json arguments = {jsonOf(*object)};
    arguments.insert(arguments.end(), more.begin(), more.end());
    bool const isDone = edit(*result);
    add(function, std::move(arguments), std::move(options), isDone ? jsonOf(*result) : Json());
}

// -- Random objects

void setRandomModes(Random& random, Object& object)
{
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = object.keys();
    for (Orvan::String const& key : *keys) {
        auto const value = object.getProperty(key);
        auto const* const property = value.get<Orvan::Ptr<Object>>();
        if (property && *property && (*property)->hasProperty(sInterp) && random.below(2) == 0)
            replaceIn(key, sInterp, Common::DataInterpolationMode::None, object);
    }
}

void addNonGeoProperties(Random& random, Object& object)
{
    Object inner;
    inner.setProperty("text", Orvan::String("inside"));
    inner.setProperty("nothing", Tessara::PropertyValue());
    Tessara::PropertyValue const values[] = {1.5f + float(random.below(9)), Orvan::String("text"), random.below(99),
        Orvan::makePtr<Object>(inner), Orvan::makePtr<Orvan::Array<Orvan::String>>(2U),
        Orvan::Ptr<Orvan::Array<float>>(), Common::DataInterpolationMode::Linear, Common::GeometryType::Strands,
        Tessara::Math::double4x4{}};
    for (std::size_t i = 0; i != std::size(values); ++i)
        if (random.below(3) != 0)
            object.setProperty(("other" + std::to_string(i)).c_str(), Tessara::PropertyValue(values[i]));
}

/// Adds properties of all types to all components and to one of its own, ranges, and keys that are no geometry.
Input decorated(Orvan::MutablePtr<Object> object, Random& random)
{
    if (object->hasProperty(sFaceComp) || object->hasProperty(sStrandComp)) // point clouds have no other components
        addComponent("holes", 3, *object);
    for (char const* const component : {sPointComp, sFaceVertexComp, sFaceComp, sStrandComp, "holes"})
        if (object->hasProperty(component)) {
            addAllTypes(component, random, *object, true);
            addRandomProperties(component, random, *object);
        }
    setRandomModes(random, *object);
    addNonGeoProperties(random, *object);
    return object;
}

Input randomPolygons(Random& random)
{
    return decorated(PolygonMesh::soup(9, 6, 3, 6, random).build(), random);
}

Input randomTriangles(unsigned int seed, Random& random)
{
    auto builder = MeshBuilder::torus(5 + seed % 3, 4).withNoise(0.05f, seed);
    return decorated(std::move(builder).withNeedles(4).shuffled(seed).build(), random);
}

Input randomCloud(Random& random)
{
    return decorated(makePointCloud(randomPositions(2 + random.below(6), random)), random);
}

Input randomStrands(Random& random)
{
    return decorated(makeStrands(randomPositions(6, random), {0, 2, 2 + random.below(5), 6}), random);
}

Orvan::Array<bool> randomMask(std::size_t count, Random& random)
{
    Orvan::Array<bool> mask(count);
    for (bool& isMarked : mask)
        isMarked = random.below(3) == 0;
    return mask;
}

// -- The operations

void addEdits(Random& random)
{
    Input const cloud = randomCloud(random), mesh = randomPolygons(random);
    unsigned int const count = getElementCount(*cloud, sPointComp);
    Positions const added = randomPositions(random.below(4), random);
    for (char const* const tag : {"isNew", "sPointComp1", ""})
        addEdit("add_points_to_point_cloud", cloud, {jsonOf(added)}, {{"tag", tag}},
            [&](Object& o) { return addPointsToPointCloud(added, tag, o, nullptr); });
    Indices indices;
    for (unsigned int i = random.below(5); i != 0; --i)
        indices.append(random.below(count));
    addEdit("delete_points_in_point_cloud", cloud, {listOf(indices)}, Json::object(),
        [&](Object& o) { return deletePointsInPointCloud(indices, o, nullptr); });
    auto const faces = randomMask(getElementCount(*mesh, sFaceComp), random);
    addEdit("delete_faces", mesh, {jsonOf(faces)}, Json::object(), [&](Object& o) { return deleteFaces(faces, o); });
    auto const points = randomMask(count, random), holes = randomMask(3, random);
    auto const deleteMarked = [](Orvan::Array<bool> const& marked, char const* component) {
        return [&marked, component](
                   Object& o) { return deleteComponents(computeDeletedComponentMapping(marked), component, o); };
    };
    addEdit("delete_components", cloud, {"points", jsonOf(points)}, Json::object(), deleteMarked(points, sPointComp));
    addEdit("delete_components", mesh, {"holes", jsonOf(holes)}, Json::object(), deleteMarked(holes, "holes"));
    add("compute_deleted_component_mapping", {jsonOf(points)}, Json::object(),
        jsonOf(computeDeletedComponentMapping(points)));
    Inputs const inputs{randomCloud(random), randomStrands(random), mesh};
    addEdit("copy_non_geo_properties", cloud, {{jsonOf(*inputs[0]), jsonOf(*inputs[1]), jsonOf(*inputs[2])}},
        Json::object(), [&](Object& o) {
            copyNonGeoProperties(inputs, o);
            return true;
        });
    Json sentences = Json::array();
    for (Orvan::String const& sentence : reportProperties(*mesh))
        sentences.push_back(sentence.c_str());
    add("validate", {jsonOf(*mesh)}, Json::object(), sentences);
}

template <class Merge, class Make> void addMerge(char const* function, Merge const& merge, Make const& makeInput)
{
    Inputs inputs;
    Json files = Json::array();
    for (int i = 0; i != 3; ++i) {
        inputs.append(makeInput());
        files.push_back(jsonOf(*inputs[static_cast<std::uint64_t>(i)]));
    }
    auto const result = Tessara::createObject();
    bool const isDone = merge(inputs, *result, nullptr);
    for (char const* const name : {function, "merge"})
        add(name, {files}, Json::object(), isDone ? jsonOf(*result) : Json());
}

void addMerges(Random& random)
{
    addMerge("merge_meshes", mergeMeshes, [&] { return randomPolygons(random); });
    addMerge("merge_point_clouds", mergePointClouds, [&] { return randomCloud(random); });
    addMerge("merge_strands", mergeStrands, [&] { return randomStrands(random); });
}

void addSurfaces(unsigned int seed, Random& random)
{
    Input const polygons = randomPolygons(random), closed = randomTriangles(seed, random);
    for (char const* const channels : {"*", "* ^sFaceComp*", "sFace*float* -*2"})
        addEdit("triangulate", polygons, Json::array(), {{"channels", channels}}, [&](Object& o) {
            Geometry::Mesh::triangulate(channels, o);
            ModelingProgram::dropOutdatedProperties(o); // of types whose values triangulation does not copy
            return true;
        });
    addEdit("subdivide", closed, {0.25}, Json::object(), [](Object& o) { return Geometry::Mesh::subdivide(0.25f, o); });
    addEdit("remove_slivers", closed, {0.25}, Json::object(), [](Object& o) {
        ModelingProgram::dropOtherProperties(o); // the operation renumbers elements of the others only
        return Geometry::Mesh::removeSlivers(0.25f, o);
    });
    auto const positions = dataOf<float3>(*closed, sPointPosition);
    auto const corners = dataOf<unsigned int>(*closed, sFaceVertex),
               offsets = dataOf<unsigned int>(*closed, sFaceOffset);
    auto const pointCount = static_cast<unsigned int>(positions->size), faceCount = getElementCount(*closed, sFaceComp);
    Orvan::Array<float> weights(pointCount);
    for (float& weight : weights)
        weight = random.coordinate() + 0.5f;
    addEdit("smooth", closed, {1.75}, {{"weights", jsonOf(weights)}}, [&](Object& o) {
        Positions moved = *positions;
        Geometry::Mesh::smooth(1.75f, pointCount, faceCount, *corners, *offsets, &weights, moved, CoreGL::NOPLogger());
        replaceIn(sPointPosition, sData, Orvan::makePtr<Positions>(moved), o);
        return true;
    });
    Orvan::Array<bool> marks(faceCount);
    Geometry::Mesh::Internal::markForSubdivision(0.25f, faceCount, *positions, *corners, *offsets, marks);
    add("large_faces", {jsonOf(*closed), 0.25}, Json::object(), jsonOf(marks));
}

template <class Traits> void addVolume(int tileSide, Input const& mesh, Random& random)
{
    using namespace TSR::TileTree3D;
    constexpr int kFirst = -12, kEnd = 13, kSide = kEnd - kFirst;
    Field field = Field::of(kFirst, kEnd, [&](int, int, int) { return 0.75f + 0.25f * random.coordinate(); });
    auto const volume = buildVolume<Traits>({.background = 1, .depth = Traits::kUnitDepth, .block = field.block()});
    LinearSampler<Traits> sampler(
        volume.container, volume.channel, volume.topology, {.scale = 8, .background = volume.background}, nullptr);
    std::vector<float> values; // z fastest
    for (int i = kFirst; i != kEnd; ++i)
        for (int j = kFirst; j != kEnd; ++j)
            for (int k = kFirst; k != kEnd; ++k)
                values.push_back(field(i, j, k));
    Json const array = jsonOf(values, {kSide, kSide, kSide}), origin = {kFirst / 8.0, kFirst / 8.0, kFirst / 8.0};
    Json const options = {{"origin", origin}, {"tile_side", tileSide}};
    Positions points = randomPositions(50, random);
    points.append(float3{9, 9, 9});
    Orvan::Array<float> sampled(points.size);
    sampler.sampleAll(points.data, points.size, Traits::kUnitDepth, kWorldSpace, sampled.data);
    addMembers(
        "Guide.from_array", {array, 0.125}, options, {{"sample", {jsonOf(points)}, Json::object(), jsonOf(sampled)}});
    Json const guide = {{"function", "Guide.from_array"}, {"arguments", {array, 0.125}}, {"options", options}};
    addEdit("subdivide_by_volume", mesh, {guide, 0.375}, Json::object(),
        [&](Object& o) { return Geometry::Mesh::subdivide(sampler, o, 0.375f); });
}

void addHalfEdges(Object const& mesh)
{
    unsigned int const points = getElementCount(mesh, sPointComp);
    Geometry::Mesh::HalfEdgeDataStructure const edges(points, getElementCount(mesh, sFaceComp),
        *dataOf<unsigned int>(mesh, sFaceVertex), *dataOf<unsigned int>(mesh, sFaceOffset));
    Json const none = Json::object();
    Json members = {{"__len__", Json::array(), none, edges.size()}};
    for (unsigned int point = 0; point != points; ++point) {
        Indices neighbors;
        for (auto const& [other, edge] : edges.neighbors(point)) {
            neighbors.append(other);
            members.push_back({"find", {other, point}, none, {{"tuple", {edge.face, edge.corner}}}});
        }
        members.push_back({"valence", {point}, none, edges.valence(point)});
        members.push_back({"neighbors", {point}, none, jsonOf(neighbors)});
    }
    addMembers("HalfEdges", {jsonOf(mesh)}, Json::object(), members);
}

void addTemplate(bool strict, Random& random)
{
    using Tessara::Modeling::StitchTemplate;
    unsigned int const corners = 3 + random.below(4);
    PolygonMesh polygon, other;
    std::vector<float3> ring, place, normals;
    for (unsigned int i = 0; i != corners; ++i) {
        float const angle = 6.2831853f * (float(i) + 0.3f * random.coordinate()) / float(corners);
        ring.push_back({std::cos(angle), std::sin(angle), 0});
        place.push_back({2 * std::cos(angle), 2 * std::sin(angle), random.coordinate()});
        normals.push_back(random.point());
    }
    polygon.addPolygon(ring);
    auto const onEdge = [&](unsigned int edge) {
        float3 const &a = ring[edge % corners], &b = ring[(edge + 1) % corners];
        return float3{(a.x + b.x) / 2, (a.y + b.y) / 2, 0};
    };
    Positions positions;
    Indices offsets{0};
    for (unsigned int strand = 0; strand != corners; ++strand) {
        positions.append(onEdge(strand));
        positions.append(random.point(0.2f));
        if (strict || random.below(3) != 0)
            positions.append(onEdge(strand + 1));
        offsets.append(static_cast<unsigned int>(positions.size));
    }
    auto const mesh = polygon.build(), strands = makeStrands(positions, offsets);
    StitchTemplate const made(*mesh, *strands, strict);
    Positions const target(place), directions(normals);
    Positions laid[2];
    std::vector<float> weights;
    Indices found{0};
    Json ends = Json::array();
    for (auto const& strand : made.getStrands())
        for (Orvan::Array<float> const& point : strand.controlPoints) {
            weights.insert(weights.end(), point.begin(), point.end());
            laid[0].append(float3{});
            laid[1].append(float3{});
            made.findControlPointPos(target, point, 1.5f, true, laid[0][laid[0].size - 1]);
            made.findControlPointPos(target, point, 1.5f, directions, false, laid[1][laid[1].size - 1]);
            if (&point == &strand.controlPoints[strand.controlPoints.size - 1])
                found.append(static_cast<unsigned int>(laid[0].size));
        }
    for (auto const& edge : made.getEdgeEndpoints()) {
        ends.push_back(Json::array());
        for (auto const& [strand, end] : edge)
            ends.back().push_back({{"tuple", {strand, end}}});
    }
    Json const none = Json::object();
    addMembers("StitchTemplate", {jsonOf(*mesh), jsonOf(*strands)}, {{"strict", strict}},
        {{"corner_count", nullptr, none, made.getPolySize()}, {"tolerance", nullptr, none, made.getTol()},
            {"weights", nullptr, none, jsonOf(weights, {laid[0].size, corners + 1})},
            {"strand_offsets", nullptr, none, jsonOf(found)}, {"edge_ends", nullptr, none, ends},
            {"lay", {jsonOf(target), 1.5}, {{"flip", true}}, jsonOf(laid[0])},
            {"lay", {jsonOf(target), 1.5}, {{"normals", jsonOf(directions)}}, jsonOf(laid[1])}});
}

}

int main(int argc, char** argv)
try {
    if (argc != 3)
        throw std::invalid_argument("usage: operationReference FOLDER SEED");
    folder = argv[1];
    auto const seed = static_cast<unsigned int>(std::stoul(argv[2]));
    Random random(seed);
    addEdits(random);
    addMerges(random);
    addSurfaces(seed, random);
    addVolume<TSR::TileTree3D::Traits2>(4, randomTriangles(seed, random), random);
    addVolume<TSR::TileTree3D::Traits5>(5, randomTriangles(seed, random), random);
    addHalfEdges(*randomPolygons(random));
    addTemplate(true, random);
    addTemplate(false, random);
    std::ofstream(folder / "cases.json") << cases;
    return 0;
} catch (std::exception const& exception) {
    std::cerr << exception.what() << '\n';
    return 1;
}
