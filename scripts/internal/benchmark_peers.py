"""Runs the rows of the benchmark programs beside their peers, and whole jobs on files, and writes a document with a plot.

An interrupted run continues where it stopped, unless a program has changed since.
"""

from __future__ import annotations

import argparse
import dataclasses
import os
import sys
from pathlib import Path

from benchmark_jobs import measure_jobs
from benchmark_report import (
    INTRODUCTION, OPERATIONS, OWN, THREADS, Results, describe_machine, details, draw, overview, quote, threads_table,
)
from benchmark_runs import Program, Record, Row, Sample, Setting, count_of, groups_of, in_turns, least

LONG_ENOUGH = 15.0  # seconds: a row that has taken so long in one setting is not measured again
TOLERANCE = {"result": 1e-4, "similar_result": 0.2}  # how far results may be apart, as fractions


def check_results(group: list[Row], samples: dict[Row, Sample]) -> None:
    """Compares what the contenders got with what the library got."""
    own = next((row for row in group if row in samples and not row.contender), None)
    for row in group:
        for kind, tolerance in TOLERANCE.items():
            value = getattr(samples[row], kind) if row in samples else None
            expected = getattr(samples[own], kind) if own else None
            if value is not None and expected is not None and not abs(value - expected) <= tolerance * abs(expected):
                sys.exit(f"{row.name}: the {kind.replace('_', ' ')} is {value}, that of the library is {expected}")


def measure_rows(programs: dict[Row, Program], settings: list[Setting], rounds: int, record: Record) -> Results:
    samples: dict[tuple[Row, Setting], list[Sample]] = {}
    spent: dict[tuple[Row, Setting], float] = {}
    fresh: dict[Row, Sample] = {}
    groups = groups_of(programs)
    group_of = {row: group for group in groups for row in group}
    for turn, row in in_turns(rounds, groups):
        for setting in settings:
            if spent.get((row, setting), 0) < LONG_ENOUGH:
                run = record.get(
                    [row.name, str(setting), turn], lambda: dataclasses.asdict(programs[row].measure(row, setting))
                )
                samples.setdefault((row, setting), []).append(Sample(**run))
                spent[row, setting] = spent.get((row, setting), 0) + run["process_seconds"]
                if setting.is_fresh and row not in fresh:
                    fresh[row] = samples[row, setting][0]
                    check_results(group_of[row], fresh)
    return {key: least(values) for key, values in samples.items()}


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("programs", type=Path, help="the folder of the built programs")
    parser.add_argument("output", type=Path, help="the document; the plot goes beside it")
    parser.add_argument("--filter", help="of rows; by default those of operations, and whole jobs")
    parser.add_argument("--rounds", type=int, default=3)
    parser.add_argument("--seconds", type=float, default=0.05, help="how long each warm run takes at least")
    parser.add_argument("--peers", action="store_true", help="measure the programs of peers too")
    parser.add_argument("--quote", type=Path, help="a document with lines of the overview, which are replaced")
    parser.add_argument("--packages", nargs="*", default=[], help="whose versions are told")
    options = parser.parse_args()
    processors = len(os.sched_getaffinity(0))
    threads = sorted({1, processors})
    settings = [*(Setting(count, is_fresh=False) for count in threads), Setting(processors, is_fresh=True)]
    warm = settings[len(threads) - 1]
    is_whole = options.filter is None

    peers = sorted(options.programs.glob("modelingPeer-*")) if options.peers else []
    peer_jobs = sorted(options.programs.glob("modelingJobs-*")) if options.peers else []
    programs = [Program(path, options.seconds) for path in [options.programs / "modelingBenchmarks", *peers]]
    by_row = {row: program for program in programs for row in program.rows(options.filter or "")}
    if is_whole:
        by_row = {row: program for row, program in by_row.items() if row.operation in OPERATIONS}
    files = [*(program.path for program in programs), options.programs / "modeling", *peer_jobs]
    record = Record(options.programs.parent / "runs.jsonl", files, f"{options.seconds} s")

    results = measure_rows(by_row, settings, options.rounds, record)
    own = (OWN, options.programs / "modeling")
    jobs = list(measure_jobs(own, peer_jobs, options.rounds, threads, record)) if is_whole else []
    plot = options.output.with_suffix(".svg")
    summary = list(overview(results, settings, warm))
    machine, rounds = describe_machine(processors, options.packages), count_of(options.rounds, "round")
    lines = [INTRODUCTION.format(machine=machine, rounds=rounds, seconds=options.seconds)]
    lines += [] if is_whole else ["This run is not a whole one: rows and jobs were left out.\n"]
    lines += ["## Overview\n", *summary]
    if jobs:
        lines += ["\n## Whole jobs\n", "Binary PLY in, binary PLY out: a process from its start to its end.\n", *jobs]
    if warm.threads > 1:
        lines += [THREADS.format(threads=warm), *threads_table(results, settings, warm)]
    lines += ["\n## Operations"]
    if draw(results, warm, plot):
        lines += [f"\n![Time per element against size, warm, with all threads]({plot.name})"]
    options.output.write_text("\n".join([*lines, *details(results, settings, warm)]) + "\n", encoding="utf-8")
    if is_whole:
        if options.quote:
            quote(summary, options.quote)
        record.close()


if __name__ == "__main__":
    try:
        main()
    except KeyboardInterrupt:
        sys.exit("\nstopped; the same command continues here")
