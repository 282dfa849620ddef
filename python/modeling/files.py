"""Reading and writing files of geometry."""

from __future__ import annotations

import errno
import os
import stat
from collections.abc import Sequence
from typing import Literal, Union, overload

from . import _modeling
from ._modeling import Mesh, PointCloud, StrandSet
from .errors import FileError, MissingFileError, PresentFileError

Geometry = Union[Mesh, PointCloud, StrandSet]
Path = Union[str, "os.PathLike[str]"]
Point = tuple[float, float, float]


def _encoded(file: Path) -> bytes:
    name = os.fspath(file)
    if not isinstance(name, str):
        raise TypeError(f"a file has to be a str or os.PathLike, not {type(name).__name__}")
    if "\0" in name:
        raise ValueError("the name of a file contains a null character")
    return os.fsencode(name)


def _extension(format: str | None) -> str:
    if format is None:
        return ""
    name = format.lower().removeprefix(".")
    if name not in _modeling.formats():
        raise ValueError(f"there is no format {format!r}. There are: {', '.join(_modeling.formats())}")
    return "." + name


def _point(values: Sequence[float], name: str) -> Point:
    x, y, z = (float(value) for value in values) if len(values) == 3 else _refuse_point(name)
    return x, y, z


def _refuse_point(name: str) -> Point:
    raise ValueError(f"{name} has to be three numbers")


def _raise_specific(error: FileError, file: bytes, writes: bool) -> None:
    """Raises the built-in exception too if the state of the file is the reason."""
    path = _modeling.file_of(file)
    folder = os.path.dirname(path) or b"."
    if not writes and not os.path.lexists(path) or writes and not os.path.isdir(folder):
        raise MissingFileError(errno.ENOENT, str(error), os.fsdecode(path)) from None
    raise error


@overload
def read(
    file: Path,
    *,
    lenient: bool = ...,
    center: bool = ...,
    origin: Sequence[float] | None = ...,
    format: str | None = ...,
    with_origin: Literal[False] = ...,
) -> Geometry: ...
@overload
def read(
    file: Path,
    *,
    lenient: bool = ...,
    center: bool = ...,
    origin: Sequence[float] | None = ...,
    format: str | None = ...,
    with_origin: Literal[True],
) -> tuple[Geometry, Point | None]: ...


def read(
    file: Path,
    *,
    lenient: bool = False,
    center: bool = False,
    origin: Sequence[float] | None = None,
    format: str | None = None,
    with_origin: bool = False,
) -> Geometry | tuple[Geometry, Point | None]:
    """Read an OBJ, PLY, STL, OFF, XYZ, glTF (.glb, .gltf) or HDF5 file, with all attributes that the format has.

    The result is a mesh if the file has faces, otherwise a strand set if it has polylines, otherwise a point cloud.

    file
        A name ("scan.ply"), or an object in an HDF5 file ("scans.h5#left"). Pipes such as /dev/stdin are read to their end.
    lenient
        Leave out points that are not finite, the faces and polylines at them, faces with fewer than three corners, and bytes
        after the last element. Otherwise such files are refused.
    center
        Subtract a point near the middle of the geometry from all positions, in double precision. Far from the origin, single
        precision has only a few decimal places.
    origin
        Subtract this point (x, y, z) instead, such as that of a file that was read before.
    format
        The format if the name does not tell it, such as "ply". By default the first bytes of the file tell it.
    with_origin
        Return a pair: the object, and the point that was subtracted, or None.

    Raises `FileError` (an `OSError`; also `FileNotFoundError` if there is no file) and `InvalidGeometry`. Issues a
    `GeometryWarning` for everything in the file that the object does not have.

    >>> mesh = read(samples / "cube.ply")
    >>> topology(mesh).quads
    6
    """
    name = _encoded(file)
    point = None if origin is None else _point(origin, "origin")
    try:
        result, subtracted = _modeling.read(name, lenient, center, point, _extension(format))
    except FileError as error:
        _raise_specific(error, name, writes=False)
        raise
    return (result, subtracted) if with_origin else result


def write(
    object: Geometry,
    file: Path,
    *,
    overwrite: bool = False,
    compression: int = 0,
    format: str | None = None,
    comment: str = "",
) -> None:
    """Write an OBJ, PLY, STL, VTP, GLB or HDF5 file. HDF5 files hold everything without loss.

    The file appears under its name when it is complete. If anything fails, an existing file is unchanged.

    file
        A name, whose extension tells the format.
    overwrite
        Replace an existing file.
    compression
        Of HDF5 files: 1 (fast) to 9 (small), or 0 for none.
    format
        The format if the name does not tell it, such as "ply".
    comment
        A line of text that the file contains, in formats that have comments.

    Raises `FileError` (an `OSError`; also `FileExistsError` or `FileNotFoundError` if a file or its folder is the reason) and
    `InvalidGeometry`. Issues a `GeometryWarning` for everything that the format cannot hold.

    >>> write(read(samples / "cube.ply"), folder / "cube.obj")
    >>> topology(read(folder / "cube.obj")).quads
    6
    """
    name = _encoded(file)
    extension = _extension(format)
    if not 0 <= compression <= 9:
        raise ValueError(f"compression has to be 0 to 9, not {compression}")
    if compression and _modeling.format_of(name, extension) != ".h5":
        raise ValueError("compression applies to HDF5 files only")
    if "\n" in comment or "\r" in comment:
        raise ValueError("comment has to be one line")
    _require_new(_modeling.file_of(name), overwrite)
    try:
        _modeling.write(object, name, overwrite, compression, extension, comment)
    except FileError as error:
        _raise_specific(error, name, writes=True)
        raise


def _require_new(path: bytes, overwrite: bool) -> None:
    try:
        exists = stat.S_ISREG(os.stat(path).st_mode)
    except OSError:
        return  # writing says why
    if exists and not overwrite:
        message = f"{os.fsdecode(path)} cannot be written: the file exists; overwrite=True replaces it"
        raise PresentFileError(errno.EEXIST, message, os.fsdecode(path))
