// Whole jobs of VTK on binary PLY files: modelingJobs-VTK --list, or JOB IN OUT.

#include <vtkAlgorithmOutput.h>
#include <vtkAppendPolyData.h>
#include <vtkNew.h>
#include <vtkPLYReader.h>
#include <vtkPLYWriter.h>
#include <vtkTriangleFilter.h>

#include <cstdio>
#include <string_view>

int main(int argc, char** argv)
{
    constexpr char const* kTriangulate = "triangulate quads";
    constexpr char const* kMerge = "merge a mesh with itself";
    if (argc == 2)
        std::printf("%s\n%s\n", kTriangulate, kMerge);
    if (argc != 4)
        return argc == 2 ? 0 : 2;
    vtkNew<vtkPLYReader> reader;
    reader->SetFileName(argv[2]);
    vtkNew<vtkTriangleFilter> triangulate;
    vtkNew<vtkAppendPolyData> merge;
    vtkNew<vtkPLYReader> second; // as others read the file twice
    second->SetFileName(argv[2]);
    triangulate->SetInputConnection(reader->GetOutputPort());
    merge->AddInputConnection(reader->GetOutputPort());
    merge->AddInputConnection(second->GetOutputPort());
    vtkNew<vtkPLYWriter> writer;
    writer->SetInputConnection(
        argv[1] == std::string_view(kMerge) ? merge->GetOutputPort() : triangulate->GetOutputPort());
    writer->SetFileName(argv[3]);
    writer->SetFileTypeToBinary();
    return writer->Write() != 0 ? 0 : 1;
}
