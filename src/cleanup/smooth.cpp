#include <Modeling/smooth.h>

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"
#include "host/MeshArrays.h"

#include <TessaraMathSupport/Stepper.h>

#include <utility>

namespace Geometry::Mesh {

using namespace Modeling;

namespace {

    /// The faces around each point, ascending; a face is listed once for each of its corners at the point.
    struct PointFaces {
        IndexArray offsets; // point count + 1
        IndexArray faces;
        IndexArray corners; // which corner of the face is at the point: 0 for its first one
    };

    /// What a face contributes to its points in a step.
    struct FaceTerms {
        float3 normal; // of a triangle, not normalized; zero for other faces
        float3 middle; // the centroid of a triangle, the mean of the corners of another face
    };

    /// Never reset between steps: targets and normals are means over all steps so far, and existing scenes depend on
    /// it.
    struct PointSums {
        float3 normals{0, 0, 0};
        float3 centroids{0, 0, 0};
        unsigned int count = 0;

        void add(float3 const& normal, float3 const& centroid)
        {
            normals = normals + normal;
            centroids = centroids + centroid;
            ++count;
        }
    };

    float3 operator/(float3 const& v, float divisor)
    {
        return {v.x / divisor, v.y / divisor, v.z / divisor};
    }

    [[maybe_unused]] bool hasFaces(unsigned int faceCount, IndexArray const& faceVertex, IndexArray const& faceOffset)
    {
        return faceOffset.size > faceCount && isNonDecreasing(faceOffset.data, std::size_t{faceCount} + 1)
            && faceOffset[faceCount] <= faceVertex.size;
    }

    PointFaces findPointFaces(FaceView const& mesh, unsigned int pointCount)
    {
        // Corners before the first face and after the last one are ignored.
        unsigned int const firstCorner = mesh.count == 0 ? 0 : mesh.offsets.begin(0);
        unsigned int const cornerCount = mesh.count == 0 ? 0 : mesh.offsets.begin(mesh.count) - firstCorner;
        MODELING_ASSERT(areBelow(pointCount, mesh.faceVertex + firstCorner, cornerCount));
        IndexArray faceOfCorner = uninitializedArray<unsigned int>(cornerCount);
        unsigned int* const faceOf = faceOfCorner.data;
        // Each face writes the entries of its corners.
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.count, kElementGrain), [=](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                std::fill(faceOf + (mesh.offsets.begin(face) - firstCorner),
                    faceOf + (mesh.offsets.end(face) - firstCorner), face);
        });

        PointCorners around = cornersByPoint(pointCount, mesh.faceVertex + firstCorner, cornerCount);
        MODELING_ASSERT(areOffsets(around.offsets.data, pointCount, cornerCount));
        IndexArray faces = uninitializedArray<unsigned int>(around.corners.size);
        // Each entry is written once.
        parallelFor(tbb::blocked_range<std::size_t>(0, faces.size, kElementGrain),
            [=, face = faces.data, corner = around.corners.data](auto const& entries) {
                for (std::size_t entry = entries.begin(); entry != entries.end(); ++entry) {
                    face[entry] = faceOf[corner[entry]];
                    corner[entry] -= mesh.offsets.begin(face[entry]) - firstCorner;
                }
            });
        return {std::move(around.offsets), std::move(faces), std::move(around.corners)};
    }

    FaceTerms termsOf(unsigned int const* corner, unsigned int size, float3 const* position)
    {
        if (size == 3) {
            float3 const &a = position[corner[0]], &b = position[corner[1]], &c = position[corner[2]];
            return {cross(b - a, c - a), ((b + a) + c) / 3};
        }
        float3 mean{0, 0, 0};
        for (unsigned int k = 0; k != size; ++k)
            mean = mean + position[corner[k]] / static_cast<float>(size);
        return {{0, 0, 0}, mean};
    }

    void measureFaces(FaceView const& mesh, float3 const* position, Orvan::Array<FaceTerms>& terms)
    {
        // Each face writes its own entry.
        parallelFor(
            tbb::blocked_range<unsigned int>(0, mesh.count, kFaceGrain), [=, term = terms.data](auto const& faces) {
                for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                    term[face] = termsOf(mesh.corners(face), mesh.size(face), position);
            });
    }

    /// A polygon as the fan of triangles between its edges and the mean of its corners. Adds the triangles at a point
    /// to the sums of that point.
    class FanOfPolygon {
    public:
        FanOfPolygon(FaceView const& mesh, unsigned int face, float3 const& mean, float3 const* position)
            : corner_(mesh.corners(face))
            , size_(mesh.size(face))
            , mean_(mean)
            , position_(position)
        {
        }

        /// For a point that is at corner k only: the triangles of the edges before and after it, in ascending order.
        void addAround(unsigned int k, PointSums& sums) const
        {
            unsigned int const before = k == 0 ? size_ - 1 : k - 1;
            addTriangle(std::min(before, k), sums);
            if (before != k)
                addTriangle(std::max(before, k), sums);
        }

        /// For a point that may be at several corners.
        void addAllAt(unsigned int point, PointSums& sums) const
        {
            for (unsigned int k = 0; k != size_; ++k)
                if (corner_[k] == point || corner_[next(k)] == point)
                    addTriangle(k, sums);
        }

    private:
        unsigned int next(unsigned int k) const { return k + 1 == size_ ? 0 : k + 1; }

        void addTriangle(unsigned int k, PointSums& sums) const
        {
            float3 const &u = position_[corner_[k]], &w = position_[corner_[next(k)]];
            sums.add(cross(u - mean_, w - mean_), ((mean_ + u) + w) / 3);
        }

        unsigned int const* corner_;
        unsigned int size_;
        float3 mean_;
        float3 const* position_;
    };

    void addFacesAround(unsigned int point, FaceView const& mesh, PointFaces const& around, FaceTerms const* terms,
        float3 const* position, PointSums& sums)
    {
        unsigned int const* const face = around.faces.data;
        unsigned int const begin = around.offsets[point];
        unsigned int const end = around.offsets[point + 1];
        for (unsigned int entry = begin; entry != end; ++entry) {
            FaceTerms const& term = terms[face[entry]];
            if (mesh.size(face[entry]) == 3) {
                sums.add(term.normal, term.middle);
                continue;
            }
            FanOfPolygon const fan(mesh, face[entry], term.middle, position);
            bool const isAlone = (entry == begin || face[entry - 1] != face[entry])
                && (entry + 1 == end || face[entry + 1] != face[entry]);
            if (isAlone)
                fan.addAround(around.corners[entry], sums);
            else
                fan.addAllAt(point, sums);
        }
    }

    void accumulate(FaceView const& mesh, PointFaces const& around, Orvan::Array<FaceTerms> const& terms,
        float3 const* position, Orvan::Array<PointSums>& sums)
    {
        auto const pointCount = static_cast<unsigned int>(sums.size);
        // Each point adds to its own sums; positions do not change meanwhile.
        parallelFor(tbb::blocked_range<unsigned int>(0, pointCount, kOneRingGrain), [&](auto const& points) {
            for (unsigned int point = points.begin(); point != points.end(); ++point)
                addFacesAround(point, mesh, around, terms.data, position, sums[point]);
        });
    }

    float3 moveOf(PointSums const& sums, float3 const& position, float increment)
    {
        float3 const normal = safeNormalize(sums.normals);
        float3 const target = sums.centroids / static_cast<float>(sums.count);
        float3 const move = (target - position) * increment;
        return move - normal * dot(normal, move);
    }

    void movePoints(Orvan::Array<PointSums> const& sums, Tessara::Math::Stepper const& stepper, float const* weight,
        float3* position)
    {
        // Each point reads and writes only its own position.
        parallelFor(tbb::blocked_range<std::size_t>(0, sums.size, kElementGrain), [&](auto const& points) {
            for (std::size_t point = points.begin(); point != points.end(); ++point) {
                float3 move = moveOf(sums[point], position[point], stepper.increment());
                if (weight) {
                    float const atLeast0 = 0.0f > weight[point] ? 0.0f : weight[point];
                    move = move * (atLeast0 > 1.0f ? 1.0f : atLeast0);
                }
                position[point] = position[point] + move;
            }
        });
    }

}

template <class Logger> void smooth(float amount, unsigned int pointCount, unsigned int faceCount,
    IndexArray const& faceVertex, IndexArray const& faceOffset, Orvan::Array<float> const* weights,
    Orvan::Array<float3>& positions, Logger const& logger)
{
    Tessara::Math::Stepper stepper(amount, 0.9f);
    if (!stepper)
        return;
    MODELING_ASSERT(positions.size >= pointCount && (!weights || weights->size >= pointCount));
    MODELING_ASSERT(faceCount == 0 || hasFaces(faceCount, faceVertex, faceOffset));
    FaceView const mesh{faceVertex.data, faceOffset, faceCount};
    PointFaces const around = findPointFaces(mesh, pointCount);
    Orvan::Array<FaceTerms> terms = uninitializedArray<FaceTerms>(faceCount);
    Orvan::Array<PointSums> sums = filledArray(pointCount, PointSums{});
    for (; stepper; stepper.step(logger)) {
        measureFaces(mesh, positions.data, terms);
        accumulate(mesh, around, terms, positions.data, sums);
        movePoints(sums, stepper, weights ? weights->data : nullptr, positions.data);
    }
}

template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, IndexArray const&, IndexArray const&,
    Orvan::Array<float> const*, Orvan::Array<float3>&, CoreGL::OrvanLogger const&);
template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, IndexArray const&, IndexArray const&,
    Orvan::Array<float> const*, Orvan::Array<float3>&, CoreGL::ConsoleLogger const&);
template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, IndexArray const&, IndexArray const&,
    Orvan::Array<float> const*, Orvan::Array<float3>&, CoreGL::NOPLogger const&);

}
