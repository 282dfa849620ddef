#include "Measuring.h"
#ifdef MODELING_HAS_CGAL
#include "peers/cgalNeedles.h"
#endif

#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"

#include "support/MeshBuilder.h"

#include <Modeling/removeSlivers.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

using namespace Benchmarks;
using namespace Modeling;
using TestSupport::MeshBuilder;

namespace {

constexpr float kRatio = 0.05f;

/// A sphere with needles, 23,520 of them at 500,000 faces: each cut makes two.
MeshBuilder const& needledSphere(benchmark::State const& state)
{
    return madeOnce(sizeOf(state),
        [](std::size_t faces) { return MeshBuilder::sphereWithFaces(faces).withNeedles(faces * 1176 / 50'000); });
}

std::size_t bytesOf(std::size_t pointCount, std::size_t faceCount)
{
    return pointCount * sizeof(float3) + faceCount * 4 * sizeof(unsigned int); // corners and offsets
}

void removeSliversOfSphere(benchmark::State& state)
{
    using namespace Tessara::Geometry;
    auto const source = needledSphere(state).build();
    auto const edit = [](Tessara::Object& mesh) { Geometry::Mesh::removeSlivers(kRatio, mesh); };
    auto const result = timeOnCopies(state, *source, edit);
    countElements(state, sizeOf(state));
    Tessara::Object mesh = *source;
    countWorkingBytes(state, sizeOf(state),
        bytesOf(getElementCount(*result, sPointComp), getElementCount(*result, sFaceComp)), [&] { edit(mesh); });
}

/// The shortest edges of all faces end at one of two hubs.
void removeSliversOfWheel(benchmark::State& state)
{
    auto const source = MeshBuilder::wheel(static_cast<unsigned int>(sizeOf(state) / 2)).build();
    timeOnCopies(state, *source, [](Tessara::Object& mesh) { Geometry::Mesh::removeSlivers(0.5f, mesh); });
    countElements(state, sizeOf(state));
}

/// The face across edge k of a face.
unsigned int twinOf(PointCorners const& around, unsigned int const* corner, unsigned int face, unsigned int k)
{
    unsigned int const* const c = corner + std::size_t{3} * face;
    unsigned int const end = c[k == 2 ? 0 : k + 1];
    for (unsigned int i = around.offsets[end]; i != around.offsets[end + 1]; ++i) {
        unsigned int const other = around.corners[i];
        if (corner[other % 3 == 2 ? other - 2 : other + 1] == c[k])
            return other / 3;
    }
    return Tessara::Geometry::kInvalidIndex;
}

/// What any method needs: adjacency, normals and one measuring sweep over flat arrays.
void flatPasses(benchmark::State& state)
{
    MeshBuilder const& mesh = needledSphere(state);
    auto const faceCount = static_cast<unsigned int>(mesh.faces.size());
    unsigned int const* const corner = mesh.faces[0].data();
    float3 const* const position = mesh.points.data();
    for (auto _ : state) {
        PointCorners const around =
            cornersByPoint(static_cast<unsigned int>(mesh.points.size()), corner, std::size_t{3} * faceCount);
        auto adjacency = uninitializedArray<unsigned int>(std::uint64_t{3} * faceCount);
        auto normals = uninitializedArray<float3>(faceCount);
        auto ratios = uninitializedArray<float>(faceCount);
        parallelFor(tbb::blocked_range<unsigned int>(0, faceCount, 1), [&](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                unsigned int const* const c = corner + std::size_t{3} * face;
                for (unsigned int k = 0; k != 3; ++k)
                    adjacency[std::size_t{3} * face + k] = twinOf(around, corner, face, k);
                float3 const a = position[c[0]], b = position[c[1]], d = position[c[2]];
                normals[face] = cross(safeNormalize(b - a), safeNormalize(d - a));
                float const ab = length(b - a), bd = length(d - b), da = length(a - d);
                ratios[face] = std::min({ab, bd, da}) / std::max({ab, bd, da});
            }
        });
        benchmark::DoNotOptimize(adjacency.data);
        benchmark::DoNotOptimize(normals.data);
        benchmark::DoNotOptimize(ratios.data);
    }
    countElements(state, sizeOf(state));
}

[[maybe_unused]] bool const areRowsAdded = [] {
    Sizes const sizes{{5'000}, {50'000}, {500'000}};
    addRow("removeSlivers", sizes, removeSliversOfSphere);
    addRow("removeSlivers:hubs", sizes, removeSliversOfWheel);
    addRow("removeSlivers:flat passes", sizes, flatPasses);
    addRow("removeSlivers:memcpy", sizes, [](benchmark::State& state) {
        MeshBuilder const& mesh = needledSphere(state);
        copyBytes(state, bytesOf(mesh.points.size(), mesh.faces.size()), sizeOf(state));
    });
#ifdef MODELING_HAS_CGAL
    addRow("removeSlivers:CGAL", sizes, [](benchmark::State& state) {
        timePeer(
            state, CgalMesh(needledSphere(state)), sizeOf(state), [](CgalMesh& mesh) { mesh.removeNeedles(kRatio); });
    });
#endif
    return true;
}();

}
