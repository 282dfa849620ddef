#pragma once

#include "GeometryBuilder.h"
#include "PlyHeader.h"

namespace ModelingProgram {

/// Reads the elements of a binary file in blocks, in parallel, if they have a common layout: all lists of a property
/// have the same length, or the only lists are the point indices of faces. The uses and targets of the properties must
/// have been set. Lists other than the indices are only found, and read by `copyEqualLists`.
/// \return the end of the elements in the file. Nullopt if they must be read one by one, because the layout is another
///         one or because something may be wrong with them; nothing has been added to the builder then.
std::optional<std::size_t> readPlyRecords(
    PlyElement& element, std::size_t begin, bool swapsBytes, InputFile const& file, GeometryBuilder& builder);

/// Copies the values of all lists, which have the type of the property, one after another.
void copyEqualLists(PlyProperty const& property, InputFile const& file, std::byte* target);

}
