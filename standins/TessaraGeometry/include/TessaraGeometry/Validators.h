#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

#include <utility>

namespace Tessara::Geometry {

// The validators check the standard geometry strictly, and nothing else:
// - all components of the kind exist (and no others in a point cloud), and all standard properties exist with the right
//   element type, target and type of `sDefault`;
// - position and index arrays are as long as their component, offset arrays one entry longer;
// - offsets start at 0, are non-decreasing and end at the number of corners; point indices are in range. Offsets of
//   strands end at the number of points, and may start above 0: the points before the first strand belong to none.
// A mesh without faces has no corners, but may have points; so may a strand set without strands, whose only offset is
// then 0 or the number of points. Positions need not be finite. Empty geometry is valid. Other properties never make an
// object invalid, whatever their length is: operations pad, trim or drop them. `reportProperties` describes them.
//
// Any number of threads may validate the same object at once. Linear in the length of the standard arrays.

namespace GeoValidator {

    /// Whether an object is valid; if not, a sentence about the first failure names the property and the element.
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
        /// Empty for a valid object. Owned by the status, so that it outlives the validator and the object.
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

/// Describes suspicious properties that the validators ignore, in one sentence each: lengths that do not match the
/// target, range entries beyond the data that targets the range, missing targets, data without an array of one of the
/// forty element types, ranges without indices. None of these makes an object invalid.
TESSARAGEOMETRY_EXPORT Orvan::Array<Orvan::String> reportProperties(Object const& object);

}
