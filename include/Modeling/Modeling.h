#pragma once

// All operations of the library.

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/StitchTemplate.h>
#include <Modeling/VoxelSampler.h>
#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/computeDeletedComponentMapping.h>
#include <Modeling/copyNonGeoProperties.h>
#include <Modeling/deleteComponents.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/mergeStrands.h>
#include <Modeling/removeSlivers.h>
#include <Modeling/smooth.h>
#include <Modeling/subdivide.h>
#include <Modeling/subdivideByVolume.h>
#include <Modeling/subdivisionSteps.h>
#include <Modeling/triangulate.h>
