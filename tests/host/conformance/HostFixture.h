#pragma once

#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/VoxelTopology.h>

#include <memory>

/// What the tests need of a host besides the interface. Each host implements it in a source of its own, or leaves it out:
/// then the tests that need it are skipped.
namespace HostFixture {

/// Makes `Orvan::isJobCancelled` give this answer. \return false if that is not possible
bool setJobCancelled(bool cancelled);

using Traits2 = TSR::TileTree3D::Traits<2, 4, 0, 1>;
using Traits5 = TSR::TileTree3D::Traits<5, 5, 0, 1>;

template <class Traits> struct Volume {
    std::shared_ptr<void const> owner;
    TSR::TileTree3D::Container<Traits> const* container = nullptr;
    TSR::TileTree3D::Channel<Traits, float> const* channel = nullptr;
    TSR::TileTree3D::VoxelTopology const* topology = nullptr;

    explicit operator bool() const { return container; }
};

using Field = float (*)(int i, int j, int k);

/// A volume with one voxel per index unit, values `field(i, j, k)` at all voxels from -20 up to 20 along each axis, and
/// nothing else. Empty if the host cannot make one.
template <class Traits> Volume<Traits> makeVolume(Field field, unsigned int offsetType);
template <> Volume<Traits2> makeVolume(Field field, unsigned int offsetType);
template <> Volume<Traits5> makeVolume(Field field, unsigned int offsetType);

}
