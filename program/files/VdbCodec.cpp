#include "VdbCodec.h"

#include <openvdb/io/Archive.h>
#include <openvdb/io/GridDescriptor.h>
#include <openvdb/openvdb.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <istream>
#include <limits>
#include <sstream>
#include <streambuf>

namespace ModelingProgram {

namespace {

    [[noreturn]] void refuse(std::filesystem::path const& file, std::string const& why)
    {
        throw FileError(file.string() + " cannot be read: " + why);
    }

    constexpr double kSameSize = 1e-9; // relative tolerance for rounding of equal voxel sizes

    void initializeOpenVdb()
    {
        static bool const isDone = [] {
            openvdb::initialize();
            // Metadata of types whose sizes the file could contradict is read as raw bytes.
            openvdb::Metadata::clearRegistry();
            openvdb::BoolMetadata::registerType();
            openvdb::StringMetadata::registerType();
            return true;
        }();
        static_cast<void>(isDone);
    }

    /// A stream buffer over bytes in memory.
    class ByteSource final : public std::streambuf {
    public:
        explicit ByteSource(InputFile const& file)
        {
            char* const first = file.bytes.get();
            setg(first, first, first + file.size);
        }

    private:
        pos_type seekoff(off_type offset, std::ios_base::seekdir from, std::ios_base::openmode) override
        {
            off_type const start = from == std::ios_base::beg ? 0
                : from == std::ios_base::cur                  ? gptr() - eback()
                                                              : egptr() - eback();
            off_type const target = start + offset;
            if (target < 0 || target > egptr() - eback())
                return pos_type(off_type(-1));
            setg(eback(), eback() + target, egptr());
            return pos_type(target);
        }

        pos_type seekpos(pos_type position, std::ios_base::openmode mode) override
        {
            return seekoff(off_type(position), std::ios_base::beg, mode);
        }
    };

    class GridArchive final : public openvdb::io::Archive {
    public:
        openvdb::FloatGrid::Ptr read(
            InputFile const& file, VdbGridEntry const& entry, std::vector<VdbGridEntry> const& all)
        {
            ByteSource source(file);
            std::istream stream(&source);
            stream.exceptions(std::ios::failbit | std::ios::badbit | std::ios::eofbit);
            readHeader(stream);
            setFormatVersion(stream);
            setLibraryVersion(stream);
            setDataCompression(stream);
            openvdb::FloatGrid::Ptr const grid = readAt(entry, stream);
            for (VdbGridEntry const& other : all)
                if (!entry.treeOwner.empty() && other.uniqueName == entry.treeOwner)
                    grid->setTree(readAt(other, stream)->treePtr());
            return grid;
        }

        static std::string bytesOf(openvdb::FloatGrid::ConstPtr const& grid)
        {
            std::ostringstream stream(std::ios::binary);
            stream.exceptions(std::ios::failbit | std::ios::badbit);
            GridArchive().Archive::write(stream, openvdb::GridCPtrVec{grid}, true);
            return std::move(stream).str();
        }

    private:
        static openvdb::FloatGrid::Ptr readAt(VdbGridEntry const& entry, std::istream& stream)
        {
            stream.seekg(static_cast<std::streamoff>(entry.descriptor));
            openvdb::io::GridDescriptor descriptor;
            openvdb::GridBase::Ptr const grid = descriptor.read(stream);
            descriptor.seekToGrid(stream);
            readGrid(grid, descriptor, stream);
            return openvdb::gridPtrCast<openvdb::FloatGrid>(grid);
        }
    };

    /// Refuses transforms whose voxels are not cubes along the axes.
    void takeTransform(
        openvdb::math::Transform const& transform, std::filesystem::path const& file, SparseVolume& volume)
    {
        std::string const grid = "grid \"" + volume.name + "\"";
        openvdb::Mat4d const m = transform.baseMap()->getAffineMap()->getMat4(); // translation in the last row
        double const size = m(0, 0);
        for (int row = 0; row != 4; ++row)
            for (int column = 0; column != 3; ++column)
                if (!std::isfinite(m(row, column)))
                    refuse(file, grid + " has a transform that is not finite");
        for (int row = 0; row != 3; ++row)
            for (int column = 0; column != 3; ++column)
                if (row != column && std::abs(m(row, column)) > kSameSize * std::abs(size))
                    refuse(file, grid + " is rotated or sheared. Resample it along the axes first");
        if (!(size > 0 && m(1, 1) > 0 && m(2, 2) > 0))
            refuse(file,
                grid + " is mirrored, or its voxels have no size. Resample it to voxels of a positive size first");
        if (std::abs(m(1, 1) - size) > kSameSize * size || std::abs(m(2, 2) - size) > kSameSize * size)
            refuse(file, grid + " has voxels that are not cubes. Resample it to cubic voxels first");
        volume.voxelSize = size;
        volume.translation = {m(3, 0), m(3, 1), m(3, 2)};
    }

    [[noreturn]] void refuseValue(openvdb::Coord const& at, std::filesystem::path const& file, std::string const& grid)
    {
        refuse(file,
            "voxel (" + std::to_string(at[0]) + ", " + std::to_string(at[1]) + ", " + std::to_string(at[2])
                + ") of grid \"" + grid + "\" has a value that is not finite");
    }

    void takeLeaf(openvdb::FloatTree::LeafNodeType const& leaf, std::filesystem::path const& file, SparseVolume& volume)
    {
        using Leaf = openvdb::FloatTree::LeafNodeType;
        static_assert(Leaf::DIM == 8);
        openvdb::Coord const first = leaf.origin();
        TSR::TileTree3D::VoxelCube cube{{first[0], first[1], first[2]}, {}, volume.cubeValues.size()};
        for (int k = 0; k != 8; ++k)
            for (int place = 0; place != 64; ++place) {
                openvdb::Coord const at(place % 8, place / 8, k);
                openvdb::Index const offset = Leaf::coordToOffset(at);
                if (!leaf.isValueOn(offset))
                    continue;
                float const value = leaf.getValue(offset);
                if (!std::isfinite(value))
                    refuseValue(first + at, file, volume.name);
                cube.active[static_cast<std::size_t>(k)] |= std::uint64_t{1} << place;
                volume.cubeValues.push_back(value);
            }
        if (cube.firstValue != volume.cubeValues.size())
            volume.cubes.push_back(cube);
    }

    void takeValues(openvdb::FloatGrid const& grid, std::filesystem::path const& file, SparseVolume& volume)
    {
        volume.background = grid.background();
        if (!std::isfinite(volume.background))
            refuse(file, "the background of grid \"" + volume.name + "\" is not a finite number");
        std::size_t voxelCount = 0, leafCount = 0;
        for (auto leaf = grid.tree().cbeginLeaf(); leaf; ++leaf, ++leafCount)
            voxelCount += leaf->onVoxelCount();
        volume.cubeValues.reserve(voxelCount);
        volume.cubes.reserve(leafCount);
        for (auto leaf = grid.tree().cbeginLeaf(); leaf; ++leaf)
            takeLeaf(*leaf, file, volume);
        auto at = grid.cbeginValueOn();
        at.setMaxDepth(openvdb::FloatTree::DEPTH - 2); // above leaves
        for (; at; ++at) {
            openvdb::CoordBBox const box = at.getBoundingBox();
            openvdb::Coord const first = box.min(), last = box.max();
            if (!std::isfinite(*at))
                refuseValue(first, file, volume.name);
            if (std::max({last[0], last[1], last[2]}) == std::numeric_limits<int>::max())
                refuse(file, "grid \"" + volume.name + "\" reaches beyond what indices of 32 bits can count");
            volume.boxes.push_back({{first[0], first[1], first[2]}, {last[0] + 1, last[1] + 1, last[2] + 1}, *at});
        }
    }

    openvdb::FloatGrid::Ptr makeGrid(SparseVolume const& volume)
    {
        auto const grid = openvdb::FloatGrid::create(volume.background);
        grid->setName(volume.name);
        auto const transform = openvdb::math::Transform::createLinearTransform(volume.voxelSize);
        transform->postTranslate({volume.translation[0], volume.translation[1], volume.translation[2]});
        grid->setTransform(transform);
        for (auto const& [first, end, value] : volume.boxes)
            grid->sparseFill({{first.i, first.j, first.k}, {end.i - 1, end.j - 1, end.k - 1}}, value);
        auto accessor = grid->getAccessor();
        volume.forEachVoxel([&](int i, int j, int k, float value) { accessor.setValueOn({i, j, k}, value); });
        return grid;
    }

    /// Replaces the random UUID of the file by a hash of its content, so that equal volumes give equal files.
    void identifyByContent(std::string& file)
    {
        constexpr std::size_t kIdentityAt = 21, kIdentityBytes = 36;
        std::memset(file.data() + kIdentityAt, '0', kIdentityBytes);
        std::uint64_t hashes[2] = {0xcbf29ce484222325u, 0x84222325cbf29ce4u}; // FNV-1a
        for (char const byte : file)
            for (std::uint64_t& hash : hashes)
                hash = (hash ^ static_cast<unsigned char>(byte)) * 0x100000001b3u;
        char text[kIdentityBytes + 1];
        std::snprintf(text, sizeof(text), "%08x-%04x-4%03x-8%03x-%012llx", static_cast<unsigned int>(hashes[0] >> 32),
            static_cast<unsigned int>(hashes[0] >> 16 & 0xffff), static_cast<unsigned int>(hashes[0] & 0xfff),
            static_cast<unsigned int>(hashes[1] >> 52), static_cast<unsigned long long>(hashes[1] & 0xffffffffffff));
        std::memcpy(file.data() + kIdentityAt, text, kIdentityBytes);
    }

}

void modelingReadVdb(
    InputFile const& file, VdbGridEntry const& entry, std::vector<VdbGridEntry> const& all, SparseVolume& volume)
{
    initializeOpenVdb();
    volume.name = entry.name;
    try {
        auto const grid = GridArchive().read(file, entry, all);
        takeTransform(grid->transform(), file.path, volume);
        takeValues(*grid, file.path, volume);
    } catch (FileError const&) {
        throw;
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const& error) { // from OpenVDB or the stream
        refuse(file.path, "grid \"" + volume.name + "\" is broken: " + error.what());
    }
}

void modelingWriteVdb(SparseVolume const& volume, std::string& bytes)
{
    initializeOpenVdb();
    try {
        bytes = GridArchive::bytesOf(makeGrid(volume));
    } catch (openvdb::Exception const& error) {
        throw FileError(
            "OpenVDB has no voxels of a size of " + std::to_string(volume.voxelSize) + " (" + error.what() + ")");
    }
    identifyByContent(bytes);
}

}
