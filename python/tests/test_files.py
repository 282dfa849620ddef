"""Reading and writing files."""

import os
import pathlib
import struct
import threading

import pytest

import modeling
from operation_support import SAMPLES, contents, positions_of, torus


def test_files_keep_everything_that_the_format_holds(tmp_path: pathlib.Path) -> None:
    mesh = modeling.read(torus(1))
    for extension in ("ply", "h5", "vtp", "obj", "glb"):
        file = tmp_path / f"mesh.{extension}"
        if extension in ("obj", "glb"):
            with pytest.warns(modeling.GeometryWarning):
                modeling.write(mesh, str(file))
        else:
            modeling.write(mesh, file)
        if extension in ("ply", "h5"):
            assert contents(modeling.read(file)) == contents(mesh)
    modeling.write(mesh, tmp_path / "small.h5", compression=9)
    assert (tmp_path / "small.h5").stat().st_size < (tmp_path / "mesh.h5").stat().st_size
    modeling.write(mesh, tmp_path / "pack.h5#left")
    assert contents(modeling.read(tmp_path / "pack.h5#left")) == contents(mesh)
    modeling.write(mesh, tmp_path / "unnamed", format="ply")
    assert contents(modeling.read(tmp_path / "unnamed")) == contents(mesh)


def test_positions_are_centered() -> None:
    file = SAMPLES / "cylinder.obj"
    mesh, origin = modeling.read(file, center=True, with_origin=True)
    assert origin is not None
    assert positions_of(modeling.read(file)) - positions_of(mesh) == pytest.approx(
        positions_of(mesh) * 0 + origin, abs=1e-5
    )
    assert contents(modeling.read(file, origin=origin)) == contents(mesh)


def test_files_that_fail_say_why_and_stay(tmp_path: pathlib.Path) -> None:
    mesh = modeling.read(SAMPLES / "cube.ply")
    present = tmp_path / "present.obj"
    present.write_text("v 0 0 x\n")
    with pytest.raises(FileExistsError, match="overwrite=True"):
        modeling.write(mesh, present)
    assert present.read_text() == "v 0 0 x\n"
    with pytest.raises(modeling.FileError, match='present.obj, line 1: "x" is not a valid number'):
        modeling.read(present)
    modeling.write(mesh, present, overwrite=True)
    with pytest.raises(FileNotFoundError) as missing:
        modeling.read(tmp_path / "missing.ply")
    assert isinstance(missing.value, modeling.FileError) and missing.value.filename.endswith("missing.ply")
    with pytest.raises(FileNotFoundError):
        modeling.write(mesh, tmp_path / "folder" / "a.ply")
    for file in (tmp_path, tmp_path / "a.off", tmp_path / "a.stl"):  # a folder, not a format to write, quads
        with pytest.raises(modeling.FileError):
            modeling.write(mesh, file)
    assert sorted(os.listdir(tmp_path)) == ["present.obj"]
    for wrong in (b"a.ply", 3, None):
        with pytest.raises(TypeError):
            modeling.read(wrong)
    for arguments in ({"compression": 10}, {"compression": 1}, {"format": "doc"}, {"comment": "a\nb"}):
        with pytest.raises(ValueError):
            modeling.write(mesh, tmp_path / "a.obj", **arguments)
    with pytest.raises(ValueError):
        modeling.read("a\0.ply")
    with pytest.raises(modeling.FileError):
        modeling.read(tmp_path / "\udce4.ply")


def test_invalid_geometry_is_refused_with_the_sentence_of_the_validator(tmp_path: pathlib.Path) -> None:
    file = tmp_path / "broken.h5"
    modeling.write(modeling.read(SAMPLES / "stitch-triangle.obj"), file)
    valid = file.read_bytes()
    corners = struct.pack("<3I", 0, 1, 2)
    assert valid.count(corners) == 1
    file.write_bytes(valid.replace(corners, struct.pack("<3I", 0, 1, 99)))
    with pytest.raises(modeling.InvalidGeometry, match="broken.h5 does not contain a valid mesh: .*sFaceVertex.*99"):
        modeling.read(file)


def test_a_pipe_is_read_while_python_writes_to_it(tmp_path: pathlib.Path) -> None:
    os.mkfifo(tmp_path / "pipe")
    text = (SAMPLES / "cylinder.obj").read_bytes()
    writer = threading.Thread(target=lambda: (tmp_path / "pipe").write_bytes(text))
    writer.start()
    mesh = modeling.read(tmp_path / "pipe", format="obj")
    writer.join()
    assert contents(mesh) == contents(modeling.read(SAMPLES / "cylinder.obj"))
