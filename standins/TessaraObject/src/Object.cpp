#include <TessaraObject/Object.h>

#include <algorithm>
#include <array>
#include <functional>
#include <string_view>

namespace Tessara {

namespace {

    constexpr std::size_t kFewKeys = 16; // up to here, comparing all keys is faster than hashing one

    /// As `==`. Keys of equal length mostly differ in their last character, and comparing that inline is faster.
    bool isSame(std::string_view a, std::string_view b)
    {
        return a.size() == b.size() && (a.empty() || (a.back() == b.back() && a == b));
    }

    bool valueConforms(PropertyValue const& value, PropertyValue const& prototype)
    {
        if (prototype.empty())
            return true;
        auto const* const prototypeObject = prototype.get<Orvan::Ptr<Object>>();
        if (!prototypeObject)
            return value.type() == prototype.type();
        auto const* const object = value.get<Orvan::Ptr<Object>>();
        return object && *object && (!*prototypeObject || Object::isA(**object, **prototypeObject));
    }

}

// Inline because lookups dominate, and calls to members of an exported class go through the procedure linkage table.

// The slot of the key, or the free slot to insert it into.
inline std::size_t Object::slotOf(std::string_view key) const
{
    std::size_t const mask = slots_.size() - 1;
    std::size_t slot = std::hash<std::string_view>()(key) & mask;
    while (slots_[slot] != 0 && !isSame(entries_[slots_[slot] - 1].key.view(), key))
        slot = (slot + 1) & mask;
    return slot;
}

inline Object::Entry const* Object::find(std::string_view key) const
{
    if (slots_.empty()) {
        for (Entry const& entry : entries_)
            if (isSame(entry.key.view(), key))
                return &entry;
        return nullptr;
    }
    std::uint32_t const slot = slots_[slotOf(key)];
    return slot == 0 ? nullptr : &entries_[slot - 1];
}

void Object::rebuildSlots(std::size_t slotCount)
{
    slots_.assign(slotCount, 0);
    for (std::size_t entry = 0; slotCount != 0 && entry < entries_.size(); ++entry)
        slots_[slotOf(entries_[entry].key.view())] = static_cast<std::uint32_t>(entry + 1);
}

bool Object::hasProperty(Orvan::String const& key) const
{
    return find(key.view()) != nullptr;
}

PropertyValue Object::getProperty(Orvan::String const& key) const
{
    Entry const* const entry = find(key.view());
    return entry ? entry->value : PropertyValue();
}

PropertyValue const* Object::findProperty(std::string_view key) const
{
    Entry const* const entry = find(key);
    return entry ? &entry->value : nullptr;
}

void Object::eraseProperty(Orvan::String const& key)
{
    Entry const* const entry = find(key.view());
    if (!entry)
        return;
    entries_.erase(entries_.begin() + (entry - entries_.data()));
    rebuildSlots(slots_.size()); // does not allocate: the number of slots is the same
}

void Object::eraseAllProperties()
{
    entries_.clear();
    slots_.clear();
}

// Level by level: first all objects, then their entries, then what these refer to. The cache misses of a level overlap.
void Object::prefetchHeldObjects() const
{
    std::array<Object const*, kFewKeys> objects;
    std::size_t count = 0;
    for (Entry const& entry : entries_) {
        auto const* const held = entry.value.get<Orvan::Ptr<Object>>();
        if (!held || !*held)
            continue;
        if (count == objects.size())
            break;
        held->prefetch();
        objects[count++] = held->get();
    }
    auto const forEachEntry = [&](auto const& visit) {
        for (std::size_t object = 0; object != count; ++object) {
            std::vector<Entry> const& entries = objects[object]->entries_;
            std::for_each_n(entries.begin(), std::min(entries.size(), kFewKeys), visit);
        }
    };
    forEachEntry([](Entry const& entry) {
        __builtin_prefetch(&entry.key);
        __builtin_prefetch(&entry.value);
    });
    forEachEntry([](Entry const& entry) { entry.value.prefetch(); });
}

Orvan::Ptr<Orvan::Array<Orvan::String>> Object::keys() const
{
    prefetchHeldObjects();
    auto names = Orvan::MutablePtr<Orvan::Array<Orvan::String>>::make(entries_.size());
    for (std::size_t entry = 0; entry < entries_.size(); ++entry)
        (*names)[entry] = entries_[entry].key;
    return names;
}

void Object::setProperty(Orvan::String const& key, PropertyValue&& value)
{
    if (Entry const* const present = find(key.view())) {
        entries_[static_cast<std::size_t>(present - entries_.data())].value = std::move(value);
        return;
    }
    std::size_t const count = entries_.size() + 1;
    entries_.push_back({key, PropertyValue()});
    try {
        if (count > kFewKeys && slots_.size() < 2 * count)
            rebuildSlots(std::max(4 * kFewKeys, 2 * slots_.size()));
        else if (!slots_.empty())
            slots_[slotOf(key.view())] = static_cast<std::uint32_t>(count);
    } catch (...) {
        entries_.pop_back();
        throw;
    }
    entries_.back().value = std::move(value);
}

bool Object::isA(Object const& object, Object const& prototype)
{
    // Values are read in place: copying them would make all threads write the reference counts of shared prototypes.
    constexpr std::string_view kExcluded = kExcludedKeys;
    auto const lacksAll = [&](PropertyValue const& excluded) {
        if (auto const* const values = excluded.get<Orvan::Ptr<Object>>(); values && *values)
            return std::none_of((*values)->entries_.begin(), (*values)->entries_.end(), [&](Entry const& forbidden) {
                Entry const* const entry = object.find(forbidden.key.view());
                return entry && valueConforms(entry->value, forbidden.value);
            });
        auto const* const names = excluded.get<Orvan::Ptr<Orvan::Array<Orvan::String>>>();
        return !names || !*names || std::none_of((*names)->begin(), (*names)->end(), [&](Orvan::String const& name) {
            return object.find(name.view());
        });
    };
    return std::all_of(prototype.entries_.begin(), prototype.entries_.end(), [&](Entry const& required) {
        if (required.key.view() == kExcluded)
            return lacksAll(required.value);
        Entry const* const entry = object.find(required.key.view());
        return entry && valueConforms(entry->value, required.value);
    });
}

Orvan::MutablePtr<Object> createObject()
{
    return Orvan::MutablePtr<Object>::make();
}

}

namespace Orvan::Internal {

template <> Ptr<Tessara::Object> const& getDefaultClass<Tessara::Object>()
{
    static Ptr<Tessara::Object> const instance = Tessara::createObject();
    return instance;
}

}
