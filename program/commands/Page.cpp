#include "Commands.h"
#include "Operation.h"
#include "page/PageWriter.h"
#include "shell/Cancellation.h"
#include "shell/Phase.h"

#include <fmt/format.h>

#include <memory>

namespace ModelingProgram {

namespace {

    struct PageOptions {
        std::filesystem::path page;
        std::vector<std::filesystem::path> files;
        std::string title;
        bool replaces = false;
    };

    std::string pageTitle(PageOptions const& options)
    {
        if (!options.title.empty())
            return options.title;
        std::string const first = fileOf(options.files[0]).filename().string();
        return options.files.size() == 1 ? first
                                         : fmt::format("{} and {}", first, countOf(options.files.size() - 1, "other"));
    }

    void writePage(PageOptions const& options, Report& report)
    {
        Existing const existing = options.replaces ? Existing::Replace : Existing::Keep;
        PageWriter::checkWritable(options.page, existing);
        PageWriter page(options.page, existing, options.files.size());
        for (std::filesystem::path const& file : options.files) {
            Input const input = loadInput(file, report);
            Phase const phase(report, &Times::writing, fmt::format("writing {}", options.page.filename().string()));
            page.add(*input.object, file.string(), {}, input.topology ? &*input.topology : nullptr);
            stopIfCancelled();
        }
        Phase const phase(report, &Times::writing, fmt::format("writing {}", options.page.filename().string()));
        page.finish(pageTitle(options), {});
        report.document["output"] = options.page.string();
        reportRun(report);
    }

}

void addPage(CommandLine& program, Invocation& invocation)
{
    auto const options = std::make_shared<PageOptions>();
    constexpr CommandHelp kHelp = {"page", "Write an HTML page that shows files side by side",
        R"(The page is one file, which any browser opens without a server, a network or an installation. It has a view for
each file, with its facts as "modeling info" shows them, and histograms of edge lengths and face quality: the
shortest over the longest edge of each face. Views turn together. Faces, points and strands can be colored by any attribute, and
boundary edges, non-manifold edges and slivers highlighted. Meshes of more than 2 million faces are drawn with fewer;
the page says so.

Other commands write a page of what they did with --page.)",
        "  modeling page bunny.html samples/bunny.obj\n"
        "  modeling page compare.html before.ply after.ply --title \"Before and after\""};
    Command command = addCommand(kHelp, program, invocation);
    command.addOption("OUT", options->page, "Page to write, *.html").synopsis(" ").required();
    command.addOption("FILES", options->files, "Files to show").required().synopsis("FILE...");
    command.addOption("--title", options->title, "The title of the page").valueName("TEXT");
    command.addFlag("-f,--force", options->replaces, "Replace the file to write if it exists");
    onSelected(command, invocation, [options](Report& report) { writePage(*options, report); });
}

}
