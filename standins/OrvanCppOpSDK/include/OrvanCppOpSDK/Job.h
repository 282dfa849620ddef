#pragma once

#include <OrvanCppOpSDK/Export.h>

namespace Orvan {

/// Whether the host wants the running job to stop. May be called on any thread; costs one atomic load.
ORVANCPPOPSDK_EXPORT bool isJobCancelled() noexcept;

/// For the host program: asks the running job to stop, or resets the flag for the next job. May be called on any thread
/// and in signal handlers, as it takes no lock. A thread that sees the cancellation also sees what the caller wrote
/// before it.
ORVANCPPOPSDK_EXPORT void setJobCancelled(bool cancelled) noexcept;

}
