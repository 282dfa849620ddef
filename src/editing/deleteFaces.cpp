#include <Modeling/deleteFaces.h>

#include "Deletion.h"
#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "host/MeshArrays.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>
#include <atomic>
#include <optional>
#include <utility>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Tessara::Geometry;
using Modeling::Internal::Deletion;
using Modeling::Internal::KeptElements;

namespace {

    /// A run of a few faces takes nanoseconds.
    constexpr std::size_t kFaceWordGrain = kElementGrain / 8;

    /// What the deletion of faces means for all elements.
    struct FaceElements {
        KeptElements faces, corners, points;
    };

    bool fitsCounts(MeshArrays const& arrays, Object const& mesh)
    {
        return arrays.faceOffset && arrays.faceVertex && arrays.faceOffset->size == std::uint64_t{arrays.faceCount} + 1
            && arrays.faceVertex->size >= arrays.cornerCount && getGeoPropTargetName(mesh, sFaceOffset) == sFaceComp
            && getGeoPropTargetName(mesh, sFaceVertex) == sFaceVertexComp;
    }

    /// Sets ranges of bits that other threads may set too. Ascending ranges in one word need one access to it.
    class BitSetter {
    public:
        explicit BitSetter(std::uint64_t* words)
            : words_(words)
        {
        }
        BitSetter(BitSetter const&) = delete;
        BitSetter& operator=(BitSetter const&) = delete;
        ~BitSetter() { store(); }

        void set(std::uint64_t first, std::uint64_t end)
        {
            for (std::uint64_t bit = first; bit < end;) {
                if (bit / kBits != word_) {
                    store();
                    word_ = bit / kBits;
                }
                std::uint64_t const wordEnd = std::min(end, (word_ + 1) * kBits), count = wordEnd - bit;
                bits_ |= (~std::uint64_t{0} >> (kBits - count)) << bit % kBits;
                bit = wordEnd;
            }
        }

    private:
        static constexpr std::uint64_t kBits = KeptElements::kWordBits;

        void store()
        {
            if (bits_ != 0)
                std::atomic_ref<std::uint64_t>(words_[word_]).fetch_or(bits_, std::memory_order_relaxed);
            bits_ = 0;
        }

        std::uint64_t* words_;
        std::uint64_t word_ = 0;
        std::uint64_t bits_ = 0; // of that word, not stored yet
    };

    /// The corners of kept faces. Offsets may decrease or lead too far.
    KeptElements findKeptCorners(KeptElements const& faces, IndexArray const& faceOffset, unsigned int cornerCount)
    {
        auto bits = zeroedArray<std::uint64_t>(KeptElements::wordsFor(cornerCount));
        unsigned int const* const offset = faceOffset.data;
        // Words that two threads share are set atomically.
        parallelFor(tbb::blocked_range<std::size_t>(0, faces.wordCount(), kFaceWordGrain), [&](auto const& words) {
            BitSetter corners(bits.data);
            faces.visitRuns(words.begin(), words.end(), [&](std::uint64_t first, std::uint64_t, std::uint64_t count) {
                if (isNonDecreasing(offset + first, count + 1))
                    corners.set(offset[first], std::min(offset[first + count], cornerCount));
                else
                    for (std::uint64_t face = first; face != first + count; ++face)
                        corners.set(offset[face], std::min(offset[face + 1], cornerCount));
            });
        });
        return KeptElements(cornerCount, std::move(bits));
    }

    /// Returns nullopt if the index arrays do not fit the mesh.
    std::optional<FaceElements> findFaceElements(Orvan::Array<bool> const& deleted, Object const& mesh)
    {
        MeshArrays const arrays = readMeshArrays(mesh); // released before the deletion, which may then edit in place
        if (!fitsCounts(arrays, mesh))
            return std::nullopt;
        KeptElements faces(deleted);
        KeptElements corners = findKeptCorners(faces, *arrays.faceOffset, arrays.cornerCount);
        KeptElements points(findUnused(arrays.pointCount, *arrays.faceVertex, corners));
        return FaceElements{std::move(faces), std::move(corners), std::move(points)};
    }

    /// Prepares points, then corners, then faces. An index array is renumbered only after its whole component has been
    /// prepared: if that is refused, the array keeps its old indices.
    bool prepareDeletion(FaceElements const& elements, IndexArray const& pointRemap, Deletion& deletion)
    {
        if (!deletion.prepare(sPointComp, elements.points) || !deletion.prepare(sFaceVertexComp, elements.corners))
            return false;
        deletion.renumber(sFaceVertex, pointRemap);
        if (!deletion.prepare(sFaceComp, elements.faces))
            return false;
        deletion.renumberOffsets(sFaceOffset, elements.corners);
        return true;
    }

}

bool deleteFaces(Orvan::Array<bool> const& deleted, Object& mesh)
{
    if (!Object::isA(mesh, *getMeshPrototype()) || deleted.size != getElementCount(mesh, sFaceComp))
        return false;
    std::optional<FaceElements> const elements = findFaceElements(deleted, mesh);
    if (!elements)
        return false;
    IndexArray const pointRemap = elements->points.remap();
    Deletion deletion(mesh);
    bool const isDone = prepareDeletion(*elements, pointRemap, deletion);
    deletion.commit();
    return isDone;
}

}
