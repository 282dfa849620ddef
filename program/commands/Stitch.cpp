#include "Edit.h"
#include "PageOfRun.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "shell/Failure.h"

#include <Modeling/StitchTemplate.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>
#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>

#include <algorithm>
#include <atomic>
#include <cmath>
#include <limits>
#include <memory>
#include <optional>
#include <utility>

namespace ModelingProgram {

namespace {

    using Tessara::Object;
    using Tessara::Modeling::LocalStrand;
    using Tessara::Modeling::StitchTemplate;
    using Points = Orvan::Array<float3>;
    using Indices = Orvan::Array<unsigned int>;

    struct StitchOptions {
        std::vector<std::filesystem::path> drawing; // the polygon and the strands
        std::string normals = "points";
        unsigned int rotate = 0;
        bool isOpen = false;
        bool flip = false;
        bool allowsFaults = false;
    };

    /// A message of a template, and the element that it is about if that is known.
    struct Fault {
        std::string message;
        std::optional<std::uint64_t> strand, point, edge; // the point is counted within its strand
    };

    /// Splits the errors of a template into messages, each of which is enclosed in dashes.
    std::vector<std::string> splitMessages(Orvan::String const& errors)
    {
        constexpr std::string_view kDashes = "---";
        std::vector<std::string> messages;
        std::string_view rest = errors.view();
        while (rest.starts_with(kDashes)) {
            rest.remove_prefix(kDashes.size());
            std::size_t const end = std::min(rest.find(kDashes), rest.size());
            messages.emplace_back(rest.substr(0, end));
            rest.remove_prefix(std::min(end + kDashes.size(), rest.size()));
        }
        return messages;
    }

    /// Messages about one control point, found with a template of that point alone.
    struct PointFaults {
        std::size_t messageCount = 0;
        bool isEndFaulty = false; // if a strand begins or ends at the point
    };

    PointFaults faultsOfPoint(Orvan::Ptr<Points> const& polygon, float3 const& point, bool strict)
    {
        StitchTemplate const alone(
            polygon, Orvan::makePtr<Points>(Points{point}), Orvan::makePtr<Indices>(Indices{0, 1}), false);
        std::vector<std::string> const messages = splitMessages(alone.getErrors());
        auto const ofEnds = static_cast<std::size_t>(std::count_if(messages.begin(), messages.end(),
            [](std::string const& message) { return message.starts_with("strand "); }));
        auto const& edges = alone.getEdgeEndpoints();
        bool const isRecorded = std::any_of(edges.begin(), edges.end(), [](auto const& ends) { return !ends.empty(); });
        return {messages.size() - ofEnds, !isRecorded && (strict || ofEnds != 0)};
    }

    /// Assigns messages to elements by counting: they come in the order of the control points, then of the edges.
    std::vector<Fault> locateFaults(
        StitchTemplate const& made, Object const& polygonMesh, Object const& strandSet, bool strict)
    {
        std::vector<Fault> faults;
        for (std::string& message : splitMessages(made.getErrors()))
            faults.push_back({std::move(message), {}, {}, {}});
        if (made.getStrands().empty())
            return faults; // they are about the template as a whole

        MeshArrays const mesh = arraysOf(polygonMesh);
        auto polygon = Orvan::MutablePtr<Points>::make();
        for (unsigned int const point : *mesh.faceVertex)
            polygon->append((*mesh.positions)[point]);
        Orvan::Ptr<Points> const corners = std::move(polygon);
        auto const positions = Tessara::Geometry::dataOf<float3>(strandSet, Tessara::Geometry::sPointPosition);
        auto const offsets = Tessara::Geometry::dataOf<unsigned int>(strandSet, Tessara::Geometry::sStrandOffset);

        auto fault = faults.begin();
        for (std::uint64_t strand = 0; strand + 1 < offsets->size && fault != faults.end(); ++strand) {
            std::uint64_t const first = (*offsets)[strand], end = (*offsets)[strand + 1];
            for (std::uint64_t point = first; point != end; ++point) {
                PointFaults const own = faultsOfPoint(corners, (*positions)[point], strict);
                std::size_t count = own.messageCount;
                if (own.isEndFaulty)
                    count += std::size_t{point == first} + std::size_t{point + 1 == end};
                for (; count != 0 && fault != faults.end(); --count, ++fault) {
                    fault->strand = strand;
                    fault->point = point - first;
                }
            }
        }
        auto const& edges = made.getEdgeEndpoints();
        for (std::uint64_t edge = 0; edge != edges.size && fault != faults.end(); ++edge)
            if (edges[edge].size != 1 && edges[edge].size != 2)
                (fault++)->edge = edge;
        return faults;
    }

    std::string describe(Fault const& fault)
    {
        if (fault.edge)
            return fmt::format("{}: edge {}", fault.message, *fault.edge);
        if (fault.strand)
            return fmt::format("{}: strand {}, control point {}", fault.message, *fault.strand, *fault.point);
        return fault.message;
    }

    Json describeFaults(std::vector<Fault> const& faults)
    {
        auto const valueOf = [](std::optional<std::uint64_t> const& value) { return value ? Json(*value) : Json(); };
        Json list = Json::array();
        for (Fault const& fault : faults)
            list.push_back({{"message", fault.message}, {"strand", valueOf(fault.strand)},
                {"point", valueOf(fault.point)}, {"edge", valueOf(fault.edge)}});
        return list;
    }

    std::uint64_t controlPointCountOf(StitchTemplate const& made)
    {
        std::uint64_t count = 0;
        for (LocalStrand const& strand : made.getStrands())
            count += strand.controlPoints.size;
        return count;
    }

    /// Refuses a template with faults, unless --allow-faults accepts the rest of it.
    StitchTemplate readTemplate(StitchOptions const& options, Report& report)
    {
        std::filesystem::path const &polygonFile = options.drawing[0], &strandFile = options.drawing[1];
        // A template has coordinates of its own: --center translates only the mesh.
        ReadOptions const reading = std::exchange(report.reading, {.isLenient = report.reading.isLenient});
        Orvan::MutablePtr<Object> const polygon = loadGeometry(polygonFile, report);
        requireType(GeometryType::Mesh, *polygon, "stitch", polygonFile);
        Orvan::MutablePtr<Object> const strands = loadGeometry(strandFile, report);
        report.reading = reading;
        if (typeOf(*strands) != GeometryType::Strands)
            throw Failure(ExitCode::Refused,
                fmt::format("stitch needs strands, such as the lines of an OBJ file, but {} contains a {}",
                    strandFile.string(), nameOf(typeOf(*strands))));

        StitchTemplate made(*polygon, *strands, !options.isOpen);
        std::vector<Fault> const faults = locateFaults(made, *polygon, *strands, !options.isOpen);
        report.document["template"] = {{"corners", made.getPolySize()}, {"strands", made.getStrands().size},
            {"controlPoints", controlPointCountOf(made)}, {"messages", describeFaults(faults)}};
        std::vector<std::string> reasons;
        for (Fault const& fault : faults)
            reasons.push_back(describe(fault));
        if (!faults.empty() && (!options.allowsFaults || made.getStrands().empty()))
            throw Failure(ExitCode::Refused, "the template is not usable", std::move(reasons));
        for (std::string const& reason : reasons)
            report.warn(reason);
        return made;
    }

    struct Target {
        MeshArrays mesh;
        Indices faces; // those with as many corners as the template
        Points pointNormals; // empty if normals of faces are used
        float scale = 0; // the mean edge length of these faces: one for all, so that raised strand ends meet
    };

    /// The unit normal of each point: the area-weighted mean of the normals of its faces (Newell's method). Zero if the
    /// mean has no direction.
    Points sumPointNormals(MeshArrays const& mesh)
    {
        Points normals(mesh.pointCount());
        for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
            std::span<unsigned int const> const corners = mesh.corners(face);
            float3 sum{0, 0, 0};
            for (std::size_t i = 0; i != corners.size(); ++i) {
                float3 const& a = (*mesh.positions)[corners[i]];
                float3 const& b = (*mesh.positions)[corners[(i + 1) % corners.size()]];
                sum.x += (a.y - b.y) * (a.z + b.z);
                sum.y += (a.z - b.z) * (a.x + b.x);
                sum.z += (a.x - b.x) * (a.y + b.y);
            }
            for (unsigned int const point : corners)
                normals[point] = {normals[point].x + sum.x, normals[point].y + sum.y, normals[point].z + sum.z};
        }
        for (float3& normal : normals) {
            float const length = distanceInFloats({}, normal);
            if (length > 0)
                normal = {normal.x / length, normal.y / length, normal.z / length};
        }
        return normals;
    }

    Target readTarget(Object const& object, unsigned int polySize, bool withPointNormals)
    {
        Target target{arraysOf(object), {}, {}, 0};
        double length = 0;
        for (unsigned int face = 0; face != target.mesh.faceCount(); ++face) {
            std::span<unsigned int const> const corners = target.mesh.corners(face);
            if (corners.size() != polySize)
                continue;
            target.faces.append(face);
            for (std::size_t i = 0; i != corners.size(); ++i)
                length += static_cast<double>(distanceInFloats(
                    (*target.mesh.positions)[corners[i]], (*target.mesh.positions)[corners[(i + 1) % corners.size()]]));
        }
        target.scale = static_cast<float>(length / (static_cast<double>(target.faces.size) * polySize));
        if (withPointNormals)
            target.pointNormals = sumPointNormals(target.mesh);
        return target;
    }

    /// Lays all control points on one polygon. \return how many were not raised, because the polygon has no normal
    /// there
    std::size_t layOnPolygon(StitchTemplate const& made, Points const& corners, Points const& normals, float scale,
        bool flip, float3* position)
    {
        std::size_t flatCount = 0;
        for (LocalStrand const& strand : made.getStrands()) {
            for (Orvan::Array<float> const& weights : strand.controlPoints) {
                if (normals.empty())
                    made.findControlPointPos(corners, weights, scale, flip, *position);
                else
                    made.findControlPointPos(corners, weights, scale, normals, flip, *position);
                if (!isFinite(*position)) {
                    ++flatCount;
                    Orvan::Array<float> const flat(std::span<float const>(weights.data, made.getPolySize()));
                    made.findControlPointPos(corners, flat, scale, flip, *position);
                }
                ++position;
            }
        }
        return flatCount;
    }

    struct LaidStrands {
        Points positions;
        std::size_t flatCount = 0;
    };

    LaidStrands layOnFaces(StitchTemplate const& made, Target const& target, StitchOptions const& options)
    {
        std::uint64_t const perFace = controlPointCountOf(made);
        unsigned int const polySize = made.getPolySize();
        LaidStrands laid{Points(perFace * target.faces.size, Orvan::kUninitialized), 0};
        std::atomic<std::size_t> flatCount = 0;
        // Each face writes its own range.
        tbb::parallel_for(tbb::blocked_range<std::size_t>(0, target.faces.size, 100), [&](auto const& faces) {
            Points corners(polySize), normals(target.pointNormals.empty() ? 0 : polySize);
            for (std::size_t i = faces.begin(); i != faces.end(); ++i) {
                std::span<unsigned int const> const points = target.mesh.corners(target.faces[i]);
                for (unsigned int corner = 0; corner != polySize; ++corner) {
                    unsigned int const point = points[(corner + options.rotate % polySize) % polySize];
                    corners[corner] = (*target.mesh.positions)[point];
                    if (!normals.empty())
                        normals[corner] = target.pointNormals[point];
                }
                flatCount +=
                    layOnPolygon(made, corners, normals, target.scale, options.flip, laid.positions.data + i * perFace);
            }
        });
        laid.flatCount = flatCount;
        return laid;
    }

    Indices repeatOffsets(StitchTemplate const& made, std::uint64_t copies)
    {
        Indices offsets;
        offsets.reserve(made.getStrands().size * copies + 1);
        std::uint64_t offset = 0;
        for (std::uint64_t copy = 0; copy != copies; ++copy) {
            for (LocalStrand const& strand : made.getStrands()) {
                offsets.append(static_cast<unsigned int>(offset));
                offset += strand.controlPoints.size;
            }
        }
        offsets.append(static_cast<unsigned int>(offset));
        return offsets;
    }

    void requireFits(StitchTemplate const& made, Target const& target, std::string const& source)
    {
        if (target.faces.empty() && target.mesh.faceCount() != 0)
            throw Failure(ExitCode::Refused,
                fmt::format("the template has {} corners, but no face of {} has as many", made.getPolySize(), source));
        std::uint64_t const mostOfFace = std::max(controlPointCountOf(made), made.getStrands().size);
        if (mostOfFace * target.faces.size >= std::numeric_limits<unsigned int>::max())
            throw Failure(ExitCode::Refused, "there would be more than 4,294,967,295 control points");
    }

    class Stitch final : public Edit {
    public:
        void declareFiles(Command& command) override;
        void declareOptions(Command& command) override;
        void readFiles(Report& report) override { template_ = readTemplate(options_, report); }
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override;

        /// Reports whether the template is usable.
        void reportTemplate(Report& report);

    private:
        StitchOptions options_;
        std::optional<StitchTemplate> template_;
        std::uint64_t coveredCount_ = 0, otherCount_ = 0; // faces
        Json before_, after_;
        std::vector<std::string> dropped_;
    };

    void Stitch::declareFiles(Command& command)
    {
        command.addOption("--template", options_.drawing, "Files of the polygon and of the strands in it")
            .required()
            .values(2)
            .synopsis("POLYGON STRANDS");
    }

    void Stitch::declareOptions(Command& command)
    {
        command.addOption("--normals", options_.normals, "Raise along normals interpolated from points, or of faces")
            .oneOf({"points", "faces"})
            .showDefault();
        command.addOption("--rotate", options_.rotate, "Begin at corner N of each face, counted from 0")
            .valueName("N")
            .between(0, std::numeric_limits<unsigned int>::max());
        command.addFlag("--flip", options_.flip, "Lower where the template raises");
        command.addFlag("--open", options_.isOpen, "Allow strand ends anywhere, and any number per edge");
        command.addFlag("--allow-faults", options_.allowsFaults, "Accept a template despite its faults");
    }

    void Stitch::run(Subject& subject, Report& report)
    {
        Object const& mesh = *subject.object;
        Target const target = readTarget(mesh, template_->getPolySize(), options_.normals == "points");
        requireFits(*template_, target, subject.name);

        LaidStrands laid;
        runOperation(report, [&] { laid = layOnFaces(*template_, target, options_); });
        if (laid.flatCount != 0)
            report.warn(fmt::format("{} not raised, because the faces have no normal there",
                laid.flatCount == 1 ? "1 control point was" : groupDigits(laid.flatCount) + " control points were"));
        coveredCount_ = target.faces.size;
        otherCount_ = target.mesh.faceCount() - coveredCount_;
        for (Property const& property : propertiesOf(mesh))
            if (!property.isStandard)
                dropped_.push_back(property.name);
        Json const from = countsOf(mesh);
        subject.object =
            Tessara::Geometry::makeStrands(std::move(laid.positions), repeatOffsets(*template_, coveredCount_));
        subject.setKnown();
        Json const to = countsOf(*subject.object);
        before_ = {{"faces", from["faces"]}, {"points", from["points"]}, {"strands", Json()}};
        after_ = {{"faces", Json()}, {"points", to["points"]}, {"strands", to["strands"]}};
    }

    void Stitch::report(Report& report)
    {
        report.document["coveredFaces"] = coveredCount_;
        report.document["otherFaces"] = otherCount_;
        report.text += fmt::format("laid on {}; {} a different number of corners\n\n", countOf(coveredCount_, "face"),
            otherCount_ == 1 ? "1 face has" : groupDigits(otherCount_) + " faces have");
        reportOperation(before_, after_, dropped_, report);
    }

    void Stitch::reportTemplate(Report& report)
    {
        readFiles(report);
        report.text = fmt::format("{}: {}, {}, {}\n",
            report.document["template"]["messages"].empty() ? "a usable template" : "a template with faults",
            countOf(template_->getPolySize(), "corner"), countOf(template_->getStrands().size, "strand"),
            countOf(controlPointCountOf(*template_), "control point"));
    }

}

constinit EditKind const kStitch = {
    .help = {"stitch", "Lay a pattern of strands on the faces of a mesh",
        R"(A template is a polygon in the plane z = 0 (a mesh with one face) and strands drawn in it (the lines of an
OBJ file). It is laid on every face with as many corners. Heights in units of the mean edge length of the
polygon are scaled by the mean edge length of the covered faces. Each strand must begin and end on edges of
the polygon, and each edge must have one or two ends, unless --open. Ends meet if they are placed
symmetrically on the edges.)",
        "  modeling stitch --check --template quad.obj loop.obj\n"
        "  modeling stitch --template quad.obj loop.obj --on body.obj knitted.vtp"},
    .create = createEdit<Stitch>,
    .gives = GeometryType::Strands};

void addStitch(CommandLine& program, Invocation& invocation)
{
    struct Files {
        std::vector<std::filesystem::path> on{1};
        Output out;
        bool checkOnly = false;
    };
    auto const files = std::make_shared<Files>();
    auto const edit = std::make_shared<Stitch>();
    Command command = addCommand(kStitch.help, program, invocation);
    edit->declareFiles(command);
    command.addOption("--on", files->on[0], "Mesh to lay the template on").synopsis("MESH");
    addOutput("File of strands to write", files->out, command, invocation, Needed::Sometimes);
    addPageOption(files->out, command);
    edit->declareOptions(command);
    command.addFlag("--check", files->checkOnly, "Only report whether the template is usable");
    onSelected(command, invocation, [files, edit](Report& report) {
        if (files->checkOnly) {
            edit->reportTemplate(report);
            return;
        }
        if (files->on[0].empty() || files->out.file.empty())
            throw Failure(ExitCode::CommandLine, "stitch needs --on MESH and OUT, or --check");
        runOnFiles(kStitch, *edit, files->on, files->out, report);
    });
}

}
