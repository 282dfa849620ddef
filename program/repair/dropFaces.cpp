#include "dropFaces.h"

#include "frame/ParallelFor.h"
#include "geometry/EdgeSides.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <atomic>
#include <cstdint>

namespace ModelingProgram {

namespace {

    using Indices = Orvan::Array<unsigned int>;

    /// The corners of a face that remain without repetitions and spikes.
    class Outline {
    public:
        void trim(MeshArrays const& mesh, unsigned int face)
        {
            unsigned int const* const pointAt = mesh.faceVertex->data;
            auto const areEqual = [=](unsigned int a, unsigned int b) { return pointAt[a] == pointAt[b]; };
            corners_.clear();
            for (unsigned int corner = (*mesh.faceOffset)[face]; corner != (*mesh.faceOffset)[face + 1]; ++corner) {
                if (!corners_.empty() && areEqual(corners_.back(), corner))
                    continue;
                if (corners_.size() >= 2 && areEqual(corners_[corners_.size() - 2], corner))
                    corners_.pop_back();
                else
                    corners_.push_back(corner);
            }
            // The same across the end.
            first_ = 0;
            for (bool isDone = false; !isDone && size() >= 2;) {
                if (areEqual(corners_[first_], corners_.back())) {
                    corners_.pop_back();
                } else if (size() >= 3 && areEqual(corners_[first_ + 1], corners_.back())) {
                    ++first_;
                    corners_.pop_back();
                } else if (size() >= 3 && areEqual(corners_[corners_.size() - 2], corners_[first_])) {
                    corners_.pop_back();
                } else {
                    isDone = true;
                }
            }
        }

        std::size_t size() const { return corners_.size() - first_; }
        std::span<unsigned int const> corners() const { return std::span(corners_).subspan(first_); }

    private:
        std::vector<unsigned int> corners_;
        std::size_t first_ = 0;
    };

    /// Whether a face has nothing to trim; if not sure, false.
    bool isClean(MeshArrays const& mesh, unsigned int face)
    {
        std::span<unsigned int const> const points = mesh.corners(face);
        std::size_t const count = points.size();
        if (count == 3)
            return points[0] != points[1] && points[1] != points[2] && points[2] != points[0];
        bool isClean = count > 2;
        for (std::size_t i = 0; isClean && i != count; ++i) {
            std::size_t const after = i + 1 == count ? 0 : i + 1;
            isClean = points[i] != points[after] && points[i] != points[after + 1 == count ? 0 : after + 1];
        }
        return isClean;
    }

    bool areClean(MeshArrays const& mesh)
    {
        std::atomic<bool> result = true;
        // Only reads.
        Modeling::parallelFor(tbb::blocked_range<unsigned int>(0, mesh.faceCount(), 10'000), [&](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                if (!isClean(mesh, face))
                    result.store(false, std::memory_order_relaxed);
        });
        return result;
    }

    /// A face as listed at its lowest point, the start of a form that does not depend on its first corner or direction.
    struct FaceKey {
        std::uint64_t hash; // of its points, from the lowest one towards the lower of its neighbors
        unsigned int start; // the corner at the lowest point
        bool isBackward; // the lower neighbor is before it
        friend auto operator<=>(FaceKey const&, FaceKey const&) = default;
    };

    /// Walks the points of a face in the direction of its key.
    class KeyWalk {
    public:
        KeyWalk(MeshArrays const& mesh, unsigned int face, FaceKey const& key)
            : points_(mesh.corners(face))
            , place_(key.start - (*mesh.faceOffset)[face])
            , isBackward_(key.isBackward)
        {
        }
        std::size_t size() const { return points_.size(); }
        unsigned int next()
        {
            unsigned int const point = points_[place_];
            if (isBackward_)
                place_ = place_ == 0 ? points_.size() - 1 : place_ - 1;
            else
                place_ = place_ + 1 == points_.size() ? 0 : place_ + 1;
            return point;
        }

    private:
        std::span<unsigned int const> points_;
        std::size_t place_;
        bool isBackward_;
    };

    FaceKey keyOf(MeshArrays const& mesh, unsigned int face, CornerNeighbors const& at)
    {
        unsigned int const* const pointAt = mesh.faceVertex->data;
        FaceKey key{0, at.corner, pointAt[at.previous] < pointAt[at.next]};
        KeyWalk walk(mesh, face, key);
        for (std::size_t i = 0; i != walk.size(); ++i) {
            key.hash = (key.hash ^ walk.next()) * 0x9E3779B97F4A7C15u;
            key.hash ^= key.hash >> 29;
        }
        return key;
    }

    struct FoundCopies {
        std::vector<unsigned int> copies; // faces to drop
        std::vector<Twins> twins;
    };

    /// The faces whose lowest point is a given one, and the copies among them.
    class FacesAtPoint {
    public:
        FacesAtPoint(MeshArrays const& mesh, EdgeSides const& edges)
            : mesh_(mesh)
            , edges_(edges)
        {
        }

        void findCopies(unsigned int point, FoundCopies& found)
        {
            keys_.clear();
            edges_.forEachCornerAt(point, [&](CornerNeighbors const& at) {
                unsigned int const face = edges_.faceOf(at.corner);
                std::span<unsigned int const> const points = mesh_.corners(face);
                unsigned int const* const lowest = std::min_element(points.data(), points.data() + points.size());
                if (lowest == mesh_.faceVertex->data + at.corner)
                    keys_.push_back(keyOf(mesh_, face, at));
            });
            std::sort(keys_.begin(), keys_.end());
            for (auto first = keys_.begin(); first != keys_.end();) {
                auto const last =
                    std::find_if(first, keys_.end(), [=](FaceKey const& key) { return key.hash != first->hash; });
                compare({first, last}, found);
                first = last;
            }
        }

    private:
        /// Compares faces with the same hash with the first of them.
        void compare(std::span<FaceKey const> keys, FoundCopies& found) const
        {
            FaceKey const* twin = nullptr;
            for (FaceKey const& key : keys.subspan(1)) {
                if (!areEqual(keys[0], key))
                    continue;
                if (key.isBackward != keys[0].isBackward && !twin) {
                    twin = &key;
                    found.twins.push_back({edges_.faceOf(keys[0].start), edges_.faceOf(key.start)});
                } else {
                    found.copies.push_back(edges_.faceOf(key.start));
                }
            }
        }

        bool areEqual(FaceKey const& a, FaceKey const& b) const
        {
            KeyWalk walk(mesh_, edges_.faceOf(a.start), a);
            KeyWalk other(mesh_, edges_.faceOf(b.start), b);
            bool isSame = walk.size() == other.size();
            for (std::size_t i = 0; isSame && i != walk.size(); ++i)
                isSame = walk.next() == other.next();
            return isSame;
        }

        MeshArrays const& mesh_;
        EdgeSides const& edges_;
        std::vector<FaceKey> keys_;
    };

    FoundCopies findCopies(MeshArrays const& mesh)
    {
        EdgeSides const edges(mesh);
        // Partial results are joined in the order of the points.
        return tbb::parallel_reduce(
            tbb::blocked_range<unsigned int>(0, mesh.pointCount(), 1000), FoundCopies{},
            [&](auto const& points, FoundCopies found) {
                FacesAtPoint faces(mesh, edges);
                for (unsigned int point = points.begin(); point != points.end(); ++point)
                    faces.findCopies(point, found);
                return found;
            },
            [](FoundCopies a, FoundCopies const& b) {
                a.copies.insert(a.copies.end(), b.copies.begin(), b.copies.end());
                a.twins.insert(a.twins.end(), b.twins.begin(), b.twins.end());
                return a;
            });
    }

}

DegenerateFaces dropDegenerateFaces(MeshWithSources& mesh)
{
    unsigned int const faceCount = mesh.arrays.faceCount();
    DegenerateFaces result;
    if (areClean(mesh.arrays))
        return result;

    MeshArrays const old = mesh.arrays;
    Indices points, corners;
    Indices offsets;
    offsets.append(0);
    points.reserve(old.cornerCount());
    corners.reserve(old.cornerCount());
    Orvan::Array<bool> isDropped(faceCount, false);
    Outline outline;
    for (unsigned int face = 0; face != faceCount; ++face) {
        outline.trim(old, face);
        std::size_t const oldSize = old.corners(face).size();
        isDropped[face] = outline.size() < 3;
        if (isDropped[face])
            ++result.droppedCount;
        else if (outline.size() != oldSize)
            ++result.shortenedCount;
        for (unsigned int const corner : outline.corners()) {
            points.append((*old.faceVertex)[corner]);
            corners.append(mesh.cornerSource[corner]);
        }
        offsets.append(static_cast<unsigned int>(points.size));
    }
    mesh.arrays.faceVertex = Orvan::makePtr<Indices>(std::move(points));
    mesh.arrays.faceOffset = Orvan::makePtr<Indices>(std::move(offsets));
    mesh.cornerSource = std::move(corners);
    if (result.droppedCount != 0)
        mesh.dropFaces(isDropped);
    return result;
}

DoubledFaces dropDoubledFaces(MeshWithSources& mesh)
{
    FoundCopies found = findCopies(mesh.arrays);
    DoubledFaces result{static_cast<unsigned int>(found.copies.size()), std::move(found.twins)};
    if (result.droppedCount != 0) {
        Orvan::Array<bool> isDropped(mesh.arrays.faceCount(), false);
        for (unsigned int const face : found.copies)
            isDropped[face] = true;
        std::vector<unsigned int> newFace(mesh.arrays.faceCount());
        unsigned int count = 0;
        for (unsigned int face = 0; face != mesh.arrays.faceCount(); ++face)
            newFace[face] = isDropped[face] ? count : count++;
        for (Twins& twins : result.twins)
            twins = {newFace[twins[0]], newFace[twins[1]]};
        mesh.dropFaces(isDropped);
    }
    std::sort(result.twins.begin(), result.twins.end());
    return result;
}

}
