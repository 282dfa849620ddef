"""modeling.batch in one process: recipes, plans, reports and second runs. test_batch_cluster.py runs it on workers."""

import json
import os
import signal
import subprocess
import sys
import threading
import time
from pathlib import Path
from typing import Any, Callable

import pytest

import modeling
from modeling import _modeling
from modeling.batch.cli import main

PYRAMID = "v 0 0 0\nv 2 0 0\nv 2 2 0\nv 0 2 0\nv 1 1 {height}\nf 1 4 3 2\nf 1 2 5\nf 2 3 5\nf 3 4 5\nf 4 1 5\n"
RECIPE = {"modeling": 1, "steps": [{"do": "triangulate"}], "output": {"format": "ply"}}

Batch = Callable[..., tuple[int, dict[str, Any]]]


def write(path: Path, text: str) -> Path:
    path.parent.mkdir(parents=True, exist_ok=True)
    path.write_text(text)
    return path


def pyramid(path: Path, height: float = 1) -> Path:
    return write(path, PYRAMID.format(height=height))


@pytest.fixture
def batch(tmp_path: Path, monkeypatch: pytest.MonkeyPatch) -> Batch:
    """Runs a batch in this process. Returns its exit status, and the status of each output."""
    monkeypatch.chdir(tmp_path)
    write(tmp_path / "recipe.json", json.dumps(RECIPE))

    def run(*arguments: str, recipe: str = "recipe.json") -> tuple[int, dict[str, Any]]:
        status = main([recipe, *arguments, "--out", "out", "--in-process"])
        if not os.path.exists("out/report.json"):
            return status, {}
        return status, {entry["output"]: entry["status"] for entry in json.load(open("out/report.json"))["files"]}

    return run


def test_runs_as_the_program_does(batch: Batch, tmp_path: Path, capsys: pytest.CaptureFixture[str]) -> None:
    pyramid(tmp_path / "in/a.obj")
    write(tmp_path / "in/broken.obj", "v 0 0 x\n")
    assert batch("in") == (1, {"a.ply": "done", "broken.ply": "failed"})
    printed = capsys.readouterr()
    assert "1/2 a.ply: done: 5 points, 5 → 6 faces" in printed.err
    row = next(line for line in printed.out.splitlines() if line.startswith("broken.ply"))
    assert "line 1: " in row
    program = [os.environ["MODELING_PROGRAM"], "run", "in/a.obj", "single.ply", "--recipe", "recipe.json", "--json"]
    expected = json.loads(subprocess.run(program, capture_output=True, check=True).stdout)
    assert Path("out/a.ply").read_bytes() == Path("single.ply").read_bytes()
    report = json.load(open("out/report.json"))
    assert report["summary"] == {"files": 2, "done": 1, "current": 0, "failed": 1, "open": 0}
    assert report["files"][0]["after"] == expected["steps"][0]["after"]
    assert sorted(os.listdir("out")) == ["a.ply", "report.json"]


def test_refuses_wrong_recipes_with_the_line(batch: Batch, tmp_path: Path, capsys: pytest.CaptureFixture[str]) -> None:
    pyramid(tmp_path / "a.obj")
    steps = '[[steps]]\ndo = "smooth"\n'
    cases = {
        "r.json": [
            ('{"modeling": 1,\n"steps": [{"do": "smooth",\n"amuont": 1}]}', 'line 3: step 1 (smooth): there is no key "amuont"'),
            ('{"modeling": 1,\n"steps": [{"do": "stitch",\n"template": ["a"]}]}', 'line 3: step 1 (stitch): "template"'),
            ('{"modeling": 1,\n"steps": [{"do": "triangulate"},\n{"do": "merge"}]}', "line 3: step 2 (merge): "),
            ('{"modeling": 1,\n"steps": [{"do": "merge",\n"source-attribute": "a"}],\n"output": {"format": "stl"}}', "line 2: "),
            ('{"modeling": 1,\n', "parse error at line 2"),
            ('{"modeling": 1, "steps": [{"do": "add-points", "points": "-"}]}', "is a stream"),
            ('{"modeling": 1, "steps": [\n{"do": "add-points", "points": "none.ply"}]}', 'line 2: step 1: "points": '),
        ],
        "r.toml": [
            ("modeling = 1\n\n" + steps + "# a comment\n\namuont = 1\n", 'line 7: step 1 (smooth): there is no key "amuont"'),
            ("modeling = 1\n" + steps + steps + "amount = [\n 1,\n 2]\n", 'line 6: step 2 (smooth): "amount"'),
            ("modeling = 1\n" + steps + "amount = inf\n", 'line 4: step 1 (smooth): "amount" has to be a number'),
            ("modeling = 1\n" + steps + "amount = -1\n", "line 4: step 1 (smooth): --amount: -1 is not"),
            ("modeling = 1\n" + steps + "[output]\nformat = 'off'\n", 'line 5: "format" has to be one of'),
            ("modeling = 1\n" + steps + '[[steps]]\ndo = "subdivide"\n', "line 4: step 2 (subdivide): "),
            ('modeling = 1\nsteps = [\n  {do = "smooth"}, # a comment\n  {do = "smooth", amuont = 1},\n]\n', "line 4: step 2 (smooth): "),
            ('modeling = 1\nsteps = [\n{do = "smooth", amount = [\n1,\n2\n]}]\n', 'line 3: step 1 (smooth): "amount"'),
            ('modeling = 1\nsteps = [\n{do = "delete-faces", box = [\n0, 0, 0, 1, 1, 1\n], amuont = 1}]\n', "line 5: step 1 (delete-faces): "),
            ("modeling = 2\n" + steps, "line 1: it is no recipe of version 1"),
            ("modeling = \n", "(at line 1, column 12)"),
        ],
    }
    for name, recipes in cases.items():
        for text, message in recipes:
            write(tmp_path / name, text)
            assert batch("a.obj", recipe=name) == (2, {}), text
            error = capsys.readouterr().err
            assert name in error, text
            assert message in error, text
    assert not os.path.exists("out")


def test_toml_and_json_are_the_same_recipe(batch: Batch, tmp_path: Path) -> None:
    pyramid(tmp_path / "a.obj")
    write(tmp_path / "same.toml", 'modeling = 1\noutput = {format = "ply"}\nsteps = [{do = "triangulate"}]\n')
    assert batch("a.obj") == (0, {"a.ply": "done"})
    assert batch("a.obj", recipe="same.toml") == (0, {"a.ply": "current"})


def test_names_outputs_after_inputs(batch: Batch, tmp_path: Path, capsys: pytest.CaptureFixture[str]) -> None:
    for name in ("in/a.obj", "in/sub/a.obj", "in/sub/b.obj", "in/.hidden.obj", "other/a.obj"):
        pyramid(tmp_path / name)
    write(tmp_path / "in/notes.txt", "")
    assert batch("in")[1].keys() == {"a.ply", "sub/a.ply", "sub/b.ply"}
    assert batch("*/sub/?.obj")[1].keys() == {"in/sub/a.ply", "in/sub/b.ply"}
    assert batch("in/**/b.obj", "in/a.obj", "in/a.obj")[1].keys() == {"sub/b.ply", "a.ply"}
    assert batch("in/a.obj", "--format", "stl")[1] == {"a.stl": "done"}
    assert batch(".")[1].keys() >= {"in/a.ply", "other/a.ply"}  # but nothing in out
    assert not any(name.startswith("out/") for name in batch(".")[1])
    capsys.readouterr()
    for arguments, message in (
        (["in", "other"], "a.obj would both be written to "),
        (["nothing"], "there is no file or folder nothing"),
        (["*.off"], "no file matches *.off"),
    ):
        assert batch(*arguments)[0] == 2
        assert message in capsys.readouterr().err
    assert main(["recipe.json", "in/a.obj", "--out", "in", "--format", "obj"]) == 2
    assert "but it is an input" in capsys.readouterr().err
    write(tmp_path / "no-format.json", json.dumps({**RECIPE, "output": {}}))
    pyramid(tmp_path / "c.xyz")
    assert batch("c.xyz", recipe="no-format.json")[0] == 2
    assert batch("in/a.obj", recipe="no-format.json")[1] == {"a.obj": "done"}


def test_second_run_does_what_is_missing_or_changed(batch: Batch, tmp_path: Path, monkeypatch: pytest.MonkeyPatch) -> None:
    for name in "abc":
        pyramid(tmp_path / f"in/{name}.obj")
    assert batch("in") == (0, dict.fromkeys(["a.ply", "b.ply", "c.ply"], "done"))
    assert batch("in", "--threads", "2") == (0, dict.fromkeys(["a.ply", "b.ply", "c.ply"], "current"))
    pyramid(tmp_path / "in/a.obj", height=2)
    os.unlink("out/b.ply")
    os.utime("in/c.obj")
    assert batch("in") == (0, {"a.ply": "done", "b.ply": "done", "c.ply": "current"})
    assert batch("in/a.obj") == (0, {"a.ply": "current"})
    assert batch("in/b.obj") == (0, {"b.ply": "current"})  # what it did before is not forgotten
    assert set(batch("in", "--lenient")[1].values()) == {"done"}
    monkeypatch.setattr(_modeling, "library_version", "another")
    assert set(batch("in", "--lenient")[1].values()) == {"done"}


def test_files_of_steps_and_buffers_count_as_contents(batch: Batch, tmp_path: Path) -> None:
    write(tmp_path / "cloud.obj", "v 0 0 0\n")
    more = write(tmp_path / "more.obj", "v 1 0 0\n")
    steps = [{"do": "add-points", "points": "more.obj"}]
    write(tmp_path / "add.json", json.dumps({**RECIPE, "steps": steps}))
    buffer = tmp_path / "parts/x y.bin"
    buffer.parent.mkdir()
    buffer.write_bytes(bytes(36))
    accessor = {"bufferView": 0, "componentType": 5126, "count": 3, "type": "VEC3", "min": [0, 0, 0], "max": [0, 0, 0]}
    document = {
        "asset": {"version": "2.0"},
        "buffers": [{"byteLength": 36, "uri": "x%20y.bin"}],
        "bufferViews": [{"buffer": 0, "byteLength": 36}],
        "accessors": [accessor],
        "meshes": [{"primitives": [{"attributes": {"POSITION": 0}, "mode": 0}]}],
        "nodes": [{"mesh": 0}],
        "scenes": [{"nodes": [0]}],
        "scene": 0,
    }
    write(tmp_path / "parts/p.gltf", json.dumps(document))
    inputs = ["cloud.obj", "parts/p.gltf"]
    assert batch(*inputs, recipe="add.json") == (0, {"cloud.ply": "done", "p.ply": "done"})
    assert batch(*inputs, recipe="add.json") == (0, {"cloud.ply": "current", "p.ply": "current"})
    buffer.write_bytes(bytes(32) + b"\0\0\0\x3f")
    assert batch(*inputs, recipe="add.json") == (0, {"cloud.ply": "current", "p.ply": "done"})
    more.write_text("v 1 0 5\n")
    assert batch(*inputs, recipe="add.json") == (0, {"cloud.ply": "done", "p.ply": "done"})


def test_replaces_only_what_batches_have_written(batch: Batch, tmp_path: Path, capsys: pytest.CaptureFixture[str]) -> None:
    pyramid(tmp_path / "a.obj")
    foreign = write(tmp_path / "out/a.ply", "mine")
    for _ in range(2):  # the report of the first run does not make it ours
        assert batch("a.obj") == (1, {"a.ply": "failed"})
        assert foreign.read_text() == "mine"
        assert "exists, and no batch has written it; --force" in capsys.readouterr().out
    assert batch("a.obj", "--force") == (0, {"a.ply": "done"})
    foreign.write_text("edited")
    pyramid(tmp_path / "a.obj", height=3)
    for _ in range(2):
        assert batch("a.obj") == (1, {"a.ply": "failed"})
        assert foreign.read_text() == "edited"
    assert batch("a.obj", "--force") == (0, {"a.ply": "done"})
    # An output of an input that has become broken is kept, and is still ours when the input is good again.
    result = foreign.read_bytes()
    write(tmp_path / "a.obj", "v x\n")
    assert batch("a.obj") == (1, {"a.ply": "failed"})
    assert foreign.read_bytes() == result
    pyramid(tmp_path / "a.obj", height=4)
    assert batch("a.obj") == (0, {"a.ply": "done"})
    write(tmp_path / "out/report.json", "{}")
    assert main(["recipe.json", "a.obj", "--out", "out", "--in-process"]) == 2
    assert "is no report of a batch" in capsys.readouterr().err
    assert Path("out/report.json").read_text() == "{}"


def test_links_in_the_folder_are_followed_as_by_the_program(batch: Batch, tmp_path: Path) -> None:
    pyramid(tmp_path / "a.obj")
    pyramid(tmp_path / "b.obj")
    target = write(tmp_path / "elsewhere/target.ply", "mine")
    (tmp_path / "out").mkdir()
    (tmp_path / "out/a.ply").symlink_to(target)
    (tmp_path / "out/b.ply").symlink_to(tmp_path / "elsewhere/new.ply")
    assert batch("a.obj", "b.obj") == (1, {"a.ply": "failed", "b.ply": "done"})
    assert target.read_text() == "mine"
    assert batch("a.obj", "b.obj", "--force") == (0, {"a.ply": "done", "b.ply": "current"})
    assert os.path.islink("out/a.ply") and os.path.islink("out/b.ply")
    program = [os.environ["MODELING_PROGRAM"], "run", "a.obj", "single.ply", "--recipe", "recipe.json"]
    Path("single.ply").symlink_to("elsewhere/single.ply")
    subprocess.run(program, check=True)
    assert os.path.islink("single.ply")
    for file in ("elsewhere/target.ply", "elsewhere/new.ply"):
        assert Path(file).read_bytes() == Path("elsewhere/single.ply").read_bytes()
    Path("out/b.ply").unlink()
    Path("out/b.ply").symlink_to(target)
    assert batch("a.obj", "b.obj", "--force")[0] == 2, "two outputs are one file"


def test_hdf5_files_are_inputs_and_outputs(batch: Batch, tmp_path: Path) -> None:
    left, right = (modeling.read(pyramid(tmp_path / "p.obj", height)) for height in (1, 2))
    (tmp_path / "in").mkdir()
    for name, mesh in (("left", left), ("right", right)):
        modeling.write(mesh, f"in/scan.h5#{name}", overwrite=True)
    output = {"format": "h5", "compress": 9}
    steps = [{"do": "triangulate"}, {"do": "subdivide", "relative": 0.02}]
    write(tmp_path / "packed.json", json.dumps({**RECIPE, "steps": steps, "output": output}))
    write(tmp_path / "plain.json", json.dumps({**RECIPE, "steps": steps, "output": {"format": "h5"}}))
    both = "in/scan.h5#left", "in/scan.h5#right"
    names = {"scan-left.h5", "scan-right.h5"}
    assert batch(*both, recipe="packed.json") == (0, dict.fromkeys(names, "done"))
    for name, mesh in (("left", left), ("right", right)):
        expected = modeling.subdivide(modeling.triangulate(mesh, keep_units=False), relative=0.02)
        assert modeling.read(f"out/scan-{name}.h5") == expected
        command = [os.environ["MODELING_PROGRAM"], "run", f"in/scan.h5#{name}", f"{name}.h5", "--compress", "9"]
        subprocess.run([*command, "--recipe", "packed.json"], check=True, stdout=subprocess.DEVNULL)
        assert Path(f"out/scan-{name}.h5").read_bytes() == Path(f"{name}.h5").read_bytes()
    packed = os.path.getsize("out/scan-left.h5")
    assert batch(*both, recipe="packed.json") == (0, dict.fromkeys(names, "current"))
    assert batch(*both, recipe="plain.json") == (0, dict.fromkeys(names, "done"))
    assert os.path.getsize("out/scan-left.h5") > packed
    status, statuses = batch("in", "in/scan.h5#none", recipe="packed.json")
    assert status == 1 and set(statuses.values()) == {"failed"}, "it has several objects, and none of that name"


def test_interrupt_keeps_what_is_finished(batch: Batch, tmp_path: Path) -> None:
    for i in range(400):
        pyramid(tmp_path / f"in/{i:03}.obj", height=i + 1)
    command = [sys.executable, "-m", "modeling.batch", "recipe.json", "in", "--out", "out", "--in-process"]
    process = subprocess.Popen(command, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, text=True)
    assert process.stderr
    process.stderr.readline()  # one is finished
    process.send_signal(signal.SIGINT)
    error = process.communicate(timeout=60)[1]
    assert process.returncode == 6
    assert "Traceback" not in error and error.rstrip().endswith("the next run does the others")
    summary = json.load(open("out/report.json"))["summary"]
    assert summary["done"] > 0 and summary["open"] > 0 and summary["done"] + summary["open"] == 400
    status, files = batch("in")
    assert status == 0 and list(files.values()).count("current") == summary["done"]


def test_runs_of_the_module(tmp_path: Path, capfd: pytest.CaptureFixture[str]) -> None:
    source = pyramid(tmp_path / "a.obj")
    recipe = json.dumps({"modeling": 1, "steps": [{"do": "triangulate"}, {"do": "subdivide", "relative": 0.01}]})
    results: list[dict[str, Any]] = []
    outputs = [tmp_path / f"{i}.ply" for i in range(4)]

    def run(output: Path, threads: int) -> None:
        results.append(_modeling.run_recipe(recipe, [source], output, threads=threads))

    threads = [threading.Thread(target=run, args=(output, i % 3)) for i, output in enumerate(outputs)]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()
    assert len(results) == 4 and all(result["exitCode"] == 0 for result in results)
    assert len({output.read_bytes() for output in outputs}) == 1
    with pytest.raises(_modeling.RunError, match="exists") as caught:
        _modeling.run_recipe(recipe, [source], outputs[0])
    assert caught.value.exit_code == 3 and caught.value.report["command"] == "run"
    with pytest.raises(_modeling.RunError, match="/dev/stdout cannot be written: it is a stream"):
        _modeling.run_recipe(recipe, [source], "/dev/stdout", format="ply")
    limited = recipe.replace("0.01", '0.00001, "max-memory": "1kB"')
    with pytest.raises(_modeling.RunError) as caught:
        _modeling.run_recipe(limited, [source], tmp_path / "never.ply")
    assert caught.value.exit_code == 7 and not (tmp_path / "never.ply").exists()
    run(tmp_path / "after.ply", 1)  # the limit does not cancel later runs
    assert capfd.readouterr() == ("", "")


def test_interrupt_ends_a_run_of_the_module(tmp_path: Path) -> None:
    source = pyramid(tmp_path / "a.obj")
    recipe = json.dumps({"modeling": 1, "steps": [{"do": "triangulate"}, {"do": "subdivide", "relative": 0.0002}]})
    timer = threading.Timer(0.3, signal.raise_signal, [signal.SIGINT])
    timer.start()
    start = time.monotonic()
    with pytest.raises(KeyboardInterrupt):
        _modeling.run_recipe(recipe, [source], tmp_path / "a.ply", threads=1)
    assert os.listdir(tmp_path) == ["a.obj"] and time.monotonic() - start < 30
    _modeling.run_recipe(recipe.replace("0.0002", "0.1"), [source], tmp_path / "a.ply")


def test_types() -> None:
    package = os.path.dirname(modeling.__file__)
    options = ["--strict", "--follow-imports=skip", "--cache-dir", os.devnull]
    result = subprocess.run(
        [sys.executable, "-m", "mypy", *options, "-p", "modeling.batch"],
        capture_output=True,
        text=True,
        env={**os.environ, "MYPYPATH": os.path.dirname(package)},
    )
    assert result.returncode == 0, result.stdout + result.stderr


def test_outputs_stay_in_their_folder_and_replace_only_files(batch: Batch, tmp_path: Path) -> None:
    pyramid(tmp_path / "a" / "b" / "p.obj")
    pyramid(tmp_path / "data" / "q.obj")
    assert main(["recipe.json", "*/../../*/data/*.obj", "--out", "out"]) == 2
    (tmp_path / "out").mkdir(exist_ok=True)
    os.mkfifo(tmp_path / "out" / "q.ply")
    status, statuses = batch("data")
    assert status == 1 and list(statuses.values()) == ["failed"]
