#pragma once

#if defined(TessaraObject_EXPORTS)
#define TESSARAOBJECT_EXPORT __attribute__((visibility("default")))
#else
#define TESSARAOBJECT_EXPORT
#endif
