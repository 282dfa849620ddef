#pragma once

#include <OrvanCppOpSDK/Export.h>

namespace Orvan {

/// Whether the host wants the running job to stop. Any thread may ask; it costs one load.
ORVANCPPOPSDK_EXPORT bool isJobCancelled() noexcept;

/// For the host program: asks the running job to stop, or lets the next one run. Any thread may call it, and so may a
/// signal handler: it takes no lock. Whoever sees the job cancelled also sees what the caller wrote before.
ORVANCPPOPSDK_EXPORT void setJobCancelled(bool cancelled) noexcept;

}
