#pragma once

#if defined(Modeling_EXPORTS)
#define MODELING_EXPORT __attribute__((visibility("default")))
#else
#define MODELING_EXPORT
#endif

// A private member of an exported class.
#define MODELING_NO_EXPORT __attribute__((visibility("hidden")))
