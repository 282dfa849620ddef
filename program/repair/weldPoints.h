#pragma once

#include "MeshWithSources.h"

namespace ModelingProgram {

/// Merges points that are not farther apart than `distance`: in the order of the points, each is merged into the lowest
/// earlier point within that distance which was kept. So points that are kept keep their positions and properties, and
/// are farther apart than the distance. With 0 points at equal positions are merged; 0 and -0 are equal. Points that
/// are NaN or infinite are kept.
///
/// Faces then use the points that were kept, and may use one several times. Linear, on the calling thread, with 8 to 20
/// bytes per point.
/// \return the number of points that were merged into others
unsigned int weldPoints(double distance, MeshWithSources& mesh);

}
