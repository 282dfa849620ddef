#include "vtkAppend.h"

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>

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
#include <vtkSmartPointer.h>
#include <vtkUnsignedIntArray.h>

#include <vector>

namespace Benchmarks {

using namespace Tessara::Geometry;

struct VtkAppend::Inputs {
    std::vector<vtkSmartPointer<vtkPolyData>> polyData;
    std::size_t points = 0;
    std::size_t faces = 0;
};

namespace {

    template <class VtkArray, class T, class Scalar>
    void addArray(Tessara::Object const& object, Orvan::String const& name, int components, vtkFieldData* to)
    {
        auto const values = dataOf<T>(object, name);
        if (!values)
            return;
        vtkNew<VtkArray> array;
        array->SetName(name.c_str());
        array->SetNumberOfComponents(components);
        array->SetNumberOfTuples(static_cast<vtkIdType>(values->size));
        std::memcpy(array->GetPointer(0), values->data, values->size * sizeof(T));
        to->AddArray(array);
    }

    vtkSmartPointer<vtkPolyData> polyDataOf(Tessara::Object const& object)
    {
        auto polyData = vtkSmartPointer<vtkPolyData>::New();
        auto const positions = dataOf<Tessara::Math::float3>(object, sPointPosition);
        vtkNew<vtkPoints> points; // of single precision
        points->SetNumberOfPoints(static_cast<vtkIdType>(positions->size));
        std::memcpy(points->GetVoidPointer(0), positions->data, positions->size * sizeof(Tessara::Math::float3));
        polyData->SetPoints(points);
        if (auto const corners = dataOf<unsigned int>(object, sFaceVertex)) {
            vtkNew<vtkCellArray> cells;
            for (std::uint64_t corner = 0; corner != corners->size; corner += 3) {
                vtkIdType const face[] = {(*corners)[corner], (*corners)[corner + 1], (*corners)[corner + 2]};
                cells->InsertNextCell(3, face);
            }
            polyData->SetPolys(cells);
        }
        for (auto const& [component, to] : {std::pair<char const*, vtkFieldData*>{sPointComp, polyData->GetPointData()},
                 {sFaceComp, polyData->GetCellData()}}) {
            Orvan::Array<Orvan::String> const names = getGeoPropNamesByTarget(object, component);
            for (Orvan::String const& name : names) {
                if (name == sPointPosition || name == sFaceOffset)
                    continue;
                addArray<vtkFloatArray, Tessara::Math::float3, float>(object, name, 3, to);
                addArray<vtkFloatArray, float, float>(object, name, 1, to);
                addArray<vtkDoubleArray, double, double>(object, name, 1, to);
                addArray<vtkIntArray, int, int>(object, name, 1, to);
                addArray<vtkUnsignedIntArray, unsigned int, unsigned int>(object, name, 1, to);
            }
        }
        return polyData;
    }

}

VtkAppend::VtkAppend(Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs)
    : inputs_(std::make_unique<Inputs>())
{
    for (auto const& input : inputs) {
        inputs_->polyData.push_back(polyDataOf(*input));
        inputs_->points += static_cast<std::size_t>(inputs_->polyData.back()->GetNumberOfPoints());
        inputs_->faces += static_cast<std::size_t>(inputs_->polyData.back()->GetNumberOfPolys());
    }
}

VtkAppend::~VtkAppend() = default;

void VtkAppend::run() const
{
    vtkNew<vtkAppendPolyData> append;
    for (auto const& input : inputs_->polyData)
        append->AddInputData(input);
    append->Update();
}

std::size_t VtkAppend::pointCount() const
{
    return inputs_->points;
}

std::size_t VtkAppend::faceCount() const
{
    return inputs_->faces;
}

}
