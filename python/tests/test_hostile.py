"""What scripts can do to the package from the side: other threads, callbacks and memory that changes."""

import subprocess
import sys
import threading
from collections import UserList
from typing import Any

import numpy as np
import pytest

import modeling
from modeling import _modeling

TRIANGLE = ([[0, 0, 0], [1, 0, 0], [0, 1, 0]], [[0, 1, 2]])


def test_an_object_that_another_thread_replaces_is_kept_while_it_is_used() -> None:
    points = np.random.default_rng(1).random((300_000, 3), np.float32)
    faces = np.random.default_rng(2).integers(0, len(points), (300_000, 3)).astype(np.uint32)
    mesh = modeling.Mesh(points, faces)
    ended = threading.Event()

    def check() -> None:
        while not ended.is_set():
            mesh.validate()

    threads = [threading.Thread(target=check) for _ in range(2)]
    for thread in threads:
        thread.start()
    for _ in range(50):
        mesh.__init__(*TRIANGLE)  # type: ignore[misc]
        mesh.__init__(points, faces)  # type: ignore[misc]
    ended.set()
    for thread in threads:
        thread.join()
    assert mesh == modeling.Mesh(points, faces)


def test_faces_may_be_made_while_they_are_read() -> None:
    class Faces(UserList[Any]):
        def __getitem__(self, index: Any) -> Any:
            return list(self.data[index])

    mesh = modeling.Mesh(np.zeros((5000, 3), np.float32), Faces([[1000, 2000, 3000], [1000, 2000, 3000, 4000]]))
    assert mesh.face_vertices.tolist() == [1000, 2000, 3000, 1000, 2000, 3000, 4000]


def test_every_byte_but_0_is_true_in_a_mask() -> None:
    quad = modeling.Mesh([[0, 0, 0], [1, 0, 0], [1, 1, 0], [0, 1, 0]], [[0, 1, 2], [0, 2, 3], [0, 1, 3], [1, 2, 3]])
    mask = np.array([255, 0, 0, 2], np.uint8).view(np.bool_)
    assert modeling.delete_faces(quad, mask) == modeling.delete_faces(quad, [0, 3])


def test_memory_that_others_can_write_is_copied() -> None:
    memory = bytearray(np.array([0, 1, 2], np.uint32).tobytes())
    corners = modeling.adopt(np.frombuffer(memoryview(memory).toreadonly(), np.uint32))
    mesh = modeling.Mesh(TRIANGLE[0], corners, offsets=[0, 3])
    memory[0:4] = b"\xff\xff\xff\x7f"
    assert mesh.face_vertices.tolist() == [0, 1, 2]


def test_long_options_in_messages_are_no_trouble() -> None:
    with pytest.raises(modeling.Refusal, match="channels: "):
        modeling.triangulate(modeling.Mesh(*TRIANGLE), channels="--" + "a" * 300_000)


@pytest.mark.parametrize("kind", [modeling.HalfEdges, modeling.threads, _modeling.Guide, _modeling.StitchTemplate])
def test_there_are_no_instances_without_a_value(kind: type) -> None:
    with pytest.raises(TypeError):
        kind.__new__(kind)


def test_pickled_lists_that_grow_and_nest_are_refused_or_read() -> None:
    cloud = modeling.PointCloud([[0, 0, 0]])
    state = cloud.__reduce_ex__(4)[1][1]
    locations: list[Any] = []

    class Grows:
        def __index__(self) -> int:
            locations.extend([locations[0]] * 100_000)
            return 5

    location = (b"a", b"b", 1, b"\0" * 12)
    locations += [location, (b"a", b"b", Grows(), b"\0" * 12)]
    restore = cloud.__reduce_ex__(4)[0]
    restore(modeling.PointCloud, ("object", state[1] + ((b"q", ("locations", locations)),)))

    inner: Any = ("nothing",)
    entries = []
    for number in range(300):  # each of them allowed by itself
        for _ in range(990):
            inner = ("object", ((b"k", inner),))
        entries.append((b"%d" % number, inner))
    with pytest.raises(ValueError):
        restore(modeling.PointCloud, ("object", state[1] + tuple(entries)))


def test_the_interpreter_can_end_while_daemon_threads_are_at_work() -> None:
    script = (
        "import modeling, threading, time\n"
        "m = modeling.Mesh([[0,0,0],[1,0,0],[0,1,0],[0,0,1]], [[0,2,1],[0,1,3],[1,2,3],[0,3,2]])\n"
        "m = modeling.subdivide(m, 0.02)\n"
        "def work():\n"
        "    while True: modeling.smooth(m, 30)\n"
        "for _ in range(2): threading.Thread(target=work, daemon=True).start()\n"
        "time.sleep(0.2)\n"
    )
    for _ in range(3):
        assert subprocess.run([sys.executable, "-c", script], timeout=60).returncode == 0
