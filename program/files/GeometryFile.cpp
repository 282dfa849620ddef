#include "GeometryFile.h"

#include "Readers.h"
#include "Writers.h"

#include <map>

namespace ModelingProgram {

namespace {

    struct Format {
        GeometryFile (*read)(InputFile const&, ReadOptions const&);
        void (*write)(WritableGeometry&, std::filesystem::path const&);
    };

    std::map<std::string, Format> const& formats()
    {
        static std::map<std::string, Format> const result{
            {".glb", {readGltf, writeGltf}},
            {".gltf", {readGltf, nullptr}},
            {".obj", {readObj, writeObj}},
            {".off", {readOff, nullptr}},
            {".ply", {readPly, writePly}},
            {".stl", {readStl, writeStl}},
            {".vtp", {nullptr, writeVtp}},
            {".xyz", {readXyz, nullptr}},
        };
        return result;
    }

    Format formatOf(std::filesystem::path const& file)
    {
        auto const format = formats().find(lowerCase(file.extension().string()));
        return format == formats().end() ? Format{} : format->second;
    }

}

GeometryFile readGeometryFile(std::filesystem::path const& file, ReadOptions const& options)
{
    Format const format = formatOf(file);
    if (!format.read)
        throw FileError(file.string()
            + " cannot be read: its extension is none of .obj, .ply, .stl, .off, .xyz, .glb and "
              ".gltf");
    InputFile const input(file);
    if (input.size == 0 && format.read != readObj && format.read != readXyz) // the others have headers
        throw FileError(file.string() + " cannot be read: it is empty");
    return format.read(input, options);
}

std::vector<std::string> writeGeometryFile(
    Tessara::Object const& object, std::filesystem::path const& file, WriteOptions const& options)
{
    Format const format = formatOf(file);
    if (!format.write)
        throw FileError(file.string() + " cannot be written: its extension is none of .obj, .ply, .stl, .vtp and .glb");
    WritableGeometry geometry = takeApart(object, file);
    geometry.existing = options.existing;
    geometry.remark = options.remark;
    if (format.write != writeObj)
        for (FaceNames const& names : geometry.faceNames)
            leaveOut(names.data, "only OBJ files can hold names of faces", geometry.leftOut);
    format.write(geometry, file);
    return std::move(geometry.leftOut);
}

bool isWritableFormat(std::filesystem::path const& file)
{
    return formatOf(file).write != nullptr;
}

}
