#include "Construction.h"

#include "Cancellation.h"

#include "Texts.h"
#include "Views.h"

#include "geometry/Geometry.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

#include <cmath>
#include <limits>
#include <optional>

namespace ModelingPython {

using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::Math::float3;

namespace {

    using Indices = Orvan::Ptr<Orvan::Array<unsigned int>>;
    using Positions = Orvan::Ptr<Orvan::Array<float3>>;

    constexpr double kReportedMove = 1e-6; // as a fraction of the diagonal of the bounding box

    /// The size of the positions: the diagonal of their box, or if they all coincide, their largest coordinate.
    double extentOf(double const* coordinates, std::uint64_t points)
    {
        double least[3] = {HUGE_VAL, HUGE_VAL, HUGE_VAL}, most[3] = {-HUGE_VAL, -HUGE_VAL, -HUGE_VAL}, largest = 0;
        for (std::uint64_t i = 0; i != 3 * points; ++i) {
            double const value = coordinates[i];
            if (!std::isfinite(value))
                continue;
            least[i % 3] = std::min(least[i % 3], value);
            most[i % 3] = std::max(most[i % 3], value);
            largest = std::max(largest, std::abs(value));
        }
        if (!(least[0] <= most[0] && least[1] <= most[1] && least[2] <= most[2]))
            return largest;
        double const diagonal = std::hypot(most[0] - least[0], most[1] - least[1], most[2] - least[2]);
        return diagonal > 0 ? diagonal : largest;
    }

    void warnOfMove(double move, std::uint64_t point, double extent)
    {
        std::string const text = "positions are stored in single precision, which moves point " + std::to_string(point)
            + " by " + toText(py::str(py::float_(move))) + " in a box with the diagonal "
            + toText(py::str(py::float_(extent))) + "; subtract the center first";
        py::object const category = py::module_::import("modeling.data").attr("PrecisionWarning");
        if (PyErr_WarnEx(category.ptr(), text.c_str(), 1) != 0)
            throw py::error_already_set();
    }

    Positions narrowed(py::array const& array)
    {
        auto const wide = py::array_t<double, py::array::c_style | py::array::forcecast>(array);
        auto const count = static_cast<std::uint64_t>(wide.shape(0));
        auto result = Orvan::MutablePtr<Orvan::Array<float3>>::make(count, Orvan::kUninitialized);
        double const* const from = wide.data();
        double largest = 0;
        std::uint64_t moved = 0;
        for (std::uint64_t point = 0; point != count; ++point) {
            double const* const p = from + 3 * point;
            float3 const q{static_cast<float>(p[0]), static_cast<float>(p[1]), static_cast<float>(p[2])};
            (*result)[point] = q;
            double const move = std::max({std::abs(p[0] - static_cast<double>(q.x)),
                std::abs(p[1] - static_cast<double>(q.y)), std::abs(p[2] - static_cast<double>(q.z))});
            if (move > largest) { // not for NaN
                largest = move;
                moved = point;
            }
        }
        if (largest > 0)
            if (double const extent = extentOf(from, count); largest > kReportedMove * extent)
                warnOfMove(largest, moved, extent);
        return result;
    }

    bool isEmpty(py::array const& array)
    {
        return array.ndim() == 1 && array.shape(0) == 0;
    }

    void requireCount(py::ssize_t count, char const* elements)
    {
        if (static_cast<std::uint64_t>(count) >= kDeletedElement)
            raiseValueError(
                std::to_string(count) + " " + elements + " are more than an object can hold, 4,294,967,293");
    }

    Positions positionsFrom(py::handle points)
    {
        py::array const array = arrayFrom(points, "points");
        if (isEmpty(array))
            return Orvan::makePtr<Orvan::Array<float3>>();
        if (array.ndim() != 2 || array.shape(1) != 3)
            raiseValueError("points is " + describe(array) + "; the shape must be (n, 3)");
        requireCount(array.shape(0), "points");
        if (hasElements<float3>(array))
            return valuesFrom<float3>(array);
        char const kind = array.dtype().kind();
        if (kind != 'f' && kind != 'i' && kind != 'u')
            raiseTypeError("points is " + describe(array) + "; coordinates are numbers");
        return narrowed(array);
    }

    /// The message of the host's validator for point indices.
    std::string beyond(char const* name, std::uint64_t entry, std::string const& index, std::string const& why)
    {
        return std::string(name) + "[" + std::to_string(entry) + "] is " + index + why;
    }

    template <class Integer> Indices narrowedIndices(py::array const& array, char const* name, std::string const& why)
    {
        auto const wide = py::array_t<Integer, py::array::c_style>(array);
        auto const count = static_cast<std::uint64_t>(wide.size());
        auto result = Orvan::MutablePtr<Orvan::Array<unsigned int>>::make(count, Orvan::kUninitialized);
        Integer const* const from = wide.data();
        for (std::uint64_t i = 0; i != count; ++i) {
            if (!std::in_range<unsigned int>(from[i]))
                raiseInvalidGeometry(beyond(name, i, std::to_string(from[i]), why));
            (*result)[i] = static_cast<unsigned int>(from[i]);
        }
        return result;
    }

    /// Integers of any type as indices.
    /// \param name  of the array in the object, for messages
    /// \param why   completes the message about an index that is negative or too large
    Indices indicesFrom(py::array const& array, char const* name, std::string const& why)
    {
        if (array.size() == 0)
            return Orvan::makePtr<Orvan::Array<unsigned int>>();
        char const kind = array.dtype().kind();
        if (kind != 'i' && kind != 'u')
            raiseTypeError(std::string(name) + ": " + describe(array) + " does not hold integers");
        py::array const flat = array.attr("reshape")(-1);
        if (hasElements<unsigned int>(flat))
            return valuesFrom<unsigned int>(flat);
        return kind == 'i' ? narrowedIndices<long long>(flat, name, why)
                           : narrowedIndices<unsigned long long>(flat, name, why);
    }

    Indices offsetsFrom(py::handle offsets, char const* name)
    {
        py::array const array = arrayFrom(offsets, "offsets");
        if (array.ndim() != 1)
            raiseValueError("offsets is " + describe(array) + "; the shape must be (m + 1,)");
        Indices result = indicesFrom(array, name, ", which is no offset");
        return result->empty() ? Orvan::makePtr<Orvan::Array<unsigned int>>(std::initializer_list<unsigned int>{0})
                               : result;
    }

    struct Faces {
        Indices corners;
        Indices offsets;
    };

    std::string beyondPoints(std::uint64_t pointCount)
    {
        return ", but the mesh has " + std::to_string(pointCount) + " points";
    }

    /// Faces that all have k corners.
    Faces facesFrom(py::array const& array, std::uint64_t pointCount)
    {
        auto const faces = static_cast<std::uint64_t>(array.shape(0)), k = static_cast<std::uint64_t>(array.shape(1));
        requireCount(array.shape(0), "faces");
        requireCount(array.size(), "face corners");
        auto offsets = Orvan::MutablePtr<Orvan::Array<unsigned int>>::make(faces + 1, Orvan::kUninitialized);
        for (std::uint64_t face = 0; face <= faces; ++face)
            (*offsets)[face] = static_cast<unsigned int>(face * k);
        return {indicesFrom(array, sFaceVertex, beyondPoints(pointCount)), std::move(offsets)};
    }

    /// Faces as a sequence of sequences of indices.
    Faces facesFrom(py::sequence const& faces, std::uint64_t pointCount)
    {
        auto corners = Orvan::MutablePtr<Orvan::Array<unsigned int>>::make();
        auto offsets = Orvan::MutablePtr<Orvan::Array<unsigned int>>::make();
        offsets->append(0);
        for (py::object const face : faces) {
            std::string const name = "face " + std::to_string(offsets->size - 1);
            if (PySequence_Check(face.ptr()) == 0 || PyUnicode_Check(face.ptr()) != 0)
                raiseTypeError(name + " is not a sequence of point indices");
            for (py::object const corner : py::reinterpret_borrow<py::sequence>(face)) {
                auto const index = py::reinterpret_steal<py::object>(PyNumber_Index(corner.ptr()));
                if (!index) {
                    if (PyErr_ExceptionMatches(PyExc_TypeError) == 0)
                        throw py::error_already_set();
                    PyErr_Clear();
                    raiseTypeError(name + " has a corner that is not an integer");
                }
                int overflow = 0;
                long long const point = PyLong_AsLongLongAndOverflow(index.ptr(), &overflow);
                if (overflow != 0 || !std::in_range<unsigned int>(point))
                    raiseInvalidGeometry(
                        beyond(sFaceVertex, corners->size, toText(py::str(index)), beyondPoints(pointCount)));
                corners->append(static_cast<unsigned int>(point));
            }
            if (corners->size >= kDeletedElement)
                raiseValueError("there are more face corners than a mesh can hold");
            offsets->append(static_cast<unsigned int>(corners->size));
        }
        return {std::move(corners), std::move(offsets)};
    }

    Faces facesFrom(py::handle faces, std::uint64_t pointCount)
    {
        bool const isSequence = !py::isinstance<py::array>(faces) && PySequence_Check(faces.ptr()) != 0
            && PyUnicode_Check(faces.ptr()) == 0 && PyBytes_Check(faces.ptr()) == 0;
        std::optional<py::array> array;
        if (isSequence) {
            try {
                array = py::array(py::module_::import("numpy").attr("asarray")(faces));
            } catch (py::error_already_set& error) {
                if (!error.matches(PyExc_ValueError) && !error.matches(PyExc_OverflowError))
                    throw; // faces of different sizes
            }
            if (!array || array->dtype().kind() == 'O')
                return facesFrom(py::reinterpret_borrow<py::sequence>(faces), pointCount);
        } else {
            array = arrayFrom(faces, "faces");
        }
        if (isEmpty(*array))
            return {Orvan::makePtr<Orvan::Array<unsigned int>>(),
                Orvan::makePtr<Orvan::Array<unsigned int>>(std::initializer_list<unsigned int>{0})};
        if (array->ndim() != 2)
            raiseValueError("faces is " + describe(*array)
                + "; the shape must be (m, k), or (n,) with `offsets=`, the start of each face and the end");
        return facesFrom(*array, pointCount);
    }

    template <class T> void addElements(char const* component, std::uint64_t count, char const* name,
        Orvan::Ptr<Orvan::Array<T>> values, Object& object)
    {
        addComponent(component, static_cast<unsigned int>(count), object);
        object.setProperty(name, Orvan::Ptr<Object>(makeDataProperty<T>(component, std::move(values))));
    }

    Orvan::Ptr<Object> validated(Orvan::MutablePtr<Object> object)
    {
        requireValid(*object);
        return object;
    }

}

void requireValid(Object const& object)
{
    GeoValidator::Status const status = withoutLock([&] { return ModelingProgram::validate(object); });
    if (!status)
        raiseInvalidGeometry(std::string(status.message().view()));
}

Orvan::Ptr<Object> constructMesh(py::handle points, py::handle faces, py::handle offsets)
{
    Positions positions = positionsFrom(points);
    Faces parsed;
    if (offsets.is_none()) {
        parsed = facesFrom(faces, positions->size);
    } else {
        py::array const corners = arrayFrom(faces, "faces");
        if (corners.ndim() != 1)
            raiseValueError("faces is " + describe(corners) + "; with `offsets` the shape must be (n,)");
        requireCount(corners.shape(0), "face corners");
        parsed = {indicesFrom(corners, sFaceVertex, beyondPoints(positions->size)), offsetsFrom(offsets, sFaceOffset)};
        requireCount(static_cast<py::ssize_t>(parsed.offsets->size), "faces");
    }
    Orvan::MutablePtr<Object> mesh = Tessara::createObject();
    std::uint64_t const pointCount = positions->size, cornerCount = parsed.corners->size;
    std::uint64_t const faceCount = parsed.offsets->size - 1;
    addElements(sPointComp, pointCount, sPointPosition, std::move(positions), *mesh);
    addElements(sFaceVertexComp, cornerCount, sFaceVertex, std::move(parsed.corners), *mesh);
    addElements(sFaceComp, faceCount, sFaceOffset, std::move(parsed.offsets), *mesh);
    return validated(std::move(mesh));
}

Orvan::Ptr<Object> constructPointCloud(py::handle points)
{
    Positions positions = positionsFrom(points);
    Orvan::MutablePtr<Object> cloud = Tessara::createObject();
    std::uint64_t const count = positions->size;
    addElements(sPointComp, count, sPointPosition, std::move(positions), *cloud);
    return validated(std::move(cloud));
}

namespace {

    /// The points of all strands, and where each begins.
    std::pair<py::object, Indices> joinStrands(py::handle strands)
    {
        if (py::isinstance<py::array>(strands) && py::reinterpret_borrow<py::array>(strands).ndim() == 2)
            raiseTypeError("`offsets=` is missing: the start of each strand and the number of points; or pass a list "
                           "with the points of each strand");
        auto offsets = Orvan::MutablePtr<Orvan::Array<unsigned int>>::make();
        offsets->append(0);
        py::list parts;
        std::uint64_t end = 0;
        for (py::handle const strand : strands) {
            std::string const name = "strand " + std::to_string(parts.size());
            py::array const part = arrayFrom(strand, name);
            if (part.size() != 0 && (part.ndim() != 2 || part.shape(1) != 3))
                raiseValueError(name + " is " + describe(part) + "; the shape must be (n, 3)");
            parts.append(part.attr("reshape")(-1, 3));
            end += static_cast<std::uint64_t>(part.size()) / 3;
            requireCount(static_cast<py::ssize_t>(end), "points");
            offsets->append(static_cast<unsigned int>(end));
        }
        py::object const none = py::make_tuple();
        return {parts.empty() ? none : py::module_::import("numpy").attr("concatenate")(parts), std::move(offsets)};
    }

}

Orvan::Ptr<Object> constructStrandSet(py::handle points, py::handle offsets)
{
    Positions positions;
    Indices parsed;
    if (offsets.is_none()) {
        auto [joined, starts] = joinStrands(points);
        positions = positionsFrom(joined);
        parsed = std::move(starts);
    } else {
        positions = positionsFrom(points);
        parsed = offsetsFrom(offsets, sStrandOffset);
    }
    requireCount(static_cast<py::ssize_t>(parsed->size), "strands");
    Orvan::MutablePtr<Object> strands = Tessara::createObject();
    std::uint64_t const pointCount = positions->size, strandCount = parsed->size - 1;
    addElements(sPointComp, pointCount, sPointPosition, std::move(positions), *strands);
    addElements(sStrandComp, strandCount, sStrandOffset, std::move(parsed), *strands);
    return validated(std::move(strands));
}

Orvan::Ptr<Object> withPositions(Object const& object, py::handle points)
{
    Positions positions = positionsFrom(points);
    std::uint64_t const expected = getElementCount(object, sPointComp);
    if (positions->size != expected)
        raiseValueError(
            "there are " + std::to_string(positions->size) + " positions for " + std::to_string(expected) + " points");
    auto copy = Orvan::MutablePtr<Object>::make(object);
    Tessara::PropertyValue const held = copy->getProperty(sPointPosition);
    auto const* const property = held.get<Orvan::Ptr<Object>>();
    if (!property || !*property)
        raiseInvalidGeometry("the data property sPointPosition is missing");
    auto changed = Orvan::MutablePtr<Object>::make(**property);
    changed->setProperty(sData, std::move(positions));
    copy->setProperty(sPointPosition, Orvan::Ptr<Object>(std::move(changed)));
    return copy;
}

}
