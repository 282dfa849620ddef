"""modeling.batch on Dask workers: those that it starts, and those of a scheduler on the loopback address."""

import json
import os
import signal
import subprocess
import sys
import time
from pathlib import Path
from typing import Any, Callable, Iterator

import pytest
from distributed import Client

FILES = 300


class Processes:
    """Processes that end with the test."""

    def __init__(self, folder: Path) -> None:
        self._folder = folder
        self._all: list[subprocess.Popen[bytes]] = []

    def start(self, *arguments: str) -> subprocess.Popen[bytes]:
        log = open(self._folder / f"{len(self._all)}.log", "wb")
        process = subprocess.Popen([sys.executable, *arguments], stdout=log, stderr=log, cwd=self._folder)
        self._all.append(process)
        return process

    def start_worker(self, address: str) -> subprocess.Popen[bytes]:
        options = ["--nthreads", "1", "--no-nanny", "--no-dashboard", "--memory-limit", "0"]
        return self.start("-m", "distributed.cli.dask_worker", address, *options, "--death-timeout", "60")

    def start_scheduler(self) -> str:
        file = self._folder / "scheduler.json"
        options = ["--host", "127.0.0.1", "--port", "0", "--no-dashboard", "--scheduler-file", str(file)]
        self.start("-m", "distributed.cli.dask_scheduler", *options)
        wait_until(file.exists)
        time.sleep(0.1)  # it is written in place
        return str(json.loads(file.read_text())["address"])

    def end(self) -> None:
        for process in self._all:
            process.kill()
            process.wait()


def wait_until(condition: Callable[[], bool], seconds: float = 60) -> None:
    end = time.monotonic() + seconds
    while not condition():
        assert time.monotonic() < end
        time.sleep(0.01)


@pytest.fixture
def processes(tmp_path: Path) -> Iterator[Processes]:
    (tmp_path / "processes").mkdir()
    processes = Processes(tmp_path / "processes")
    yield processes
    processes.end()


@pytest.fixture
def folder(tmp_path: Path) -> Path:
    """A folder with a recipe and many different closed meshes, the last of which is broken."""
    steps = [{"do": "triangulate"}, {"do": "subdivide", "relative": 0.1}]
    (tmp_path / "recipe.json").write_text(json.dumps({"modeling": 1, "steps": steps, "output": {"format": "ply"}}))
    (tmp_path / "in").mkdir()
    for i in range(FILES - 1):
        points = f"v 0 0 0\nv 2 0 0\nv 2 2 0\nv 0 2 0\nv 1 1 {1 + i / FILES}\n"
        (tmp_path / f"in/{i:03}.obj").write_text(points + "f 1 4 3 2\nf 1 2 5\nf 2 3 5\nf 3 4 5\nf 4 1 5\n")
    (tmp_path / f"in/{FILES - 1}.obj").write_text("v 0 0 zero\n")
    return tmp_path


def batch(folder: Path, out: str, *options: str, python_path: str = "") -> "subprocess.Popen[str]":
    """Starts a batch in a process group of its own, as a terminal does."""
    command = [sys.executable, "-m", "modeling.batch", "recipe.json", "in", "--out", out, *options]
    pipe = subprocess.PIPE
    environment = {**os.environ, "PYTHONPATH": python_path + os.pathsep + os.environ["PYTHONPATH"]}
    return subprocess.Popen(
        command, cwd=folder, stdout=pipe, stderr=pipe, text=True, env=environment, start_new_session=True
    )


def results(folder: Path, out: str) -> dict[str, bytes]:
    return {path.name: path.read_bytes() for path in (folder / out).glob("*.ply")}


def count(folder: Path, out: str) -> int:
    return len(list((folder / out).glob("*.ply")))


def summary(folder: Path, out: str) -> dict[str, Any]:
    return dict(json.loads((folder / out / "report.json").read_text())["summary"])


def test_workers_give_the_same_bytes_though_one_is_killed(folder: Path, processes: Processes) -> None:
    address = processes.start_scheduler()
    victim, other = processes.start_worker(address), processes.start_worker(address)
    with Client(address) as client:
        client.wait_for_workers(2, timeout=60)
    alone = batch(folder, "alone", "--in-process")
    process = batch(folder, "workers", "--scheduler", address)
    wait_until(lambda: count(folder, "workers") >= FILES // 3)
    os.kill(victim.pid, signal.SIGKILL)
    victim.wait()
    assert count(folder, "workers") < FILES - 10 and process.poll() is None
    output, error = process.communicate(timeout=120)
    assert process.returncode == 1, error
    assert "Traceback" not in error
    assert summary(folder, "workers") == {"files": FILES, "done": FILES - 1, "current": 0, "failed": 1, "open": 0}
    row = next(line for line in output.splitlines() if line.startswith(f"{FILES - 1}.ply"))
    assert 'line 1: "zero" is not a valid number' in row
    assert other.poll() is None
    alone.communicate(timeout=120)
    expected = results(folder, "alone")
    assert len(expected) == FILES - 1 and results(folder, "workers") == expected
    assert sorted(os.listdir(folder / "workers")) == sorted([*expected, "report.json"])

    # The last worker dies too: the batch ends and says so, and the next one does the rest.
    other.kill()
    other.wait()
    for name in ("000.ply", "001.ply"):
        (folder / "workers" / name).unlink()
    process = batch(folder, "workers", "--scheduler", address, "--wait", "1")
    error = process.communicate(timeout=60)[1]
    assert process.returncode == 3 and "has no workers" in error
    process = batch(folder, "workers", "--workers", "2", "--quiet")
    error = process.communicate(timeout=60)[1]
    assert process.returncode == 1, error
    assert summary(folder, "workers") == {"files": FILES, "done": 2, "current": FILES - 3, "failed": 1, "open": 0}
    assert results(folder, "workers") == expected


def test_says_if_there_is_no_scheduler(folder: Path) -> None:
    process = batch(folder, "out", "--scheduler", "tcp://127.0.0.1:9", "--wait", "1")
    error = process.communicate(timeout=60)[1]
    assert process.returncode == 3 and "there is no scheduler at tcp://127.0.0.1:9" in error
    assert "Traceback" not in error
    assert summary(folder, "out")["open"] == FILES


def test_a_file_that_ends_its_workers_does_not_stop_the_others(folder: Path) -> None:
    for i in range(20, FILES):
        (folder / f"in/{i:03}.obj").unlink()
    (folder / "sitecustomize.py").write_text(
        "import os\n"
        "from modeling.batch import work\n"
        "run = work._modeling.run_recipe\n"
        "def run_or_die(recipe, inputs, *rest, **options):\n"
        "    os.path.basename(inputs[0]) == '003.obj' and os.kill(os.getpid(), 9)\n"
        "    return run(recipe, inputs, *rest, **options)\n"
        "work._modeling.run_recipe = run_or_die\n"
    )
    process = batch(folder, "out", "--workers", "2", python_path=str(folder))
    output, error = process.communicate(timeout=120)
    assert process.returncode == 1 and "Traceback" not in error, error
    assert summary(folder, "out") == {"files": 20, "done": 19, "current": 0, "failed": 1, "open": 0}
    row = next(line for line in output.splitlines() if line.startswith("003.ply"))
    assert "each worker process that ran it died" in row


def test_interrupt_ends_the_workers(folder: Path) -> None:
    process = batch(folder, "out", "--workers", "2", "--quiet")
    wait_until(lambda: count(folder, "out") > 10)
    os.killpg(process.pid, signal.SIGINT)
    error = process.communicate(timeout=60)[1]
    assert process.returncode == 6, error
    assert error == "modeling.batch: cancelled; finished files are kept, and the next run does the others\n"
    wait_until(lambda: not group_exists(process.pid))
    after = summary(folder, "out")
    assert after["done"] > 0 and after["open"] > 0 and after["failed"] == 0


def group_exists(group: int) -> bool:
    try:
        os.killpg(group, 0)
    except ProcessLookupError:
        return False
    return True
