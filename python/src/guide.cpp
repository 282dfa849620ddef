#include "Bindings.h"
#include "Cancellation.h"
#include "Creation.h"
#include "Errors.h"
#include "Facts.h"
#include "GuideHandle.h"
#include "arrays.h"

#include "commands/GuideVolume.h"
#include "files/VdbFile.h"
#include "geometry/Geometry.h"
#include "geometry/MeshArrays.h"
#include "geometry/SurfaceVolume.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Report.h"

#include <pybind11/stl.h>

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>

namespace ModelingPython {

namespace {

    using namespace ModelingProgram;
    using TSR::TileTree3D::VoxelCube;

    constexpr char kMesh[] = "the mesh";

    void requireFree(std::uint64_t bytes, std::string const& what)
    {
        if (std::uint64_t const free = freeMemory(); bytes > free)
            throw Failure(ExitCode::OutOfMemory,
                fmt::format("{} would need about {}, but only {} are free. Larger voxels need less.", what,
                    formatBytes(bytes), formatBytes(free)));
    }

    /// A volume, and what makes a guide of it.
    struct GuideSource {
        SparseVolume volume;
        std::optional<float> leastValue;
        int tileSide = 4;
    };

    Guide guideOf(GuideSource&& source)
    {
        return Guide(GuideGrid(source.volume, source.leastValue, source.tileSide));
    }

    Guide readGuideFile(py::bytes const& file, std::string const& grid, std::optional<float> leastValue, int tileSide)
    {
        constexpr std::uint64_t kTreesInMemory = 3; // of OpenVDB, the values copied from it, and the library's tiles
        GuideOptions options;
        options.file = std::string(file);
        options.grid = grid;
        return runCancellable([&] {
            std::size_t const number = chooseGrid(options, listVdbGrids(options.file));
            SparseVolume volume = readVdbGrid(options.file, number,
                [](VdbGridSize const& size) { requireFree(kTreesInMemory * size.treeBytes, "the volume"); });
            return guideOf({std::move(volume), leastValue, tileSide});
        });
    }

    /// The cubes of 8³ voxels of a dense array, whose last index is z.
    void addDense(Values<float> const& values, SparseVolume& volume)
    {
        auto const value = values.unchecked<3>();
        py::ssize_t const size[3] = {value.shape(0), value.shape(1), value.shape(2)};
        constexpr py::ssize_t kSide = 8, kMost = std::numeric_limits<int>::max() - kSide;
        if (*std::max_element(std::begin(size), std::end(size)) > kMost)
            throw py::value_error("the array has too many values along an axis");
        volume.cubeValues.reserve(static_cast<std::size_t>(values.size()));
        for (py::ssize_t i = 0; i < size[0]; i += kSide)
            for (py::ssize_t j = 0; j < size[1]; j += kSide)
                for (py::ssize_t k = 0; k < size[2]; k += kSide) {
                    VoxelCube cube{
                        {static_cast<int>(i), static_cast<int>(j), static_cast<int>(k)}, {}, volume.cubeValues.size()};
                    for (py::ssize_t z = 0; z != std::min(kSide, size[2] - k); ++z)
                        for (py::ssize_t y = 0; y != std::min(kSide, size[1] - j); ++y)
                            for (py::ssize_t x = 0; x != std::min(kSide, size[0] - i); ++x) {
                                cube.active[static_cast<std::size_t>(z)] |= std::uint64_t{1} << (x + kSide * y);
                                volume.cubeValues.push_back(value(i + x, j + y, k + z));
                            }
                    volume.cubes.push_back(cube);
                }
    }

    Guide guideOfArray(Values<float> const& values, double voxelSize, std::array<double, 3> const& origin,
        float background, std::optional<float> leastValue, int tileSide)
    {
        SparseVolume volume;
        volume.name = "scale";
        volume.voxelSize = voxelSize;
        volume.translation = origin;
        volume.background = background;
        return runCancellable([&] {
            SparseVolume filled = volume;
            addDense(values, filled);
            return guideOf({std::move(filled), leastValue, tileSide});
        });
    }

    /// How a volume is made around a surface.
    struct Band {
        std::optional<double> voxelSize;
        unsigned int voxels = 100;
        double halfWidth = 3;
        std::optional<std::pair<float, float>> mapTo;
        float background = 1;
        std::string grid = "scale";
    };

    SparseVolume makeVolume(Tessara::Object const& mesh, SurfaceValue const& value, Band const& band)
    {
        MeshArrays const arrays = arraysOf(mesh);
        requireFiniteSurface(arrays, kMesh);
        SparseVolume volume;
        volume.name = band.grid;
        volume.background = band.background;
        volume.voxelSize = band.voxelSize ? *band.voxelSize : voxelSizeFor(band.voxels, mesh, kMesh);
        constexpr double kMostBytes = 1e18;
        requireFree(static_cast<std::uint64_t>(
                        std::min(estimateBand(arrays, volume.voxelSize, band.halfWidth).bytes, kMostBytes)),
            fmt::format("a band of voxels of size {:.4g}", volume.voxelSize));
        fillBand(arrays, value, band.halfWidth, band.mapTo, volume);
        return volume;
    }

    /// The value of a volume at the surface: a number per point, or the distance to a point.
    SurfaceValue surfaceValueOf(std::optional<Values<float>> const& numbers,
        std::optional<std::array<double, 3>> const& point, Tessara::Object const& mesh)
    {
        SurfaceValue value;
        if (point) {
            value.distanceTo = {(*point)[0], (*point)[1], (*point)[2]};
            return value;
        }
        auto const array = arrayOf<float>(numbers.value());
        unsigned int const count = arraysOf(mesh).pointCount();
        if (array.size != count)
            throw py::value_error(
                fmt::format("values has {} entries, but there are {}", array.size, countOf(count, "point")));
        value.pointNumbers.assign(array.begin(), array.end());
        requireFiniteNumbers(value.pointNumbers, "values");
        return value;
    }

    Band bandOf(std::optional<double> voxelSize, unsigned int voxels, double halfWidth,
        std::optional<std::pair<float, float>> const& mapTo, float background)
    {
        return {voxelSize, voxels, halfWidth, mapTo, background};
    }

    Guide guideOfSurface(Mesh& mesh, std::optional<Values<float>> const& numbers,
        std::optional<std::array<double, 3>> const& point, Band const& band, std::optional<float> leastValue,
        int tileSide)
    {
        Orvan::Ptr<Tessara::Object> const object = validObjectOf(mesh);
        SurfaceValue const value = surfaceValueOf(numbers, point, *object);
        return runCancellable([&] { return guideOf({makeVolume(*object, value, band), leastValue, tileSide}); });
    }

    void writeVolume(py::bytes const& file, Mesh& mesh, std::optional<Values<float>> const& numbers,
        std::optional<std::array<double, 3>> const& point, Band const& band, bool overwrites)
    {
        Orvan::Ptr<Tessara::Object> const object = validObjectOf(mesh);
        SurfaceValue const value = surfaceValueOf(numbers, point, *object);
        std::filesystem::path const path = std::string(file);
        runCancellable([&] {
            writeVdbFile(makeVolume(*object, value, band), path, overwrites ? Existing::Replace : Existing::Keep);
            return 0;
        });
    }

    py::array_t<float> sample(Guide const& guide, Values<float> const& points)
    {
        auto const at = pointsOf(points);
        Orvan::Array<float> values(at.size, Orvan::kUninitialized);
        withoutLock([&] { guide.grid().sample({at.data, at.size}, {values.data, values.size}); });
        return numbersOf<float>(std::move(values));
    }

    std::uint64_t countCovered(Guide const& guide, Mesh& mesh)
    {
        Orvan::Ptr<Tessara::Object> const object = validObjectOf(mesh);
        return withoutLock([&] {
            MeshArrays const arrays = arraysOf(*object);
            for (unsigned int face = 0; face != arrays.faceCount(); ++face)
                if (arrays.corners(face).size() < 2)
                    refuse(fmt::format("face {} has fewer than two corners", face));
            return guide.grid().countCovered(arrays);
        });
    }

}

void bindGuide(py::module_& module)
{
    py::class_<Band> band(module, "Band");
    defineCreation(band, &bandOf);
    module.def("write_volume", &writeVolume);
    py::class_<Guide> guideClass(module, "Guide");
    refuseCreation(guideClass);
    guideClass.def_static("read", &readGuideFile)
        .def_static("from_array", &guideOfArray)
        .def_static("from_surface", &guideOfSurface)
        .def("sample", &sample)
        .def("covered_faces", &countCovered)
        .def_property_readonly("name", [](Guide const& guide) { return textOf(guide.grid().grid()); })
        .def_property_readonly("background", [](Guide const& guide) { return guide.grid().background(); })
        .def_property_readonly("value_range",
            [](Guide const& guide) { return py::make_tuple(guide.grid().range().least, guide.grid().range().most); });
}

}
