#pragma once

// All operations of the library.

#include <Modeling/copyNonGeoProperties.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/mergeStrands.h>
#include <Modeling/removeSlivers.h>
#include <Modeling/triangulate.h>
