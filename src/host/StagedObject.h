#pragma once

#include <OrvanCore/Ptr.h>
#include <TessaraObject/Object.h>

namespace Modeling {

/// A shallow copy of an object to build a result in. The object itself changes only when the copy is published: it then
/// receives everything or, if memory runs out, nothing.
class StagedObject {
public:
    explicit StagedObject(Tessara::Object& target);

    Tessara::Object& operator*() const { return *copy_; }

    /// Gives the target all keys of the copy. Keys that were erased from the copy are kept.
    /// \throws std::bad_alloc  with the target unchanged
    void publish() const;

private:
    Tessara::Object& target_;
    Orvan::MutablePtr<Tessara::Object> copy_;
};

}
