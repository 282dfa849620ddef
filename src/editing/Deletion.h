#pragma once

#include "ArrayCompaction.h"
#include "host/GeoPropertyKind.h"

#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

#include <memory>
#include <vector>

namespace Modeling::Internal {

/// Marks the values, out of `length`, that no kept entry refers to.
/// \param indices  One per element that `kept` knows, or more; indices of no value are ignored.
Orvan::Array<bool> findUnused(std::uint64_t length, IndexArray const& indices, KeptElements const& kept);

/// Deletes elements of components of one object. All changes are prepared first, so that an operation that runs out of
/// memory leaves the object unchanged.
class Deletion {
public:
    explicit Deletion(Tessara::Object& object)
        : object_(object)
    {
    }

    // These prepare what `deleteComponents` does to one component. If one returns false, the changes up to the refusal
    // stay prepared: operations commit them, and do not roll back.

    bool prepare(Orvan::String const& component, Orvan::Array<bool> const& deleted);
    bool prepare(Orvan::String const& component, IndexArray const& remap);
    /// \param kept  Must live until `commit`.
    bool prepare(Orvan::String const& component, KeptElements const& kept);

    // Further changes to an index array that has been prepared. The arguments must live until `commit`.

    void renumber(Orvan::String const& key, IndexArray const& remap);
    void renumberOffsets(Orvan::String const& key, KeptElements const& kept);

    /// Makes the prepared changes. Nothing is allocated once the first one is made, provided that the host does not
    /// allocate to replace the value of a present key.
    /// \throws std::bad_alloc  if oneTBB runs out of memory while arrays are filled, with the object unchanged
    void commit();

private:
    struct Count {
        Orvan::String component;
        unsigned int count;
    };
    struct Change {
        Orvan::String key;
        char const* arrayKey; // `sData` or `sIndices`
        Orvan::MutablePtr<Tessara::Object> property; // replaces the present one; has no array before the commit
        std::unique_ptr<ArrayCompaction> array;
    };

    template <class Entries> bool prepareEntries(Orvan::String const& component, Entries const& entries);
    bool prepareRange(Orvan::String const& name, Orvan::MutablePtr<Tessara::Object>&& range, KeptElements const& kept);
    template <class Types> bool prepareArray(Orvan::String const& key, char const* arrayKey,
        Orvan::MutablePtr<Tessara::Object>&& property, KeptElements const& kept);
    ArrayCompaction* arrayAt(Orvan::String const& key);

    Tessara::Object& object_;
    GeoPropertyClassifier const classifier_;
    std::vector<Count> counts_;
    std::vector<Change> changes_;
    // Owned here because the changes refer to them.
    std::vector<std::unique_ptr<KeptElements>> kept_;
    std::vector<std::unique_ptr<IndexArray>> remaps_;
    CompactionBuffer buffer_; // of arrays that are compacted in place
};

}
