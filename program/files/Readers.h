#pragma once

#include "GeometryBuilder.h"

namespace ModelingProgram {

// One reader a format; all throw `FileError`.

/// Polygons, or polylines if there are none, or points. Texture coordinates and normals become properties of the
/// face corners ("uv", "normal"), colours behind positions one of the points ("color").
GeometryFile readObj(InputFile const& file, ReadOptions const& options);

/// All three encodings. Columns that belong together become one property: nx ny nz "normal", red green blue alpha
/// "color", u v or s t or texture_u texture_v "uv"; the other columns keep their names and types, and lists of one
/// length become vectors or matrices. Lists "texcoord" of the faces become "uv" of their corners.
GeometryFile readPly(InputFile const& file, ReadOptions const& options);

/// Binary if and only if the file is as long as its count says, or longer if read leniently. Corners at equal positions
/// become one point; 0 and -0 are equal. Normals are left out, for they follow from the corners; the two bytes behind
/// each triangle become "attribute" of the faces, unless all are 0.
GeometryFile readStl(InputFile const& file, ReadOptions const& options);

/// With colours and normals of points and colours of faces ("color", "normal"): bytes where all are whole numbers up to
/// 255, otherwise floats.
GeometryFile readOff(InputFile const& file, ReadOptions const& options);

/// Tables of points, as docs/program.md describes: the heading line or the values tell what the columns are.
GeometryFile readXyz(InputFile const& file, ReadOptions const& options);

}
