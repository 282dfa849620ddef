#include <Modeling/triangulate.h>

#include "cutQuads.h"
#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/ElementTypes.h"
#include "host/MeshArrays.h"
#include "triangulatePolygon.h"

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometryVolume/ChannelParser.h>

#include <algorithm>
#include <array>
#include <limits>
#include <new>
#include <optional>
#include <span>
#include <utility>

namespace Geometry::Mesh {

using namespace Modeling;

namespace {

    struct Triangulation {
        IndexArray triangleOffset; // the first triangle of each face, and the end of the last one
        IndexArray faceVertex; // the point of each corner of the triangles
        IndexArray sourceCorner; // the corner of the mesh that each comes from; empty unless a property needs it

        unsigned int triangleCount() const { return triangleOffset.data[triangleOffset.size - 1]; }
    };

    /// nullopt if an array is missing or shorter than its count says. The arrays remain readable while the object
    /// receives the new ones.
    std::optional<MeshArrays> readPolygonMesh(Tessara::Object const& object)
    {
        MeshArrays mesh = readMeshArrays(object);
        bool const fits = mesh.isComplete() && mesh.positions->size >= mesh.pointCount
            && mesh.faceVertex->size >= mesh.cornerCount
            && (mesh.faceCount == 0 || mesh.faceOffset->size > mesh.faceCount);
        if (!fits)
            return std::nullopt;
        return mesh;
    }

    /// 0 if the offsets of the face decrease or lead beyond the corners.
    unsigned int cornerCountOf(MeshArrays const& mesh, std::size_t face)
    {
        return OffsetView(*mesh.faceOffset).sizeWithin(mesh.faceVertex->size, face);
    }

    /// Cuts the faces of a range, quads four at once.
    class FaceCutter {
    public:
        /// \param triangulation  Its `faceVertex` receives the points of the corners of the triangles, and its
        ///                       `sourceCorner`, unless empty, the corners of the mesh.
        FaceCutter(MeshArrays const& mesh, Triangulation& triangulation)
            : mesh_(mesh)
            , offset_(mesh.faceOffset->data)
            , triangleOffset_(triangulation.triangleOffset.data)
            , faceVertex_(triangulation.faceVertex.data)
            , sourceCorner_(triangulation.sourceCorner.empty() ? nullptr : triangulation.sourceCorner.data)
        {
        }

        /// Quads may be delayed.
        void cut(unsigned int face)
        {
            unsigned int const triangleCount = triangleOffset_[face + 1] - triangleOffset_[face];
            if (triangleCount == 0)
                return;
            MODELING_ASSERT(areBelow(mesh_.positions->size, verticesOf(face), triangleCount + 2));
            if (triangleCount == 2) {
                quads_[quadCount_++] = face;
                if (quadCount_ == quads_.size())
                    cutFourQuads();
            } else if (triangleCount == 1) {
                writeCorners(face, std::span<unsigned int const, 3>(kTriangle));
            } else {
                cutAlone(face, triangleCount);
            }
        }

        void finish()
        {
            for (unsigned int quad = 0; quad != quadCount_; ++quad)
                cutAlone(quads_[quad], 2);
            quadCount_ = 0;
        }

    private:
        void cutFourQuads()
        {
            std::array<float3, 16> corners;
            for (unsigned int quad = 0; quad != 4; ++quad)
                gather(quads_[quad], {&corners[4 * quad], 4});
            std::array<unsigned int, 24> triangles;
            unsigned int const cut = Modeling::Internal::cutQuads(corners, triangles);
            for (unsigned int quad = 0; quad != 4; ++quad)
                if ((cut >> quad & 1) != 0)
                    writeCorners(quads_[quad], std::span<unsigned int const, 6>(&triangles[6 * quad], 6));
                else
                    cutAlone(quads_[quad], 2);
            quadCount_ = 0;
        }

        void cutAlone(unsigned int face, unsigned int triangleCount)
        {
            std::span<float3> const corners(storage_.positions.take(triangleCount + 2), triangleCount + 2);
            gather(face, corners);
            std::span<unsigned int> const triangles(
                faceVertex_ + std::size_t{3} * triangleOffset_[face], std::size_t{3} * triangleCount);
            Modeling::Internal::triangulatePolygon(corners, triangles, storage_);
            writeCorners(face, std::span<unsigned int const>(triangles));
        }

        /// Turns the corner numbers of a face's triangles into points, possibly in place.
        template <std::size_t kExtent>
        void writeCorners(unsigned int face, std::span<unsigned int const, kExtent> numbers)
        {
            std::size_t const first = std::size_t{3} * triangleOffset_[face];
            unsigned int const* const vertex = verticesOf(face);
            if (sourceCorner_)
                for (std::size_t i = 0; i != numbers.size(); ++i)
                    sourceCorner_[first + i] = offset_[face] + numbers[i];
            for (std::size_t i = 0; i != numbers.size(); ++i)
                faceVertex_[first + i] = vertex[numbers[i]];
        }

        void gather(unsigned int face, std::span<float3> corners) const
        {
            unsigned int const* const vertex = verticesOf(face);
            float3 const* const position = mesh_.positions->data;
            for (std::size_t i = 0; i != corners.size(); ++i)
                corners[i] = position[vertex[i]];
        }

        unsigned int const* verticesOf(unsigned int face) const { return mesh_.faceVertex->data + offset_[face]; }

        static constexpr std::array<unsigned int, 3> kTriangle{0, 1, 2}; // its own corner numbers

        MeshArrays const& mesh_;
        unsigned int const* const offset_;
        unsigned int const* const triangleOffset_;
        unsigned int* const faceVertex_;
        unsigned int* const sourceCorner_; // null if not needed
        Modeling::Internal::PolygonStorage storage_;
        std::array<unsigned int, 4> quads_; // faces
        unsigned int quadCount_ = 0;
    };

    Triangulation cutFaces(MeshArrays const& mesh, bool needsSources)
    {
        Triangulation triangulation;
        triangulation.triangleOffset = offsetsFromCounts(mesh.faceCount, [&](std::size_t face) {
            unsigned int const cornerCount = cornerCountOf(mesh, face);
            return cornerCount < 2 ? 0 : cornerCount - 2;
        });
        std::uint64_t const cornerCount = std::uint64_t{3} * triangulation.triangleCount();
        if (cornerCount > std::numeric_limits<unsigned int>::max())
            throw std::bad_alloc();
        triangulation.faceVertex = uninitializedArray<unsigned int>(cornerCount);
        if (needsSources)
            triangulation.sourceCorner = uninitializedArray<unsigned int>(cornerCount);

        // Each face writes its own triangles.
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.faceCount, kFaceGrain), [&](auto const& faces) {
            FaceCutter cutter(mesh, triangulation);
            for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                cutter.cut(face);
            cutter.finish();
        });
        MODELING_ASSERT(
            areOffsets(triangulation.triangleOffset.data, mesh.faceCount, triangulation.faceVertex.size / 3));
        MODELING_ASSERT(
            areBelow(mesh.faceVertex->size, triangulation.sourceCorner.data, triangulation.sourceCorner.size));
        return triangulation;
    }

    /// Values of the corners of the faces, for the corners of the triangles.
    template <class T> Orvan::Array<T> transferToCorners(Orvan::Array<T> const& values, IndexArray const& sourceCorner)
    {
        Orvan::Array<T> transferred = uninitializedArray<T>(sourceCorner.size);
        // Each corner writes its own entry.
        parallelFor(tbb::blocked_range<std::size_t>(0, sourceCorner.size, kElementGrain),
            [source = sourceCorner.data, from = values.data, available = values.size, to = transferred.data](
                auto const& corners) {
                for (std::size_t corner = corners.begin(); corner != corners.end(); ++corner)
                    to[corner] = source[corner] < available ? from[source[corner]] : T{};
            });
        return transferred;
    }

    /// Values of the faces, for the triangles.
    template <class T>
    Orvan::Array<T> transferToTriangles(Orvan::Array<T> const& values, IndexArray const& triangleOffset)
    {
        std::size_t const faceCount = triangleOffset.size - 1;
        Orvan::Array<T> transferred = uninitializedArray<T>(triangleOffset.data[faceCount]);
        // Each face writes the entries of its triangles.
        parallelFor(tbb::blocked_range<std::size_t>(0, faceCount, kElementGrain),
            [offset = triangleOffset.data, from = values.data, available = values.size, to = transferred.data](
                auto const& faces) {
                for (std::size_t face = faces.begin(); face != faces.end(); ++face) {
                    T const value = face < available ? from[face] : T{};
                    std::fill(to + offset[face], to + offset[face + 1], value);
                }
            });
        return transferred;
    }

    IndexArray offsetsOfTriangles(unsigned int triangleCount)
    {
        IndexArray faceOffset = uninitializedArray<unsigned int>(std::uint64_t{triangleCount} + 1);
        // Each triangle writes its own entry.
        parallelFor(tbb::blocked_range<std::size_t>(0, faceOffset.size, kElementGrain),
            [offset = faceOffset.data](auto const& triangles) {
                for (std::size_t triangle = triangles.begin(); triangle != triangles.end(); ++triangle)
                    offset[triangle] = static_cast<unsigned int>(3 * triangle);
            });
        return faceOffset;
    }

    void writeTriangles(Triangulation& triangulation, PreparedWrites& writes)
    {
        MeshArrays triangles; // without points, which are kept
        triangles.faceCount = triangulation.triangleCount();
        triangles.cornerCount = 3 * triangles.faceCount;
        triangles.faceOffset = Orvan::makePtr<IndexArray>(offsetsOfTriangles(triangles.faceCount));
        triangles.faceVertex = Orvan::makePtr<IndexArray>(std::move(triangulation.faceVertex));
        writeMeshArrays(std::move(triangles), writes);
    }

    /// Transfers values of the faces, or of their corners, to the triangles.
    struct Transfer {
        Triangulation const& triangulation;
        bool ofCorners;

        template <class T> Orvan::Array<T> operator()(Orvan::Array<T> const& values) const
        {
            return ofCorners ? transferToCorners(values, triangulation.sourceCorner)
                             : transferToTriangles(values, triangulation.triangleOffset);
        }
    };

    /// Adds the transferred array of a data property to the changes. \return false if the property is not data of a
    /// core type
    bool transferData(
        Orvan::String const& name, Transfer const& transfer, Tessara::Object const& mesh, PreparedWrites& writes)
    {
        Orvan::Ptr<Tessara::Object> const property = dataPropertyAt(mesh, name);
        if (!property)
            return false;
        Tessara::PropertyValue const data = property->getProperty(Tessara::Geometry::sData);
        bool isTransferred = false;
        forEachElementType<CoreElementTypes, ArrayForm>(
            &data, &isTransferred, [&]<class T>(Orvan::Ptr<Orvan::Array<T>> const& values) {
                if (values)
                    writes.writeGeoPropData(name, Orvan::makePtr<Orvan::Array<T>>(transfer(*values)));
                return bool(values);
            });
        return isTransferred;
    }

    /// Whether a property of the corners, besides their points, is to be kept.
    bool keepsCornerProperties(TSR::Utils::ChannelParser const& channels, Tessara::Object const& mesh)
    {
        using namespace Tessara::Geometry;
        Orvan::Array<Orvan::String> const names = getGeoPropNamesByTarget(mesh, sFaceVertexComp);
        return std::any_of(names.begin(), names.end(),
            [&](Orvan::String const& name) { return name != sFaceVertex && channels.accepts(name); });
    }

    /// Transfers or removes the properties that target a component, except its standard property. Properties that are
    /// neither data of a core type nor ranges are kept as they are.
    void carryProperties(Orvan::String const& component, Orvan::String const& standardProperty,
        TSR::Utils::ChannelParser const& channels, Transfer const& transfer, Tessara::Object const& mesh,
        PreparedWrites& writes)
    {
        using namespace Tessara::Geometry;
        Orvan::Array<Orvan::String> const names = getGeoPropNamesByTarget(mesh, component);
        for (Orvan::String const& name : names) {
            if (name == standardProperty)
                continue;
            if (!channels.accepts(name)) {
                Orvan::Array<Orvan::String> const dependents = getGeoPropNamesByTarget(mesh, name);
                for (Orvan::String const& dependent : dependents)
                    writes.eraseProperty(dependent);
                writes.eraseProperty(name);
            } else if (!transferData(name, transfer, mesh, writes)) {
                // A triangle or corner has the same index into the data of the range as its source.
                if (Orvan::Ptr<IndexArray> const indices = getRangeGeoPropIndices(mesh, name))
                    writes.setRangeIndices(name, Orvan::makePtr<IndexArray>(transfer(*indices)));
            }
        }
    }

}

void triangulate(Orvan::String const& channels, Tessara::Object& mesh)
{
    using namespace Tessara::Geometry;
    std::optional<MeshArrays> const polygons = readPolygonMesh(mesh);
    if (!polygons)
        return;
    TSR::Utils::ChannelParser parser;
    parser.parses(channels); // false if an entry is malformed; such entries are ignored
    Triangulation triangulation = cutFaces(*polygons, keepsCornerProperties(parser, mesh));

    PreparedWrites writes(mesh);
    writeTriangles(triangulation, writes);
    carryProperties(sFaceVertexComp, sFaceVertex, parser, Transfer{triangulation, true}, mesh, writes);
    carryProperties(sFaceComp, sFaceOffset, parser, Transfer{triangulation, false}, mesh, writes);
    writes.commit();
}

}
