#pragma once

// Exports a symbol from the library. Empty in code that only uses the library.
#if defined(Modeling_EXPORTS)
#define MODELING_EXPORT __attribute__((visibility("default")))
#else
#define MODELING_EXPORT
#endif

// Hides a member of an exported class from the dynamic symbol table.
#define MODELING_NO_EXPORT __attribute__((visibility("hidden")))
