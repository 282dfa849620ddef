// Whole jobs of Open3D on binary PLY files: modelingJobs-Open3D --list, or JOB IN OUT.

#include <open3d/geometry/TriangleMesh.h>
#include <open3d/io/TriangleMeshIO.h>

#include <cstdio>
#include <string_view>

int main(int argc, char** argv)
{
    constexpr char const* kTriangulate = "triangulate quads"; // which reading does
    constexpr char const* kMerge = "merge a mesh with itself";
    if (argc == 2)
        std::printf("%s\n%s\n", kTriangulate, kMerge);
    if (argc != 4)
        return argc == 2 ? 0 : 2;
    open3d::geometry::TriangleMesh mesh, second;
    if (!open3d::io::ReadTriangleMesh(argv[2], mesh))
        return 1;
    if (argv[1] == std::string_view(kMerge)) {
        if (!open3d::io::ReadTriangleMesh(argv[2], second)) // as others read the file twice
            return 1;
        mesh += second;
    }
    return open3d::io::WriteTriangleMesh(argv[3], mesh) ? 0 : 1;
}
