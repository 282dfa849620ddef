#include "SettledFaces.h"

#include "frame/Arrays.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <new>
#include <vector>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace {

    struct Counts {
        std::uint64_t keptFaces = 0, keptCorners = 0, splitFaces = 0, emitted = 0;

        Counts& operator+=(Counts const& other)
        {
            keptFaces += other.keptFaces;
            keptCorners += other.keptCorners;
            splitFaces += other.splitFaces;
            emitted += other.emitted;
            return *this;
        }
    };

    EdgeFate fateNextTo(unsigned char neighbor, unsigned int level)
    {
        if (!isSplit(neighbor))
            return EdgeFate::third;
        if (levelOf(neighbor) > level)
            return EdgeFate::gateFlip;
        return levelOf(neighbor) == level ? EdgeFate::flip : EdgeFate::nothing;
    }

    EdgeFates fatesOf(SettledFaces const& faces, unsigned int face)
    {
        EdgeFates fates{};
        for (unsigned int edge = 0; edge != 3; ++edge)
            if (unsigned int const twin = faces.twins[face][edge]; twin != kInvalidIndex)
                fates.set(edge, fateNextTo(faces.states[faceOfTwin(twin)], levelOf(faces.states[face])));
        return fates;
    }

    constexpr unsigned int kFacesPerBlock = 4096;

    /// Calls `work(block, first, last)` for blocks of faces, in parallel.
    template <class Work> void forEachFaceBlock(unsigned int faceCount, Work const& work)
    {
        unsigned int const blockCount = faceCount / kFacesPerBlock + (faceCount % kFacesPerBlock != 0);
        // `work` writes what belongs to its block.
        parallelFor(tbb::blocked_range<unsigned int>(0, blockCount, 1), [&](auto const& blocks) {
            for (unsigned int block = blocks.begin(); block != blocks.end(); ++block) {
                unsigned int const first = block * kFacesPerBlock;
                work(block, first, first + std::min(kFacesPerBlock, faceCount - first));
            }
        });
    }

    /// Settles the fates of edges.
    /// \return the counts of the faces before each block, and the total
    std::vector<Counts> countFaces(SettledFaces& faces)
    {
        std::vector<Counts> counts(faces.count / kFacesPerBlock + std::size_t{2});
        forEachFaceBlock(faces.count, [&](unsigned int block, unsigned int first, unsigned int last) {
            Counts sum;
            for (unsigned int face = first; face != last; ++face) {
                unsigned char const state = faces.states[face];
                if (!isSplit(state)) {
                    ++sum.keptFaces;
                    sum.keptCorners += faces.size(face);
                } else if (isSplitAroundPoint(state)) {
                    ++sum.splitFaces;
                    faces.fates[face] = fatesOf(faces, face);
                    sum.emitted += faces.fates[face].emitted();
                }
            }
            counts[block] = sum;
        });
        Counts sum;
        for (Counts& count : counts) {
            Counts const own = count;
            count = sum;
            sum += own;
        }
        return counts;
    }

    unsigned int fitted(std::uint64_t count)
    {
        if (count > std::numeric_limits<unsigned int>::max())
            throw std::bad_alloc();
        return static_cast<unsigned int>(count);
    }

}

void numberFaces(SettledFaces& faces)
{
    faces.fates = uninitializedArray<EdgeFates>(faces.count);
    std::vector<Counts> const before = countFaces(faces);
    Counts const& total = before.back();
    faces.keptFaceCount = fitted(total.keptFaces);
    faces.keptCornerCount = fitted(total.keptCorners);
    faces.emittedCount = fitted(total.emitted);
    faces.numbers = uninitializedArray<unsigned int>(faces.count);
    if (faces.halfEdges)
        faces.keptCorners = uninitializedArray<unsigned int>(faces.count);
    faces.splitFaces = uninitializedArray<unsigned int>(total.splitFaces);
    faces.emittedOffsets = uninitializedArray<unsigned int>(total.splitFaces);

    forEachFaceBlock(faces.count, [&](unsigned int block, unsigned int first, unsigned int last) {
        auto kept = static_cast<unsigned int>(before[block].keptFaces);
        auto keptCorner = static_cast<unsigned int>(before[block].keptCorners);
        auto rank = static_cast<unsigned int>(before[block].splitFaces);
        auto emitted = static_cast<unsigned int>(before[block].emitted);
        for (unsigned int face = first; face != last; ++face) {
            unsigned char const state = faces.states[face];
            if (!isSplit(state)) {
                faces.numbers[face] = kept++;
                if (faces.halfEdges) {
                    faces.keptCorners[face] = keptCorner;
                    keptCorner += faces.size(face);
                }
            } else if (isSplitAroundPoint(state)) {
                faces.numbers[face] = rank;
                faces.splitFaces[rank] = face;
                faces.emittedOffsets[rank++] = emitted;
                emitted += faces.fates[face].emitted();
            }
        }
    });
}

}
