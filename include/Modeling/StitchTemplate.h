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

/// The place of a strand end on a polygon edge.
struct pair {
    unsigned int strand = 0; ///< index in the template's strands
    bool end = false; ///< false: the strand's first control point; true: its last one

    friend bool operator==(pair const&, pair const&) = default;
};

/// A strand of a template.
struct LocalStrand {
    unsigned int polySize = 0; ///< corners of the polygon it was drawn in

    /// One weights array a control point, in the order of the strand: `polySize` + 1 entries, the weights of the
    /// corners and then the height over the polygon, in units of the polygon's mean edge length.
    Orvan::Array<Orvan::Array<float>> controlPoints;

    friend bool operator==(LocalStrand const&, LocalStrand const&) = default;
};

/// A pattern of strands that is drawn in one flat polygon and can be laid on any polygon with as many corners.
///
/// Each control point is kept as mean value coordinates of the polygon's corners and a height over it; neither the
/// polygon nor the positions are kept. For each edge of the polygon the template records which strands end there, so
/// that strands on neighbouring polygons can be tied together. Edge i runs from corner i to corner (i + 1) modulo
/// `polySize`.
///
///     StitchTemplate const loop(polygon, positions, offsets, true);
///     if (loop.getErrors().empty())
///         for (LocalStrand const& strand : loop.getStrands())
///             for (Orvan::Array<float> const& weights : strand.controlPoints)
///                 loop.findControlPointPos(corners, weights, scale, false, position);
///
/// Nothing here throws on bad input or returns a verdict: each fault appends a text of its own, such as
/// "---invalid input: polygon is empty---", to `errors`, without separators and in the order in which faults occur. A
/// template with empty `errors` is usable. All functions that take memory throw std::bad_alloc; the template is then
/// incomplete, but can be read, filled, assigned to and destroyed.
///
/// Any number of threads may read a template, which is all that `findControlPointPos` does. Filling one and computing
/// coordinates changes it. All arithmetic is in single precision and on the calling thread.
///
/// Coordinates: Hormann, Floater, "Mean value coordinates for arbitrary planar polygons", 2006.
class StitchTemplate {
public:
    /// An empty template, which is not usable: its `errors` is "---empty stitch template---".
    MODELING_EXPORT StitchTemplate();

    /// As `construct`, on a new template with empty `errors`.
    MODELING_EXPORT StitchTemplate(Orvan::Ptr<Orvan::Array<Math::float3>> const& polygon,
        Orvan::Ptr<Orvan::Array<Math::float3>> const& strandPositions,
        Orvan::Ptr<Orvan::Array<unsigned int>> const& strandOffsets, bool strict);

    /// From the only face of a mesh and from a strand set, both in the plane z = 0 as far as strands are flat.
    ///
    /// \param mesh       Its `sFaceVertex` and `sPointPosition` give the polygon: one corner for each entry of
    ///                   `sFaceVertex`. A face with corners at points that are not there counts as a missing polygon.
    /// \param strandSet  Its `sPointPosition` and `sStrandOffset` are taken as `construct` takes them.
    /// \param strict     As in `construct`. One of these texts ends the filling at its start, with `polySize` 0:
    ///                   "---input mesh not single polygon---", where the mesh has not exactly one face;
    ///                   "---input poly missing face_vertices property---";
    ///                   "---input poly missing point_positions property---".
    MODELING_EXPORT StitchTemplate(Tessara::Object const& mesh, Tessara::Object const& strandSet, bool strict);

    /// Fills the template.
    ///
    /// Each position becomes a control point with the weights that `computeMeanValueCoordinates` gives, and stays one
    /// whatever is wrong with it. The mean length of the polygon's edges in the plane is the `scale` of the
    /// coordinates. Strand ends on polygon edges are recorded and brought into the order from corner i to corner i + 1:
    /// two of them by the weight of corner i, more of them, unless `strict`, by that of corner i + 1; of more that lie
    /// at one place only the one recorded last stays. An end at a corner is on no edge.
    ///
    /// `tol` is a fraction of the mean edge length on entry, and is overwritten by the length. Nothing is cleared:
    /// texts and strands come behind those that are there, and the recorded ends count strands from 0. So this is meant
    /// for a template that was never filled, and on a default-constructed one after `setErrors("")`.
    ///
    /// \param polygon          The corners in order, all with |z| up to the tolerance.
    /// \param strandPositions  The control points of all strands, one strand after the other.
    /// \param strandOffsets    Strand count + 1 entries: strand s has the positions from entry s up to but excluding
    ///                         that of s + 1. A strand whose entries fall or lead beyond the positions has no control
    ///                         points.
    /// \param strict           Asks for a closed pattern: every strand begins and ends on an edge, and every edge holds
    ///                         one or two ends.
    ///
    /// These texts end the filling, with the strands as they were:
    /// "---invalid input: missing polygon or strand---": an argument is null. Nothing has changed.
    /// "---invalid input: polygon is empty---"
    /// "---invalid input: polygon is degenerated---": one or two corners.
    /// "---invalid input: empty input strands offset---": fewer than two entries.
    /// "---invalid input: input polygon must lie in the xy plane---": a corner lies off it; `tol` is already a length.
    ///
    /// After these it goes on, so that all faults of a template are told at once; those of
    /// `computeMeanValueCoordinates` come among them, in front of the other texts of their control point: "---strand
    /// starting point not on polygon edge---" and "---strand ending point not on polygon edge---": only if `strict`;
    /// otherwise such an end is just not recorded. "---strand starting point on edge but outside of polygon---",
    /// "---strand ending point on edge but outside of polygon---": a weight of a corner of that edge is not positive;
    /// not recorded. "---polygon edge contains too few/many strand end points---": once for each edge that holds no end
    /// or more than two; only if `strict`. Its ends stay in the order in which they were recorded.
    ///
    /// Linear in the control points times the corners, and n log n in the ends on an edge. Takes one block of memory
    /// for each control point.
    MODELING_EXPORT void construct(Orvan::Ptr<Orvan::Array<Math::float3>> const& polygon,
        Orvan::Ptr<Orvan::Array<Math::float3>> const& strandPositions,
        Orvan::Ptr<Orvan::Array<unsigned int>> const& strandOffsets, bool strict);

    /// Mean value coordinates of a point for the corners of a polygon in the plane z = 0, and its height. They are
    /// positive inside a convex polygon, sum to 1 and give back the point; they are defined outside too, where some are
    /// negative.
    ///
    /// A point closer than `tol` to a corner gets the weight 1 there. One closer to an edge than about `tol` times
    /// `scale` over half its length, and between its ends, gets the weights of those two corners only.
    ///
    /// \param polygon  `polySize` corners, clockwise or counter-clockwise, convex or not
    /// \param weights  `polySize` + 1 entries, of which the first `polySize` must be zero: sums start from what they
    ///                 find
    /// \param scale    The unit of the height, and of the area tolerance `tol` * `scale`. Not zero.
    /// \return         The edge on which the point lies, of several the first; 0xFFFFFFFF where it lies on none.
    ///
    /// Appends to `errors`: "---control point too close to polygon vertex---", with the other weights as they came;
    /// "---point lies along polygon edge but too far out side of polygon---", where one of the two weights is below
    /// -0.2; "---point lies too far out side of polygon---", for each weight below -0.2. The weights are written all
    /// the same. Nothing guards the divisions: where the weights sum to 0 they come out infinite or not a number.
    ///
    /// Linear in the corners; takes memory only from 17 corners on.
    MODELING_EXPORT unsigned int computeMeanValueCoordinates(Orvan::Array<Math::float3> const& polygon,
        Math::float3 const& point, Orvan::Array<float>& weights, float scale);

    /// Where a control point comes to lie on another polygon, raised along a normal blended from those at its corners.
    ///
    /// \param polygon   `polySize` corners, in space; of arrays that hold less, what is there is taken
    /// \param weights   Of a control point. Without the last entry, the height, the point stays in the polygon.
    /// \param scale     The unit of the height, such as the mean edge length of this polygon.
    /// \param normals   One a corner, of any length. Where their blend is zero the position is not a number.
    /// \param flip      Lowers the point instead of raising it.
    /// \param position  The result; what it held does not matter.
    MODELING_EXPORT void findControlPointPos(Orvan::Array<Math::float3> const& polygon,
        Orvan::Array<float> const& weights, float scale, Orvan::Array<Math::float3> const& normals, bool flip,
        Math::float3& position) const;

    /// The same, raised along the normal of the triangle of the polygon's first three corners. Where they lie on a line
    /// the position is not a number; where there are fewer the point stays in the polygon.
    MODELING_EXPORT void findControlPointPos(Orvan::Array<Math::float3> const& polygon,
        Orvan::Array<float> const& weights, float scale, bool flip, Math::float3& position) const;

    MODELING_EXPORT unsigned int getPolySize() const;
    MODELING_EXPORT Orvan::Array<LocalStrand> const& getStrands() const;
    /// One entry an edge: the strand ends that lie on it.
    MODELING_EXPORT Orvan::Array<Orvan::Array<pair>> const& getEdgeEndpoints() const;
    MODELING_EXPORT Orvan::String const& getErrors() const;
    /// 0.02 at first; once `construct` has measured the polygon, that times its mean edge length.
    MODELING_EXPORT float getTol() const;

    // Nothing is checked: what is set is taken as it is.
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
