#include "Inputs.h"

#include <vtkAppendPolyData.h>
#include <vtkCellArray.h>
#include <vtkCellData.h>
#include <vtkDoubleArray.h>
#include <vtkFloatArray.h>
#include <vtkIntArray.h>
#include <vtkNew.h>
#include <vtkPointData.h>
#include <vtkPoints.h>
#include <vtkPolyData.h>
#include <vtkThreshold.h>
#include <vtkThresholdPoints.h>
#include <vtkTriangleFilter.h>
#include <vtkUnsignedCharArray.h>
#include <vtkUnsignedIntArray.h>
#include <vtkUnstructuredGrid.h>
#include <vtkWindowedSincPolyDataFilter.h>

using namespace Benchmarks;

namespace {

template <class Array>
vtkSmartPointer<Array> addArray(char const* name, int components, std::size_t count, vtkFieldData* data)
{
    auto array = vtkSmartPointer<Array>::New();
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
    addArray<vtkFloatArray>("normal", 3, made(Meshes::sphere, faces).points.size(), polyData->GetPointData());
    addArray<vtkIntArray>("material", 1, made(Meshes::sphere, faces).faceCount(), polyData->GetCellData());
    return polyData;
}

vtkSmartPointer<vtkPolyData> cloudOf(std::size_t count)
{
    auto polyData = vtkSmartPointer<vtkPolyData>::New();
    vtkNew<vtkPoints> points;
    points->SetNumberOfPoints(static_cast<vtkIdType>(count));
    points->GetData()->Fill(0);
    polyData->SetPoints(points);
    return polyData;
}

/// Moves points along their normals too.
Row const smoothing("smooth triangles:VTK", kTriangles, [](Run& run) {
    PolygonMesh const& mesh = made(Meshes::noisy, run.size());
    auto const polyData = polyDataOf(mesh);
    timeRuns(run, mesh.faceCount() * kSmoothingSteps, [&] {
        vtkNew<vtkWindowedSincPolyDataFilter> filter;
        filter->SetInputData(polyData);
        filter->SetNumberOfIterations(kSmoothingSteps);
        filter->Update();
    });
});

template <auto make> void measureTriangulation(Run& run)
{
    PolygonMesh const& mesh = made(make, run.size());
    auto const polyData = polyDataOf(mesh);
    auto const makeFilter = [&] {
        vtkNew<vtkPolyData> copy;
        copy->ShallowCopy(polyData);
        auto filter = vtkSmartPointer<vtkTriangleFilter>::New();
        filter->SetInputData(copy);
        return filter;
    };
    timeOnEach(run, mesh.triangleCount(), makeFilter, [](auto const& filter) { filter->Update(); });
}
Row const quads("triangulate quads:VTK", kQuads, measureTriangulation<Meshes::bentQuads>);
Row const polygons("triangulate polygons:VTK", kPolygons, measureTriangulation<Meshes::concave>);

/// Appends as many inputs as the first argument says, each with that many elements.
template <class MakeInput> void measureAppending(Run& run, std::size_t elements, MakeInput const& makeInput)
{
    std::vector<vtkSmartPointer<vtkPolyData>> inputs;
    while (inputs.size() != run.size())
        inputs.push_back(makeInput());
    timeRuns(run, run.size() * elements, [&] {
        vtkNew<vtkAppendPolyData> append;
        for (auto const& input : inputs)
            append->AddInputData(input);
        append->Update();
    });
}

Row const appendingMeshes("mergeMeshes:VTK", kMeshes, [](Run& run) {
    measureAppending(run, made(Meshes::sphere, run.size(1)).faceCount(), [&] { return attributedSphere(run.size(1)); });
});

Row const appendingClouds("mergePointClouds:VTK", kClouds, [](Run& run) {
    std::size_t const count = run.size(1);
    measureAppending(run, count, [&] {
        auto const cloud = cloudOf(count);
        addArray<vtkIntArray>("color", 1, count, cloud->GetPointData());
        addArray<vtkDoubleArray>("weight", 1, count, cloud->GetPointData());
        addArray<vtkUnsignedIntArray>("id", 1, count, cloud->GetPointData());
        addArray<vtkFloatArray>("radius", 1, count, cloud->GetPointData());
        return cloud;
    });
});

/// Runs the filter anew each time, which keeps what has a flag below 0.5.
template <class Filter> void measureDeletion(Run& run, std::size_t elements, Filter* filter)
{
    auto const prepare = [=] {
        filter->GetOutput()->Initialize();
        filter->Modified();
        return filter;
    };
    timeOnEach(run, elements, prepare, [](Filter* prepared) { prepared->Update(); });
}

Row const deletingPoints("deletePointsInPointCloud:VTK", kPoints, [](Run& run) {
    auto const cloud = cloudOf(run.size());
    auto* const data = cloud->GetPointData();
    addArray<vtkFloatArray>("normal", 3, run.size(), data);
    addArray<vtkUnsignedCharArray>("color", 4, run.size(), data);
    addArray<vtkFloatArray>("intensity", 1, run.size(), data);
    auto const flags = addArray<vtkUnsignedCharArray>("deleted", 1, run.size(), data);
    for (unsigned int const point : everySecondAtRandom(run.size()))
        flags->SetValue(static_cast<vtkIdType>(point), 1);
    data->SetActiveScalars("deleted");
    vtkNew<vtkThresholdPoints> filter;
    filter->SetInputData(cloud);
    filter->ThresholdByLower(0.5);
    measureDeletion(run, run.size(), filter.Get());
    run.report("remaining", static_cast<double>(filter->GetOutput()->GetNumberOfPoints()));
});

Row const deletingFaces("deleteFaces:VTK", kFaces, [](Run& run) {
    PatchedSphere const sphere(run.size());
    auto const mesh = attributedSphere(run.size());
    auto const flags = addArray<vtkUnsignedCharArray>("deleted", 1, sphere.faceCount(), mesh->GetCellData());
    for (std::size_t face = 0; face != sphere.deleted.size; ++face)
        flags->SetValue(static_cast<vtkIdType>(face), sphere.deleted[face] ? 1 : 0);
    mesh->GetCellData()->SetActiveScalars("deleted");
    vtkNew<vtkThreshold> filter;
    filter->SetInputData(mesh);
    filter->SetInputArrayToProcess(0, 0, 0, vtkDataObject::FIELD_ASSOCIATION_CELLS, "deleted");
    filter->SetThresholdFunction(vtkThreshold::THRESHOLD_LOWER);
    filter->SetLowerThreshold(0.5);
    measureDeletion(run, sphere.faceCount(), filter.Get());
    run.report("remaining", static_cast<double>(filter->GetOutput()->GetNumberOfCells()));
});

}
