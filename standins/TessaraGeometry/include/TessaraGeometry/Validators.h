#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

#include <utility>

namespace Tessara::Geometry {

// The validators check the standard geometry strictly, and nothing else:
// - all components of the kind are there (a point cloud has no other component), all standard properties are there with
//   the right element type, target and type of `sDefault`;
// - position and index arrays are as long as their component, offset arrays one entry longer;
// - offsets start at 0, are non-decreasing and end at the number of corners; point indices are in range. Offsets of
//   strands end at the number of points, and may start above 0: the points in front of that belong to no strand.
// A mesh without faces has no corners but may hold points; so may a strand set without strands, whose one offset is
// then 0 or the number of points. Positions need not be finite. Empty geometry is valid. Other properties make no
// object invalid, not by their length either: operations pad, trim or drop them; `reportProperties` tells about them.
//
// All of it may run on many threads for one object at once; linear in the standard arrays.

namespace GeoValidator {

    /// Whether an object passed, and otherwise the first failure in a sentence that names property and element.
    class Status {
    public:
        Status() = default;
        explicit Status(Orvan::String failure)
            : failure_(std::move(failure))
        {
        }
        ~Status() = default;
        Status(Status const&) = default;
        Status(Status&&) = default;
        Status& operator=(Status const&) = default;
        Status& operator=(Status&&) = default;

        explicit operator bool() const noexcept { return failure_.empty(); }
        /// Empty for a valid object. Belongs to the status: it outlives validator and object.
        Orvan::String const& message() const noexcept { return failure_; }

    private:
        Orvan::String failure_;
    };

}

TESSARAGEOMETRY_EXPORT GeoValidator::Status validateMesh(Object const& mesh);

class TESSARAGEOMETRY_EXPORT PointCloudValidator {
public:
    PointCloudValidator() = default;
    PointCloudValidator(PointCloudValidator const&) = default;
    PointCloudValidator& operator=(PointCloudValidator const&) = default;
    virtual ~PointCloudValidator() = default;
    virtual GeoValidator::Status validate(Object const& pointCloud);
};

class TESSARAGEOMETRY_EXPORT StrandValidator {
public:
    StrandValidator() = default;
    StrandValidator(StrandValidator const&) = default;
    StrandValidator& operator=(StrandValidator const&) = default;
    virtual ~StrandValidator() = default;
    virtual GeoValidator::Status validate(Object const& strands);
};

/// What is odd in properties that the validators do not look at, a sentence each: lengths that do not fit the target's,
/// range entries beyond the data that targets the range, targets that are not there. None of it makes an object
/// invalid.
TESSARAGEOMETRY_EXPORT Orvan::Array<Orvan::String> reportProperties(Object const& object);

}
