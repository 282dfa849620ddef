"""What the functions of `modeling` raise, and the warnings that they issue."""

from __future__ import annotations


class FileError(OSError):
    """A file cannot be read or written: the text names the file, and the line or element if there is one.

    If there is no such file, it is a `FileNotFoundError` too, and a `FileExistsError` if the file is not to be replaced.
    """


class MissingFileError(FileError, FileNotFoundError):
    """There is no such file."""


class PresentFileError(FileError, FileExistsError):
    """The file exists, and is not to be replaced."""


class Refusal(ValueError):
    """An operation cannot handle an object: the text says why, and mostly how to fix it.

    `reasons` has one sentence per fault. Points and faces are counted from 0.
    """

    reasons: tuple[str, ...] = ()


class InvalidGeometry(ValueError):
    """An object is invalid: arrays do not fit the counts, offsets decrease, or an index is out of range.

    The text names the property and the element.
    """


class GeometryWarning(UserWarning):
    """Something was left out, converted or guessed, or a property was dropped."""


for _class in (FileError, Refusal, InvalidGeometry, GeometryWarning):
    _class.__module__ = "modeling"  # where users find it, which tracebacks show
