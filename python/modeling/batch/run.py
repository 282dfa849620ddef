"""Runs the jobs of a batch, in this process or on workers, and shows the progress."""

from __future__ import annotations

import os
import signal
import sys
from contextlib import contextmanager
from dataclasses import dataclass
from types import FrameType
from typing import Callable, Iterator

from rich.console import Console
from rich.progress import BarColumn, MofNCompleteColumn, Progress, TextColumn, TimeRemainingColumn

from .report import line_of
from .work import Entry, Job, Settings, run_job


@dataclass(frozen=True)
class Place:
    """Where jobs run."""

    scheduler: str = ""  # its address; empty for this machine
    workers: int = 0  # processes on this machine; 0 for one per core, or fewer if each job has several threads
    in_process: bool = False
    seconds: float = 60.0  # to wait for a scheduler, or a worker

    def processes(self, jobs: int, threads: int) -> int:
        cores = len(os.sched_getaffinity(0))
        return min(jobs, self.workers or max(1, cores // max(1, threads)))


def run_jobs(jobs: list[Job], settings: Settings, place: Place) -> Iterator[Entry]:
    """Yields the entries of the jobs as they finish."""
    if place.in_process:
        yield from (run_job(job, settings) for job in jobs)
        return
    from . import cluster  # takes a second, which a batch that has nothing to do need not wait

    client = (
        cluster.remote_client(place.scheduler, place.seconds)
        if place.scheduler
        else cluster.local_client(place.processes(len(jobs), settings.threads))
    )
    with client as connected:
        yield from cluster.run_on(connected, jobs, settings, place.seconds)


@contextmanager
def interruptible() -> Iterator[None]:
    """SIGTERM and SIGHUP end the batch like Ctrl-C. Another signal while it ends changes nothing."""
    signals = (signal.SIGINT, signal.SIGTERM, signal.SIGHUP)

    def interrupt(number: int, frame: FrameType | None) -> None:
        for other in signals:
            signal.signal(other, signal.SIG_IGN)
        raise KeyboardInterrupt

    old = {number: signal.getsignal(number) for number in signals}
    for number in signals:
        if old[number] != signal.SIG_IGN:  # nohup
            signal.signal(number, interrupt)
    try:
        yield
    finally:
        for number, handler in old.items():
            signal.signal(number, handler)


@contextmanager
def progress_of(total: int, done: int, is_quiet: bool) -> Iterator[Callable[[Entry], None]]:
    """Shows finished files on standard error: a bar on a terminal, and otherwise a line for each."""
    console = Console(stderr=True, highlight=False, soft_wrap=True)
    if not console.is_terminal:

        def print_line(entry: Entry) -> None:
            nonlocal done
            done += 1
            if not is_quiet or entry["status"] == "failed":
                print(f"{done}/{total} {line_of(entry)}", file=sys.stderr, flush=True)

        yield print_line
        return
    columns = (TextColumn("{task.description}"), BarColumn(), MofNCompleteColumn(), TimeRemainingColumn())
    with Progress(*columns, console=console, transient=True) as bar:
        task = bar.add_task("files", total=total, completed=done)

        def advance(entry: Entry) -> None:
            if entry["status"] == "failed":
                bar.console.print(line_of(entry), markup=False)
            bar.advance(task)

        yield advance
