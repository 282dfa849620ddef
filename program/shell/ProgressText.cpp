#include "ProgressText.h"

#include "Report.h"
#include "files/WorkMeter.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <vector>

namespace ModelingProgram {

namespace {

    std::string describeDuration(double seconds)
    {
        constexpr double kMostOfUnit = 100;
        double const minutes = seconds / 60;
        return seconds < kMostOfUnit ? fmt::format("{:.0f} s", seconds)
            : minutes < kMostOfUnit  ? fmt::format("{:.0f} min", minutes)
                                     : fmt::format("{:.0f} h", minutes / 60);
    }

    std::string describeAmount(std::uint64_t amount, char const* unit)
    {
        return unit == std::string_view(WorkMeter::kBytes) ? formatBytes(amount)
                                                           : fmt::format("{} {}", groupDigits(amount), unit);
    }

    double fractionOf(PhaseProgress const& phase)
    {
        constexpr double kMost = 0.99; // totals may be estimates
        return std::min(kMost, static_cast<double>(phase.done) / static_cast<double>(phase.total));
    }

    /// What is known of a phase, the most important first.
    std::vector<std::string> partsOf(PhaseProgress const& phase)
    {
        std::vector<std::string> parts;
        if (phase.total != 0)
            parts.push_back(fmt::format("{:.0f} %", std::floor(100 * fractionOf(phase))));
        else
            parts.push_back(describeDuration(phase.seconds));
        if (phase.unit && phase.total == 0)
            parts.push_back(describeAmount(phase.done, phase.unit));
        if (phase.total != 0 && phase.rate > 0 && phase.seconds >= 1) // before that, the rate says little
            parts.push_back(
                describeDuration(static_cast<double>(phase.total - std::min(phase.done, phase.total)) / phase.rate)
                + " left");
        if (phase.unit && phase.rate >= 1)
            parts.push_back(describeAmount(static_cast<std::uint64_t>(phase.rate), phase.unit) + "/s");
        return parts;
    }

    /// An upper bound: characters of three or four bytes may be two columns wide.
    std::size_t columnsOf(std::string_view text)
    {
        std::size_t width = 0;
        for (char const c : text)
            width += (c & '\xC0') == '\x80' ? 0 : static_cast<unsigned char>(c) >= 0xE0 ? 2 : 1;
        return width;
    }

    std::string cutTo(std::size_t width, std::string text)
    {
        while (columnsOf(text) > width)
            text.pop_back(); // the rest of a character has no width
        return text;
    }

}

std::string progressLine(PhaseProgress const& phase)
{
    return fmt::format("{}: {}", phase.title, fmt::join(partsOf(phase), ", "));
}

std::string progressBar(PhaseProgress const& phase, std::size_t columns, bool isColored)
{
    constexpr std::size_t kMostColumns = 100, kLeastTitle = 10, kLeastBar = 12, kMostBar = 40, kGap = 2;
    std::size_t free = std::min(columns, kMostColumns) - 1; // the last column would move the cursor to the next line
    std::string end;
    for (std::string const& part : partsOf(phase)) {
        if (std::min(kLeastTitle, columnsOf(phase.title)) + kGap + columnsOf(part) > free)
            break;
        end += std::string(kGap, ' ') + part;
        free -= kGap + columnsOf(part);
    }
    std::string line = cutTo(free, phase.title);
    free -= columnsOf(line);
    if (phase.total != 0 && free >= kGap + kLeastBar) {
        std::size_t const length = std::min(free - kGap, kMostBar) - 2; // without the brackets
        auto const full = static_cast<std::size_t>(fractionOf(phase) * static_cast<double>(length));
        line += fmt::format("  [{}{}{}{}]", isColored ? "\x1b[32m" : "", std::string(full, '#'),
            isColored ? "\x1b[0m" : "", std::string(length - full, '-'));
    }
    return line + end;
}

}
