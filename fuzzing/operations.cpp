#include "Bags.h"

#include "geometry/MeshTopology.h"
#include "repair/repairMesh.h"

#include <Modeling/Modeling.h>
#include <OrvanCppOpSDK/Job.h>
#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <cstring>
#include <functional>
#include <new>
#include <stdexcept>

// Every operation, and the repair of meshes, on objects that the validators accept. The result is valid again where the operation promises it, the
// same whether others share the object or not, and the others see no change.

namespace Fuzzing {

namespace {

    using namespace Tessara::GeometryAlgorithms;
    using namespace TSR::TileTree3D;
    using Indices = Orvan::Array<unsigned int>;
    using Inputs = Orvan::Array<Orvan::Ptr<Object>>;

    /// What holds after an operation.
    enum class Outcome { Anything, Valid, Unchanged };
    using Operation = std::function<Outcome(Object&)>;

    /// Cancels the job when a refinement has made too many points.
    class LimitedObject final : public Object {
    public:
        explicit LimitedObject(Object const& object)
            : Object(object)
        {
        }

        void setProperty(Orvan::String const& key, Tessara::PropertyValue&& value) override
        {
            Object::setProperty(key, std::move(value));
            auto const values = key == kCarried ? dataOf<float>(*this, key) : nullptr;
            if (values && values->size > kMostPoints)
                Orvan::setJobCancelled(true);
        }

        static constexpr char const* kCarried = "carried";
        static constexpr std::uint64_t kMostPoints = 3000;
    };

    Outcome refine(Object& mesh, std::function<bool(Object&)> const& subdivide)
    {
        LimitedObject limited(mesh);
        Orvan::Array<float> carried(getElementCount(mesh, sPointComp));
        addDataProperty<float>(LimitedObject::kCarried, sPointComp, std::move(carried), limited);
        try {
            subdivide(limited);
        } catch (std::runtime_error const&) {
            require(Orvan::isJobCancelled(), "only a cancelled job throws");
            require(fingerprint(limited) == fingerprint(mesh), "a cancelled job leaves the mesh as it was");
        }
        Orvan::setJobCancelled(false);
        mesh = limited;
        return Outcome::Valid;
    }

    template <class Traits> Volume<Traits> anyVolume(Bytes& bytes)
    {
        std::vector<float> values(64);
        for (float& value : values)
            value = anyNumber(bytes);
        std::vector<Voxel> voxels(bytes.ConsumeIntegralInRange<std::size_t>(0, 4));
        for (auto& [i, j, k, value] : voxels) {
            for (int* const index : {&i, &j, &k})
                *index = bytes.ConsumeBool() ? bytes.ConsumeIntegral<int>() : bytes.ConsumeIntegral<signed char>();
            value = anyNumber(bytes);
        }
        VoxelList const list{bytes.ConsumeIntegralInRange<int>(Traits::kUnitDepth - 2, Traits::kDeepest), voxels};
        int const first = bytes.ConsumeIntegralInRange<int>(-9, 9);
        VolumeSource source{.background = anyNumber(bytes),
            .offsetType = bytes.ConsumeIntegralInRange<unsigned int>(0, 7),
            .depth = Traits::kUnitDepth,
            .lists = {&list, 1},
            .block = {{first, first, first}, {4, 4, 4}, values.data()}};
        if (bytes.ConsumeBool())
            source.coarsestDepth = bytes.ConsumeIntegralInRange<int>(0, Traits::kUnitDepth);
        try {
            return buildVolume<Traits>(source);
        } catch (std::invalid_argument const&) { // an index beyond 32 bits
            source.lists = {};
            return buildVolume<Traits>(source);
        }
    }

    LinearSamplerSettings anySettings(Bytes& bytes)
    {
        LinearSamplerSettings settings{.scale = anyNumber(bytes), .voxelOffset = anyPoint(bytes)};
        settings.background = anyNumber(bytes);
        if (bytes.ConsumeBool())
            settings.minDepth = bytes.ConsumeIntegralInRange<int>(-1, 40);
        if (bytes.ConsumeBool())
            settings.maxDepth = bytes.ConsumeIntegralInRange<int>(-1, 40);
        return settings;
    }

    template <class Traits> Operation refinementByVolume(Bytes& bytes)
    {
        auto const volume = std::make_shared<Volume<Traits> const>(anyVolume<Traits>(bytes));
        LinearSamplerSettings const settings = anySettings(bytes);
        bool const withHalos = bytes.ConsumeBool();
        auto const halos =
            withHalos ? std::make_shared<Channel<Traits, float> const>(makeHaloChannel(*volume)) : nullptr;
        float const tolerance = anyNumber(bytes);
        int const depth = bytes.ConsumeIntegralInRange<int>(0, Traits::kDeepest);
        int const space = bytes.ConsumeIntegralInRange<int>(1, 2);
        return [=](Object& mesh) {
            LinearSampler<Traits> const sampler(
                volume->container, volume->channel, volume->topology, settings, halos.get());
            LinearSampler<Traits> one(sampler), many(sampler);
            auto const points = dataOf<float3>(mesh, sPointPosition);
            std::vector<float> values(points->size);
            many.sampleAll(points->data, values.size(), depth, space, values.data());
            for (std::size_t i = 0; i != values.size(); ++i) {
                float const value = one.sample((*points)[i], depth, space);
                require(std::memcmp(&value, &values[i], sizeof(value)) == 0, "sampleAll gives the values of sample");
            }
            return refine(
                mesh, [&](Object& limited) { return Geometry::Mesh::subdivide(sampler, limited, tolerance); });
        };
    }

    Operation refinement(Bytes& bytes)
    {
        switch (bytes.ConsumeIntegralInRange<int>(0, 3)) {
        case 0:
            return refinementByVolume<Traits2>(bytes);
        case 1:
            return refinementByVolume<Traits5>(bytes);
        default:
            float const tolerance = anyNumber(bytes);
            return [=](Object& mesh) {
                return refine(mesh, [=](Object& limited) { return Geometry::Mesh::subdivide(tolerance, limited); });
            };
        }
    }

    Operation smoothing(Bytes& bytes)
    {
        float const amount = std::min(anyNumber(bytes), 4.0f); // each 0.9 is a step
        std::vector<float> factors(bytes.ConsumeIntegralInRange<std::size_t>(0, 3));
        for (float& factor : factors)
            factor = anyNumber(bytes);
        return [=](Object& mesh) {
            auto const corners = dataOf<unsigned int>(mesh, sFaceVertex),
                       offsets = dataOf<unsigned int>(mesh, sFaceOffset);
            Orvan::Array<float3> positions = *dataOf<float3>(mesh, sPointPosition);
            Orvan::Array<float> weights(positions.size);
            for (std::size_t i = 0; i != weights.size && !factors.empty(); ++i)
                weights[i] = factors[i % factors.size()];
            Geometry::Mesh::smooth(amount, static_cast<unsigned int>(positions.size),
                static_cast<unsigned int>(offsets->size - 1), *corners, *offsets, factors.empty() ? nullptr : &weights,
                positions, CoreGL::NOPLogger());
            replaceIn(sPointPosition, sData, Orvan::makePtr<Orvan::Array<float3>>(std::move(positions)), mesh);
            return Outcome::Valid;
        };
    }

    Operation faceDeletion(Bytes& bytes)
    {
        std::vector<bool> const pattern{bytes.ConsumeBool(), bytes.ConsumeBool(), bytes.ConsumeBool()};
        unsigned int const excess = bytes.ConsumeIntegralInRange(0u, 9u);
        return [=](Object& mesh) {
            auto const offsets = dataOf<unsigned int>(mesh, sFaceOffset);
            Orvan::Array<bool> deleted(offsets->size - 1 + (excess == 9 ? 1 : 0));
            for (std::size_t face = 0; face != deleted.size; ++face)
                deleted[face] = pattern[face % pattern.size()];
            bool const haveCorners = std::adjacent_find(offsets->begin(), offsets->end()) == offsets->end();
            return deleteFaces(deleted, mesh) && haveCorners ? Outcome::Valid : Outcome::Anything;
        };
    }

    Operation componentDeletion(char const* component, Kind kind, Bytes& bytes)
    {
        Indices const pattern = numbersBelow(12u, 12, bytes);
        bool const isRemap = bytes.ConsumeBool();
        return [=](Object& object) {
            unsigned int const count = getElementCount(object, component);
            Orvan::Array<bool> deleted(isRemap ? count : 0);
            for (std::size_t i = 0; i != deleted.size && !pattern.empty(); ++i)
                deleted[i] = pattern[i % pattern.size] < 6;
            bool const isDone =
                deleteComponents(isRemap ? computeDeletedComponentMapping(deleted) : pattern, component, object);
            return isDone && isRemap && kind == Kind::PointCloud ? Outcome::Valid : Outcome::Anything;
        };
    }

    /// Merges inputs and the object itself, which becomes the result.
    Operation merging(Kind kind, Bytes& bytes)
    {
        Inputs inputs;
        for (unsigned int left = bytes.ConsumeIntegralInRange(0u, 3u); left != 0; --left)
            inputs.append(bytes.ConsumeBool() ? validBag(kind, bytes) : nullptr);
        return [=](Object& object) {
            Inputs all = inputs;
            all.append(Orvan::makePtr<Object>(object));
            auto const before = deepCopy(*all[all.size - 1]);
            auto const merge = kind == Kind::Mesh ? mergeMeshes
                : kind == Kind::Strands           ? mergeStrands
                                                  : mergePointClouds;
            bool const isDone = merge(all, object, nullptr);
            require(isDone, "valid inputs are merged");
            require(sameContents(*all[all.size - 1], *before), "inputs of a merge stay as they are");
            return Outcome::Valid;
        };
    }

    Operation repair(Bytes& bytes)
    {
        using ModelingProgram::RepairSteps;
        ModelingProgram::RepairOptions options;
        for (auto const step : {&RepairSteps::weld, &RepairSteps::degenerate, &RepairSteps::doubled,
                 &RepairSteps::orient, &RepairSteps::fill, &RepairSteps::split, &RepairSteps::unused})
            options.steps.*step = bytes.ConsumeIntegralInRange(0, 7) != 0;
        float const distance = anyNumber(bytes);
        if (distance > 0 && distance <= 1e30f)
            options.weldDistance = distance;
        if (bytes.ConsumeBool())
            options.mostHoleEdges = bytes.ConsumeIntegralInRange<std::size_t>(0, 9);
        return [=](Object& mesh) {
            repairMesh(options, mesh);
            auto const topology = ModelingProgram::analyzeTopology(ModelingProgram::arraysOf(mesh));
            RepairSteps const& steps = options.steps;
            require(
                !steps.split || !(topology.nonManifoldEdges || topology.nonManifoldPoints), "splitting separates all");
            require(!(steps.split && steps.orient) || !topology.windingConflicts, "the surface is oriented");
            require(!steps.unused || !topology.isolatedPoints, "unused points are removed");
            return Outcome::Valid;
        };
    }

    Operation meshOperation(Bytes& bytes)
    {
        switch (bytes.ConsumeIntegralInRange(0, 8)) {
        case 0: {
            std::string const channels = bytes.ConsumeRandomLengthString(16);
            return [=](Object& mesh) {
                Geometry::Mesh::triangulate(channels.c_str(), mesh);
                return Outcome::Valid;
            };
        }
        case 1:
            return smoothing(bytes);
        case 2: {
            float const ratio = anyNumber(bytes);
            return [=](Object& mesh) {
                require(Geometry::Mesh::removeSlivers(ratio, mesh), "removeSlivers returns true");
                return Outcome::Valid;
            };
        }
        case 3:
            return refinement(bytes);
        case 4:
            return faceDeletion(bytes);
        case 5:
            return merging(Kind::Mesh, bytes);
        case 6:
            return componentDeletion(
                bytes.PickValueInArray({sPointComp, sFaceComp, sFaceVertexComp}), Kind::Mesh, bytes);
        case 7:
            return repair(bytes);
        default:
            return [](Object& mesh) {
                Object other;
                copyNonGeoProperties({Orvan::makePtr<Object>(mesh), nullptr}, other);
                return Outcome::Unchanged;
            };
        }
    }

    Operation cloudOperation(Bytes& bytes)
    {
        switch (bytes.ConsumeIntegralInRange(0, 3)) {
        case 0: {
            Orvan::String const tag = bytes.ConsumeIntegralInRange(0, 9) == 0
                ? bytes.PickValueInArray({sPointPosition, sPointComp})
                : anyName(bytes);
            bool const isOwn = bytes.ConsumeBool();
            Orvan::Array<float3> const points = anyPoints(9, bytes);
            return [=](Object& cloud) {
                bool const isStandard = tag == sPointPosition || tag == sPointComp;
                auto const own = dataOf<float3>(cloud, sPointPosition);
                bool const isDone = addPointsToPointCloud(isOwn ? *own : points, tag, cloud, nullptr);
                require(isDone || isStandard, "points are added to a valid cloud");
                return isStandard ? Outcome::Anything : Outcome::Valid;
            };
        }
        case 1: {
            Indices const narrow = numbersBelow(25u, 9, bytes);
            Orvan::Array<long long> const wide = numbersBelow(25ll, 9, bytes);
            return [=](Object& cloud) {
                bool const isEmpty = getElementCount(cloud, sPointComp) == 0;
                bool const isDone = wide.empty() ? deletePointsInPointCloud(narrow, cloud, nullptr)
                                                 : deletePointsInPointCloud(wide, cloud, nullptr);
                return isDone ? Outcome::Valid : isEmpty ? Outcome::Unchanged : Outcome::Anything;
            };
        }
        case 2:
            return merging(Kind::PointCloud, bytes);
        default:
            return componentDeletion(sPointComp, Kind::PointCloud, bytes);
        }
    }

    Operation strandOperation(Bytes& bytes)
    {
        if (bytes.ConsumeBool())
            return merging(Kind::Strands, bytes);
        return componentDeletion(bytes.PickValueInArray({sPointComp, sStrandComp}), Kind::Strands, bytes);
    }

    void fillTemplate(Bytes& bytes)
    {
        using Tessara::Modeling::LocalStrand;
        auto points = [&] { return Orvan::makePtr<Orvan::Array<float3>>(anyPoints(12, bytes)); };
        auto const polygon = points(), positions = points();
        bool const isFlat = bytes.ConsumeBool();
        auto flat = *polygon;
        for (float3& corner : flat)
            corner.z = 0;
        auto const offsets = Orvan::makePtr<Indices>(numbersBelow(13u, 6, bytes));
        Tessara::Modeling::StitchTemplate const pattern(
            isFlat ? Orvan::makePtr<Orvan::Array<float3>>(flat) : polygon, positions, offsets, bytes.ConsumeBool());
        float const scale = anyNumber(bytes);
        Orvan::Array<float3> const corners = anyPoints(12, bytes), normals = anyPoints(12, bytes);
        for (LocalStrand const& strand : pattern.getStrands()) {
            for (Orvan::Array<float> const& weights : strand.controlPoints) {
                require(weights.size == strand.polySize + 1, "there is a weight for each corner, and the height");
                float3 position;
                pattern.findControlPointPos(corners, weights, scale, normals, bytes.ConsumeBool(), position);
                pattern.findControlPointPos(corners, weights, scale, bytes.ConsumeBool(), position);
            }
        }
    }

    Outcome runWithOther(Holders holders, Operation const& run, Object const& before, Object& object)
    {
        Object const other = held(holders, object);
        Outcome const outcome = run(object);
        require(sameContents(other, held(holders, before)), "other holders see no change");
        return outcome;
    }

    void runOperation(Bytes& bytes)
    {
        Kind const kind = bytes.ConsumeEnum<Kind>();
        auto const holders = static_cast<Holders>(bytes.ConsumeIntegralInRange(1, 3));
        Operation const run = kind == Kind::Mesh ? meshOperation(bytes)
            : kind == Kind::PointCloud           ? cloudOperation(bytes)
                                                 : strandOperation(bytes);
        auto const object = validBag(kind, bytes);
        if (!isValid(*object))
            return; // a property has replaced one of the host's
        auto const before = deepCopy(*object), unshared = deepCopy(*object);
        Outcome const outcome = runWithOther(holders, run, *before, *object);
        require(run(*unshared) == outcome, "sharing makes no difference");
        require(sameContents(*object, *unshared), "sharing makes no difference");
        if (outcome == Outcome::Valid)
            require(isValid(*object), "the result is valid");
        if (outcome == Outcome::Unchanged)
            require(sameContents(*object, *before), "the object is unchanged");
    }

}

}

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size)
{
    Fuzzing::Bytes bytes(data, size);
    if (bytes.ConsumeIntegralInRange(0, 15) == 0)
        Fuzzing::fillTemplate(bytes);
    else
        Fuzzing::runOperation(bytes);
    return 0;
}
