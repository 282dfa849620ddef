"""Runs all rows of the benchmark program beside their peers, and whole jobs on files, and writes docs/benchmarks.md with plots."""

from __future__ import annotations

import argparse
import dataclasses
import math
import os
import platform
import statistics
import subprocess
import sys
import tempfile
from collections.abc import Callable, Iterator
from pathlib import Path

import numpy as np
from benchmark_runs import Program, Row, Sample, Setting, groups_of, in_turns, least, run_process

OWN = "here"


@dataclasses.dataclass(frozen=True)
class Job:
    """A whole job: a process that reads a file, works and writes another."""

    name: str  # also for the programs of peers
    corners: int  # of each face of the model
    faces: int
    arguments: Callable[[str, str], list[str]]  # of `modeling`, from input and output


JOBS = [
    Job("triangulate quads", 4, 1_000_000, lambda source, result: ["triangulate", source, result]),
    Job("merge a mesh with itself", 3, 1_000_000, lambda source, result: ["merge", source, source, "-o", result]),
    # Makes about as many faces as two uniform steps of a peer: nine times as many.
    Job("two √3 steps", 3, 200_000, lambda source, result: ["subdivide", "--relative", "0.0007", source, result]),
]

INTRODUCTION = """# Benchmarks

Written by `scripts/benchmark --peers`, which installs the peers and measures everything in one go; run it on your machine to
repeat it. {machine}

Each figure is the least of {rounds} rounds. In each round every contender runs in a process of its own, in turns. "Warm" repeats
the work in one process for {seconds} s or more, so that memory is there already; "fresh" is the first and only run of a process.
Peers are single-threaded unless they say otherwise; the source of each row in [benchmarks](../benchmarks) says what a peer leaves
out. `memcpy` copies the bytes of the input into fresh memory on one thread; "flat" columns are loops over plain arrays, without
objects and checks. All times are per element in nanoseconds, unless they say ms. Working memory is what is allocated beyond the
result, in bytes per element. Columns of contenders say how long they take in terms of the library, warm and with all threads: above
1 the library is faster.
"""


def sizes_of(row: Row) -> str:
    return " × ".join(f"{int(part):,}" if part.isdigit() else part for part in row.size.split("/")) or "-"


def describe_machine(settings: list[Setting]) -> str:
    model = next((line.split(":", 1)[1].strip() for line in Path("/proc/cpuinfo").open() if line.startswith("model name")), "")
    compiler = subprocess.run(["g++", "--version"], capture_output=True, text=True, check=True).stdout.splitlines()[0]
    return f"{model or platform.processor()}, {max(s.threads for s in settings)} processors, {platform.system()}, {compiler}."


def versions_of(packages: list[str]) -> str:
    if not packages:
        return "no peers"
    listing = subprocess.run(["dpkg-query", "-W", "-f=${Package} ${Version}\\n", *packages], capture_output=True, text=True).stdout
    return ", ".join(line for line in listing.splitlines() if not line.endswith(" "))


def nanoseconds(sample: Sample) -> str:
    """Per element if the row has elements."""
    if sample.per_element is None:
        return f"{sample.seconds * 1e3:.3g} ms"
    time = sample.per_element * 1e9
    return f"{time:,.0f}" if time >= 100 else f"{time:.2g}" if time < 10 else f"{time:.3g}"


Samples = dict[tuple[Row, Setting], list[Sample]]


def measure_rows(program: Program, pattern: str, settings: list[Setting], rounds: int) -> Samples:
    samples: Samples = {}
    for _, row in in_turns(rounds, groups_of(program.rows(pattern))):
        for setting in settings:
            samples.setdefault((row, setting), []).append(program.measure(row, setting))
    return samples


def tables(results: dict[tuple[Row, Setting], Sample], settings: list[Setting]) -> Iterator[str]:
    """A table per operation: a line per size, with the contenders as ratios."""
    all_rows = sorted({row for row, _ in results}, key=lambda row: row.operation)
    warm = max((s for s in settings if not s.is_fresh), key=lambda s: s.threads)
    fresh = next(s for s in settings if s.is_fresh)
    for operation in dict.fromkeys(row.operation for row in all_rows):
        groups = groups_of([row for row in program_order(results) if row.operation == operation])
        contenders = sorted({row.contender for group in groups for row in group if row.contender})
        yield f"\n### {operation}\n"
        columns = ["size", *(f"ns, {s}" for s in settings), "working bytes", *contenders]
        yield f"| {' | '.join(columns)} |"
        yield f"|{' --- |' * len(columns)}"
        for group in groups:
            by_contender = {row.contender: row for row in group}
            own = by_contender.get("")
            cells = [sizes_of(group[0])]
            for setting in settings:
                cells.append(nanoseconds(results[own, setting]) if own else "")
            working = results[own, fresh].working_bytes if own else None
            cells.append(f"{working:.3g}" if working is not None else "")
            for name in contenders:
                row = by_contender.get(name)
                cells.append(f"{results[row, warm].seconds / results[own, warm].seconds:.2f}" if row and own else "")
            yield f"| {' | '.join(cells)} |"


def program_order(results: dict[tuple[Row, Setting], Sample]) -> list[Row]:
    return list(dict.fromkeys(row for row, _ in results))


def elements_of(sample: Sample) -> float | None:
    return sample.seconds / sample.per_element if sample.per_element else None


def draw(results: dict[tuple[Row, Setting], Sample], setting: Setting, path: Path) -> None:
    """Time per element against the number of elements, a small plot per operation."""
    import matplotlib

    matplotlib.use("svg")
    matplotlib.rcParams.update({"svg.hashsalt": "modeling", "font.size": 7, "lines.linewidth": 1, "lines.markersize": 2.5})
    from matplotlib import pyplot

    curves: dict[str, dict[str, list[tuple[float, float]]]] = {}
    for (row, measured), sample in results.items():
        elements = elements_of(sample)
        if measured == setting and elements and sample.per_element:
            points = curves.setdefault(row.operation, {}).setdefault(row.contender or OWN, [])
            points.append((elements, sample.per_element * 1e9))
    shown = {name: lines for name, lines in curves.items() if len(lines.get(OWN, [])) > 1}
    if not shown:
        return
    columns = 4
    figure, axes = pyplot.subplots(-(-len(shown) // columns), columns, figsize=(12, 2.3 * -(-len(shown) // columns)), squeeze=False)
    for plot in axes.flat[len(shown) :]:
        plot.remove()
    for plot, (operation, lines) in zip(axes.flat, shown.items()):
        for contender, points in sorted(lines.items(), key=lambda line: line[0] != OWN):
            style = {"color": "black", "linewidth": 1.8} if contender == OWN else {}
            plot.loglog(*zip(*sorted(points)), marker="o", label=contender, **style)
        plot.set_title(operation, fontsize=8)
        plot.legend(fontsize=6, frameon=False)
        plot.grid(alpha=0.2)
    figure.supxlabel("elements")
    figure.supylabel("ns per element")
    figure.tight_layout()
    path.parent.mkdir(parents=True, exist_ok=True)
    figure.savefig(path, metadata={"Date": None})


# -- Whole jobs


def write_torus(job: Job, path: Path) -> None:
    """A binary PLY file with a torus of quads that are not planar, or of triangles."""
    n = math.isqrt(job.faces // (5 - job.corners))
    i, j = np.meshgrid(np.arange(n), np.arange(n), indexing="ij")
    u, v = 2 * np.pi * i / n, 2 * np.pi * j / n
    radius = 3 + np.cos(v) + np.random.default_rng(1).normal(0, 0.1 / n, u.shape)
    points = np.stack([radius * np.cos(u), radius * np.sin(u), np.sin(v)], -1).reshape(-1, 3).astype("<f4")
    a, b, c, d = (((i + di) % n * n + (j + dj) % n).ravel() for di, dj in ((0, 0), (1, 0), (1, 1), (0, 1)))
    corners = np.stack([a, b, c, d] if job.corners == 4 else [a, b, c, a, c, d], -1).reshape(-1, job.corners)
    faces = np.empty(len(corners), dtype=[("count", "u1"), ("corners", "<i4", job.corners)])
    faces["count"], faces["corners"] = job.corners, corners
    header = (
        f"ply\nformat binary_little_endian 1.0\nelement vertex {len(points)}\nproperty float x\nproperty float y\n"
        f"property float z\nelement face {len(faces)}\nproperty list uchar int vertex_indices\nend_header\n"
    )
    path.write_bytes(header.encode() + points.tobytes() + faces.tobytes())


Command = Callable[[str, str], list[str]]


def job_contenders(job: Job, programs: Path) -> dict[str, Command]:
    """The command of each contender from the input and the output."""
    commands: dict[str, Command] = {OWN: lambda *files: [str(programs / "modeling"), *job.arguments(*files), "--quiet"]}
    for peer in sorted(programs.glob("modelingJobs-*")):
        known = subprocess.run([peer, "--list"], capture_output=True, text=True, check=True).stdout.split("\n")
        if job.name in known:
            commands[peer.name.partition("-")[2]] = lambda *files, peer=peer: [str(peer), job.name, *files]
    return commands


def measure_job(job: Job, programs: Path, rounds: int, threads: list[int], folder: Path) -> Iterator[str]:
    source, result = folder / "in.ply", folder / "out.ply"
    write_torus(job, source)
    contenders = job_contenders(job, programs)
    times: dict[tuple[str, int], list[float]] = {}
    peaks: dict[str, list[int]] = {}
    for turn in range(rounds):
        for name in contenders if turn % 2 == 0 else reversed(contenders):
            for count in threads:
                result.unlink(missing_ok=True)
                _, seconds, peak = run_process(contenders[name](str(source), str(result)), count)
                if not result.exists():
                    sys.exit(f"{name} wrote nothing for {job.name}")
                times.setdefault((name, count), []).append(seconds)
                peaks.setdefault(name, []).append(peak)
    for name in contenders:
        cells = [f"{min(times[name, count]):.3g}" for count in threads]
        yield f"| {job.name}, {job.faces:,} faces | {name} | {' | '.join(cells)} | {statistics.median(peaks[name]) / 1e6:.0f} |"


def measure_jobs(programs: Path, rounds: int, threads: list[int]) -> Iterator[str]:
    headings = [f"s, {count} thread{'s' if count != 1 else ''}" for count in threads]
    yield f"| job | contender | {' | '.join(headings)} | peak MB |"
    yield f"|{' --- |' * (3 + len(threads))}"
    with tempfile.TemporaryDirectory() as folder:
        for job in JOBS:
            yield from measure_job(job, programs, rounds, threads, Path(folder))


def main() -> None:
    parser = argparse.ArgumentParser()
    parser.add_argument("programs", type=Path, help="the folder of the built programs")
    parser.add_argument("output", type=Path, help="the document; the plot goes beside it")
    parser.add_argument("--filter", default="")
    parser.add_argument("--rounds", type=int, default=3)
    parser.add_argument("--seconds", type=float, default=0.2)
    parser.add_argument("--packages", nargs="*", default=[], help="whose versions are told")
    options = parser.parse_args()
    processors = len(os.sched_getaffinity(0))
    threads = sorted({1, processors})
    settings = [*(Setting(count, is_fresh=False) for count in threads), Setting(processors, is_fresh=True)]

    program = Program(options.programs / "modelingBenchmarks", options.seconds)
    samples = measure_rows(program, options.filter, settings, options.rounds)
    results = {key: least(values) for key, values in samples.items()}
    plot = options.output.with_suffix(".svg")
    draw(results, max((s for s in settings if not s.is_fresh), key=lambda s: s.threads), plot)
    machine = f"{describe_machine(settings)} {versions_of(options.packages)}."
    with options.output.open("w", encoding="utf-8") as document:
        print(INTRODUCTION.format(machine=machine, rounds=options.rounds, seconds=options.seconds), file=document)
        print("## Whole jobs\n\nBinary PLY in, binary PLY out, a process from its start to its end.\n", file=document)
        print("\n".join(measure_jobs(options.programs, options.rounds, threads)), file=document)
        print(f"\n## Operations\n\n![Time per element against size]({plot.name})", file=document)
        print("\n".join(tables(results, settings)), file=document)


if __name__ == "__main__":
    main()
