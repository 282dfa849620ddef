"""report.json, which is also what the next batch knows of this one, and the table on the terminal."""

from __future__ import annotations

import fcntl
import json
import os
import time
from contextlib import contextmanager
from typing import Any, Iterator

from rich.console import Console
from rich.table import Table
from rich.text import Text

from .recipe import BatchError
from .work import UNKNOWN, Entry, Job, make_entry

NAME = "report.json"
STATUSES = ("done", "current", "failed", "open")


class Report:
    """The entries of all files of a batch, saved from time to time so that little is lost if the batch is killed."""

    def __init__(self, folder: str, head: dict[str, Any]) -> None:
        self.path = os.path.join(folder, NAME)
        self.head = head
        self.entries: dict[str, Entry] = {}  # by output
        self.earlier = _read_records(self.path)
        self._start = time.monotonic()
        self._next_save = 0.0

    def begin(self, all_jobs: list[Job], settled: list[Entry]) -> None:
        """Sets the files. Those that are not settled count as ours from now on, however the batch ends."""
        known = {entry["output"]: entry for entry in settled}
        for job in all_jobs:
            self.entries[job.name] = known.get(job.name) or make_entry(job, "open", "not finished", UNKNOWN)
        self.save()

    def add(self, entry: Entry) -> None:
        self.entries[entry["output"]] = entry
        if time.monotonic() >= self._next_save:
            self.save()

    def counts(self) -> dict[str, int]:
        statuses = [entry["status"] for entry in self.entries.values()]
        return {"files": len(statuses), **{status: statuses.count(status) for status in STATUSES}}

    def save(self) -> None:
        """Writes the report. It is replaced only by a complete one."""
        start = time.monotonic()
        document = {
            "modeling": 1,
            **self.head,
            "seconds": round(start - self._start, 3),
            "summary": self.counts(),
            "files": list(self.entries.values()),
            "earlier": [entry for name, entry in self.earlier.items() if name not in self.entries],
        }
        temporary = f"{self.path}.{os.getpid()}.tmp"
        try:
            with open(temporary, "w", encoding="utf-8", errors="surrogateescape") as file:
                json.dump(document, file, indent=1, ensure_ascii=False)
                file.flush()
                os.fsync(file.fileno())
            os.replace(temporary, self.path)
        except BaseException:
            if os.path.exists(temporary):
                os.unlink(temporary)
            raise
        end = time.monotonic()
        self._next_save = end + max(1.0, 20 * (end - start))  # saving takes a small part of the time


def _read_records(path: str) -> dict[str, Entry]:
    try:
        with open(path, encoding="utf-8", errors="surrogateescape") as file:
            document = json.load(file)
        if document["modeling"] != 1:
            raise ValueError
        entries = document["earlier"] + document["files"]
        return {entry["output"]: entry for entry in entries if entry["hashes"]["output"]}
    except FileNotFoundError:
        return {}
    except OSError as error:
        raise BatchError(f"{path} cannot be read: {error.strerror}") from None
    except (ValueError, KeyError, TypeError, RecursionError):
        raise BatchError(f"{path} exists, but is no report of a batch: move it away") from None


@contextmanager
def locked(folder: str) -> Iterator[None]:
    """Keeps other batches out of the folder."""
    descriptor = os.open(folder, os.O_RDONLY | os.O_DIRECTORY)
    try:
        try:
            fcntl.flock(descriptor, fcntl.LOCK_EX | fcntl.LOCK_NB)
        except BlockingIOError:
            raise BatchError(f"another batch is writing to {folder}") from None
        except OSError:
            pass  # this file system has no locks
        yield
    finally:
        os.close(descriptor)


def change_of(entry: Entry, key: str) -> str:
    """ "8 → 12", or "8" if nothing has changed."""
    before, after = entry.get("before", {}).get(key), entry.get("after", {}).get(key)
    texts = [f"{number:,}" for number in (before, after) if number is not None]
    return " → ".join(dict.fromkeys(texts))


def line_of(entry: Entry) -> str:
    """One line on a file that is finished."""
    parts = [f"{change_of(entry, key)} {key}" for key in ("points", "faces") if change_of(entry, key)]
    parts += [f"{entry['seconds']:.2f} s"] if "seconds" in entry else []
    parts += [entry["message"]] if entry["message"] else []
    return one_line(f"{entry['output']}: {entry['status']}: {', '.join(parts)}")


def one_line(text: str) -> str:
    """Without control characters, which names of files may contain."""
    return "".join(c if c.isprintable() else "?" for c in text)


def print_table(entries: list[Entry]) -> None:
    """Prints the entries. A terminal wraps long messages; elsewhere each file is one line."""
    console = Console(highlight=False)
    is_terminal = console.is_terminal
    if not is_terminal:
        console = Console(highlight=False, width=100_000)
    table = Table(box=None, pad_edge=False, padding=(0, 3, 0, 0))
    table.add_column("file", overflow="fold")
    table.add_column("status", no_wrap=True)
    for title in ("points", "faces", "seconds"):
        table.add_column(title, justify="right", no_wrap=True)
    table.add_column("message", overflow="fold")
    styles = {"failed": "red", "open": "yellow"}
    for entry in entries:
        is_run = entry["status"] in ("done", "failed") and "seconds" in entry
        seconds = f"{entry['seconds']:.2f}" if is_run else ""
        cells = [entry["output"], entry["status"], change_of(entry, "points"), change_of(entry, "faces"), seconds]
        cells.append(entry["message"])
        style = styles.get(entry["status"], "")
        table.add_row(*[Text(one_line(cell)) for cell in cells], style=style)
    if is_terminal:
        console.print(table)
        return
    with console.capture() as capture:
        console.print(table)
    print("\n".join(line.rstrip() for line in capture.get().splitlines()))
