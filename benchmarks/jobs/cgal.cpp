// Whole jobs of CGAL on binary PLY files: modelingJobs-CGAL --list, or JOB IN OUT.

#include <CGAL/Exact_predicates_inexact_constructions_kernel.h>
#include <CGAL/Polygon_mesh_processing/triangulate_faces.h>
#include <CGAL/Surface_mesh.h>
#include <CGAL/Surface_mesh/IO/PLY.h>
#include <CGAL/subdivision_method_3.h>

#include <cstdio>
#include <fstream>
#include <functional>
#include <map>
#include <string>

using Kernel = CGAL::Exact_predicates_inexact_constructions_kernel;
using Mesh = CGAL::Surface_mesh<Kernel::Point_3>;

int main(int argc, char** argv)
{
    std::map<std::string, std::function<void(Mesh&)>> const jobs{
        {"triangulate quads", [](Mesh& mesh) { CGAL::Polygon_mesh_processing::triangulate_faces(mesh); }},
        {"one √3 step",
            [](Mesh& mesh) {
                CGAL::Subdivision_method_3::Sqrt3_subdivision(mesh, CGAL::parameters::number_of_iterations(1));
            }},
    };
    if (argc == 2)
        for (auto const& [name, job] : jobs)
            std::puts(name.c_str());
    if (argc != 4)
        return argc == 2 ? 0 : 2;
    Mesh mesh;
    std::string comments;
    std::ifstream in(argv[2], std::ios::binary);
    if (!CGAL::IO::read_PLY(in, mesh, comments))
        return 1;
    jobs.at(argv[1])(mesh);
    mesh.collect_garbage();
    std::ofstream out(argv[3], std::ios::binary);
    CGAL::IO::set_binary_mode(out);
    return CGAL::IO::write_PLY(out, mesh) ? 0 : 1;
}
