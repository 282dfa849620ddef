#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>

/// Grain sizes of parallel loops. A range of up to the grain is not divided: a loop over so few elements runs on the
/// calling thread, and the tasks of a longer one get at least half as many elements each.
///
/// With oneTBB 2021 on x86-64, starting a task takes about half a microsecond and waking up a thread takes several.
/// oneTBB first cuts a range into a few parts per thread, and divides a part further only if a thread runs out of work.
/// So a grain of 1 costs nothing in long loops and balances uneven work; larger ones keep short loops off the
/// scheduler.
namespace Modeling {

/// A small fixed amount of work per element: copy, fill or transfer a value. 1000 elements take 0.2 to a few
/// microseconds, so that a smaller task would take longer to start than to run.
inline constexpr std::size_t kElementGrain = 1000;
/// Scattered writes through a list of indices: tens of nanoseconds each if they miss the cache, so that 100 of them
/// take a few microseconds.
inline constexpr std::size_t kScatterGrain = 100;
/// A whole face: work is uneven, and refinement or removal can concentrate it in few faces.
inline constexpr unsigned int kFaceGrain = 1;
/// A point with its one-ring: uneven in the same way, most of all at points of high valence.
inline constexpr unsigned int kOneRingGrain = 1;
/// An input, a property, or a part of an array: microseconds to seconds each, and often few of them.
inline constexpr std::size_t kCoarseGrain = 1;
/// Sampling a volume at a point takes some nanoseconds once the tiles around it are known. But each task copies the
/// sampler, whose tables begin empty: 40 kilobytes to set up, and tens of tiles to look up.
inline constexpr unsigned int kSampledPointGrain = 4096;

/// Up to this many points, the calling thread has listed the corners by point before a second thread has woken up.
inline constexpr unsigned int kFewPoints = 4096;
/// The maximum number of parts of the points if each part has to read all corners: more of them gain little.
inline constexpr unsigned int kMostPointParts = 8;

namespace Internal {

    /// Copying or filling a block takes about 10 microseconds, twenty times as long as starting its task.
    inline constexpr std::size_t kBlockBytes = std::size_t{1} << 18;

    template <class T> constexpr std::size_t kBlockGrain = std::max<std::size_t>(1, kBlockBytes / sizeof(T));

}

}
