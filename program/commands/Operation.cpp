#include "Operation.h"

#include "files/OutputFile.h"
#include "files/Scanner.h"
#include "files/Streams.h"
#include "files/WorkMeter.h"
#include "geometry/Geometry.h"
#include "geometry/MeshArrays.h"
#include "geometry/MeshRequirements.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"
#include "shell/Phase.h"
#include "shell/Progress.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <fstream>

#include <sys/resource.h>

namespace ModelingProgram {

namespace fs = std::filesystem;

namespace {

    std::uint64_t peakMemory()
    {
        // getrusage is the fallback only: its peak includes what the process used before it executed this program.
        std::ifstream status("/proc/self/status");
        for (std::string line; std::getline(status, line);)
            if (line.starts_with("VmHWM:"))
                return std::strtoull(line.c_str() + 6, nullptr, 10) * 1024;
        rusage usage{};
        ::getrusage(RUSAGE_SELF, &usage);
        return static_cast<std::uint64_t>(usage.ru_maxrss) * 1024;
    }

    /// Adds where the time went to the document, and to the rows. A step writes nothing, and its total is the sum.
    void addTimes(bool isStep, Report& report, std::vector<std::vector<std::string>>& rows)
    {
        struct Part {
            char const* name;
            double seconds;
        };
        Times const times = timesOf(report);
        std::vector<Part> parts{{"reading", times.reading}, {"operation", times.operation}, {"report", times.report}};
        if (!isStep)
            parts.push_back({"writing", times.writing});
        Json& document = report.document["phaseSeconds"];
        double total = 0;
        std::vector<std::string> texts;
        for (Part const& part : parts) {
            document[part.name] = part.seconds;
            total += part.seconds;
            if (part.seconds != 0)
                texts.push_back(fmt::format("{} {}", part.name, formatSeconds(part.seconds)));
        }
        if (!isStep) {
            total = std::chrono::duration<double>(std::chrono::steady_clock::now() - report.start).count();
            document["total"] = total;
        }
        rows.push_back({"time", fmt::format("{} ({})", formatSeconds(total), fmt::join(texts, ", "))});
    }

    /// Ends the report with a table of these rows and those of every command, as far as they apply.
    void addLastRows(std::vector<std::vector<std::string>> rows, Report& report)
    {
        Json& document = report.document;
        addTimes(document.contains("step"), report, rows);
        if (document.contains("output")) {
            document["peakMemoryBytes"] = peakMemory();
            rows.push_back({"peak memory", formatBytes(document["peakMemoryBytes"].get<std::uint64_t>())});
            rows.push_back({"written", document["output"].get<std::string>()});
        }
        report.text += "\n" + formatTable({{}, {}}, rows);
    }

    [[noreturn]] void refuseOutput(Output const& out, std::string const& why)
    {
        throw Failure(ExitCode::File, fmt::format("{} cannot be written: {}", out.file.string(), why));
    }

    bool hasExtension(Output const& out, std::string_view extension)
    {
        return formatOf(out.file, out.format) == extension;
    }

    /// Refuses a mesh with faces that the format cannot hold.
    void requireWritableFaces(Output const& out, Tessara::Object const& mesh)
    {
        bool const isStl = hasExtension(out, ".stl");
        if (!isStl && !hasExtension(out, ".glb"))
            return;
        MeshArrays const arrays = arraysOf(mesh);
        for (unsigned int face = 0; face != arrays.faceCount(); ++face)
            if (std::size_t const corners = arrays.corners(face).size(); corners != 3)
                refuseOutput(out,
                    fmt::format(
                        "{} files hold triangles only, but face {} has {}; OBJ, PLY, VTP and HDF5 files can hold "
                        "it",
                        isStl ? "STL" : "GLB", face, countOf(corners, "corner")));
    }

}

fs::path outputOf(FileList const& files)
{
    if (!files.out.file.empty() || files.in.size() < 2)
        return files.out.file;
    return files.in.back() == kStandardInput ? fs::path(kStandardOutput) : files.in.back(); // it was a -
}

void chooseOutput(char const* command, FileList& files)
{
    Output& out = files.out;
    if (!out.file.empty() && !files.in.empty())
        return;
    if (files.in.size() < 2)
        throw Failure(ExitCode::CommandLine,
            fmt::format(
                "{0} needs input files and an output file: modeling {0} IN... OUT, or modeling {0} IN... -o OUT",
                command));
    out.file = outputOf(files);
    files.in.pop_back();
    std::error_code ignored;
    if (!out.replaces && !isStream(out.file) && fs::is_regular_file(fileOf(out.file), ignored))
        throw Failure(ExitCode::File,
            fmt::format("the last file, {}, exists. If it is an input, name the output with -o OUT; if it is the "
                        "output, --force replaces it",
                out.file.string()));
}

void requireHolds(Output const& out, GeometryType type)
{
    if (!isWritableFormat(formatOf(out.file, out.format)))
        refuseOutput(out,
            out.file.has_extension() && !isStream(out.file)
                ? "its name has to end in .obj, .ply, .stl, .vtp, .glb or .h5"
                : "--format has to name its format: obj, ply, stl, vtp, glb or h5");
    if (type == GeometryType::Strands && (hasExtension(out, ".ply") || hasExtension(out, ".stl")))
        refuseOutput(out, "this format cannot hold strands; OBJ, VTP, GLB and HDF5 can");
    if (type == GeometryType::PointCloud && hasExtension(out, ".stl"))
        refuseOutput(out, "STL files cannot hold point clouds; OBJ, PLY, VTP, GLB and HDF5 files can");
}

void requireHolds(Output const& out, Tessara::Object const& object)
{
    bool const isEmpty = Tessara::Geometry::getElementCount(object, Tessara::Geometry::sPointComp) == 0;
    GeometryType const type = isEmpty ? GeometryType::None : typeOf(object);
    requireHolds(out, type);
    if (type == GeometryType::Mesh)
        requireWritableFaces(out, object);
}

void requireWritable(Output const& out, GeometryType type)
{
    requireHolds(out, type);
    requirePlace(out);
}

void requirePlace(Output const& out)
{
    std::error_code ignored;
    fs::path const file = fileOf(out.file);
    if (fs::is_directory(file, ignored))
        refuseOutput(out, "it is a folder");
    fs::path const folder = file.has_parent_path() ? file.parent_path() : fs::path(".");
    if (!fs::is_directory(folder, ignored))
        refuseOutput(out, fmt::format("there is no folder {}", folder.string()));
    if (!out.replaces && !isStream(file) && fs::is_regular_file(file, ignored))
        refuseOutput(out, "the file exists; --force replaces it");
    if (out.compression != 0 && !hasExtension(out, ".h5"))
        throw Failure(ExitCode::CommandLine,
            fmt::format("--compress applies to HDF5 files only, and {} is none", out.file.string()));
    OutputFile::checkWritable(file, out.existing());
}

void requireAttribute(Output const& out, char const* option, std::string const& name)
{
    if (!hasExtension(out, ".ply") && !hasExtension(out, ".vtp") && !hasExtension(out, ".h5"))
        throw Failure(ExitCode::Refused,
            fmt::format("{}: {} cannot hold the attribute \"{}\"; PLY, VTP and HDF5 files can", option,
                out.file.string(), name));
    constexpr std::string_view kTaken[] = {"x", "y", "z", "vertex_index", "vertex_indices"};
    if (hasExtension(out, ".ply")
        && (name.find_first_of(" \t\n\r\v\f") != std::string::npos
            || std::find(std::begin(kTaken), std::end(kTaken), name) != std::end(kTaken)))
        throw Failure(
            ExitCode::Refused, fmt::format("{}: PLY files cannot hold an attribute named \"{}\"", option, name));
}

Orvan::MutablePtr<Tessara::Object> readGeometry(fs::path const& file, Report& report)
{
    std::uint64_t const bytes = bytesOf({file});
    Phase const phase(
        report, &Times::reading, fmt::format("reading {}", fileOf(file).filename().string()), WorkMeter::kBytes, bytes);
    std::uint64_t const done = workMeter.done();
    GeometryFile geometry = readGeometryFile(file, report.reading);
    workMeter.set(done + bytes); // also if not all of the file was used
    stopIfCancelled();
    if (geometry.origin) {
        report.reading.origin = geometry.origin;
        report.document["center"] = {geometry.origin->x, geometry.origin->y, geometry.origin->z};
    }
    for (std::string const& note : geometry.notes)
        report.warnOfInput(fmt::format("{}: {}", file.string(), note));
    report.document["inputs"].push_back(
        {{"file", file.string()}, {"format", geometry.format}, {"kind", nameOf(typeOf(*geometry.object))}});
    return std::move(geometry.object);
}

std::uint64_t bytesOf(std::vector<fs::path> const& files)
{
    std::uint64_t bytes = 0;
    for (fs::path const& file : files) {
        std::error_code error;
        std::uintmax_t const size = fs::file_size(fileOf(file), error);
        bytes += error ? 0 : size;
    }
    return bytes;
}

std::string centerOf(ReadOptions const& reading)
{
    return fmt::format(
        "center {} {} {} subtracted from all positions", reading.origin->x, reading.origin->y, reading.origin->z);
}

Orvan::MutablePtr<Tessara::Object> loadGeometry(fs::path const& file, Report& report)
{
    Phase const phase(report, &Times::reading, fmt::format("reading {}", fileOf(file).filename().string()),
        WorkMeter::kBytes, bytesOf({file}));
    Orvan::MutablePtr<Tessara::Object> object = readGeometry(file, report);
    requireValid(*object, file);
    return object;
}

Input loadInput(fs::path const& file, Report& report)
{
    Input input{loadGeometry(file, report), {}};
    Phase const phase(report, &Times::report, "checking requirements");
    requireProperties(report.requirements, *input.object, file,
        [&]() -> MeshTopology const& { return input.topology.emplace(analyzeTopology(arraysOf(*input.object))); });
    return input;
}

void requireValid(Tessara::Object const& object, fs::path const& file)
{
    auto const status = validate(object);
    if (!status)
        throw Failure(ExitCode::Invalid,
            fmt::format(
                "{} does not contain a valid {}: {}", file.string(), nameOf(typeOf(object)), status.message().view()));
}

void requireDone(char const* command, bool isDone)
{
    if (!isDone)
        throw Failure(ExitCode::Refused,
            fmt::format(
                "{} failed: the geometry or one of its attributes does not meet the requirements of the operation",
                command));
}

void runOperation(Report& report, std::function<void()> const& operation)
{
    Phase const phase(report, &Times::operation);
    auto const start = std::chrono::steady_clock::now();
    try {
        operation();
    } catch (std::bad_alloc const&) {
        throw;
    } catch (Failure const&) {
        throw;
    } catch (std::exception const&) {
        stopIfCancelled(); // a cancelled operation throws the exception of the host
        throw;
    }
    stopIfCancelled();
    std::chrono::duration<double> const time = std::chrono::steady_clock::now() - start;
    report.document["seconds"] = time.count();
}

void saveGeometry(Tessara::Object const& object, Output const& out, Report& report)
{
    Phase const phase(report, &Times::writing, fmt::format("writing {}", fileOf(out.file).filename().string()));
    auto const status = validate(object);
    if (!status)
        throw Failure(ExitCode::Unexpected,
            fmt::format("the result is invalid, so nothing was written: {}", status.message().view()));
    stopIfCancelled();
    std::string const remark = report.reading.origin ? centerOf(report.reading) : std::string();
    for (std::string const& note : writeGeometryFile(
             object, out.file, {out.existing(), remark, out.compression, report.reading.onSize, out.format}))
        report.warn(note);
    report.document["output"] = out.file.string();
}

void reportOperation(
    Json const& before, Json const& after, std::vector<std::string> const& droppedProperties, Report& report)
{
    Json& document = report.document;
    document["before"] = before;
    document["after"] = after;
    document["droppedProperties"] = droppedProperties;

    report.text += formatValues({{"before", before}, {"after", after}});
    std::vector<std::vector<std::string>> rows;
    if (document.contains("keptProperties"))
        rows.push_back({"kept properties", listOf(document["keptProperties"])});
    rows.push_back({"dropped properties", listOf(droppedProperties)});
    addLastRows(rows, report);
}

void reportRun(Report& report)
{
    addLastRows({}, report);
}

}
