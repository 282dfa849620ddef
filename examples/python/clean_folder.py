"""Removes the needles of all meshes of a folder: triangles whose shortest edge is shorter than a fraction of the longest.

    python3 clean_folder.py scans/ --out clean/

Prints what happened to each file, and why a file was not cleaned. Without --out nothing is written. Without a folder, the
files are made in a temporary one.
"""

from __future__ import annotations

import argparse
import sys
import tempfile
import warnings
from pathlib import Path

import modeling
import numpy as np

FORMATS = {".obj", ".ply", ".stl", ".off", ".glb", ".gltf", ".h5"}


def make_samples(folder: Path, columns: int = 48, rows: int = 36) -> None:
    """Writes tori whose rings are at random angles, so that the faces between some of them are needles."""
    for seed in range(3):
        a, b = np.meshgrid(
            np.linspace(0, 2 * np.pi, columns, endpoint=False),
            np.sort(np.random.default_rng(seed).uniform(0, 2 * np.pi, rows)),
            indexing="ij",
        )
        radius = 2 + np.cos(b)
        points = np.stack([radius * np.cos(a), radius * np.sin(a), np.sin(b)], axis=-1).reshape(-1, 3)
        point = np.arange(columns * rows).reshape(columns, rows)
        quads = np.stack([point, np.roll(point, -1, 0), np.roll(point, (-1, -1), (0, 1)), np.roll(point, -1, 1)], -1)
        torus = modeling.Mesh(points.astype(np.float32), quads.reshape(-1, 4))
        modeling.write(torus, folder / f"torus-{seed}.ply")
    modeling.write(modeling.delete_faces(torus, [5]), folder / "with-hole.ply")


def clean(file: Path, out: Path | None, ratio: float) -> str:
    """Cleans one file, and returns what to say about it."""
    mesh = modeling.read(file)
    if not isinstance(mesh, modeling.Mesh):
        return "has no faces"
    mesh = modeling.triangulate(mesh)
    cleaned = modeling.remove_slivers(mesh, ratio)
    if out:
        modeling.write(cleaned, (out / file.name).with_suffix(".ply"))  # never replaces a file
    return f"{mesh.face_count:,} faces, {mesh.face_count - cleaned.face_count:,} fewer now"


def clean_folder(folder: Path, out: Path | None, ratio: float) -> int:
    """Cleans all files with meshes, and returns how many it could not clean."""
    failures = 0
    for file in sorted(folder.iterdir()):
        if file.suffix.lower() not in FORMATS:
            continue
        try:
            print(f"{file.name}: {clean(file, out, ratio)}")
        except (modeling.Refusal, modeling.InvalidGeometry, modeling.FileError) as error:
            failures += 1
            print(f"{file.name}: not cleaned: {error}")
    return failures


def main(arguments: list[str] | None = None) -> int:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("folder", type=Path, nargs="?")
    parser.add_argument("--out", type=Path, help="folder of the results, which are PLY files")
    parser.add_argument("--ratio", type=float, default=0.1, help="of the shortest to the longest edge")
    options = parser.parse_args(arguments)

    warnings.simplefilter("ignore", modeling.GeometryWarning)  # attributes are dropped if faces are removed
    if options.out:
        options.out.mkdir(parents=True, exist_ok=True)
    if options.folder:
        return 1 if clean_folder(options.folder, options.out, options.ratio) else 0
    with tempfile.TemporaryDirectory() as folder:
        make_samples(Path(folder))
        clean_folder(Path(folder), options.out, options.ratio)
    return 0


if __name__ == "__main__":
    sys.exit(main())
