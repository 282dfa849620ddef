"""Calls that are repeated need no more memory, neither in the library nor for Python objects."""

import contextlib
import ctypes
import gc
import pathlib
import pickle
import sys
from collections.abc import Callable
from typing import Any

import numpy as np
import pytest

import modeling
from modeling import Guide, HalfEdges, Mesh, PointCloud, StitchTemplate, StrandSet, _modeling
from operation_support import SAMPLES, torus

pytestmark = pytest.mark.filterwarnings("ignore")


class _Allocator(ctypes.Structure):
    _fields_ = [(name, ctypes.c_size_t) for name in ("arena", "ordblks", "smblks", "hblks", "hblkhd", "usmblks", "fsmblks",
                                                     "uordblks", "fordblks", "keepcost")]  # fmt: skip


_libc = ctypes.CDLL(None)
_libc.malloc.restype = ctypes.c_void_p
_libc.mallinfo2.restype = _Allocator


def leaked(call: Callable[[], Any], count: int = 12) -> tuple[int, ...]:
    """Bytes and Python objects per call that stay. Caches fill once, leaks grow in every round."""
    rounds = []
    for _ in range(3):
        gc.collect()
        state, blocks = _libc.mallinfo2(), sys.getallocatedblocks()
        bytes = state.uordblks + state.hblkhd
        for _ in range(count):
            call()
        gc.collect()
        state = _libc.mallinfo2()
        rounds.append((state.uordblks + state.hblkhd - bytes, sys.getallocatedblocks() - blocks))
    return tuple(max(0, round(min(kinds) / count)) for kinds in zip(*rounds))


def refused(call: Callable[[], Any]) -> Callable[[], None]:
    def run() -> None:
        with contextlib.suppress(ValueError, TypeError, IndexError, KeyError, OSError):
            call()
            raise AssertionError("nothing was refused")

    return run


def calls_of_everything(folder: pathlib.Path) -> dict[str, Callable[[], Any]]:
    mesh = modeling.read(torus(1, columns=9, rows=6))
    quads = modeling.read(SAMPLES / "cube.ply")
    assert isinstance(mesh, Mesh)
    points = np.random.default_rng(1).random((60, 3), np.float32)
    cloud, strands = PointCloud(points), StrandSet([points[:30], points[30:]])
    for geometry in (mesh, cloud, strands):
        geometry.point_data["text"] = ["a text that is longer than sixteen"] * geometry.point_count
        geometry.ranges["r"] = "points", [0] * geometry.point_count
    values = np.ones((9, 9, 9), np.float32)
    guide = Guide.from_array(values, 1, (-4, -4, -4))
    polygon, rings = modeling.read(SAMPLES / "stitch-quad.obj"), modeling.read(SAMPLES / "stitch-quad-rings.obj")
    template = StitchTemplate(polygon, rings)
    corners = polygon.points
    data, state = mesh.point_data, pickle.dumps(mesh)
    number = iter(range(10**9))
    calls: dict[str, Callable[[], Any]] = {
        "Mesh": lambda: Mesh(points, [[0, 1, 2], [0, 1, 2, 3]]), "PointCloud": lambda: PointCloud(points.tolist()),
        "StrandSet": lambda: StrandSet([points, points[:2]]), "adopt": lambda: PointCloud(modeling.adopt(points.copy())),
        "views": lambda: (mesh.points, mesh.face_vertices, data["quality"], data["text"], repr(mesh), mesh._repr_html_()),
        "set": lambda: (data.__setitem__("quality", np.arange(54.0)), setattr(mesh, "points", np.array(mesh.points))),
        "info": lambda: setattr(data.info("quality"), "default", 2.0), "pickle": lambda: pickle.loads(state),
        "ranges": lambda: (mesh.ranges.__setitem__("q", ("faces", np.zeros(108, np.uint32))), mesh.ranges.pop("q")),
        "components": lambda: (mesh.components.__setitem__("holes", 3), mesh.components.pop("holes")),
        "add": lambda: modeling.add_points_to_point_cloud(cloud, points, tag="new"),
        "delete points": lambda: modeling.delete_points_in_point_cloud(cloud, [1, 2]),
        "delete faces": lambda: modeling.delete_faces(mesh, [1, 2]),
        "delete components": lambda: modeling.delete_components(cloud, "points", [3]),
        "mapping": lambda: modeling.compute_deleted_component_mapping(np.ones(99, bool)),
        "copy": lambda: modeling.copy_non_geo_properties(cloud, [mesh, strands]), "merge": lambda: modeling.merge([mesh, quads]),
        "merge meshes": lambda: modeling.merge_meshes([mesh, quads]),
        "merge clouds": lambda: modeling.merge_point_clouds([cloud, cloud]),
        "merge strands": lambda: modeling.merge_strands([strands, strands]), "triangulate": lambda: modeling.triangulate(quads),
        "subdivide": lambda: modeling.subdivide(mesh, 0.3), "smooth": lambda: modeling.smooth(mesh, pin_sharp=30),
        "guided": lambda: modeling.subdivide_by_volume(mesh, guide, 0.3), "slivers": lambda: modeling.remove_slivers(mesh, 0.3),
        "large faces": lambda: modeling.large_faces(mesh, 0.3), "facts": lambda: (modeling.topology(mesh), modeling.validate(mesh)),
        "edges": lambda: (HalfEdges(mesh).neighbors(1), HalfEdges(mesh).find(0, 1)), "volume": lambda: guide.sample(points),
        "guide": lambda: Guide.from_array(values, 1), "distance": lambda: Guide.from_distance(mesh, (0, 0, 0), voxels=9),
        "template": lambda: (StitchTemplate(polygon, rings).edge_ends, template.weights, template.lay(corners, 1)),
        "threads": lambda: modeling.threads(1).__enter__().__exit__(None, None, None),
        "refused value": refused(lambda: data.__setitem__("quality", [1])), "refused key": refused(lambda: data["missing"]),
        "refused mesh": refused(lambda: Mesh(points, [[0, 1, 99]])), "refused face": refused(lambda: modeling.delete_faces(mesh, [999])),
        "refused quads": refused(lambda: modeling.subdivide(quads, 0.1)),
        "refused merge": refused(lambda: modeling.merge([mesh, cloud])), "refused pickle": refused(lambda: _modeling._restore(Mesh, ("array", 1))),
        "refused file": refused(lambda: modeling.read(folder / "missing.ply")),
        "refused array": refused(lambda: Guide.from_array([[[float("nan")]]], 1)),
    }  # fmt: skip
    for extension in ("ply", "obj", "stl", "glb", "h5", "vtp", "xyz", "off"):
        file = folder / f"a.{extension}"
        if extension == "xyz":
            np.savetxt(file, points)
        elif extension == "off":
            file.write_text("OFF\n3 1 0\n0 0 0\n1 0 0\n0 1 0\n3 0 1 2\n")
        else:
            modeling.write(mesh, file)
            calls["write " + extension] = lambda e=extension: modeling.write(mesh, folder / f"{next(number) % 2}.{e}", overwrite=True)
        if extension != "vtp":
            calls["read " + extension] = lambda file=file: modeling.read(file)
            broken = folder / f"broken.{extension}"
            broken.write_bytes(file.read_bytes()[:-20] if extension in ("ply", "stl", "glb", "h5") else b"v x y z\n1 2 x\n")
            calls["refused " + extension] = lambda file=broken: refused(lambda: modeling.read(file))()
    return calls


def test_a_leak_is_seen() -> None:
    kept: list[Any] = []
    assert leaked(lambda: _libc.malloc(64))[0] >= 32
    assert leaked(lambda: kept.append(object()))[1] >= 1


def test_nothing_leaks(tmp_path: pathlib.Path) -> None:
    calls = calls_of_everything(tmp_path)
    suspects = [name for name, call in calls.items() if any(leaked(call, 5 if "h5" in name else 8))]  # h5: starts a process
    found = {name: leaked(calls[name], 40 if "h5" in name else 200) for name in suspects}  # caches do not grow that far
    assert {name: leak for name, leak in found.items() if leak[0] >= 32 or leak[1] >= 1} == {}
