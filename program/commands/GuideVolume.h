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

/// The volume given on the command line.
struct GuideOptions {
    std::filesystem::path file; // empty for none
    std::string grid; // empty for the only float grid
    int tileSide = 4; // voxels along a tile
    std::optional<float> leastValue; // replaces smaller values
};

/// Adds the options to a command.
void addGuideOptions(GuideOptions& options, Command& command);

/// A grid of an OpenVDB file that scales the tolerance of a refinement.
class GuideVolume {
public:
    /// Reads the grid and reports its contents. Warns about values that are not above 0, where faces are not refined.
    /// \param limit  checked before values are read, unless null
    /// \throws Failure, FileError  if there is no such grid, or the library cannot represent it
    GuideVolume(GuideOptions const& options, Report& report, MemoryLimit const* limit = nullptr);

    std::string const& grid() const { return grid_; }
    /// Nullopt if no value is above 0.
    std::optional<float> smallestPositiveValue() const { return smallestPositive_; }

    /// Reports how many faces of the mesh the volume covers.
    void reportCoverage(MeshArrays const& mesh, Report& report) const;

    /// Refines with the tolerance scaled by the volume. \return how many faces are still too large, as
    /// `countLargeFaces` counts
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
    float scale_ = 1; // voxels per unit of length
    Tessara::Math::float3 shift_{0, 0, 0}; // offset of the voxels from multiples of their size
    // Without halos, which would double the memory and save hardly any time.
    std::variant<std::monostate, TSR::TileTree3D::Volume<TSR::TileTree3D::Traits2>,
        TSR::TileTree3D::Volume<TSR::TileTree3D::Traits5>>
        volume_;
};

}
