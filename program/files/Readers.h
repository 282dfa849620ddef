#pragma once

#include "GeometryBuilder.h"

namespace ModelingProgram {

// One reader per format; all throw `FileError`. For tests, readers of texts have a choice: about how many bytes each thread
// reads at a time. The result does not depend on it.

/// Polygons, or polylines if there are none, or points. Texture coordinates and normals become properties of the face
/// corners ("uv", "normal"), colors after positions a property of the points ("color"). Objects, groups, materials and
/// material libraries become ranges of the faces whose data is the names ("object", "group", "material",
/// "material_library"), smoothing groups numbers of the faces ("smoothing_group", 0 for none).
GeometryFile readObj(InputFile const& file, ReadOptions const& options);
GeometryFile readObj(InputFile const& file, ReadOptions const& options, std::size_t partBytes);

/// All three encodings. Groups of columns become one property: nx ny nz "normal", red green blue alpha "color", u v or
/// s t or texture_u texture_v "uv"; other columns keep their names and types, and lists of equal length become vectors
/// or matrices. Lists "texcoord" of the faces become "uv" of their corners.
GeometryFile readPly(InputFile const& file, ReadOptions const& options);

/// In addition, `General` reads binary files element by element even if their layout allows more.
enum class PlyPath { Fastest, General };
GeometryFile readPly(InputFile const& file, ReadOptions const& options, PlyPath path, std::size_t partBytes);

/// Binary if the file is exactly as long as its count requires, or, if read leniently, longer with a zero byte
/// somewhere. Corners at equal positions become one point; 0 and -0 are equal. Normals are ignored, because the corners
/// determine them; the two bytes after each triangle become "attribute" of the faces, unless all are 0.
GeometryFile readStl(InputFile const& file, ReadOptions const& options);
GeometryFile readStl(InputFile const& file, ReadOptions const& options, std::size_t partBytes);

/// With normals, colors and texture coordinates of points and colors of faces ("normal", "color", "uv"). Colors are
/// bytes if all are whole numbers up to 255, otherwise floats.
GeometryFile readOff(InputFile const& file, ReadOptions const& options);
GeometryFile readOff(InputFile const& file, ReadOptions const& options, std::size_t partBytes);

/// Tables of points, as docs/program.md describes: the heading line or the values determine the columns.
GeometryFile readXyz(InputFile const& file, ReadOptions const& options);
GeometryFile readXyz(InputFile const& file, ReadOptions const& options, std::size_t partBytes);

/// glTF 2.0: the triangles of all meshes in the scene, or lines if there are none, or points, at their places in the
/// scene. NORMAL becomes "normal", TEXCOORD_0 "uv", COLOR_0 "color", TEXCOORD_1 "uv1" and so on; an attribute whose name
/// begins with an underscore has the rest as its name. Vertices of a mesh at equal positions become one point, and
/// attributes in which such vertices differ become attributes of corners. If there is more than one primitive, "source"
/// has the number of the primitive of each face, strand, or point of a cloud.
GeometryFile readGltf(InputFile const& file, ReadOptions const& options);

}
