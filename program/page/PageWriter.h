#pragma once

#include "files/OutputFile.h"
#include "geometry/MeshTopology.h"
#include "shell/Report.h"

#include <TessaraObject/Object.h>

#include <optional>
#include <string>

namespace ModelingProgram {

struct DrawnGeometry;

/// Writes an HTML page that shows geometry: one view per object, with its facts. The page contains all it needs: the
/// arrays, in base64, and the viewer (`viewer/`). It makes no web request, and a policy in it forbids them.
///
/// Views are written one after another, so that each object can change or vanish after its view has been added.
class PageWriter {
public:
    /// \param viewCount  how many views there will be: many views get fewer elements to draw each
    /// \throws FileError, as all functions do
    PageWriter(std::filesystem::path const& file, Existing existing, std::size_t viewCount);

    /// \param role      "before", "after", or empty
    /// \param topology  of a mesh, if it is known
    /// \pre  the object is valid
    void add(Tessara::Object const& object, std::string const& name, std::string const& role,
        MeshTopology const* topology = nullptr);

    /// Completes the file.
    /// \param title  shown above the views
    /// \param run    what made the last view: "commandLine" and what a report has. Null if nothing did
    void finish(std::string const& title, Json const& run);

    /// Refuses a name that is not that of a page, and what `OutputFile::checkWritable` refuses.
    static void checkWritable(std::filesystem::path const& file, Existing existing);

private:
    /// Writes an array as a block, and describes it.
    template <class T> Json addArray(Orvan::Array<T> const& array);
    /// The same for some of its elements, or all if there is no choice.
    template <class T>
    Json addChosen(Orvan::Array<T> const& array, std::optional<Orvan::Array<unsigned int>> const& elements);
    Json addBlock(char const* type, unsigned int components, void const* data, std::uint64_t bytes);
    Json addAttribute(struct Attribute const& attribute, DrawnGeometry const& drawn);
    Json addArrays(DrawnGeometry const& drawn);

    OutputFile out_;
    std::uint64_t mostElements_;
    std::uint64_t blockCount_ = 0;
    Json views_ = Json::array();
};

}
