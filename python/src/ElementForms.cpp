#include "ElementForms.h"

#include "Texts.h"

#include <span>

namespace ModelingPython {

using namespace Tessara::Geometry;

namespace {

    py::dtype recordOf(py::list const& fields)
    {
        return py::dtype::from_args(fields);
    }

    std::string shapeText(std::span<py::ssize_t const> shape)
    {
        std::string text = "(n,";
        for (std::size_t i = 0; i != shape.size(); ++i)
            text += (i == 0 ? " " : ", ") + std::to_string(shape[i]);
        return text + ")";
    }

}

py::dtype recordType(ElementType<Common::GeometryType>)
{
    py::list fields;
    fields.append(py::make_tuple("geometry_type", "i4"));
    return recordOf(fields);
}

py::dtype recordType(ElementType<Mesh::FaceEdge>)
{
    static_assert(sizeof(Mesh::FaceEdge) == 8 && sizeof(unsigned int) == 4);
    py::list fields;
    fields.append(py::make_tuple("face", "u4"));
    fields.append(py::make_tuple("edge", "u4"));
    return recordOf(fields);
}

py::dtype recordType(ElementType<Transform::GraphTransforms>)
{
    static_assert(sizeof(Transform::GraphTransforms) == 128);
    py::list fields;
    fields.append(py::make_tuple("local", "f4", py::make_tuple(4, 4)));
    fields.append(py::make_tuple("world", "f4", py::make_tuple(4, 4)));
    return recordOf(fields);
}

std::string describe(py::array const& array)
{
    return toText(py::str(array.dtype())) + " of shape " + toText(py::str(array.attr("shape")));
}

std::string possibleShapes(py::array const& array)
{
    py::dtype const type = array.dtype();
    std::string shapes;
    forEachElementTypeName([&]<class T>(ElementType<T>) {
        if constexpr (kIsViewable<T>) {
            py::dtype const possible = numpyType<T>();
            bool const isSame = kIsRecord<T> ? type.equal(possible)
                                             : type.kind() == possible.kind() && type.itemsize() == possible.itemsize();
            if (isSame)
                shapes += (shapes.empty() ? "" : ", ") + shapeText(elementShape<T>());
        }
    });
    return shapes;
}

}
