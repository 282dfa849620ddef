#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <optional>
#include <span>

namespace Tessara::Modeling {

/// A strand end on a polygon edge.
struct pair {
    unsigned int strand = 0; ///< index into the strands of the template
    bool end = false; ///< false: the strand's first control point; true: its last one

    friend bool operator==(pair const&, pair const&) = default;
};

/// A strand of a template.
struct LocalStrand {
    unsigned int polySize = 0; ///< number of corners of the polygon it was drawn in

    /// One array of weights per control point, in strand order. It has `polySize` + 1 entries: the weights of the
    /// corners, then the height above the polygon in units of the mean edge length of the polygon.
    Orvan::Array<Orvan::Array<float>> controlPoints;

    friend bool operator==(LocalStrand const&, LocalStrand const&) = default;
};

/// A pattern of strands, drawn in a flat polygon, that can be laid on any polygon with the same number of corners.
///
/// Each control point is stored as mean value coordinates with respect to the corners of the polygon, and a height
/// above it; neither the polygon nor the positions are kept. For each edge of the polygon the template records which
/// strands end there, so that strands on neighboring polygons can be connected. Edge i runs from corner i to corner
/// i + 1, and the last one to corner 0.
///
///     StitchTemplate const loop(polygon, positions, offsets, true);
///     if (loop.getErrors().empty())
///         for (LocalStrand const& strand : loop.getStrands())
///             for (Orvan::Array<float> const& weights : strand.controlPoints)
///                 loop.findControlPointPos(corners, weights, scale, false, position);
///
/// No function throws on bad input or returns a status: each error appends a fixed text, such as "---invalid input:
/// polygon is empty---", to `errors` (see `getErrors`), without separators and in the order in which errors occur. A
/// template with empty `errors` is usable. Functions that allocate throw std::bad_alloc; the template is then
/// incomplete, but can be read, filled, assigned to and destroyed.
///
/// Any number of threads may read a template concurrently, and `findControlPointPos` only reads it. Filling a template
/// and computing coordinates modify it. All computation is in single precision and on the calling thread.
///
/// Coordinates: Hormann, Floater, "Mean value coordinates for arbitrary planar polygons", 2006.
class StitchTemplate {
public:
    /// An empty template, which is unusable: its `errors` is "---empty stitch template---".
    MODELING_EXPORT StitchTemplate();

    /// Calls `construct` on a new template with empty `errors`.
    MODELING_EXPORT StitchTemplate(Orvan::Ptr<Orvan::Array<Math::float3>> const& polygon,
        Orvan::Ptr<Orvan::Array<Math::float3>> const& strandPositions,
        Orvan::Ptr<Orvan::Array<unsigned int>> const& strandOffsets, bool strict);

    /// Takes the polygon from the only face of a mesh, and the strands from a strand set.
    ///
    /// Three errors come before those of `construct`, and leave `polySize` 0:
    /// - "---input mesh not single polygon---": the mesh does not have exactly one face.
    /// - "---input poly missing face_vertices property---"
    /// - "---input poly missing point_positions property---"
    ///
    /// \param mesh       Its `sFaceVertex` and `sPointPosition` give the polygon: one corner per entry of
    ///                   `sFaceVertex`, in the plane z = 0. If a point index is out of range, the polygon counts as
    ///                   missing.
    /// \param strandSet  Its `sPointPosition` and `sStrandOffset` are the other arguments of `construct`.
    /// \param strict     As in `construct`.
    MODELING_EXPORT StitchTemplate(Tessara::Object const& mesh, Tessara::Object const& strandSet, bool strict);

    /// Fills the template.
    ///
    /// Each position becomes a control point with the weights from `computeMeanValueCoordinates`, even if it causes
    /// errors. The `scale` of the coordinates is the mean edge length of the polygon in the plane. The strand ends on
    /// edge i are recorded in order from corner i to corner i + 1. Two ends are sorted by descending weight of corner
    /// i. More than two are, unless `strict`, sorted by ascending weight of corner i + 1, and of ends with equal
    /// weights only the one recorded last is kept. An end at a corner is on no edge.
    ///
    /// On entry, `tol` is a fraction of the mean edge length; it is multiplied by that length. Nothing is cleared:
    /// texts and strands are appended to existing ones, although the recorded ends count strands from 0. So fill a
    /// template only once, and call `setErrors("")` first on a default-constructed one.
    ///
    /// \param polygon          The corners in order, each with |z| up to the resulting `tol`.
    /// \param strandPositions  The control points of all strands, one strand after the other.
    /// \param strandOffsets    Strand count + 1 entries: strand s has the positions from entry s up to but excluding
    ///                         entry s + 1. A strand whose entries decrease or lead beyond the positions has no control
    ///                         points.
    /// \param strict           Requires a closed pattern: every strand starts and ends on an edge, and every edge has
    ///                         one or two ends.
    ///
    /// These errors stop before any strand is added:
    /// - "---invalid input: missing polygon or strand---": an argument is null; nothing else has changed.
    /// - "---invalid input: polygon is empty---"
    /// - "---invalid input: polygon is degenerated---": one or two corners.
    /// - "---invalid input: empty input strands offset---": fewer than two entries.
    /// - "---invalid input: input polygon must lie in the xy plane---": a corner is off that plane; `tol` is already a
    ///   length.
    ///
    /// After the others, filling continues, so that all errors of a template are reported together. For each control
    /// point, those of `computeMeanValueCoordinates` come first:
    /// - "---strand starting point not on polygon edge---", "---strand ending point not on polygon edge---": only if
    ///   `strict`; otherwise such an end is not recorded.
    /// - "---strand starting point on edge but outside of polygon---",
    ///   "---strand ending point on edge but outside of polygon---": a corner of that edge has no positive weight; the
    ///   end is not recorded.
    /// - "---polygon edge contains too few/many strand end points---": once for each edge with no end or more than two,
    ///   only if `strict`. The ends of such an edge keep the order in which they were recorded.
    ///
    /// Takes time linear in the number of control points times the number of corners, and O(n log n) for n ends on an
    /// edge. Allocates one block of memory per control point.
    MODELING_EXPORT void construct(Orvan::Ptr<Orvan::Array<Math::float3>> const& polygon,
        Orvan::Ptr<Orvan::Array<Math::float3>> const& strandPositions,
        Orvan::Ptr<Orvan::Array<unsigned int>> const& strandOffsets, bool strict);

    /// Computes the mean value coordinates of a point with respect to the corners of a polygon in the plane z = 0, and
    /// its height above the plane. The coordinates sum to 1 and reproduce the point. They are positive inside a convex
    /// polygon; outside, where they are defined too, some are negative.
    ///
    /// A point closer than `tol` to a corner has weight 1 at that corner. A point between the ends of an edge of length
    /// l, and closer to the edge than about 2 * `tol` * `scale` / l, has weights at these two corners only.
    ///
    /// \param polygon  `polySize` corners, clockwise or counterclockwise, convex or not.
    /// \param weights  `polySize` + 1 entries: receives the coordinates, then the height. The first `polySize` must be
    ///                 zero on entry, because coordinates are added to them.
    /// \param scale    The unit of the height, not zero. The tolerance for triangle areas is `tol` * `scale`.
    /// \return         The first edge with the point on it; 0xFFFFFFFF if there is none.
    ///
    /// Appends to `errors`: "---control point too close to polygon vertex---", with the other weights unchanged;
    /// "---point lies along polygon edge but too far out side of polygon---" if one of the two weights is below
    /// -0.2; "---point lies too far out side of polygon---" for each weight below -0.2. The weights are written in all
    /// cases. Divisions are not guarded: if the weights sum to 0, they become infinite or NaN.
    ///
    /// Takes time linear in the number of corners. Apart from error texts, allocates only if there are more than 16
    /// corners.
    MODELING_EXPORT unsigned int computeMeanValueCoordinates(Orvan::Array<Math::float3> const& polygon,
        Math::float3 const& point, Orvan::Array<float>& weights, float scale);

    /// Computes the position of a control point on another polygon, offset by its height along a normal that is blended
    /// from the normals at the corners.
    ///
    /// \param polygon   `polySize` corners in space. Corners that this array, `weights` or `normals` lacks are ignored.
    /// \param weights   Of a control point. Without the last entry, the height, there is no offset.
    /// \param scale     The unit of the height, such as the mean edge length of this polygon.
    /// \param normals   One per corner, of any length. If their blend is zero, the position is NaN.
    /// \param flip      Offsets the point in the opposite direction.
    /// \param position  The result; its old value is ignored.
    MODELING_EXPORT void findControlPointPos(Orvan::Array<Math::float3> const& polygon,
        Orvan::Array<float> const& weights, float scale, Orvan::Array<Math::float3> const& normals, bool flip,
        Math::float3& position) const;

    /// The same, offset along the normal of the triangle of the first three corners. If these are collinear, the
    /// position is NaN; if there are fewer, there is no offset.
    MODELING_EXPORT void findControlPointPos(Orvan::Array<Math::float3> const& polygon,
        Orvan::Array<float> const& weights, float scale, bool flip, Math::float3& position) const;

    MODELING_EXPORT unsigned int getPolySize() const;
    MODELING_EXPORT Orvan::Array<LocalStrand> const& getStrands() const;
    /// One entry per edge: the strand ends on it.
    MODELING_EXPORT Orvan::Array<Orvan::Array<pair>> const& getEdgeEndpoints() const;
    MODELING_EXPORT Orvan::String const& getErrors() const;
    /// 0.02 by default; multiplied by the mean edge length once `construct` has measured the polygon.
    MODELING_EXPORT float getTol() const;

    // The setters check nothing.
    MODELING_EXPORT void setPolySize(unsigned int polySize);
    MODELING_EXPORT void setStrands(Orvan::Array<LocalStrand> const& strands);
    MODELING_EXPORT void setEdgeEndpoints(Orvan::Array<Orvan::Array<pair>> const& edgeEndpoints);
    MODELING_EXPORT void setErrors(Orvan::String const& errors);
    MODELING_EXPORT void setTol(float tol);

private:
    std::optional<float> measurePolygon(Orvan::Array<Math::float3> const* polygon,
        Orvan::Array<Math::float3> const* strandPositions, Orvan::Array<unsigned int> const* strandOffsets);
    void appendStrand(Orvan::Array<Math::float3> const& polygon, std::span<Math::float3 const> points,
        unsigned int number, float scale, bool strict);
    void recordEnd(pair const& place, unsigned int edge, Orvan::Array<float> const& weights, bool strict);
    void orderEndsOnEdge(unsigned int edge, bool strict);

    unsigned int polySize_ = 0;
    Orvan::Array<LocalStrand> strands_;
    Orvan::Array<Orvan::Array<pair>> edgeEndpoints_;
    Orvan::String errors_;
    float tol_ = 0.02f;
};

}
