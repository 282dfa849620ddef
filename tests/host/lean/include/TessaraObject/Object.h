#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraObject/PropertyValue.h>

#include <map>
#include <string>

namespace Tessara {

class Object;
namespace Geometry::Internal {
    struct Access;
}

Orvan::MutablePtr<Object> createObject();

/// Objects are made by `createObject`, and copied by `makeMutable` only.
class Object {
public:
    virtual ~Object() = default;
    virtual bool hasProperty(Orvan::String const& key) const;
    virtual PropertyValue getProperty(Orvan::String const& key) const;
    virtual void operationOfTheHost1(); // operations that the library does not know
    virtual void operationOfTheHost2();
    virtual void eraseProperty(Orvan::String const& key);
    virtual void eraseAllProperties();
    virtual Orvan::Ptr<Orvan::Array<Orvan::String>> keys() const;
    virtual void operationOfTheHost3();
    virtual void setProperty(Orvan::String const& key, PropertyValue&& value);

    static bool isA(Object const& object, Object const& prototype);

    void operator=(Object const&) = delete;

private:
    friend class Orvan::MutablePtr<Object>;
    friend struct Geometry::Internal::Access;

    Object() = default;
    Object(Object const&) = default;

    std::map<std::string, PropertyValue> values_;
    unsigned int elementCount_ = 0;
    bool isComponent_ = false;
};

}

namespace Orvan::Internal {

template <class T> Ptr<T> const& getDefaultClass();
template <> Ptr<Tessara::Object> const& getDefaultClass<Tessara::Object>();

}
