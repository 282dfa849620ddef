#pragma once

#include <OrvanCore/Export.h>

namespace Orvan {

/// Returns the freed blocks of memory that the allocator of `Array` keeps to the system.
///
/// The system clears the memory that it hands out, which can take longer than what an operation does with it. So freed
/// blocks of 4 MiB or more are kept, up to 32 of them with 256 MiB in all, and used again for blocks of about their size
/// (sizes are rounded up by at most an eighth). Blocks in use and kept ones together never exceed what has been in use at
/// one time, and the system may take the memory of kept blocks if it runs short.
///
/// The environment variable ORVAN_CACHED_MEBIBYTES, read once, sets another limit than 256; 0 keeps nothing. Blocks are also
/// returned if there is no memory for a block of 4 MiB or more, and when the process ends. With the address or the thread
/// sanitizer nothing is kept, because that would hide errors.
///
/// Any number of threads may call it at once, and use arrays meanwhile.
ORVANCORE_EXPORT void releaseCachedBlocks() noexcept;

}
