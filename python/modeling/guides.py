"""Volumes that control how fine `subdivide_by_volume` makes a mesh, and patterns of strands."""

from __future__ import annotations

import math
from collections.abc import Sequence
from typing import TYPE_CHECKING

import numpy as np

from . import _modeling
from ._modeling import Mesh, StrandSet
from .errors import FileError
from .files import Path, Point, _encoded, _point, _raise_specific, _require_new

if TYPE_CHECKING:
    from numpy.typing import ArrayLike, NDArray


def _floats(values: ArrayLike, dimensions: int, name: str) -> NDArray[np.float32]:
    array = np.asarray(values)
    if array.dtype.kind not in "fiu":
        raise TypeError(f"{name} has to hold real numbers, not {array.dtype}")
    if array.ndim != dimensions:
        raise ValueError(f"{name} has to have {dimensions} dimensions, not {array.ndim}")
    with np.errstate(over="ignore"):
        return np.ascontiguousarray(array, np.float32)


def _tile_side(side: int) -> int:
    if side not in (4, 5):
        raise ValueError(f"tile_side has to be 4 or 5, not {side}")
    return side


def _size(size: float, name: str = "voxel_size") -> float:
    if not 1e-30 <= size <= 1e30:
        raise ValueError(f"{name} has to be between 1e-30 and 1e30, not {size}")
    return size


class Guide:
    """A sparse volume of floats that scales the tolerance of `subdivide_by_volume`. It does not change.

    Make one with `Guide.read`, `Guide.from_array`, `Guide.from_values` or `Guide.from_distance`.
    """

    __slots__ = ("_guide",)
    _guide: _modeling.Guide

    def __init__(self) -> None:
        raise TypeError("a Guide is made by Guide.read, Guide.from_array, Guide.from_values or Guide.from_distance")

    @classmethod
    def _of(cls, guide: _modeling.Guide) -> Guide:
        made = object.__new__(cls)
        made._guide = guide
        return made

    @classmethod
    def read(cls, file: Path, grid: str = "", *, min_value: float | None = None, tile_side: int = 4) -> Guide:
        """Read a float grid of an OpenVDB file.

        grid
            Its name; optional if there is only one float grid.
        min_value
            Replaces smaller values: it keeps the tolerance away from 0.
        tile_side
            Voxels per side of a tile in memory, 4 or 5.
        """
        name = _encoded(file)
        try:
            return cls._of(_modeling.Guide.read(name, grid, min_value, _tile_side(tile_side)))
        except FileError as error:
            _raise_specific(error, name, writes=False)
            raise

    @classmethod
    def from_array(
        cls,
        values: ArrayLike,
        voxel_size: float,
        origin: Sequence[float] = (0, 0, 0),
        *,
        background: float = 1,
        min_value: float | None = None,
        tile_side: int = 4,
    ) -> Guide:
        """Make a volume of a dense array.

        values
            Shape (nx, ny, nz), float32: `values[i, j, k]` is at `origin + voxel_size * (i, j, k)`.
        voxel_size, origin
            In scene units.
        background
            The value everywhere else.

        >>> guide = Guide.from_array([[[1, 3]]], voxel_size=0.5, background=2)
        >>> guide.sample([[0, 0, 0], [0, 0, 0.25], [9, 9, 9]])
        array([1., 2., 2.], dtype=float32)
        """
        array = _floats(values, 3, "values")
        place = _point(origin, "origin")
        if not all(map(math.isfinite, place)):
            raise ValueError("origin has to be finite")
        return cls._of(
            _modeling.Guide.from_array(array, _size(voxel_size), place, background, min_value, _tile_side(tile_side))
        )

    @classmethod
    def from_values(
        cls,
        mesh: Mesh,
        values: ArrayLike,
        *,
        voxel_size: float | None = None,
        voxels: int = 100,
        band: float = 3,
        map_to: tuple[float, float] | None = None,
        background: float = 1,
        min_value: float | None = None,
        tile_side: int = 4,
    ) -> Guide:
        """Make a volume in a band around a mesh, from a number per point, interpolated over faces.

        values
            Shape (points,), float32.
        voxel_size
            In scene units.
        voxels
            Instead of a size: how many voxels the longest side of the bounding box has.
        band
            The distance from the surface up to which there are voxels, in voxels.
        map_to
            What the smallest and the largest value become; the others are mapped linearly.
        background
            The value everywhere else.
        """
        made = _band(voxel_size, voxels, band, map_to, background)
        numbers = _floats(values, 1, "values")
        return cls._of(_modeling.Guide.from_surface(mesh, numbers, None, made, min_value, _tile_side(tile_side)))

    @classmethod
    def from_distance(
        cls,
        mesh: Mesh,
        point: Sequence[float],
        *,
        voxel_size: float | None = None,
        voxels: int = 100,
        band: float = 3,
        map_to: tuple[float, float] | None = None,
        background: float = 1,
        min_value: float | None = None,
        tile_side: int = 4,
    ) -> Guide:
        """Make a volume in a band around a mesh, whose values are the distances of the surface from a point (x, y, z).

        The other arguments are those of `from_values`.
        """
        made = _band(voxel_size, voxels, band, map_to, background)
        place = _finite(point)
        return cls._of(_modeling.Guide.from_surface(mesh, None, place, made, min_value, _tile_side(tile_side)))

    @property
    def name(self) -> str:
        """The name of the grid."""
        return self._guide.name

    @property
    def background(self) -> float:
        """The value where there are no voxels."""
        return self._guide.background

    @property
    def value_range(self) -> tuple[float, float]:
        """The smallest and the largest value of a voxel."""
        return self._guide.value_range

    def sample(self, points: ArrayLike) -> NDArray[np.float32]:
        """The values at points, interpolated trilinearly: shape (n,), float32.

        points
            Shape (n, 3), float32, in scene units.
        """
        array = _floats(points, 2, "points")
        if array.shape[1] != 3:
            raise ValueError(f"points has to have the shape (n, 3), not {array.shape}")
        return self._guide.sample(array)

    def covered_faces(self, mesh: Mesh) -> int:
        """How many faces have their second corner at a voxel. The others get the background."""
        return self._guide.covered_faces(mesh)


def _finite(point: Sequence[float]) -> Point:
    place = _point(point, "point")
    if not all(map(math.isfinite, place)):
        raise ValueError("point has to be finite")
    return place


def _band(
    voxel_size: float | None, voxels: int, band: float, map_to: tuple[float, float] | None, background: float
) -> _modeling.Band:
    if not 1 <= voxels <= 1000000:
        raise ValueError(f"voxels has to be 1 to 1000000, not {voxels}")
    if not 1 <= band <= 1000:
        raise ValueError(f"band has to be 1 to 1000, not {band}")
    return _modeling.Band(None if voxel_size is None else _size(voxel_size), voxels, band, map_to, background)


def make_volume(
    mesh: Mesh,
    file: Path,
    *,
    values: ArrayLike | None = None,
    distance_to: Sequence[float] | None = None,
    voxel_size: float | None = None,
    voxels: int = 100,
    band: float = 3,
    map_to: tuple[float, float] | None = None,
    background: float = 1,
    overwrite: bool = False,
) -> None:
    """Write the volume of `Guide.from_values` or `Guide.from_distance` as an OpenVDB file.

    values, distance_to
        One of the two: a number per point, or a point.
    overwrite
        Replace an existing file.
    """
    if (values is None) == (distance_to is None):
        raise TypeError("either values or distance_to is required")
    made = _band(voxel_size, voxels, band, map_to, background)
    numbers = None if values is None else _floats(values, 1, "values")
    place = None if distance_to is None else _finite(distance_to)
    name = _encoded(file)
    _require_new(name, overwrite)
    try:
        _modeling.write_volume(name, mesh, numbers, place, made, overwrite)
    except FileError as error:
        _raise_specific(error, name, writes=True)
        raise


class StitchTemplate:
    """A pattern of strands, drawn in a flat polygon, that can be laid on any polygon with as many corners.

    polygon
        A mesh with one face, in the plane z = 0.
    strands
        The strands in it. Heights above the plane are kept.
    strict
        Require that every strand begins and ends on an edge, and that every edge has one or two ends.

    A template with `errors` is not usable as a whole.
    """

    __slots__ = ("_template",)

    def __init__(self, polygon: Mesh, strands: StrandSet, *, strict: bool = True) -> None:
        self._template = _modeling.StitchTemplate(polygon, strands, strict)

    @property
    def corner_count(self) -> int:
        """The number of corners of the polygon."""
        return self._template.corner_count

    @property
    def tolerance(self) -> float:
        """How close to an edge a strand has to end, in scene units."""
        return self._template.tolerance

    @property
    def errors(self) -> list[str]:
        """What is wrong with the polygon or the strands; empty if the template is usable."""
        return self._template.errors

    @property
    def weights(self) -> NDArray[np.float32]:
        """Shape (control points, corners + 1), float32: mean value coordinates, and the height in mean edge lengths."""
        return self._template.weights

    @property
    def strand_offsets(self) -> NDArray[np.uint32]:
        """Shape (strands + 1,), uint32: the first control point of each strand, and the end."""
        return self._template.strand_offsets

    @property
    def edge_ends(self) -> list[list[tuple[int, bool]]]:
        """Per edge of the polygon, the strands that end there, and whether with their last control point."""
        return self._template.edge_ends

    def lay(
        self, polygon: ArrayLike, scale: float, *, normals: ArrayLike | None = None, flip: bool = False
    ) -> NDArray[np.float32]:
        """The positions of all control points on another polygon: shape (control points, 3), float32.

        polygon
            Shape (corners, 3), float32, in scene units.
        scale
            The unit of heights, such as the mean edge length of this polygon.
        normals
            Shape (corners, 3): heights are along their blend. Otherwise along the normal of the first three corners.
        flip
            Lower where the template raises.

        Points are NaN where the polygon has no normal.
        """
        corners = _floats(polygon, 2, "polygon")
        directions = None if normals is None else _floats(normals, 2, "normals")
        return self._template.lay(corners, scale, directions, flip)
