#include "commands/GuideVolume.h"

#include "files/VdbFile.h"
#include "shell/Failure.h"

#include "support/MeshBuilder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

namespace ModelingProgram {

namespace {

    using Tessara::Math::float3;
    using TestSupport::MeshBuilder;

    /// A guide read from a file to which a volume was written.
    GuideGrid throughFile(SparseVolume const& volume, Report& report, GuideOptions options = {})
    {
        options.file = std::filesystem::path(testing::TempDir()) / "modeling-guide.vdb";
        writeVdbFile(volume, options.file);
        return readGuide(options, report);
    }

    /// Fine where x is above 0, half as boxes and half as voxels, on a lattice with an offset in voxels.
    SparseVolume halfSpace(double voxelSize, std::array<double, 3> const& shift)
    {
        SparseVolume volume;
        volume.name = "half";
        volume.voxelSize = voxelSize;
        volume.background = 1;
        for (std::size_t axis = 0; axis != 3; ++axis)
            volume.translation[axis] = shift[axis] * voxelSize;
        auto const most = static_cast<int>(2 / voxelSize);
        auto const firstOf = [&](double coordinate, std::size_t axis) {
            return static_cast<int>(std::ceil(coordinate / voxelSize - shift[axis]));
        };
        int const i0 = firstOf(0, 0), j0 = firstOf(-2, 1), middle = firstOf(0, 1), k0 = firstOf(-2, 2);
        volume.boxes.push_back({{i0, j0, k0}, {i0 + most, middle, k0 + 2 * most}, 0.25f});
        for (int i = i0; i != i0 + most; ++i)
            for (int j = middle; j != middle + most; ++j)
                for (int k = k0; k != k0 + 2 * most; ++k)
                    volume.voxels.push_back({i, j, k, 0.25f});
        return volume;
    }

    /// Half the longest side of the boxes of faces with all corners in a slab along x.
    float toleranceIn(float low, float high, MeshArrays const& mesh)
    {
        float largest = 0;
        for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
            auto const at = [&](std::size_t corner) { return (*mesh.positions)[mesh.corners(face)[corner]]; };
            auto const sizeAlong = [&](float float3::*axis) {
                auto const [least, most] = std::minmax({at(0).*axis, at(1).*axis, at(2).*axis});
                return most - least;
            };
            auto const [least, most] = std::minmax({at(0).x, at(1).x, at(2).x});
            if (least >= low && most <= high)
                largest = std::max({largest, sizeAlong(&float3::x), sizeAlong(&float3::y), sizeAlong(&float3::z)});
        }
        return largest / 2;
    }

}

TEST(GuideVolume, ScalesTheToleranceAtThePositionsInTheFile)
{
    auto const sphere = MeshBuilder::sphereWithFaces(2000).build();
    float const before = toleranceIn(-2, 2, arraysOf(*sphere));
    for (int const tileSide : {4, 5})
        for (auto const& shift : {std::array{0.0, 0.0, 0.0}, {0.4, -0.7, 12.5}, {1000.25, 0.5, -0.5}}) {
            SCOPED_TRACE(testing::Message() << tileSide << " " << shift[0]);
            GuideOptions options;
            options.tileSide = tileSide;
            Report report("test");
            GuideGrid const guide = throughFile(halfSpace(0.05, shift), report, options);
            reportCoverage(guide, arraysOf(*sphere), report);
            EXPECT_EQ(report.document["warnings"].size(), 0);
            EXPECT_NEAR(
                report.document["volume"]["coveredFaces"].get<double>() / arraysOf(*sphere).faceCount(), 0.5, 0.1);
            Tessara::Object refined = *sphere;
            guide.refine(before, refined);
            EXPECT_LE(toleranceIn(0.1f, 2, arraysOf(refined)), before * 0.25f);
            EXPECT_GT(toleranceIn(-2, -0.3f, arraysOf(refined)), before * 0.5f);
        }
}

TEST(GuideVolume, RefusesWhatItCannotRepresent)
{
    struct Case {
        char const* message;
        SparseVolume volume;
    };
    SparseVolume far, huge;
    far.translation = {3e9, 0, 0};
    far.voxels = {{0, 0, 0, 1}};
    huge.voxelSize = 1e39;
    for (Case const& c : {Case{"more than 32 bits can count", far}, {"single precision cannot hold", huge}}) {
        Report report("test");
        try {
            throughFile(c.volume, report);
            ADD_FAILURE() << c.message;
        } catch (Failure const& failure) {
            EXPECT_EQ(failure.code, ExitCode::Refused);
            EXPECT_THAT(failure.what(), testing::HasSubstr(c.message));
        }
    }
    SparseVolume mixed;
    mixed.name = "mixed";
    for (float const background : {1.0f, 0.0f, -1.0f}) {
        Report report("test");
        mixed.background = background;
        mixed.voxels = {{0, 0, 0, 0.0f}};
        EXPECT_EQ(throughFile(mixed, report).range().leastPositive.has_value(), background > 0);
        EXPECT_EQ(report.document["warnings"].size(), 1) << background;
    }
}

}
