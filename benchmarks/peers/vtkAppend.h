#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <TessaraObject/Object.h>

#include <memory>

namespace Benchmarks {

/// VTK's filter that appends polygonal data, with all arrays of points and faces. Corners have no arrays there: the
/// texture coordinates of meshes are not among them.
class VtkAppend {
public:
    explicit VtkAppend(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs);
    ~VtkAppend();

    void run() const;
    std::size_t pointCount() const;
    std::size_t faceCount() const;

private:
    struct Inputs;
    std::unique_ptr<Inputs> inputs_;
};

}
