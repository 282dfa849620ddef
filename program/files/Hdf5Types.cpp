#include "Hdf5Types.h"

#include <utility>

namespace ModelingProgram {

using namespace Tessara::Geometry;

namespace {

    template <class Number>
    Hdf5Type enumeration(hid_t base, std::initializer_list<std::pair<char const*, Number>> members)
    {
        Hdf5Type type(H5Tenum_create(base));
        for (auto const& [name, value] : members)
            checked(H5Tenum_insert(type, name, &value));
        return type;
    }

    template <class Enum> int numberOf(Enum value)
    {
        return static_cast<int>(value);
    }

}

Hdf5Type hdf5Interpolation()
{
    using enum Common::DataInterpolationMode;
    static_assert(sizeof(None) == sizeof(int));
    return enumeration<int>(H5T_STD_I32LE, {{"None", numberOf(None)}, {"Linear", numberOf(Linear)}});
}

Hdf5Type hdf5Absent(char const* tag)
{
    Hdf5Type type(H5Tcreate(H5T_OPAQUE, 1));
    checked(H5Tset_tag(type, tag));
    return type;
}

Hdf5Type hdf5Text(std::size_t bytes)
{
    Hdf5Type type(H5Tcopy(H5T_C_S1));
    checked(H5Tset_size(type, bytes));
    checked(H5Tset_strpad(type, H5T_STR_NULLPAD));
    checked(H5Tset_cset(type, H5T_CSET_UTF8));
    return type;
}

/// As h5py stores booleans.
Hdf5Type Internal::hdf5Boolean()
{
    return enumeration<signed char>(H5T_STD_I8LE, {{"FALSE", 0}, {"TRUE", 1}});
}

Hdf5Type Internal::hdf5GeometryType()
{
    using enum Common::GeometryType;
    static_assert(sizeof(Mesh) == sizeof(int));
    return enumeration<int>(H5T_STD_I32LE,
        {{"None", numberOf(None)}, {"Mesh", numberOf(Mesh)}, {"PointCloud", numberOf(PointCloud)},
            {"Strands", numberOf(Strands)}});
}

Hdf5Type Internal::hdf5FaceEdge()
{
    using Mesh::FaceEdge;
    Hdf5Type type(H5Tcreate(H5T_COMPOUND, sizeof(FaceEdge)));
    checked(H5Tinsert(type, "face", offsetof(FaceEdge, face), H5T_STD_U32LE));
    checked(H5Tinsert(type, "edge", offsetof(FaceEdge, edge), H5T_STD_U32LE));
    return type;
}

Hdf5Type Internal::hdf5Transforms()
{
    using Transform::GraphTransforms;
    Hdf5Type const matrix = hdf5ElementType<Tessara::Math::float4x4>().whole();
    Hdf5Type type(H5Tcreate(H5T_COMPOUND, sizeof(GraphTransforms)));
    checked(H5Tinsert(type, "local", offsetof(GraphTransforms, local), matrix));
    checked(H5Tinsert(type, "world", offsetof(GraphTransforms, world), matrix));
    return type;
}

}
