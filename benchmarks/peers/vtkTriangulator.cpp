#include "triangulators.h"

#include <vtkCellArray.h>
#include <vtkNew.h>
#include <vtkPoints.h>
#include <vtkPolyData.h>
#include <vtkTriangleFilter.h>

namespace Benchmarks {

struct VtkTriangulator::Mesh {
    vtkNew<vtkPolyData> polygons;
    vtkNew<vtkTriangleFilter> filter;
};

VtkTriangulator::VtkTriangulator(TestSupport::PolygonMesh const& mesh)
    : mesh_(std::make_unique<Mesh>())
{
    vtkNew<vtkPoints> points;
    points->SetNumberOfPoints(static_cast<vtkIdType>(mesh.points.size()));
    for (std::size_t point = 0; point != mesh.points.size(); ++point)
        points->SetPoint(
            static_cast<vtkIdType>(point), mesh.points[point].x, mesh.points[point].y, mesh.points[point].z);
    vtkNew<vtkCellArray> cells;
    for (std::size_t face = 0; face != mesh.faceCount(); ++face) {
        cells->InsertNextCell(static_cast<int>(mesh.faceOffset[face + 1] - mesh.faceOffset[face]));
        for (unsigned int corner = mesh.faceOffset[face]; corner != mesh.faceOffset[face + 1]; ++corner)
            cells->InsertCellPoint(static_cast<vtkIdType>(mesh.faceVertex[corner]));
    }
    mesh_->polygons->SetPoints(points);
    mesh_->polygons->SetPolys(cells);
}

VtkTriangulator::VtkTriangulator(VtkTriangulator const& other)
    : mesh_(std::make_unique<Mesh>())
{
    mesh_->polygons->ShallowCopy(other.mesh_->polygons); // the filter leaves its input as it is
}

VtkTriangulator::~VtkTriangulator() = default;

void VtkTriangulator::triangulate()
{
    mesh_->filter->SetInputData(mesh_->polygons);
    mesh_->filter->Update();
}

}
