#include "FileSupport.h"
#include "VdbFile.h"

#include <openvdb/io/File.h>
#include <openvdb/io/Stream.h>
#include <openvdb/openvdb.h>

#include <sstream>

namespace ModelingProgram {

/// Asked by the leak checker. OpenVDB leaks partially read nodes if a stream ends among them, and its logger what belongs to
/// the first thread.
extern "C" char const* __lsan_default_suppressions()
{
    return "leak:libopenvdb\nleak:liblog4cplus";
}

namespace {

    using openvdb::Coord;
    using openvdb::CoordBBox;
    using openvdb::FloatGrid;
    using openvdb::math::Transform;
    using testing::HasSubstr;

    /// The bytes of a file written by OpenVDB.
    void write(std::filesystem::path const& file, openvdb::GridPtrVec const& grids,
        std::uint32_t compression = openvdb::io::COMPRESS_BLOSC | openvdb::io::COMPRESS_ACTIVE_MASK)
    {
        openvdb::initialize();
        openvdb::io::File out(file.string());
        out.setCompression(compression);
        out.write(grids);
    }

    FloatGrid::Ptr makeGrid(char const* name)
    {
        openvdb::initialize();
        FloatGrid::Ptr const grid = FloatGrid::create(2.0f);
        grid->setName(name);
        grid->setTransform(Transform::createLinearTransform(0.25));
        grid->transform().postTranslate({10, -0.125, 0});
        return grid;
    }

    /// Active voxels, active tiles of 8³ and 128³ voxels, and inactive voxels that differ from the background.
    FloatGrid::Ptr makeVariedGrid(char const* name)
    {
        FloatGrid::Ptr const grid = makeGrid(name);
        Random random(1);
        for (int i = -9; i != 9; ++i)
            for (int j = 0; j != 5; ++j)
                grid->tree().setValueOn(Coord(i, j * j, -i), static_cast<float>(random.below(64)) * 0.25f);
        grid->tree().setValueOff(Coord(1, 2, 0), 5.0f);
        grid->tree().setValueOff(Coord(1, 3, 0), -5.0f);
        grid->sparseFill(CoordBBox(Coord(64), Coord(95)), 0.5f);
        grid->sparseFill(CoordBBox(Coord(-256, 0, 0), Coord(-129, 127, 127)), 0.75f);
        return grid;
    }

    using Boxes = std::map<std::array<int, 6>, float>; // by their first and last voxels

    void expectSame(SparseVolume const& volume, FloatGrid const& grid)
    {
        Boxes expected, found;
        for (auto at = grid.cbeginValueOn(); at; ++at) {
            Coord const first = at.getBoundingBox().min(), last = at.getBoundingBox().max();
            expected[{first[0], first[1], first[2], last[0], last[1], last[2]}] = *at;
        }
        volume.forEachVoxel([&](int i, int j, int k, float value) { found[{i, j, k, i, j, k}] = value; });
        for (auto const& [first, end, value] : volume.boxes)
            found[{first.i, first.j, first.k, end.i - 1, end.j - 1, end.k - 1}] = value;
        EXPECT_TRUE(found == expected);
        EXPECT_EQ(volume.cubeValues.size() + volume.boxes.size(), expected.size());
        EXPECT_EQ(volume.activeCount(), grid.activeVoxelCount());
        EXPECT_EQ(volume.background, grid.background());
        openvdb::Vec3d const place = grid.indexToWorld(Coord(3, -4, 5));
        EXPECT_DOUBLE_EQ(place[0], 3 * volume.voxelSize + volume.translation[0]);
        EXPECT_DOUBLE_EQ(place[1], -4 * volume.voxelSize + volume.translation[1]);
        EXPECT_DOUBLE_EQ(place[2], 5 * volume.voxelSize + volume.translation[2]);
    }

    std::string refusalOfGrid(std::filesystem::path const& file, std::size_t grid = 0)
    {
        try {
            readVdbGrid(file, grid);
        } catch (FileError const& error) {
            EXPECT_THAT(error.what(), HasSubstr(file.string()));
            return error.what();
        }
        return {};
    }

    TEST(VdbFile, ReadsWhatOpenVdbWrites)
    {
        TemporaryFolder const folder;
        std::filesystem::path const file = folder / "a.vdb";
        for (bool const isHalf : {false, true})
            for (std::uint32_t compression = 0; compression != 8; ++compression) {
                SCOPED_TRACE(testing::Message() << isHalf << " " << compression);
                FloatGrid::Ptr const grid = makeVariedGrid("a");
                grid->setSaveFloatAsHalf(isHalf);
                FloatGrid::Ptr const same = openvdb::gridPtrCast<FloatGrid>(grid->copyGrid()); // shares the tree
                same->setName("a");
                FloatGrid::Ptr const empty = FloatGrid::create();
                empty->setTransform(grid->transformPtr());
                auto const bools = openvdb::GridBase::createGrid("Tree_bool_5_4_3");
                auto const vectors = openvdb::GridBase::createGrid("Tree_vec3s_5_4_3");
                write(file, {bools, grid, vectors, same, empty}, compression);
                std::vector<VdbGrid> const grids = listVdbGrids(file);
                ASSERT_EQ(grids.size(), 5);
                EXPECT_EQ(grids[0].type + grids[1].type + grids[2].type, "boolfloatvec3s");
                EXPECT_EQ(grids[1].name + grids[3].name, "a[0]a[1]");
                expectSame(readVdbGrid(file, 1), *grid);
                expectSame(readVdbGrid(file, 3), *same);
                expectSame(readVdbGrid(file, 4), *empty);
                EXPECT_THAT(refusalOfGrid(file, 0), HasSubstr("no such float grid"));
            }
    }

    TEST(VdbFile, IsReadByOpenVdb)
    {
        TemporaryFolder const folder;
        write(folder / "a.vdb", {makeVariedGrid("guide")});
        SparseVolume const volume = readVdbGrid(folder / "a.vdb", 0);
        writeVdbFile(volume, folder / "b.vdb");
        writeVdbFile(volume, folder / "c.vdb");
        EXPECT_EQ(contentOf(folder / "b.vdb"), contentOf(folder / "c.vdb"));
        openvdb::initialize();
        openvdb::io::File in((folder / "b.vdb").string());
        in.open();
        auto const grid = openvdb::gridPtrCast<FloatGrid>(in.readGrid("guide"));
        ASSERT_TRUE(grid);
        expectSame(volume, *grid);
        expectSame(readVdbGrid(folder / "b.vdb", 0), *grid);
        SparseVolume tiny;
        tiny.voxelSize = 1e-9;
        EXPECT_THROW(writeVdbFile(tiny, folder / "b.vdb"), FileError);
        EXPECT_EQ(contentOf(folder / "b.vdb"), contentOf(folder / "c.vdb"));
        EXPECT_EQ(folder.entryCount(), 3); // no temporary file is left
    }

    TEST(VdbFile, SaysWhyAGridIsRefused)
    {
        TemporaryFolder const folder;
        std::filesystem::path const file = folder / "a.vdb";
        float const nan = std::numeric_limits<float>::quiet_NaN();
        struct Case {
            char const* message;
            std::function<void(FloatGrid&)> change;
        };
        openvdb::Mat4d sheared = openvdb::Mat4d::identity();
        sheared(1, 0) = 0.5;
        openvdb::BBoxd const box({0, 0, 0}, {10, 10, 10});
        for (Case const& c :
            std::vector<Case>{{"rotated or sheared", [](FloatGrid& grid) { grid.transform().preRotate(0.5); }},
                {"rotated or sheared",
                    [&](FloatGrid& grid) { grid.setTransform(Transform::createLinearTransform(sheared)); }},
                {"not cubes", [](FloatGrid& grid) { grid.transform().preScale(openvdb::Vec3d(1, 1, 1.001)); }},
                {"mirrored", [](FloatGrid& grid) { grid.transform().preScale(openvdb::Vec3d(1, -1, 1)); }},
                {"frustum",
                    [&](FloatGrid& grid) { grid.setTransform(Transform::createFrustumTransform(box, 0.5, 10)); }},
                {"voxel (1, -2, 3)", [&](FloatGrid& grid) { grid.tree().setValueOn(Coord(1, -2, 3), nan); }},
                {"voxel (64, 0, 0)",
                    [&](FloatGrid& grid) {
                        grid.sparseFill({{64, 0, 0}, {71, 7, 7}}, nan);
                    }},
                {"the background", [&](FloatGrid& grid) { grid.tree().root().setBackground(nan, false); }}}) {
            FloatGrid::Ptr const grid = makeGrid("a");
            c.change(*grid);
            write(file, {grid});
            EXPECT_THAT(refusalOfGrid(file), HasSubstr(c.message));
        }
        std::ostringstream stream(std::ios::binary);
        openvdb::io::Stream(stream).write(openvdb::GridPtrVec{makeGrid("a")});
        store(file, stream.str());
        EXPECT_THAT(refusalOfGrid(file), HasSubstr("written as a stream"));
        store(file, "ply\nformat ascii 1.0\n");
        EXPECT_THAT(refusalOfGrid(file), HasSubstr("not an OpenVDB file"));
        EXPECT_THAT(refusalOfGrid(folder / "missing.vdb"), HasSubstr("no such file"));
    }

    TEST(VdbFile, IsRefusedIfItIsCutOff)
    {
        TemporaryFolder const folder;
        write(folder / "a.vdb", {makeVariedGrid("a")});
        std::string const whole = contentOf(folder / "a.vdb");
        for (std::size_t length = 0; length < whole.size(); length += length < 1000 ? 1 : 37) {
            store(folder / "b.vdb", whole.substr(0, length));
            EXPECT_NE(refusalOfGrid(folder / "b.vdb"), "") << length;
        }
    }

    TEST(VdbFile, WithOtherBytesIsReadOrRefused)
    {
        constexpr int kFilesEach = 600;
        TemporaryFolder const folder;
        std::filesystem::path const file = folder / "a.vdb";
        Random random(1);
        for (std::uint32_t const compression : {2u, 3u, 6u}) {
            write(file, {makeVariedGrid("a"), makeGrid("b")}, compression);
            std::string const whole = contentOf(file);
            for (int i = 0; i != kFilesEach; ++i) {
                std::string broken = whole;
                // Half of them before the values.
                std::size_t const end = i % 2 == 0 ? whole.size() : std::min<std::size_t>(whole.size(), 2000);
                broken[random.below(end)] ^= static_cast<char>(1 << random.below(8));
                broken[random.below(end)] = static_cast<char>(random.below(256));
                store(file, broken);
                refusalOfGrid(file);
            }
        }
    }

}

}
