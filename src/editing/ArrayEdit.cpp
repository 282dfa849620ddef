#include "ArrayEdit.h"

namespace Modeling::Internal {

using Tessara::Object;
using Tessara::PropertyValue;

PropertyValue takeArray(char const* arrayKey, Object& property)
{
    PropertyValue array = property.getProperty(arrayKey);
    property.setProperty(arrayKey, PropertyValue());
    return array;
}

void replaceProperty(Orvan::String const& key, char const* arrayKey, Orvan::MutablePtr<Object>&& property,
    ArrayEdit* edit, Object& object)
{
    object.setProperty(key, Orvan::Ptr<Object>()); // releases the old array, so that it can be edited in place
    property->setProperty(arrayKey, edit ? edit->finish() : PropertyValue());
    object.setProperty(key, Orvan::Ptr<Object>(std::move(property)));
}

}
