#include "VdbFile.h"

#include "OutputFile.h"
#include "VdbCodec.h"
#include "VdbOutline.h"

#include <dlfcn.h>

namespace ModelingProgram {

namespace {

    /// Remains loaded until the program ends.
    struct Codec {
        Codec()
            : library(::dlopen(kVdbCodec, RTLD_NOW | RTLD_LOCAL))
        {
            if (!library)
                problem = ::dlerror();
        }

        void* library;
        std::string problem;
    };

    template <class Function> Function* codec(char const* name)
    {
        static Codec const codec;
        void* const symbol = codec.library ? ::dlsym(codec.library, name) : nullptr;
        if (!symbol)
            throw FileError("OpenVDB files can be neither read nor written: " + codec.problem);
        return reinterpret_cast<Function*>(symbol);
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
    codec<decltype(modelingReadVdb)>("modelingReadVdb")(input, entries[grid], entries, volume);
    return volume;
}

void writeVdbFile(SparseVolume const& volume, std::filesystem::path const& file, Existing existing)
{
    OutputFile out(file, existing);
    std::string bytes;
    try {
        codec<decltype(modelingWriteVdb)>("modelingWriteVdb")(volume, bytes);
    } catch (FileError const& error) {
        throw FileError(file.string() + " cannot be written: " + error.what());
    }
    out << bytes;
    out.commit();
}

}
