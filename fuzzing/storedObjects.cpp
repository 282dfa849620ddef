#include "Files.h"

#include "files/Hdf5File.h"
#include "files/VdbFile.h"

#include <cstring>
#include <string_view>

// OpenVDB files, and HDF5 files with their outlines. The outline of an HDF5 file comes from the HDF5 library in a process
// of its own, and may be nonsense if the file is broken.

namespace Fuzzing {

namespace {

    constexpr char kVdbMagic[] = " BDV";

    void readVolume(std::filesystem::path const& file)
    {
        constexpr std::uint64_t kMostVoxels = 1 << 20;
        try {
            std::size_t const count = listVdbGrids(file).size();
            for (std::size_t grid = 0; grid != std::min<std::size_t>(count, 4); ++grid) {
                SparseVolume const volume = readVdbGrid(file, grid, [](VdbGridSize const& size) {
                    if (size.activeVoxels > kMostVoxels)
                        throw FileError("file is too large");
                });
                std::uint64_t voxels = 0;
                volume.forEachVoxel([&](int, int, int, float value) {
                    ++voxels;
                    require(std::isfinite(value), "values are finite");
                });
                require(voxels == volume.voxels.size() + volume.cubeValues.size(), "each voxel has a value");
            }
        } catch (FileError const& error) {
            require(std::string_view(error.what()).find("file") != std::string_view::npos, "a refusal names the file");
        }
    }

    /// The length of the outline, the outline, and the file.
    void readOutlined(std::string_view content)
    {
        std::uint16_t length = 0;
        if (content.size() < sizeof(length))
            return;
        std::memcpy(&length, content.data(), sizeof(length));
        content.remove_prefix(sizeof(length));
        std::string_view const outline = content.substr(0, length);
        content.remove_prefix(outline.size());
        auto const& file = storedFile(reinterpret_cast<std::uint8_t const*>(content.data()), content.size());
        try {
            for (Hdf5Object const& object : readOutlinedObjects(outline, file, readOptions(false).onSize))
                sameContents(*object.object, *deepCopy(*object.object));
        } catch (FileError const& error) {
            require(std::string_view(error.what()).find("file") != std::string_view::npos, "a refusal names the file");
        }
    }

}

}

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size)
{
    using namespace Fuzzing;
    std::string_view const content(reinterpret_cast<char const*>(data), size);
    if (content.starts_with(kVdbMagic))
        readVolume(storedFile(data, size));
    else
        readOutlined(content);
    return 0;
}
