#pragma once

#include "ArrayCompaction.h"

#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

#include <memory>
#include <vector>

namespace Tessara::GeometryAlgorithms::Internal {

/// Deletes elements of components of one object: prepared first, and then done without a failure.
class Deletion {
public:
    explicit Deletion(Object& object)
        : object_(object)
    {
    }

    // These prepare what `deleteComponents` does to one component. Where one is false, what came before the refusal is
    // prepared nevertheless: operations do that much, and do not roll back.

    bool prepare(Orvan::String const& component, Orvan::Array<bool> const& deleted);
    bool prepare(Orvan::String const& component, IndexArray const& remap);
    /// \param kept  has to live until `commit`
    bool prepare(Orvan::String const& component, KeptElements const& kept);

    // Further changes to an index array that has been prepared. What is referred to has to live until `commit`.

    void renumber(Orvan::String const& key, IndexArray const& remap);
    void renumberOffsets(Orvan::String const& key, KeptElements const& kept);

    /// Does what has been prepared. Takes no memory with a host that replaces values of present keys without taking
    /// any.
    void commit();

private:
    struct Count {
        Orvan::String component;
        unsigned int count;
    };
    struct Change {
        Orvan::String key;
        char const* arrayKey; // `sData` or `sIndices`
        Orvan::MutablePtr<Object> property; // replaces the present one, and has no array yet
        std::unique_ptr<ArrayCompaction> array;
    };

    template <class Entries> bool prepareEntries(Orvan::String const& component, Entries const& entries);
    bool prepareRange(Orvan::String const& name, Orvan::MutablePtr<Object>&& range, KeptElements const& kept);
    template <class Types> bool prepareArray(
        Orvan::String const& key, char const* arrayKey, Orvan::MutablePtr<Object>&& property, KeptElements const& kept);
    ArrayCompaction* arrayAt(Orvan::String const& key);
    void fillArrays();

    Object& object_;
    std::vector<Count> counts_;
    std::vector<Change> changes_;
    // What the changes point to.
    std::vector<std::unique_ptr<KeptElements>> kept_;
    std::vector<std::unique_ptr<IndexArray>> remaps_;
};

}
