#pragma once

#include "Edit.h"
#include "page/PageWriter.h"

#include <optional>

namespace ModelingProgram {

/// Adds --page to a command that writes geometry.
void addPageOption(Output& out, Command& command);

/// The page that --page requests: what a command read, what it wrote, and how long that took. Without the option it does
/// nothing. Objects are written when they are added, and may change or vanish then.
class PageOfRun {
public:
    /// \param inputCount  how many there are; only the first few get a view
    /// \throws Failure, FileError  if the page cannot be written
    PageOfRun(Output const& out, std::size_t inputCount, Report& report);

    /// Shows the inputs of an edit.
    void addBefore(Edit const& edit, Subject const& subject);
    void addBefore(Tessara::Object const& object, std::string const& name, MeshTopology const* topology = nullptr);
    /// Shows what was written.
    void addAfter(Tessara::Object const& object, MeshTopology const* topology = nullptr);
    /// Completes the page, when the report is complete.
    void finish();

private:
    void add(Tessara::Object const& object, std::string const& name, char const* role, MeshTopology const* topology);

    Output const& out_;
    Report& report_;
    std::size_t inputCount_;
    std::size_t shownCount_ = 0;
    std::optional<PageWriter> page_;
};

}
