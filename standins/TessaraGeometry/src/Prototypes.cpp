#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

#include "GeoProps.h"

#include <initializer_list>

namespace Tessara::Geometry {

namespace {

    void exclude(std::initializer_list<Orvan::String> keys, Object& prototype)
    {
        prototype.setProperty(Object::kExcludedKeys, Orvan::makePtr<Orvan::Array<Orvan::String>>(keys));
    }

    Orvan::Ptr<Object> makeComponentPrototype()
    {
        Orvan::MutablePtr<Object> prototype = createObject();
        prototype->setProperty(Internal::sElementCount, 0u);
        exclude({sData, sIndices}, *prototype);
        return prototype;
    }

    Orvan::Ptr<Object> makeRangePrototype()
    {
        Orvan::MutablePtr<Object> prototype = createObject();
        prototype->setProperty(sIndices, PropertyValue());
        prototype->setProperty(sTarget, Orvan::String());
        exclude({sData, Internal::sElementCount}, *prototype);
        return prototype;
    }

    Orvan::Ptr<Object> makeDataPrototype()
    {
        Orvan::MutablePtr<Object> prototype = createObject();
        prototype->setProperty(sData, PropertyValue());
        prototype->setProperty(sTarget, Orvan::String());
        exclude({sIndices, Internal::sElementCount}, *prototype);
        return prototype;
    }

    Orvan::Ptr<Object> const& sharedComponentPrototype()
    {
        static Orvan::Ptr<Object> const prototype = makeComponentPrototype();
        return prototype;
    }

    Orvan::Ptr<Object> const& sharedRangePrototype()
    {
        static Orvan::Ptr<Object> const prototype = makeRangePrototype();
        return prototype;
    }

    Orvan::Ptr<Object> const& sharedDataPrototype()
    {
        static Orvan::Ptr<Object> const prototype = makeDataPrototype();
        return prototype;
    }

    Orvan::Ptr<Object> makeGeometryPrototype(std::initializer_list<char const*> components,
        std::initializer_list<char const*> data, std::initializer_list<char const*> excludedComponents)
    {
        Orvan::MutablePtr<Object> prototype = createObject();
        for (char const* const name : components)
            prototype->setProperty(name, getComponentGeoPropPrototype());
        for (char const* const name : data)
            prototype->setProperty(name, getDataGeoPropPrototype(sGenericDataGeoProp));
        Orvan::MutablePtr<Object> excluded = createObject();
        for (char const* const name : excludedComponents)
            excluded->setProperty(name, getComponentGeoPropPrototype());
        if (excludedComponents.size() != 0)
            prototype->setProperty(Object::kExcludedKeys, Orvan::Ptr<Object>(std::move(excluded)));
        return prototype;
    }

}

Orvan::Ptr<Object> getMeshPrototype()
{
    static Orvan::Ptr<Object> const prototype =
        makeGeometryPrototype({sPointComp, sFaceComp, sFaceVertexComp}, {sPointPosition, sFaceVertex, sFaceOffset}, {});
    return prototype;
}

Orvan::Ptr<Object> getPointCloudPrototype()
{
    static Orvan::Ptr<Object> const prototype =
        makeGeometryPrototype({sPointComp}, {sPointPosition}, {sFaceComp, sFaceVertexComp, sStrandComp});
    return prototype;
}

Orvan::Ptr<Object> getStrandPrototype()
{
    static Orvan::Ptr<Object> const prototype =
        makeGeometryPrototype({sPointComp, sStrandComp}, {sPointPosition, sStrandOffset}, {});
    return prototype;
}

Orvan::Ptr<Object> getComponentGeoPropPrototype()
{
    return sharedComponentPrototype();
}

Orvan::Ptr<Object> getRangeGeoPropPrototype()
{
    return sharedRangePrototype();
}

Orvan::Ptr<Object> getDataGeoPropPrototype(Orvan::String const& name)
{
    return name == sGenericDataGeoProp ? sharedDataPrototype() : nullptr;
}

Object const& Internal::dataPrototype()
{
    return *sharedDataPrototype();
}

Object const& Internal::rangePrototype()
{
    return *sharedRangePrototype();
}

Object const& Internal::componentPrototype()
{
    return *sharedComponentPrototype();
}

}
