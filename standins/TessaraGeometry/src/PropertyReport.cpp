#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include "GeoProps.h"

#include <algorithm>
#include <map>
#include <optional>
#include <string>

namespace Tessara::Geometry {

namespace {

    using std::to_string;

    constexpr char const* kStandardNames[] = {sPointPosition, sFaceVertex, sFaceOffset, sStrandOffset};

    bool isStandard(Orvan::String const& name)
    {
        return std::any_of(
            std::begin(kStandardNames), std::end(kStandardNames), [&](auto const* n) { return name == n; });
    }

    /// The length of the array that a data property holds; nullopt if it holds no array of a known element type.
    std::optional<std::uint64_t> dataLength(Object const& property)
    {
        std::optional<std::uint64_t> length;
        visitArray(property.getProperty(sData), [&](auto const& array, auto) { length = array.size; });
        return length;
    }

    class Report {
    public:
        explicit Report(Object const& object)
            : object_(object)
        {
        }

        Orvan::Array<Orvan::String> make()
        {
            auto const dataNames = getGeoPropNamesByPrototype(object_, *getDataGeoPropPrototype(sGenericDataGeoProp));
            for (Orvan::String const& name : dataNames)
                examineData(name);
            for (Orvan::String const& name : getGeoPropNamesByPrototype(object_, *getRangeGeoPropPrototype()))
                examineRange(name);
            return std::move(sentences_);
        }

    private:
        void examineData(Orvan::String const& name)
        {
            auto const length = dataLength(*getDataGeoProperty(object_, name));
            if (isStandard(name))
                return;
            Orvan::String const target = getGeoPropTargetName(object_, name);
            if (!length)
                add(Internal::quoted(name) + " holds no array of a known element type");
            else if (getRangeGeoProperty(object_, target))
                noteRangeData(target, name, *length);
            else
                examineLength(name, target, *length);
        }

        void examineRange(Orvan::String const& name)
        {
            auto const indices = getRangeGeoPropIndices(object_, name);
            if (!indices) {
                add(Internal::quoted(name) + " holds no indices");
                return;
            }
            Orvan::String const target = getGeoPropTargetName(object_, name);
            if (!getRangeGeoProperty(object_, target))
                examineLength(name, target, indices->size);
            auto const data = shortestData_.find(name);
            if (data == shortestData_.end())
                return;
            auto const beyond = std::find_if(indices->begin(), indices->end(),
                [&](unsigned int index) { return index != kInvalidIndex && index >= data->second.length; });
            if (beyond != indices->end())
                add(Internal::quoted(name) + "[" + to_string(beyond - indices->begin()) + "] is " + to_string(*beyond)
                    + ", but " + Internal::quoted(data->second.name) + " has " + to_string(data->second.length)
                    + " values");
        }

        void examineLength(Orvan::String const& name, Orvan::String const& target, std::uint64_t length)
        {
            Orvan::Ptr<Object> const component = Internal::objectAt(object_, target.view());
            if (!component || !Object::isA(*component, *getComponentGeoPropPrototype())) {
                add(Internal::quoted(name) + " targets " + Internal::quoted(target) + ", which does not exist");
                return;
            }
            unsigned int const count = getElementCount(object_, target);
            if (length != count)
                add(Internal::quoted(name) + " has " + to_string(length) + " entries for " + to_string(count)
                    + " elements of " + std::string(target.view()));
        }

        void noteRangeData(Orvan::String const& range, Orvan::String const& name, std::uint64_t length)
        {
            auto const [entry, isFirst] = shortestData_.try_emplace(range, RangeData{name, length});
            if (!isFirst && length < entry->second.length)
                entry->second = {name, length};
        }

        void add(std::string const& sentence) { sentences_.append(Orvan::String(sentence)); }

        struct RangeData {
            Orvan::String name;
            std::uint64_t length;
        };

        Object const& object_;
        std::map<Orvan::String, RangeData> shortestData_;
        Orvan::Array<Orvan::String> sentences_;
    };

}

Orvan::Array<Orvan::String> reportProperties(Object const& object)
{
    return Report(object).make();
}

}
