#include "Bindings.h"
#include "Construction.h"
#include "ElementForms.h"
#include "Handles.h"
#include "Texts.h"
#include "Values.h"
#include "Views.h"

#include "geometry/Geometry.h"

#include <cstring>
#include <map>

namespace ModelingPython {

using namespace Tessara::Geometry;
using Common::DataInterpolationMode;
using Common::GeoLocation;
using Tessara::Object;
using Tessara::PropertyValue;

// An object becomes nested tuples, each with its kind first. Arrays are buffers, which pickle protocol 5 can transport
// without copies. A value that is shared becomes the same tuple, which pickle stores once; it is shared again when it is
// restored.

namespace {

    py::bytes bytesOfText(std::string_view text)
    {
        return {text.data(), text.size()};
    }

    /// The bytes of all strings, and where each begins.
    PropertyValue offsetsOf(Orvan::Array<Orvan::String> const& strings, std::string& bytes)
    {
        auto offsets = Orvan::MutablePtr<Orvan::Array<unsigned long long>>::make();
        offsets->reserve(strings.size + 1);
        offsets->append(0);
        for (Orvan::String const& text : strings) {
            bytes += text.view();
            offsets->append(bytes.size());
        }
        return Orvan::Ptr<Orvan::Array<unsigned long long>>(std::move(offsets));
    }

    py::tuple locationState(GeoLocation const& location)
    {
        return py::make_tuple(bytesOfText(location.object.view()), bytesOfText(location.component.view()),
            location.element,
            bytesOfText({reinterpret_cast<char const*>(&location.coordinates), sizeof(location.coordinates)}));
    }

    class Describer {
    public:
        explicit Describer(int protocol)
            : hasBuffers_(protocol >= 5)
        {
        }

        py::tuple describe(Object const& object, std::string const& path)
        {
            py::list entries;
            auto const keys = object.keys();
            for (Orvan::String const& key : *keys)
                entries.append(py::make_tuple(bytesOfText(key.view()),
                    describeValue(*object.findProperty(key.view()), path + "/" + std::string(key.view()))));
            return py::make_tuple("object", py::tuple(entries));
        }

    private:
        py::tuple describeValue(PropertyValue const& value, std::string const& path)
        {
            if (value.empty())
                return py::make_tuple("nothing");
            if (auto const* const object = value.get<Orvan::Ptr<Object>>())
                return *object ? shared(object->get(), [&] { return describe(**object, path); })
                               : py::make_tuple("null object");
            if (auto const* const mode = value.get<DataInterpolationMode>())
                return py::make_tuple("interpolation", static_cast<int>(*mode));
            py::tuple state;
            bool const isKnown = visitValue(
                value,
                [&]<class T>(Orvan::Ptr<Orvan::Array<T>> const& array, ElementType<T> type) {
                    state = array ? shared(array.get(), [&] { return describeArray(value, *array, type); })
                                  : py::make_tuple("null array", type.name);
                },
                [&]<class T>(T const& single, ElementType<T> type) {
                    state = py::make_tuple("value", type.name, describeSingle(single));
                });
            if (!isKnown)
                raiseTypeError("the value " + path + " has a type that cannot be pickled");
            return state;
        }

        template <class Describe> py::tuple shared(void const* value, Describe const& describe)
        {
            auto const known = states_.find(value);
            if (known != states_.end())
                return known->second;
            py::tuple const state = describe();
            states_.emplace(value, state);
            return state;
        }

        template <class T>
        py::tuple describeArray(PropertyValue const& value, Orvan::Array<T> const& array, ElementType<T> type)
        {
            if constexpr (kIsViewable<T>) {
                return py::make_tuple("array", type.name, buffer(value));
            } else if constexpr (std::is_same_v<T, Orvan::String>) {
                std::string bytes;
                PropertyValue const offsets = offsetsOf(array, bytes);
                return py::make_tuple("strings", bytesOfText(bytes), buffer(offsets));
            } else {
                py::list locations;
                for (GeoLocation const& location : array)
                    locations.append(locationState(location));
                return py::make_tuple("locations", locations);
            }
        }

        template <class T> static py::object describeSingle(T const& value)
        {
            if constexpr (kIsViewable<T>)
                return bytesOfText({reinterpret_cast<char const*>(&value), sizeof(T)});
            else if constexpr (std::is_same_v<T, Orvan::String>)
                return bytesOfText(value.view());
            else
                return locationState(value);
        }

        py::object buffer(PropertyValue const& array) const
        {
            py::array const bytes = bytesOf(array);
            if (!hasBuffers_)
                return bytes.attr("tobytes")();
            return py::reinterpret_steal<py::object>(PyPickleBuffer_FromObject(bytes.ptr()));
        }

        bool hasBuffers_;
        std::map<void const*, py::tuple> states_;
    };

    [[noreturn]] void refuseState()
    {
        raiseValueError("this is not pickled geometry");
    }

    /// The memory of a buffer, and an object that keeps it: a view, so that a bytearray cannot change its size.
    std::pair<py::buffer_info, py::object> memoryOf(py::handle object)
    {
        auto view = py::reinterpret_steal<py::object>(PyMemoryView_FromObject(object.ptr()));
        if (!view)
            throw py::error_already_set();
        if (!view.attr("contiguous").cast<bool>())
            refuseState();
        view = view.attr("cast")("B");
        return {py::buffer(view).request(), view};
    }

    class Restorer {
    public:
        Orvan::Ptr<Object> restore(py::tuple const& state)
        {
            PropertyValue const value = restoreValue(state, 0);
            auto const* const object = value.get<Orvan::Ptr<Object>>();
            if (!object || !*object)
                refuseState();
            return *object;
        }

    private:
        static constexpr int kMostLevels = 1000;

        PropertyValue restoreValue(py::tuple const& state, int level)
        {
            if (level > kMostLevels || state.empty())
                refuseState();
            Restored& known = values_[state.ptr()];
            if (known.levels == 0) {
                int const outer = std::exchange(levels_, 0);
                known.value = restoreNew(state, level);
                known.levels = levels_ + 1;
                levels_ = outer;
            }
            if (level + known.levels > kMostLevels + 1)
                refuseState();
            levels_ = std::max(levels_, known.levels);
            return known.value;
        }

        PropertyValue restoreNew(py::tuple const& state, int level)
        {
            auto const kind = state[0].cast<std::string>();
            if (kind == "nothing")
                return {};
            if (kind == "null object")
                return Orvan::Ptr<Object>();
            if (kind == "object")
                return restoreObject(state[1].cast<py::tuple>(), level);
            if (kind == "interpolation")
                return static_cast<DataInterpolationMode>(state[1].cast<int>());
            if (kind == "strings")
                return restoreStrings(state);
            if (kind == "locations")
                return restoreLocations(py::tuple(state[1].cast<py::list>()));
            if (kind == "array")
                return restoreArray(state[1].cast<std::string>(), state[2]);
            return restoreOther(kind, state[1].cast<std::string>(), state);
        }

        PropertyValue restoreObject(py::tuple const& entries, int level)
        {
            Orvan::MutablePtr<Object> object = Tessara::createObject();
            for (py::handle const entry : entries) {
                auto const pair = entry.cast<py::tuple>();
                object->setProperty(Orvan::String(std::string_view(pair[0].cast<std::string>())),
                    restoreValue(pair[1].cast<py::tuple>(), level + 1));
            }
            return Orvan::Ptr<Object>(std::move(object));
        }

        static PropertyValue restoreArray(std::string const& type, py::handle buffer)
        {
            auto const [memory, owner] = memoryOf(buffer);
            PropertyValue values = valuesIn(type, memory, owner);
            if (values.empty())
                refuseState();
            return values;
        }

        static PropertyValue restoreStrings(py::tuple const& state)
        {
            auto const bytes = state[1].cast<std::string>();
            PropertyValue const held = restoreArray("ulong", state[2]);
            auto const& offsets = **held.get<Orvan::Ptr<Orvan::Array<unsigned long long>>>();
            if (offsets.empty())
                refuseState();
            auto strings = Orvan::MutablePtr<Orvan::Array<Orvan::String>>::make(offsets.size - 1);
            for (std::uint64_t i = 0; i + 1 < offsets.size; ++i) {
                if (offsets[i] > offsets[i + 1] || offsets[i + 1] > bytes.size())
                    refuseState();
                (*strings)[i] = Orvan::String(std::string_view(bytes).substr(offsets[i], offsets[i + 1] - offsets[i]));
            }
            return Orvan::Ptr<Orvan::Array<Orvan::String>>(std::move(strings));
        }

        static GeoLocation restoreLocation(py::tuple const& state)
        {
            GeoLocation location;
            location.object = Orvan::String(std::string_view(state[0].cast<std::string>()));
            location.component = Orvan::String(std::string_view(state[1].cast<std::string>()));
            location.element = state[2].cast<unsigned int>();
            auto const coordinates = state[3].cast<std::string>();
            if (coordinates.size() != sizeof(location.coordinates))
                refuseState();
            std::memcpy(&location.coordinates, coordinates.data(), coordinates.size());
            return location;
        }

        static PropertyValue restoreLocations(py::tuple const& states)
        {
            auto locations = Orvan::MutablePtr<Orvan::Array<GeoLocation>>::make(states.size());
            for (std::size_t i = 0; i != states.size(); ++i)
                (*locations)[i] = restoreLocation(states[i].cast<py::tuple>());
            return Orvan::Ptr<Orvan::Array<GeoLocation>>(std::move(locations));
        }

        /// Null arrays and single values.
        static PropertyValue restoreOther(std::string const& kind, std::string const& typeName, py::tuple const& state)
        {
            PropertyValue value;
            forEachElementTypeName([&]<class T>(ElementType<T> type) {
                if (typeName != type.name)
                    return;
                if (kind == "null array")
                    value = Orvan::Ptr<Orvan::Array<T>>();
                else if (kind == "value")
                    value = restoreSingle<T>(state[2]);
            });
            if (value.empty())
                refuseState();
            return value;
        }

        template <class T> static T restoreSingle(py::handle state)
        {
            if constexpr (std::is_same_v<T, GeoLocation>) {
                return restoreLocation(state.cast<py::tuple>());
            } else {
                auto const bytes = state.cast<std::string>();
                if constexpr (std::is_same_v<T, Orvan::String>) {
                    return Orvan::String(std::string_view(bytes));
                } else {
                    if (bytes.size() != sizeof(T) || (std::is_same_v<T, bool> && bytes[0] != 0 && bytes[0] != 1))
                        refuseState();
                    T value;
                    std::memcpy(static_cast<void*>(&value), bytes.data(), sizeof(T));
                    return value;
                }
            }
        }

        struct Restored {
            PropertyValue value;
            int levels = 0; // of objects in it, and itself
        };
        std::map<PyObject*, Restored> values_;
        int levels_ = 0; // the most that a value inside the one being restored has
    };

    py::object restore(py::object const& type, py::object const& state)
    {
        if (PyType_Check(type.ptr()) == 0
            || PyType_IsSubtype(reinterpret_cast<PyTypeObject*>(type.ptr()),
                   reinterpret_cast<PyTypeObject*>(py::type::of<Handle>().ptr()))
                == 0)
            refuseState();
        Orvan::Ptr<Object> object;
        try {
            object = Restorer().restore(state.cast<py::tuple>());
        } catch (py::cast_error const&) {
            refuseState();
        }
        py::object const expected = py::type::of(makeHandle(object));
        if (PyObject_IsSubclass(type.ptr(), expected.ptr()) != 1)
            refuseState();
        py::object self = newInstance(type);
        self.cast<Handle&>().replace(std::move(object));
        return self;
    }

    py::tuple reduce(py::object const& self, int protocol)
    {
        py::tuple const state = Describer(protocol).describe(*self.cast<Handle&>().object(), "");
        return py::make_tuple(py::module_::import("modeling.data").attr("_restore"),
            py::make_tuple(py::type::of(self), state), self.attr("__getstate__")());
    }

}

void bindPickling(py::module_& module)
{
    module.def("_restore", &restore);
    module.attr("Geometry").attr("__reduce_ex__") =
        py::cpp_function(&reduce, py::name("__reduce_ex__"), py::is_method(module.attr("Geometry")));
}

}
