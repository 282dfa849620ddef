#include "Bags.h"

#include <Modeling/Modeling.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include <algorithm>

// Objects in which anything may be wrong: the validators accept exactly those that keep their rules, and the operations
// that check their input refuse the others without reading outside of arrays.

namespace Fuzzing {

namespace {

    using namespace Tessara::GeometryAlgorithms;
    using Indices = Orvan::Array<unsigned int>;
    using Inputs = Orvan::Array<Orvan::Ptr<Object>>;

    bool isComponent(Object const& object, char const* name)
    {
        auto const value = object.getProperty(name);
        auto const* const held = value.get<Orvan::Ptr<Object>>();
        return held && *held && Object::isA(**held, *getComponentGeoPropPrototype());
    }

    template <class T>
    bool hasValues(Object const& object, char const* name, char const* component, std::uint64_t further = 0)
    {
        auto const values = dataOf<T>(object, name);
        return isComponent(object, component) && values && values->size == getElementCount(object, component) + further
            && getGeoPropTargetName(object, name) == component;
    }

    /// The rules that `Validators.h` lists, without those on defaults.
    bool keepsRulesOfMeshes(Object const& object)
    {
        if (!hasValues<float3>(object, sPointPosition, sPointComp)
            || !hasValues<unsigned int>(object, sFaceVertex, sFaceVertexComp)
            || !hasValues<unsigned int>(object, sFaceOffset, sFaceComp, 1))
            return false;
        auto const corners = dataOf<unsigned int>(object, sFaceVertex),
                   offsets = dataOf<unsigned int>(object, sFaceOffset);
        unsigned int const points = getElementCount(object, sPointComp);
        return std::is_sorted(offsets->begin(), offsets->end()) && (*offsets)[0] == 0
            && (*offsets)[offsets->size - 1] == corners->size
            && std::all_of(corners->begin(), corners->end(), [=](unsigned int point) { return point < points; });
    }

    bool keepsRulesOfStrands(Object const& object)
    {
        if (!hasValues<float3>(object, sPointPosition, sPointComp)
            || !hasValues<unsigned int>(object, sStrandOffset, sStrandComp, 1))
            return false;
        auto const offsets = dataOf<unsigned int>(object, sStrandOffset);
        unsigned int const points = getElementCount(object, sPointComp), last = (*offsets)[offsets->size - 1];
        return std::is_sorted(offsets->begin(), offsets->end())
            && (last == points || (last == 0 && offsets->size == 1));
    }

    void checkValidators(Object const& object)
    {
        auto const mesh = validateMesh(object);
        require(!mesh || keepsRulesOfMeshes(object), "a valid mesh keeps the rules");
        auto const cloud = PointCloudValidator().validate(object);
        require(!cloud || hasValues<float3>(object, sPointPosition, sPointComp), "a valid cloud keeps the rules");
        auto const strands = StrandValidator().validate(object);
        require(!strands || keepsRulesOfStrands(object), "a valid strand set keeps the rules");
        for (auto const* const status : {&mesh, &cloud, &strands})
            require(static_cast<bool>(*status) == status->message().empty(), "a failure has a message");
    }

    void lookUpAll(Object const& object)
    {
        reportProperties(object);
        for (auto const& prototype : {getMeshPrototype(), getPointCloudPrototype(), getStrandPrototype()})
            static_cast<void>(Object::isA(object, *prototype));
        static_cast<void>(Object::isA(object, object));
        auto const keys = object.keys();
        for (Orvan::String const& key : *keys) {
            Orvan::String const component = getTargetComponent(object, key);
            require(
                component.empty() || isComponent(object, component.c_str()), "a chain of targets ends at a component");
            getGeoPropNamesByTarget(object, key);
            if (auto const range = getRangeGeoProperty(object, key))
                getRangeGeoPropIndices(*range);
        }
    }

    /// Operations allocate what the counts declare, however short the arrays are.
    bool isSmall(Object const& object)
    {
        constexpr unsigned int kMostElements = 10'000;
        auto const components = getGeoPropNamesByPrototype(object, *getComponentGeoPropPrototype());
        return std::all_of(components.begin(), components.end(),
            [&](Orvan::String const& name) { return getElementCount(object, name) <= kMostElements; });
    }

    /// An operation that checks its input.
    bool edit(Object& object, Bytes& bytes)
    {
        Indices const indices = numbersBelow(20u, 20, bytes);
        switch (bytes.ConsumeIntegralInRange(0, 5)) {
        case 0:
            return addPointsToPointCloud(anyPoints(4, bytes), anyName(bytes), object, nullptr);
        case 1:
            return deletePointsInPointCloud(indices, object, nullptr);
        case 2: {
            Orvan::Array<bool> deleted(indices.size);
            for (std::size_t i = 0; i != deleted.size; ++i)
                deleted[i] = indices[i] % 2 == 0;
            return deleteFaces(deleted, object);
        }
        case 3:
            return deleteComponents(indices, anyName(bytes), object);
        case 4: {
            constexpr char const* kComponents[] = {sPointComp, sFaceComp, sFaceVertexComp, sStrandComp};
            return deleteComponents(indices, bytes.PickValueInArray(kComponents), object);
        }
        default: {
            constexpr decltype(&mergeMeshes) kMerges[] = {mergeMeshes, mergePointClouds, mergeStrands};
            Object copied;
            Inputs const inputs{Orvan::Ptr<Object>(anyBag(bytes)), nullptr, Orvan::makePtr<Object>(object)};
            copyNonGeoProperties(inputs, copied);
            return bytes.PickValueInArray(kMerges)(inputs, object, nullptr);
        }
        }
    }

}

}

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size)
{
    using namespace Fuzzing;
    Bytes bytes(data, size);
    auto const object = anyBag(bytes);
    checkValidators(*object);
    lookUpAll(*object);
    if (!isSmall(*object))
        return 0;
    auto const before = deepCopy(*object);
    Object const other = *object;
    edit(*object, bytes);
    require(sameContents(other, *before), "other holders see no change");
    checkValidators(*object);
    return 0;
}
