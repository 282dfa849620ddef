"""Whatever is passed to any function, method or property: an exception that is documented or a result, never a crash, and
objects that were passed stay as they are. MODELING_TEST_CALLS is the number of calls of a long run."""

import contextlib
import inspect
import os
import pathlib
import random
import subprocess
import sys
from collections.abc import Callable, Iterator
from typing import Any

import numpy as np
import pytest

import modeling
from modeling import Mesh, PointCloud, StrandSet, _modeling
from test_data_fuzz import arrays

ALLOWED = (ValueError, TypeError, IndexError, KeyError, AttributeError, OverflowError, MemoryError, OSError)
CALLS = int(os.environ.get("MODELING_TEST_CALLS", "8000"))
# What belongs to the interpreter.
SKIPPED = {"__class__", "__dict__", "__new__", "__init_subclass__", "__subclasshook__", "__getattribute__", "__delattr__",
           "__setattr__", "__dir__", "__sizeof__", "__reduce__", "__getstate__", "_abc_impl"}  # fmt: skip


class Subclass(np.ndarray):
    pass


def objects() -> dict[str, Any]:
    """One of each class, by the names of the arguments that take them."""
    points = np.array([[0, 0, 0], [1, 0, 0], [0, 1, 0], [0, 0, 1]], np.float32)
    mesh = Mesh(points, [[0, 2, 1], [0, 1, 3], [1, 2, 3], [0, 3, 2]])
    cloud, strands = PointCloud(points), StrandSet([points[:2], points[2:]])
    for geometry in (mesh, cloud, strands):
        geometry.point_data["w"] = np.arange(4.0)
        geometry.ranges["r"] = "points", [0, 0, 0, 0]
        geometry.ranges["r"].data["text"] = ["a"]
    mesh.face_data["material"] = np.arange(4)
    guide = modeling.Guide.from_array(np.ones((2, 2, 2)), 1)
    polygon = Mesh([[0, 0, 0], [1, 0, 0], [0, 1, 0]], [[0, 1, 2]])
    template = modeling.StitchTemplate(polygon, StrandSet([[[0.5, 0, 0], [0, 0.5, 0]]]))
    return {"mesh": mesh, "cloud": cloud, "strands": strands, "guide": guide, "polygon": polygon, "template": template,
            "threads": modeling.threads(2), "edges": modeling.HalfEdges(mesh), "raw_guide": guide._guide, "raw_template": template._template,
            "band": _modeling.Band(1.0, 10, 3.0, None, 1.0), "range": mesh.ranges["r"], "ranges": mesh.ranges,
            "components": mesh.components, "data": mesh.point_data, "info": mesh.point_data.info("w")}  # fmt: skip


def odd_array(chance: random.Random) -> Any:
    a = np.asanyarray(arrays(chance))
    kind = chance.randrange(6)
    if kind == 0:
        a = a.view(Subclass)
    elif kind == 1:
        a.flags.writeable = False
    elif kind == 2 and a.ndim and a.dtype != object:
        a = np.lib.stride_tricks.as_strided(a, a.shape, (0,) * a.ndim)  # all elements overlap
    elif kind == 3:
        a = np.ma.masked_array(a)
    return a


def thing(chance: random.Random, known: dict[str, Any]) -> Any:
    """An argument of any kind."""
    return chance.choice([
        lambda: odd_array(chance), lambda: odd_array(chance), lambda: chance.choice(list(known.values())),
        lambda: [chance.choice(list(known.values())), None], lambda: (known["mesh"], known["mesh"]), lambda: type(known["mesh"]),
        lambda: chance.choice([None, True, 0, 1, 3, -1, 255, 2**31, 2**32 - 2, 2**63, 2**64, 2**70, -(2**63), -(2**70)]),
        lambda: chance.choice([0.0, -0.0, 0.5, -1.5, 1e300, -1e300, 1e-30, float("nan"), float("inf"), 1j]),
        lambda: chance.choice(["", "\0", "\ud800", "w", "r", "points", "faces", "a.ply", "a.h5", "ply", "*", "a" * 10_000]),
        lambda: chance.choice([b"", b"bytes", bytearray(8), memoryview(b"12345678")]), lambda: [], lambda: {}, lambda: [[]],
        lambda: [0, 1, 2], lambda: [0.5, 1, 2], lambda: [2**70], lambda: [[0, 1, 2], [3]], lambda: range(4), lambda: iter([0, 1]),
        lambda: object(), lambda: pathlib.Path("b.obj"), lambda: slice(None), lambda: (0.0, 1.0), lambda: modeling.GeoLocation,
    ])()  # fmt: skip


def fitting(name: str, chance: random.Random, known: dict[str, Any]) -> Any:
    """An argument that its name suggests, so that the others are looked at as well."""
    if name in known:
        return known[name]
    some = {
        "object": lambda: chance.choice([known["mesh"], known["cloud"], known["strands"]]), "objects": lambda: [known["mesh"]] * 2,
        "meshes": lambda: [known["mesh"]] * 2, "clouds": lambda: [known["cloud"]] * 2, "inputs": lambda: [known["strands"]],
        "relative": lambda: chance.choice([None, 0.3]), "tolerance": lambda: chance.choice([None, 0.5]),
        "points": lambda: chance.choice([[0, 2], known["mesh"].points]), "positions": lambda: [[0, 0, 1]], "file": lambda: "a.h5",
        "faces": lambda: [1], "elements": lambda: [3], "component": lambda: "points", "deleted": lambda: np.ones(4, bool),
        "values": lambda: np.ones(4), "point": lambda: chance.choice([2, (0, 0, 0)]), "voxel_size": lambda: 0.5,
        "offsets": lambda: [0, 2, 4], "name": lambda: "w", "count": lambda: 2, "overwrite": lambda: True, "scale": lambda: 1.0,
    }  # fmt: skip
    return some[name]() if name in some else thing(chance, known)


# What is meant to change objects, besides properties that are assigned.
CHANGING = {"clear", "pop", "popitem", "update", "setdefault", "__setitem__", "__delitem__"}


def members(known: dict[str, Any]) -> Iterator[tuple[str, bool, Callable[..., Any]]]:
    """All functions of the package, constructors, methods and setters of properties, and whether they change objects."""
    for module in (modeling, _modeling):
        for name in modeling.__all__ if module is modeling else dir(module):
            value = getattr(module, name)
            if callable(value) and not (isinstance(value, type) and issubclass(value, BaseException)) and name not in SKIPPED:
                yield name, name.startswith(("_set_", "_delete_")), value
    for name in ("read", "from_array", "from_values", "from_distance"):
        yield name, False, getattr(modeling.Guide, name)
    for owner in known.values():
        for name in dir(owner):
            if name in SKIPPED or name == "__init__":  # replaces the object: see test_data_fuzz
                continue
            if isinstance(inspect.getattr_static(type(owner), name, None), property):
                yield name, True, accessor(owner, name)
            elif callable(getattr(owner, name)):
                yield name, name in CHANGING, getattr(owner, name)


def accessor(owner: Any, name: str) -> Callable[..., Any]:
    return lambda *values: setattr(owner, name, *values) if values else getattr(owner, name)


def parameters(function: Callable[..., Any]) -> list[inspect.Parameter]:
    try:
        return [p for p in inspect.signature(function).parameters.values() if p.kind not in (p.VAR_POSITIONAL, p.VAR_KEYWORD)]
    except (ValueError, TypeError):  # written in C++
        return []


def arguments(function: Callable[..., Any], chance: random.Random, known: dict[str, Any]) -> tuple[list[Any], dict[str, Any]]:
    wrong = chance.choice([0.1, 0.4, 1])
    named = parameters(function)
    if not named:
        choose = lambda: thing(chance, known) if chance.random() < 0.7 else known["mesh"]  # noqa: E731
        return [choose() for _ in range(chance.randrange(7))], {}
    positional, options = [], {}
    for parameter in named:
        value = thing(chance, known) if chance.random() < wrong else fitting(parameter.name, chance, known)
        if parameter.kind is parameter.KEYWORD_ONLY:
            if chance.random() < 0.3:
                options[parameter.name] = value
        elif parameter.default is parameter.empty or chance.random() < 0.5:
            positional.append(value)
    return positional, options


def run(calls: int, seed: int) -> None:
    chance = random.Random(seed)
    done = 0
    for call in range(calls):
        if call % 100 == 0:
            known = objects()
            everything = list(members(known))
        copies = {name: known[name].copy() for name in ("mesh", "cloud", "strands")}
        name, changes, function = chance.choice(everything)
        positional, options = arguments(function, chance, known)
        if os.environ.get("MODELING_TEST_TRACE"):
            with contextlib.suppress(Exception):  # of what earlier calls have deleted
                print(seed, call, name, positional, options, file=sys.stderr, flush=True)
        try:
            function(*positional, **options)
            done += 1
        except ALLOWED:
            pass
        except RuntimeError:  # a limit of threads that is in force already
            assert name == "__enter__", (seed, call, name, positional, options)
        for key, copy in copies.items():
            if known[key] != copy:
                assert changes, (seed, call, name, positional, options)
            known[key].validate()
    assert done > calls / 20


@pytest.mark.filterwarnings("ignore")
def test_any_argument(tmp_path: pathlib.Path) -> None:
    """In a process of its own, so that a crash is seen as one."""
    code = f"import warnings, test_any_argument as t; warnings.simplefilter('ignore'); t.run({CALLS}, {CALLS})"
    tests = str(pathlib.Path(__file__).parent)
    environment = {**os.environ, "PYTHONPATH": os.pathsep.join([tests, os.environ["PYTHONPATH"]]), "PYTHONFAULTHANDLER": "1"}
    ended = subprocess.run([sys.executable, "-c", code], cwd=tmp_path, env=environment, capture_output=True, text=True)
    assert ended.returncode == 0, ended.stderr[-4000:]
