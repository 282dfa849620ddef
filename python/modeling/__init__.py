"""Geometry algorithms for meshes, point clouds and strand sets with all their properties."""

from ._modeling import Geometry, HalfEdges, Mesh, PointCloud, StrandSet, __version__, adopt, thread_count, threads
from .data import Components, ElementData, GeoLocation, PrecisionWarning, PropertyInfo, Range, Ranges
from .errors import FileError, GeometryWarning, InvalidGeometry, Refusal
from .files import read, write
from .guides import Guide, StitchTemplate, make_volume
from .operations import (
    Topology,
    add_points_to_point_cloud,
    compute_deleted_component_mapping,
    copy_non_geo_properties,
    delete_components,
    delete_faces,
    delete_points_in_point_cloud,
    large_faces,
    merge,
    merge_meshes,
    merge_point_clouds,
    merge_strands,
    remove_slivers,
    smooth,
    subdivide,
    subdivide_by_volume,
    topology,
    triangulate,
    validate,
)

__all__ = [
    "Components",
    "ElementData",
    "FileError",
    "GeoLocation",
    "Geometry",
    "GeometryWarning",
    "Guide",
    "HalfEdges",
    "InvalidGeometry",
    "Mesh",
    "PointCloud",
    "PrecisionWarning",
    "PropertyInfo",
    "Range",
    "Ranges",
    "Refusal",
    "StitchTemplate",
    "StrandSet",
    "Topology",
    "__version__",
    "add_points_to_point_cloud",
    "adopt",
    "compute_deleted_component_mapping",
    "copy_non_geo_properties",
    "delete_components",
    "delete_faces",
    "delete_points_in_point_cloud",
    "large_faces",
    "make_volume",
    "merge",
    "merge_meshes",
    "merge_point_clouds",
    "merge_strands",
    "read",
    "remove_slivers",
    "smooth",
    "subdivide",
    "subdivide_by_volume",
    "thread_count",
    "threads",
    "topology",
    "triangulate",
    "validate",
    "write",
]

for _class in (Geometry, Mesh, PointCloud, StrandSet, adopt):
    _class.__module__ = "modeling"
del _class
