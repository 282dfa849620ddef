#include "PageOfRun.h"

#include "shell/Cancellation.h"
#include "shell/Phase.h"

#include <fmt/format.h>

namespace ModelingProgram {

namespace {

    constexpr std::size_t kMostInputs = 4; // side by side with the result

}

void addPageOption(Output& out, Command& command)
{
    command
        .addOption("--page", out.page,
            "Write an HTML page too, with the geometry before and after, the times and the memory; --force replaces it")
        .valueName("OUT.html");
}

PageOfRun::PageOfRun(Output const& out, std::size_t inputCount, Report& report)
    : out_(out)
    , report_(report)
    , inputCount_(inputCount)
{
    if (out.page.empty())
        return;
    PageWriter::checkWritable(out.page, out.existing());
    page_.emplace(out.page, out.existing(), std::min(inputCount, kMostInputs) + 1);
}

void PageOfRun::add(
    Tessara::Object const& object, std::string const& name, char const* role, MeshTopology const* topology)
{
    Phase const phase(report_, &Times::writing, fmt::format("writing {}", out_.page.filename().string()));
    page_->add(object, name, role, topology);
    stopIfCancelled();
}

void PageOfRun::addBefore(Edit const& edit, Subject const& subject)
{
    if (page_)
        edit.forEachInput(
            subject, [this](Tessara::Object const& object, std::string const& name, MeshTopology const* topology) {
                addBefore(object, name, topology);
            });
}

void PageOfRun::addBefore(Tessara::Object const& object, std::string const& name, MeshTopology const* topology)
{
    if (page_ && shownCount_++ < kMostInputs)
        add(object, name, "before", topology);
}

void PageOfRun::addAfter(Tessara::Object const& object, MeshTopology const* topology)
{
    if (page_)
        add(object, out_.file.string(), "after", topology);
}

void PageOfRun::finish()
{
    if (!page_)
        return;
    Json run = {{"commandLine", report_.commandLine}};
    for (char const* const key : {"seconds", "phaseSeconds", "peakMemoryBytes", "warnings", "before", "after"})
        if (report_.document.contains(key))
            run[key] = report_.document[key];
    if (inputCount_ > kMostInputs)
        run["notes"] = {fmt::format("{} of {} inputs are shown.", kMostInputs, inputCount_)};
    page_->finish(
        fmt::format("{}: {}", report_.document["command"].get<std::string>(), out_.file.filename().string()), run);
    report_.document["page"] = out_.page.string();
    report_.text += fmt::format("page written to {}\n", out_.page.string());
}

}
