#include "orientFaces.h"

#include "frame/ParallelFor.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <limits>

namespace ModelingProgram {

namespace {

    constexpr unsigned char kUnknown = 2;

    /// Visits the faces of all sheets, and calls `visit(face, side, other side)` for each joined side.
    template <class Visit> Sheets traverse(MeshArrays const& mesh, Adjacency const& adjacency, Visit const& visit)
    {
        Sheets sheets;
        sheets.faces.reserve(mesh.faceCount());
        std::vector<bool> isFound(mesh.faceCount());
        unsigned int const* const offset = mesh.faceOffset->data;
        for (unsigned int lowest = 0; lowest != mesh.faceCount(); ++lowest) {
            if (isFound[lowest])
                continue;
            sheets.starts.push_back(sheets.faces.size());
            isFound[lowest] = true;
            sheets.faces.push_back(lowest);
            for (std::size_t i = sheets.starts.back(); i != sheets.faces.size(); ++i) {
                unsigned int const face = sheets.faces[i];
                for (unsigned int side = offset[face]; side != offset[face + 1]; ++side) {
                    if (!adjacency.isJoined(side))
                        continue;
                    unsigned int const other = adjacency.across(side);
                    visit(face, side, other);
                    unsigned int const neighbor = adjacency.faceOf(other);
                    if (!isFound[neighbor]) {
                        isFound[neighbor] = true;
                        sheets.faces.push_back(neighbor);
                    }
                }
            }
        }
        sheets.starts.push_back(sheets.faces.size());
        return sheets;
    }

    bool isOriented(MeshArrays const& mesh, Adjacency const& adjacency)
    {
        std::atomic<bool> result = true;
        // Only reads.
        Modeling::parallelFor(tbb::blocked_range<unsigned int>(0, mesh.cornerCount(), 10'000), [&](auto const& sides) {
            for (unsigned int side = sides.begin(); side != sides.end(); ++side)
                if (adjacency.isJoined(side) && !adjacency.areOpposite(side, adjacency.across(side)))
                    result.store(false, std::memory_order_relaxed);
        });
        return result;
    }

    bool isClosed(std::span<unsigned int const> faces, MeshArrays const& mesh, Adjacency const& adjacency)
    {
        unsigned int const* const offset = mesh.faceOffset->data;
        if (mesh.corners(faces[0]).empty())
            return false;
        for (unsigned int const face : faces)
            for (unsigned int side = offset[face]; side != offset[face + 1]; ++side)
                if (!adjacency.isJoined(side) || !adjacency.areOpposite(side, adjacency.across(side)))
                    return false;
        return true;
    }

    /// Whether the volume of a closed sheet is negative by more than rounding errors, as that of a flat one may be.
    /// Relative to one of its points, so that no digits are lost far from the origin.
    bool isInward(std::span<unsigned int const> faces, MeshArrays const& mesh)
    {
        constexpr double kFlat = 1e-12;
        float3 const* const position = mesh.positions->data;
        double3 const origin = inDoubles(position[mesh.corners(faces[0])[0]]);
        double volume = 0, sumOfSizes = 0;
        for (unsigned int const face : faces) {
            std::span<unsigned int const> const corners = mesh.corners(face);
            double3 const area = areaVector(corners, position), arm = inDoubles(position[corners[0]]) - origin;
            volume += dot(arm, area);
            sumOfSizes += length(arm) * length(area);
        }
        return volume < -kFlat * sumOfSizes;
    }

    /// Whether points are inside an odd number of closed sheets: counts how often the ray from a point upward, along z,
    /// crosses them.
    class InsideTest {
    public:
        InsideTest(MeshArrays const& mesh, std::vector<unsigned int> const& points)
            : position_(mesh.positions->data)
            , mesh_(mesh)
        {
            for (unsigned int const point : points)
                rays_.push_back({position_[point], false});
            auto const isLess = [](Ray const& a, Ray const& b) { return keyOf(a.start) < keyOf(b.start); };
            std::sort(rays_.begin(), rays_.end(), isLess);
            auto const areEqual = [](Ray const& a, Ray const& b) { return keyOf(a.start) == keyOf(b.start); };
            rays_.erase(std::unique(rays_.begin(), rays_.end(), areEqual), rays_.end());
        }

        /// Counts the crossings of all rays with a sheet.
        void addSheet(std::span<unsigned int const> faces)
        {
            forEachTriangle(faces, [&](std::array<unsigned int, 3> const& points) {
                float const x[] = {position_[points[0]].x, position_[points[1]].x, position_[points[2]].x};
                float const most = *std::max_element(x, x + 3);
                auto ray = std::lower_bound(rays_.begin(), rays_.end(), *std::min_element(x, x + 3),
                    [](Ray const& r, float least) { return r.start.x < least; });
                for (; ray != rays_.end() && ray->start.x <= most; ++ray)
                    if (isCrossed(ray->start, points))
                        ray->isInside = !ray->isInside;
            });
        }

        /// Whether a point is inside an odd number of the sheets other than its own.
        bool isInsideOthers(unsigned int point, std::span<unsigned int const> ownFaces) const
        {
            auto const ray = std::lower_bound(rays_.begin(), rays_.end(), position_[point],
                [](Ray const& r, float3 const& p) { return keyOf(r.start) < keyOf(p); });
            bool isInside = ray->isInside;
            forEachTriangle(ownFaces, [&](std::array<unsigned int, 3> const& points) {
                isInside = isInside != isCrossed(position_[point], points);
            });
            return isInside;
        }

    private:
        struct Ray {
            float3 start;
            bool isInside;
        };

        static std::array<float, 3> keyOf(float3 const& p) { return {p.x, p.y, p.z}; }

        /// Polygons are cut into the fan from their first corner, as for their volume.
        template <class Visit> void forEachTriangle(std::span<unsigned int const> faces, Visit const& visit) const
        {
            for (unsigned int const face : faces) {
                std::span<unsigned int const> const corners = mesh_.corners(face);
                for (std::size_t i = 2; i < corners.size(); ++i)
                    visit(std::array{corners[0], corners[i - 1], corners[i]});
            }
        }

        /// Twice the area of the triangle from an edge to a point, seen from above.
        double areaSeen(unsigned int start, unsigned int end, float3 const& p) const
        {
            double3 const a = inDoubles(position_[start]) - inDoubles(p), b = inDoubles(position_[end]) - inDoubles(p);
            return a.x * b.y - a.y * b.x;
        }

        bool isCrossed(float3 const& p, std::array<unsigned int, 3> const& points) const
        {
            // An odd number of its edges are right of the point. That depends on where the edge is seen from above and
            // on nothing else, not even on the order of its points: so a ray through an edge crosses exactly one of the
            // faces at it, and also edges that are above each other are passed on the same side.
            unsigned int passedCount = 0;
            double weight[3];
            for (unsigned int i = 0; i != 3; ++i) {
                unsigned int const start = points[i], end = points[i == 2 ? 0 : i + 1];
                unsigned int const lower = position_[start].y > position_[end].y ? end : start;
                unsigned int const upper = lower == start ? end : start;
                double const area = areaSeen(lower, upper, p);
                if (position_[lower].y <= p.y && position_[upper].y > p.y && area > 0)
                    ++passedCount;
                weight[i] = lower == start ? area : -area;
            }
            if (passedCount % 2 == 0)
                return false;
            double const sum = weight[0] + weight[1] + weight[2];
            double const height = (weight[0] * position_[points[2]].z + weight[1] * position_[points[0]].z
                                      + weight[2] * position_[points[1]].z)
                / sum;
            return height > p.z;
        }

        float3 const* position_;
        MeshArrays const& mesh_;
        std::vector<Ray> rays_; // by their start, each once
    };

    /// Those of the sheets that are inside an odd number of other closed ones.
    std::vector<std::size_t> findCavities(std::vector<std::size_t> const& inward, Sheets const& sheets,
        std::vector<bool> const& areClosed, MeshArrays const& mesh)
    {
        auto const pointOf = [&](std::size_t sheet) { return mesh.corners(sheets.facesOf(sheet)[0])[0]; };
        std::vector<unsigned int> points;
        for (std::size_t const sheet : inward)
            points.push_back(pointOf(sheet));
        InsideTest test(mesh, points);
        for (std::size_t sheet = 0; sheet != sheets.count(); ++sheet)
            if (areClosed[sheet])
                test.addSheet(sheets.facesOf(sheet));
        std::vector<std::size_t> cavities;
        for (std::size_t const sheet : inward)
            if (test.isInsideOthers(pointOf(sheet), sheets.facesOf(sheet)))
                cavities.push_back(sheet);
        return cavities;
    }

}

Sheets findSheets(MeshArrays const& mesh, Adjacency const& adjacency)
{
    return traverse(mesh, adjacency, [](unsigned int, unsigned int, unsigned int) {});
}

Orientation orientSheets(MeshArrays const& mesh, Adjacency const& adjacency)
{
    Orientation result;
    if (isOriented(mesh, adjacency)) {
        result.isFlipped.resize(mesh.faceCount(), 0);
        return result;
    }
    std::vector<unsigned char>& isFlipped = result.isFlipped;
    isFlipped.resize(mesh.faceCount(), kUnknown);
    Sheets const sheets = traverse(mesh, adjacency, [&](unsigned int face, unsigned int side, unsigned int other) {
        if (isFlipped[face] == kUnknown) // the first of a sheet
            isFlipped[face] = 0;
        unsigned int const neighbor = adjacency.faceOf(other);
        bool const isTurned = !adjacency.areOpposite(side, other);
        auto const expected = static_cast<unsigned char>(isTurned ? 1 - isFlipped[face] : isFlipped[face]);
        if (isFlipped[neighbor] == kUnknown)
            isFlipped[neighbor] = expected;
        else if (isFlipped[neighbor] != expected)
            result.conflicts.push_back(side);
    });
    for (std::size_t sheet = 0; sheet != sheets.count(); ++sheet) {
        std::span<unsigned int const> const faces = sheets.facesOf(sheet);
        std::size_t flippedCount = 0;
        for (unsigned int const face : faces)
            flippedCount += isFlipped[face] == 1 ? 1u : 0u;
        bool const areMost = flippedCount > faces.size() - flippedCount;
        for (unsigned int const face : faces)
            isFlipped[face] = (isFlipped[face] == 1) != areMost ? 1 : 0;
    }
    return result;
}

void flipFaces(std::vector<unsigned char> const& isFlipped, MeshWithSources& mesh, Adjacency& adjacency)
{
    if (std::find(isFlipped.begin(), isFlipped.end(), 1) == isFlipped.end())
        return;
    unsigned int const* const offset = mesh.arrays.faceOffset->data;
    editArray(mesh.arrays.faceVertex, [&](Orvan::Array<unsigned int>& points) {
        // Each face writes the entries of its corners.
        Modeling::parallelFor(
            tbb::blocked_range<unsigned int>(0, mesh.arrays.faceCount(), 1000), [&](auto const& faces) {
                for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                    if (!isFlipped[face])
                        continue;
                    std::reverse(points.data + offset[face] + 1, points.data + offset[face + 1]);
                    std::reverse(mesh.cornerSource.data + offset[face] + 1, mesh.cornerSource.data + offset[face + 1]);
                    if (face < mesh.isFlipped.size)
                        mesh.isFlipped[face] = !mesh.isFlipped[face];
                }
            });
    });
    adjacency.reverse(isFlipped);
}

void turnOutward(MeshWithSources& mesh, Adjacency& adjacency)
{
    MeshArrays const& arrays = mesh.arrays;
    Sheets const sheets = findSheets(arrays, adjacency);
    std::vector<bool> areClosed(sheets.count());
    std::vector<std::size_t> inward;
    for (std::size_t sheet = 0; sheet != sheets.count(); ++sheet) {
        areClosed[sheet] = isClosed(sheets.facesOf(sheet), arrays, adjacency);
        if (areClosed[sheet] && isInward(sheets.facesOf(sheet), arrays))
            inward.push_back(sheet);
    }
    if (inward.empty())
        return;
    std::vector<std::size_t> const cavities = findCavities(inward, sheets, areClosed, arrays);
    std::vector<unsigned char> isFlipped(arrays.faceCount(), 0);
    for (std::size_t const sheet : inward)
        if (!std::binary_search(cavities.begin(), cavities.end(), sheet))
            for (unsigned int const face : sheets.facesOf(sheet))
                isFlipped[face] = 1;
    flipFaces(isFlipped, mesh, adjacency);
}

unsigned int dropCopiedSheets(
    std::vector<std::array<unsigned int, 2>> const& twins, Adjacency const& adjacency, MeshWithSources& mesh)
{
    if (twins.empty())
        return 0;
    constexpr unsigned int kNone = Tessara::Geometry::kInvalidIndex;
    std::vector<unsigned int> twinOf(mesh.arrays.faceCount(), kNone);
    for (auto const& [face, twin] : twins) {
        twinOf[face] = twin;
        twinOf[twin] = face;
    }
    Sheets const sheets = findSheets(mesh.arrays, adjacency);
    std::vector<std::size_t> sheetOf(mesh.arrays.faceCount());
    for (std::size_t sheet = 0; sheet != sheets.count(); ++sheet)
        for (unsigned int const face : sheets.facesOf(sheet))
            sheetOf[face] = sheet;

    Orvan::Array<bool> isDropped(mesh.arrays.faceCount(), false);
    unsigned int droppedCount = 0;
    for (std::size_t sheet = sheets.count(); sheet-- != 0;) { // the lowest of two copies is kept
        std::span<unsigned int const> const faces = sheets.facesOf(sheet);
        bool const isCopy = std::all_of(faces.begin(), faces.end(), [&](unsigned int face) {
            return twinOf[face] != kNone && sheetOf[twinOf[face]] != sheet && !isDropped[twinOf[face]];
        });
        if (!isCopy || isClosed(faces, mesh.arrays, adjacency))
            continue;
        for (unsigned int const face : faces)
            isDropped[face] = true;
        droppedCount += static_cast<unsigned int>(faces.size());
    }
    if (droppedCount != 0)
        mesh.dropFaces(isDropped);
    return droppedCount;
}

}
