#include <Modeling/copyNonGeoProperties.h>

#include "copyNonGeoProperties.h"
#include "host/GeoPropertyKind.h"

#include <utility>

namespace Modeling::Internal {

using Tessara::Object;
using Tessara::PropertyValue;

namespace {

    void copyNonGeoPropertiesOf(Object const& input, GeoPropertyClassifier const& classifier, Object& output)
    {
        Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = input.keys();
        for (Orvan::String const& key : *keys) {
            if (key.empty() || output.hasProperty(key))
                continue;
            PropertyValue value = input.getProperty(key);
            if (classifier.kindOf(value) == GeoPropertyKind::None)
                output.setProperty(key, std::move(value));
        }
    }

}

void copyNonGeoProperties(MergePlan const& plan, Object& output)
{
    GeoPropertyClassifier const classifier;
    forEachLayout(plan, [&](MergeInput const& input) { copyNonGeoPropertiesOf(*input.object, classifier, output); });
}

}

namespace Tessara::GeometryAlgorithms {

void copyNonGeoProperties(Orvan::Array<Orvan::Ptr<Object>> const& inputs, Object& output)
{
    Modeling::GeoPropertyClassifier const classifier;
    for (Orvan::Ptr<Object> const& input : inputs)
        if (input)
            Modeling::Internal::copyNonGeoPropertiesOf(*input, classifier, output);
}

}
