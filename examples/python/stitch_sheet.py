"""Lays a pattern of strands on every quad of a sheet: chain mail, knitting, or a woven fabric.

    python3 stitch_sheet.py cloth.obj --template polygon.obj strands.obj --out fabric.obj --plot fabric.png

Without a file, a wavy sheet is made. Nothing is written without --out and --plot.
"""

from __future__ import annotations

import argparse
from pathlib import Path

import matplotlib

matplotlib.use("Agg")  # no window
import matplotlib.pyplot as plt
import modeling
import numpy as np
from drawing import draw_strands, save
from numpy.typing import NDArray

SAMPLES = Path(__file__).parents[2] / "samples"


def wavy_sheet(side: int = 11) -> modeling.Mesh:
    i, j = (axis.ravel() for axis in np.indices((side + 1, side + 1)))
    points = np.stack([i, j, 0.6 * np.sin(i / 1.8) * np.cos(j / 1.8)], axis=1)
    corner = np.arange((side + 1) ** 2).reshape(side + 1, side + 1)
    quads = np.stack([corner[:-1, :-1], corner[1:, :-1], corner[1:, 1:], corner[:-1, 1:]], axis=-1)
    return modeling.Mesh(points, quads.reshape(-1, 4))


def point_normals(mesh: modeling.Mesh) -> NDArray[np.float32]:
    """The mean of the normals of the quads at each point, weighted by area."""
    corners = mesh.points[mesh.faces]
    sums = np.zeros_like(mesh.points)
    normals = np.cross(corners[:, 2] - corners[:, 0], corners[:, 3] - corners[:, 1])
    np.add.at(sums, mesh.faces, normals[:, None])
    sums /= np.linalg.norm(sums, axis=1, keepdims=True)
    return sums


def stitch(template: modeling.StitchTemplate, mesh: modeling.Mesh) -> modeling.StrandSet:
    """Lays the template on each face. Each strand knows its face, and its number in the template."""
    corners = mesh.points[mesh.faces]
    normals = point_normals(mesh)[mesh.faces]
    scale = float(np.linalg.norm(corners - np.roll(corners, 1, axis=1), axis=2).mean())  # one for all: ends meet
    points = [template.lay(polygon, scale, normals=own) for polygon, own in zip(corners, normals)]
    per_face = np.diff(template.strand_offsets.astype(np.int64))
    offsets = np.concatenate([[0], np.cumsum(np.tile(per_face, mesh.face_count))])
    strands = modeling.StrandSet(np.concatenate(points), offsets=offsets)
    strands.strand_data["face"] = np.repeat(np.arange(mesh.face_count, dtype=np.int32), len(per_face))
    strands.strand_data["pattern"] = np.tile(np.arange(len(per_face), dtype=np.int32), mesh.face_count)
    return strands


def plot(strands: modeling.StrandSet, file: Path) -> None:
    height = np.add.reduceat(strands.points[:, 2], strands.strand_offsets[:-1]) / np.diff(strands.strand_offsets)
    figure, axes = plt.subplots(figsize=(9, 5.6), layout="constrained")
    colors = plt.get_cmap("YlGnBu_r")(0.15 + 0.5 * (height - height.min()) / max(np.ptp(height), 1e-9))[:, :3]
    draw_strands(axes, strands, colors, eye=(-1, -1.3, 1.7), width=4)
    save(figure, file)


def main(arguments: list[str] | None = None) -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("mesh", type=Path, nargs="?", help="a mesh of quads")
    parser.add_argument("--template", type=Path, nargs=2, metavar=("POLYGON", "STRANDS"),
                        default=(SAMPLES / "stitch-quad.obj", SAMPLES / "stitch-quad-rings.obj"))  # fmt: skip
    parser.add_argument("--out", type=Path, help="file of the strands")
    parser.add_argument("--plot", type=Path, help="picture (PNG, SVG or PDF)")
    options = parser.parse_args(arguments)

    polygon, pattern = (modeling.read(file) for file in options.template)
    mesh = modeling.read(options.mesh) if options.mesh else wavy_sheet()
    if not isinstance(polygon, modeling.Mesh) or not isinstance(pattern, modeling.StrandSet):
        parser.error("a template is a polygon and strands in it")
    if not isinstance(mesh, modeling.Mesh) or mesh.corner_count != 4 * mesh.face_count:
        parser.error(f"{options.mesh} has other faces than quads")
    template = modeling.StitchTemplate(polygon, pattern)
    if template.errors or template.corner_count != 4:
        parser.error(f"the template is not usable: {template.errors or 'it is no quad'}")

    strands = stitch(template, mesh)
    print(f"{strands.strand_count:,} strands with {strands.point_count:,} points on {mesh.face_count:,} faces")
    if options.out:
        modeling.write(strands, options.out)
    if options.plot:
        plot(strands, options.plot)


if __name__ == "__main__":
    main()
