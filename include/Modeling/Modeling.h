#pragma once

// All operations of the library.

#include <Modeling/removeSlivers.h>
#include <Modeling/triangulate.h>
