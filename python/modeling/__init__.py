"""Geometry algorithms for meshes, point clouds and strand sets with all their properties."""

from ._modeling import __version__

__all__ = ["__version__"]
