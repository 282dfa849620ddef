"""What the tests of operations share."""

import hashlib
import itertools
import os
import subprocess
import tempfile
from pathlib import Path

import numpy as np

import modeling

SAMPLES = Path(__file__).parents[2] / "samples"
PROGRAM = os.environ["MODELING_PROGRAM"]
_numbers = itertools.count()
_folder = tempfile.TemporaryDirectory()


def scratch(extension: str) -> Path:
    return Path(_folder.name) / f"{next(_numbers)}{extension}"


def run(*arguments: object) -> str:
    done = subprocess.run([PROGRAM, *map(str, arguments)], capture_output=True, text=True)
    assert done.returncode == 0, done.stderr
    return done.stdout


def contents(object: object) -> str:
    """A fingerprint of everything that an object holds: HDF5 files hold it without loss, and always in the same bytes."""
    file = scratch(".h5")
    modeling.write(object, file)
    return hashlib.sha256(file.read_bytes()).hexdigest()


def made_by_program(command: str, *arguments: object, inputs: tuple = ()) -> str:
    """The same of what the program makes of the same arguments."""
    file = scratch(".h5")
    run(command, *inputs, *arguments, "-o" if command == "merge" else file, *([file] if command == "merge" else []))
    return hashlib.sha256(file.read_bytes()).hexdigest()


def torus(seed: int, *, quads: bool = False, columns: int = 24, rows: int = 12, noise: float = 0.02) -> Path:
    """A PLY file of a closed mesh with random points, needles, and attributes of points and faces."""
    random = np.random.default_rng(seed)
    u, v = np.meshgrid(np.arange(columns), np.arange(rows), indexing="ij")
    a = 2 * np.pi * u / columns
    b = 2 * np.pi * (v + 0.45 * (u % 3 == 0) * (v % 4 == 0) * 2) / rows
    radius = 2 + np.cos(b)
    points = np.stack([radius * np.cos(a), radius * np.sin(a), np.sin(b)], -1).reshape(-1, 3)
    points = (points + random.normal(0, noise, points.shape)).astype(np.float32)
    corner = lambda i, j: (i % columns) * rows + j % rows
    faces = []
    for i, j in itertools.product(range(columns), range(rows)):
        quad = corner(i, j), corner(i + 1, j), corner(i + 1, j + 1), corner(i, j + 1)
        faces += [quad] if quads else [quad[:3], (quad[0], quad[2], quad[3])]
    lines = ["ply", "format ascii 1.0", f"element vertex {len(points)}"]
    lines += [f"property float {name}" for name in ("x", "y", "z", "quality")]
    lines += [f"element face {len(faces)}", "property list uchar int vertex_indices", "property int material", "end_header"]
    lines += [f"{x!s} {y!s} {z!s} {q!s}" for (x, y, z), q in zip(points, random.random(len(points), np.float32))]
    lines += [" ".join(map(str, (len(face), *face, random.integers(5)))) for face in faces]
    file = scratch(".ply")
    file.write_text("\n".join(lines) + "\n")
    return file


def cloud(seed: int, count: int = 200) -> Path:
    file = scratch(".xyz")
    np.savetxt(file, np.random.default_rng(seed).normal(size=(count, 3)).astype(np.float32), fmt="%.9g")
    return file


def positions_of(object: object) -> np.ndarray:
    file = scratch(".obj")
    modeling.write(object, file)
    rows = [line.split()[1:4] for line in file.read_text().splitlines() if line.startswith("v ")]
    return np.array(rows, np.float32).reshape(-1, 3)


def faces_of(object: object) -> list[list[int]]:
    file = scratch(".obj")
    modeling.write(object, file)
    return [
        [int(corner.split("/")[0]) - 1 for corner in line.split()[1:]]
        for line in file.read_text().splitlines()
        if line.startswith("f ")
    ]
