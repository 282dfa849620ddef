"""Runs rows of the benchmark programs, and whole jobs, each in a process of its own."""

from __future__ import annotations

import dataclasses
import json
import os
import re
import shlex
import subprocess
import sys
import tempfile
import time
from collections.abc import Callable, Iterable
from pathlib import Path

ENVIRONMENT = {**os.environ, "VTK_SMP_BACKEND_IN_USE": "TBB"}  # else VTK uses one thread
UNITS = {"ns": 1e-9, "us": 1e-6, "ms": 1e-3, "s": 1.0}


@dataclasses.dataclass(frozen=True, order=True)
class Row:
    """A row of a program: "<operation>/<size>" or "<operation>:<contender>/<size>"."""

    operation: str
    size: str
    contender: str  # "" is the library
    name: str  # for the program

    @staticmethod
    def parse(name: str) -> Row:
        label, _, size = name.removesuffix("/real_time").partition("/")
        operation, _, contender = label.partition(":")
        return Row(operation, size, contender, name)


@dataclasses.dataclass(frozen=True)
class Setting:
    threads: int
    is_fresh: bool  # the only iteration in a new process, which includes the first use of memory

    def __str__(self) -> str:
        return f"{'fresh, ' if self.is_fresh else ''}{count_of(self.threads, 'thread')}"


@dataclasses.dataclass
class Sample:
    seconds: float
    per_element: float | None = None  # seconds
    peak_bytes: float | None = None  # per element, beyond the input; only of fresh runs
    working_bytes: float | None = None  # per element, beyond the result
    result: float | None = None  # the same for all contenders
    similar_result: float | None = None
    busy_threads: float | None = None  # in the median run; of short ones, on average
    process_seconds: float = 0  # of the whole process


def count_of(number: int, noun: str) -> str:
    return f"{number} {noun}{'s' if number != 1 else ''}"


def run_process(command: list[str], threads: int) -> tuple[str, float, int]:
    """Output, wall time in seconds and peak memory in bytes of a process that sees that many processors."""
    cores = ",".join(str(core) for core in sorted(os.sched_getaffinity(0))[:threads])
    command = ["taskset", "-c", cores, *command]
    start = time.perf_counter()
    with tempfile.TemporaryFile("w+") as errors, subprocess.Popen(
        command, stdout=subprocess.PIPE, stderr=errors, text=True, env=ENVIRONMENT
    ) as process:
        assert process.stdout
        output = process.stdout.read()
        _, status, usage = os.wait4(process.pid, 0)
        seconds = time.perf_counter() - start
        process.returncode = os.waitstatus_to_exitcode(status)
        if process.returncode != 0:
            errors.seek(0)
            sys.exit(f"{shlex.join(command)} failed with exit code {process.returncode}: {errors.read().strip()[-500:]}")
    return output, seconds, usage.ru_maxrss * 1024


class Program:
    """A build of a benchmark program."""

    def __init__(self, path: Path, warm_seconds: float) -> None:
        self.path = path
        self.warm_seconds = warm_seconds

    def rows(self, pattern: str) -> list[Row]:
        listing = subprocess.run([self.path, "--benchmark_list_tests"], check=True, capture_output=True, text=True).stdout
        return [row for row in map(Row.parse, listing.split("\n")) if row.name and re.search(pattern, row.name.removesuffix("/real_time"))]

    def measure(self, row: Row, setting: Setting) -> Sample:
        escaped = re.sub(r"([][().*+?^$|\\{}])", r"\\\1", row.name)  # re.escape() also escapes what other engines refuse
        options = [f"--benchmark_filter=^{escaped}$", "--benchmark_format=json"]
        if setting.is_fresh:
            options += ["--benchmark_min_time=1e-9"]
        else:  # one iteration first that is not measured
            options += [f"--benchmark_min_time={self.warm_seconds}", "--benchmark_min_warmup_time=1e-9"]
        output, process_seconds, _ = run_process([str(self.path), *options], setting.threads)
        [run] = json.loads(output)["benchmarks"]
        if run.get("error_occurred"):
            sys.exit(f"{row.name} failed: {run['error_message']}")
        return Sample(
            run["real_time"] * UNITS[run["time_unit"]],
            run.get("time/element"),
            run.get("peak bytes/element"),
            run.get("working bytes/element"),
            run.get("result"),
            run.get("similar result"),
            run.get("busy threads"),
            process_seconds,
        )


class Record:
    """Keeps what has been measured in a file, so that a run that was interrupted continues where it stopped.

    A record of other programs or options is dropped.
    """

    def __init__(self, path: Path, programs: Iterable[Path], options: str) -> None:
        self.path = path
        about = [options, *(f"{program} {program.stat().st_size} {program.stat().st_mtime_ns}" for program in programs)]
        lines = path.read_text().splitlines() if path.exists() else []
        complete = [line for line in lines if line.endswith("]")]
        self.known: dict[str, dict[str, float]] = {}
        if complete and json.loads(complete[0]) == about:
            self.known = {json.dumps(key): value for key, value in map(json.loads, complete[1:])}
            print(f"continuing with {count_of(len(self.known), 'run')} of {path}", file=sys.stderr)
            path.write_text("".join(f"{line}\n" for line in complete))
        else:
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_text(f"{json.dumps(about)}\n")

    def get(self, key: list[object], measure: Callable[[], dict[str, float]]) -> dict[str, float]:
        text = json.dumps(key)
        if text not in self.known:
            self.known[text] = measure()
            with self.path.open("a") as file:
                print(json.dumps([key, self.known[text]]), file=file)
        return self.known[text]

    def close(self) -> None:
        """The next run starts anew."""
        self.path.unlink()


def in_turns(rounds: int, groups: Iterable[list[Row]]) -> Iterable[tuple[int, Row]]:
    """The rows of each group one after the other, in the other direction every other time: nobody always runs first."""
    groups = list(groups)
    for turn in range(rounds):
        for number, group in enumerate(groups):
            show_progress(turn * len(groups) + number, rounds * len(groups), group[0])
            for row in group if turn % 2 == 0 else reversed(group):
                yield turn, row
    show_progress(1, 1, None)


def show_progress(done: int, total: int, row: Row | None) -> None:
    if sys.stderr.isatty():
        print(f"\r\033[K{done} of {total}: {row.operation}/{row.size}" if row else "\r\033[K", end="", file=sys.stderr, flush=True)


def least(samples: list[Sample]) -> Sample:
    """The fastest one; what does not vary in time is the same in all. Of the busy threads, the most: whatever interrupts a run
    makes threads wait that would not wait otherwise."""
    busy = [sample.busy_threads for sample in samples if sample.busy_threads]
    return dataclasses.replace(min(samples, key=lambda sample: sample.seconds), busy_threads=max(busy, default=None))


def groups_of(rows: Iterable[Row]) -> list[list[Row]]:
    """The rows that are compared with each other: same operation, same size; the library first."""
    groups: dict[tuple[str, str], list[Row]] = {}
    for row in rows:
        groups.setdefault((row.operation, row.size), []).append(row)
    return [sorted(group, key=lambda row: row.contender) for group in groups.values()]
