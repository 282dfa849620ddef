// Whole jobs of OpenMesh on binary PLY files: modelingJobs-OpenMesh --list, or JOB IN OUT.

#include <OpenMesh/Core/IO/MeshIO.hh>
#include <OpenMesh/Core/Mesh/PolyMesh_ArrayKernelT.hh>
#include <OpenMesh/Core/Mesh/TriMesh_ArrayKernelT.hh>
#include <OpenMesh/Tools/Subdivider/Uniform/Sqrt3T.hh>

#include <cstdio>
#include <string_view>

namespace {

template <class Mesh, class Work> int run(char const* in, char const* out, Work const& work)
{
    Mesh mesh;
    if (!OpenMesh::IO::read_mesh(mesh, in))
        return 1;
    work(mesh);
    return OpenMesh::IO::write_mesh(mesh, out, OpenMesh::IO::Options::Binary) ? 0 : 1;
}

}

int main(int argc, char** argv)
{
    constexpr char const* kTriangulate = "triangulate quads";
    constexpr char const* kRefine = "one √3 step";
    if (argc == 2)
        std::printf("%s\n%s\n", kTriangulate, kRefine);
    if (argc != 4)
        return argc == 2 ? 0 : 2;
    if (argv[1] == std::string_view(kTriangulate))
        return run<OpenMesh::PolyMesh_ArrayKernelT<>>(argv[2], argv[3], [](auto& mesh) { mesh.triangulate(); });
    return run<OpenMesh::TriMesh_ArrayKernelT<>>(argv[2], argv[3], [](auto& mesh) {
        OpenMesh::Subdivider::Uniform::Sqrt3T<OpenMesh::TriMesh_ArrayKernelT<>, float> sqrt3;
        sqrt3.attach(mesh);
        sqrt3(1);
        sqrt3.detach();
    });
}
