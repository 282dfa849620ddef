"""The examples do what their first lines say, with their own input and with that of the user."""

import os
import subprocess
import sys
from pathlib import Path

import numpy as np
import pytest

import modeling
from operation_support import SAMPLES, run, torus

pytestmark = pytest.mark.filterwarnings("ignore::modeling.GeometryWarning")
EXAMPLES = Path(__file__).parents[2] / "examples" / "python"


@pytest.fixture
def example(tmp_path: Path):
    """Runs an example in an empty folder."""

    def run_example(name: str, *arguments: object, code: int = 0) -> str:
        if name.startswith("vtk"):
            pytest.importorskip("vtkmodules.util.numpy_support", reason="needs python3-vtk9")
        command = [sys.executable, EXAMPLES / f"{name}.py", *map(str, arguments)]
        done = subprocess.run(command, cwd=tmp_path, capture_output=True, text=True)
        assert done.returncode == code, done.stdout + done.stderr
        return done.stdout

    return run_example


@pytest.mark.parametrize(
    "name, told",
    {
        "clean_folder": ["torus-0.ply: 3,456 faces, 528 fewer now", "with-hole.ply: not cleaned: "],
        "merge_scans": ["head: 1,", "back: ", "tail: "],
        "refine_near_feature": ["before: 32 faces at the features", "3,642 elsewhere"],
        "stitch_sheet": ["484 strands with 6,292 points on 121 faces"],
        "properties": ["of four faces: [1, 1, 1, 0]", "side             string     sides                  6 linear"],
        "vtk_round_trip": ["from VTK", "back to VTK", "8,076 faces with 360 needles, now 6,932 with 0"],
    }.items(),
)
def test_examples_run_on_their_own_input_and_write_nothing(example, tmp_path: Path, name: str, told: list[str]) -> None:
    output = example(name)
    assert all(text in output for text in told), output
    assert list(tmp_path.iterdir()) == []


def test_a_folder_is_cleaned(example, tmp_path: Path) -> None:
    scans, out = tmp_path / "scans", tmp_path / "out"
    scans.mkdir()
    (scans / "notes.txt").write_text("no mesh")
    (scans / "hole.stl").write_bytes((SAMPLES / "sphere-with-hole.stl").read_bytes())
    (scans / "torus.ply").write_bytes(torus(8, noise=0).read_bytes())
    example("clean_folder", scans, "--out", out, "--ratio", 0.3, code=1)
    assert os.listdir(out) == ["torus.ply"]
    before, after = modeling.read(scans / "torus.ply"), modeling.read(out / "torus.ply")
    assert after == modeling.remove_slivers(before, 0.3) and after.face_count < before.face_count
    assert "the file exists" in example("clean_folder", scans, "--out", out, code=1)


def test_scans_are_merged_as_the_program_does(example, tmp_path: Path) -> None:
    scans = [torus(1), torus(2, quads=True)]
    output = example("merge_scans", *scans, "--out", "all.ply", "--plot", "counts.png")
    assert output == f"{scans[0].name}: 576 faces\n{scans[1].name}: 288 faces\n"
    run("merge", *scans, "-o", tmp_path / "expected.ply", "--source-attribute", "scan")
    assert modeling.read(tmp_path / "all.ply") == modeling.read(tmp_path / "expected.ply")
    assert (tmp_path / "counts.png").read_bytes().startswith(b"\x89PNG")


def test_a_mesh_is_fine_at_its_features_only(example, tmp_path: Path) -> None:
    at, file = (3, 0, 0), torus(3, noise=0)
    example("refine_near_feature", file, "--at", *at, "--radius", 0.3, "--relative", 0.06,
            "--out", "fine.ply", "--plot", "fine.png")  # fmt: skip
    before, after = modeling.read(file), modeling.read(tmp_path / "fine.ply")
    assert modeling.topology(after).closed_manifold

    def extents(mesh: modeling.Mesh, least: float, most: float) -> np.ndarray:
        corners = mesh.points[mesh.faces]
        distance = np.linalg.norm(corners.mean(axis=1) - at, axis=1)
        return np.ptp(corners, axis=1).max(axis=1)[(distance >= least) & (distance < most)]

    tolerance = 0.06 * modeling.topology(before).diagonal
    assert extents(after, 0, 0.2).max() <= 2 * 0.08 * tolerance < extents(before, 0, 0.3).max() / 3
    assert len(extents(after, 0, 0.2)) > 40 and len(extents(after, 1.5, 9)) < 1.1 * len(extents(before, 1.5, 9))
    assert (tmp_path / "fine.png").read_bytes().startswith(b"\x89PNG")


def test_a_sheet_is_stitched_as_the_program_does(example, tmp_path: Path) -> None:
    mesh, template = torus(4, quads=True), [SAMPLES / "stitch-quad.obj", SAMPLES / "stitch-quad-rings.obj"]
    example("stitch_sheet", mesh, "--out", "strands.h5", "--plot", "strands.svg")
    run("stitch", "--template", *template, "--on", mesh, tmp_path / "expected.h5")
    strands, expected = modeling.read(tmp_path / "strands.h5"), modeling.read(tmp_path / "expected.h5")
    assert np.allclose(strands.points, expected.points, atol=1e-5)
    assert np.array_equal(strands.strand_offsets, expected.strand_offsets)
    assert strands.strand_data["face"].tolist() == [face for face in range(288) for _ in range(4)]
    assert "<svg" in (tmp_path / "strands.svg").read_text()
    assert example("stitch_sheet", SAMPLES / "bunny.obj", code=2) == ""


def test_properties_are_kept_in_a_file(example, tmp_path: Path) -> None:
    example("properties", "--out", "brick.h5")
    brick = modeling.read(tmp_path / "brick.h5")
    weight = brick.point_data.info("weight")
    assert (weight.type, weight.default, weight.interpolation) == ("double", -1, "none")
    assert brick.data("sides")["side"].tolist() == ["left", "right", "front", "back", "bottom", "top"]
    assert brick.ranges["material"].data["material_name"][brick.ranges["material"].indices].tolist().count("brick") == 3
    assert example("properties", tmp_path / "brick.h5").count("\nweight ") == 1


def test_vtk_and_the_package_share_memory(example, tmp_path: Path) -> None:
    for arguments in ([], ["first.vtp"]):
        output = example("vtk_round_trip", *arguments, "--out", "second.vtp" if arguments else "first.vtp")
        assert "copied" not in output and output.count(": same\n") == 8
    from vtkmodules.vtkIOXML import vtkXMLPolyDataReader

    reader = vtkXMLPolyDataReader()
    reader.SetFileName(str(tmp_path / "first.vtp"))
    reader.Update()
    surface = reader.GetOutput()
    assert surface.GetNumberOfPolys() == 6932 and surface.GetPointData().GetArrayName(0) == "height"
    assert surface.GetBounds()[1] == pytest.approx(1, abs=0.02)


def test_types() -> None:
    options = ["--strict", "--ignore-missing-imports", "--cache-dir", os.devnull]
    packages = os.path.dirname(os.path.dirname(modeling.__file__))
    result = subprocess.run(
        [sys.executable, "-m", "mypy", *options, *sorted(EXAMPLES.glob("*.py"))],
        capture_output=True,
        text=True,
        cwd=EXAMPLES,
        env={**os.environ, "MYPYPATH": packages},
    )
    assert result.returncode == 0, result.stdout + result.stderr
