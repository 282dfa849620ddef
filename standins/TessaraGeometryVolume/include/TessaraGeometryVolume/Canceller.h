#pragma once

#include <TessaraGeometryVolume/Export.h>

#include <cstdint>

namespace TSR {

/// Where loops announce to the host that they may be cancelled. This host looks at the job's own flag instead, and only
/// counts the announcements, so that tests can see whether a loop makes them.
class TESSARAGEOMETRYVOLUME_EXPORT Canceller {
public:
    /// Which kind of place in a program announces itself.
    struct ID {
        unsigned int value;
    };

    /// Called from loop bodies, from any number of threads at once; it changes nothing in `place`.
    static void cancelID(ID& place) noexcept;

    /// How often `cancelID` was called since the start or the last reset. Exact once the calling threads are joined.
    static std::uint64_t callCount() noexcept;
    static void resetCallCount() noexcept;
};

}
