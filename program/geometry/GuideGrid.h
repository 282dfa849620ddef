#pragma once

#include "MeshArrays.h"
#include "files/VdbFile.h"

#include <Modeling/VoxelSampler.h>
#include <TessaraGeometryVolume/VolumeBuilder.h>
#include <TessaraObject/Object.h>

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <variant>

namespace ModelingProgram {

/// The values of a volume: of its active voxels, and with the background.
struct ValueRange {
    float least = 0; // of the active voxels
    float most = 0;
    float leastOfAll = 0;
    std::optional<float> leastPositive; // of all; nullopt if no value is above 0
};

/// A volume that scales the tolerance of a refinement.
class GuideGrid {
public:
    /// \param volume      its values and voxels are modified
    /// \param leastValue  replaces smaller values
    /// \param tileSide    voxels along a tile, 4 or 5
    /// \throws Failure  if a value is NaN, or if the library cannot represent the volume
    GuideGrid(SparseVolume& volume, std::optional<float> leastValue, int tileSide);

    std::string const& grid() const { return grid_; }
    float background() const { return background_; }
    ValueRange const& range() const { return range_; }

    /// How many faces of the mesh the volume covers.
    std::uint64_t countCovered(MeshArrays const& mesh) const;

    /// The values at points, as a refinement reads them.
    /// \pre  as many values as points
    void sample(std::span<float3 const> points, std::span<float> values) const;

    /// Refines with the tolerance scaled by the volume. \return how many faces are still too large, as
    /// `countLargeFaces` counts
    std::uint64_t refine(float tolerance, Tessara::Object& mesh) const;

private:
    void placeOnLattice(SparseVolume& volume);
    void build(SparseVolume const& volume, int tileSide);
    template <class Traits> TSR::TileTree3D::LinearSampler<Traits> samplerOf(
        TSR::TileTree3D::Volume<Traits> const& volume, float background) const;
    template <class Visit> void visitVolume(Visit const& visit) const;
    float3 toLattice(float3 const& point) const;

    std::string grid_;
    float background_ = 0;
    ValueRange range_;
    float scale_ = 1; // voxels per unit of length
    float3 shift_{0, 0, 0}; // offset of the voxels from multiples of their size
    // Without halos, which would double the memory and save hardly any time.
    std::variant<std::monostate, TSR::TileTree3D::Volume<TSR::TileTree3D::Traits2>,
        TSR::TileTree3D::Volume<TSR::TileTree3D::Traits5>>
        volume_;
};

}
