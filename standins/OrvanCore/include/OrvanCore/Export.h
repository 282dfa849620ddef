#pragma once

#if defined(OrvanCore_EXPORTS)
#define ORVANCORE_EXPORT __attribute__((visibility("default")))
#else
#define ORVANCORE_EXPORT
#endif
