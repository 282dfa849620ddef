#include "MergedComponents.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "host/GeoProperties.h"

#include <TessaraGeometry/Lookup.h>

#include <algorithm>

namespace Modeling::Internal {

void transferComponentProperties(Orvan::String const& component, Tessara::Object& source, Tessara::Object& output)
{
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = source.keys();
    for (Orvan::String const& key : *keys) {
        bool const belongs = key == component || Tessara::Geometry::getTargetComponent(source, key) == component;
        if (belongs && !key.empty())
            output.setProperty(key, source.getProperty(key));
    }
    source.eraseAllProperties();
}

void rebaseRegions(Offsets const& regionOffsets, Orvan::Array<unsigned int>& values, Offsets const& baseOffsets)
{
    // Each region belongs to one iteration. The base of the first one is 0.
    parallelFor(tbb::blocked_range<std::size_t>(1, baseOffsets.size - 1, kCoarseGrain), [&](auto const& regions) {
        for (std::size_t region = regions.begin(); region != regions.end(); ++region) {
            unsigned int const base = baseOffsets[region];
            std::size_t const end = std::min<std::size_t>(regionOffsets[region + 1], values.size);
            std::size_t const begin = std::min<std::size_t>(regionOffsets[region], end);
            // Each value is written once.
            parallelFor(tbb::blocked_range<std::size_t>(begin, end, kElementGrain),
                [data = values.data, base](auto const& elements) {
                    for (std::size_t element = elements.begin(); element != elements.end(); ++element)
                        data[element] += base;
                });
        }
    });
}

bool finishConnectivity(Connectivity const& connectivity, Offsets const& regionOffsets, Tessara::Object& output)
{
    MODELING_ASSERT(regionOffsets.size == connectivity.baseOffsets.size);
    if (!connectivity.merged)
        return false;
    if (readGeoPropData<unsigned int>(output, connectivity.name).get() == connectivity.merged.get())
        return true;
    return editGeoPropData<unsigned int>(connectivity.name, output, [&](Orvan::Array<unsigned int>& values) {
        if (connectivity.closingEntry)
            values.append(*connectivity.closingEntry);
        rebaseRegions(regionOffsets, values, connectivity.baseOffsets);
    });
}

}
