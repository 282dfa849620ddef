#include "Report.h"

#include "Progress.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <cstdio>

namespace ModelingProgram {

namespace {

    bool isLower(char c)
    {
        return c >= 'a' && c <= 'z';
    }

    bool isUpper(char c)
    {
        return c >= 'A' && c <= 'Z';
    }

    bool isDigit(char c)
    {
        return c >= '0' && c <= '9';
    }

    std::string labelOf(std::string_view key)
    {
        std::string label;
        for (char const c : key) {
            if (!label.empty() && isLower(label.back()) && (isUpper(c) || isDigit(c)))
                label += ' ';
            label += isUpper(c) ? static_cast<char>(c - 'A' + 'a') : c;
        }
        return label;
    }

    std::string cellOf(Json const& value)
    {
        if (value.is_null())
            return "-";
        if (value.is_boolean())
            return value.get<bool>() ? "yes" : "no";
        if (value.is_string())
            return value.get<std::string>();
        if (value.is_number_unsigned())
            return groupDigits(value.get<std::uint64_t>());
        return toText(value);
    }

    // Characters, not bytes: names in files are mostly UTF-8.
    std::size_t widthOf(std::string_view text)
    {
        return static_cast<std::size_t>(
            std::count_if(text.begin(), text.end(), [](char c) { return (c & '\xC0') != '\x80'; }));
    }

}

Report::Report(std::string const& command)
    : name_(command)
{
    document["command"] = command;
    document["warnings"] = Json::array();
}

Report Report::ofStep(std::size_t number, std::string const& name) const
{
    Report report;
    report.document = {{"step", number}, {"do", name}, {"warnings", Json::array()}};
    report.isJson = isJson;
    report.isQuiet = isQuiet;
    report.isSilent = isSilent;
    report.isStrict = isStrict;
    report.name_ = fmt::format("step {} ({})", number, name);
    report.isOfStep_ = true;
    return report;
}

void Report::warn(std::string const& sentence)
{
    hasWarned = true;
    warnOfInput(sentence);
}

void Report::warnOfInput(std::string const& sentence)
{
    document["warnings"].push_back(sentence);
    if (!isSilent)
        printMessage(fmt::format("modeling: warning: {}", isOfStep_ ? titleOf(sentence) : sentence));
}

std::string Report::titleOf(std::string const& what) const
{
    if (what.empty())
        return name_;
    return isOfStep_ ? fmt::format("{}: {}", name_, what) : what;
}

std::string toText(Json const& document)
{
    return document.dump(2, ' ', false, Json::error_handler_t::replace);
}

bool writeToStandardOutput(std::string const& text)
{
    return std::fwrite(text.data(), 1, text.size(), stdout) == text.size() && std::fflush(stdout) == 0;
}

Json numberOf(float value)
{
    if (!std::isfinite(value))
        return {};
    std::string const text = fmt::format("{}", value == 0 ? 0 : value); // without the sign of a negative zero
    bool const isWhole = text.find_first_of(".e") == std::string::npos;
    return Json::parse(isWhole ? text + ".0" : text);
}

std::string groupDigits(std::uint64_t number)
{
    std::string text = std::to_string(number);
    for (std::size_t end = text.size(); end > 3; end -= 3)
        text.insert(end - 3, 1, ',');
    return text;
}

std::string countOf(std::uint64_t number, std::string_view singular, std::string_view plural)
{
    if (number == 1)
        return fmt::format("1 {}", singular);
    return plural.empty() ? fmt::format("{} {}s", groupDigits(number), singular)
                          : fmt::format("{} {}", groupDigits(number), plural);
}

std::string listOf(std::vector<std::string> const& texts)
{
    return texts.empty() ? "none" : fmt::format("{}", fmt::join(texts, ", "));
}

std::string formatSeconds(double seconds)
{
    if (seconds < 1e-3)
        return fmt::format("{:.3g} µs", seconds * 1e6);
    if (seconds < 1)
        return fmt::format("{:.3g} ms", seconds * 1e3);
    return seconds < 100 ? fmt::format("{:.2f} s", seconds) : fmt::format("{:.1f} min", seconds / 60);
}

std::string formatBytes(std::uint64_t bytes)
{
    constexpr char const* kUnits[] = {"bytes", "kB", "MB", "GB", "TB"};
    auto number = static_cast<double>(bytes);
    std::size_t unit = 0;
    for (; number >= 1000 && unit + 1 != std::size(kUnits); ++unit)
        number /= 1000;
    return unit == 0 ? countOf(bytes, "byte") : fmt::format("{:.1f} {}", number, kUnits[unit]);
}

std::string formatTable(std::vector<Column> const& columns, std::vector<std::vector<std::string>> const& rows)
{
    std::vector<std::string> titles;
    std::vector<std::size_t> widths;
    std::vector<std::vector<std::string>> cells;
    for (auto const& row : rows) {
        cells.emplace_back();
        for (std::string const& text : row)
            cells.back().push_back(printable(text)); // names in files may contain anything
    }
    for (std::size_t c = 0; c != columns.size(); ++c) {
        titles.push_back(columns[c].title);
        widths.push_back(widthOf(columns[c].title));
        for (auto const& row : cells)
            widths[c] = std::max(widths[c], widthOf(row[c]));
    }

    std::string table;
    auto const addLine = [&](std::vector<std::string> const& texts) {
        std::string line;
        for (std::size_t c = 0; c != columns.size(); ++c) {
            std::string const padding(widths[c] - widthOf(texts[c]), ' ');
            line += c == 0 ? "" : "   ";
            line += columns[c].isNumber ? padding + texts[c] : texts[c] + padding;
        }
        table += line.substr(0, line.find_last_not_of(' ') + 1) + "\n";
    };
    if (std::any_of(titles.begin(), titles.end(), [](std::string const& title) { return !title.empty(); }))
        addLine(titles);
    for (auto const& row : cells)
        addLine(row);
    return table;
}

std::string formatValues(std::vector<Values> const& columns)
{
    std::vector<Column> header{{}};
    for (Values const& column : columns)
        header.push_back({column.title, true});
    std::vector<std::vector<std::string>> rows;
    for (auto const& [key, value] : columns.front().values.items()) {
        std::vector<std::string> row{labelOf(key)};
        for (Values const& column : columns)
            row.push_back(cellOf(column.values.value(key, Json())));
        rows.push_back(std::move(row));
    }
    return formatTable(header, rows);
}

}
