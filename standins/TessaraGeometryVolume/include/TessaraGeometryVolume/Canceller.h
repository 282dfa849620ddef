#pragma once

#include <TessaraGeometryVolume/Export.h>

#include <cstdint>

namespace TSR {

/// Loops announce here that they can be cancelled. This host checks the job's own flag instead and only counts the
/// announcements, so that tests can verify them.
class TESSARAGEOMETRYVOLUME_EXPORT Canceller {
public:
    /// Identifies the loop that makes the announcement.
    struct ID {
        unsigned int value;
    };

    /// Called from loop bodies, from any number of threads at once; `place` is not modified.
    static void cancelID(ID& place) noexcept;

    /// The number of calls of `cancelID` since the start or the last reset. Exact once the calling threads are joined.
    static std::uint64_t callCount() noexcept;
    static void resetCallCount() noexcept;
};

}
