"""The operations of the library.

Objects are values: an operation never changes its arguments. It returns a new object, which shares all arrays that did not
change. Operations run without the interpreter lock and use all processors (see `threads`); their results do not depend on
the number of threads. An operation that cannot handle an object raises `Refusal`, and `InvalidGeometry` if the object is
invalid; it does nothing by halves.
"""

from __future__ import annotations

import dataclasses
from collections.abc import Iterable
from typing import TYPE_CHECKING, Any, TypeVar

import numpy as np

from . import _modeling
from ._modeling import Mesh, PointCloud, StrandSet
from .files import Geometry
from .guides import Guide

if TYPE_CHECKING:
    from numpy.typing import ArrayLike, NDArray

AnyGeometry = TypeVar("AnyGeometry", Mesh, PointCloud, StrandSet)

_COMPONENTS = {"points": "sPointComp", "faces": "sFaceComp", "corners": "sFaceVertexComp", "strands": "sStrandComp"}


def _numbers(values: ArrayLike, name: str) -> NDArray[np.float32]:
    array = np.asarray(values)
    if array.dtype == np.float32:
        return array
    if array.dtype.kind not in "fiu" and array.size != 0:
        raise TypeError(f"{name} has to hold real numbers, not {array.dtype}")
    with np.errstate(over="ignore"):  # becomes infinite, which operations check
        return array.astype(np.float32)


def _points(values: ArrayLike, name: str) -> NDArray[np.float32]:
    points = _numbers(values, name)
    if points.size == 0:
        return np.empty((0, 3), np.float32)
    if points.ndim != 2 or points.shape[1] != 3:
        raise ValueError(f"{name} has to have the shape (n, 3), not {points.shape}")
    return points


def _selected(elements: ArrayLike, name: str) -> NDArray[np.bool_] | NDArray[np.int64]:
    """A mask of elements, or their indices."""
    array = np.asarray(elements)
    if array.ndim != 1:
        raise ValueError(f"{name} has to have one dimension, not {array.ndim}")
    if array.dtype == np.bool_ or array.dtype == np.int64:
        return array
    if array.size == 0:
        return np.empty(0, np.int64)
    if array.dtype.kind not in "iu":
        raise TypeError(f"{name} has to hold indices or be a mask, but its type is {array.dtype}")
    return array.astype(np.int64)  # indices beyond it become negative


def _text(value: str, name: str) -> str:
    if not isinstance(value, str):
        raise TypeError(f"{name} has to be a str, not {type(value).__name__}")
    if "\0" in value:
        raise ValueError(f"{name} contains a null character")
    return value


def _positive(value: Any, name: str) -> None:
    if not value > 0:
        raise ValueError(f"{name} has to be above 0, not {value}")


# -- Points, faces and other elements


def add_points_to_point_cloud(cloud: PointCloud, positions: ArrayLike, *, tag: str = "") -> PointCloud:
    """Append points to a point cloud.

    positions
        Shape (n, 3), float32, in scene units. May be empty.
    tag
        The name of a new attribute of points, which is true for the new ones. It replaces one of that name.

    In all other attributes, the new points get the default of the attribute, or zero.

    >>> cloud = read(samples / "spider.xyz")                                   # doctest: +SKIP
    >>> add_points_to_point_cloud(cloud, [[0, 0, 1], [0, 0, 2]], tag="new")    # doctest: +SKIP
    """
    return _modeling.add_points_to_point_cloud(cloud, _points(positions, "positions"), _text(tag, "tag"))


def delete_points_in_point_cloud(cloud: PointCloud, points: ArrayLike) -> PointCloud:
    """Delete points of a point cloud, with their values in all attributes. The others keep their order.

    points
        Indices (integers in any order, from 0), or a mask with one boolean per point.
    """
    return _modeling.delete_points_in_point_cloud(cloud, _selected(points, "points"))


def delete_faces(mesh: Mesh, faces: ArrayLike) -> Mesh:
    """Delete faces of a mesh, with their corners and every point that no remaining face uses.

    The other elements keep their order and attributes. Points that no face used before are deleted too.

    faces
        Indices (integers in any order, from 0), or a mask with one boolean per face.

    >>> cylinder = read(samples / "cylinder.obj")
    >>> topology(delete_faces(cylinder, [0])).open_edges
    3
    """
    return _modeling.delete_faces(mesh, _selected(faces, "faces"))


def delete_components(object: AnyGeometry, component: str, elements: ArrayLike) -> AnyGeometry:
    """Delete elements of one component, with their values in all attributes.

    component
        "points", "faces", "corners", "strands", or the name of a component of your own.
    elements
        Indices (integers in any order, from 0), or a mask with one boolean per element.

    Refuses a deletion after which other elements refer to missing ones, such as that of points of a mesh: `delete_faces`
    also renumbers.
    """
    name = _COMPONENTS.get(_text(component, "component"), component)
    return _modeling.delete_components(object, name, _selected(elements, "elements"))


def compute_deleted_component_mapping(deleted: ArrayLike) -> NDArray[np.uint32]:
    """The new index of each element after some are deleted: shape (n,), uint32.

    deleted
        A mask with one boolean per element. Deleted elements get 4294967294.

    >>> compute_deleted_component_mapping([False, True, False])
    array([         0, 4294967294,          1], dtype=uint32)
    """
    array = np.asarray(deleted)
    if array.dtype != np.bool_ or array.ndim != 1:
        raise TypeError("deleted has to be a mask: booleans in one dimension")
    return _modeling.compute_deleted_component_mapping(array)


def copy_non_geo_properties(object: AnyGeometry, inputs: Iterable[Geometry]) -> AnyGeometry:
    """Copy what other objects hold besides geometry, such as numbers and texts, each from the first that has it.

    Keys that the object already has are kept.
    """
    return _modeling.copy_non_geo_properties(object, tuple(inputs))


# -- Merging


def merge(objects: Iterable[AnyGeometry]) -> AnyGeometry:
    """Join meshes, point clouds or strand sets into one, with all attributes.

    All objects have to be of the same kind; those without points may be of any. Points, faces and strands come in the order
    of the objects. The type of each attribute is that of the first object that has it. Elements of objects without it, or
    with another type, get its default.

    >>> cylinder = read(samples / "cylinder.obj")
    >>> topology(merge([cylinder, cylinder])).parts
    2
    """
    return _modeling.merge(tuple(objects))


def merge_meshes(meshes: Iterable[Mesh]) -> Mesh:
    """Join meshes into one, as `merge` does."""
    return _modeling.merge_meshes(tuple(meshes))


def merge_point_clouds(clouds: Iterable[PointCloud]) -> PointCloud:
    """Join point clouds into one, as `merge` does."""
    return _modeling.merge_point_clouds(tuple(clouds))


def merge_strands(strands: Iterable[StrandSet]) -> StrandSet:
    """Join strand sets into one, as `merge` does."""
    return _modeling.merge_strands(tuple(strands))


# -- Surfaces


def triangulate(mesh: Mesh, *, channels: str = "*", keep_units: bool = True) -> Mesh:
    """Cut every face with n corners into n - 2 triangles between its own corners. Faces may be concave.

    No point is added, moved or removed. Triangles come in the order of the faces, and get their attributes.

    channels
        Which attributes of faces and corners to keep: names and patterns, separated by blanks or commas, with `*` for any
        characters and `?` for one; a leading `^` excludes, and the last match decides.
    keep_units
        Faces below 5e-5 square units are cut into a fan whatever their shape. With False, the mesh counts as about a million
        units long, so that only faces without area are; `modeling triangulate` does that.

    >>> cube = read(samples / "cube.ply")
    >>> topology(triangulate(cube)).triangles
    12
    """
    return _modeling.triangulate(mesh, _text(channels, "channels"), keep_units)


def subdivide(mesh: Mesh, tolerance: float | None = None, *, relative: float | None = None, check: bool = True) -> Mesh:
    """Refine a closed triangle mesh until every face fits into a box of twice the tolerance (adaptive √3-subdivision).

    Meant for coarse meshes of smooth shapes: every edge and corner is rounded. Points keep their indices, and new ones follow.
    Attributes of points with floating-point values are interpolated; all others are dropped, with a `GeometryWarning`.

    tolerance
        Half the size of the largest face to keep, in scene units.
    relative
        The same, as a fraction of the diagonal of the bounding box. One of the two is required.
    check
        Refuse a mesh that is not closed, manifold and consistently oriented, or has points without a face. This costs about
        100 ns per face, once per mesh. With False, only a mesh with a boundary is refused, and other faults make a
        result of little use.

    Dividing the tolerance by 3 makes nine times as many faces. Ctrl-C stops it within a pass, and `MemoryError` is raised
    before memory runs out.

    >>> cylinder = read(samples / "cylinder.obj")
    >>> topology(subdivide(cylinder, relative=0.1)).closed_manifold
    True
    """
    if relative is not None or tolerance is None or not tolerance > 0:
        _require_size(tolerance, relative)
    return _modeling.subdivide(mesh, tolerance, relative, None, check)


def subdivide_by_volume(
    mesh: Mesh, guide: Guide, tolerance: float | None = None, *, relative: float | None = None, check: bool = True
) -> Mesh:
    """Refine a mesh as `subdivide` does, with the tolerance of each face multiplied by the value of a volume there.

    guide
        The volume. Faces whose second corner is at a value that is not above 0 are not refined.
    tolerance, relative, check
        As for `subdivide`; for a value of 1.
    """
    if not isinstance(guide, Guide):
        raise TypeError(f"guide has to be a Guide, not {type(guide).__name__}")
    _require_size(tolerance, relative)
    return _modeling.subdivide(mesh, tolerance, relative, guide._guide, check)


def _require_size(tolerance: float | None, relative: float | None) -> None:
    if (tolerance is None) == (relative is None):
        raise TypeError("either tolerance or relative is required")
    _positive(relative if tolerance is None else tolerance, "tolerance" if relative is None else "relative")


def large_faces(mesh: Mesh, tolerance: float) -> NDArray[np.bool_]:
    """Which faces of a triangle mesh `subdivide` would split at this tolerance: shape (faces,), bool."""
    return _modeling.large_faces(mesh, tolerance)


def smooth(
    mesh: Mesh,
    amount: float = 1,
    *,
    weights: ArrayLike | None = None,
    pin_boundary: bool = False,
    pin_sharp: float | None = None,
) -> Mesh:
    """Even out edge lengths and noise on a rounded surface (tangential Laplacian smoothing).

    Each point moves toward the mean of the centroids of its faces, within its tangent plane. Faces may have any number of
    corners. Normals no longer fit and are dropped, with a `GeometryWarning`.

    amount
        Dimensionless, 0 to 1000; divided into steps of at most 0.9. 1 removes most noise, 10 converges.
    weights
        Shape (points,), float32: a factor for the moves of each point, clamped to [0, 1]. 0 pins the point.
    pin_boundary
        Pin points at boundary edges; otherwise an open mesh shrinks.
    pin_sharp
        Pin points at edges whose faces have normals that differ by more than this many degrees.

    >>> smooth(read(samples / "bunny.obj"), 2, pin_boundary=True)    # doctest: +ELLIPSIS
    <...Mesh...>
    """
    if not 0 <= amount <= 1000:
        raise ValueError(f"amount has to be 0 to 1000, not {amount}")
    factors = None if weights is None else _numbers(weights, "weights")
    if factors is not None and factors.ndim != 1:
        raise ValueError(f"weights has to have one dimension, not {factors.ndim}")
    if pin_sharp is not None and not 0 <= pin_sharp <= 180:
        raise ValueError(f"pin_sharp has to be 0 to 180 degrees, not {pin_sharp}")
    return _modeling.smooth(mesh, amount, factors, pin_boundary, pin_sharp)


def remove_slivers(mesh: Mesh, ratio: float = 0.05, *, check: bool = True) -> Mesh:
    """Collapse the needles of a closed triangle mesh: faces whose shortest edge is shorter than `ratio` times the longest.

    Collapses that would change the topology or flip a face are skipped. Points and faces are renumbered, and attributes are
    dropped with a `GeometryWarning`, unless nothing collapses.

    ratio
        A fraction of the longest edge, 0 to 1.
    check
        Refuse a mesh that is not closed, manifold and consistently oriented. With False, nothing collapses at such places,
        and a mesh with other faces than triangles is left as it is.
    """
    if not 0 <= ratio <= 1:
        raise ValueError(f"ratio has to be 0 to 1, not {ratio}")
    return _modeling.remove_slivers(mesh, ratio, check)


# -- Facts


def validate(object: Geometry) -> list[str]:
    """What is wrong with an object: one sentence each. An empty list if there is nothing.

    The first sentence is about the geometry if that is invalid: lengths that do not match the counts, decreasing offsets,
    indices out of range. Others are about attributes with anomalies, which operations accept.

    >>> validate(read(samples / "bunny.obj"))
    []
    """
    invalid, suspicious = _modeling.validate(object)
    return [invalid, *suspicious] if invalid else suspicious


@dataclasses.dataclass(frozen=True)
class Topology:
    """How the faces of a mesh are connected, and its shape. Counts unless another unit is given."""

    triangles: int
    quads: int
    polygons: int  #: faces with more than four corners
    faces_below_three_corners: int
    faces_with_repeated_points: int
    edges: int
    parts: int  #: connected components
    open_edges: int  #: boundary edges, with one face
    non_manifold_edges: int  #: edges with more than two faces
    winding_conflicts: int  #: edges that two faces traverse in the same direction
    pinched_points: int  #: non-manifold vertices: their faces are not all connected by edges there
    isolated_points: int  #: points without a face
    coincident_points: int  #: points at exactly the position of an earlier one
    closed_manifold: bool
    genus: int | None  #: of closed manifolds, summed over the parts
    slivers: tuple[int, int, int]  #: faces whose shortest edge is below 0.1, 0.05, 0.01 times the longest
    volume: float | None  #: enclosed by a closed mesh, in cubic scene units; negative if normals point inward
    area: float  #: in square scene units
    fold_overs: int  #: edges whose faces have normals that differ by more than 150 degrees
    diagonal: float  #: of the bounding box, in scene units


def topology(mesh: Mesh) -> Topology:
    """How the faces of a mesh are connected, and its shape: the facts of `modeling info`.

    >>> facts = topology(read(samples / "cylinder.obj"))
    >>> facts.closed_manifold, facts.genus, facts.edges
    (True, 0, 384)
    """
    return Topology(**_modeling.topology(mesh))
