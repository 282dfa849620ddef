#include <OrvanCppOpSDK/Job.h>
#include <TessaraGeometryVolume/Canceller.h>
#include <TessaraGeometryVolume/ChannelParser.h>
#include <TessaraMathSupport/ExceptionMessage.h>
#include <TessaraMathSupport/Stepper.h>
#include <TessaraSpatial/SpatialQuery.h>

#include "LeanJob.h"

#include <algorithm>
#include <atomic>
#include <sstream>

namespace {

std::atomic<bool> isCancelled = false;

}

namespace Orvan {

bool isJobCancelled()
{
    return isCancelled;
}

}

void LeanHost::setJobCancelled(bool cancelled)
{
    isCancelled = cancelled;
}

namespace TSR {

Orvan::String const exceptionMessage = "the job was cancelled";

void Canceller::cancelID(ID&)
{
}

Utils::ChannelParser::Status Utils::ChannelParser::parses(Orvan::String const& list)
{
    std::istringstream words(list.c_str());
    names_.clear();
    for (std::string name; words >> name;)
        names_.insert(name);
    return {};
}

bool Utils::ChannelParser::accepts(Orvan::String const& name) const
{
    return names_.contains("*") || names_.contains(name.c_str());
}

}

namespace Tessara {

Math::Stepper::Stepper(float amount, float limit)
    : remainder_(amount)
    , limit_(limit)
{
}

namespace SpatialQuery {

    namespace {

        double doubledArea(Math::float2 const& a, Math::float2 const& b, Math::float2 const& c)
        {
            return (double{b.x} - a.x) * (double{c.y} - a.y) - (double{b.y} - a.y) * (double{c.x} - a.x);
        }

    }

    PointEdgeOrientation pointEdgeOrientation(Math::float2 const& a, Math::float2 const& b, Math::float2 const& c)
    {
        double const area = doubledArea(a, b, c);
        return PointEdgeOrientation(area > 0 ? 1 : area < 0 ? 2 : 0);
    }

    bool pointInTriangle(Math::float2 const& p, Math::float2 const& a, Math::float2 const& b, Math::float2 const& c,
        float& u, float& v, float& w, int* out)
    {
        double const area = doubledArea(a, b, c);
        u = static_cast<float>(doubledArea(p, b, c) / area);
        v = static_cast<float>(doubledArea(p, c, a) / area);
        w = static_cast<float>(doubledArea(p, a, b) / area);
        bool const isInside = std::min({u, v, w}) > 0; // NaN in a flat triangle, which contains nothing
        if (out)
            *out = isInside;
        return isInside;
    }

}

}
