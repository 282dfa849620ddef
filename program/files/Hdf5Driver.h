#pragma once

#include "Hdf5Library.h"

namespace ModelingProgram {

/// Makes the library read and write through a plain descriptor. Its own driver looks up the real name of what it opens,
/// but a temporary file has none.
/// \throws Hdf5Error
void useDescriptors(hid_t accessProperties);

}
