#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

#include <memory>
#include <vector>

namespace Tessara::GeometryAlgorithms::Internal {

using IndexArray = Orvan::Array<unsigned int>;

/// The elements that stay, of as many as there were.
struct KeptElements {
    std::uint64_t oldCount;
    IndexArray sources; // for each element that stays its old index; ascending
};

/// What becomes of the entries of an index array: entry e turns to `(*remap)[e]`, or to `outside` where the remap has no
/// such entry. Without a remap they stay.
struct Renumbering {
    IndexArray const* remap = nullptr;
    unsigned int outside = 0;

    unsigned int operator()(unsigned int entry) const { return entry < remap->size ? (*remap)[entry] : outside; }
};

/// One array on its way to a shorter one.
class ArrayCompaction {
public:
    virtual ~ArrayCompaction() = default;
    /// Fills the new array, where there is one and where that cannot fail: on any thread.
    virtual void fill() = 0;
    /// The compacted array, after the object has let go of the old one. Takes no memory.
    virtual PropertyValue finish() = 0;
    /// For index arrays. The remap has to live until `finish`.
    virtual void renumber(Renumbering const&) { }
    /// For index arrays that are longer than their component: adds an entry at the end.
    virtual void close(unsigned int) { }
};

/// Deletes elements of components of one object: prepared first, and then done without a failure.
class Deletion {
public:
    explicit Deletion(Object& object)
        : object_(object)
    {
    }

    /// Prepares what `deleteComponents` does to one component; the elements are given by flags or by a remap. Nothing of
    /// the arguments is needed afterwards. Where this is false, what came before the refusal is prepared nevertheless:
    /// operations do it, and do not roll back.
    bool prepare(Orvan::String const& component, Orvan::Array<bool> const& deleted);
    bool prepare(Orvan::String const& component, IndexArray const& remap);

    /// Further changes to an index array that has been prepared. The remap has to live until `commit`.
    void renumber(Orvan::String const& key, Renumbering const& renumbering);
    void close(Orvan::String const& key, unsigned int lastEntry);

    /// Does what has been prepared. Takes no memory with a host that replaces values of present keys without taking any.
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

    template <class Entries> bool prepareComponent(Orvan::String const& component, Entries const& entries);
    bool prepareRange(Orvan::String const& name, Orvan::MutablePtr<Object>&& range, KeptElements const& kept);
    template <class Types> bool prepareArray(Orvan::String const& key, char const* arrayKey,
        Orvan::MutablePtr<Object>&& property, KeptElements const& kept, Renumbering const& renumbering = {});
    void fillArrays();

    Object& object_;
    std::vector<Count> counts_;
    std::vector<Change> changes_;
    // What the changes point to.
    std::vector<std::unique_ptr<KeptElements>> kept_;
    std::vector<std::unique_ptr<IndexArray>> remaps_;
};

}
