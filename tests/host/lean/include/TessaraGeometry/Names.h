#pragma once

namespace Tessara::Geometry {

// Defined elsewhere: operations must not rely on the values at compile time.
extern char const *const sPointComp, *const sFaceComp, *const sFaceVertexComp, *const sStrandComp;
extern char const *const sPointPosition, *const sFaceVertex, *const sFaceOffset, *const sStrandOffset;
extern char const *const sData, *const sTarget, *const sDefault, *const sInterp, *const sDependsOn, *const sIndices;
extern char const *const sGenericDataGeoProp, *const sNullString;

extern unsigned int const kInvalidIndex, kDeletedElement;

}
