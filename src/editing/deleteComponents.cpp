#include <Modeling/deleteComponents.h>

#include "Deletion.h"

namespace Tessara::GeometryAlgorithms {

bool deleteComponents(Orvan::Array<unsigned int> const& remap, Orvan::String const& component, Object& object)
{
    Modeling::Internal::Deletion deletion(object);
    bool const isDone = deletion.prepare(component, remap);
    deletion.commit();
    return isDone;
}

}
