#include "deletions.h"

#include <vtkCellArray.h>
#include <vtkCellData.h>
#include <vtkFloatArray.h>
#include <vtkIntArray.h>
#include <vtkNew.h>
#include <vtkPointData.h>
#include <vtkPoints.h>
#include <vtkPolyData.h>
#include <vtkThreshold.h>
#include <vtkThresholdPoints.h>
#include <vtkUnsignedCharArray.h>
#include <vtkUnstructuredGrid.h>

namespace Benchmarks {

namespace {

    template <class Array> vtkSmartPointer<Array> makeArray(char const* name, int components, std::size_t count)
    {
        auto array = vtkSmartPointer<Array>::New();
        array->SetName(name);
        array->SetNumberOfComponents(components);
        array->SetNumberOfTuples(static_cast<vtkIdType>(count));
        array->Fill(0);
        return array;
    }

    template <class Data> void addScalars(vtkSmartPointer<vtkUnsignedCharArray> const& flags, Data* data)
    {
        data->AddArray(flags);
        data->SetActiveScalars(flags->GetName());
    }

    /// Runs the filter anew each time, which keeps what is below 0.5.
    template <class Filter> PeerDeletion makeDeletion(vtkSmartPointer<Filter> const& filter)
    {
        return {[=] {
                    filter->GetOutput()->Initialize();
                    filter->Modified();
                },
            [=] { filter->Update(); }, nullptr};
    }

}

PeerDeletion vtkPointDeletion(std::size_t pointCount, Orvan::Array<unsigned int> const& indices)
{
    vtkNew<vtkPolyData> cloud;
    vtkNew<vtkPoints> points;
    points->SetData(makeArray<vtkFloatArray>("position", 3, pointCount));
    cloud->SetPoints(points);
    cloud->GetPointData()->AddArray(makeArray<vtkFloatArray>("normal", 3, pointCount));
    cloud->GetPointData()->AddArray(makeArray<vtkUnsignedCharArray>("color", 4, pointCount));
    cloud->GetPointData()->AddArray(makeArray<vtkFloatArray>("intensity", 1, pointCount));
    auto const flags = makeArray<vtkUnsignedCharArray>("deleted", 1, pointCount);
    for (unsigned int const point : indices)
        flags->SetValue(static_cast<vtkIdType>(point), 1);
    addScalars(flags, cloud->GetPointData());
    auto const filter = vtkSmartPointer<vtkThresholdPoints>::New();
    filter->SetInputData(cloud);
    filter->ThresholdByLower(0.5);
    PeerDeletion deletion = makeDeletion(filter);
    deletion.remaining = [=] { return static_cast<std::size_t>(filter->GetOutput()->GetNumberOfPoints()); };
    return deletion;
}

PeerDeletion vtkFaceDeletion(PeerMesh const& input)
{
    vtkNew<vtkPolyData> mesh;
    vtkNew<vtkPoints> points;
    for (auto const& p : input.positions)
        points->InsertNextPoint(p.x, p.y, p.z);
    vtkNew<vtkCellArray> faces;
    for (std::size_t corner = 0; corner != input.faceVertex.size; corner += 3) {
        vtkIdType const face[] = {input.faceVertex[corner], input.faceVertex[corner + 1], input.faceVertex[corner + 2]};
        faces->InsertNextCell(3, face);
    }
    mesh->SetPoints(points);
    mesh->SetPolys(faces);
    mesh->GetPointData()->AddArray(makeArray<vtkFloatArray>("normal", 3, input.positions.size));
    mesh->GetCellData()->AddArray(makeArray<vtkIntArray>("material", 1, input.deleted.size));
    auto const flags = makeArray<vtkUnsignedCharArray>("deleted", 1, input.deleted.size);
    for (std::size_t face = 0; face != input.deleted.size; ++face)
        flags->SetValue(static_cast<vtkIdType>(face), input.deleted[face] ? 1 : 0);
    addScalars(flags, mesh->GetCellData());
    auto const filter = vtkSmartPointer<vtkThreshold>::New();
    filter->SetInputData(mesh);
    filter->SetInputArrayToProcess(0, 0, 0, vtkDataObject::FIELD_ASSOCIATION_CELLS, "deleted");
    filter->SetThresholdFunction(vtkThreshold::THRESHOLD_LOWER);
    filter->SetLowerThreshold(0.5);
    PeerDeletion deletion = makeDeletion(filter);
    deletion.remaining = [=] { return static_cast<std::size_t>(filter->GetOutput()->GetNumberOfCells()); };
    return deletion;
}

}
