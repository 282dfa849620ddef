#pragma once

#include <OrvanCore/Ptr.h>
#include <TessaraObject/Object.h>

namespace Modeling {

/// A shallow copy of an object, in which an operation builds its result. The object itself changes only when the copy
/// is published: it then receives everything or, if memory runs out, nothing.
class StagedObject {
public:
    explicit StagedObject(Tessara::Object& target);

    Tessara::Object& operator*() const { return *copy_; }

    /// Sets all keys of the copy in the target. Keys that were erased from the copy remain in the target.
    /// \throws std::bad_alloc  with the target unchanged
    void publish() const;

private:
    Tessara::Object& target_;
    Orvan::MutablePtr<Tessara::Object> copy_;
};

}
