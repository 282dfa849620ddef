"""Geometry as NumPy arrays: construction, views, properties, ranges, copies and pickles."""

import copy
import gc
import pickle
import warnings
import weakref

import numpy as np
import pytest

import modeling
from modeling import GeoLocation, InvalidGeometry, Mesh, PointCloud, StrandSet, adopt

f4, u4 = np.float32, np.uint32
SQUARES = np.array([[0, 0, 0], [1, 0, 0], [2, 0, 0], [0, 1, 0], [1, 1, 0], [2, 1, 0]], f4)
QUADS = [[0, 1, 4, 3], [1, 2, 5, 4]]

SCALARS = {
    "char": "i1", "short": "i2", "int": "i4", "long": "i8", "uchar": "u1", "ushort": "u2", "uint": "u4", "ulong": "u8",
    "float": "f4", "double": "f8",
}  # fmt: skip
SHAPES = {
    "int": ["2", "3", "2x2", "2x3"],
    "short": ["2", "3", "2x2", "2x3"],
    "uchar": ["3", "4"],
    "float": ["2", "3", "4", "2x2", "2x3", "3x3", "4x4"],
    "double": ["2", "3", "4", "2x2", "2x3", "3x3", "4x4"],
}
RECORDS = {
    "GeometryType": [("geometry_type", "i4")],
    "FaceEdge": [("face", "u4"), ("edge", "u4")],
    "GraphTransforms": [("local", "f4", (4, 4)), ("world", "f4", (4, 4))],
}
TYPES = {name: (np.dtype(scalar), ()) for name, scalar in SCALARS.items()} | {"bool": (np.dtype(bool), ())}
for _scalar, _shapes in SHAPES.items():
    TYPES |= {_scalar + s: (np.dtype(SCALARS[_scalar]), tuple(map(int, s.split("x")))) for s in _shapes}
TYPES |= {name: (np.dtype(fields), ()) for name, fields in RECORDS.items()}
OBJECTS = {
    "string": ["", "grün", "a\0b", "\udcff not UTF-8", "x" * 100, "end"],
    "GeoLocation": [GeoLocation(f"o{i}", "sFaceComp", i, (i, 0.5, -1.0)) for i in range(6)],
}
ALL_TYPES = [*TYPES, *OBJECTS]


def mesh() -> Mesh:
    return Mesh(SQUARES, QUADS)


def values_of(name: str, count: int = 6) -> np.ndarray:
    """Every bit pattern is possible, but for booleans."""
    if name in OBJECTS:
        values = np.empty(count, object)
        values[:] = (OBJECTS[name] * count)[:count]
        return values
    dtype, shape = TYPES[name]
    random = np.random.default_rng(ALL_TYPES.index(name))
    count_of_bytes = count * int(np.prod(shape, dtype=int)) * dtype.itemsize
    raw = random.integers(0, 2 if name == "bool" else 256, count_of_bytes, np.uint8)
    return raw.view(dtype).reshape(count, *shape)


def same(a: np.ndarray, b: np.ndarray) -> bool:
    """To the bit."""
    return a.dtype == b.dtype and a.shape == b.shape and (a.tolist() if a.dtype == object else a.tobytes()) == (
        b.tolist() if b.dtype == object else b.tobytes()
    )


def address(array: np.ndarray) -> int:
    return array.__array_interface__["data"][0]


def with_all_types() -> Mesh:
    result = mesh()
    result.ranges["material"] = "faces", [0, 5]
    result.components["lines"] = 6
    for name in ALL_TYPES:
        result.point_data[name] = values_of(name)
        result.ranges["material"].data[name + "_of_material"] = values_of(name)
        result.data("lines")[name + "_of_line"] = values_of(name)
    return result


def test_the_table_has_all_element_types():
    assert len(set(ALL_TYPES)) == 40


@pytest.mark.parametrize("name", ALL_TYPES)
def test_each_type_goes_both_ways(name):
    with_range = mesh()
    with_range.ranges["r"] = "corners", range(8)
    for m, data in ((m := mesh(), m.point_data), (with_range, with_range.ranges["r"].data)):
        data["w"] = values_of(name)
        assert data.info("w").type == name and data.info("w").length == 6
        assert same(data["w"], values_of(name))
        assert not data["w"].flags.writeable
        with pytest.raises(ValueError):
            data["w"].setflags(write=True)
            data["w"][0] = data["w"][1]
        data.info("w").default = values_of(name)[3]
        default = data.info("w").default
        expected = values_of(name)[3]
        assert default == expected if name in OBJECTS else default.tobytes() == expected.tobytes()
        # The default and the mode belong to the property, not to its values.
        data.info("w").interpolation = "none"
        data["w"] = values_of(name)[::-1]
        assert same(data["w"], np.ascontiguousarray(values_of(name)[::-1]))
        assert data.info("w").interpolation == "none"
        kept = data.info("w").default
        assert kept == expected if name in OBJECTS else kept.tobytes() == expected.tobytes()
        m.validate()


def test_construction():
    for faces in (QUADS, np.array(QUADS), np.array(QUADS, np.int8), np.array(QUADS, ">u8"), [tuple(q) for q in QUADS]):
        assert Mesh(SQUARES, faces) == mesh()
    flat = np.array(QUADS).ravel()
    assert Mesh(SQUARES.tolist(), flat, offsets=[0, 4, 8]) == mesh()
    assert Mesh(SQUARES[:, ::-1], flat, offsets=[0, 4, 8]).points.tolist() == SQUARES[:, ::-1].tolist()
    mixed = Mesh(SQUARES, [[0, 1, 4], [1, 2, 5, 4], (), np.array([0, 4, 3])])
    assert mixed.face_offsets.tolist() == [0, 3, 7, 7, 10]
    assert (mixed.point_count, mixed.face_count, mixed.corner_count) == (6, 4, 10)
    with pytest.raises(ValueError, match="0 to 4 corners; use `face_vertices` and `face_offsets`"):
        mixed.faces
    for empty in (Mesh(), Mesh([], []), Mesh(np.zeros((0, 3)), np.zeros((0, 3), int)), Mesh.__new__(Mesh)):
        assert empty == Mesh() and empty.faces.shape == (0, 3) and empty.points.shape == (0, 3)
    assert PointCloud(SQUARES).points.tolist() == SQUARES.tolist()
    strands = StrandSet([SQUARES[:2], SQUARES[2:], []])
    assert strands == StrandSet(SQUARES, offsets=[0, 2, 6, 6]) and strands.strand_count == 3
    assert strands.strand_offsets.dtype == u4 and strands.strand_offsets.tolist() == [0, 2, 6, 6]
    assert StrandSet([]) == StrandSet()


BAD = [
    (lambda: Mesh(SQUARES, [[0, 1, 6]]), InvalidGeometry, r"sFaceVertex\[2\] is 6, but the mesh has 6 points"),
    (lambda: Mesh(SQUARES, [[0, 1, 2], [0, -1, 2]]), InvalidGeometry, r"sFaceVertex\[4\] is -1, but the mesh has 6"),
    (lambda: Mesh(SQUARES, [[0, 1, 2**70]]), InvalidGeometry, rf"sFaceVertex\[2\] is {2**70}, but"),
    (lambda: Mesh(SQUARES, [[0, 1], [0, 1, 2**40]]), InvalidGeometry, rf"sFaceVertex\[4\] is {2**40}, but"),
    (lambda: Mesh(SQUARES, [0, 1, 2], offsets=[0, 2]), InvalidGeometry, r"sFaceOffset\[1\] is 2, but the mesh has 3"),
    (lambda: Mesh(SQUARES, [0, 1, 2], offsets=[0, 3, 2, 3]), InvalidGeometry, r"sFaceOffset\[2\] is 2, less than"),
    (lambda: Mesh(SQUARES, [0, 1, 2], offsets=[0, -3]), InvalidGeometry, r"sFaceOffset\[1\] is -3"),
    (lambda: StrandSet(SQUARES, offsets=[0, 7]), InvalidGeometry, r"sStrandOffset\[1\] is 7, but the strand set has 6"),
    (lambda: Mesh(SQUARES, [0, 1, 2]), ValueError, "faces is int64 of shape .3,.; the shape must be"),
    (lambda: Mesh(SQUARES, [[0, 1, 2.5]]), TypeError, "does not hold integers"),
    (lambda: Mesh(SQUARES, [[0, 1], [0, 1, 2.5]]), TypeError, "face 1 has a corner that is not an integer"),
    (lambda: Mesh(SQUARES, "faces"), (TypeError, ValueError), "faces"),
    (lambda: Mesh(SQUARES, 5), ValueError, r"faces is int64 of shape \(\)"),
    (lambda: Mesh(SQUARES.T, QUADS), ValueError, r"points is float32 of shape \(3, 6\)"),
    (lambda: Mesh(np.float32(1), QUADS), ValueError, r"points is float32 of shape \(\)"),
    (lambda: Mesh(SQUARES.astype(str), QUADS), TypeError, "coordinates are numbers"),
    (lambda: PointCloud(np.broadcast_to(f4(0), (2**32, 3))), ValueError, "4294967296 points are more"),
    (lambda: Mesh(SQUARES, np.broadcast_to(u4(0), (2**40, 0))), ValueError, "are more than an object can hold"),
    (lambda: StrandSet(SQUARES), TypeError, "`offsets=` is missing"),
    (lambda: StrandSet([SQUARES, [1, 2]]), ValueError, "strand 1 is int64"),
    (lambda: modeling.Geometry(), TypeError, "abstract"),
]


@pytest.mark.parametrize("make, error, text", BAD)
def test_bad_input_is_named(make, error, text):
    with pytest.raises(error, match=text):
        make()


def test_narrowing_warns_if_it_moves_points():
    with warnings.catch_warnings():
        warnings.simplefilter("error")
        assert PointCloud(SQUARES.astype(float) + 0.1).points.dtype == f4
        PointCloud([[0.1, 0.2, 0.3]])
        PointCloud([[np.nan, np.inf, 0.1], [0.1, 2, 3]])
    with pytest.warns(modeling.PrecisionWarning, match="moves point 5 by 0.0999"):
        far = PointCloud(np.array([[1e7, 0, 0]] * 5 + [[1e7 + 1.1, 0, 0]]))
    assert far.points[5, 0] == f4(1e7 + 1)
    with pytest.warns(modeling.PrecisionWarning, match="by inf"):
        PointCloud([[1e300, 0, 0], [0, 0, 0.0]])
    m = mesh()
    with warnings.catch_warnings():
        warnings.simplefilter("error")
        with pytest.raises(modeling.PrecisionWarning):
            m.points = SQUARES.astype(float) + (1e9 + 0.3)
    assert m == mesh(), "nothing changes if the warning is an error"


def test_views_share_memory_and_keep_their_values():
    m = mesh()
    m.point_data["w"] = np.arange(6.0)
    for get in (lambda: m.points, lambda: m.face_vertices, lambda: m.face_offsets, lambda: m.point_data["w"]):
        assert address(get()) == address(get())
        assert not get().flags.writeable and not get().flags.owndata
        with pytest.raises(ValueError):
            get().setflags(write=True)
    assert address(m.faces) == address(m.face_vertices) and m.faces.tolist() == QUADS
    points, w = m.points, m.point_data["w"]
    m.points = SQUARES + 1
    m.point_data["w"] = np.zeros(6)
    assert points.tolist() == SQUARES.tolist() and w.tolist() == [0, 1, 2, 3, 4, 5]
    del m
    gc.collect()
    assert points.sum() == SQUARES.sum()


def test_memory_that_nobody_can_write_is_shared():
    a = np.arange(18, dtype=f4).reshape(6, 3)
    at = address(a)
    m = Mesh(adopt(a), adopt(np.array(QUADS, u4)))
    assert address(m.points) == at and not a.flags.writeable
    with pytest.raises(ValueError):
        a.resize((100, 3), refcheck=False)
    # Views go on to other geometry, also in part and as another type.
    other = PointCloud(m.points)
    assert address(other.points) == at
    other = PointCloud(m.points[2:])
    other.point_data["x"] = m.points[:, 0].copy()[2:]
    other.point_data["y"] = m.points.reshape(-1)[6:10]
    assert address(other.points) == at + 24 and address(other.point_data["y"]) == at + 24
    frozen = np.frombuffer(np.arange(6.0).tobytes())
    m.point_data["w"] = frozen
    assert address(m.point_data["w"]) == address(frozen)
    # The memory lives as long as someone uses it.
    watched = weakref.ref(a)
    del a, m
    assert other.points.tolist() == np.arange(6, 18).reshape(4, 3).tolist() and watched() is not None
    del other
    gc.collect()
    assert watched() is None


def test_memory_that_others_can_write_is_copied():
    writable = np.arange(6.0)
    base = np.arange(12.0)
    kept_read_only = np.arange(6.0)
    kept_read_only.setflags(write=False)  # its owner can undo that
    view_of_writable = base[:6]
    view_of_writable.setflags(write=False)
    buffer = bytearray(np.arange(6.0).tobytes())
    not_boolean = np.full(6, 2, np.uint8)
    m = mesh()
    for given in (writable, kept_read_only, view_of_writable):
        m.point_data["w"] = given
        assert address(m.point_data["w"]) != address(given)
    for given in (base[:6], view_of_writable, np.frombuffer(buffer), base[::2], writable.astype(">f8")):
        adopted = adopt(given)
        assert not np.shares_memory(adopted, given) and not adopted.flags.writeable
        m.point_data["w"] = adopted
        assert address(m.point_data["w"]) == address(adopted), "copied once only"
        assert m.point_data["w"].tolist() == given.tolist()
    assert base.flags.writeable
    m.point_data["w"] = adopt(base[:6], check=False)  # the caller knows that nobody writes it
    assert address(m.point_data["w"]) == address(base)
    m.point_data["w"] = adopt(base[::2], check=False)
    assert not np.shares_memory(m.point_data["w"], base)
    m.point_data["b"] = adopt(not_boolean.view(bool))
    assert m.point_data["b"].view(np.uint8).tolist() == [1] * 6, "a boolean has one bit"
    for wrong in ([1, 2], np.array(["a"], object), np.zeros(3, complex), np.ma.masked_array([1.0], [True])):
        with pytest.raises(TypeError):
            adopt(wrong)


def test_names_are_those_of_files():
    m = mesh()
    m.point_data["color"] = np.zeros((6, 3), f4)
    m.face_data["color"] = np.zeros((2, 3), np.uint8)
    m.corner_data["sPointPosition"] = np.arange(8)
    assert [list(d) for d in (m.point_data, m.face_data, m.corner_data)] == [["color"], ["color"], ["sPointPosition"]]
    assert m.face_data.info("color").key == "face:color" and m.corner_data.info("sPointPosition").key.startswith("corner:")
    m.face_data["color"] = np.ones((2, 3), np.uint8)
    assert m.face_data["color"].tolist() == [[1, 1, 1]] * 2 and m.point_data["color"].sum() == 0
    del m.point_data["color"]  # the prefix has no reason any more
    assert list(m.face_data) == ["color"] and m.face_data.info("color").key == "color"
    m.face_data["\udcff"] = [1, 2]
    assert list(m.face_data) == ["color", "\udcff"] and "? (long)" in repr(m)
    assert "color" in m._repr_html_() and m._repr_html_().isascii() or m._repr_html_().encode()
    m.point_data["point:a"] = m.point_data["a"] = np.arange(6)
    assert list(m.point_data) == ["point:a", "a"]


def test_mappings_behave_as_mappings():
    m = mesh()
    data = m.point_data
    data.update(a=np.arange(6), b=np.arange(6.0))
    assert list(data) == ["a", "b"] and len(data) == 2 and "a" in data and "c" not in data and 5 not in data
    assert data.get("c") is None and data.pop("a").tolist() == list(range(6)) and list(data) == ["b"]
    for key in ("a", 5, None):
        with pytest.raises(KeyError):
            data[key]
        with pytest.raises(KeyError):
            del data[key]
    with pytest.raises(KeyError, match='no property .*"a.* of points; there are these: b'):
        data["a"]
    with pytest.raises(KeyError, match="no component or range"):
        m.data("strands")["a"] = np.arange(6)
    data.clear()
    assert not data and "no properties" in repr(data)


@pytest.mark.parametrize(
    "values, error, text",
    [
        (np.arange(5), ValueError, 'property "w" of points has 5 values for 6 elements'),
        (0.0, ValueError, "is a single value; numpy.full"),
        (np.zeros((6, 5)), ValueError, r"float64 of shape \(6, 5\), but such values have one of the shapes \(n,\), \(n, 2\)"),
        (np.zeros(6, complex), TypeError, "complex128 of shape .* no element type"),
        (np.zeros(6, "datetime64[s]"), TypeError, "no element type"),
        (np.zeros(6, [("face", "u4")]), TypeError, "no element type"),
        (["a", "b", 5, "d", "e", "f"], TypeError, 'property "w" of points: element 2: a text is expected, not int'),
        ([[1], [1, 2]] * 3, ValueError, "cannot be made an array"),
        ([None] * 6, TypeError, "element 0"),
        ([GeoLocation("a", "b", -1, (0, 0, 0))] * 6, TypeError, "element 0"),
        (["a\ud800"] * 6, ValueError, "element 0: .*surrogates not allowed"),
        (np.ma.masked_array(np.arange(6), [True] * 6), TypeError, "masked"),
    ],
)
def test_bad_values_change_nothing(values, error, text):
    m = mesh()
    m.point_data["w"] = np.arange(6)
    before = m.copy()
    if isinstance(values, list) and isinstance(values[0], str) and values[1:2] == ["b"]:
        values = np.array(values, object)
    with pytest.raises(error, match=text):
        m.point_data["w"] = values
    assert m == before


def test_info_checks_what_is_assigned():
    m = mesh()
    m.point_data["w"] = np.arange(6, dtype=np.int16)
    info = m.point_data.info("w")
    assert (info.type, info.default, info.interpolation, info.depends_on) == ("short", 0, "linear", [])
    for value, error in ((70000, ValueError), (1.5, ValueError), ("x", TypeError), ([1, 2], TypeError)):
        with pytest.raises(error):
            info.default = value
    with pytest.raises(ValueError):
        info.interpolation = "cubic"
    with pytest.raises(ValueError, match="6 values for 2 elements"):
        info.target = "faces"
    with pytest.raises(KeyError):
        info.target = "nothing"
    m.ranges["r"] = "faces", [0, 1]
    info.default = 7
    info.target = "r"
    assert list(m.point_data) == [] and list(m.ranges["r"].data) == ["w"] and info.default == 7
    with pytest.raises(KeyError):
        m.point_data.info("w")


def test_ranges_and_components():
    m = mesh()
    m.ranges["material"] = "faces", [1, 0]
    m.ranges["material"].data["name"] = ["steel", "wood"]
    material = m.ranges["material"]
    assert material.target == "faces" and material.indices.dtype == u4
    assert material.data["name"][material.indices].tolist() == ["wood", "steel"]
    material.indices = np.array([0, 2**32 - 1])
    assert m.anomalies() == [] or "material" in m.anomalies()[0]
    m.ranges["of_range"] = "material", [0, 1]
    for bad in ([0], [0, -1], [0, 2**32], [[0, 1]], [0.5, 1]):
        with pytest.raises((ValueError, TypeError), match="material"):
            material.indices = bad
    with pytest.raises(ValueError, match="leads to no component"):
        m.ranges["material"] = "of_range", [0, 1]  # a cycle
    with pytest.raises(ValueError, match="has data"):
        del m.ranges["material"]
    assert dict(m.components) == {"points": 6, "corners": 8, "faces": 2}
    m.components["holes"] = 3
    m.data("holes")["size"] = np.arange(3.0)
    for bad in (lambda: m.components.__setitem__("points", 5), lambda: m.components.__delitem__("holes"),
                lambda: m.components.__setitem__("holes", -1), lambda: m.components.__setitem__("holes", 2**32 - 2),
                lambda: m.components.__setitem__("material", 2)):  # fmt: skip
        with pytest.raises(ValueError):
            bad()
    del m.data("holes")["size"], m.components["holes"], m.ranges["of_range"]
    assert list(m.ranges) == ["material"]
    with pytest.raises(ValueError):
        PointCloud(SQUARES).components["lines"] = 3


def test_geometry_is_a_value():
    m = with_all_types()
    for copied in (m.copy(), copy.copy(m), copy.deepcopy(m), pickle.loads(pickle.dumps(m))):
        assert copied == m and type(copied) is Mesh
        copied.point_data["float"] = np.zeros(6, f4)
        assert copied != m and same(m.point_data["float"], values_of("float"))
        copied.point_data["float"] = values_of("float")
        assert copied == m
        copied.point_data.info("string").default = "x"
        assert copied != m
    assert address(m.copy().points) == address(m.points)
    assert m != 5 and Mesh() != PointCloud() and m.points is not m
    with pytest.raises(TypeError):
        hash(m)
    a, b = PointCloud([[0.0, 0, 0]]), PointCloud([[-0.0, 0, 0]])
    assert a != b, "to the bit"
    nan = PointCloud([[np.nan, 0, 0]])
    assert nan == nan.copy() and nan == PointCloud(nan.points.copy())


def test_repr_tells_counts_and_properties():
    m = mesh()
    m.face_data["<b>"] = np.arange(2.0)
    assert repr(m) == "<modeling.Mesh: 6 points, 8 corners, 2 faces; faces: <b> (double)>"
    assert "&lt;b&gt; (double)" in m._repr_html_() and "<b>" not in m._repr_html_()
    assert repr(StrandSet()) == "<modeling.StrandSet: 0 points, 0 strands>"
    m.face_data["\udcff"] = np.arange(2.0)
    assert "? (double)" in repr(m).encode().decode(), "it can be printed"


@pytest.mark.parametrize("protocol", range(2, pickle.HIGHEST_PROTOCOL + 1))
def test_pickles_hold_everything(protocol):
    m = with_all_types()
    m.corner_data["shared"] = m.face_vertices
    restored = pickle.loads(pickle.dumps(m, protocol))
    assert restored == m and list(restored.point_data) == ALL_TYPES
    assert address(restored.corner_data["shared"]) == address(restored.face_vertices), "it is shared again"
    restored.validate()
    for geometry in (PointCloud(SQUARES), StrandSet([SQUARES]), Mesh()):
        assert pickle.loads(pickle.dumps(geometry, protocol)) == geometry


class Slotted(Mesh):
    __slots__ = ("tags", "unset")


class Made(PointCloud):
    def __new__(cls, name):
        made = super().__new__(cls)
        made.name = [name]
        return made

    def __init__(self, name):
        super().__init__(SQUARES)


def test_copies_of_derived_classes_keep_what_they_add():
    slotted = Slotted(SQUARES, QUADS)
    slotted.tags = [1]
    made = Made("made")
    made.itself = made
    for ours, field in ((slotted, "tags"), (made, "name")):
        shallow, deep, restored = copy.copy(ours), copy.deepcopy(ours), pickle.loads(pickle.dumps(ours))
        for copied in (shallow, deep, restored, ours.copy()):
            assert type(copied) is type(ours) and copied == ours and getattr(copied, field) == getattr(ours, field)
            assert not hasattr(copied, "unset")
        assert getattr(shallow, field) is getattr(ours, field) and getattr(deep, field) is not getattr(ours, field)
        if ours is made:
            assert shallow.itself is made and deep.itself is deep and restored.itself is restored


def test_buffers_that_others_write_do_not_change_what_was_pickled(tmp_path):
    m = mesh()
    received = []
    data = pickle.dumps(m, 5, buffer_callback=received.append)
    arrays = [np.frombuffer(buffer, np.uint8).copy() for buffer in received]
    for number, array in enumerate(arrays):
        array.tofile(tmp_path / str(number))
    files = [np.memmap(tmp_path / str(number), np.uint8, "r") for number in range(len(arrays))]
    read_only = [memoryview(array).toreadonly() for array in arrays]
    read_only_arrays = [array.view() for array in arrays]
    for array in read_only_arrays:
        array.setflags(write=False)
    restored = [pickle.loads(data, buffers=buffers) for buffers in (files, read_only, read_only_arrays)]
    given = PointCloud(np.memmap(tmp_path / "0", np.float32, "r", shape=(len(arrays[0]) // 12, 3)))
    before = given.copy().points.tobytes()
    for number, array in enumerate(arrays):
        array[:] = 1
        array.tofile(tmp_path / str(number))
    assert all(r == m for r in restored)
    assert given.points.tobytes() == before


def test_exceptions_of_elements_say_where_and_why():
    m = mesh()

    with pytest.raises(TypeError, match="element 1: a text is expected") as raised:
        m.face_data["names"] = np.array(["a", 3], object)
    assert isinstance(raised.value.__cause__, TypeError)
    with pytest.raises(ValueError, match="element 0: .*surrogates") as raised:
        m.face_data["names"] = np.array(["\ud800", "b"], object)
    assert isinstance(raised.value.__cause__, UnicodeEncodeError)


def test_pickle_buffers_are_not_copied():
    m = with_all_types()
    buffers = []
    data = pickle.dumps(m, 5, buffer_callback=buffers.append)
    addresses = {address(np.frombuffer(b, np.uint8)) for b in buffers}
    assert {address(m.points), address(m.point_data["float4x4"]), address(m.face_offsets)} <= addresses
    assert address(pickle.loads(data, buffers=buffers).points) == address(m.points)
    received = [bytes(b) for b in buffers]
    restored = pickle.loads(data, buffers=received)
    assert address(restored.points) in {address(np.frombuffer(b, np.uint8)) for b in received}
    odd = [memoryview(b" " + b)[1:] for b in received]  # not aligned: copied
    assert restored == m and pickle.loads(data, buffers=odd) == m
    wrong = [b"\2" * len(b) for b in received]
    with pytest.raises(ValueError, match="boolean"):
        pickle.loads(data, buffers=wrong)


def test_broken_pickles_are_refused():
    restore = modeling.data._restore
    function, (cls, state), _ = mesh().__reduce_ex__(4)
    assert function is restore and restore(cls, state) == mesh()
    for broken in ((), ("object",), ("object", 5), ("nothing",), ("object", ((b"k", ("array", "float9", b"")),)), 5,
                   ("value", "float", b"12345"), ("strings", b"", b"12345678"), state[:1] + (state[1][:2],),
                   ("object", ((b"k", ("locations", [(b"", b"", -1, b"")])),)), ("array", "float", "text")):  # fmt: skip
        with pytest.raises((ValueError, TypeError, IndexError)):
            restore(cls, broken)
    for wrong in (PointCloud, modeling.Geometry, int, 5):
        with pytest.raises((ValueError, TypeError)):
            restore(wrong, state)


def test_classes_can_be_derived():
    class Named(Mesh):
        def __init__(self, name):
            self.name = name  # without super().__init__(): an empty mesh

    named = Named("a")
    assert named == Mesh() and named.points.shape == (0, 3)
    copied = copy.deepcopy(named)
    assert type(copied) is Named and copied.name == "a"
    with pytest.raises(TypeError):
        type("Both", (Mesh, PointCloud), {})()
