#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Deletes elements of one component, with their values in all properties that target it. The order of the other
/// elements is kept.
///
/// - The count of the component becomes the number of kept elements.
/// - Data properties of any of the forty element types lose the values of deleted elements, and values beyond the
///   count. So an offset array, which has one more entry than there are elements, loses its last entry; the entries of
///   kept elements are unchanged.
/// - Range properties lose the entries of deleted elements. The data that targets the range then loses the values that
///   no entry refers to any more, even if no element was deleted, and the entries are renumbered; `kInvalidIndex` is
///   kept.
/// - Not changed: data of other types, data and ranges whose array is null or shorter than the component, and other
///   kinds of geo properties. Their length then no longer matches the count.
///
/// Indices into this component that other properties hold, as `sFaceVertex` does, are not renumbered: the caller does
/// that with the remap.
///
/// \param remap      One entry per element: its new index or `kDeletedElement`, as `computeDeletedComponentMapping`
///                   returns it. May be an array of the object.
/// \param component  Name of the component, for instance `sPointComp`.
/// \param object     Any geometry object. Other references to its properties and arrays see no change; arrays that are
///                   not shared are edited in place.
/// \pre              The new indices in the remap count up from 0. Otherwise elements may end up at other indices than
///                   it says, but nothing is read or written outside the arrays. Range entries that are neither an
///                   index into the data nor `kInvalidIndex` become `kInvalidIndex` if the data has elements.
/// \return           False, with the object unchanged: there is no such component, its count is 0, or its count differs
///                   from the remap's length. False, without rollback, if a range of the component is refused: data
///                   that targets it has no array of the forty element types; `sIndices` is null or empty, but there
///                   is data; or a data property of the range follows one that has elements. The count, the properties
///                   that precede the range in the order of the object's keys, and the range's data that precedes what
///                   was refused have then been changed, while the range itself and what follows it have not.
/// \throws           std::bad_alloc, with the object unchanged.
///
/// Linear in the number of elements. Blocks of large arrays are compacted in parallel: shared arrays into memory of the final
/// size, the others in place. Allocates a fifth of a byte per element, up to 6 per value of a range's data, and 2 MiB if it
/// compacts a large array in place.
MODELING_EXPORT bool deleteComponents(
    Orvan::Array<unsigned int> const& remap, Orvan::String const& component, Tessara::Object& object);

}
