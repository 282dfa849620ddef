#include <Modeling/StitchTemplate.h>

#include "frame/Assert.h"
#include "frame/VectorMath.h"
#include "host/MeshArrays.h"
#include "weighCorners.h"

#include <algorithm>
#include <cmath>
#include <optional>
#include <span>
#include <utility>
#include <vector>

namespace Tessara::Modeling {

using namespace ::Modeling;

namespace {

    using Points = Orvan::Array<float3>;
    using Weights = Orvan::Array<float>;

    using ::Modeling::Internal::kNoEdge;

    constexpr unsigned int nextCorner(unsigned int corner, unsigned int polySize)
    {
        return corner + 1 == polySize ? 0 : corner + 1;
    }

    float meanEdgeLength(Points const& polygon, unsigned int polySize)
    {
        float sum = 0;
        for (unsigned int i = 0; i != polySize; ++i) {
            float3 const edge = polygon[nextCorner(i, polySize)] - polygon[i];
            sum += std::sqrt(edge.x * edge.x + edge.y * edge.y);
        }
        return sum / static_cast<float>(polySize);
    }

    bool isFlat(Points const& polygon, float tolerance)
    {
        return std::none_of(
            polygon.begin(), polygon.end(), [=](float3 const& corner) { return std::fabs(corner.z) > tolerance; });
    }

    /// The positions of the corners of a face; null if a point index is out of range.
    Orvan::Ptr<Points> cornersOfFace(IndexArray const& faceVertex, Points const& positions)
    {
        auto polygon = Orvan::MutablePtr<Points>::make(faceVertex.size, Orvan::kUninitialized);
        for (std::uint64_t corner = 0; corner != faceVertex.size; ++corner) {
            if (faceVertex[corner] >= positions.size)
                return nullptr;
            (*polygon)[corner] = positions[faceVertex[corner]];
        }
        return polygon;
    }

    /// Empty if the offsets decrease or lead beyond the positions.
    std::span<float3 const> pointsOfStrand(IndexArray const& offsets, std::uint64_t strand, Points const& positions)
    {
        OffsetView const strands(offsets);
        unsigned int const size = strands.sizeWithin(positions.size, strand);
        if (size == 0)
            return {};
        return {positions.data + strands.begin(strand), size};
    }

    /// The weight of a corner at a strand end; 0 for strands from `setStrands` that lack it.
    float weightAt(pair const& place, unsigned int corner, Orvan::Array<LocalStrand> const& strands)
    {
        if (place.strand >= strands.size || strands[place.strand].controlPoints.empty())
            return 0;
        auto const& controlPoints = strands[place.strand].controlPoints;
        Weights const& weights = controlPoints[place.end ? controlPoints.size - 1 : 0];
        return corner < weights.size ? weights[corner] : 0;
    }

    /// Sorts the ends by ascending weight of a corner. Of ends with equal weights only the last one is kept.
    Orvan::Array<pair> sortEnds(
        Orvan::Array<pair> const& ends, unsigned int corner, Orvan::Array<LocalStrand> const& strands)
    {
        std::vector<std::pair<float, std::uint64_t>> order;
        order.reserve(ends.size);
        for (std::uint64_t i = 0; i != ends.size; ++i) {
            float const weight = weightAt(ends[i], corner, strands);
            order.emplace_back(std::isnan(weight) ? 0.0f : weight, i); // NaN only with weights from `setStrands`
        }
        std::sort(order.begin(), order.end());

        Orvan::Array<pair> sorted;
        sorted.reserve(ends.size);
        for (std::size_t i = 0; i != order.size(); ++i)
            if (i + 1 == order.size() || order[i].first != order[i + 1].first)
                sorted.append(ends[order[i].second]);
        return sorted;
    }

    float3 blend(Points const& vectors, Weights const& weights, unsigned int polySize)
    {
        std::uint64_t const count = std::min<std::uint64_t>({polySize, vectors.size, weights.size});
        float3 sum{0, 0, 0};
        for (std::uint64_t i = 0; i != count; ++i)
            sum = sum + vectors[i] * weights[i];
        return sum;
    }

    /// Moves a point along a normal of any length. Divides by that length: the result is NaN if it is 0.
    float3 offsetAlong(float3 const& base, float3 const& normal, float height, float scale, bool flip)
    {
        float const norm = length(normal);
        float3 const direction{normal.x / norm, normal.y / norm, normal.z / norm};
        float3 const offset = (direction * height) * scale;
        return flip ? base - offset : base + offset;
    }

}

StitchTemplate::StitchTemplate()
    : errors_("---empty stitch template---")
{
}

StitchTemplate::StitchTemplate(Orvan::Ptr<Points> const& polygon, Orvan::Ptr<Points> const& strandPositions,
    Orvan::Ptr<IndexArray> const& strandOffsets, bool strict)
{
    construct(polygon, strandPositions, strandOffsets, strict);
}

StitchTemplate::StitchTemplate(Tessara::Object const& mesh, Tessara::Object const& strandSet, bool strict)
{
    using namespace Tessara::Geometry;
    MeshArrays const polygon = readMeshArrays(mesh);
    if (polygon.faceCount != 1) {
        errors_ += "---input mesh not single polygon---";
        return;
    }
    if (!polygon.faceVertex) {
        errors_ += "---input poly missing face_vertices property---";
        return;
    }
    if (!polygon.positions) {
        errors_ += "---input poly missing point_positions property---";
        return;
    }
    construct(cornersOfFace(*polygon.faceVertex, *polygon.positions),
        readGeoPropData<float3>(strandSet, sPointPosition), readGeoPropData<unsigned int>(strandSet, sStrandOffset),
        strict);
}

void StitchTemplate::construct(Orvan::Ptr<Points> const& polygon, Orvan::Ptr<Points> const& strandPositions,
    Orvan::Ptr<IndexArray> const& strandOffsets, bool strict)
{
    std::optional<float> const scale = measurePolygon(polygon.get(), strandPositions.get(), strandOffsets.get());
    if (!scale)
        return;
    std::uint64_t const strandCount = strandOffsets->size - 1;
    strands_.reserve(strands_.size + strandCount);
    for (std::uint64_t strand = 0; strand != strandCount; ++strand)
        appendStrand(*polygon, pointsOfStrand(*strandOffsets, strand, *strandPositions),
            static_cast<unsigned int>(strand), *scale, strict);
    for (unsigned int edge = 0; edge != polySize_; ++edge)
        orderEndsOnEdge(edge, strict);
}

std::optional<float> StitchTemplate::measurePolygon(
    Points const* polygon, Points const* strandPositions, IndexArray const* strandOffsets)
{
    auto const refuse = [this](char const* error) {
        errors_ += error;
        return std::nullopt;
    };
    if (!polygon || !strandPositions || !strandOffsets)
        return refuse("---invalid input: missing polygon or strand---");
    polySize_ = static_cast<unsigned int>(polygon->size);
    edgeEndpoints_.resize(polySize_);
    if (polySize_ == 0)
        return refuse("---invalid input: polygon is empty---");
    if (polySize_ < 3)
        return refuse("---invalid input: polygon is degenerated---");
    if (strandOffsets->size < 2)
        return refuse("---invalid input: empty input strands offset---");

    float const scale = meanEdgeLength(*polygon, polySize_);
    tol_ *= scale;
    if (!isFlat(*polygon, tol_))
        return refuse("---invalid input: input polygon must lie in the xy plane---");
    return scale;
}

void StitchTemplate::appendStrand(
    Points const& polygon, std::span<float3 const> points, unsigned int number, float scale, bool strict)
{
    LocalStrand strand{polySize_, {}};
    strand.controlPoints.reserve(points.size());
    for (std::size_t point = 0; point != points.size(); ++point) {
        Weights weights(std::uint64_t{polySize_} + 1);
        unsigned int const edge = computeMeanValueCoordinates(polygon, points[point], weights, scale);
        if (point == 0)
            recordEnd({number, false}, edge, weights, strict);
        if (point == points.size() - 1)
            recordEnd({number, true}, edge, weights, strict);
        strand.controlPoints.append(std::move(weights));
    }
    strands_.append(std::move(strand));
}

void StitchTemplate::recordEnd(pair const& place, unsigned int edge, Weights const& weights, bool strict)
{
    MODELING_ASSERT(edge == kNoEdge || edge < edgeEndpoints_.size);
    if (edge == kNoEdge) {
        if (strict)
            errors_ += place.end ? "---strand ending point not on polygon edge---"
                                 : "---strand starting point not on polygon edge---";
    } else if (weights[edge] > 0 && weights[nextCorner(edge, polySize_)] > 0) {
        edgeEndpoints_[edge].append(place);
    } else {
        errors_ += place.end ? "---strand ending point on edge but outside of polygon---"
                             : "---strand starting point on edge but outside of polygon---";
    }
}

void StitchTemplate::orderEndsOnEdge(unsigned int edge, bool strict)
{
    Orvan::Array<pair>& ends = edgeEndpoints_[edge];
    if (ends.size == 2) {
        // The end closer to the first corner of the edge comes first.
        if (weightAt(ends[1], edge, strands_) > weightAt(ends[0], edge, strands_))
            std::swap(ends[0], ends[1]);
    } else if (ends.size != 1 && strict) {
        errors_ += "---polygon edge contains too few/many strand end points---";
    } else if (ends.size > 2) {
        ends = sortEnds(ends, nextCorner(edge, polySize_), strands_);
    }
}

unsigned int StitchTemplate::computeMeanValueCoordinates(
    Points const& polygon, float3 const& point, Weights& weights, float scale)
{
    MODELING_ASSERT(polygon.size >= polySize_ && weights.size > polySize_);
    weights[polySize_] = point.z / scale;
    if (polySize_ == 0)
        return kNoEdge;

    auto const place =
        ::Modeling::Internal::weighCorners({polygon.data, polySize_}, point, tol_, tol_ * scale, weights.data);
    if (place.isAtCorner)
        errors_ += "---control point too close to polygon vertex---";
    else if (place.edge != kNoEdge && place.tooFarOutside != 0)
        errors_ += "---point lies along polygon edge but too far out side of polygon---";
    else
        for (std::size_t corner = 0; corner != place.tooFarOutside; ++corner)
            errors_ += "---point lies too far out side of polygon---";
    return place.edge;
}

void StitchTemplate::findControlPointPos(Points const& polygon, Weights const& weights, float scale,
    Points const& normals, bool flip, float3& position) const
{
    float3 const base = blend(polygon, weights, polySize_);
    bool const hasHeight = weights.size > polySize_;
    position =
        hasHeight ? offsetAlong(base, blend(normals, weights, polySize_), weights[polySize_], scale, flip) : base;
}

void StitchTemplate::findControlPointPos(
    Points const& polygon, Weights const& weights, float scale, bool flip, float3& position) const
{
    float3 const base = blend(polygon, weights, polySize_);
    if (polygon.size < 3 || weights.size <= polySize_) {
        position = base;
        return;
    }
    float3 const normal = cross(polygon[1] - polygon[0], polygon[2] - polygon[0]);
    position = offsetAlong(base, normal, weights[polySize_], scale, flip);
}

unsigned int StitchTemplate::getPolySize() const
{
    return polySize_;
}

Orvan::Array<LocalStrand> const& StitchTemplate::getStrands() const
{
    return strands_;
}

Orvan::Array<Orvan::Array<pair>> const& StitchTemplate::getEdgeEndpoints() const
{
    return edgeEndpoints_;
}

Orvan::String const& StitchTemplate::getErrors() const
{
    return errors_;
}

float StitchTemplate::getTol() const
{
    return tol_;
}

void StitchTemplate::setPolySize(unsigned int polySize)
{
    polySize_ = polySize;
}

void StitchTemplate::setStrands(Orvan::Array<LocalStrand> const& strands)
{
    strands_ = strands;
}

void StitchTemplate::setEdgeEndpoints(Orvan::Array<Orvan::Array<pair>> const& edgeEndpoints)
{
    edgeEndpoints_ = edgeEndpoints;
}

void StitchTemplate::setErrors(Orvan::String const& errors)
{
    errors_ = errors;
}

void StitchTemplate::setTol(float tol)
{
    tol_ = tol;
}

}
