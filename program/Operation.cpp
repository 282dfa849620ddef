#include "Operation.h"

#include "Cancellation.h"
#include "Failure.h"
#include "Geometry.h"
#include "files/GeometryFile.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <chrono>
#include <cstdlib>
#include <fstream>

#include <sys/resource.h>

namespace ModelingProgram {

namespace fs = std::filesystem;

namespace {

    std::uint64_t peakMemory()
    {
        // The kernel's own line: the other number starts with what the process took before it became this program.
        std::ifstream status("/proc/self/status");
        for (std::string line; std::getline(status, line);)
            if (line.starts_with("VmHWM:"))
                return std::strtoull(line.c_str() + 6, nullptr, 10) * 1024;
        rusage usage{};
        ::getrusage(RUSAGE_SELF, &usage);
        return static_cast<std::uint64_t>(usage.ru_maxrss) * 1024;
    }

    /// Ends the report with a table of these rows and those that all commands have.
    void addRun(std::vector<std::vector<std::string>> rows, Report& report)
    {
        Json& document = report.document;
        document["peakMemoryBytes"] = peakMemory();
        rows.push_back({"time", formatSeconds(document["seconds"].get<double>())});
        rows.push_back({"peak memory", formatBytes(document["peakMemoryBytes"].get<std::uint64_t>())});
        rows.push_back({"written", document["output"].get<std::string>()});
        report.text += "\n" + formatTable({{}, {}}, rows);
    }

}

void requireWritable(fs::path const& file)
{
    if (!isWritableFormat(file))
        throw Failure(ExitCode::File,
            fmt::format("cannot write {}: the name has to end in .obj, .ply, .stl or .vtp", file.string()));
    requirePlace(file);
}

void requirePlace(fs::path const& file)
{
    std::error_code ignored;
    if (fs::is_directory(file, ignored))
        throw Failure(ExitCode::File, fmt::format("cannot write {}: it is a folder", file.string()));
    fs::path const folder = file.has_parent_path() ? file.parent_path() : fs::path(".");
    if (!fs::is_directory(folder, ignored))
        throw Failure(
            ExitCode::File, fmt::format("cannot write {}: there is no folder {}", file.string(), folder.string()));
}

Orvan::MutablePtr<Tessara::Object> readGeometry(fs::path const& file, Report& report)
{
    GeometryFile geometry = readGeometryFile(file, report.reading);
    stopIfCancelled();
    if (geometry.origin) {
        report.reading.origin = geometry.origin;
        report.document["center"] = {geometry.origin->x, geometry.origin->y, geometry.origin->z};
    }
    for (std::string const& note : geometry.notes)
        report.warn(note);
    report.document["inputs"].push_back(
        {{"file", file.string()}, {"format", geometry.format}, {"kind", nameOf(typeOf(*geometry.object))}});
    return std::move(geometry.object);
}

std::string centerOf(ReadOptions const& reading)
{
    return fmt::format(
        "center {} {} {} subtracted from all positions", reading.origin->x, reading.origin->y, reading.origin->z);
}

Orvan::MutablePtr<Tessara::Object> loadGeometry(fs::path const& file, Report& report)
{
    Orvan::MutablePtr<Tessara::Object> object = readGeometry(file, report);
    requireValid(*object, file);
    return object;
}

void requireValid(Tessara::Object const& object, fs::path const& file)
{
    auto const status = validate(object);
    if (!status)
        throw Failure(ExitCode::Invalid,
            fmt::format("{} holds no valid {}: {}", file.string(), nameOf(typeOf(object)), status.message().view()));
}

void requirePointCloud(char const* command, Tessara::Object const& object, fs::path const& file)
{
    if (typeOf(object) != GeometryType::PointCloud)
        throw Failure(ExitCode::Refused,
            fmt::format("{} needs a point cloud, and {} holds a {}", command, file.string(), nameOf(typeOf(object))));
}

void requireDone(char const* command, bool isDone)
{
    if (!isDone)
        throw Failure(ExitCode::Refused,
            fmt::format(
                "{} cannot be done: the geometry or one of its attributes is not as the operation needs it", command));
}

void runOperation(Report& report, std::function<void()> const& operation)
{
    auto const start = std::chrono::steady_clock::now();
    try {
        operation();
    } catch (std::bad_alloc const&) {
        throw;
    } catch (Failure const&) {
        throw;
    } catch (std::exception const&) {
        stopIfCancelled(); // that is how a cancelled operation ends
        throw;
    }
    stopIfCancelled();
    std::chrono::duration<double> const time = std::chrono::steady_clock::now() - start;
    report.document["seconds"] = time.count();
}

void saveGeometry(Tessara::Object const& object, fs::path const& file, Report& report)
{
    auto const status = validate(object);
    if (!status)
        throw Failure(ExitCode::Unexpected,
            fmt::format("the result is not valid, so nothing was written: {}", status.message().view()));
    stopIfCancelled();
    std::string const remark = report.reading.origin ? centerOf(report.reading) : std::string();
    for (std::string const& note : writeGeometryFile(object, file, remark))
        report.warn(note);
    report.document["output"] = file.string();
}

Json countsOf(Tessara::Object const& object)
{
    using namespace Tessara::Geometry;
    Json counts;
    for (auto const& [key, component] :
        {std::pair{"points", sPointComp}, {"corners", sFaceVertexComp}, {"faces", sFaceComp}, {"strands", sStrandComp}})
        if (object.hasProperty(component))
            counts[key] = getElementCount(object, component);
    return counts;
}

void reportOperation(
    Json const& before, Json const& after, std::vector<std::string> const& droppedProperties, Report& report)
{
    Json& document = report.document;
    document["before"] = before;
    document["after"] = after;
    document["droppedProperties"] = droppedProperties;

    report.text += formatValues({{"before", before}, {"after", after}});
    auto const listOf = [](std::vector<std::string> const& names) {
        return names.empty() ? "none" : fmt::format("{}", fmt::join(names, ", "));
    };
    std::vector<std::vector<std::string>> rows;
    if (document.contains("keptProperties"))
        rows.push_back({"kept properties", listOf(document["keptProperties"])});
    rows.push_back({"dropped properties", listOf(droppedProperties)});
    addRun(rows, report);
}

void reportRun(Report& report)
{
    addRun({}, report);
}

}
