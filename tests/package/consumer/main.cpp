// A program outside the project: builds a closed mesh with two needles, and has them collapsed.

#include <Modeling/Modeling.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Validators.h>

#include <cstdio>

int main()
{
    using namespace Tessara::Geometry;

    // An octahedron; point 6 cuts its first edge close to one end.
    auto const mesh = makeMesh({{1, 0, 0}, {0, 1, 0}, {-1, 0, 0}, {0, -1, 0}, {0, 0, 1}, {0, 0, -1}, {0.99f, 0.01f, 0}},
        {0, 6, 4, 6, 1, 4, 1, 2, 4, 2, 3, 4, 3, 0, 4, 6, 0, 5, 1, 6, 5, 2, 1, 5, 3, 2, 5, 0, 3, 5},
        {0, 3, 6, 9, 12, 15, 18, 21, 24, 27, 30});
    if (auto const status = validateMesh(*mesh); !status) {
        std::printf("invalid mesh: %s\n", status.message().c_str());
        return 1;
    }
    Geometry::Mesh::removeSlivers(0.05f, *mesh);

    std::printf("%u points, %u faces\n", getElementCount(*mesh, sPointComp), getElementCount(*mesh, sFaceComp));
    return getElementCount(*mesh, sPointComp) == 6 && getElementCount(*mesh, sFaceComp) == 8 ? 0 : 1;
}
