#pragma once

#if defined(TessaraSpatial_EXPORTS)
#define TESSARASPATIAL_EXPORT __attribute__((visibility("default")))
#else
#define TESSARASPATIAL_EXPORT
#endif
