#include "HostFixture.h"

#include "src/LeanJob.h"

namespace HostFixture {

bool setJobCancelled(bool cancelled)
{
    LeanHost::setJobCancelled(cancelled);
    return true;
}

namespace {

    template <class Traits> struct Parts {
        TSR::TileTree3D::Container<Traits> container;
        TSR::TileTree3D::Channel<Traits, float> channel;
        TSR::TileTree3D::VoxelTopology topology;
    };

    template <class Traits> Volume<Traits> build(Field field, unsigned int offsetType, int side, int depth)
    {
        auto const parts =
            std::make_shared<Parts<Traits>>(Parts<Traits>{{}, {}, TSR::TileTree3D::VoxelTopology(offsetType)});
        for (int k = -20; k < 20; k += side)
            for (int j = -20; j < 20; j += side)
                for (int i = -20; i < 20; i += side) {
                    auto const [index, tileDepth] = parts->container.add(i, j, k, depth);
                    std::vector<float>& values = parts->channel.values[{tileDepth, index}];
                    for (int voxel = 0; voxel < side * side * side; ++voxel)
                        values.push_back(field(i + voxel % side, j + voxel / side % side, k + voxel / side / side));
                }
        return {parts, &parts->container, &parts->channel, &parts->topology};
    }

}

template <> Volume<Traits2> makeVolume(Field field, unsigned int offsetType)
{
    return build<Traits2>(field, offsetType, 4, 28);
}

template <> Volume<Traits5> makeVolume(Field field, unsigned int offsetType)
{
    return build<Traits5>(field, offsetType, 5, 12);
}

}
