"""Mappings between names and arrays, through which geometry shows its properties."""

from __future__ import annotations

from collections.abc import Iterator, Mapping, MutableMapping
from typing import Any, NamedTuple, Optional, TypedDict, Union

import numpy as np
from numpy.typing import ArrayLike, NDArray

from . import _modeling

__all__ = ["Components", "ElementData", "GeoLocation", "PrecisionWarning", "PropertyInfo", "Range", "Ranges"]


class PrecisionWarning(UserWarning):
    """Positions lose more in single precision than a millionth of the bounding box's diagonal."""


class GeoLocation(NamedTuple):
    """A location on geometry: an element of a component of an object, and coordinates within the element."""

    object: str
    component: str
    element: int
    coordinates: tuple[float, float, float]


class ElementData(MutableMapping[str, "NDArray[Any]"]):
    """The properties of the elements of a component, or the data of a range: names and arrays.

    Arrays that come out are read-only views, and stay as they are if the property is replaced; `.copy()` makes one to
    be changed. An assigned array determines the type of the property and must have one row per element. It is copied
    once, unless nobody can write its memory: see `modeling.adopt`.
    """

    __slots__ = ("_geometry", "_target")

    def __init__(self, geometry: _modeling.Geometry, target: str) -> None:
        self._geometry = geometry
        self._target = target

    def __getitem__(self, name: str) -> NDArray[Any]:
        return _modeling._get_data(self._geometry, self._target, _checked(name))

    def __setitem__(self, name: str, values: ArrayLike) -> None:
        _modeling._set_data(self._geometry, self._target, name, values)

    def __delitem__(self, name: str) -> None:
        _modeling._delete_data(self._geometry, self._target, _checked(name))

    def __iter__(self) -> Iterator[str]:
        return iter(_modeling._data_names(self._geometry, self._target))

    def __len__(self) -> int:
        return len(_modeling._data_names(self._geometry, self._target))

    def __contains__(self, name: object) -> bool:
        return name in _modeling._data_names(self._geometry, self._target)

    def info(self, name: str) -> PropertyInfo:
        """The type, the default and the interpolation of a property."""
        info = PropertyInfo(self._geometry, self._target, _checked(name))
        info.key  # raises KeyError if there is no such property
        return info

    def __repr__(self) -> str:
        types = ", ".join(f"{name!r}: {self.info(name).type}" for name in self)
        return f"<{self._target}: {types or 'no properties'}>"

    def _ipython_key_completions_(self) -> list[str]:
        return list(self)


class _Info(TypedDict):
    type: Optional[str]
    length: Optional[int]
    key: str
    interpolation: Union[str, int, None]
    default: Optional[NDArray[Any]]
    depends_on: list[str]


class PropertyInfo:
    """What a property has besides its values. Attributes can be assigned, which changes the geometry."""

    __slots__ = ("_geometry", "_target", "_name")

    def __init__(self, geometry: _modeling.Geometry, target: str, name: str) -> None:
        self._geometry = geometry
        self._target = target
        self._name = name

    def _get(self) -> _Info:
        return _modeling._data_info(self._geometry, self._target, self._name)

    @property
    def name(self) -> str:
        return self._name

    @property
    def key(self) -> str:
        """The key in the object: the name, with a prefix if other elements have a property of this name."""
        return self._get()["key"]

    @property
    def type(self) -> Optional[str]:
        """The element type: "float3". None if the property holds no array."""
        return self._get()["type"]

    @property
    def length(self) -> Optional[int]:
        """The number of values. Usually, but not necessarily that of the elements."""
        return self._get()["length"]

    @property
    def default(self) -> Any:
        """The value of elements that operations add. None if there is no default."""
        view = self._get()["default"]
        return None if view is None else view[0]

    @default.setter
    def default(self, value: Any) -> None:
        values = _modeling._get_data(self._geometry, self._target, self._name)
        _modeling._set_default(self._geometry, self._target, self._name, _single(value, values, self._name))

    @property
    def interpolation(self) -> Union[str, int, None]:
        """How values between elements are interpolated: "linear" or "none". None if the property does not say."""
        return self._get()["interpolation"]

    @interpolation.setter
    def interpolation(self, mode: str) -> None:
        _modeling._set_interpolation(self._geometry, self._target, self._name, mode)

    @property
    def target(self) -> str:
        """The component or the range that the property belongs to. It can be moved to another one of the same length."""
        return self._target

    @target.setter
    def target(self, target: str) -> None:
        _modeling._set_target(self._geometry, self._target, self._name, target)
        self._target = target

    @property
    def depends_on(self) -> list[str]:
        """Names of properties that this one was computed from."""
        return self._get()["depends_on"]

    def __repr__(self) -> str:
        info = self._get()
        return (
            f"<{self._name}: {info['type']}, {info['length']} {self._target}, default {self.default!r}, "
            f"interpolation {info['interpolation']}>"
        )


class Range:
    """One index per element, into the values of the properties in `data`. So elements share values."""

    __slots__ = ("_geometry", "_name")

    def __init__(self, geometry: _modeling.Geometry, name: str) -> None:
        self._geometry = geometry
        self._name = name

    @property
    def target(self) -> str:
        """The component, or another range, whose elements have the indices."""
        return _modeling._get_range(self._geometry, self._name)[0]

    @property
    def indices(self) -> NDArray[np.uint32]:
        """uint32 of shape (elements,), a read-only view."""
        indices = _modeling._get_range(self._geometry, self._name)[1]
        return np.empty(0, np.uint32) if indices is None else indices

    @indices.setter
    def indices(self, indices: ArrayLike) -> None:
        _modeling._set_range(self._geometry, self._name, self.target, indices)

    @property
    def data(self) -> ElementData:
        """The properties that the indices lead to: a mapping from names to arrays of any length."""
        return ElementData(self._geometry, self._name)

    def __repr__(self) -> str:
        return f"<range {self._name!r} of {self.target}: {len(self.indices)} indices, data {list(self.data)}>"


class Ranges(MutableMapping[str, Range]):
    """The ranges of geometry. `ranges[name] = target, indices` adds or replaces one."""

    __slots__ = ("_geometry",)

    def __init__(self, geometry: _modeling.Geometry) -> None:
        self._geometry = geometry

    def __getitem__(self, name: str) -> Range:
        _modeling._get_range(self._geometry, _checked(name))
        return Range(self._geometry, name)

    def __setitem__(self, name: str, value: Union[Range, tuple[str, ArrayLike]]) -> None:
        if isinstance(value, Range):
            value = value.target, value.indices
        if not isinstance(value, tuple) or len(value) != 2:
            raise TypeError("a range is set to (target, indices)")
        _modeling._set_range(self._geometry, name, value[0], value[1])

    def __delitem__(self, name: str) -> None:
        _modeling._delete_range(self._geometry, _checked(name))

    def __iter__(self) -> Iterator[str]:
        return iter(_modeling._range_names(self._geometry))

    def __len__(self) -> int:
        return len(_modeling._range_names(self._geometry))

    def __repr__(self) -> str:
        return "{" + ", ".join(f"{name!r}: {self[name]!r}" for name in self) + "}"


class Components(MutableMapping[str, int]):
    """The number of elements of each component. Those other than points, faces, corners and strands can be set."""

    __slots__ = ("_geometry",)

    def __init__(self, geometry: _modeling.Geometry) -> None:
        self._geometry = geometry

    def _counts(self) -> Mapping[str, int]:
        return _modeling._component_counts(self._geometry)

    def __getitem__(self, name: str) -> int:
        counts = self._counts()
        if name not in counts:
            raise KeyError(f"there is no component {name!r}; there are these: {', '.join(counts)}")
        return counts[name]

    def __setitem__(self, name: str, count: int) -> None:
        _modeling._set_component(self._geometry, name, count)

    def __delitem__(self, name: str) -> None:
        _modeling._delete_component(self._geometry, _checked(name))

    def __iter__(self) -> Iterator[str]:
        return iter(self._counts())

    def __len__(self) -> int:
        return len(self._counts())

    def __repr__(self) -> str:
        return repr(dict(self._counts()))


def _restore(cls: type, state: tuple[Any, ...]) -> _modeling.Geometry:
    """What pickles call: a function that they can find by its name."""
    return _modeling._restore(cls, state)


def _checked(name: Any) -> str:
    """Looking up a key that is no text fails as in a dict."""
    if not isinstance(name, str):
        raise KeyError(name)
    return name


def _single(value: Any, like: NDArray[Any], name: str) -> NDArray[Any]:
    """An array of one value, of the type and shape of the elements of `like`."""
    one = np.empty((1, *like.shape[1:]), like.dtype)
    if like.dtype == object or like.dtype.names:
        one[0] = value
        return one
    given = np.asarray(value)
    if given.shape != like.shape[1:] or given.dtype.kind not in "biuf":
        raise TypeError(f"the default of {name!r} has the shape {like.shape[1:]} and the type {like.dtype}")
    with np.errstate(all="ignore"):
        one[0] = given.astype(like.dtype)
    if like.dtype.kind != "f" and not np.array_equal(one[0], given):
        raise ValueError(f"the default of {name!r} is {like.dtype}, which cannot hold {value!r}")
    return one
