#include "Commands.h"
#include "Operation.h"
#include "PageOfRun.h"
#include "geometry/Geometry.h"

#include <memory>

namespace ModelingProgram {

namespace {

    struct ConvertOptions {
        std::filesystem::path in;
        Output out;
    };

    void convert(ConvertOptions const& options, Report& report)
    {
        requireWritable(options.out, GeometryType::None);
        PageOfRun page(options.out, 1, report);
        Orvan::MutablePtr<Tessara::Object> const object = loadInput(options.in, report).object;
        page.addBefore(*object, options.in.string());
        requireHolds(options.out, *object);
        saveGeometry(*object, options.out, report);
        page.addAfter(*object);
        Json const counts = countsOf(*object);
        report.document["counts"] = counts;
        report.text += formatValues({{"", counts}});
        reportRun(report);
        page.finish();
    }

}

void addConvert(CommandLine& program, Invocation& invocation)
{
    auto const options = std::make_shared<ConvertOptions>();
    constexpr CommandHelp kHelp = {"convert", "Write the geometry of a file in another format",
        R"(Elements, their order and their values are kept. A warning lists what the file of the first format contains
and the geometry cannot hold, and what the second format cannot: then it is left out.)",
        "  modeling convert scan.ply scan.vtp\n"
        "  modeling convert tile.xyz tile.ply --center"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("IN", "File to read", options->in, command);
    addOutput("File to write", options->out, command, invocation);
    addPageOption(options->out, command);
    onSelected(command, invocation, [options](Report& report) { convert(*options, report); });
}

}
