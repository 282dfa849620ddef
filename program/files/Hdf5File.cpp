#include "Hdf5File.h"

#include "GeometryBuilder.h"
#include "Hdf5Names.h"
#include "Hdf5Process.h"
#include "OutputFile.h"
#include "Writers.h"

#include <TessaraGeometry/Lookup.h>

#include <algorithm>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::Math::double3;
using Tessara::Math::float3;

namespace {

    constexpr std::string_view kExtensions[] = {".h5", ".hdf5"};

    /// The position of the '#' between the name of a file and that of an object; npos if there is none.
    std::size_t separatorIn(std::string const& name)
    {
        std::string const lower = lowerCase(name);
        std::size_t first = std::string::npos;
        for (std::string_view const extension : kExtensions) {
            std::size_t const at = lower.find(std::string(extension) + "#");
            if (at != std::string::npos)
                first = std::min(first, at + extension.size());
        }
        return first;
    }

    /// The standard arrays of a valid object. Those that its kind does not have are null.
    struct StandardArrays {
        Orvan::Ptr<Orvan::Array<float3>> positions;
        Orvan::Ptr<Orvan::Array<unsigned int>> faceVertex;
        Orvan::Ptr<Orvan::Array<unsigned int>> faceOffset;
        Orvan::Ptr<Orvan::Array<unsigned int>> strandOffset;

        explicit StandardArrays(Object const& object)
            : positions(dataOf<float3>(object, sPointPosition))
        {
            if (object.hasProperty(sFaceComp)) {
                faceVertex = dataOf<unsigned int>(object, sFaceVertex);
                faceOffset = dataOf<unsigned int>(object, sFaceOffset);
            } else if (object.hasProperty(sStrandComp)) {
                strandOffset = dataOf<unsigned int>(object, sStrandOffset);
            }
        }

        RawGeometry copied() const
        {
            RawGeometry raw;
            raw.positions = *positions;
            if (faceOffset) {
                raw.faceVertex = *faceVertex;
                raw.faceOffset = *faceOffset;
            } else if (strandOffset) {
                raw.strandOffset = *strandOffset;
            }
            return raw;
        }
    };

    /// Describes the first element that no operation can handle, after the path of the array; empty if there is none.
    std::string unusableElement(StandardArrays const& arrays)
    {
        auto const& positions = *arrays.positions;
        float3 const* const point =
            std::find_if_not(positions.begin(), positions.end(), [](float3 const& p) { return isFinite(p); });
        if (point != positions.end())
            return "/sPointPosition/sData: a coordinate of element " + std::to_string(point - positions.begin())
                + " is not finite; --lenient leaves such points out";
        if (arrays.faceOffset) {
            auto const& offset = *arrays.faceOffset;
            for (std::uint64_t face = 0; face + 1 < offset.size; ++face)
                if (offset[face + 1] - offset[face] < 3)
                    return "/sFaceOffset/sData: face " + std::to_string(face)
                        + " has fewer than three corners; --lenient leaves such faces out";
        }
        return {};
    }

    void leaveOutUnusable(StandardArrays const& arrays, std::string const& place, GeometryFile& file)
    {
        RawGeometry const raw = arrays.copied();
        UnusableElements const unusable(raw);
        if (!unusable.anyPointRemains())
            throw FileError(place + ": no point is left");
        if (arrays.faceOffset && !unusable.anyFaceRemains())
            throw FileError(place + ": no face is left");
        file.notes = unusable.describe();
        unusable.deleteFrom(raw, *file.object);
    }

    void subtractOrigin(ReadOptions const& options, GeometryFile& file)
    {
        auto const positions = dataOf<float3>(*file.object, sPointPosition);
        if ((!options.isCentered && !options.origin) || positions->empty())
            return;
        Orvan::Array<double3> wide(positions->size, Orvan::kUninitialized);
        std::transform(positions->begin(), positions->end(), wide.begin(), [](float3 const& p) {
            return double3{p.x, p.y, p.z};
        });
        double3 const origin = options.origin ? *options.origin : roundedCenterOf(*positions, wide);
        Orvan::Array<float3> moved(positions->size, Orvan::kUninitialized);
        std::transform(wide.begin(), wide.end(), moved.begin(), [&](double3 const& p) {
            return float3{static_cast<float>(p.x - origin.x), static_cast<float>(p.y - origin.y),
                static_cast<float>(p.z - origin.z)};
        });
        Orvan::MutablePtr<Object> const property =
            Orvan::MutablePtr<Object>::make(*getDataGeoProperty(*file.object, sPointPosition));
        property->setProperty(sData, Orvan::makePtr<Orvan::Array<float3>>(std::move(moved)));
        file.object->setProperty(sPointPosition, Orvan::makePtr<Object>(std::move(*property)));
        file.origin = origin;
    }

}

std::optional<Hdf5Location> hdf5LocationOf(std::filesystem::path const& path)
{
    std::string const name = path.filename().string();
    std::size_t const separator = separatorIn(name);
    if (separator != std::string::npos)
        return Hdf5Location{path.parent_path() / name.substr(0, separator), name.substr(separator + 1)};
    std::string const extension = lowerCase(path.extension().string());
    if (std::find(std::begin(kExtensions), std::end(kExtensions), extension) == std::end(kExtensions))
        return std::nullopt;
    return Hdf5Location{path, std::nullopt};
}

GeometryFile readHdf5Geometry(Hdf5Location const& location, ReadOptions const& options)
{
    std::vector<Hdf5Object> objects = readHdf5Objects(location.file,
        location.object ? Hdf5Selection::Named : Hdf5Selection::Only, location.object.value_or(""), options.onSize);
    if (objects.empty())
        throw FileError(location.file.string() + " cannot be read: the HDF5 library reports no object");
    auto& [name, object, remark] = objects.front();
    GeometryFile file;
    file.format = "HDF5, object \"" + name + "\"";
    file.object = Orvan::MutablePtr<Object>::make(*object);
    if (!validateGeometry(*file.object)) // which the commands refuse, as the validator says
        return file;
    StandardArrays const arrays(*file.object);
    std::string const place = location.file.string() + ", /" + name;
    if (std::string const element = unusableElement(arrays); !element.empty()) {
        if (!options.isLenient)
            throw FileError(place + element);
        leaveOutUnusable(arrays, place, file);
    }
    subtractOrigin(options, file);
    return file;
}

void writeHdf5Objects(
    std::vector<Hdf5Object> const& objects, std::filesystem::path const& file, WriteOptions const& options)
{
    OutputFile out(file, options.existing);
    std::filesystem::path const temporary = out.temporaryFile();
    try {
        writeHdf5With(objects, temporary, options.compression);
    } catch (std::runtime_error const& error) {
        throw FileError(file.string() + " cannot be written: " + error.what());
    }
    out.commit();
}

void writeHdf5Geometry(Object const& object, Hdf5Location const& location, WriteOptions const& options)
{
    std::string const name = location.object.value_or(kHdf5DefaultName);
    auto const key = unescapedName(name);
    if (name.empty() || !key || escapedName(*key) != name)
        throw FileError(location.file.string() + " cannot be written: \"" + name
            + "\" is not a name of an object; percent signs are escaped as %25");
    takeApart(object, location.file); // refuses what cannot be read again
    Hdf5Object const written{name, Orvan::makePtr<Object>(object), options.remark};
    std::vector<Hdf5Object> objects;
    std::error_code ignored;
    if (location.object && options.existing == Existing::Replace && std::filesystem::exists(location.file, ignored))
        objects = readHdf5Objects(location.file, Hdf5Selection::All, "", options.onSize);
    auto const same =
        std::find_if(objects.begin(), objects.end(), [&](auto const& other) { return other.name == name; });
    if (same == objects.end())
        objects.push_back(written);
    else
        *same = written;
    writeHdf5Objects(objects, location.file, options);
}

}
