#include "extendComponent.h"

#include "ArrayEdit.h"
#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"
#include "host/IndexArray.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>
#include <limits>
#include <memory>
#include <type_traits>
#include <utility>
#include <vector>

namespace Modeling::Internal {

using Tessara::Object;
using Tessara::PropertyValue;
namespace Math = Tessara::Math;
using namespace Tessara::Geometry;

namespace {

    struct Extension {
        Orvan::String const& component;
        Orvan::String const& tag; // a property of this name is replaced in the end, and not extended
        std::uint64_t oldCount;
        std::uint64_t newCount;
        NewValues const& given;
    };

    /// A property that is to be replaced by a clone with another array.
    struct Change {
        Orvan::String key;
        char const* arrayKey; // `sData` or `sIndices`
        Orvan::MutablePtr<Object> property; // has no array before the commit
        std::unique_ptr<ArrayEdit> array; // null: the property loses its array
    };

    /// Trims or extends an array to another length. An array that may be edited and has room for the new elements gets
    /// them behind its end, where nobody sees them before the commit. Otherwise they are in a copy, with the capacity
    /// that appending would give.
    template <class T> class Growth final : public ArrayEdit {
        static constexpr bool kTrivial = std::is_trivially_copyable_v<T>;
        static_assert(!kTrivial || std::is_trivially_default_constructible_v<T>, "resizing must not write");

    public:
        Growth(Orvan::Ptr<Orvan::Array<T>> source, std::uint64_t newCount, bool mayEdit)
            : source_(std::move(source))
            , newCount_(newCount)
        {
            std::uint64_t const capacity = mayEdit ? source_->capacity : source_->size;
            if (mayEdit && capacity >= newCount)
                return;
            std::uint64_t const added = newCount - std::min(source_->size, newCount);
            target_ = Orvan::MutablePtr<Orvan::Array<T>>::make();
            target_->reserve(added == 0 ? newCount : capacity + std::max(capacity, added));
            target_->resize(newCount, Orvan::kUninitialized);
            copyElements(source_->data, newCount - added, target_->data);
        }

        /// Sets all elements that the source does not have.
        void fill(T const& value)
        {
            if (source_->size >= newCount_)
                return;
            std::uint64_t const count = newCount_ - source_->size;
            if (kTrivial || target_)
                fillElements(values() + source_->size, count, value);
            else
                added_ = filledArray(count, value);
        }

        /// Sets elements, in a copy or behind the end of the source.
        void write(std::uint64_t first, Orvan::Array<T> const& elements) requires kTrivial
        {
            MODELING_ASSERT(target_ || source_->size <= first);
            copyElements(elements.data, elements.size, values() + first);
        }

        PropertyValue finish() override
        {
            if (!target_) {
                std::uint64_t const oldSize = source_->size;
                target_ = makeMutable(std::move(source_)); // does not copy: this is the last reference
                target_->resize(newCount_, Orvan::kUninitialized); // does not allocate: there is room
                std::move(added_.begin(), added_.end(), target_->data + oldSize);
            }
            MODELING_ASSERT(target_->size == newCount_);
            return Orvan::Ptr<Orvan::Array<T>>(std::move(target_));
        }

    private:
        T* values() { return target_ ? target_->data : source_->data; }

        Orvan::Ptr<Orvan::Array<T>> source_;
        std::uint64_t newCount_;
        Orvan::MutablePtr<Orvan::Array<T>> target_; // if in place, null until `finish`
        Orvan::Array<T> added_; // if in place and not trivial: elements behind the end would have to be destroyed
    };

    /// Extends one array of the object by its default, or by the given values.
    /// \param source  Besides this reference, the caller has one more.
    template <class T> std::unique_ptr<ArrayEdit> extended(Orvan::String const& name,
        Orvan::Ptr<Orvan::Array<T>> source, T const& fallback, Extension const& extension, Object const& object)
    {
        bool const isGiven = std::is_same_v<T, Math::float3> && name == extension.given.property;
        // Given values replace elements beyond the old count, which must not happen before the commit.
        bool const isOverwritten = isGiven && source->size > extension.oldCount;
        bool const isPadded = !isGiven || source->size < extension.oldCount;
        bool const mayEdit = !isOverwritten && !isShared(object, name, source, 2);
        auto growth = std::make_unique<Growth<T>>(std::move(source), extension.newCount, mayEdit);
        if (isPadded)
            growth->fill(fallback);
        if constexpr (std::is_same_v<T, Math::float3>)
            if (isGiven)
                growth->write(extension.oldCount, extension.given.values);
        return growth;
    }

    /// Null if the value is no array of a core type: an array that cannot be extended is dropped.
    std::unique_ptr<ArrayEdit> extendedData(Orvan::String const& name, PropertyValue const& data,
        PropertyValue const& defaultValue, Extension const& extension, Object const& object)
    {
        std::unique_ptr<ArrayEdit> result;
        bool matched = false;
        forEachElementType<CoreElementTypes, ArrayForm>(
            &data, &matched, [&]<class T>(Orvan::Ptr<Orvan::Array<T>>& source) {
                if (!source)
                    return false;
                T const* const fallback = defaultValue.get<T>();
                result = extended(name, std::move(source), fallback ? *fallback : T{}, extension, object);
                return true;
            });
        return result;
    }

    /// Visits clones of the geo properties of a kind that target the component: `visit(name, property)`.
    template <class Visit>
    void forEachProperty(Object const& object, Object const& prototype, Extension const& extension, Visit const& visit)
    {
        Orvan::Array<Orvan::String> const names = getGeoPropNamesByPrototype(object, prototype);
        for (Orvan::String const& name : names)
            if (!name.empty() && name != extension.tag && getGeoPropTargetName(object, name) == extension.component)
                visit(name, makeMutable(objectAt(object, name)));
    }

    void prepareData(Extension const& extension, Object const& object, std::vector<Change>& changes)
    {
        forEachProperty(object, *getDataGeoPropPrototype(sGenericDataGeoProp), extension,
            [&](Orvan::String const& name, Orvan::MutablePtr<Object>&& property) {
                PropertyValue const data = takeArray(sData, *property);
                auto array = extendedData(name, data, property->getProperty(sDefault), extension, object);
                changes.push_back({name, sData, std::move(property), std::move(array)});
            });
    }

    void prepareRanges(Extension const& extension, Object const& object, std::vector<Change>& changes)
    {
        forEachProperty(object, *getRangeGeoPropPrototype(), extension,
            [&](Orvan::String const& name, Orvan::MutablePtr<Object>&& property) {
                Orvan::Ptr<IndexArray> indices = getRangeGeoPropIndices(*property);
                if (!indices)
                    return;
                PropertyValue const taken = takeArray(sIndices, *property);
                auto array = extended(name, std::move(indices), kInvalidIndex, extension, object);
                changes.push_back({name, sIndices, std::move(property), std::move(array)});
            });
    }

    /// A boolean data property of the points that is true for the new elements.
    Orvan::MutablePtr<Object> makeTag(Extension const& extension)
    {
        Orvan::Array<bool> isNew = uninitializedArray<bool>(extension.newCount);
        fillElements(isNew.data, extension.oldCount, false);
        fillElements(isNew.data + extension.oldCount, extension.newCount - extension.oldCount, true);
        Orvan::MutablePtr<Object> tag = Tessara::createObject();
        populateTag(sPointComp, Orvan::makePtr<Orvan::Array<bool>>(std::move(isNew)), *tag);
        return tag;
    }

}

bool extendComponent(Orvan::String const& component, std::uint64_t addCount, Orvan::String const& tag,
    NewValues const& given, Object& object)
{
    std::uint64_t const oldCount = getElementCount(object, component);
    if (addCount > std::numeric_limits<unsigned int>::max() - oldCount)
        return false;
    MODELING_ASSERT(given.values.size == addCount);
    Extension const extension{component, tag, oldCount, oldCount + addCount, given};

    // The arguments may be stored in the object itself, so all of them are read before the object changes.
    PreparedWrites writes(object);
    if (!writes.setElementCount(component, static_cast<unsigned int>(extension.newCount)))
        return false;
    std::vector<Change> changes;
    prepareData(extension, object, changes);
    prepareRanges(extension, object, changes);
    if (!tag.empty())
        writes.setProperty(tag, Orvan::Ptr<Object>(makeTag(extension)));
    writes.commit();
    for (Change& change : changes)
        replaceProperty(change.key, change.arrayKey, std::move(change.property), change.array.get(), object);
    return true;
}

}
