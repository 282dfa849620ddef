#include <OrvanCore/UntypedTypeRep.h>
#include <TessaraObject/Object.h>

#include <cstddef>
#include <limits>
#include <new>

namespace Orvan::Internal {

void* UntypedTypeRep::allocate(std::uint64_t count) const
{
    if (count == 0)
        return nullptr;
    constexpr std::uint64_t kMostBytes = std::numeric_limits<std::ptrdiff_t>::max();
    if (count > kMostBytes / elementSize)
        throw std::bad_alloc();
    return ::operator new(count* elementSize, std::align_val_t(elementAlignment));
}

void UntypedTypeRep::deallocate(void* pointer, std::uint64_t) const noexcept
{
    ::operator delete(pointer, std::align_val_t(elementAlignment));
}

template <> Ptr<Tessara::Object> const& getDefaultClass<Tessara::Object>()
{
    static Ptr<Tessara::Object> const instance = Tessara::createObject();
    return instance;
}

}

namespace Tessara {

Orvan::MutablePtr<Object> createObject()
{
    return Orvan::MutablePtr<Object>::make();
}

bool Object::hasProperty(Orvan::String const& key) const
{
    return values_.contains(key.c_str());
}

PropertyValue Object::getProperty(Orvan::String const& key) const
{
    auto const found = values_.find(key.c_str());
    return found == values_.end() ? PropertyValue() : found->second;
}

void Object::operationOfTheHost1()
{
}
void Object::operationOfTheHost2()
{
}
void Object::operationOfTheHost3()
{
}

void Object::eraseProperty(Orvan::String const& key)
{
    if (auto const found = values_.find(key.c_str()); found != values_.end())
        values_.erase(found);
}

void Object::eraseAllProperties()
{
    values_.clear();
}

Orvan::Ptr<Orvan::Array<Orvan::String>> Object::keys() const
{
    auto names = Orvan::MutablePtr<Orvan::Array<Orvan::String>>::make();
    for (auto const& [key, value] : values_)
        names->append(key.c_str());
    return names;
}

void Object::setProperty(Orvan::String const& key, PropertyValue&& value)
{
    values_[key.c_str()] = std::move(value);
}

bool Object::isA(Object const& object, Object const& prototype)
{
    if (prototype.isComponent_ || object.isComponent_)
        return prototype.isComponent_ == object.isComponent_;
    for (auto const& [key, value] : prototype.values_)
        if (!object.hasProperty(key.c_str()))
            return false;
    return true;
}

}
