#pragma once

#include "files/GeometryFile.h"

#include <nlohmann/json.hpp>

#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace ModelingProgram {

using Json = nlohmann::ordered_json;

class Phase;

/// Where the time of a command went, in seconds.
struct Times {
    double reading = 0; // files, until the geometry has been validated
    double operation = 0; // of the library
    double report = 0; // checks of requirements, and facts such as topology and shape before and after
    double writing = 0;

    Times& operator+=(Times const& other)
    {
        reading += other.reading;
        operation += other.operation;
        report += other.report;
        writing += other.writing;
        return *this;
    }
};

/// The output of a command. Results are printed to standard output when it ends, as text or as one JSON document;
/// warnings are printed to standard error immediately and also added to the document.
class Report {
public:
    explicit Report(std::string const& command);

    /// A report of a step of this command. Its warnings begin with the step.
    Report ofStep(std::size_t number, std::string const& name) const;

    void warn(std::string const& sentence);
    /// A warning that is about an input file only, which --strict accepts.
    void warnOfInput(std::string const& sentence);

    /// Whether facts that only the results and the warnings of the result show are worth their time.
    bool needsFacts() const { return !isQuiet || isJson || isStrict; }

    /// The title of a phase: "step 2 (smooth): reading a.txt". Without a text, the name of the command or step.
    std::string titleOf(std::string const& text) const;

    Json document; // what --json prints
    std::vector<Json> lines; // if there are any, --json prints these documents instead, one per line
    std::string text; // what is printed without --json
    bool isJson = false; // standard output is reserved for the document
    bool isQuiet = false; // the text is not printed
    bool isSilent = false; // warnings are only added to the document
    bool isStrict = false; // warnings about the result have an exit code of their own
    bool hasWarned = false; // about the result
    int exitCode = 0; // if the command does not fail
    std::vector<std::string> requirements; // what inputs have to be, as `parseRequirements` returns it
    std::string commandLine; // as it could be typed
    ReadOptions reading; // of all files; the first file read determines the center to subtract
    Times times; // of the phases that have ended
    Phase* phase = nullptr; // the innermost one
    std::chrono::steady_clock::time_point start = std::chrono::steady_clock::now();

private:
    Report() = default;

    std::string name_; // of the command, or "step 2 (smooth)"
    bool isOfStep_ = false;
};

/// The document as it is printed. Invalid UTF-8, which names in files may contain, becomes replacement characters.
std::string toText(Json const& document);

/// Returns false if the text could not be written completely.
[[nodiscard]] bool writeToStandardOutput(std::string const& text);
inline constexpr char kCannotWriteOutput[] = "cannot write to standard output";

/// The shortest decimal number that reads back as the same float. Whole numbers end in ".0", because tables show JSON
/// integers as counts. Null if the value is not finite.
Json numberOf(float value);
/// 1234567 as "1,234,567".
std::string groupDigits(std::uint64_t number);
/// "1 edge", "1,234 edges".
std::string countOf(std::uint64_t number, std::string_view singular, std::string_view plural = {});
/// "a, b, c", or "none".
std::string listOf(std::vector<std::string> const& texts);
/// "80 µs", "1.25 ms", "3.10 s", "2.5 min".
std::string formatSeconds(double seconds);
/// "512 bytes", "8.1 MB", "2.0 GB".
std::string formatBytes(std::uint64_t bytes);

struct Column {
    std::string title;
    bool isNumber = false; // right-aligned
};

/// Aligns cells in columns. The title line is omitted if all titles are empty.
std::string formatTable(std::vector<Column> const& columns, std::vector<std::vector<std::string>> const& rows);

/// Shows objects with the same keys side by side, one row per key: "openEdges" becomes "open edges", null becomes "-".
struct Values {
    std::string title;
    Json values;
};
std::string formatValues(std::vector<Values> const& columns);

}
