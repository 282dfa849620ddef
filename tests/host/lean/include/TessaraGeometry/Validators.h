#pragma once

#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

namespace GeoValidator {

    class Status {
    public:
        explicit Status(bool isValid)
            : isValid_(isValid)
        {
        }
        ~Status() { }
        operator bool() const { return isValid_; }

    private:
        bool isValid_;
    };

}

GeoValidator::Status validateMesh(Object const& mesh);

class PointCloudValidator {
public:
    PointCloudValidator() = default;
    virtual ~PointCloudValidator() = default;
    virtual GeoValidator::Status validate(Object const& pointCloud);
};

class StrandValidator {
public:
    StrandValidator() = default;
    virtual ~StrandValidator() = default;
    virtual GeoValidator::Status validate(Object const& strands);
};

}
