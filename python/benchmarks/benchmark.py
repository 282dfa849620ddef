"""Measures the package beside the library without Python, and beside VTK and meshio if they are installed.

    cmake --build build/release --target ModelingPython ModelingPythonReference
    /usr/bin/python3 python/benchmarks/benchmark.py [--build build/release] [--faces 1000000] [--rounds 9]
        [--threads 1] [GROUP...]

Groups: calls, large, vtk, meshio. All contenders of a row run in turn, round after round, and the least time of each counts:
processor time (of the thread for calls, of the process otherwise) and wall time. VTK and meshio are the Debian packages
python3-vtk9 and python3-meshio. Compare only figures of one run.
"""

from __future__ import annotations

import argparse
import gc
import importlib
import sys
import tempfile
import time
import warnings
from collections.abc import Callable, Iterator
from pathlib import Path
from typing import Any

import numpy as np

Work = Callable[[], object]
CALLS = 400  # of tiny operations per round: short enough that some round is not disturbed


def import_modules(build: Path) -> tuple[Any, Any]:
    """The package and its reference, of this build tree."""
    sys.path[:0] = [str(build / "python"), str(build / "python_benchmarks")]
    try:
        return importlib.import_module("modeling"), importlib.import_module("modeling_reference")
    except ImportError as error:
        sys.exit(f"{error}; build it: cmake --build {build} --target ModelingPython ModelingPythonReference")


def import_peer(name: str, package: str) -> Any:
    """None if the module is missing."""
    try:
        return importlib.import_module(name)
    except ImportError:
        print(f"\nLeft out: there is no {name}. The Debian package is {package}.")
        return None


# -- Measuring


def measure(
    works: dict[str, Work], rounds: int, clock: Callable[[], float] = time.process_time
) -> dict[str, tuple[float, float]]:
    """The least processor time and the least wall time of each, in seconds."""
    least = {name: (np.inf, np.inf) for name in works}
    for turn in range(rounds + 1):
        order = list(works.items())
        for name, work in order if turn % 2 == 0 else reversed(order):  # nobody always follows the same one
            gc.collect()
            processor, wall = clock(), time.perf_counter()
            result = work()
            processor, wall = clock() - processor, time.perf_counter() - wall
            del result
            if turn != 0:  # the first one finds facts and warms caches
                least[name] = min(least[name][0], processor), min(least[name][1], wall)
    return least


def print_table(title: str, columns: list[str], rows: list[list[str]]) -> None:
    print(f"\n{title}\n")
    for row in [columns, ["---"] * len(columns), *rows]:
        print(f"| {' | '.join(row)} |", flush=True)


def milliseconds(times: tuple[float, float]) -> str:
    return " / ".join(f"{1e3 * value:.1f}" for value in times)


# -- Meshes


def grid(faces: int) -> tuple[np.ndarray, np.ndarray]:
    """Points and quads of a torus with as many faces as that or a few less: a closed manifold."""
    n = int(faces**0.5)
    u, v = np.meshgrid(np.arange(n), np.arange(n), indexing="ij")
    a, b = 2 * np.pi * u / n, 2 * np.pi * v / n
    radius = 3 + np.cos(b)
    points = np.stack([radius * np.cos(a), radius * np.sin(a), np.sin(b)], -1).reshape(-1, 3).astype(np.float32)
    noise = np.random.default_rng(1).normal(0, 0.2 / n, points.shape)
    corner = lambda i, j: (i % n) * n + j % n
    quads = np.stack([corner(u, v), corner(u + 1, v), corner(u + 1, v + 1), corner(u, v + 1)], -1)
    return (points + noise).astype(np.float32), quads.reshape(-1, 4).astype(np.uint32)


def triangles(faces: int) -> tuple[np.ndarray, np.ndarray]:
    points, quads = grid(faces // 2)
    return points, quads[:, [0, 1, 2, 0, 2, 3]].reshape(-1, 3)


def tetrahedron(m: Any) -> Any:
    return m.Mesh([[0, 0, 0], [1, 0, 0], [0, 1, 0], [0, 0, 1]], [[0, 2, 1], [0, 1, 3], [1, 2, 3], [0, 3, 2]])


# -- Groups


def tiny_calls(m: Any, r: Any) -> Iterator[tuple[str, Work, Callable[[int], object] | None]]:
    """Calls from Python, and the same without Python for a number of times."""
    mesh = tetrahedron(m)
    cloud = m.PointCloud(mesh.points)
    strands = m.StrandSet(mesh.points, offsets=[0, 2, 4])
    guide = m.Guide.from_array(np.ones((4, 4, 4), np.float32), voxel_size=1)
    point = np.array([[0, 0, 1]], np.float32)
    mask, index = np.array([True, False, False, False]), np.array([0])
    yield "mesh.points", lambda: mesh.points, None
    yield (
        "add_points_to_point_cloud",
        lambda: m.add_points_to_point_cloud(cloud, point),
        lambda n: r.add_points_to_point_cloud(cloud, n),
    )
    yield (
        "delete_points_in_point_cloud",
        lambda: m.delete_points_in_point_cloud(cloud, index),
        lambda n: r.delete_points_in_point_cloud(cloud, index, n),
    )
    yield "delete_faces", lambda: m.delete_faces(mesh, mask), lambda n: r.delete_faces(mesh, mask, n)
    yield (
        "delete_components",
        lambda: m.delete_components(cloud, "points", mask),
        lambda n: r.delete_components(cloud, "sPointComp", mask, n),
    )
    yield (
        "compute_deleted_component_mapping",
        lambda: m.compute_deleted_component_mapping(mask),
        lambda n: r.compute_deleted_component_mapping(mask, n),
    )
    yield (
        "copy_non_geo_properties",
        lambda: m.copy_non_geo_properties(mesh, [mesh]),
        lambda n: r.copy_non_geo_properties(mesh, n),
    )
    yield "merge", lambda: m.merge([mesh, mesh]), lambda n: r.merge_meshes(mesh, n)
    yield "merge_meshes", lambda: m.merge_meshes([mesh, mesh]), lambda n: r.merge_meshes(mesh, n)
    yield "merge_point_clouds", lambda: m.merge_point_clouds([cloud, cloud]), lambda n: r.merge_point_clouds(cloud, n)
    yield "merge_strands", lambda: m.merge_strands([strands, strands]), lambda n: r.merge_strands(strands, n)
    yield "triangulate", lambda: m.triangulate(mesh), lambda n: r.triangulate(mesh, n)
    yield "subdivide", lambda: m.subdivide(mesh, 10), lambda n: r.subdivide(mesh, 10, n)
    yield (
        "subdivide_by_volume",
        lambda: m.subdivide_by_volume(mesh, guide, 10),
        lambda n: r.subdivide_by_volume(mesh, guide._guide, 10, n),
    )
    yield "large_faces", lambda: m.large_faces(mesh, 10), lambda n: r.large_faces(mesh, 10, n)
    yield "smooth", lambda: m.smooth(mesh, 0.5), lambda n: r.smooth(mesh, 0.5, n)
    yield "remove_slivers", lambda: m.remove_slivers(mesh), lambda n: r.remove_slivers(mesh, 0.05, n)
    yield "validate", lambda: m.validate(mesh), lambda n: r.validate(mesh, n)
    yield "HalfEdges", lambda: m.HalfEdges(mesh), lambda n: r.HalfEdges(mesh, n)
    yield "topology", lambda: m.topology(mesh), lambda n: r.topology(mesh, n)


def repeated(work: Work) -> Work:
    def run() -> None:
        for _ in range(CALLS):
            work()

    return run


def measure_calls(m: Any, r: Any, arguments: argparse.Namespace) -> None:
    empty, argument = r.empty, object()
    rows = []
    for name, call, library in tiny_calls(m, r):
        works = {"empty": repeated(lambda: empty(argument)), "loop": repeated(lambda: None), "python": repeated(call)}
        if library:
            works["library"] = lambda library=library: library(CALLS)
        least = {key: value[0] / CALLS for key, value in measure(works, 5 * arguments.rounds, time.thread_time).items()}
        unit, python = least["empty"] - least["loop"], least["python"] - least["loop"]
        inside = least.get("library", 0)
        rows.append([f"`{name}`", f"{1e6 * unit:.2f}", f"{1e6 * inside:.2f}" if library else "",
                     f"{1e6 * python:.2f}", f"{1e6 * (python - inside):.2f}", f"{(python - inside) / unit:.1f}"])
    print_table(
        "Calls on four faces or points: processor time in µs",
        ["call", "empty call", "library", "Python", "more than the library", "in empty calls"], rows)


def measure_large(m: Any, r: Any, arguments: argparse.Namespace) -> None:
    quads, mesh = m.Mesh(*grid(arguments.faces)), m.Mesh(*triangles(arguments.faces))
    cloud = m.PointCloud(mesh.points)
    guide = m.Guide.from_array(np.ones((4, 4, 4), np.float32), voxel_size=10)
    faces, points = np.arange(mesh.face_count) % 7 == 0, np.arange(cloud.point_count) % 7 == 0
    indices = np.flatnonzero(points)
    coarse, fine = 10.0, 0.6 * 6 / arguments.faces**0.5 * 2
    pairs: dict[str, tuple[Work, Work]] = {
        "triangulate (quads)": (lambda: m.triangulate(quads), lambda: r.triangulate(quads, 1)),
        "triangulate (triangles)": (lambda: m.triangulate(mesh), lambda: r.triangulate(mesh, 1)),
        "smooth, one step": (lambda: m.smooth(mesh, 0.5), lambda: r.smooth(mesh, 0.5, 1)),
        "smooth, ten steps": (lambda: m.smooth(mesh, 9), lambda: r.smooth(mesh, 9, 1)),
        "merge_meshes, two": (lambda: m.merge_meshes([mesh, mesh]), lambda: r.merge_meshes(mesh, 1)),
        "merge, two clouds": (lambda: m.merge([cloud, cloud]), lambda: r.merge_point_clouds(cloud, 1)),
        "delete_faces": (lambda: m.delete_faces(mesh, faces), lambda: r.delete_faces(mesh, faces, 1)),
        "delete_points_in_point_cloud": (lambda: m.delete_points_in_point_cloud(cloud, indices),
                                         lambda: r.delete_points_in_point_cloud(cloud, indices.astype(np.uint32), 1)),
        "remove_slivers, no slivers": (lambda: m.remove_slivers(mesh, 0), lambda: r.remove_slivers(mesh, 0, 1)),
        "remove_slivers, 0.3": (lambda: m.remove_slivers(mesh, 0.3), lambda: r.remove_slivers(mesh, 0.3, 1)),
        "subdivide, nothing to split": (lambda: m.subdivide(mesh, coarse), lambda: r.subdivide(mesh, coarse, 1)),
        "subdivide, splits": (lambda: m.subdivide(mesh, fine), lambda: r.subdivide(mesh, fine, 1)),
        "subdivide_by_volume, nothing": (lambda: m.subdivide_by_volume(mesh, guide, coarse),
                                         lambda: r.subdivide_by_volume(mesh, guide._guide, coarse, 1)),
        "large_faces": (lambda: m.large_faces(mesh, fine), lambda: r.large_faces(mesh, fine, 1)),
        "HalfEdges": (lambda: m.HalfEdges(mesh), lambda: r.HalfEdges(mesh, 1)),
        "validate": (lambda: m.validate(mesh), lambda: r.validate(mesh, 1)),
    }
    rows = []
    for name, (python, library) in pairs.items():
        least = measure({"Python": python, "library": library}, arguments.rounds)
        ratios = [f"{least['Python'][i] / least['library'][i]:.2f}" for i in range(2)]
        rows.append([name, milliseconds(least["library"]), milliseconds(least["Python"]), " / ".join(ratios)])
    print_table(f"Operations on {mesh.face_count:,} faces, {arguments.threads} threads: processor / wall time in ms",
                ["operation", "library", "Python", "ratio"], rows)


def vtk_mesh(vtk: Any, mesh: Any) -> Any:
    """The same arrays in VTK, which keeps references to them."""
    support = importlib.import_module("vtkmodules.util.numpy_support")
    cells, points, poly = vtk.vtkCellArray(), vtk.vtkPoints(), vtk.vtkPolyData()
    cells.SetData(support.numpy_to_vtkIdTypeArray(mesh.face_offsets.astype(np.int64), deep=True),
                  support.numpy_to_vtkIdTypeArray(mesh.face_vertices.astype(np.int64), deep=True))
    points.SetData(support.numpy_to_vtk(mesh.points, deep=True))
    poly.SetPoints(points)
    poly.SetPolys(cells)
    return poly


def measure_vtk(m: Any, r: Any, arguments: argparse.Namespace) -> None:
    vtk = import_peer("vtkmodules.all", "python3-vtk9")
    if not vtk:
        return
    mesh = m.Mesh(*triangles(arguments.faces))
    poly = vtk_mesh(vtk, mesh)

    def append() -> Any:
        filter = vtk.vtkAppendPolyData()
        filter.AddInputData(poly)
        filter.AddInputData(poly)
        filter.Update()
        return filter.GetOutput()

    def smooth() -> Any:
        filter = vtk.vtkSmoothPolyDataFilter()
        filter.SetInputData(poly)
        filter.SetNumberOfIterations(10)
        filter.SetRelaxationFactor(0.9)
        filter.SetConvergence(0)
        filter.Update()
        return filter.GetOutput()

    assert append().GetNumberOfPolys() == 2 * mesh.face_count and smooth().GetNumberOfPoints() == mesh.point_count
    rows = []
    for name, ours, theirs in (
        ("merge_meshes, two / vtkAppendPolyData", lambda: m.merge_meshes([mesh, mesh]), append),
        ("smooth, ten steps / vtkSmoothPolyDataFilter, ten iterations", lambda: m.smooth(mesh, 9), smooth),
    ):
        rows.append([name, *compare(ours, theirs, arguments.rounds)])
    print_table(f"{vtk.vtkVersion.GetVTKSourceVersion()}, {mesh.face_count:,} triangles, {arguments.threads} threads: "
                "processor / wall time in ms", ["operation", "modeling", "VTK", "times as long"], rows)


def compare(ours: Work, theirs: Work, rounds: int) -> list[str]:
    least = measure({"ours": ours, "theirs": theirs}, rounds)
    ratios = [f"{least['theirs'][i] / least['ours'][i]:.1f}" for i in range(2)]
    return [milliseconds(least["ours"]), milliseconds(least["theirs"]), " / ".join(ratios)]


def measure_meshio(m: Any, r: Any, arguments: argparse.Namespace) -> None:
    meshio = import_peer("meshio", "python3-meshio")
    if not meshio:
        return
    mesh = m.Mesh(*triangles(arguments.faces // 4))
    rows = []
    with tempfile.TemporaryDirectory() as folder:
        for name in ("mesh.ply", "mesh.stl", "mesh.obj"):
            file = f"{folder}/{name}"
            m.write(mesh, file)
            read = meshio.read(file)
            assert sum(len(block.data) for block in read.cells) == mesh.face_count
            size = Path(file).stat().st_size / 1e6
            times = compare(lambda: m.read(file), lambda: meshio.read(file), min(arguments.rounds, 3))
            rows.append([f"{name[-3:].upper()}, {size:.0f} MB", *times])
    print_table(f"Reading {mesh.face_count:,} triangles, meshio {meshio.__version__}, {arguments.threads} threads: "
                "processor / wall time in ms", ["file", "modeling", "meshio", "times as long"], rows)


GROUPS = {"calls": measure_calls, "large": measure_large, "vtk": measure_vtk, "meshio": measure_meshio}


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("groups", nargs="*", metavar="GROUP", help="which to measure; all if none is named")
    parser.add_argument("--build", type=Path, default=Path(__file__).parents[2] / "build" / "release")
    parser.add_argument("--faces", type=int, default=1_000_000)
    parser.add_argument("--rounds", type=int, default=9)
    parser.add_argument("--threads", type=int, default=1)
    arguments = parser.parse_args()
    if unknown := set(arguments.groups) - set(GROUPS):
        parser.error(f"there is no group {', '.join(sorted(unknown))}")
    modeling, reference = import_modules(arguments.build.resolve())
    warnings.simplefilter("ignore", modeling.GeometryWarning)
    with modeling.threads(arguments.threads):
        for name, group in GROUPS.items():
            if name in (arguments.groups or GROUPS):
                group(modeling, reference, arguments)


if __name__ == "__main__":
    main()
