"""Whatever is passed to the functions for data: an exception or a change, never a crash or half a change."""

import random

import numpy as np
import pytest

import modeling
from modeling import Mesh, PointCloud, StrandSet, adopt

ALLOWED = (ValueError, TypeError, KeyError, IndexError, AttributeError, MemoryError, OverflowError)


class Hostile:
    """Changes the geometry while it is converted."""

    def __init__(self, geometry):
        self.geometry = geometry

    def __array__(self, dtype=None):
        for name in list(self.geometry.point_data):
            del self.geometry.point_data[name]
        self.geometry.__init__()
        return np.arange(6.0)

    def __index__(self):
        self.geometry.__init__()
        return 1

    def __len__(self):
        return -1

    def __getitem__(self, index):
        raise RuntimeError if index else IndexError


def arrays(chance: random.Random):
    dtype = chance.choice(["i1", ">i4", "u4", "i8", "u8", "f2", "f4", ">f8", "?", "g", "c8", "O", "U3", "S3", "M8[s]", "V7",
                           [("face", "u4"), ("edge", "u4")], [("face", "u4"), ("edge", "<i4")]])  # fmt: skip
    shape = chance.choice([(), (0,), (6,), (6, 3), (6, 2, 3), (2, 4), (8,), (0, 3), (3, 0), (6, 1), (1,) * 32, (6, 4, 4)])
    a = np.zeros(shape, dtype)
    if a.dtype.kind in "iuf" and a.size:
        with np.errstate(all="ignore"):
            a = a + np.array(chance.choice([0, 1, -1, 2.0**31, 2.0**40, np.nan])).astype(a.dtype)
    if a.ndim == 1 and chance.random() < 0.3:
        a = chance.choice([a[::-1], np.broadcast_to(a[:1], (6,)) if a.size else a, np.repeat(a, 2)[::2]])
    if a.ndim == 2 and chance.random() < 0.3:
        a = chance.choice([a.T, np.asfortranarray(a), a[:, ::-1]])
    if chance.random() < 0.2:
        a = np.frombuffer(b"\xff" + a.tobytes(), np.uint8)[1:]  # not aligned
        a = a[: a.size // 8 * 8].view(chance.choice(["f8", "u4", "?", "u8"]))
    return a


def thing(chance: random.Random, geometry):
    return chance.choice([
        lambda: arrays(chance), lambda: arrays(chance), lambda: adopt(arrays(chance)), lambda: None, lambda: 5, lambda: -1,
        lambda: "points", lambda: "", lambda: "\0", lambda: "\ud800", lambda: "w", lambda: b"bytes", lambda: {}, lambda: [],
        lambda: [[0, 1, 2]], lambda: [[0, 1], [2**70]], lambda: [[]], lambda: [None], lambda: object(), lambda: 1e300,
        lambda: Hostile(geometry), lambda: [Hostile(geometry)] * 6, lambda: geometry, lambda: type(geometry),
        lambda: geometry.points, lambda: iter([]), lambda: float("nan"), lambda: range(6), lambda: ["a"] * 6,
        lambda: modeling.GeoLocation("a", "b", 2**40, (1, 2)), lambda: [modeling.GeoLocation(1, 2, 3, 4)] * 6,
        lambda: ("points", range(6)), lambda: ("w", [0]), lambda: "sPointComp", lambda: "sPointPosition", lambda: "lines",
        lambda: 2**70, lambda: "face:w", lambda: ("faces", [0, 1]), lambda: "r", lambda: 6,
    ])()  # fmt: skip


def step(chance: random.Random, geometry, make):
    """One change with arguments of any kind."""
    any_thing = lambda: thing(chance, geometry)  # noqa: E731
    name = lambda: chance.choice(["w", "r", "lines", "points", "faces", "corners", any_thing()])  # noqa: E731
    data = lambda: geometry.data(chance.choice(["points", "faces", "corners", "strands", "r", "lines"]))  # noqa: E731
    chance.choice([
        lambda: data().__setitem__(name(), any_thing()), lambda: data().__setitem__(name(), any_thing()),
        lambda: data().__delitem__(name()), lambda: data()[name()], lambda: list(data()), lambda: data().info(name()),
        lambda: setattr(data().info(name()), chance.choice(["default", "interpolation", "target"]), any_thing()),
        lambda: geometry.ranges.__setitem__(name(), any_thing()), lambda: geometry.ranges.__delitem__(name()),
        lambda: setattr(geometry.ranges[name()], "indices", any_thing()), lambda: geometry.ranges[name()].data[name()],
        lambda: geometry.components.__setitem__(name(), any_thing()), lambda: geometry.components.__delitem__(name()),
        lambda: setattr(geometry, "points", any_thing()), lambda: geometry.data(any_thing()), lambda: geometry == any_thing(),
        lambda: make(any_thing(), any_thing()), lambda: make(any_thing(), offsets=any_thing()), lambda: make(any_thing()),
        lambda: adopt(any_thing()), lambda: modeling._modeling._restore(any_thing(), any_thing()),
        lambda: modeling._modeling._restore(make, (any_thing(), any_thing())),
        lambda: modeling._modeling._restore(make, ("array", any_thing(), any_thing())),
    ])()  # fmt: skip


@pytest.mark.filterwarnings("ignore")
@pytest.mark.parametrize("seed", range(30))
def test_any_input(seed):
    chance = random.Random(seed)
    points = np.arange(18, dtype=np.float32).reshape(6, 3)
    make, fresh = chance.choice([
        (Mesh, lambda: Mesh(points, [[0, 1, 2, 3], [3, 4, 5, 0]])), (StrandSet, lambda: StrandSet([points])),
        (PointCloud, lambda: PointCloud(points)),
    ])  # fmt: skip
    geometry = fresh()
    done = 0
    for _ in range(500):
        before = geometry.copy()
        try:
            step(chance, geometry, make)
            done += 1
        except ALLOWED:
            assert geometry == before or geometry.point_count == 0
        except RuntimeError:
            pass  # from Hostile
        geometry.validate()
        repr(geometry), geometry._repr_html_()
        if geometry.point_count == 0:  # the work of Hostile
            geometry = fresh()
    assert done > 30
