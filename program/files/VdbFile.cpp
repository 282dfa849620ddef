#include "VdbFile.h"

#include "CodecModule.h"
#include "OutputFile.h"
#include "VdbCodec.h"
#include "VdbOutline.h"

namespace ModelingProgram {

namespace {

    template <class Function> Function* vdbFunction(char const* name)
    {
        static CodecModule const module(kVdbCodec, "OpenVDB");
        return module.function<Function>(name);
    }

}

std::uint64_t SparseVolume::activeCount() const
{
    std::uint64_t count = voxels.size() + cubeValues.size();
    for (auto const& [first, end, value] : boxes)
        count += static_cast<std::uint64_t>(std::int64_t{end.i} - first.i)
            * static_cast<std::uint64_t>(std::int64_t{end.j} - first.j)
            * static_cast<std::uint64_t>(std::int64_t{end.k} - first.k);
    return count;
}

std::vector<VdbGrid> listVdbGrids(std::filesystem::path const& file)
{
    std::vector<VdbGrid> grids;
    for (VdbGridEntry& entry : readVdbOutline(InputFile(file)))
        grids.push_back({std::move(entry.name), std::move(entry.type)});
    return grids;
}

SparseVolume readVdbGrid(
    std::filesystem::path const& file, std::size_t grid, std::function<void(VdbGridSize const&)> const& onSize)
{
    InputFile const input(file);
    std::vector<VdbGridEntry> const entries = readVdbOutline(input);
    if (grid >= entries.size() || entries[grid].type != "float")
        throw FileError(file.string() + " cannot be read: there is no such float grid");
    onSize(checkVdbFloatGrid(input, entries[grid], entries));
    SparseVolume volume;
    vdbFunction<decltype(modelingReadVdb)>("modelingReadVdb")(input, entries[grid], entries, volume);
    return volume;
}

void writeVdbFile(SparseVolume const& volume, std::filesystem::path const& file, Existing existing)
{
    OutputFile out(file, existing);
    std::string bytes;
    try {
        vdbFunction<decltype(modelingWriteVdb)>("modelingWriteVdb")(volume, bytes);
    } catch (FileError const& error) {
        throw FileError(file.string() + " cannot be written: " + error.what());
    }
    out << bytes;
    out.commit();
}

}
