"""Runs rows of the benchmark program, and whole jobs, each in a process of its own."""

from __future__ import annotations

import dataclasses
import json
import os
import re
import subprocess
import sys
import time
from collections.abc import Iterable
from pathlib import Path

UNITS = {"ns": 1e-9, "us": 1e-6, "ms": 1e-3, "s": 1.0}


@dataclasses.dataclass(frozen=True, order=True)
class Row:
    """A row of the program: "<operation>/<size>" or "<operation>:<contender>/<size>"."""

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
    is_fresh: bool  # one iteration in a new process, which includes the first use of memory

    def __str__(self) -> str:
        return f"{self.threads} thread{'s' if self.threads != 1 else ''}{', fresh' if self.is_fresh else ''}"


@dataclasses.dataclass
class Sample:
    seconds: float
    per_element: float | None  # seconds
    working_bytes: float | None  # per element


def run_process(command: list[str], threads: int) -> tuple[str, float, int]:
    """Output, wall time in seconds and peak memory in bytes of a process that sees that many processors."""
    cores = ",".join(str(core) for core in sorted(os.sched_getaffinity(0))[:threads])
    start = time.perf_counter()
    with subprocess.Popen(["taskset", "-c", cores, *command], stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True) as process:
        assert process.stdout
        output = process.stdout.read()
        _, status, usage = os.wait4(process.pid, 0)
        process.returncode = os.waitstatus_to_exitcode(status)
    if process.returncode != 0:
        sys.exit(f"{' '.join(command)} failed with exit code {process.returncode}")
    return output, time.perf_counter() - start, usage.ru_maxrss * 1024


class Program:
    """A build of the benchmark program."""

    def __init__(self, path: Path, warm_seconds: float) -> None:
        self.path = path
        self.warm_seconds = warm_seconds

    def rows(self, pattern: str) -> list[Row]:
        listing = subprocess.run([self.path, "--benchmark_list_tests"], check=True, capture_output=True, text=True).stdout
        return [row for row in map(Row.parse, listing.split("\n")) if row.name and re.search(pattern, row.name.removesuffix("/real_time"))]

    def measure(self, row: Row, setting: Setting) -> Sample:
        escaped = re.sub(r"([][().*+?^$|\\{}])", r"\\\1", row.name)  # re.escape() also escapes what other engines refuse
        seconds = 1e-9 if setting.is_fresh else self.warm_seconds
        options = [f"--benchmark_filter=^{escaped}$", "--benchmark_format=json", f"--benchmark_min_time={seconds}"]
        output, _, _ = run_process([str(self.path), *options], setting.threads)
        [run] = json.loads(output)["benchmarks"]
        return Sample(run["real_time"] * UNITS[run["time_unit"]], run.get("time/element"), run.get("working bytes/element"))


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
    return Sample(
        min(s.seconds for s in samples),
        None if samples[0].per_element is None else min(s.per_element or 0 for s in samples),
        samples[0].working_bytes,
    )


def groups_of(rows: list[Row]) -> list[list[Row]]:
    """The rows that are compared with each other: same operation, same size; the library first."""
    groups: dict[tuple[str, str], list[Row]] = {}
    for row in rows:
        groups.setdefault((row.operation, row.size), []).append(row)
    return [sorted(group, key=lambda row: row.contender) for group in groups.values()]
