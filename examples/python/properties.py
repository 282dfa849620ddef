"""A walk through the properties of geometry: types, defaults, interpolation, targets, ranges, components and sharing.

    python3 properties.py --out brick.h5

Each cell (# %%) can be run by itself in an editor with notebooks. Nothing is written without --out.
With the name of a file, its properties are listed at the end, instead of those of the walk.
"""

# %% Imports, and a mesh: a brick of six quads
from __future__ import annotations

import argparse
from pathlib import Path

import modeling
import numpy as np


def brick() -> modeling.Mesh:
    corners = np.array([[x, y, z] for x in (0, 2) for y in (0, 1) for z in (0, 1)], np.float32)
    return modeling.Mesh(corners, [[0, 1, 3, 2], [4, 6, 7, 5], [0, 4, 5, 1], [2, 3, 7, 6], [0, 2, 6, 4], [1, 5, 7, 3]])


mesh = brick()
print(mesh)


# %% Types: the array that is assigned determines the type of the property
mesh.point_data["weight"] = np.linspace(0, 1, 8)  # float64
mesh.point_data["velocity"] = np.zeros((8, 3), np.float32)
mesh.face_data["color"] = np.full((6, 4), (200, 120, 80, 255), np.uint8)
mesh.face_data["side"] = ["left", "right", "front", "back", "bottom", "top"]
mesh.corner_data["uv"] = np.tile(np.array([[0, 0], [1, 0], [1, 1], [0, 1]], np.float32), (6, 1))
for elements in (mesh.point_data, mesh.face_data, mesh.corner_data):
    print(elements)  # weight: double, velocity: float3, color: uchar4, side: string, uv: float2

# Values are read-only views of the library's memory. To change some, assign a changed copy.
weight = mesh.point_data["weight"].copy()
weight[0] = 0.5
mesh.point_data["weight"] = weight


# %% Defaults: what elements get that have no value, here those of the second brick
info = mesh.point_data.info("weight")
info.default = -1
plain = brick()
both = modeling.merge([mesh, plain], source_attribute="brick")
print("merged:", both.point_data["weight"].tolist())  # -1 for the points of the second brick
assert (both.point_data["weight"][8:] == -1).all()


# %% Interpolation: whether values between points have a meaning
print("velocity:", mesh.point_data.info("velocity").interpolation)
info.interpolation = "none"  # a weight belongs to its point only
print("weight:", info)


# %% Targets: a property can move to other elements of the same number
mesh.components["sides"] = 6  # a component of our own
mesh.face_data.info("side").target = "sides"
print("of sides:", mesh.data("sides"), "of faces:", mesh.face_data)


# %% Ranges: elements that share values have an index each
mesh.ranges["material"] = "faces", [0, 0, 1, 1, 1, 0]
material = mesh.ranges["material"]
material.data["material_name"] = ["brick", "mortar"]
print(material)
print("by face:", material.data["material_name"][material.indices].tolist())

# A deletion keeps the indices of the faces that are left, and the values.
half = modeling.delete_faces(mesh, [0, 1])
print("of four faces:", half.ranges["material"].indices.tolist())


# %% Names: the mappings hide prefixes that keep names apart in the object and in files
mesh.point_data["color"] = np.zeros((8, 4), np.uint8)
print("keys:", mesh.face_data.info("color").key, mesh.point_data.info("color").key)


# %% Sharing: copies share all arrays until one of them changes
other = mesh.copy()
assert np.shares_memory(other.point_data["weight"], mesh.point_data["weight"])
other.point_data["weight"] = np.ones(8)
print("after a change:", mesh.point_data["weight"][0], other.point_data["weight"][0])

# Assigned arrays are copied once, since others could write them. `adopt` hands the memory over instead.
large = np.arange(8.0)
mesh.point_data["large"] = modeling.adopt(large)
assert np.shares_memory(mesh.point_data["large"], large) and not large.flags.writeable


# %% What a file has, and all of it in a file
def table(geometry: modeling.Geometry) -> str:
    """One row per property."""
    rows = []
    for target in [*geometry.components, *geometry.ranges]:
        for name in (data := geometry.data(target)):
            row = data.info(name)
            rows.append(f"{name:16} {row.type!s:10} {target:14} {row.length:>9,} {row.interpolation!s:8} {row.default}")
    return "\n".join([f"{'property':16} {'type':10} {'of':14} {'length':>9} {'between':8} default", *rows])


if __name__ == "__main__":
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("file", type=Path, nargs="?")
    parser.add_argument("--out", type=Path, help="file of the brick")
    options = parser.parse_args()
    print(table(modeling.read(options.file) if options.file else mesh))
    if options.out:
        modeling.write(mesh, options.out)
