#include "GeometryFile.h"

#include "Hdf5File.h"
#include "Readers.h"
#include "Recognition.h"
#include "WorkMeter.h"
#include "Writers.h"

#include <algorithm>
#include <map>

namespace ModelingProgram {

namespace {

    using Reader = GeometryFile (*)(InputFile const&, ReadOptions const&);
    constexpr Reader kReadObj = readObj, kReadPly = readPly, kReadStl = readStl, kReadXyz = readXyz;

    struct Format {
        Reader read;
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

    constexpr char kHdf5[] = ".h5";

    Format functionsOf(std::string const& format)
    {
        auto const known = formats().find(format);
        return known == formats().end() ? Format{} : known->second;
    }

    bool isKnown(std::string const& format)
    {
        return format == kHdf5 || formats().contains(format);
    }

    std::string formatOfInput(std::filesystem::path const& file, ReadOptions const& options)
    {
        std::string format = formatOf(file, options.format);
        if (isKnown(format))
            return format;
        format = recognizedFormat(file);
        if (format.empty())
            format = options.fallbackFormat;
        if (format.empty())
            throw FileError(file.string()
                + " cannot be read: neither its name nor its first bytes tell the format; --format names it");
        return format;
    }

}

GeometryFile readGeometryFile(std::filesystem::path const& file, ReadOptions const& options)
{
    std::string const name = formatOfInput(file, options);
    if (name == kHdf5)
        return readHdf5Geometry(hdf5LocationOf(file).value_or(Hdf5Location{file, std::nullopt}), options);
    Format const format = functionsOf(name);
    if (!format.read)
        throw FileError(file.string()
            + " cannot be read: its extension is none of .obj, .ply, .stl, .off, .xyz, .glb, .gltf, .h5 and .hdf5");
    bool const readsParts = format.read == kReadPly || format.read == kReadStl;
    InputFile const input(file, readsParts ? InputFile::Loading::Beginning : InputFile::Loading::Whole);
    if (input.size == 0 && format.read != kReadObj && format.read != kReadXyz) // the others have headers
        throw FileError(file.string() + " cannot be read: it is empty");
    return format.read(input, options);
}

std::vector<std::string> writeGeometryFile(
    Tessara::Object const& object, std::filesystem::path const& file, WriteOptions const& options)
{
    std::string const name = formatOf(file, options.format);
    if (name == kHdf5) {
        writeHdf5Geometry(object, hdf5LocationOf(file).value_or(Hdf5Location{file, std::nullopt}), options);
        return {};
    }
    Format const format = functionsOf(name);
    if (!format.write)
        throw FileError(
            file.string() + " cannot be written: its extension is none of .obj, .ply, .stl, .vtp, .glb, .h5 and .hdf5");
    WritableGeometry geometry = takeApart(object, file);
    geometry.existing = options.existing;
    geometry.remark = options.remark;
    if (format.write != writeObj)
        for (FaceNames const& names : geometry.faceNames)
            leaveOut(names.data, "only OBJ and HDF5 files can hold names of faces", geometry.leftOut);
    workMeter.begin(WorkMeter::kBytes, estimateFileBytes(geometry, name));
    format.write(geometry, file);
    return std::move(geometry.leftOut);
}

std::vector<std::string> geometryFormats()
{
    std::vector<std::string> names{kHdf5 + 1};
    for (auto const& [extension, format] : formats())
        names.push_back(extension.substr(1));
    std::sort(names.begin(), names.end());
    return names;
}

bool isWritableFormat(std::string const& format)
{
    return format == kHdf5 || functionsOf(format).write;
}

std::string formatOf(std::filesystem::path const& file, std::string const& otherwise)
{
    std::string extension = hdf5LocationOf(file) ? kHdf5 : lowerCase(file.extension().string());
    return isKnown(extension) || otherwise.empty() ? extension : otherwise;
}

std::filesystem::path fileOf(std::filesystem::path const& file)
{
    auto const location = hdf5LocationOf(file);
    return location ? location->file : file;
}

}
