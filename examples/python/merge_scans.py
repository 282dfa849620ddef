"""Merges scans into one mesh, with the number of its scan at each face, and plots how many faces each scan has.

    python3 merge_scans.py left.ply right.ply --out all.ply --plot counts.png

Without files, three parts of a sample model are merged. Nothing is written without --out and --plot.
"""

from __future__ import annotations

import argparse
from pathlib import Path

import matplotlib

matplotlib.use("Agg")  # no window
import matplotlib.pyplot as plt
import modeling
import numpy as np
from drawing import draw_mesh, save

SAMPLES = Path(__file__).parents[2] / "samples"
COLORS = np.array([[0.90, 0.60, 0.25], [0.36, 0.62, 0.75], [0.56, 0.70, 0.38], [0.78, 0.44, 0.50], [0.60, 0.54, 0.74]])


def read_mesh(file: Path) -> modeling.Mesh:
    mesh = modeling.read(file)
    if not isinstance(mesh, modeling.Mesh):
        raise SystemExit(f"{file} has no faces")
    return mesh


def parts_of_sample() -> tuple[list[str], list[modeling.Mesh]]:
    """A mesh cut into three parts, which stand for three scans."""
    bunny = read_mesh(SAMPLES / "bunny.obj")
    x, y, _ = bunny.points[bunny.faces].mean(axis=1).T
    is_head = (x < -1.5) | (y > 6.5)
    parts = {"head": is_head, "back": ~is_head & (x < 2.5), "tail": x >= 2.5}
    return list(parts), [modeling.delete_faces(bunny, ~is_part) for is_part in parts.values()]


def plot(merged: modeling.Mesh, names: list[str], file: Path) -> None:
    source = merged.face_data["scan"]
    triangles = modeling.triangulate(merged)
    figure, (left, right) = plt.subplots(1, 2, figsize=(8, 3.4), width_ratios=(1.25, 1), layout="constrained")
    draw_mesh(left, triangles, COLORS[triangles.face_data["scan"] % len(COLORS)], eye=(-0.35, 0.25, 1), edges=0.25)
    counts = np.bincount(source, minlength=len(names))
    bars = right.barh(np.arange(len(names)), counts, tick_label=names, color=COLORS[np.arange(len(names)) % len(COLORS)])
    right.bar_label(bars, [f"{count:,}" for count in counts], padding=4)
    right.margins(x=0.22)
    right.invert_yaxis()
    right.set_xlabel("faces")
    right.spines[["top", "right"]].set_visible(False)
    save(figure, file)


def main(arguments: list[str] | None = None) -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("scans", type=Path, nargs="*")
    parser.add_argument("--out", type=Path, help="file of the merged mesh")
    parser.add_argument("--plot", type=Path, help="picture (PNG, SVG or PDF)")
    options = parser.parse_args(arguments)

    names, scans = parts_of_sample()
    if options.scans:
        names, scans = [file.name for file in options.scans], [read_mesh(file) for file in options.scans]
    merged = modeling.merge(scans, source_attribute="scan")
    for name, count in zip(names, np.bincount(merged.face_data["scan"], minlength=len(names))):
        print(f"{name}: {count:,} faces")
    if options.out:
        modeling.write(merged, options.out)
    if options.plot:
        plot(merged, names, options.plot)


if __name__ == "__main__":
    main()
