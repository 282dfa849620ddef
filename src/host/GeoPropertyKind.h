#pragma once

#include <OrvanCore/Ptr.h>
#include <TessaraObject/Object.h>

namespace Modeling {

/// The three kinds of geo properties, which are mutually exclusive. `None` is everything else.
enum class GeoPropertyKind : unsigned char { None, Component, Data, Range };

/// Decides which kind of geo property an object is. Holds the host's prototypes: fetching them for each property would
/// make all threads contend for their reference counts.
class GeoPropertyClassifier {
public:
    GeoPropertyClassifier();

    GeoPropertyKind kindOf(Tessara::Object const& property) const;
    /// `None` also for values that hold no object, or a null one.
    GeoPropertyKind kindOf(Tessara::PropertyValue const& value) const;

private:
    Orvan::Ptr<Tessara::Object> component_;
    Orvan::Ptr<Tessara::Object> data_;
    Orvan::Ptr<Tessara::Object> range_;
};

}
