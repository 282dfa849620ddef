#pragma once

#if defined(Modeling_EXPORTS)
#define MODELING_EXPORT __attribute__((visibility("default")))
#else
#define MODELING_EXPORT
#endif
