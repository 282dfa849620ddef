#include "smoothers.h"

#include <vtkCellArray.h>
#include <vtkNew.h>
#include <vtkPoints.h>
#include <vtkPolyData.h>
#include <vtkWindowedSincPolyDataFilter.h>

namespace Benchmarks {

struct VtkSmoother::Mesh {
    vtkNew<vtkPolyData> polygons;
};

VtkSmoother::VtkSmoother(TestSupport::PolygonMesh const& mesh)
    : mesh_(std::make_unique<Mesh>())
{
    vtkNew<vtkPoints> points;
    for (auto const& p : mesh.points)
        points->InsertNextPoint(p.x, p.y, p.z);
    vtkNew<vtkCellArray> cells;
    for (std::size_t corner = 0; corner != mesh.faceVertex.size(); corner += 3) {
        vtkIdType const face[] = {mesh.faceVertex[corner], mesh.faceVertex[corner + 1], mesh.faceVertex[corner + 2]};
        cells->InsertNextCell(3, face);
    }
    mesh_->polygons->SetPoints(points);
    mesh_->polygons->SetPolys(cells);
}

VtkSmoother::~VtkSmoother() = default;

void VtkSmoother::smooth(int steps)
{
    vtkNew<vtkWindowedSincPolyDataFilter> filter;
    filter->SetInputData(mesh_->polygons);
    filter->SetNumberOfIterations(steps);
    filter->Update();
}

}
