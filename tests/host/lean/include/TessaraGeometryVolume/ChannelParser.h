#pragma once

#include <OrvanCore/String.h>

#include <set>
#include <string>

namespace TSR::Utils {

/// A list is names between blanks; "*" selects all.
class ChannelParser {
public:
    class Status { };

    ChannelParser() = default;
    ~ChannelParser() = default;
    Status parses(Orvan::String const& list);
    bool accepts(Orvan::String const& name) const;

private:
    std::set<std::string> names_;
};

}
