#include "StagedObject.h"

#include "GeoProperties.h"

namespace Modeling {

using Tessara::Object;

StagedObject::StagedObject(Object& target)
    : target_(target)
    , copy_(Tessara::createObject())
{
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = target.keys();
    for (Orvan::String const& key : *keys)
        copy_->setProperty(key, target.getProperty(key));
}

void StagedObject::publish() const
{
    PreparedWrites writes(target_);
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = copy_->keys();
    for (Orvan::String const& key : *keys)
        writes.setProperty(key, copy_->getProperty(key));
    writes.commit();
}

}
