#include "Commands.h"
#include "Operation.h"
#include "geometry/Geometry.h"
#include "shell/Progress.h"

#include <fmt/format.h>

namespace ModelingProgram {

namespace {

    std::string describeCounts(Json const& counts)
    {
        std::vector<std::string> texts;
        for (auto const& [key, count] : counts.items())
            texts.push_back(countOf(count.get<std::uint64_t>(), key.substr(0, key.size() - 1)));
        return fmt::format("{}", fmt::join(texts, ", "));
    }

    void validateFile(std::filesystem::path const& file, Report& report)
    {
        // Loading throws if the object is invalid.
        Orvan::MutablePtr<Tessara::Object> const object = loadInput(file, report).object;
        for (Orvan::String const& sentence : Tessara::Geometry::reportProperties(*object))
            report.warn(std::string(sentence.view()));
        Json const counts = countsOf(*object);
        report.document["valid"] = true;
        report.document["counts"] = counts;
        report.text = fmt::format(
            "{} contains a valid {}: {}\n", printable(file.string()), nameOf(typeOf(*object)), describeCounts(counts));
    }

}

void addValidate(CommandLine& program, Invocation& invocation)
{
    auto const file = std::make_shared<std::filesystem::path>();
    constexpr CommandHelp kHelp = {"validate", "Check whether a file contains valid geometry",
        R"(Valid means that array lengths match the element counts, offsets are non-decreasing, and indices are
in range. Anomalies of other properties are warnings. How faces are connected does not matter here:
"modeling info" shows that.)",
        "  modeling validate part.stl"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("FILE", "File to read", *file, command);
    onSelected(command, invocation, [file](Report& report) { validateFile(*file, report); });
}

}
