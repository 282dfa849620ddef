#include "Bindings.h"
#include "Cancellation.h"
#include "Errors.h"
#include "Facts.h"

#include "files/GeometryFile.h"
#include "geometry/Geometry.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Report.h"

#include <pybind11/stl.h>

#include <fmt/format.h>

#include <array>
#include <csignal>
#include <filesystem>

namespace ModelingPython {

namespace {

    namespace fs = std::filesystem;
    using namespace ModelingProgram;

    /// During its lifetime, other code may change what happens if a process ends: the codec of HDF5 files starts one.
    class KeepChildAction {
    public:
        KeepChildAction() { ::sigaction(SIGCHLD, nullptr, &action_); }
        KeepChildAction(KeepChildAction const&) = delete;
        KeepChildAction& operator=(KeepChildAction const&) = delete;
        ~KeepChildAction() { ::sigaction(SIGCHLD, &action_, nullptr); }

    private:
        struct sigaction action_ = {};
    };

    /// A name of a file as Python encodes it for the system.
    fs::path pathOf(py::bytes const& encoded)
    {
        return std::string(encoded);
    }

    void requireFree(std::uint64_t bytes)
    {
        if (std::uint64_t const free = freeMemory(); bytes > free)
            throw Failure(ExitCode::OutOfMemory,
                fmt::format(
                    "the arrays would need about {}, but only {} are free", formatBytes(bytes), formatBytes(free)));
    }

    ReadOptions readOptions(
        bool isLenient, bool isCentered, std::optional<std::array<double, 3>> const& origin, std::string const& format)
    {
        ReadOptions options;
        options.isLenient = isLenient;
        options.isCentered = isCentered;
        if (origin)
            options.origin = {(*origin)[0], (*origin)[1], (*origin)[2]};
        options.onSize = requireFree;
        options.format = format;
        return options;
    }

    /// \return the object, and what was subtracted from all positions
    py::tuple read(py::bytes const& file, bool isLenient, bool isCentered,
        std::optional<std::array<double, 3>> const& origin, std::string const& format)
    {
        fs::path const path = pathOf(file);
        GeometryFile geometry = runCancellable([&] {
            KeepChildAction const keeping;
            return readGeometryFile(path, readOptions(isLenient, isCentered, origin, format));
        });
        py::object center = py::none();
        if (geometry.origin)
            center = py::make_tuple(geometry.origin->x, geometry.origin->y, geometry.origin->z);
        Orvan::Ptr<Tessara::Object> const object = std::move(geometry.object);
        auto const status = withoutLock([&] { return validate(*object); });
        if (!status)
            refuseInvalid(fmt::format("{} does not contain a valid {}: {}", path.string(),
                nameOf(ModelingProgram::typeOf(*object)), status.message().view()));
        for (std::string const& note : geometry.notes)
            warn(fmt::format("{}: {}", path.string(), note));
        return py::make_tuple(makeValidHandle(ModelingProgram::typeOf(*object), object), center);
    }

    void write(Handle& handle, py::bytes const& file, bool overwrites, unsigned int compression,
        std::string const& format, std::string const& comment)
    {
        Orvan::Ptr<Tessara::Object> const object = validObjectOf(handle);
        fs::path const path = pathOf(file);
        WriteOptions options;
        options.existing = overwrites ? Existing::Replace : Existing::Keep;
        options.remark = comment;
        options.compression = compression;
        options.onSize = requireFree;
        options.format = format;
        auto const notes = runCancellable([&] {
            KeepChildAction const keeping;
            return writeGeometryFile(*object, path, options);
        });
        for (std::string const& note : notes)
            warn(fmt::format("{}: {}", path.string(), note));
    }

    bool isWritable(py::bytes const& file, std::string const& format)
    {
        return isWritableFormat(formatOf(pathOf(file), format));
    }

}

void bindFiles(py::module_& module)
{
    module.def("read", &read);
    module.def("write", &write);
    module.def("is_writable_format", &isWritable);
    module.def("format_of",
        [](py::bytes const& file, std::string const& otherwise) { return textOf(formatOf(pathOf(file), otherwise)); });
    module.def("file_of", [](py::bytes const& file) { return py::bytes(fileOf(pathOf(file)).string()); });
    module.def("formats", &geometryFormats);
}

}
