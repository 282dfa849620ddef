"""Geometry algorithms for meshes, point clouds and strand sets with all their properties."""

from ._modeling import Geometry, Mesh, PointCloud, StrandSet, __version__, adopt
from .data import Components, ElementData, GeoLocation, PrecisionWarning, PropertyInfo, Range, Ranges
from .errors import InvalidGeometry

__all__ = [
    "Components",
    "ElementData",
    "GeoLocation",
    "Geometry",
    "InvalidGeometry",
    "Mesh",
    "PointCloud",
    "PrecisionWarning",
    "PropertyInfo",
    "Range",
    "Ranges",
    "StrandSet",
    "__version__",
    "adopt",
]

for _class in (Geometry, Mesh, PointCloud, StrandSet, adopt):
    _class.__module__ = "modeling"
del _class
