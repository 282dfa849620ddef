#include <TessaraObject/Object.h>

#include <algorithm>
#include <functional>
#include <string_view>

namespace Tessara {

namespace {

    constexpr std::size_t kFewKeys = 8; // up to here comparing all keys is faster than hashing one

    std::size_t hashOf(Orvan::String const& key)
    {
        return std::hash<std::string_view>()(key.view());
    }

    bool lacksAll(Object const& object, PropertyValue const& excluded)
    {
        auto const* const names = excluded.get<Orvan::Ptr<Orvan::Array<Orvan::String>>>();
        return !names || !*names || std::none_of((*names)->begin(), (*names)->end(), [&](Orvan::String const& name) {
            return object.hasProperty(name);
        });
    }

    bool valueConforms(PropertyValue const& value, PropertyValue const& wanted)
    {
        if (wanted.empty())
            return true;
        auto const* const wantedObject = wanted.get<Orvan::Ptr<Object>>();
        if (!wantedObject)
            return value.type() == wanted.type();
        auto const* const object = value.get<Orvan::Ptr<Object>>();
        return object && *object && (!*wantedObject || Object::isA(**object, **wantedObject));
    }

}

// The slot that holds the key, or the free slot where it would go.
std::size_t Object::slotOf(Orvan::String const& key) const
{
    std::size_t const mask = slots_.size() - 1;
    std::size_t slot = hashOf(key) & mask;
    while (slots_[slot] != 0 && entries_[slots_[slot] - 1].key != key)
        slot = (slot + 1) & mask;
    return slot;
}

Object::Entry const* Object::find(Orvan::String const& key) const
{
    if (slots_.empty()) {
        auto const entry = std::find_if(entries_.begin(), entries_.end(), [&](Entry const& e) { return e.key == key; });
        return entry == entries_.end() ? nullptr : &*entry;
    }
    std::uint32_t const number = slots_[slotOf(key)];
    return number == 0 ? nullptr : &entries_[number - 1];
}

void Object::rebuildSlots(std::size_t slotCount)
{
    slots_.assign(slotCount, 0);
    for (std::size_t entry = 0; slotCount != 0 && entry < entries_.size(); ++entry)
        slots_[slotOf(entries_[entry].key)] = static_cast<std::uint32_t>(entry + 1);
}

bool Object::hasProperty(Orvan::String const& key) const
{
    return find(key) != nullptr;
}

PropertyValue Object::getProperty(Orvan::String const& key) const
{
    Entry const* const entry = find(key);
    return entry ? entry->value : PropertyValue();
}

void Object::eraseProperty(Orvan::String const& key)
{
    Entry const* const entry = find(key);
    if (!entry)
        return;
    entries_.erase(entries_.begin() + (entry - entries_.data()));
    rebuildSlots(slots_.size()); // the same number of slots: takes no memory
}

void Object::eraseAllProperties()
{
    entries_.clear();
    slots_.clear();
}

Orvan::Ptr<Orvan::Array<Orvan::String>> Object::keys() const
{
    auto names = Orvan::MutablePtr<Orvan::Array<Orvan::String>>::make(entries_.size());
    for (std::size_t entry = 0; entry < entries_.size(); ++entry)
        (*names)[entry] = entries_[entry].key;
    return names;
}

void Object::setProperty(Orvan::String const& key, PropertyValue&& value)
{
    if (Entry const* const present = find(key)) {
        entries_[static_cast<std::size_t>(present - entries_.data())].value = std::move(value);
        return;
    }
    std::size_t const count = entries_.size() + 1;
    entries_.push_back({key, PropertyValue()});
    try {
        if (count > kFewKeys && slots_.size() < 2 * count)
            rebuildSlots(std::max(4 * kFewKeys, 2 * slots_.size()));
        else if (!slots_.empty())
            slots_[slotOf(key)] = static_cast<std::uint32_t>(count);
    } catch (...) {
        entries_.pop_back();
        throw;
    }
    entries_.back().value = std::move(value);
}

bool Object::isA(Object const& object, Object const& prototype)
{
    // Values are looked at in place: a copy of a `Ptr` would have all threads write the count of one shared prototype.
    return std::all_of(prototype.entries_.begin(), prototype.entries_.end(), [&](Entry const& wanted) {
        if (wanted.key == kExcludedKeys)
            return lacksAll(object, wanted.value);
        Entry const* const entry = object.find(wanted.key);
        return entry && valueConforms(entry->value, wanted.value);
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
