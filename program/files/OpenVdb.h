#pragma once

#include <openvdb/openvdb.h>

// These are in the library: whoever makes them anew compiles twice as long.
extern template class openvdb::Grid<openvdb::FloatTree>;
extern template class openvdb::tree::Tree<openvdb::FloatTree::RootNodeType>;
