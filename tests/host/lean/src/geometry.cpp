#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include <initializer_list>
#include <string>

namespace Tessara::Geometry {

char const *const sPointComp = "points", *const sFaceComp = "faces", *const sFaceVertexComp = "corners",
                  *const sStrandComp = "strands of the set";
char const *const sPointPosition = "position of each point in space", *const sFaceVertex = "point of each corner",
                  *const sFaceOffset = "first corner of each face", *const sStrandOffset = "first point of each strand";
char const *const sData = "data", *const sTarget = "target", *const sDefault = "default", *const sInterp = "interp",
                  *const sDependsOn = "depends on", *const sIndices = "indices";
char const *const sGenericDataGeoProp = "any data", *const sNullString = "(none)";

unsigned int const kInvalidIndex = 0xFFFFFFFE, kDeletedElement = 0xFFFFFFFF;

struct Internal::Access {
    static Orvan::MutablePtr<Object> makeComponent()
    {
        Orvan::MutablePtr<Object> component = createObject();
        component->isComponent_ = true;
        return component;
    }

    static Object const* componentIn(Object const& object, Orvan::String const& name)
    {
        auto const found = object.values_.find(name.c_str());
        auto const* const held = found == object.values_.end() ? nullptr : found->second.get<Orvan::Ptr<Object>>();
        return held && *held && (*held)->isComponent_ ? held->get() : nullptr;
    }

    static unsigned int countOf(Object const& component) { return component.elementCount_; }

    /// Takes the component out of the object, so that it is copied only if another object has it too.
    static void setCount(Orvan::String const& name, unsigned int count, Object& object)
    {
        PropertyValue& value = object.values_.find(name.c_str())->second;
        Orvan::Ptr<Object> shared = *value.get<Orvan::Ptr<Object>>();
        value = Orvan::Ptr<Object>();
        Orvan::MutablePtr<Object> component;
        try {
            component = makeMutable(std::move(shared));
        } catch (...) {
            value = shared;
            throw;
        }
        component->elementCount_ = count;
        value = Orvan::Ptr<Object>(std::move(component));
    }
};

namespace {

    using Internal::Access;

    template <class T> T valueOr(PropertyValue const& value, T const& otherwise)
    {
        T const* const held = value.get<T>();
        return held ? *held : otherwise;
    }

    Orvan::Ptr<Object> objectAt(Object const& object, Orvan::String const& name)
    {
        return valueOr(object.getProperty(name), Orvan::Ptr<Object>());
    }

    Orvan::Ptr<Object> prototypeOf(std::initializer_list<char const*> requiredKeys)
    {
        Orvan::MutablePtr<Object> prototype = createObject();
        for (char const* const key : requiredKeys)
            prototype->setProperty(key, PropertyValue());
        return prototype;
    }

    template <class T> void addData(char const* name, char const* target, Orvan::Array<T> values, Object& object)
    {
        Orvan::MutablePtr<Object> data = createObject();
        data->setProperty(sData, Orvan::makePtr<Orvan::Array<T>>(std::move(values)));
        data->setProperty(sTarget, Orvan::String(target));
        data->setProperty(sDefault, T{});
        data->setProperty(sInterp, static_cast<Common::DataInterpolationMode>(1));
        data->setProperty(sDependsOn, Orvan::makePtr<Orvan::Array<Orvan::String>>());
        object.setProperty(name, Orvan::Ptr<Object>(std::move(data)));
    }

    void addComponents(std::initializer_list<char const*> names, Object& object)
    {
        for (char const* const name : names)
            object.setProperty(name, Orvan::Ptr<Object>(Access::makeComponent()));
    }

    template <class Select> auto selected(Object const& object, Select const& select)
    {
        Orvan::Array<Orvan::String> names;
        Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = object.keys();
        for (Orvan::String const& key : *keys)
            if (Orvan::Ptr<Object> const property = objectAt(object, key); property && select(*property))
                names.append(key);
        return names;
    }

    Orvan::Ptr<Object> propertyOfKind(Object const& object, Orvan::String const& name, Orvan::Ptr<Object> const& kind)
    {
        Orvan::Ptr<Object> property = objectAt(object, name);
        return property && Object::isA(*property, *kind) ? property : nullptr;
    }

    template <class T> Orvan::Ptr<Orvan::Array<T>> arrayOf(Object const& object, char const* name)
    {
        Orvan::Ptr<Object> const property = getDataGeoProperty(object, name);
        return property ? valueOr(property->getProperty(sData), Orvan::Ptr<Orvan::Array<T>>()) : nullptr;
    }

    /// Whether the offsets are those of all elements of the component, and end at `total`.
    bool hasOffsets(Object const& object, char const* name, char const* component, unsigned int total)
    {
        auto const offsets = arrayOf<unsigned int>(object, name);
        return offsets && offsets->size == std::uint64_t{getElementCount(object, component)} + 1
            && (*offsets)[offsets->size - 1] == total;
    }

    bool hasPositions(Object const& object)
    {
        auto const positions = arrayOf<Math::float3>(object, sPointPosition);
        return positions && positions->size == getElementCount(object, sPointComp);
    }

}

unsigned int getElementCount(Object const& object, Orvan::String const& component)
{
    Object const* const found = Access::componentIn(object, component);
    return found ? Access::countOf(*found) : 0;
}

bool setElementCount(Orvan::String const& component, unsigned int count, Object& object)
{
    if (!Access::componentIn(object, component))
        return false;
    Access::setCount(component, count, object);
    return true;
}

Orvan::Ptr<Object> getMeshPrototype()
{
    return prototypeOf({sPointComp, sFaceComp, sFaceVertexComp, sPointPosition, sFaceVertex, sFaceOffset});
}

// Accepts meshes and strand sets too.
Orvan::Ptr<Object> getPointCloudPrototype()
{
    return prototypeOf({sPointComp, sPointPosition});
}

Orvan::Ptr<Object> getComponentGeoPropPrototype()
{
    return Access::makeComponent();
}

Orvan::Ptr<Object> getRangeGeoPropPrototype()
{
    return prototypeOf({sIndices, sTarget});
}

Orvan::Ptr<Object> getDataGeoPropPrototype(Orvan::String const& name)
{
    return name == sGenericDataGeoProp ? prototypeOf({sData, sTarget}) : nullptr;
}

void populateMesh(Object& object)
{
    addComponents({sPointComp, sFaceVertexComp, sFaceComp}, object);
    addData<Math::float3>(sPointPosition, sPointComp, {}, object);
    addData<unsigned int>(sFaceVertex, sFaceVertexComp, {}, object);
    addData(sFaceOffset, sFaceComp, Orvan::Array<unsigned int>(1), object);
}

void populatePointCloud(Object& object)
{
    addComponents({sPointComp}, object);
    addData<Math::float3>(sPointPosition, sPointComp, {}, object);
}

void populateStrand(Object& object)
{
    addComponents({sPointComp, sStrandComp}, object);
    addData<Math::float3>(sPointPosition, sPointComp, {}, object);
    addData(sStrandOffset, sStrandComp, Orvan::Array<unsigned int>(1), object);
}

void populateTag(Orvan::String const& target, Orvan::Ptr<Orvan::Array<bool>> const& values, Object& tag)
{
    tag.setProperty(sData, Orvan::Ptr<Orvan::Array<bool>>(values));
    tag.setProperty(sTarget, Orvan::String(target));
    tag.setProperty(sDefault, false);
}

bool populateRangeGeoProperty(
    Orvan::Ptr<Orvan::Array<unsigned int>> indices, Orvan::String const& target, Object& range)
{
    if (!indices)
        return false;
    range.setProperty(sIndices, std::move(indices));
    range.setProperty(sTarget, Orvan::String(target));
    return true;
}

Orvan::Array<Orvan::String> getGeoPropNamesByPrototype(Object const& object, Object const& prototype)
{
    return selected(object, [&](Object const& property) { return Object::isA(property, prototype); });
}

Orvan::Array<Orvan::Ptr<Object>> getGeoPropsByPrototype(Object const& object, Object const& prototype)
{
    Orvan::Array<Orvan::Ptr<Object>> properties;
    for (Orvan::String const& name : getGeoPropNamesByPrototype(object, prototype))
        properties.append(objectAt(object, name));
    return properties;
}

Orvan::Array<Orvan::String> getGeoPropNamesByTarget(Object const& object, Orvan::String const& target)
{
    return selected(object, [&](Object const& property) {
        PropertyValue const name = property.getProperty(sTarget);
        return name.get<Orvan::String>() && *name.get<Orvan::String>() == target;
    });
}

Orvan::String getGeoPropTargetName(Object const& object, Orvan::String const& name)
{
    Orvan::Ptr<Object> const property = objectAt(object, name);
    return property ? valueOr(property->getProperty(sTarget), Orvan::String()) : Orvan::String();
}

Orvan::String getTargetComponent(Object const& object, Orvan::String const& name)
{
    Orvan::String target = getGeoPropTargetName(object, name);
    if (getRangeGeoProperty(object, target))
        target = getGeoPropTargetName(object, target);
    return Access::componentIn(object, target) ? target : Orvan::String();
}

Orvan::Ptr<Object> getDataGeoProperty(Object const& object, Orvan::String const& name)
{
    return propertyOfKind(object, name, getDataGeoPropPrototype(sGenericDataGeoProp));
}

Orvan::Ptr<Object> getRangeGeoProperty(Object const& object, Orvan::String const& name)
{
    return propertyOfKind(object, name, getRangeGeoPropPrototype());
}

Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(Object const& range)
{
    return valueOr(range.getProperty(sIndices), Orvan::Ptr<Orvan::Array<unsigned int>>());
}

Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(Object const& object, Orvan::String const& name)
{
    Orvan::Ptr<Object> const range = getRangeGeoProperty(object, name);
    return range ? getRangeGeoPropIndices(*range) : nullptr;
}

bool setRangeGeoPropIndices(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>> indices, Object& object)
{
    Orvan::Ptr<Object> range = getRangeGeoProperty(object, name);
    if (!range)
        return false;
    Orvan::MutablePtr<Object> changed = makeMutable(std::move(range));
    changed->setProperty(sIndices, std::move(indices));
    object.setProperty(name, Orvan::Ptr<Object>(std::move(changed)));
    return true;
}

GeoValidator::Status validateMesh(Object const& mesh)
{
    unsigned int const cornerCount = getElementCount(mesh, sFaceVertexComp);
    auto const corners = arrayOf<unsigned int>(mesh, sFaceVertex);
    return GeoValidator::Status(Object::isA(mesh, *getMeshPrototype()) && hasPositions(mesh) && corners
        && corners->size == cornerCount && hasOffsets(mesh, sFaceOffset, sFaceComp, cornerCount));
}

GeoValidator::Status PointCloudValidator::validate(Object const& pointCloud)
{
    return GeoValidator::Status(hasPositions(pointCloud));
}

GeoValidator::Status StrandValidator::validate(Object const& strands)
{
    return GeoValidator::Status(
        hasPositions(strands) && hasOffsets(strands, sStrandOffset, sStrandComp, getElementCount(strands, sPointComp)));
}

}
