#include <TessaraGeometryVolume/ChannelParser.h>

#include <algorithm>
#include <string_view>

namespace TSR::Utils {

namespace {

    constexpr std::string_view kSeparators = " \t\n\v\f\r,";
    constexpr std::string_view kExcludingSigns = "^-";

    // The position after the UTF-8 character at `position`.
    std::size_t nextCharacter(std::string_view text, std::size_t position)
    {
        ++position;
        while (position < text.size() && (static_cast<unsigned char>(text[position]) & 0xC0) == 0x80)
            ++position;
        return position;
    }

    // On a mismatch only the last `*` is extended, by one byte: extending an earlier one could not match more. The time
    // is therefore at most proportional to the pattern's length times the name's.
    bool matches(std::string_view pattern, std::string_view name)
    {
        std::size_t at = 0;
        std::size_t afterStar = std::string_view::npos;
        std::size_t starEnd = 0; // the star covers the name up to here
        for (std::size_t position = 0; position < name.size();) {
            if (at < pattern.size() && pattern[at] == '*') {
                afterStar = ++at;
                starEnd = position;
            } else if (at < pattern.size() && pattern[at] == '?') {
                ++at;
                position = nextCharacter(name, position);
            } else if (at < pattern.size() && pattern[at] == name[position]) {
                ++at;
                ++position;
            } else if (afterStar != std::string_view::npos) {
                at = afterStar;
                position = ++starEnd;
            } else {
                return false;
            }
        }
        return pattern.find_first_not_of('*', at) == std::string_view::npos;
    }

    std::string describeFault(std::string_view entry, std::size_t position)
    {
        char const* const fault = entry.size() == 1 ? "excludes nothing" : "has two signs of exclusion";
        return "\"" + std::string(entry) + "\" at character " + std::to_string(position + 1) + " of the list " + fault;
    }

}

ChannelParser::Status ChannelParser::parses(Orvan::String const& list)
{
    std::vector<Entry> entries;
    std::string firstFault;
    std::string_view const text = list.view();
    std::size_t start = text.find_first_not_of(kSeparators);
    while (start != std::string_view::npos) {
        std::size_t const end = std::min(text.find_first_of(kSeparators, start), text.size());
        std::string_view const entry = text.substr(start, end - start);
        bool const excludes = kExcludingSigns.find(entry.front()) != std::string_view::npos;
        std::string_view const pattern = entry.substr(excludes ? 1 : 0);
        bool const malformed =
            pattern.empty() || (excludes && kExcludingSigns.find(pattern.front()) != std::string_view::npos);
        if (!malformed)
            entries.push_back({std::string(pattern), excludes});
        else if (firstFault.empty())
            firstFault = describeFault(entry, start);
        start = text.find_first_not_of(kSeparators, end);
    }
    Status status{Orvan::String(firstFault)};
    entries_ = std::move(entries);
    return status;
}

bool ChannelParser::accepts(Orvan::String const& name) const
{
    auto const decides = [&](Entry const& entry) { return matches(entry.pattern, name.view()); };
    auto const deciding = std::find_if(entries_.rbegin(), entries_.rend(), decides);
    return deciding != entries_.rend() && !deciding->excludes;
}

}
