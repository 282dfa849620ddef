#include "Inputs.h"

#include <vtkAOSDataArrayTemplate.h>
#include <vtkAppendPolyData.h>
#include <vtkCellArray.h>
#include <vtkCellArrayIterator.h>
#include <vtkCellData.h>
#include <vtkNew.h>
#include <vtkPointData.h>
#include <vtkPoints.h>
#include <vtkPolyData.h>
#include <vtkPolygon.h>
#include <vtkThreshold.h>
#include <vtkThresholdPoints.h>
#include <vtkTriangleFilter.h>
#include <vtkUnstructuredGrid.h>
#include <vtkWindowedSincPolyDataFilter.h>

// Some filters use several threads if the environment says VTK_SMP_BACKEND_IN_USE=TBB.

using namespace Benchmarks;

namespace {

template <class T> auto addArray(char const* name, int components, std::size_t count, vtkFieldData* data)
{
    auto array = vtkSmartPointer<vtkAOSDataArrayTemplate<T>>::New();
    array->SetName(name);
    array->SetNumberOfComponents(components);
    array->SetNumberOfTuples(static_cast<vtkIdType>(count));
    array->Fill(0);
    data->AddArray(array);
    return array;
}

vtkSmartPointer<vtkPolyData> polyDataOf(PolygonMesh const& mesh)
{
    auto polyData = vtkSmartPointer<vtkPolyData>::New();
    vtkNew<vtkPoints> points; // of single precision
    for (auto const& p : mesh.points)
        points->InsertNextPoint(p.x, p.y, p.z);
    polyData->SetPoints(points);
    vtkNew<vtkCellArray> cells;
    for (std::size_t face = 0; face != mesh.faceCount(); ++face) {
        cells->InsertNextCell(static_cast<int>(mesh.faceOffset[face + 1] - mesh.faceOffset[face]));
        for (unsigned int corner = mesh.faceOffset[face]; corner != mesh.faceOffset[face + 1]; ++corner)
            cells->InsertCellPoint(static_cast<vtkIdType>(mesh.faceVertex[corner]));
    }
    polyData->SetPolys(cells);
    return polyData;
}

/// A sphere with a normal per point and a number per face. Corners have no arrays there, so texture coordinates are missing.
vtkSmartPointer<vtkPolyData> attributedSphere(std::size_t faces)
{
    auto polyData = polyDataOf(made(Meshes::sphere, faces));
    addArray<float>("normal", 3, made(Meshes::sphere, faces).points.size(), polyData->GetPointData());
    addArray<int>("material", 1, made(Meshes::sphere, faces).faceCount(), polyData->GetCellData());
    return polyData;
}

vtkSmartPointer<vtkPolyData> cloudOf(std::size_t count)
{
    return polyDataOf({std::vector<float3>(count), {}});
}

Points pointsOf(vtkPolyData& data)
{
    return arrayOf(static_cast<std::size_t>(data.GetNumberOfPoints()), [&](std::size_t i) {
        double const* const p = data.GetPoint(static_cast<vtkIdType>(i));
        return float3{static_cast<float>(p[0]), static_cast<float>(p[1]), static_cast<float>(p[2])};
    });
}

/// Runs a filter anew each time.
template <class Filter> void timeFilter(Run& run, std::size_t elements, Filter* filter)
{
    auto const prepare = [=] {
        filter->GetOutput()->Initialize();
        filter->Modified();
        return filter;
    };
    timeOnEach(run, elements, prepare, [](Filter* prepared) { prepared->Update(); });
}

/// The faces at each point, without the faces across edges. VTK uses several threads only for grids.
template <auto make> void measureLinks(Run& run)
{
    auto const mesh = polyDataOf(made(make, run.size()));
    vtkNew<vtkUnstructuredGrid> grid;
    grid->SetPoints(mesh->GetPoints());
    grid->SetCells(VTK_TRIANGLE, mesh->GetPolys());
    measureRefinement(run, [&] {
        grid->BuildLinks();
        return static_cast<std::size_t>(grid->GetNumberOfCells());
    });
}
Row const links("halfEdges:VTK", withoutLargest(kHalfEdges), measureLinks<Meshes::sphere>);
Row const shuffledLinks("halfEdges shuffled:VTK", withoutLargest(kHalfEdges), measureLinks<Meshes::shuffled>);

/// Moves points along their normals too.
Row const smoothing("smooth triangles:VTK", kTriangles, [](Run& run) {
    PolygonMesh const& mesh = made(Meshes::noisy, run.size());
    vtkNew<vtkWindowedSincPolyDataFilter> filter;
    filter->SetInputData(polyDataOf(mesh));
    filter->SetNumberOfIterations(kSmoothingSteps);
    timeFilter(run, mesh.faceCount() * kSmoothingSteps, filter.Get());
    run.reportSimilarResult(meanRadius(pointsOf(*filter->GetOutput())));
});

template <auto make> void measureTriangulation(Run& run)
{
    vtkNew<vtkTriangleFilter> filter;
    filter->SetInputData(polyDataOf(made(make, run.size())));
    timeFilter(run, made(make, run.size()).triangleCount(), filter.Get());
    Indices corners;
    auto const cells = vtk::TakeSmartPointer(filter->GetOutput()->GetPolys()->NewIterator());
    for (cells->GoToFirstCell(); !cells->IsDoneWithTraversal(); cells->GoToNextCell())
        for (vtkIdType k = 0; k != 3; ++k)
            corners.append(static_cast<unsigned int>(cells->GetCurrentCell()->GetId(k)));
    // Not the number of triangles: VTK gives up on some concave polygons (199 of 12,046 triangles are missing).
    run.reportSimilarResult(areaOf(corners.size / 3, pointsOf(*filter->GetOutput()).data, corners.data));
}
Row const quads("triangulate quads:VTK", kQuads, measureTriangulation<Meshes::bentQuads>);
Row const polygons("triangulate polygons:VTK", kPolygons, measureTriangulation<Meshes::concave>);

/// Appends as many inputs as the first argument says, each with that many elements.
template <class MakeInput> void measureAppending(Run& run, std::size_t elements, MakeInput const& makeInput)
{
    vtkNew<vtkAppendPolyData> append;
    for (std::size_t i = 0; i != run.size(); ++i)
        append->AddInputData(makeInput());
    timeFilter(run, run.size() * elements, append.Get());
    auto* const result = append->GetOutput();
    run.reportResult(
        static_cast<double>(result->GetNumberOfCells() ? result->GetNumberOfCells() : result->GetNumberOfPoints()));
}

Row const appendingMeshes("mergeMeshes:VTK", kMeshes, [](Run& run) {
    measureAppending(run, made(Meshes::sphere, run.size(1)).faceCount(), [&] { return attributedSphere(run.size(1)); });
});

Row const appendingClouds("mergePointClouds:VTK", kClouds, [](Run& run) {
    std::size_t const count = run.size(1);
    measureAppending(run, count, [&] {
        auto const cloud = cloudOf(count);
        addArray<int>("color", 1, count, cloud->GetPointData());
        addArray<double>("weight", 1, count, cloud->GetPointData());
        addArray<unsigned int>("id", 1, count, cloud->GetPointData());
        addArray<float>("radius", 1, count, cloud->GetPointData());
        return cloud;
    });
});

Row const deletingPoints("deletePointsInPointCloud:VTK", kPoints, [](Run& run) {
    auto const cloud = cloudOf(run.size());
    auto* const data = cloud->GetPointData();
    addArray<float>("normal", 3, run.size(), data);
    addArray<unsigned char>("color", 4, run.size(), data);
    addArray<float>("intensity", 1, run.size(), data);
    auto const flags = addArray<unsigned char>("deleted", 1, run.size(), data);
    for (unsigned int const point : everySecondAtRandom(run.size()))
        flags->SetValue(static_cast<vtkIdType>(point), 1);
    data->SetActiveScalars("deleted");
    vtkNew<vtkThresholdPoints> filter;
    filter->SetInputData(cloud);
    filter->ThresholdByLower(0.5);
    timeFilter(run, run.size(), filter.Get());
    run.reportResult(static_cast<double>(filter->GetOutput()->GetNumberOfPoints()));
});

Row const deletingFaces("deleteFaces:VTK", kFaces, [](Run& run) {
    PatchedSphere const sphere(run.size());
    auto const mesh = attributedSphere(run.size());
    auto const flags = addArray<unsigned char>("deleted", 1, sphere.faceCount(), mesh->GetCellData());
    for (std::size_t face = 0; face != sphere.deleted.size; ++face)
        flags->SetValue(static_cast<vtkIdType>(face), sphere.deleted[face] ? 1 : 0);
    mesh->GetCellData()->SetActiveScalars("deleted");
    vtkNew<vtkThreshold> filter;
    filter->SetInputData(mesh);
    filter->SetInputArrayToProcess(0, 0, 0, vtkDataObject::FIELD_ASSOCIATION_CELLS, "deleted");
    filter->SetThresholdFunction(vtkThreshold::THRESHOLD_LOWER);
    filter->SetLowerThreshold(0.5);
    timeFilter(run, sphere.faceCount(), filter.Get());
    run.reportResult(static_cast<double>(filter->GetOutput()->GetNumberOfCells()));
});

/// In double precision, by the polygons that VTK has for cells.
Row const coordinates("stitch coordinates:VTK", {{200'000}}, [](Run& run) {
    auto const polygons = drawnPolygons(run.size());
    std::vector<vtkSmartPointer<vtkPolygon>> cells;
    for (auto const& [corners, points] : polygons) {
        auto& cell = cells.emplace_back(vtkSmartPointer<vtkPolygon>::New());
        cell->GetPoints()->SetDataTypeToDouble();
        for (auto const& p : corners)
            cell->GetPointIds()->InsertNextId(cell->GetPoints()->InsertNextPoint(p.x, p.y, 0));
        cell->SetUseMVCInterpolation(true);
    }
    double weights[16];
    auto const forEachPoint = [&](auto const& use) {
        for (std::size_t i = 0; i != polygons.size(); ++i)
            for (auto const& p : polygons[i].points) {
                double const point[3] = {p.x, p.y, 0};
                cells[i]->InterpolateFunctions(point, weights);
                use();
            }
    };
    timeRuns(run, run.size(), [&] { forEachPoint([] {}); });
    double sum = 0;
    forEachPoint([&] { sum += weights[0] + 2 * weights[1]; });
    run.reportResult(sum);
});

}
