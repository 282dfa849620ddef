#include "PropertyNames.h"

#include "Texts.h"

#include "files/GeometryBuilder.h"

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>

#include <algorithm>

namespace ModelingPython {

using namespace Tessara::Geometry;
using Tessara::Object;

namespace {

    constexpr char const* kStandardComponents[] = {sPointComp, sFaceComp, sFaceVertexComp, sStrandComp};

    /// Whether the key holds a data property of the target, other than the geometry itself.
    bool isDataOf(Object const& object, Orvan::String const& key, Orvan::String const& target)
    {
        return !ModelingProgram::isReservedName(key.view()) && getGeoPropTargetName(object, key) == target
            && getDataGeoProperty(object, key);
    }

}

Orvan::String targetKey(std::string_view name)
{
    for (char const* const component : kStandardComponents)
        if (ModelingProgram::elementNames(component) == name)
            return component;
    return Orvan::String(name);
}

std::string targetName(Orvan::String const& key)
{
    return ModelingProgram::elementNames(key);
}

std::vector<Orvan::String> dataKeys(Object const& object, Orvan::String const& target)
{
    std::vector<Orvan::String> keys;
    for (Orvan::String const& key : getGeoPropNamesByTarget(object, target))
        if (isDataOf(object, key, target))
            keys.push_back(key);
    return keys;
}

std::string propertyName(Object const& object, Orvan::String const& key, Orvan::String const& target)
{
    std::string_view const prefix = ModelingProgram::namePrefix(target);
    if (prefix.empty() || !key.view().starts_with(prefix))
        return std::string(key.view());
    std::string_view const plain = key.view().substr(prefix.size());
    Orvan::String const plainKey(plain);
    bool const isTaken =
        ModelingProgram::isReservedName(plain) || (object.hasProperty(plainKey) && !isDataOf(object, plainKey, target));
    return std::string(isTaken ? plain : key.view());
}

std::optional<Orvan::String> findDataKey(Object const& object, std::string_view name, Orvan::String const& target)
{
    Orvan::String const plain(name), prefixed(std::string(ModelingProgram::namePrefix(target)) + std::string(name));
    for (Orvan::String const& key : {plain, prefixed})
        if (isDataOf(object, key, target) && propertyName(object, key, target) == name)
            return key;
    return std::nullopt;
}

Orvan::String newKey(Object const& object, std::string const& name, Orvan::String const& target)
{
    if (name.empty() || name.find('\0') != std::string::npos)
        raiseValueError("a property cannot have the name " + toText(py::repr(toPython(name)))
            + ": names are not empty and have no null characters");
    auto const isTaken = [&](std::string const& key) {
        return ModelingProgram::isReservedName(key) || object.hasProperty(Orvan::String(key));
    };
    if (!isTaken(name))
        return Orvan::String(name);
    std::string const prefixed = std::string(ModelingProgram::namePrefix(target)) + name;
    if (isTaken(prefixed))
        raiseValueError("the name \"" + name + "\" is taken by something else in this geometry");
    return Orvan::String(prefixed);
}

Orvan::MutablePtr<Object> withoutKey(Object const& object, Orvan::String const& key)
{
    auto const keys = object.keys();
    Orvan::String const* renamed = nullptr;
    for (Orvan::String const& other : *keys) {
        std::string_view const prefix = ModelingProgram::namePrefix(getGeoPropTargetName(object, other));
        bool const isRenamed = !prefix.empty() && other.view().starts_with(prefix)
            && other.view().substr(prefix.size()) == key.view() && getDataGeoProperty(object, other);
        if (isRenamed && !renamed)
            renamed = &other;
    }
    Orvan::MutablePtr<Object> result = Tessara::createObject();
    for (Orvan::String const& other : *keys)
        if (other != key)
            result->setProperty(&other == renamed ? key : other, object.getProperty(other));
    return result;
}

}
