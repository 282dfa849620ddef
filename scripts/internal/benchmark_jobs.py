"""Whole jobs: a process reads a file, works and writes another one."""

from __future__ import annotations

import dataclasses
import math
import multiprocessing
import statistics
import subprocess
import sys
import tempfile
from collections.abc import Callable, Iterator
from pathlib import Path

from benchmark_runs import Record, count_of, run_process

Command = Callable[[str, str], list[str]]  # from input and output


@dataclasses.dataclass(frozen=True)
class Job:
    name: str  # also for the programs of peers
    corners: int  # of each face of the model
    faces: int
    arguments: Command  # of `modeling`
    tolerance: float = 0  # how far the numbers of faces in the results may be apart, as a fraction


JOBS = [
    Job("triangulate quads", 4, 1_000_000, lambda source, result: ["triangulate", source, result]),
    Job("merge a mesh with itself", 3, 1_000_000, lambda source, result: ["merge", source, source, "-o", result]),
    # Faces split if they are too large for this tolerance, which makes about three times as many. Peers split all.
    Job("one √3 step", 3, 1_000_000, lambda source, result: ["subdivide", "--relative", "0.00059", source, result], 0.1),
]


def write_torus(job: Job, path: Path) -> None:
    """A binary PLY file with a torus of quads that are almost square but not planar, or of halves of them."""
    import numpy as np

    quads = job.faces // (5 - job.corners)
    sides = math.isqrt(quads // 3)
    rings = quads // sides
    i, j = np.meshgrid(np.arange(rings), np.arange(sides), indexing="ij")
    u, v = 2 * np.pi * i / rings, 2 * np.pi * j / sides
    radius = 3 + np.cos(v) + np.random.default_rng(1).normal(0, 0.1 / sides, u.shape)
    points = np.stack([radius * np.cos(u), radius * np.sin(u), np.sin(v)], -1).reshape(-1, 3).astype("<f4")
    a, b, c, d = (((i + di) % rings * sides + (j + dj) % sides).ravel() for di, dj in ((0, 0), (1, 0), (1, 1), (0, 1)))
    corners = np.stack([a, b, c, d] if job.corners == 4 else [a, b, c, a, c, d], -1).reshape(-1, job.corners)
    faces = np.empty(len(corners), dtype=[("count", "u1"), ("corners", "<i4", job.corners)])
    faces["count"], faces["corners"] = job.corners, corners
    header = (
        f"ply\nformat binary_little_endian 1.0\nelement vertex {len(points)}\nproperty float x\nproperty float y\n"
        f"property float z\nelement face {len(faces)}\nproperty list uchar int vertex_indices\nend_header\n"
    )
    path.write_bytes(header.encode() + points.tobytes() + faces.tobytes())


def face_count(path: Path) -> int:
    """As the header of a PLY file says."""
    with path.open("rb") as file:
        for line in file:
            if line.startswith(b"element face "):
                return int(line.split()[2])
            if line.startswith(b"end_header"):
                break
    sys.exit(f"{path} has no faces")


def contenders_of(job: Job, own: tuple[str, Path], peers: list[Path]) -> dict[str, Command]:
    """The library's name and program, and those of peers that know the job."""
    name, program = own
    commands: dict[str, Command] = {name: lambda *files: [str(program), *job.arguments(*files), "--quiet"]}
    for peer in peers:
        known = subprocess.run([peer, "--list"], capture_output=True, text=True, check=True).stdout.split("\n")
        if job.name in known:
            commands[peer.name.partition("-")[2]] = lambda *files, peer=peer: [str(peer), job.name, *files]
    return commands


def run_job(command: Command, threads: int, source: Path, result: Path) -> dict[str, float]:
    result.unlink(missing_ok=True)
    _, seconds, peak = run_process(command(str(source), str(result)), threads)
    if not result.exists():
        sys.exit(f"{' '.join(command(str(source), str(result)))} wrote nothing")
    return {"seconds": seconds, "peak": peak, "faces": face_count(result)}


def check_results(job: Job, runs: dict[str, list[dict[str, float]]], own: str) -> None:
    expected = runs[own][0]["faces"]
    for name, values in runs.items():
        if abs(values[0]["faces"] - expected) > job.tolerance * expected:
            sys.exit(f"{job.name}: the result of {name} has {values[0]['faces']:,} faces, that of the library {expected:,}")


def measure_job(job: Job, own: tuple[str, Path], peers: list[Path], rounds: int, threads: list[int], record: Record) -> Iterator[str]:
    """The lines of the table."""
    contenders = contenders_of(job, own, peers)
    runs: dict[str, list[dict[str, float]]] = {}
    times: dict[tuple[str, int], list[float]] = {}
    with tempfile.TemporaryDirectory() as folder:
        source, result = Path(folder, "in.ply"), Path(folder, "out.ply")
        # The peak memory of a process is at least the memory of the one that starts it, so that one has to stay small.
        writer = multiprocessing.get_context("fork").Process(target=write_torus, args=(job, source))
        writer.start()
        writer.join()
        for turn in range(rounds):
            for name in contenders if turn % 2 == 0 else reversed(contenders):
                for count in threads:
                    run = record.get([job.name, name, count, turn], lambda: run_job(contenders[name], count, source, result))
                    runs.setdefault(name, []).append(run)
                    times.setdefault((name, count), []).append(run["seconds"])
    check_results(job, runs, own[0])
    for name in contenders:
        cells = [f"{min(times[name, count]):.3g}" for count in threads]
        cells.append(f"{min(times[name, threads[-1]]) / min(times[own[0], threads[-1]]):.2f}")
        cells.append(f"{statistics.median(run['peak'] for run in runs[name]) / 1e6:,.0f}")
        cells.append(f"{runs[name][0]['faces']:,}")
        yield f"| {job.name}, {job.faces:,} faces | {name} | {' | '.join(cells)} |"


def measure_jobs(own: tuple[str, Path], peers: list[Path], rounds: int, threads: list[int], record: Record) -> Iterator[str]:
    headings = ["job", "by", *(f"s, {count_of(count, 'thread')}" for count in threads), "compared", "peak MB", "faces written"]
    yield f"| {' | '.join(headings)} |"
    yield f"|{' --- |' * len(headings)}"
    for job in JOBS:
        yield from measure_job(job, own, peers, rounds, threads, record)
