#include "Commands.h"
#include "Operation.h"
#include "geometry/Geometry.h"

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
        // Loading validates: whatever comes back is valid.
        Orvan::MutablePtr<Tessara::Object> const object = loadGeometry(file, report);
        for (Orvan::String const& sentence : Tessara::Geometry::reportProperties(*object))
            report.warn(std::string(sentence.view()));
        Json const counts = countsOf(*object);
        report.document["valid"] = true;
        report.document["counts"] = counts;
        report.text =
            fmt::format("{} holds a valid {}: {}\n", file.string(), nameOf(typeOf(*object)), describeCounts(counts));
    }

}

void addValidate(CommandLine& program, Invocation& invocation)
{
    auto const file = std::make_shared<std::filesystem::path>();
    constexpr CommandHelp kHelp = {"validate", "Tell whether a file holds valid geometry",
        R"(Valid means that arrays fit their counts, offsets ascend, and indices are in range. What is odd in
further properties is a warning. How faces hang together does not matter here: "modeling info" tells
that.)",
        "  modeling validate part.stl"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("FILE", "File to read", *file, command);
    onSelected(command, invocation, [file](Report& report) { validateFile(*file, report); });
}

}
