#include "HostFixture.h"

#include <OrvanCppOpSDK/Job.h>
#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <vector>

namespace HostFixture {

bool setJobCancelled(bool cancelled)
{
    Orvan::setJobCancelled(cancelled);
    return true;
}

namespace {

    template <class Traits> Volume<Traits> build(Field field, unsigned int offsetType)
    {
        std::vector<float> values;
        for (int k = -20; k < 20; ++k)
            for (int j = -20; j < 20; ++j)
                for (int i = -20; i < 20; ++i)
                    values.push_back(field(i, j, k));
        auto const built = std::make_shared<TSR::TileTree3D::Volume<Traits> const>(
            TSR::TileTree3D::buildVolume<Traits>({.offsetType = offsetType,
                .depth = Traits::kUnitDepth,
                .block = {{-20, -20, -20}, {40, 40, 40}, values.data()}}));
        return {built, &built->container, &built->channel, &built->topology};
    }

}

template <> Volume<Traits2> makeVolume(Field field, unsigned int offsetType)
{
    return build<Traits2>(field, offsetType);
}

template <> Volume<Traits5> makeVolume(Field field, unsigned int offsetType)
{
    return build<Traits5>(field, offsetType);
}

}
