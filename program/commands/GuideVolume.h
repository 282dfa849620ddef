#pragma once

#include "geometry/MeshArrays.h"
#include "shell/CommandLine.h"
#include "shell/Report.h"

#include <Modeling/VoxelSampler.h>
#include <TessaraGeometryVolume/VolumeBuilder.h>
#include <TessaraObject/Object.h>

#include <filesystem>
#include <optional>
#include <string>
#include <variant>

namespace ModelingProgram {

class MemoryLimit;
struct SparseVolume;

/// The volume that a command line asks for.
struct GuideOptions {
    std::filesystem::path file; // empty for none
    std::string grid; // empty for the only float grid there is
    int tileSide = 4; // voxels along a tile
    std::optional<float> leastValue; // stands for those below it
};

/// Adds the options to a command.
void addGuideOptions(GuideOptions& options, Command& command);

/// A grid of an OpenVDB file that scales the tolerance of a refinement.
class GuideVolume {
public:
    /// Reads the grid, and tells what is in it. A value that is not above 0 leaves faces alone, with a warning.
    /// \param limit  asked before values are read, unless it is null
    /// \throws Failure, FileError  where there is no such grid, or the library cannot hold it
    GuideVolume(GuideOptions const& options, Report& report, MemoryLimit const* limit = nullptr);

    std::string const& grid() const { return grid_; }
    /// Nothing where no value is above 0.
    std::optional<float> smallestPositiveValue() const { return smallestPositive_; }

    /// Tells how much of the mesh the volume covers.
    void tellCoverage(MeshArrays const& mesh, Report& report) const;

    /// Refines by a tolerance that the volume scales. \return how many faces are still too large, by `countLargeFaces`
    std::uint64_t refine(float tolerance, Tessara::Object& mesh) const;

private:
    void describe(SparseVolume& volume, Report& report);
    void placeOnLattice(SparseVolume& volume);
    void build(SparseVolume const& volume, int tileSide);
    template <class Traits> TSR::TileTree3D::LinearSampler<Traits> samplerOf(
        TSR::TileTree3D::Volume<Traits> const& volume, float background) const;
    template <class Visit> void visitVolume(Visit const& visit) const;
    Tessara::Math::float3 toLattice(Tessara::Math::float3 const& point) const;

    std::string grid_;
    float background_ = 0;
    std::optional<float> smallestPositive_;
    float scale_ = 1; // voxels a unit of length
    Tessara::Math::float3 shift_{0, 0, 0}; // of the voxels from whole multiples of their size
    std::variant<std::monostate, TSR::TileTree3D::Volume<TSR::TileTree3D::Traits2>,
        TSR::TileTree3D::Volume<TSR::TileTree3D::Traits5>>
        volume_; // not padded: that would double the memory for hardly any time
};

}
