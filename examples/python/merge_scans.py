"""Merges scans into one mesh, with the number of its file at each face, and counts faces by file.

    python3 merge_scans.py OUT SCAN...
"""

import sys
from pathlib import Path

import modeling
import numpy as np


def main(out: str, files: list[str]) -> None:
    scans = [modeling.read(file) for file in files]
    for number, scan in enumerate(scans):
        scan.face_data["source"] = np.full(scan.face_count, number, np.int32)
    merged = modeling.merge_meshes(scans)
    modeling.write(merged, out, overwrite=True)
    for file, count in zip(files, np.bincount(merged.face_data["source"], minlength=len(files)), strict=True):
        print(f"{Path(file).name}: {count} faces")


if __name__ == "__main__":
    if len(sys.argv) < 3:
        sys.exit(__doc__)
    main(sys.argv[1], sys.argv[2:])
