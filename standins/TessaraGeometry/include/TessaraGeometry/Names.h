#pragma once

namespace Tessara::Geometry {

// The value of each key is the name of its constant, so that a message that quotes a key also names the constant. All
// are short enough for an `Orvan::String` to store without an allocation, which makes lookups of standard properties
// cheap.

// Components: classes of elements, each with an element count.
inline constexpr char const* sPointComp = "sPointComp";
inline constexpr char const* sFaceComp = "sFaceComp";
inline constexpr char const* sFaceVertexComp = "sFaceVertexComp"; // face corners
inline constexpr char const* sStrandComp = "sStrandComp";

// Standard data properties. The offset arrays have one more entry than there are faces or strands.
inline constexpr char const* sPointPosition = "sPointPosition"; // float3 per point
inline constexpr char const* sFaceVertex = "sFaceVertex"; // unsigned int per face corner: its point
inline constexpr char const* sFaceOffset = "sFaceOffset"; // unsigned int per face: its first corner
inline constexpr char const* sStrandOffset = "sStrandOffset"; // unsigned int per strand: its first point

// Properties of geo properties.
inline constexpr char const* sData = "sData"; // Ptr<Array<T>>: the values
inline constexpr char const* sTarget = "sTarget"; // String: the component or range that the property belongs to
inline constexpr char const* sDefault = "sDefault"; // T: the value of elements without one
inline constexpr char const* sInterp = "sInterp"; // DataInterpolationMode
inline constexpr char const* sDependsOn = "sDependsOn"; // Ptr<Array<String>>: names of properties
inline constexpr char const* sIndices = "sIndices"; // Ptr<Array<unsigned int>>: entries of a range

inline constexpr char const* sGenericDataGeoProp = "sGenericData"; // selects the prototype of data of any type
inline constexpr char const* sNullString = ""; // target of data that has none yet: no component has an empty name

// Index sentinels; neither is a valid index.
inline constexpr unsigned int kInvalidIndex = 0xFFFFFFFFu; // an absent element in an index array
inline constexpr unsigned int kDeletedElement = 0xFFFFFFFEu; // a removed element in a remap array

}
