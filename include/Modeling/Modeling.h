#pragma once

// All operations of the library.

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/removeSlivers.h>
#include <Modeling/subdivide.h>
#include <Modeling/subdivisionSteps.h>
