#pragma once

#include "Commands.h"
#include "Operation.h"
#include "geometry/Geometry.h"
#include "geometry/Shape.h"

#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

namespace ModelingProgram {

/// The geometry that an edit works on, and what is already known of it if it is a mesh.
struct Subject {
    std::string name; // in messages: its file, or "the result of step 2"
    Orvan::MutablePtr<Tessara::Object> object;
    std::optional<MeshTopology> topology = {};
    std::optional<Shape> shape = {};

    /// The topology, computed only if it is not known.
    MeshTopology const& knowTopology();
    /// The same for topology and shape, which are faster to compute together. Slivers are counted in any case.
    ExaminedMesh know(float sliverRatio = 0);
    /// After the mesh has changed. By default nothing is known of the new one.
    void setKnown(std::optional<ExaminedMesh> const& facts = {});
};

/// An operation on geometry in memory, with its options. It is what a subcommand does between reading IN and writing OUT,
/// and what `modeling run` does in one step. The functions are called once each, in this order; those that refuse
/// something throw `Failure` or `FileError`.
class Edit {
public:
    virtual ~Edit() = default;

    /// Adds the files that are read in addition to the geometry: on a command line they are between IN and OUT.
    virtual void declareFiles(Command&) { }
    virtual void declareOptions(Command& command) = 0;

    /// Refuses options that are wrong whatever the geometry is.
    virtual void checkOptions() const { }

    /// An attribute that the options add to the geometry, and the option that names it.
    struct NewAttribute {
        char const* option = "";
        std::string name; // empty for none
    };
    virtual NewAttribute newAttribute() const { return {}; }

    /// Runs all that follows, within the limits that the options set.
    virtual void runLimited(std::function<void()> const& work) { work(); }

    /// Reads the files that must not wait for the geometry.
    virtual void readFiles(Report&) { }

    /// Reads and validates the geometry. By default this is one file.
    virtual Subject readSubject(std::vector<std::filesystem::path> const& files, Report& report);

    /// Calls `visit` with each input, its name, and its topology if that is known, before the edit runs. By default this
    /// is the subject.
    using VisitInput = std::function<void(Tessara::Object const&, std::string const& name, MeshTopology const*)>;
    virtual void forEachInput(Subject const& subject, VisitInput const& visit) const;

    /// Refuses the geometry if the operation cannot handle it, otherwise edits it, and what is known of it. Facts that
    /// only the report needs are omitted unless `report.needsFacts()`.
    /// \pre  it is valid and has the type that `EditKind` requires
    virtual void run(Subject& subject, Report& report) = 0;

    /// Adds to the report what was done. A subcommand has written the result by then.
    virtual void report(Report& report) = 0;
};

/// What is known of an edit before there is one.
struct EditKind {
    CommandHelp help;
    std::unique_ptr<Edit> (*create)();
    GeometryType takes = GeometryType::Mesh; // None for any type
    GeometryType gives = GeometryType::Mesh; // None for the type of the input
    bool keepsFaces = false; // each face of the result has the corners of a face of the input
    bool takesManyFiles = false; // so it can only be the first of several edits
};

template <class T> std::unique_ptr<Edit> createEdit()
{
    return std::make_unique<T>();
}

// Each edit is in the source of its command.
extern EditKind const kAddPoints, kDeletePoints, kDeleteFaces, kMerge, kTriangulate, kSubdivide, kSmooth,
    kRemoveSlivers, kRepair, kStitch;

/// All of them.
std::span<EditKind const* const> editKinds();

/// Adds the command `modeling EDIT IN OUT`.
void addEditCommand(EditKind const& kind, CommandLine& program, Invocation& invocation);

/// Runs the edit on files, as a command of its own.
void runOnFiles(EditKind const& kind, Edit& edit, std::vector<std::filesystem::path> const& files, Output const& out,
    Report& report);

// The parts of `runOnFiles`, for edits that follow one another.

/// Refuses an output that cannot hold the new attribute.
void requireAttribute(Edit::NewAttribute const& attribute, Output const& out);
/// Refuses geometry that the edit does not take. An object without points becomes an empty one of the right type.
void requireSubject(EditKind const& kind, Subject& subject);

}
