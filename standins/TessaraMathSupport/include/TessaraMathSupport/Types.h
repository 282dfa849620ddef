#pragma once

namespace Tessara::Math {

// Plain structures of scalars. Vectors have named fields; a type named 2x3 has two rows of three. There is no
// two-component `uchar` and no four-component `short` or `int`.

namespace Internal {

    template <class T> struct Vector2 {
        T x, y;
        friend bool operator==(Vector2 const&, Vector2 const&) = default;
    };

    template <class T> struct Vector3 {
        T x, y, z;
        friend bool operator==(Vector3 const&, Vector3 const&) = default;
    };

    template <class T> struct Vector4 {
        T x, y, z, w;
        friend bool operator==(Vector4 const&, Vector4 const&) = default;
    };

    template <class T, int kRows, int kColumns> struct Matrix {
        T rows[kRows][kColumns];
        friend bool operator==(Matrix const&, Matrix const&) = default;
    };

}

using float2 = Internal::Vector2<float>;
using float3 = Internal::Vector3<float>;
using float4 = Internal::Vector4<float>;
using float2x2 = Internal::Matrix<float, 2, 2>;
using float2x3 = Internal::Matrix<float, 2, 3>;
using float3x3 = Internal::Matrix<float, 3, 3>;
using float4x4 = Internal::Matrix<float, 4, 4>;

using double2 = Internal::Vector2<double>;
using double3 = Internal::Vector3<double>;
using double4 = Internal::Vector4<double>;
using double2x2 = Internal::Matrix<double, 2, 2>;
using double2x3 = Internal::Matrix<double, 2, 3>;
using double3x3 = Internal::Matrix<double, 3, 3>;
using double4x4 = Internal::Matrix<double, 4, 4>;

using int2 = Internal::Vector2<int>;
using int2x2 = Internal::Matrix<int, 2, 2>;
using int2x3 = Internal::Matrix<int, 2, 3>;
using int3 = Internal::Vector3<int>;

using short2 = Internal::Vector2<short>;
using short2x2 = Internal::Matrix<short, 2, 2>;
using short2x3 = Internal::Matrix<short, 2, 3>;
using short3 = Internal::Vector3<short>;

using uchar3 = Internal::Vector3<unsigned char>;
using uchar4 = Internal::Vector4<unsigned char>;

}
