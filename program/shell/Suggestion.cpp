#include "Suggestion.h"

#include <fmt/format.h>

#include <algorithm>

namespace ModelingProgram {

namespace {

    /// The number of insertions, deletions, substitutions and swaps of adjacent characters that turn one text into the
    /// other (optimal string alignment distance).
    std::size_t editDistance(std::string const& a, std::string const& b)
    {
        std::vector<std::vector<std::size_t>> distance(a.size() + 1, std::vector<std::size_t>(b.size() + 1));
        for (std::size_t i = 0; i <= a.size(); ++i) {
            for (std::size_t j = 0; j <= b.size(); ++j) {
                std::size_t& least = distance[i][j];
                least = std::max(i, j);
                if (i == 0 || j == 0)
                    continue;
                bool const isEqual = a[i - 1] == b[j - 1];
                least = std::min(
                    {distance[i - 1][j] + 1, distance[i][j - 1] + 1, distance[i - 1][j - 1] + (isEqual ? 0u : 1u)});
                if (i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1])
                    least = std::min(least, distance[i - 2][j - 2] + 1);
            }
        }
        return distance[a.size()][b.size()];
    }

}

std::string suggestionFor(std::string const& text, std::vector<std::string> const& names)
{
    constexpr std::size_t kLongestName = 40; // also bounds the time that a long argument takes
    if (text.size() > kLongestName)
        return {};
    std::string const* best = nullptr;
    std::size_t bestDistance = 1 + (text.size() + 1) / 3;
    for (std::string const& name : names) {
        std::size_t const distance = name.starts_with(text) && text.size() > 2 ? 0 : editDistance(text, name);
        if (distance < bestDistance) {
            best = &name;
            bestDistance = distance;
        }
    }
    return best ? fmt::format("; did you mean {}?", *best) : std::string();
}

}
