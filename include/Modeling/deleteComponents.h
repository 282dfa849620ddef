#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Deletes elements of one component, with their values in everything that targets it. The order of the elements that
/// stay does not change.
///
/// - The count of the component becomes the number of elements that stay.
/// - Data properties of any of the forty element types lose the values of deleted elements. What an array holds beyond
///   the count is cut off: an offset array, with its one entry more, comes out without its last entry, and its entries
///   are those of the elements that stay, unchanged.
/// - Range properties lose the entries of deleted elements. The data that targets the range then loses the values that
///   no entry refers to any more, also when nothing was deleted, and the entries are renumbered; `kInvalidIndex` stays.
/// - Not changed: data of other types, data and ranges whose array is null or shorter than the component, and geo
///   properties of other kinds. Their length no longer fits the count.
///
/// Indices into this component that other properties hold, as `sFaceVertex` does, are not renumbered: the remap says
/// how.
///
/// \param remap      One entry an element: its new index or `kDeletedElement`, as `computeDeletedComponentMapping`
///                   makes it. May be an array of the object.
/// \param component  Name of the component, `sPointComp` for instance.
/// \param object     Any geometry object. Other holders of the object's properties and arrays see no change; arrays
///                   that nobody else holds are edited in place.
/// \pre              Kept entries of the remap count up from 0. Otherwise elements may end at other places than it
///                   says, but nothing is read or written outside the arrays. Range entries that are neither an index
///                   into the data nor `kInvalidIndex` become `kInvalidIndex` where the data has elements.
/// \return           False, with the object unchanged: the count of the component is 0 or differs from the remap's
///                   length, or there is no such component. False, without rollback: data that targets a range of the
///                   component has an element type beyond the forty, or no array, or the range has null or empty
///                   `sIndices` but data, or a data property follows one that has elements. The count and the
///                   properties in front of that range, in the order of the object's keys, are done then; and so is the
///                   data of that range in front of what was refused, while its entries keep their old numbers.
/// \throws           std::bad_alloc, with the object as it was. Job cancellation is not looked at.
///
/// Linear in the elements. Arrays that somebody else holds are compacted side by side, each on one thread, into memory
/// of the final size; the others in place, one after the other. Takes 4 bytes for each element that stays, and up to 9
/// for each value of a range's data.
MODELING_EXPORT bool deleteComponents(
    Orvan::Array<unsigned int> const& remap, Orvan::String const& component, Tessara::Object& object);

}
