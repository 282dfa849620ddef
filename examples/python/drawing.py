"""Draws meshes and strands with matplotlib: from far to near, in parallel projection. Used by the other examples."""

from __future__ import annotations

from pathlib import Path

import modeling
import numpy as np
from matplotlib.axes import Axes
from matplotlib.collections import LineCollection, PolyCollection
from matplotlib.figure import Figure
from numpy.typing import ArrayLike, NDArray
from PIL import Image

Numbers = NDArray[np.float64]


def projected(points: ArrayLike, eye: ArrayLike, up: ArrayLike = (0, 1, 0)) -> Numbers:
    """Coordinates to the right, upwards, and towards the eye, which is a direction."""
    toward = np.asarray(eye, float) / np.linalg.norm(eye)
    right = np.cross(np.asarray(up, float), toward)
    right /= np.linalg.norm(right)
    return np.asarray(np.asarray(points) @ np.stack([right, np.cross(toward, right), toward], 1))


def draw_mesh(
    axes: Axes, mesh: modeling.Mesh, colors: ArrayLike, *, eye: ArrayLike, up: ArrayLike = (0, 1, 0), edges: float = 0
) -> None:
    """Draws the triangles of a closed mesh that face the eye. `colors` is one color (r, g, b), or one per face."""
    corners = projected(mesh.points, eye, up)[mesh.faces]
    normals = np.cross(corners[:, 1] - corners[:, 0], corners[:, 2] - corners[:, 0])
    normals /= np.maximum(np.linalg.norm(normals, axis=1, keepdims=True), 1e-30)
    order = np.argsort(corners[:, :, 2].mean(1))
    order = order[normals[order, 2] > 0]
    light = np.array([-0.35, 0.5, 0.8]) / np.linalg.norm([-0.35, 0.5, 0.8])
    brightness = 0.42 + 0.58 * np.clip(normals[order] @ light, 0, 1)
    shown = np.broadcast_to(colors, normals.shape)[order] * brightness[:, None]
    lines = shown * 0.55 if edges else shown
    axes.add_collection(
        PolyCollection(corners[order, :, :2], facecolors=shown, edgecolors=lines, linewidths=edges or 0.4)
    )
    finish(axes)


def draw_strands(
    axes: Axes,
    strands: modeling.StrandSet,
    colors: ArrayLike,
    *,
    eye: ArrayLike,
    up: ArrayLike = (0, 0, 1),
    width: float = 2,
) -> None:
    """Draws each segment with a white border, which covers strands below it. `colors` is one color, or one per strand."""
    points = projected(strands.points, eye, up)
    start = np.delete(np.arange(len(points)), np.asarray(strands.strand_offsets[1:]) - 1)
    strand = np.searchsorted(strands.strand_offsets, start, "right") - 1
    segments = np.stack([points[start], points[start + 1]], 1)
    own = np.broadcast_to(colors, (strands.strand_count, 3))[strand]
    depth = segments[:, :, 2].mean(1)
    length = np.linalg.norm(segments[:, 1] - segments[:, 0], axis=1)
    # The border, the strand and its gloss. Segments of the same strand must not cover each other's gloss.
    layers = [(np.ones_like(own), 2.0), (own * 0.7, 1.0), (own * 0.55 + 0.45, 0.35)]
    order = np.argsort(np.concatenate([depth - length, depth, depth + length]))
    shades = np.concatenate([shade for shade, _ in layers])[order]
    widths = np.repeat([width * factor for _, factor in layers], len(own))[order]
    lines = np.tile(segments[:, :, :2], (3, 1, 1))[order]
    axes.add_collection(LineCollection(lines, colors=shades, linewidths=widths, capstyle="round"))
    finish(axes)


def finish(axes: Axes) -> None:
    axes.autoscale()
    axes.set_aspect("equal")
    axes.set_axis_off()


def save(figure: Figure, file: Path) -> None:
    """Writes the picture; PNG files with 256 colors, which make them a third as large."""
    figure.savefig(file, dpi=100)
    if file.suffix.lower() == ".png":
        Image.open(file).convert("RGB").quantize(256).save(file, optimize=True)
