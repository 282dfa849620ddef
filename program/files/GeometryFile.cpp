#include "GeometryFile.h"

#include "Hdf5File.h"
#include "Readers.h"
#include "WorkMeter.h"
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
        auto const format = formats().find(extensionOf(file));
        return format == formats().end() ? Format{} : format->second;
    }

}

GeometryFile readGeometryFile(std::filesystem::path const& file, ReadOptions const& options)
{
    if (auto const location = hdf5LocationOf(file))
        return readHdf5Geometry(*location, options);
    Format const format = formatOf(file);
    if (!format.read)
        throw FileError(file.string()
            + " cannot be read: its extension is none of .obj, .ply, .stl, .off, .xyz, .glb, .gltf, .h5 and .hdf5");
    bool const readsParts = format.read == static_cast<decltype(format.read)>(readPly) || format.read == readStl;
    InputFile const input(file, readsParts ? InputFile::Loading::Beginning : InputFile::Loading::Whole);
    if (input.size == 0 && format.read != static_cast<decltype(format.read)>(readObj)
        && format.read != readXyz) // the others have headers
        throw FileError(file.string() + " cannot be read: it is empty");
    return format.read(input, options);
}

std::vector<std::string> writeGeometryFile(
    Tessara::Object const& object, std::filesystem::path const& file, WriteOptions const& options)
{
    if (auto const location = hdf5LocationOf(file)) {
        writeHdf5Geometry(object, *location, options);
        return {};
    }
    Format const format = formatOf(file);
    if (!format.write)
        throw FileError(
            file.string() + " cannot be written: its extension is none of .obj, .ply, .stl, .vtp, .glb, .h5 and .hdf5");
    WritableGeometry geometry = takeApart(object, file);
    geometry.existing = options.existing;
    geometry.remark = options.remark;
    if (format.write != writeObj)
        for (FaceNames const& names : geometry.faceNames)
            leaveOut(names.data, "only OBJ and HDF5 files can hold names of faces", geometry.leftOut);
    workMeter.begin(WorkMeter::kBytes, estimateFileBytes(geometry, extensionOf(file)));
    format.write(geometry, file);
    return std::move(geometry.leftOut);
}

bool isWritableFormat(std::filesystem::path const& file)
{
    return hdf5LocationOf(file) || formatOf(file).write;
}

std::string extensionOf(std::filesystem::path const& file)
{
    return hdf5LocationOf(file) ? ".h5" : lowerCase(file.extension().string());
}

std::filesystem::path fileOf(std::filesystem::path const& file)
{
    auto const location = hdf5LocationOf(file);
    return location ? location->file : file;
}

}
