"""Compares two builds of the benchmark program row by row: benchmark_against.py OLD NEW [--filter REGEX] [--rounds N]

In each round the old program runs twice and the new one in between. What the old one differs from itself is noise; a row is
slower, or faster, if the new one differs by more than that and by more than three percent.
"""

from __future__ import annotations

import argparse
import math
import os
import statistics
import sys
from pathlib import Path

from benchmark_runs import Program, Row, Setting, count_of, in_turns

LEAST_CHANGE = 1.03
FLOORS = ("memcpy", "flat", "copy and fill")  # contenders that are not the library


def typical(ratios: list[float]) -> float:
    return math.exp(statistics.median(map(math.log, ratios)))


def noise_of(ratios: list[float]) -> float:
    """How far apart two runs of one program usually are, as a factor above 1: three in four are closer."""
    distances = sorted(abs(math.log(ratio)) for ratio in ratios)
    return math.exp(distances[math.ceil(0.75 * len(distances)) - 1])


def compare(old: Program, new: Program, rows: list[Row], threads: int, rounds: int) -> list[tuple[Row, float, float]]:
    """For each row the time of the new program divided by that of the old one, and the noise."""
    setting = Setting(threads, is_fresh=False)
    changes: dict[Row, list[float]] = {row: [] for row in rows}
    noises: dict[Row, list[float]] = {row: [] for row in rows}
    for _, row in in_turns(rounds, [[row] for row in rows]):
        before, between, after = (program.measure(row, setting).seconds for program in (old, new, old))
        changes[row].append(between / math.sqrt(before * after))
        noises[row].append(after / before)
    return [(row, typical(changes[row]), noise_of(noises[row])) for row in rows]


def print_rows(title: str, rows: list[tuple[Row, float, float]]) -> None:
    print(f"\n{title}: {len(rows)}\n")
    if rows:
        print("| row | size | new / old | noise |\n| --- | --- | --- | --- |")
    for row, change, noise in rows:
        name = f"{row.operation}: {row.contender}" if row.contender else row.operation
        print(f"| {name} | {row.size.replace('/', ' × ')} | {change:.2f} | {noise:.2f} |")


def main() -> int:
    parser = argparse.ArgumentParser()
    parser.add_argument("old", type=Path)
    parser.add_argument("new", type=Path)
    parser.add_argument("--filter", default="")
    parser.add_argument("--rounds", type=int, default=5)
    parser.add_argument("--threads", type=int, default=len(os.sched_getaffinity(0)))
    parser.add_argument("--seconds", type=float, default=0.2, help="at least so long per run")
    options = parser.parse_args()
    old, new = Program(options.old, options.seconds), Program(options.new, options.seconds)
    known = {row.name for row in old.rows(options.filter)}
    here = new.rows(options.filter)
    rows = [row for row in here if row.name in known and not row.contender.startswith(FLOORS)]
    if not rows:
        sys.exit("no row that both revisions have matches the filter")
    compared = compare(old, new, rows, options.threads, options.rounds)
    # With many rows some exceed the noise by chance, so those that seem slower are measured once more.
    suspects = [row for row, change, noise in compared if change > max(LEAST_CHANGE, noise)]
    again = {row: (row, change, noise) for row, change, noise in compare(old, new, suspects, options.threads, 2 * options.rounds)}
    compared = [again.get(entry[0], entry) for entry in compared]
    slower = [entry for entry in compared if entry[1] > max(LEAST_CHANGE, entry[2])]
    faster = [entry for entry in compared if entry[1] < 1 / max(LEAST_CHANGE, entry[2])]
    print_rows("Slower", slower)
    print_rows("Faster", faster)
    print_rows("Within the noise", [entry for entry in compared if entry not in slower and entry not in faster])
    added = [row.name for row in here if row.name not in known]
    if added:
        print("\nOnly the new revision has:", ", ".join(added))
    print(f"\n{count_of(len(slower), 'row')} of {len(rows)} became slower")
    return 1 if slower else 0


if __name__ == "__main__":
    sys.exit(main())
