#include "Views.h"

#include "Bindings.h"

#include "PythonOwner.h"
#include "Texts.h"

#include <OrvanCore/ForeignArray.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <memory>
#include <optional>
#include <span>

namespace ModelingPython {

using namespace Tessara::Geometry;
using Common::GeoLocation;
using Tessara::PropertyValue;

namespace {

    constexpr char const* kCapsuleName = "modeling.memory";

    /// What keeps the memory of a view: an array of the library, or objects of Python.
    struct Memory {
        PropertyValue array;
        py::object owner = {};
        py::object guards = {};
    };

    py::capsule capsuleOf(Memory memory)
    {
        auto held = std::make_unique<Memory>(std::move(memory));
        PyObject* const capsule = PyCapsule_New(held.get(), kCapsuleName,
            [](PyObject* dying) { delete static_cast<Memory*>(PyCapsule_GetPointer(dying, kCapsuleName)); });
        if (!capsule)
            throw py::error_already_set();
        static_cast<void>(held.release());
        return py::reinterpret_steal<py::capsule>(capsule);
    }

    /// Null for other objects.
    Memory const* memoryIn(py::handle object)
    {
        if (PyCapsule_IsValid(object.ptr(), kCapsuleName) == 0)
            return nullptr;
        return static_cast<Memory const*>(PyCapsule_GetPointer(object.ptr(), kCapsuleName));
    }

    bool isWritable(py::handle array)
    {
        return (py::detail::array_proxy(array.ptr())->flags & py::detail::npy_api::NPY_ARRAY_WRITEABLE_) != 0;
    }

    void makeReadOnly(py::handle array)
    {
        py::detail::array_proxy(array.ptr())->flags &= ~py::detail::npy_api::NPY_ARRAY_WRITEABLE_;
    }

    /// Borrowed; null if there is none.
    PyObject* baseOf(py::handle array)
    {
        return py::detail::array_proxy(array.ptr())->base;
    }

    /// Calls NumPy itself, because the constructors of `py::array` allocate strides, and views are made all the time.
    py::array readOnlyView(py::dtype type, std::span<py::ssize_t const> shape, void const* data, py::object const& base)
    {
        auto const& numpy = py::detail::npy_api::get();
        constexpr int kFlags = 0; // not writable; NumPy finds out the others
        auto view =
            py::reinterpret_steal<py::array>(numpy.PyArray_NewFromDescr_(numpy.PyArray_Type_, type.release().ptr(),
                static_cast<int>(shape.size()), shape.data(), nullptr, const_cast<void*>(data), kFlags, nullptr));
        if (!view || numpy.PyArray_SetBaseObject_(view.ptr(), base.inc_ref().ptr()) != 0)
            throw py::error_already_set();
        return view;
    }

    /// What keeps the memory of an array that nobody can write; null if somebody can, or could make it writable again.
    py::object ownerOfConstant(py::array const& array)
    {
        py::object object = array;
        while (py::isinstance<py::array>(object)) {
            if (isWritable(object) || !baseOf(object))
                return {};
            object = py::reinterpret_borrow<py::object>(baseOf(object));
        }
        return memoryIn(object) || PyBytes_Check(object.ptr()) != 0 ? object : py::object();
    }

    bool isPlain(py::array const& array, std::size_t alignment)
    {
        return (array.flags() & py::array::c_style) != 0 && py::cast<bool>(array.dtype().attr("isnative"))
            && reinterpret_cast<std::uintptr_t>(array.data()) % alignment == 0;
    }

    bool areBooleans(void const* values, std::uint64_t count)
    {
        auto const* const bytes = static_cast<unsigned char const*>(values);
        return std::all_of(bytes, bytes + count, [](unsigned char byte) { return byte <= 1; });
    }

    std::span<py::ssize_t const> shapeOf(py::array const& array)
    {
        return {array.shape(), static_cast<std::size_t>(array.ndim())};
    }

    /// Of an array of the library: no vector, because views are made all the time.
    template <class T> auto shapeOf(std::uint64_t count)
    {
        constexpr auto element = elementShape<T>();
        std::array<py::ssize_t, element.size() + 1> shape{static_cast<py::ssize_t>(count)};
        std::copy(element.begin(), element.end(), shape.begin() + 1);
        return shape;
    }

    /// NumPy copies, because it knows all strides and byte orders.
    template <class T> Orvan::Ptr<Orvan::Array<T>> copyOf(py::array const& array)
    {
        auto const count = static_cast<std::uint64_t>(array.shape(0));
        auto values = Orvan::MutablePtr<Orvan::Array<T>>::make(count, Orvan::kUninitialized);
        if (count == 0)
            return values;
        py::array const target(numpyType<T>(), shapeOf<T>(count), values->data, py::none());
        py::module_::import("numpy").attr("copyto")(target, array);
        if constexpr (std::is_same_v<T, bool>) {
            auto* const bytes = reinterpret_cast<unsigned char*>(values->data);
            std::transform(
                bytes, bytes + count, bytes, [](unsigned char byte) { return static_cast<unsigned char>(byte != 0); });
        }
        return values;
    }

    template <class T> Orvan::Ptr<Orvan::Array<T>> share(void const* data, std::uint64_t count, py::object const& owner)
    {
        if (Memory const* const memory = memoryIn(owner)) {
            auto const* const array = memory->array.get<Orvan::Ptr<Orvan::Array<T>>>();
            if (array && (*array)->data == data && (*array)->size == count)
                return *array;
        }
        return Orvan::makeForeignArray(static_cast<T const*>(data), count, PythonOwner(owner));
    }

    py::object locationClass()
    {
        return py::module_::import("modeling.data").attr("GeoLocation");
    }

    py::object toObject(Orvan::String const& text)
    {
        return toPython(text.view());
    }

    py::object toObject(GeoLocation const& location)
    {
        auto const& [x, y, z] = location.coordinates;
        return locationClass()(toPython(location.object.view()), toPython(location.component.view()), location.element,
            py::make_tuple(x, y, z));
    }

    template <class T> py::array objectsOf(Orvan::Array<T> const& values)
    {
        py::array objects = py::module_::import("numpy").attr("empty")(values.size, py::dtype("O"));
        auto** const slots = static_cast<PyObject**>(objects.mutable_data());
        for (std::uint64_t i = 0; i != values.size; ++i)
            Py_XSETREF(slots[i], toObject(values[i]).release().ptr());
        makeReadOnly(objects);
        return objects;
    }

    Orvan::String stringFrom(py::handle object)
    {
        return Orvan::String(std::string_view(toText(object)));
    }

    GeoLocation locationFrom(py::handle object)
    {
        if (!py::isinstance(object, locationClass()))
            raiseTypeError("a GeoLocation is expected, not " + std::string(Py_TYPE(object.ptr())->tp_name));
        auto const [name, component, element, coordinates] =
            py::cast<std::tuple<py::object, py::object, py::object, std::tuple<double, double, double>>>(object);
        auto const [x, y, z] = coordinates;
        return {stringFrom(name), stringFrom(component), py::cast<unsigned int>(element),
            {static_cast<float>(x), static_cast<float>(y), static_cast<float>(z)}};
    }

    /// Raises the exception that is being handled as the cause of one that also says where, if it is about the value.
    [[noreturn]] void raiseForElement(py::error_already_set& error, std::string const& what, std::uint64_t element)
    {
        bool const isType = error.matches(PyExc_TypeError);
        if (!isType && !error.matches(PyExc_ValueError))
            throw; // KeyboardInterrupt, MemoryError, or what code of the element raised
        try {
            raise(isType ? PyExc_TypeError : PyExc_ValueError,
                what + ": element " + std::to_string(element) + ": " + toText(py::str(error.value())));
        } catch (py::error_already_set& located) {
            PyException_SetCause(located.value().ptr(), py::object(error.value()).release().ptr());
            throw;
        }
    }

    template <class T, class Convert>
    PropertyValue convertEach(py::list const& objects, std::string const& what, Convert const& convert)
    {
        auto values = Orvan::MutablePtr<Orvan::Array<T>>::make(objects.size());
        for (std::size_t i = 0; i != objects.size(); ++i) {
            try {
                (*values)[i] = convert(objects[i]);
            } catch (py::cast_error const&) {
                raiseTypeError(what + ": element " + std::to_string(i)
                    + " is not (object, component, element, (x, y, z)) of two texts, an index and three numbers");
            } catch (py::error_already_set& error) {
                raiseForElement(error, what, i);
            }
        }
        return Orvan::Ptr<Orvan::Array<T>>(std::move(values));
    }

    PropertyValue valuesFromObjects(py::array const& array, std::string const& what)
    {
        if (array.ndim() != 1)
            raiseValueError(
                what + " has objects of shape " + toText(py::str(array.attr("shape"))) + " instead of (n,)");
        py::list const objects = array.attr("tolist")();
        if (!objects.empty() && py::isinstance(objects[0], locationClass()))
            return convertEach<GeoLocation>(objects, what, locationFrom);
        return convertEach<Orvan::String>(objects, what, stringFrom);
    }

    /// Whether the memory of an array can be made constant: no array that shares it is writable, unless it is only
    /// referred to by its view. Fills in all arrays of the chain.
    bool canBecomeConstant(py::array const& array, std::vector<py::object>& chain)
    {
        py::object object = array;
        for (;;) {
            chain.push_back(object);
            PyObject* const base = baseOf(object);
            if (!base)
                return true; // it owns its memory
            if (!py::isinstance<py::array>(base)) {
                if (memoryIn(base) || PyBytes_Check(base) != 0)
                    return true;
                return false; // a buffer may be read-only here and writable elsewhere
            }
            if (isWritable(base) && Py_REFCNT(base) != 1)
                return false;
            object = py::reinterpret_borrow<py::object>(base);
        }
    }

    /// A weak reference to each array: NumPy does not resize arrays in place that have one.
    py::tuple guardsOf(std::vector<py::object> const& chain)
    {
        py::list guards;
        for (py::object const& array : chain)
            guards.append(py::weakref(array));
        return py::tuple(guards);
    }

    py::array privateCopy(py::array const& array)
    {
        py::array const copy = py::module_::import("numpy").attr("array")(
            array, py::arg("dtype") = array.dtype().attr("newbyteorder")("="), py::arg("order") = "C");
        py::array const base = copy.attr("view")(py::module_::import("numpy").attr("ndarray"));
        Memory memory;
        memory.owner = base;
        return readOnlyView(base.dtype(), shapeOf(base), base.data(), capsuleOf(memory));
    }

}

template <class T> py::array viewOf(Orvan::Ptr<Orvan::Array<T>> values)
{
    if constexpr (kIsViewable<T>) {
        auto const shape = shapeOf<T>(values->size);
        T const* const data = values->data;
        return readOnlyView(numpyType<T>(), shape, data, capsuleOf({std::move(values)}));
    } else {
        return objectsOf(*values);
    }
}

py::object viewOf(PropertyValue const& values)
{
    py::object view = py::none();
    forEachElementTypeName([&]<class T>(ElementType<T>) {
        auto const* const array = values.get<Orvan::Ptr<Orvan::Array<T>>>();
        if (array && *array)
            view = viewOf(*array);
    });
    return view;
}

py::array bytesOf(PropertyValue const& values)
{
    std::optional<py::array> view;
    visitArray(values, [&]<class T>(Orvan::Array<T> const& array, ElementType<T>) {
        view = readOnlyView(
            py::dtype("u1"), shapeOf<unsigned char>(array.size * sizeof(T)), array.data, capsuleOf({values}));
    });
    return *view;
}

py::array viewWithShape(Orvan::Ptr<Orvan::Array<unsigned int>> const& values, std::array<py::ssize_t, 2> const& shape)
{
    return readOnlyView(numpyType<unsigned int>(), shape, values->data, capsuleOf({values}));
}

py::array arrayFrom(py::handle values, std::string const& what)
{
    py::module_ const numpy = py::module_::import("numpy");
    bool const isList = PyList_Check(values.ptr()) != 0 || PyTuple_Check(values.ptr()) != 0;
    if (isList && py::len(values) != 0 && py::isinstance(py::object(values[py::int_(0)]), locationClass())) {
        // NumPy would take these tuples apart.
        py::list const items(py::reinterpret_borrow<py::object>(values));
        py::array objects = numpy.attr("empty")(items.size(), py::dtype("O"));
        for (std::size_t i = 0; i != items.size(); ++i)
            objects[py::int_(i)] = items[i];
        return objects;
    }
    if (py::isinstance(values, numpy.attr("ma").attr("MaskedArray")))
        raiseTypeError(what + " is a masked array; fill it first: numpy.ma.filled(...)");
    try {
        return numpy.attr("asarray")(values);
    } catch (py::error_already_set& error) {
        if (!error.matches(PyExc_ValueError))
            throw;
        raiseValueError(what + " cannot be made an array: " + toText(py::str(error.value())));
    }
}

template <class T> Orvan::Ptr<Orvan::Array<T>> valuesFrom(py::array const& array)
{
    static_assert(kIsViewable<T>);
    auto const count = static_cast<std::uint64_t>(array.shape(0));
    if (count == 0 || !isPlain(array, alignof(T)))
        return copyOf<T>(array);
    py::object const owner = ownerOfConstant(array);
    if (!owner || (std::is_same_v<T, bool> && !areBooleans(array.data(), count)))
        return copyOf<T>(array);
    return share<T>(array.data(), count, owner);
}

PropertyValue valuesFrom(py::array const& array, std::string const& what)
{
    if (array.ndim() == 0)
        raiseValueError(what + " is a single value; numpy.full(...) makes an array of it");
    char const kind = array.dtype().kind();
    if (kind == 'U' || kind == 'O')
        return valuesFromObjects(array, what);
    PropertyValue values;
    forEachElementTypeName([&]<class T>(ElementType<T>) {
        if constexpr (kIsViewable<T>)
            if (values.empty() && hasElements<T>(array))
                values = valuesFrom<T>(array);
    });
    if (!values.empty())
        return values;
    std::string const shapes = possibleShapes(array);
    if (shapes.empty())
        raiseTypeError(what + " is " + describe(array) + ", but there is no element type for that");
    raiseValueError(what + " is " + describe(array) + ", but such values have one of the shapes " + shapes);
}

namespace {
    /// Whether nobody can write the memory of a view. A buffer that is read-only here, such as that of a mapped file, may
    /// be writable elsewhere.
    bool isConstant(py::object const& view)
    {
        py::object const exporter = view.attr("obj");
        if (py::isinstance<py::array>(exporter))
            return static_cast<bool>(ownerOfConstant(py::reinterpret_borrow<py::array>(exporter)));
        return PyBytes_Check(exporter.ptr()) != 0;
    }

    template <class T> Orvan::Ptr<Orvan::Array<T>> typedValuesIn(py::buffer_info const& memory, py::object const& owner)
    {
        static_assert(kIsViewable<T>);
        std::uint64_t const bytes = static_cast<std::uint64_t>(memory.size * memory.itemsize),
                            count = bytes / sizeof(T);
        bool const isBroken = std::is_same_v<T, bool> && !areBooleans(memory.ptr, count);
        if (count != 0 && memory.readonly && !isBroken && isConstant(owner)
            && reinterpret_cast<std::uintptr_t>(memory.ptr) % alignof(T) == 0)
            return Orvan::makeForeignArray(static_cast<T const*>(memory.ptr), count, PythonOwner(owner));
        if (isBroken)
            raiseValueError("a boolean is neither true nor false");
        auto values = Orvan::MutablePtr<Orvan::Array<T>>::make(count, Orvan::kUninitialized);
        if (count != 0)
            std::memcpy(static_cast<void*>(values->data), memory.ptr, count * sizeof(T));
        return values;
    }
}

py::array adopt(py::handle values, bool checks)
{
    if (!py::isinstance<py::array>(values))
        raiseTypeError("adopt takes a NumPy array, not " + std::string(Py_TYPE(values.ptr())->tp_name));
    auto const array = py::reinterpret_borrow<py::array>(values);
    if (array.dtype().attr("hasobject").cast<bool>())
        raiseTypeError("adopt takes arrays of numbers and records; objects are always copied");
    if (possibleShapes(array).empty())
        raiseTypeError("adopt: " + describe(array) + " has no element type");
    if (py::isinstance(array, py::module_::import("numpy").attr("ma").attr("MaskedArray")))
        raiseTypeError("adopt: a masked array; fill it first: numpy.ma.filled(...)");
    if (array.size() == 0 || ownerOfConstant(array))
        return array;
    std::vector<py::object> chain;
    auto const alignment = array.dtype().attr("alignment").cast<std::size_t>();
    bool const isConstant = canBecomeConstant(array, chain);
    if (!isPlain(array, alignment) || (checks && !isConstant))
        return privateCopy(array);
    Memory memory;
    memory.owner = array;
    memory.guards = guardsOf(chain);
    py::array view = readOnlyView(array.dtype(), shapeOf(array), array.data(), capsuleOf(std::move(memory)));
    for (py::object const& shared : chain)
        makeReadOnly(shared);
    return view;
}

// The types that other sources use by name.
template py::array viewOf(Orvan::Ptr<Orvan::Array<Tessara::Math::float3>>);
template py::array viewOf(Orvan::Ptr<Orvan::Array<unsigned int>>);
template Orvan::Ptr<Orvan::Array<Tessara::Math::float3>> valuesFrom(py::array const&);
template Orvan::Ptr<Orvan::Array<unsigned int>> valuesFrom(py::array const&);

PropertyValue valuesIn(std::string const& elementType, py::buffer_info const& memory, py::object const& owner)
{
    PropertyValue values;
    forEachElementTypeName([&]<class T>(ElementType<T> type) {
        if constexpr (kIsViewable<T>)
            if (elementType == type.name)
                values = typedValuesIn<T>(memory, owner);
    });
    return values;
}

void bindViews(py::module_& module)
{
    module.def("adopt", &adopt, py::arg("array"), py::kw_only(), py::arg("check") = true,
        R"(Hand the memory of a NumPy array over, so that geometry uses it without a copy.

Returns a read-only array over the same memory: assign that, or pass it to a constructor. `array` itself becomes
read-only, and so does the array that it is a view of if nothing else refers to that. Do not make it writable again with
`setflags`, and do not write through views that were made before: geometry that shares the memory would change.

The memory is copied instead if it is not contiguous or not aligned for its type, if its byte order is not this
machine's, or if others can write it: a writable base array, a bytearray, an object that does not say that it is
read-only. `numpy.shares_memory(array, adopted)` tells which it was.

check
    With False, memory that others can write is handed over too, such as that of another library. Then nobody may write,
    resize or free it as long as there are geometry or views that share it: this would crash the process.)");
}

}
