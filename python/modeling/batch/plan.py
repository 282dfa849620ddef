"""Which files a batch reads and writes, and which of them are up to date."""

from __future__ import annotations

import glob
import os
from concurrent.futures import ThreadPoolExecutor
from dataclasses import dataclass, replace
from typing import Iterator

from .. import _modeling
from .recipe import BatchError
from .work import UNKNOWN, Entry, Job, Settings, hash_file, hash_input, make_entry, split_object

READABLE = ("obj", "ply", "stl", "off", "xyz", "glb", "gltf", "h5", "hdf5")
SYNONYMS = {"hdf5": "h5"}


@dataclass
class Plan:
    """Jobs to run, and the entries of files that need none: those up to date, and those that are refused."""

    jobs: list[Job]
    settled: list[Entry]


def find_jobs(inputs: list[str], folder: str, format: str) -> list[Job]:
    """One job per input file, in the order of the inputs and of names within folders.

    `format` is that of the outputs; if it is empty, each output has the format of its input.
    """
    folder = os.path.abspath(folder)
    jobs: dict[str, Job] = {}
    for argument in inputs:
        for path, relative in _files_of(argument, folder):
            job = _make_job(path, relative, folder, format)
            other = jobs.setdefault(job.name, job)
            if not _is_same(other.input, job.input):
                raise BatchError(f"{other.input} and {job.input} would both be written to {job.output}")
    written: dict[str, Job] = {}
    for job in jobs.values():
        other = written.setdefault(os.path.realpath(job.output), job)
        if other is not job:
            raise BatchError(f"{other.input} and {job.input} would both be written to {os.path.realpath(job.output)}")
    read = {os.path.realpath(split_object(job.input)[0]): job.input for job in jobs.values()}
    for job in jobs.values():
        if os.path.realpath(job.output) in read:
            raise BatchError(f"{job.output} would be written, but it is an input: choose another folder with --out")
    return list(jobs.values())


def _files_of(argument: str, folder: str) -> Iterator[tuple[str, str]]:
    """The files that an argument stands for, and their names relative to it."""
    if os.path.isdir(argument):
        yield from _files_in(argument, folder)
    elif os.path.isfile(argument) or os.path.isfile(split_object(argument)[0]):
        yield os.path.abspath(argument), os.path.basename(argument)
    elif glob.has_magic(argument):
        base = _fixed_part(argument)
        found = [path for path in sorted(glob.glob(argument, recursive=True)) if os.path.isfile(path)]
        found = [path for path in found if not _is_within(path, folder)]
        if not found:
            raise BatchError(f"no file matches {argument}")
        for path in found:
            yield os.path.abspath(path), os.path.relpath(path, base or ".")
    else:
        raise BatchError(f"there is no file or folder {argument}")


def _files_in(top: str, folder: str) -> Iterator[tuple[str, str]]:
    """All geometry files in a folder and below it, except for hidden ones and those that batches have written."""
    is_empty = True
    for parent, folders, files in os.walk(top):
        folders[:] = sorted(
            name for name in folders if name[0] != "." and not _is_within(os.path.join(parent, name), folder)
        )
        for name in sorted(files):
            path = os.path.join(parent, name)
            if name[0] != "." and _extension(name) in READABLE and not _is_within(path, folder):
                is_empty = False
                yield os.path.abspath(path), os.path.relpath(path, top)
    if is_empty:
        raise BatchError(f"there are no geometry files in {top}")


def _fixed_part(pattern: str) -> str:
    """The folder that all files below a pattern have in common."""
    parts = os.path.dirname(pattern).split(os.sep)
    fixed = next((i for i, part in enumerate(parts) if glob.has_magic(part)), len(parts))
    return os.sep.join(parts[:fixed]) or (os.sep if pattern.startswith(os.sep) else "")


def _is_within(path: str, folder: str) -> bool:
    return os.path.commonpath([os.path.realpath(path), os.path.realpath(folder)]) == os.path.realpath(folder)


def _is_same(first: str, second: str) -> bool:
    return os.path.realpath(first) == os.path.realpath(second)


def _extension(name: str) -> str:
    return os.path.splitext(name)[1][1:].lower()


def _make_job(path: str, relative: str, folder: str, format: str) -> Job:
    file, part = split_object(path)
    if not format:
        format = _extension(file)
        format = SYNONYMS.get(format, format)
        if format not in _modeling.writable_formats:
            raise BatchError(f"{path}: such files cannot be written, so --format or the recipe has to name the format")
    stem = os.path.splitext(relative.rpartition("#")[0] if part else relative)[0]
    name = f"{stem}-{part.replace(os.sep, '-')}.{format}" if part else f"{stem}.{format}"
    name = os.path.normpath(name)
    if name.split(os.sep)[0] == "..":
        raise BatchError(f"{path} would be written outside of {folder}: give its folder as an input of its own")
    return Job(name, path, os.path.join(folder, name), format)


def make_plan(jobs: list[Job], settings: Settings, records: dict[str, Entry], force: bool) -> Plan:
    """Divides the jobs into those to run and those that are settled.

    `records` are the entries of earlier batches by output. An output that exists is replaced only if its record says
    that a batch has written it, or with `force`.
    """
    plan = Plan([], [])
    with ThreadPoolExecutor(min(8, os.cpu_count() or 1)) as pool:  # hashing releases the interpreter lock
        for result in pool.map(lambda job: _settle(job, settings, records.get(job.name), force), jobs):
            if isinstance(result, Job):
                plan.jobs.append(result)
            else:
                plan.settled.append(result)
    return plan


def _settle(job: Job, settings: Settings, record: Entry | None, force: bool) -> Job | Entry:
    if not os.path.exists(job.output):  # a link to nothing is written through, as the program does
        return job
    recorded = record["hashes"]["output"] if record else None
    if not os.path.isfile(job.output):
        return make_entry(job, "failed", f"{job.output} exists, and is not a file", recorded)
    try:
        present = hash_file(job.output)
    except OSError as error:
        return make_entry(job, "failed", f"{job.output} cannot be replaced: {error.strerror}", recorded)
    if recorded not in (present, UNKNOWN) and not force:
        why = "it has been changed since" if recorded else "no batch has written it"
        return make_entry(job, "failed", f"{job.output} exists, and {why}; --force replaces it", recorded)
    if record and recorded == present and record.get("status") in ("done", "current") and _is_current(job, settings, record):
        return {**record, "status": "current", "input": job.input}
    return replace(job, old_hash=present)


def _is_current(job: Job, settings: Settings, record: Entry) -> bool:
    hashes = record["hashes"]
    if hashes.get("recipe") != settings.digest or hashes.get("library") != settings.version:
        return False
    try:
        return bool(hashes.get("input") == hash_input(job.input))
    except OSError:
        return False
