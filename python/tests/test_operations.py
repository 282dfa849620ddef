"""Operations give what the program gives for the same files, to the bit, and never change their arguments."""

import json
import math
import subprocess
import warnings

import numpy as np
import pytest

import modeling
from operation_support import (PROGRAM, SAMPLES, cloud, contents, faces_of, made_by_program, positions_of, run, scratch, torus)

pytestmark = pytest.mark.filterwarnings("ignore::modeling.GeometryWarning")


def indices(*values: int):
    file = scratch(".txt")
    file.write_text(" ".join(map(str, values)))
    return file


SURFACE = {
    "triangulate": (
        lambda mesh: modeling.triangulate(mesh), ["--keep-units"], ["keyhole.obj", "mixed.obj", torus(1, quads=True)]),
    "triangulate in fine units": (
        lambda mesh: modeling.triangulate(mesh, keep_units=False, channels="^*"), ["--channels", "^*"],
        ["keyhole.obj", torus(2, quads=True)]),
    "subdivide": (lambda mesh: modeling.subdivide(mesh, relative=0.02), ["--relative", 0.02], ["cylinder.obj", torus(3)]),
    "subdivide unchecked": (
        lambda mesh: modeling.subdivide(mesh, 0.05, check=False), ["--tolerance", 0.05], [torus(3), torus(4)]),
    "smooth": (lambda mesh: modeling.smooth(mesh, 2.5), ["--amount", 2.5], ["bunny.obj", torus(5, quads=True)]),
    "smooth pinned": (
        lambda mesh: modeling.smooth(mesh, pin_boundary=True, pin_sharp=20), ["--pin-boundary", "--pin-sharp", 20],
        ["sphere-with-hole.stl", torus(6)]),
    "remove-slivers": (
        lambda mesh: modeling.remove_slivers(mesh, 0.2), ["--ratio", 0.2], ["bunny.obj", torus(7), torus(8, noise=0)]),
    "delete-faces": (
        lambda mesh: modeling.delete_faces(mesh, [5, 0, 3, 3]), ["--indices", indices(0, 3, 5)],
        ["cube.ply", torus(9), torus(10, quads=True)]),
}  # fmt: skip


@pytest.mark.parametrize("name", SURFACE)
def test_surfaces_are_those_of_the_program(name: str) -> None:
    operation, arguments, files = SURFACE[name]
    for file in files:
        file = SAMPLES / file
        mesh = modeling.read(file)
        before = contents(mesh)
        result = contents(operation(mesh))
        assert result == made_by_program(name.split()[0], *arguments, inputs=(file,)), file
        assert contents(mesh) == before
        with modeling.threads(1):
            assert contents(operation(mesh)) == result
        assert modeling.validate(operation(mesh)) == []


def test_needles_are_removed_and_weights_are_used() -> None:
    mesh = modeling.read(torus(8, noise=0))
    assert modeling.topology(modeling.remove_slivers(mesh, 0.3)).triangles < modeling.topology(mesh).triangles
    weights = np.linspace(0, 1, len(positions_of(mesh)), dtype=np.float32)
    moved = np.any(positions_of(modeling.smooth(mesh, weights=weights)) != positions_of(mesh), axis=1)
    assert not moved[0] and moved[1:].mean() > 0.9
    assert contents(modeling.smooth(mesh, weights=np.ones_like(weights))) == contents(modeling.smooth(mesh))


def test_point_clouds_are_those_of_the_program() -> None:
    for seed in range(3):
        first, second = cloud(seed), cloud(seed + 10, 30)
        points, added = modeling.read(first), modeling.read(second)
        expected = made_by_program("add-points", first, second, "--tag", "new")
        tagged = modeling.add_points_to_point_cloud(points, positions_of(added), tag="new")
        assert contents(tagged) == expected
        expected = made_by_program("delete-points", first, "--indices", indices(7, 199, 0))
        mask = np.isin(np.arange(200), [0, 7, 199])
        for chosen in ([7, 199, 0, 7], np.array([0, 7, 199], np.uint8), mask):
            assert contents(modeling.delete_points_in_point_cloud(points, chosen)) == expected
            assert contents(modeling.delete_components(points, "points", chosen)) == expected
        mapping = modeling.compute_deleted_component_mapping(mask)
        assert list(mapping[:9]) == [4294967294, 0, 1, 2, 3, 4, 5, 4294967294, 6]
        assert contents(modeling.copy_non_geo_properties(points, [added])) == contents(points)


def test_merged_objects_are_those_of_the_program() -> None:
    cases = {
        modeling.merge_meshes: [torus(11), SAMPLES / "bunny.obj", torus(12, quads=True)],
        modeling.merge_point_clouds: [cloud(1), cloud(2)],
        modeling.merge_strands: [SAMPLES / "stitch-quad-rings.obj", SAMPLES / "stitch-triangle-rings.obj"],
    }
    for merge, files in cases.items():
        objects = [modeling.read(file) for file in files]
        expected = made_by_program("merge", *files)
        assert contents(merge(objects)) == contents(modeling.merge(objects)) == expected
        numbered = modeling.merge(objects, source_attribute="file")
        assert contents(numbered) == made_by_program("merge", "--source-attribute", "file", inputs=tuple(files))
        assert contents(objects[0]) == contents(modeling.read(files[0]))
        with pytest.raises(modeling.Refusal, match='^source_attribute: object 0 already has a property "file"$'):
            modeling.merge([numbered, objects[0]], source_attribute="file")
    with pytest.raises(modeling.Refusal, match="merge joins meshes with meshes") as refusal:
        modeling.merge([modeling.read(torus(11)), modeling.read(cloud(1))])
    assert refusal.value.reasons == ("object 0 is a mesh", "object 1 is a point cloud")


def test_volumes_are_those_of_the_program() -> None:
    for file in (SAMPLES / "bunny.obj", torus(13)):
        mesh = modeling.read(file)
        volume, own = scratch(".vdb"), scratch(".vdb")
        run("make-volume", file, volume, "--distance-to", 0.1, 1, 0, "--from", 0.25, "--to", 2, "--voxels", 40)
        band = {"map_to": (0.25, 2), "voxels": 40}
        modeling.make_volume(mesh, own, distance_to=(0.1, 1, 0), **band)
        assert own.read_bytes() == volume.read_bytes()
        expected = made_by_program("subdivide", file, "--relative", 0.03, "--volume", volume)
        for guide in (modeling.Guide.read(volume), modeling.Guide.from_distance(mesh, (0.1, 1, 0), **band)):
            assert contents(modeling.subdivide_by_volume(mesh, guide, relative=0.03)) == expected
            assert guide.value_range == (0.25, 2)
            assert guide.covered_faces(mesh) == modeling.topology(mesh).triangles
    quality = np.array([float(line.split()[3]) for line in file.read_text().splitlines()[11:299]], np.float32)
    run("make-volume", file, volume := scratch(".vdb"), "--attribute", "quality")
    modeling.make_volume(mesh, own, values=quality, overwrite=True)
    assert own.read_bytes() == volume.read_bytes()


def test_an_array_makes_the_volume_that_it_says() -> None:
    values = np.random.default_rng(1).random((11, 9, 17), np.float32) + 0.5
    guide = modeling.Guide.from_array(values, 0.25, (-1, 0.1, 2), background=9, min_value=0.75)
    i, j, k = (axis.ravel() for axis in np.indices(values.shape))
    points = np.stack([-1 + 0.25 * i, 0.1 + 0.25 * j, 2 + 0.25 * k], -1)
    assert np.allclose(guide.sample(points), np.maximum(values, 0.75).ravel(), atol=1e-4)
    assert guide.sample([[50, 0, 0], [math.nan, 0, 0]]).tolist() == [9, 9]
    mesh = modeling.read(torus(14))
    constant = modeling.Guide.from_array(np.full((40, 40, 20), 0.5), 0.2, (-4, -4, -2))
    assert contents(modeling.subdivide_by_volume(mesh, constant, 0.2)) == contents(modeling.subdivide(mesh, 0.1))
    for wrong in (np.zeros((2, 2)), np.full((1, 1, 1), math.nan)):
        with pytest.raises(ValueError):
            modeling.Guide.from_array(wrong, 1)
    point = scratch(".obj")
    point.write_text("v 1 1 1\nv 1 1 1\nv 1 1 1\nf 1 2 3\n")
    with pytest.raises(modeling.Refusal, match="so voxel_size is required"):
        modeling.Guide.from_distance(modeling.read(point), (0, 0, 0))
    with pytest.raises(FileNotFoundError):
        modeling.Guide.read(scratch(".vdb"))


def test_a_template_lays_strands_as_the_program_does() -> None:
    polygon, strands = SAMPLES / "stitch-quad.obj", SAMPLES / "stitch-quad-rings.obj"
    template = modeling.StitchTemplate(modeling.read(polygon), modeling.read(strands))
    assert template.errors == [] and template.corner_count == 4 and template.weights.shape[1] == 5
    corners = positions_of(modeling.read(polygon))
    lengths = np.linalg.norm((corners - np.roll(corners, -1, 0)).astype(np.float64), axis=1).astype(np.float32)
    scale = float(np.mean(lengths, dtype=np.float64))
    expected = scratch(".h5")
    run("stitch", "--template", polygon, strands, "--on", polygon, expected, "--normals", "faces")
    laid = modeling.read(expected)
    assert np.array_equal(template.lay(corners, scale), positions_of(laid))
    assert template.strand_offsets[-1] == len(positions_of(laid))
    wrong = modeling.StitchTemplate(modeling.read(polygon), modeling.read(SAMPLES / "stitch-wrong.obj"))
    assert "strand starting point not on polygon edge" in " ".join(wrong.errors)


def test_facts_are_those_of_the_program() -> None:
    for name in ("bunny.obj", "mixed.obj", "spider.obj", "cube.ply"):
        facts = modeling.topology(modeling.read(SAMPLES / name))
        told = json.loads(run("info", SAMPLES / name, "--json"))["topology"]
        assert facts.slivers == tuple(told[f"sliversBelow{ratio}"] for ratio in ("0.1", "0.05", "0.01"))
        snake = {"".join("_" + c.lower() if c.isupper() else c for c in key): value for key, value in told.items()}
        for key in set(snake) & set(vars(facts)):
            assert getattr(facts, key) == snake[key], (name, key)
        assert len(set(snake) & set(vars(facts))) == 14


def test_faces_are_large_until_they_are_refined() -> None:
    mesh = modeling.read(torus(15))
    corners = positions_of(mesh)[np.array(faces_of(mesh))]
    extent = (corners.max(1) - corners.min(1)).max(1)
    assert np.array_equal(modeling.large_faces(mesh, 0.2), extent > np.float32(0.4))
    assert not modeling.large_faces(modeling.subdivide(mesh, 0.2), 0.2).any()


def test_half_edges_lead_to_the_faces() -> None:
    mesh = modeling.read(torus(16, quads=True, columns=5, rows=4))
    edges = modeling.HalfEdges(mesh)
    found = {}
    for face, points in enumerate(faces_of(mesh)):
        for corner, end in enumerate(points):
            found[points[corner - 1], end] = (face, corner)
    assert len(edges) == len(found)
    for start in range(20):
        starts = [a for a in range(20) if (a, start) in found]
        assert edges.neighbors(start).tolist() == starts and edges.valence(start) == len(starts)
        for end in range(20):
            assert edges.find(start, end) == found.get((start, end))


WRONG_ARGUMENTS = {
    ("triangulate", "--channels", names): lambda mesh, names=names: modeling.triangulate(mesh, channels=names)
    for names in ("uv", "^uv", "mat* u?", "material -uv", " , ")
} | {
    ("smooth", "--amount", amount): lambda mesh, amount=amount: modeling.smooth(mesh, amount)
    for amount in (math.nan, math.inf, -1, 1000.5)
}


@pytest.mark.parametrize("arguments", WRONG_ARGUMENTS, ids=str)
def test_arguments_are_refused_with_the_sentences_of_the_program(arguments: tuple) -> None:
    command, option, value = arguments
    file = torus(18)
    told = subprocess.run([PROGRAM, command, file, scratch(".ply"), f"{option}={value}"], capture_output=True, text=True)
    with pytest.raises(ValueError) as refusal:
        WRONG_ARGUMENTS[arguments](modeling.read(file))
    assert "--" + str(refusal.value) == told.stderr.splitlines()[0].removeprefix("modeling: ")


def test_patterns_that_exclude_may_match_nothing() -> None:
    mesh = modeling.read(torus(18, quads=True))
    for channels, kept in {"* ^tmp*": ["material"], "**": ["material"], "^m*": [], "mat?rial": ["material"]}.items():
        assert list(modeling.triangulate(mesh, channels=channels).face_data) == kept


def test_refusals_say_why() -> None:
    hole, quads = modeling.read(SAMPLES / "sphere-with-hole.stl"), modeling.read(SAMPLES / "cube.ply")
    for operation, command in ((lambda mesh: modeling.subdivide(mesh, 0.3), "subdivide"),
                               (lambda mesh: modeling.subdivide(mesh, 0.3, check=False), "subdivide"),
                               (modeling.remove_slivers, "remove_slivers")):  # fmt: skip
        with pytest.raises(modeling.Refusal, match=f"{command} needs a closed manifold mesh of triangles") as refusal:
            operation(hole)
        assert "9 of 432 edges are boundary edges" in refusal.value.reasons[0]
    with pytest.raises(modeling.Refusal, match="6 faces have more than three corners. The first is face 0 with 4"):
        modeling.subdivide(quads, 0.3)
    with pytest.raises(modeling.Refusal, match="finer than single precision can distinguish"):
        modeling.subdivide(modeling.read(SAMPLES / "bunny.obj"), 1e-9)
    with pytest.raises(modeling.Refusal, match="cannot delete elements of sPointComp here"):
        modeling.delete_components(quads, "points", [0])
    with pytest.raises(IndexError, match="index 6 is out of range: there are 6 elements"):
        modeling.delete_faces(quads, [0, 6])
    with pytest.raises(modeling.Refusal, match="would replace the points"):
        modeling.add_points_to_point_cloud(modeling.read(cloud(1)), [[0, 0, 0]], tag="sPointPosition")
    with pytest.raises(modeling.GeometryWarning, match="dropped material: refinement replaces faces and corners"):
        with warnings.catch_warnings():
            warnings.simplefilter("error")
            modeling.subdivide(modeling.read(torus(17)), 0.1)
