#include "Bindings.h"
#include "Handles.h"
#include "PropertyNames.h"
#include "Texts.h"
#include "Values.h"
#include "Views.h"

#include "files/GeometryBuilder.h"
#include "geometry/Geometry.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Prototypes.h>

#include <optional>

namespace ModelingPython {

using namespace Tessara::Geometry;
using Common::DataInterpolationMode;
using Tessara::Object;
using Tessara::PropertyValue;

namespace {

    // What these functions change is put together first and replaces the object of the handle at the end. Values are
    // converted before the object is read, because a conversion can run code of the user.

    Orvan::MutablePtr<Object> copyOf(Object const& object)
    {
        return Orvan::MutablePtr<Object>::make(object);
    }

    std::string nameProperty(std::string const& name, Orvan::String const& target)
    {
        return "property \"" + name + "\" of " + targetName(target);
    }

    bool isComponent(Object const& object, Orvan::String const& key)
    {
        PropertyValue const held = object.getProperty(key);
        auto const* const property = held.get<Orvan::Ptr<Object>>();
        return property && *property && Object::isA(**property, *getComponentGeoPropPrototype());
    }

    void requireTarget(Object const& object, Orvan::String const& target)
    {
        if (isComponent(object, target) || getRangeGeoProperty(object, target))
            return;
        std::vector<std::string> names;
        for (auto const& prototype : {getComponentGeoPropPrototype(), getRangeGeoPropPrototype()})
            for (Orvan::String const& key : getGeoPropNamesByPrototype(object, *prototype))
                names.push_back(targetName(key));
        raiseKeyError(
            "there is no component or range \"" + targetName(target) + "\"; there are these: " + listed(names));
    }

    std::vector<std::string> namesOf(Object const& object, Orvan::String const& target)
    {
        std::vector<std::string> names;
        for (Orvan::String const& key : dataKeys(object, target))
            names.push_back(propertyName(object, key, target));
        return names;
    }

    Orvan::String requireKey(Object const& object, std::string const& name, Orvan::String const& target)
    {
        if (auto key = findDataKey(object, name, target))
            return *key;
        requireTarget(object, target);
        raiseKeyError(
            "there is no " + nameProperty(name, target) + "; there are these: " + listed(namesOf(object, target)));
    }

    /// A property, which is not changed, of the object of a handle.
    struct Found {
        Orvan::Ptr<Object> object;
        Orvan::String target;
        std::string name;
        Orvan::String key;
        Orvan::Ptr<Object> property;

        Found(Handle const& handle, py::handle targetText, py::handle nameText)
            : object(handle.object())
            , target(targetKey(toText(targetText)))
            , name(toText(nameText))
            , key(requireKey(*object, name, target))
            , property(getDataGeoProperty(*object, key))
        {
        }
    };

    void replaceProperty(Found const& found, Orvan::MutablePtr<Object> property, Handle& handle)
    {
        Orvan::MutablePtr<Object> object = copyOf(*found.object);
        object->setProperty(found.key, Orvan::Ptr<Object>(std::move(property)));
        handle.replace(std::move(object));
    }

    py::list dataNames(Handle const& handle, py::handle target)
    {
        py::list names;
        for (std::string const& name : namesOf(*handle.object(), targetKey(toText(target))))
            names.append(toPython(name));
        return names;
    }

    py::object getData(Handle const& handle, py::handle targetText, py::handle nameText)
    {
        Found const found(handle, targetText, nameText);
        py::object const view = viewOf(found.property->getProperty(sData));
        if (view.is_none())
            raiseValueError(nameProperty(found.name, found.target) + " has no array of a known element type");
        return view;
    }

    std::uint64_t lengthOf(PropertyValue const& values)
    {
        std::uint64_t length = 0;
        visitArray(values, [&](auto const& array, auto) { length = array.size; });
        return length;
    }

    void requireLength(
        Object const& object, PropertyValue const& values, std::string const& name, Orvan::String const& target)
    {
        if (!isComponent(object, target))
            return; // a range may lead to any number of values
        std::uint64_t const count = getElementCount(object, target), length = lengthOf(values);
        if (length != count)
            raiseValueError(nameProperty(name, target) + " has " + std::to_string(length) + " values for "
                + std::to_string(count) + " elements");
    }

    /// A property with these values. Default, interpolation and all else are those of `former` if it has the type.
    Orvan::MutablePtr<Object> propertyWith(
        PropertyValue const& values, Orvan::String const& target, Orvan::Ptr<Object> const& former)
    {
        Orvan::MutablePtr<Object> property;
        visitArray(values, [&]<class T>(Orvan::Array<T> const&, ElementType<T>) {
            auto const& array = *values.get<Orvan::Ptr<Orvan::Array<T>>>();
            if (!former) {
                property = makeDataProperty<T>(target, array);
                return;
            }
            property = copyOf(*former);
            property->setProperty(sData, PropertyValue(array));
            if (!former->getProperty(sDefault).get<T>())
                property->setProperty(sDefault, PropertyValue(T{}));
        });
        return property;
    }

    void setData(Handle& handle, py::handle targetText, py::handle nameText, py::handle values)
    {
        Orvan::String const target = targetKey(toText(targetText));
        std::string const name = toText(nameText), what = nameProperty(name, target);
        PropertyValue const data = valuesFrom(arrayFrom(values, what), what);
        requireTarget(*handle.object(), target);
        requireLength(*handle.object(), data, name, target);
        Orvan::MutablePtr<Object> object = copyOf(*handle.object());
        auto const present = findDataKey(*object, name, target);
        Orvan::String const key = present ? *present : newKey(*object, name, target);
        Orvan::Ptr<Object> const former = present ? getDataGeoProperty(*object, key) : nullptr;
        object->setProperty(key, Orvan::Ptr<Object>(propertyWith(data, target, former)));
        handle.replace(std::move(object));
    }

    void deleteData(Handle& handle, py::handle target, py::handle name)
    {
        Found const found(handle, target, name);
        handle.replace(withoutKey(*found.object, found.key));
    }

    // More than the values.

    py::object interpolationOf(Object const& property)
    {
        PropertyValue const value = property.getProperty(sInterp);
        auto const* const mode = value.get<DataInterpolationMode>();
        if (!mode)
            return py::none();
        return *mode == DataInterpolationMode::Linear ? py::object(py::str("linear"))
            : *mode == DataInterpolationMode::None    ? py::object(py::str("none"))
                                                      : py::object(py::int_(static_cast<int>(*mode)));
    }

    /// As a view of one value; None if there is no default.
    py::object defaultOf(Object const& property)
    {
        py::object view = py::none();
        visitValue(
            property.getProperty(sDefault), [](auto const&, auto) {},
            [&]<class T>(T const& value, ElementType<T>) {
                view = viewOf(PropertyValue(Orvan::makePtr<Orvan::Array<T>>(1u, value)));
            });
        return view;
    }

    py::dict infoOf(Handle const& handle, py::handle targetText, py::handle nameText)
    {
        Found const found(handle, targetText, nameText);
        py::dict info;
        info["type"] = py::none();
        info["length"] = py::none();
        visitArray(found.property->getProperty(sData), [&](auto const& array, auto elementType) {
            info["type"] = elementType.name;
            info["length"] = array.size;
        });
        info["key"] = toPython(found.key.view());
        info["interpolation"] = interpolationOf(*found.property);
        info["default"] = defaultOf(*found.property);
        py::list dependsOn;
        PropertyValue const names = found.property->getProperty(sDependsOn);
        if (auto const* const array = names.get<Orvan::Ptr<Orvan::Array<Orvan::String>>>(); array && *array)
            for (Orvan::String const& name : **array)
                dependsOn.append(toPython(name.view()));
        info["depends_on"] = dependsOn;
        return info;
    }

    void setDefault(Handle& handle, py::handle targetText, py::handle nameText, py::handle value)
    {
        PropertyValue const one = valuesFrom(arrayFrom(value, "the default"), "the default");
        Found const found(handle, targetText, nameText);
        PropertyValue const data = found.property->getProperty(sData);
        if (one.type() != data.type() || lengthOf(one) != 1)
            raiseTypeError(
                "the default of " + nameProperty(found.name, found.target) + " is not one value of its type");
        Orvan::MutablePtr<Object> property = copyOf(*found.property);
        visitArray(one, [&]<class T>(Orvan::Array<T> const& array, ElementType<T>) {
            property->setProperty(sDefault, PropertyValue(T(array[0])));
        });
        replaceProperty(found, std::move(property), handle);
    }

    void setInterpolation(Handle& handle, py::handle targetText, py::handle nameText, py::handle mode)
    {
        Found const found(handle, targetText, nameText);
        std::string const text = toText(mode);
        if (text != "linear" && text != "none")
            raiseValueError(
                "the interpolation of " + nameProperty(found.name, found.target) + " is \"linear\" or \"none\"");
        Orvan::MutablePtr<Object> property = copyOf(*found.property);
        property->setProperty(sInterp, text == "linear" ? DataInterpolationMode::Linear : DataInterpolationMode::None);
        replaceProperty(found, std::move(property), handle);
    }

    void setTarget(Handle& handle, py::handle targetText, py::handle nameText, py::handle newTargetText)
    {
        Found const found(handle, targetText, nameText);
        Orvan::String const target = targetKey(toText(newTargetText));
        requireTarget(*found.object, target);
        requireLength(*found.object, found.property->getProperty(sData), found.name, target);
        if (target == found.target)
            return;
        if (findDataKey(*found.object, found.name, target))
            raiseValueError("there is a " + nameProperty(found.name, target) + " already");
        Orvan::MutablePtr<Object> object = withoutKey(*found.object, found.key);
        Orvan::MutablePtr<Object> property = copyOf(*found.property);
        property->setProperty(sTarget, Orvan::String(target));
        object->setProperty(newKey(*object, found.name, target), Orvan::Ptr<Object>(std::move(property)));
        handle.replace(std::move(object));
    }

    // Ranges, under their keys.

    Orvan::Ptr<Object> requireRange(Object const& object, Orvan::String const& name)
    {
        auto range = getRangeGeoProperty(object, name);
        if (!range)
            raiseKeyError("there is no range \"" + std::string(name.view()) + "\"");
        return range;
    }

    py::list rangeNames(Handle const& handle)
    {
        py::list names;
        for (Orvan::String const& key : getGeoPropNamesByPrototype(*handle.object(), *getRangeGeoPropPrototype()))
            names.append(toPython(key.view()));
        return names;
    }

    py::tuple getRange(Handle const& handle, py::handle nameText)
    {
        Orvan::String const name(std::string_view(toText(nameText)));
        requireRange(*handle.object(), name);
        auto const indices = getRangeGeoPropIndices(*handle.object(), name);
        py::object const view = indices ? py::object(viewOf(indices)) : py::object(py::none());
        return py::make_tuple(toPython(targetName(getGeoPropTargetName(*handle.object(), name))), view);
    }

    Orvan::Ptr<Orvan::Array<unsigned int>> rangeIndices(py::handle values, std::string const& what)
    {
        py::array const array = arrayFrom(values, what);
        if (array.ndim() != 1)
            raiseValueError(what + " is " + describe(array) + "; the shape must be (n,)");
        if (array.shape(0) == 0)
            return Orvan::makePtr<Orvan::Array<unsigned int>>();
        if (hasElements<unsigned int>(array))
            return valuesFrom<unsigned int>(array);
        char const kind = array.dtype().kind();
        if (kind != 'i' && kind != 'u')
            raiseTypeError(what + " is " + describe(array) + "; indices are integers");
        for (char const* const bound : {"min", "max"}) {
            py::object const value = array.attr(bound)().attr("item")();
            if (value < py::int_(0) || value > py::int_(kInvalidIndex))
                raiseValueError(what + " has the index " + toText(py::str(value)));
        }
        return valuesFrom<unsigned int>(array.attr("astype")("u4"));
    }

    void setRange(Handle& handle, py::handle nameText, py::handle targetText, py::handle indices)
    {
        std::string const name = toText(nameText), what = "range \"" + name + "\"";
        Orvan::String const target = targetKey(toText(targetText));
        auto values = rangeIndices(indices, what);
        requireTarget(*handle.object(), target);
        Orvan::Ptr<Object> const held = handle.object();
        Object const& former = *held;
        if (isComponent(former, target) && values->size != getElementCount(former, target))
            raiseValueError(what + " has " + std::to_string(values->size) + " indices for "
                + std::to_string(getElementCount(former, target)) + " " + targetName(target));
        bool const isPresent = static_cast<bool>(getRangeGeoProperty(former, Orvan::String(name)));
        Orvan::MutablePtr<Object> object = copyOf(former);
        Orvan::String const key = isPresent ? Orvan::String(name) : newKey(former, name, sNullString);
        Orvan::MutablePtr<Object> range =
            isPresent ? copyOf(*getRangeGeoProperty(former, key)) : Tessara::createObject();
        range->setProperty(sIndices, std::move(values));
        range->setProperty(sTarget, Orvan::String(target));
        object->setProperty(key, Orvan::Ptr<Object>(std::move(range)));
        if (getTargetComponent(*object, key).empty())
            raiseValueError(what + " cannot have the target \"" + targetName(target) + "\": it leads to no component");
        handle.replace(std::move(object));
    }

    void deleteRange(Handle& handle, py::handle nameText)
    {
        Orvan::String const name(std::string_view(toText(nameText)));
        requireRange(*handle.object(), name);
        if (auto const users = getGeoPropNamesByTarget(*handle.object(), name); !users.empty())
            raiseValueError("range \"" + std::string(name.view()) + "\" has data, such as \""
                + std::string(users[0].view()) + "\"; delete that first");
        handle.replace(withoutKey(*handle.object(), name));
    }

    // Components.

    py::dict componentCounts(Handle const& handle)
    {
        py::dict counts;
        for (Orvan::String const& key : getGeoPropNamesByPrototype(*handle.object(), *getComponentGeoPropPrototype()))
            counts[toPython(targetName(key))] = getElementCount(*handle.object(), key);
        return counts;
    }

    /// \return the key
    Orvan::String requireOwnComponent(py::handle nameText)
    {
        Orvan::String const key = targetKey(toText(nameText));
        if (!ModelingProgram::namePrefix(key).empty())
            raiseValueError("the number of " + targetName(key) + " follows from the geometry and cannot be set");
        return key;
    }

    void setComponent(Handle& handle, py::handle nameText, py::int_ const& count)
    {
        Orvan::String const key = requireOwnComponent(nameText);
        if (count < py::int_(0) || count >= py::int_(kDeletedElement))
            raiseValueError("a component cannot have " + toText(py::str(py::object(count))) + " elements");
        if (ModelingProgram::typeOf(*handle.object()) == Common::GeometryType::PointCloud)
            raiseValueError("a point cloud has no component but points");
        Orvan::MutablePtr<Object> object = copyOf(*handle.object());
        if (isComponent(*object, key) && getElementCount(*object, key) != py::cast<unsigned int>(count)
            && !getGeoPropNamesByTarget(*object, key).empty())
            raiseValueError("component \"" + targetName(key) + "\" has properties; delete them first");
        addComponent(isComponent(*object, key) ? key : newKey(*object, std::string(key.view()), sNullString),
            py::cast<unsigned int>(count), *object);
        handle.replace(std::move(object));
    }

    void deleteComponent(Handle& handle, py::handle nameText)
    {
        Orvan::String const key = requireOwnComponent(nameText);
        if (!isComponent(*handle.object(), key))
            raiseKeyError("there is no component \"" + targetName(key) + "\"");
        if (!getGeoPropNamesByTarget(*handle.object(), key).empty())
            raiseValueError("component \"" + targetName(key) + "\" has properties; delete them first");
        handle.replace(withoutKey(*handle.object(), key));
    }

}

void bindProperties(py::module_& module)
{
    // For modeling/data.py, whose mappings are what users see.
    module.def("_data_names", &dataNames);
    module.def("_get_data", &getData);
    module.def("_set_data", &setData);
    module.def("_delete_data", &deleteData);
    module.def("_data_info", &infoOf);
    module.def("_set_default", &setDefault);
    module.def("_set_interpolation", &setInterpolation);
    module.def("_set_target", &setTarget);
    module.def("_range_names", &rangeNames);
    module.def("_get_range", &getRange);
    module.def("_set_range", &setRange);
    module.def("_delete_range", &deleteRange);
    module.def("_component_counts", &componentCounts);
    module.def("_set_component", &setComponent);
    module.def("_delete_component", &deleteComponent);
}

}
