#include "shell/MemoryLimit.h"

#include "commands/GuideVolume.h"
#include "files/VdbFile.h"
#include "geometry/SurfaceBand.h"
#include "shell/Failure.h"

#include "program/TemporaryFolder.h"
#include "support/MeshBuilder.h"

#include <OrvanCppOpSDK/Job.h>
#include <TessaraGeometry/Makers.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>

namespace ModelingProgram {

using TestSupport::MeshBuilder;

TEST(MemoryLimit, FindsTheFreeMemoryOfMachineAndGroups)
{
    constexpr std::uint64_t kMegabyte = 1 << 20;
    std::map<std::string, std::string> const machine = {{"proc/meminfo", "MemTotal: 9 kB\nMemAvailable: 10240 kB\n"}};
    std::map<std::string, std::string> const first = {{"proc/self/cgroup", "5:cpu:/a\n4:cpuset,memory:/a/b\n0::/\n"},
        {"sys/fs/cgroup/memory/a/memory.limit_in_bytes", "8388608\n"},
        {"sys/fs/cgroup/memory/a/memory.usage_in_bytes", "6291456\n"},
        {"sys/fs/cgroup/memory/a/memory.stat", "cache 1\ntotal_inactive_file 1048576\n"},
        {"sys/fs/cgroup/memory/a/b/memory.limit_in_bytes", "9223372036854771712\n"},
        {"sys/fs/cgroup/memory/a/b/memory.usage_in_bytes", "6291456\n"}};
    std::map<std::string, std::string> const second = {{"proc/self/cgroup", "0::/a\n"},
        {"sys/fs/cgroup/a/memory.max", "max\n"}, {"sys/fs/cgroup/a/memory.current", "1048576\n"},
        {"sys/fs/cgroup/memory.max", "7340032\n"}, {"sys/fs/cgroup/memory.current", "8388608\n"},
        {"sys/fs/cgroup/memory.stat", "inactive_file 2097152\n"}};
    for (auto const& [groups, expected] :
        {std::pair{&machine, 10 * kMegabyte}, {&first, 3 * kMegabyte}, {&second, 1 * kMegabyte}}) {
        TestSupport::TemporaryFolder const root;
        for (auto const* const files : {&machine, groups})
            for (auto const& [name, content] : *files) {
                std::filesystem::create_directories((root / name).parent_path());
                TestSupport::store(root / name, content);
            }
        EXPECT_EQ(freeMemory(root / ""), expected);
    }
    EXPECT_GT(freeMemory(), kMegabyte);
}

TEST(MemoryLimit, RefusesBandsAndVolumesBeforeTheyAreMade)
{
    for (double const halfWidth : {1.0, 3.0, 8.0}) {
        auto const mesh = MeshBuilder::sphere(20).build();
        constexpr double kVoxelSize = 0.02;
        auto const count =
            static_cast<double>(voxelsAround(arraysOf(*mesh), {{}, {{0, 0, 0}}}, kVoxelSize, halfWidth).size());
        EXPECT_NEAR(estimateBand(arraysOf(*mesh), kVoxelSize, halfWidth).voxels / count, 1, 0.1) << halfWidth;
        EXPECT_LT(estimateBand(arraysOf(*mesh), kVoxelSize, 1000).voxels, 1e10); // the box, not 1,000 spheres
    }

    auto const single = TestSupport::MeshBuilder::icosahedron().build(); // in a much wider band
    double const wide = static_cast<double>(voxelsAround(arraysOf(*single), {}, 0.5, 40).size());
    EXPECT_NEAR(estimateBand(arraysOf(*single), 0.5, 40).voxels / wide, 1, 0.1);

    SparseVolume volume;
    for (int i = 0; i != 100'000; ++i)
        volume.voxels.push_back({i % 100, i / 100 % 100, i / 10'000, 1});
    TestSupport::TemporaryFolder const folder;
    GuideOptions options;
    options.file = folder / "guide.vdb";
    writeVdbFile(volume, options.file);
    MemoryLimit const limit(presentMemory() + (20u << 20)); // OpenVDB alone needs more
    Report report("test");
    try {
        GuideGrid const guide = readGuide(options, report, &limit);
        ADD_FAILURE() << "read in spite of the limit";
    } catch (Failure const& failure) {
        EXPECT_EQ(failure.code, ExitCode::OutOfMemory);
        EXPECT_THAT(failure.what(), testing::HasSubstr("with 100,000 single voxels would need about"));
    }
}

TEST(MemoryLimit, RefusesMemoryThatNobodyHas)
{
    constexpr std::uint64_t kMegabyte = 1'000'000;
    requireMemory(kMegabyte, "an array");
    EXPECT_THROW(requireMemory(freeMemory(), "an array"), Failure);
    MemoryLimit const limit(presentMemory() + 20 * kMegabyte);
    requireMemory(kMegabyte, "an array");
    EXPECT_THROW(requireMemory(30 * kMegabyte, "an array"), Failure);
}

TEST(MemoryLimit, BandsOfSingleFacesCanBeCancelled)
{
    auto const mesh = Tessara::Geometry::makeMesh({{0, 0, 0}, {1, 0, 0}, {0, 1, 0}}, {0, 1, 2}, {0, 3});
    std::thread canceller([] {
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
        Orvan::setJobCancelled(true);
    });
    EXPECT_THROW(voxelsAround(arraysOf(*mesh), {{}, {{0, 0, 0}}}, 1.0 / 4000, 3), Failure);
    canceller.join();
    Orvan::setJobCancelled(false);
}

}
