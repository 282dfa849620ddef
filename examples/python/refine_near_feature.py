"""Refines a mesh near features, and leaves it coarse elsewhere: a NumPy array says how fine it becomes at each place.

    python3 refine_near_feature.py scan.ply --at 0 1.5 0.2 --radius 0.1 --out fine.ply --plot fine.png

Without a file, a sample model is refined at its eye and at the tip of its tail. Nothing is written without --out and --plot.
"""

from __future__ import annotations

import argparse
from pathlib import Path

import matplotlib

matplotlib.use("Agg")  # no window
import matplotlib.pyplot as plt
import modeling
import numpy as np
from drawing import draw_mesh, projected, save
from numpy.typing import NDArray

SAMPLES = Path(__file__).parents[2] / "samples"


def guide_near(mesh: modeling.Mesh, features: list[list[float]], radius: float, finest: float) -> modeling.Guide:
    """A volume with the value `finest` within the radius of a feature, which rises to 1 at three times the radius."""
    low, high = mesh.points.min(axis=0), mesh.points.max(axis=0)
    voxel = float(np.max(high - low)) / 80
    axes = [np.arange(start - voxel, end + 2 * voxel, voxel) for start, end in zip(low, high)]
    places = np.stack(np.meshgrid(*axes, indexing="ij"), axis=-1)
    distance = np.min([np.linalg.norm(places - feature, axis=-1) for feature in features], axis=0)
    values = np.interp(distance, [radius, 3 * radius], [finest, 1]).astype(np.float32)
    return modeling.Guide.from_array(values, voxel, origin=[axis[0] for axis in axes])


def edge_lengths(mesh: modeling.Mesh) -> NDArray[np.float32]:
    """The longest edge of each triangle."""
    corners = mesh.points[mesh.faces]
    lengths: NDArray[np.float32] = np.linalg.norm(corners - np.roll(corners, 1, axis=1), axis=2).max(axis=1)
    return lengths


def plot(meshes: dict[str, modeling.Mesh], guide: modeling.Guide, middle: list[float], file: Path) -> None:
    """Shows the surroundings of a feature. Faces are colored by the value of the volume: orange is fine."""
    eye = (-0.35, 0.25, 1)
    figure, panels = plt.subplots(1, len(meshes), figsize=(8, 4.3))
    figure.subplots_adjust(left=0.01, right=0.99, bottom=0.01, top=0.92, wspace=0.03)
    for axes, (title, mesh) in zip(panels, meshes.items()):
        value = guide.sample(mesh.points[mesh.faces].mean(axis=1))[:, None]
        colors = (1 - value) * [1.0, 0.60, 0.20] + value * [0.80, 0.85, 0.88]
        draw_mesh(axes, mesh, colors, eye=eye, edges=0.4)
        x, y, _ = projected(middle, eye)
        side = 0.22 * np.ptp(mesh.points, axis=0).max()
        axes.set(xlim=(x - side, x + side), ylim=(y - side, y + side))
        axes.set_title(f"{title}: {mesh.face_count:,} faces")
    save(figure, file)


def main(arguments: list[str] | None = None) -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("mesh", type=Path, nargs="?", help="a closed mesh of triangles")
    parser.add_argument("--at", type=float, nargs=3, action="append", metavar=("X", "Y", "Z"), help="a feature")
    parser.add_argument("--radius", type=float, default=0.6, help="of the fine regions, in the units of the mesh")
    parser.add_argument("--relative", type=float, default=0.03, help="tolerance far from the features")
    parser.add_argument("--finest", type=float, default=0.08, help="factor of the tolerance at the features")
    parser.add_argument("--out", type=Path, help="file of the refined mesh")
    parser.add_argument("--plot", type=Path, help="picture (PNG, SVG or PDF)")
    options = parser.parse_args(arguments)
    if options.mesh and not options.at:
        parser.error("--at is required for your own mesh")

    mesh = modeling.read(options.mesh or SAMPLES / "bunny.obj")
    if not isinstance(mesh, modeling.Mesh):
        parser.error(f"{options.mesh} has no faces")
    features = options.at or [[-4.3, 6.9, 2.8], [4.8, 1.6, 0.5]]
    guide = guide_near(mesh, features, options.radius, options.finest)
    refined = modeling.subdivide_by_volume(mesh, guide, relative=options.relative)
    for name, shown in ("before", mesh), ("after", refined):
        is_near = guide.sample(shown.points[shown.faces].mean(axis=1)) < 1.01 * options.finest
        near, far = edge_lengths(shown)[is_near], edge_lengths(shown)[~is_near]
        print(f"{name}: {len(near):,} faces at the features, with edges up to {near.max(initial=0):.3g}; "
              f"{len(far):,} elsewhere, up to {far.max(initial=0):.3g}")  # fmt: skip
    if options.out:
        modeling.write(refined, options.out)
    if options.plot:
        plot({"before": mesh, "after": refined}, guide, features[0], options.plot)


if __name__ == "__main__":
    main()
