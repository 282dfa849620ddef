#pragma once

#if defined(TessaraMathSupport_EXPORTS)
#define TESSARAMATHSUPPORT_EXPORT __attribute__((visibility("default")))
#else
#define TESSARAMATHSUPPORT_EXPORT
#endif
