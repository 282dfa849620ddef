#include "Bags.h"

#include <Modeling/triangulate.h>
#include <TessaraGeometryVolume/ChannelParser.h>

#include <string>
#include <string_view>
#include <vector>

// Channel lists: the first line is a list, the others are names. A name is accepted if a plain matcher says so, and
// `triangulate` keeps just the accepted properties.

namespace Fuzzing {

namespace {

    using Lines = std::vector<std::string>;

    /// Without empty ones.
    Lines split(std::string_view text, std::string_view separators)
    {
        Lines parts;
        for (std::size_t start = text.find_first_not_of(separators); start != text.npos;) {
            std::size_t const end = std::min(text.find_first_of(separators, start), text.size());
            parts.emplace_back(text.substr(start, end - start));
            start = text.find_first_not_of(separators, end);
        }
        return parts;
    }

    bool isContinuation(char byte)
    {
        return (static_cast<unsigned char>(byte) & 0xC0) == 0x80;
    }

    /// Entry i, for the rest of the pattern, tells whether it matches the name from byte i on.
    bool matchesPlainly(std::string_view pattern, std::string_view name)
    {
        std::size_t const length = name.size();
        std::vector<bool> rest(length + 1, false);
        rest[length] = true;
        for (std::size_t at = pattern.size(); at-- != 0;) {
            std::vector<bool> longer(length + 1, false);
            for (std::size_t i = length + 1; i-- != 0;) {
                std::size_t next = i + 1; // after the character at i
                while (next < length && isContinuation(name[next]))
                    ++next;
                longer[i] = pattern[at] == '*' ? rest[i] || (i < length && longer[i + 1])
                    : pattern[at] == '?'       ? i < length && rest[next]
                                               : i < length && name[i] == pattern[at] && rest[i + 1];
            }
            rest = std::move(longer);
        }
        return rest[0];
    }

    bool isSign(char c)
    {
        return c == '^' || c == '-';
    }

    bool isMalformed(std::string_view entry)
    {
        return isSign(entry[0]) && (entry.size() == 1 || isSign(entry[1]));
    }

    bool acceptsPlainly(Lines const& entries, std::string_view name)
    {
        bool isAccepted = false;
        for (std::string_view entry : entries) {
            if (isMalformed(entry))
                continue;
            bool const excludes = isSign(entry[0]);
            if (matchesPlainly(entry.substr(excludes ? 1 : 0), name))
                isAccepted = !excludes;
        }
        return isAccepted;
    }

    void checkTriangulate(Orvan::String const& list, TSR::Utils::ChannelParser const& parser, Lines const& names)
    {
        auto const mesh = PolygonMesh::quads(2).build();
        for (std::string const& name : names)
            addDataProperty<float>(Orvan::String(name), name.size() % 2 == 0 ? sFaceComp : sFaceVertexComp,
                Orvan::Array<float>(name.size() % 2 == 0 ? 4 : 16), *mesh);
        if (!isValid(*mesh))
            return; // a name is one of the host's
        Geometry::Mesh::triangulate(list, *mesh);
        require(isValid(*mesh) && getElementCount(*mesh, sFaceComp) == 8, "quads become triangles");
        for (std::string const& name : names)
            require(mesh->hasProperty(Orvan::String(name)) == parser.accepts(Orvan::String(name)),
                "accepted properties are kept");
    }

}

}

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size)
{
    using namespace Fuzzing;
    std::string_view const text(reinterpret_cast<char const*>(data), size);
    std::size_t const end = std::min(text.find('\n'), text.size());
    Lines const names = split(text.substr(end), "\n"), entries = split(text.substr(0, end), " \t\n\v\f\r,");
    Orvan::String const list(text.substr(0, end));
    TSR::Utils::ChannelParser parser;
    auto const status = parser.parses(list);
    require(static_cast<bool>(status) == std::none_of(entries.begin(), entries.end(), isMalformed),
        "malformed entries are reported");
    for (std::string const& name : names)
        require(parser.accepts(Orvan::String(name)) == acceptsPlainly(entries, name), "names match");
    checkTriangulate(list, parser, names);
    return 0;
}
