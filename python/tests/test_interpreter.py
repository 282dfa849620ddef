"""Operations as guests of the interpreter: threads, Ctrl-C, documentation, and any kind of arguments."""

import doctest
import inspect
import pathlib
import signal
import subprocess
import sys
import threading
import warnings
from concurrent.futures import ThreadPoolExecutor

import numpy as np
import pytest

import modeling
import modeling.files
import modeling.guides
import modeling.operations
from operation_support import SAMPLES, cloud, contents, torus

pytestmark = pytest.mark.filterwarnings("ignore::modeling.GeometryWarning")


def test_threads_work_on_objects_that_share_arrays() -> None:
    mesh = modeling.read(torus(1, columns=40, rows=30))
    variants = [modeling.smooth(mesh, amount) for amount in (0.5, 1, 2)]  # they share faces with the mesh
    work = [
        lambda m: modeling.smooth(m, 3),
        lambda m: modeling.subdivide(m, 0.1),
        lambda m: modeling.remove_slivers(m, 0.1),
        lambda m: modeling.delete_faces(m, range(0, 900, 7)),
        lambda m: modeling.merge([m, *variants]),
    ]
    cases = [(operation, m) for operation in work for m in (mesh, *variants)]
    expected = [contents(operation(m)) for operation, m in cases]
    before = contents(mesh)
    with ThreadPoolExecutor(4) as pool:
        for _ in range(3):
            assert list(pool.map(lambda case: contents(case[0](case[1])), cases)) == expected
    assert contents(mesh) == before


def test_the_interpreter_runs_during_operations() -> None:
    mesh = modeling.read(SAMPLES / "bunny.obj")
    count = 0
    ended = threading.Event()
    counts: list[int] = []

    def refine() -> None:
        counts.append(count)
        modeling.subdivide(mesh, relative=0.002)
        counts.append(count)
        ended.set()

    threading.Thread(target=refine).start()
    while not ended.is_set():
        count += 1
    assert counts[1] - counts[0] > 1000


INTERRUPTED = """
import os, signal, sys, threading, time
import modeling
mesh = modeling.read(sys.argv[1])
before = modeling.topology(mesh)
received = []
def interrupt():
    time.sleep(0.1)
    received.append(time.monotonic())
    os.kill(os.getpid(), signal.SIGINT)
if len(sys.argv) > 2:  # a handler that raises nothing: the operation is carried out all the same
    signal.signal(signal.SIGINT, lambda *_: print("handled"))
threading.Thread(target=interrupt).start()
start = time.monotonic()
try:
    result = modeling.subdivide(mesh, relative=float(sys.argv[2]) if len(sys.argv) > 2 else 0.0002)
    print("done", modeling.topology(result).triangles)
except KeyboardInterrupt:
    print("interrupted", time.monotonic() - received[0])
assert modeling.topology(mesh) == before
assert modeling.topology(modeling.subdivide(mesh, relative=0.05)).closed_manifold
"""


def test_an_interrupt_ends_an_operation_within_a_pass() -> None:
    done = subprocess.run(
        [sys.executable, "-c", INTERRUPTED, SAMPLES / "bunny.obj"], capture_output=True, text=True, timeout=300
    )
    assert done.returncode == 0, done.stderr
    word, seconds = done.stdout.split()
    assert word == "interrupted" and float(seconds) < 30  # to the end it would need more than the memory


def test_an_interrupt_that_is_handled_does_not_change_the_result() -> None:
    done = subprocess.run(
        [sys.executable, "-c", INTERRUPTED, SAMPLES / "bunny.obj", "0.0008"], capture_output=True, text=True, timeout=300
    )
    assert done.returncode == 0, done.stderr
    whole = modeling.subdivide(modeling.read(SAMPLES / "bunny.obj"), relative=0.0008)
    assert done.stdout.split() == ["handled", "done", str(modeling.topology(whole).triangles)]
    assert signal.getsignal(signal.SIGINT) is signal.default_int_handler


SMOOTHING = """
import os, signal, sys, threading, time
import modeling
mesh = modeling.subdivide(modeling.read(sys.argv[1]), relative=0.01)
def seconds(amount):
    start = time.monotonic()
    try:
        modeling.smooth(mesh, amount)
    except KeyboardInterrupt:
        print("interrupted")
    return time.monotonic() - start
whole = seconds(1000)
threading.Thread(target=lambda: (time.sleep(whole / 20), os.kill(os.getpid(), signal.SIGINT))).start()
print(seconds(1000) < whole / 2, len(mesh.face_vertices))
"""


def test_an_interrupt_ends_many_steps_on_a_small_mesh() -> None:
    command = [sys.executable, "-c", SMOOTHING, SAMPLES / "bunny.obj"]
    done = subprocess.run(command, capture_output=True, text=True, timeout=60)
    assert done.stdout.split()[:2] == ["interrupted", "True"], done.stdout + done.stderr


EXHAUSTED = """
import resource, sys
import modeling
mesh = modeling.read(sys.argv[1])
before = modeling.topology(modeling.subdivide(mesh, relative=0.05))
pages = int(open("/proc/self/statm").read().split()[0])
resource.setrlimit(resource.RLIMIT_AS, (pages * resource.getpagesize() + 300_000_000,) * 2)
try:
    modeling.subdivide(mesh, relative=0.0001)
except MemoryError:
    print("MemoryError")
assert modeling.topology(modeling.subdivide(mesh, relative=0.05)) == before
"""


def test_an_operation_that_runs_out_of_memory_leaves_its_argument() -> None:
    done = subprocess.run(
        [sys.executable, "-c", EXHAUSTED, SAMPLES / "cylinder.obj"], capture_output=True, text=True, timeout=120
    )
    assert (done.returncode, done.stdout) == (0, "MemoryError\n"), done.stderr


def test_threads_are_limited() -> None:
    all_threads = modeling.thread_count()
    with modeling.threads(1) as limit:
        assert modeling.thread_count() == 1
        with pytest.raises(RuntimeError):
            limit.__enter__()
        with modeling.threads(5):
            assert modeling.thread_count() == 1
    assert modeling.thread_count() == all_threads
    for wrong in (0, -1):
        with pytest.raises(ValueError):
            modeling.threads(wrong)


def test_examples_in_the_documentation_are_right(tmp_path: pathlib.Path) -> None:
    names = {name: getattr(modeling, name) for name in modeling.__all__} | {"samples": SAMPLES, "folder": tmp_path}
    for module in (modeling.operations, modeling.files, modeling.guides):
        result = doctest.testmod(module, extraglobs=names)
        assert result.failed == 0 and result.attempted > 1, module
    for function in (modeling.subdivide, modeling.smooth, modeling.read):
        assert "Parameters" not in str(inspect.signature(function)) and inspect.signature(function).return_annotation


def test_any_arguments_give_a_result_or_an_exception() -> None:
    random = np.random.default_rng(1)
    mesh = modeling.read(torus(3, columns=6, rows=5))
    quads, open_mesh = modeling.read(SAMPLES / "cube.ply"), modeling.read(SAMPLES / "stitch-quad.obj")
    points, strands = modeling.read(cloud(1, 20)), modeling.read(SAMPLES / "stitch-quad-rings.obj")
    guide = modeling.Guide.from_distance(mesh, (0, 0, 0), voxels=10)
    template = modeling.StitchTemplate(open_mesh, strands)
    nan, huge = float("nan"), 10**30
    values = [
        mesh, quads, open_mesh, points, strands, guide, None, "", "*", "points", "\0", b"x", 0, 1, -1, 0.3, nan, 1e38,
        -1e-40, huge, True, [], [0], [-1], [2**31], [2**32], [huge], [0.5], ["a"], [[0, 0, 0]], [[0, 0]], [[nan, 1e300, 0]],
        np.zeros(30, bool), np.ones(60, bool), np.zeros((3, 3, 3)), np.arange(4, dtype=np.int8), np.zeros((0, 3)),
        np.array([1j]), np.array(["x"]), np.array([None]), np.arange(30.0)[::-2], object(), (mesh, mesh), [points, None],
        (0, 0, 0), {}, [mesh, quads, mesh], np.zeros((4, 3), np.float16), np.array(3),
    ]  # fmt: skip
    skipped = {"threads", "thread_count", "Topology", "read", "write", "make_volume"}
    functions = [getattr(modeling, name) for name in modeling.__all__ if name.islower() and name not in skipped]
    functions = [f for f in functions if inspect.isfunction(f)]
    functions += [modeling.HalfEdges, modeling.HalfEdges(mesh).find, modeling.HalfEdges(mesh).neighbors, guide.sample]
    functions += [guide.covered_faces, modeling.StitchTemplate, template.lay, modeling.Guide.from_array]
    functions += [modeling.Guide.from_values, modeling.Guide.from_distance]
    before = [contents(object) for object in (mesh, quads, points, strands)]
    succeeded = set()
    for function in functions * 150:
        count = int(random.integers(1, 4))
        chosen = [values[i] for i in random.integers(len(values), size=count)]
        if random.random() < 0.7:
            chosen[0] = [mesh, quads, points, strands][int(random.integers(4))]
        try:
            with warnings.catch_warnings():
                warnings.simplefilter("ignore")
                result = function(*chosen)
        except (ValueError, TypeError, IndexError, OverflowError, AttributeError, MemoryError):
            continue
        succeeded.add(function)
        if isinstance(result, (modeling.Mesh, modeling.PointCloud, modeling.StrandSet)):
            assert modeling.validate(result) == []
    assert len(succeeded) > len(functions) / 2
    assert [contents(object) for object in (mesh, quads, points, strands)] == before
