#pragma once

#if defined(TessaraGeometry_EXPORTS)
#define TESSARAGEOMETRY_EXPORT __attribute__((visibility("default")))
#else
#define TESSARAGEOMETRY_EXPORT
#endif
