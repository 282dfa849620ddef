#pragma once

#include <OrvanCore/String.h>
#include <TessaraGeometryVolume/Export.h>

#include <string>
#include <utility>
#include <vector>

namespace TSR::Utils {

/// Selects names (of channels, of properties) by a list of patterns, such as "* -weight* weightTotal".
///
/// Entries are separated by any number of whitespace characters and commas. In an entry `*` matches any number of
/// characters, `?` one character (of UTF-8), and every other character itself; matching is case-sensitive. A leading
/// `^` or `-` makes the entry exclude names. The last entry that matches a name decides; a name that no entry matches
/// is not accepted. An empty list therefore accepts nothing, and neither does one that only excludes.
///
/// Any number of threads may call `accepts` at once.
class TESSARAGEOMETRYVOLUME_EXPORT ChannelParser {
public:
    /// Whether a list was well formed; if not, describes the first fault in a sentence.
    class Status {
    public:
        Status() = default;
        explicit Status(Orvan::String fault)
            : fault_(std::move(fault))
        {
        }

        explicit operator bool() const noexcept { return fault_.empty(); }
        /// Empty for a well-formed list. Owned by the status, so that it outlives the parser.
        Orvan::String const& message() const noexcept { return fault_; }

    private:
        Orvan::String fault_;
    };

    /// Accepts nothing until a list is parsed.
    ChannelParser() = default;
    ~ChannelParser() = default;

    /// Replaces the list. An entry is malformed if it is a `^` or `-` without a pattern, or begins with two of these
    /// signs. Malformed entries are skipped and the others are kept, so that a typo in one entry does not invert the
    /// meaning of the rest.
    /// \throws std::bad_alloc  the parser then keeps its old list
    Status parses(Orvan::String const& list);

    /// Whether the list selects the name. Allocates nothing; the time is at most proportional to the length of the name
    /// times that of the list.
    bool accepts(Orvan::String const& name) const;

private:
    struct Entry {
        std::string pattern;
        bool excludes;
    };

    std::vector<Entry> entries_;
};

}
