#include <Modeling/triangulate.h>

#include "frame/Arrays.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"
#include "triangulatePolygon.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometryVolume/ChannelParser.h>

#include <limits>
#include <new>
#include <numeric>
#include <optional>
#include <span>
#include <utility>

namespace Geometry::Mesh {

using namespace Modeling;

namespace {

    using IndexArray = Orvan::Array<unsigned int>;

    /// The arrays as the object held them: they stay readable while it receives the new ones.
    struct PolygonMesh {
        Orvan::Ptr<Orvan::Array<float3>> positions;
        Orvan::Ptr<IndexArray> faceVertex;
        Orvan::Ptr<IndexArray> faceOffset;
        unsigned int faceCount = 0;

        /// 0 also where the offsets fall or lead out of the corners.
        unsigned int cornerCount(std::size_t face) const
        {
            unsigned int const begin = faceOffset->data[face];
            unsigned int const end = faceOffset->data[face + 1];
            return begin <= end && end <= faceVertex->size ? end - begin : 0;
        }
    };

    /// Which triangles a face becomes, and which corner each of their corners was.
    struct Triangulation {
        IndexArray triangleOffset; // entry f is the first triangle of face f
        IndexArray sourceCorner;

        unsigned int triangleCount() const { return triangleOffset.data[triangleOffset.size - 1]; }
    };

    /// Nothing where an array is missing or too short for its count.
    std::optional<PolygonMesh> readPolygonMesh(Tessara::Object const& object)
    {
        using namespace Tessara::Geometry;
        PolygonMesh mesh;
        mesh.faceCount = getElementCount(object, sFaceComp);
        mesh.positions = readGeoPropData<float3>(object, sPointPosition);
        mesh.faceVertex = readGeoPropData<unsigned int>(object, sFaceVertex);
        mesh.faceOffset = readGeoPropData<unsigned int>(object, sFaceOffset);
        bool const fits = mesh.positions && mesh.faceVertex && mesh.faceOffset
            && mesh.positions->size >= getElementCount(object, sPointComp)
            && mesh.faceVertex->size >= getElementCount(object, sFaceVertexComp)
            && (mesh.faceCount == 0 || mesh.faceOffset->size > mesh.faceCount);
        if (!fits)
            return std::nullopt;
        return mesh;
    }

    /// Cuts one face: `source` receives the corners of the mesh that the corners of its triangles were.
    void cutFace(
        PolygonMesh const& mesh, unsigned int face, std::span<unsigned int> source, Internal::PolygonStorage& storage)
    {
        unsigned int const firstCorner = mesh.faceOffset->data[face];
        unsigned int const cornerCount = mesh.cornerCount(face);
        unsigned int const* const vertex = mesh.faceVertex->data + firstCorner;
        float3 const* const position = mesh.positions->data;
        if (cornerCount > 3) {
            float3* const corners = storage.positions.take(cornerCount);
            for (unsigned int i = 0; i != cornerCount; ++i)
                corners[i] = position[vertex[i]];
            Internal::triangulatePolygon({corners, cornerCount}, source, storage);
        } else {
            std::iota(source.begin(), source.end(), 0u);
        }
        for (unsigned int& corner : source)
            corner += firstCorner;
    }

    Triangulation cutFaces(PolygonMesh const& mesh)
    {
        Triangulation triangulation;
        triangulation.triangleOffset = offsetsFromCounts(mesh.faceCount, [&](std::size_t face) {
            unsigned int const cornerCount = mesh.cornerCount(face);
            return cornerCount < 2 ? 0 : cornerCount - 2;
        });
        std::uint64_t const cornerCount = std::uint64_t{3} * triangulation.triangleCount();
        if (cornerCount > std::numeric_limits<unsigned int>::max())
            throw std::bad_alloc();
        triangulation.sourceCorner = uninitializedArray<unsigned int>(cornerCount);

        unsigned int const* const triangleOffset = triangulation.triangleOffset.data;
        unsigned int* const sourceCorner = triangulation.sourceCorner.data;
        // Each face writes its own triangles.
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.faceCount, kFaceGrain), [&](auto const& faces) {
            Internal::PolygonStorage storage;
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                std::size_t const begin = std::size_t{3} * triangleOffset[face];
                std::size_t const end = std::size_t{3} * triangleOffset[face + 1];
                if (begin != end)
                    cutFace(mesh, face, {sourceCorner + begin, end - begin}, storage);
            }
        });
        return triangulation;
    }

    /// What each corner of the triangles has where the corners of the faces had `values`.
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

    /// What each triangle has where the faces had `values`.
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

    void writeTriangles(PolygonMesh const& mesh, Triangulation const& triangulation, PreparedWrites& writes)
    {
        using namespace Tessara::Geometry;
        unsigned int const triangleCount = triangulation.triangleCount();
        IndexArray faceOffset = uninitializedArray<unsigned int>(std::uint64_t{triangleCount} + 1);
        // Each triangle writes its own entry.
        parallelFor(tbb::blocked_range<std::size_t>(0, faceOffset.size, kElementGrain),
            [offset = faceOffset.data](auto const& triangles) {
                for (std::size_t triangle = triangles.begin(); triangle != triangles.end(); ++triangle)
                    offset[triangle] = static_cast<unsigned int>(3 * triangle);
            });
        writes.setElementCount(sFaceVertexComp, 3 * triangleCount);
        writes.writeGeoPropData(
            sFaceVertex, Orvan::makePtr<IndexArray>(transferToCorners(*mesh.faceVertex, triangulation.sourceCorner)));
        writes.setElementCount(sFaceComp, triangleCount);
        writes.writeGeoPropData(sFaceOffset, Orvan::makePtr<IndexArray>(std::move(faceOffset)));
    }

    /// What the triangles get of values of the faces or of their corners.
    struct Transfer {
        Triangulation const& triangulation;
        bool ofCorners;

        template <class T> Orvan::Array<T> operator()(Orvan::Array<T> const& values) const
        {
            return ofCorners ? transferToCorners(values, triangulation.sourceCorner)
                             : transferToTriangles(values, triangulation.triangleOffset);
        }
    };

    /// Whether the property is data of a core type; then the transferred array is to be written.
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
                return values != nullptr;
            });
        return isTransferred;
    }

    /// Transfers or removes what targets a component, but for the standard property of it. What is neither data of a
    /// core type nor a range stays as it is.
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
                // The index that a triangle or corner has into the range's data is its source's.
                if (Orvan::Ptr<IndexArray> const indices = getRangeGeoPropIndices(mesh, name))
                    writes.setRangeIndices(name, Orvan::makePtr<IndexArray>(transfer(*indices)));
            }
        }
    }

}

void triangulate(Orvan::String const& channels, Tessara::Object& mesh)
{
    using namespace Tessara::Geometry;
    std::optional<PolygonMesh> const polygons = readPolygonMesh(mesh);
    if (!polygons)
        return;
    Triangulation const triangulation = cutFaces(*polygons);

    PreparedWrites writes(mesh);
    writeTriangles(*polygons, triangulation, writes);
    TSR::Utils::ChannelParser parser;
    parser.parses(channels); // entries that are malformed are left out; that is no failure here
    carryProperties(sFaceVertexComp, sFaceVertex, parser, Transfer{triangulation, true}, mesh, writes);
    carryProperties(sFaceComp, sFaceOffset, parser, Transfer{triangulation, false}, mesh, writes);
    writes.commit();
}

}
