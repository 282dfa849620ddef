#pragma once

#if defined(TessaraGeometryVolume_EXPORTS)
#define TESSARAGEOMETRYVOLUME_EXPORT __attribute__((visibility("default")))
#else
#define TESSARAGEOMETRYVOLUME_EXPORT
#endif
