"""What a worker does with one file. Workers import this module only, so it needs nothing but the library."""

from __future__ import annotations

import hashlib
import json
import os
import time
import urllib.parse
from dataclasses import dataclass
from typing import Any, Iterator

from .. import _modeling

Entry = dict[str, Any]  # of report.json: what became of one file

UNKNOWN = "unknown"  # instead of a hash: the output may have been written


@dataclass(frozen=True)
class Settings:
    """What all jobs of a batch share."""

    recipe: str  # JSON
    digest: str  # of the recipe, its files and all other settings that change results
    version: str  # of the library
    compress: int = 0
    threads: int = 1
    lenient: bool = False
    require: str = ""


@dataclass(frozen=True)
class Job:
    """One file. The paths are absolute, because workers have other current folders."""

    name: str  # of the output, relative to the folder of the batch
    input: str  # "scan.h5#left" is one of several objects in an HDF5 file
    output: str
    format: str
    old_hash: str | None = None  # of the output that exists, which may be replaced


def hash_file(path: str) -> str:
    with open(path, "rb") as file:
        return hashlib.file_digest(file, "sha256").hexdigest()


def hash_input(path: str) -> str:
    """Hashes all that is read with a file: the name of the object in it, and the buffers of a glTF file."""
    file, name = split_object(path)
    parts = [hash_file(part) for part in [file, *_buffers_of(file)]]
    return parts[0] if len(parts) == 1 and not name else hashlib.sha256("\n".join([name, *parts]).encode()).hexdigest()


def split_object(path: str) -> tuple[str, str]:
    """Splits "scan.h5#left" into file and object, unless there is a file of that name."""
    file, mark, name = path.rpartition("#")
    return (file, name) if mark and not os.path.exists(path) else (path, "")


def _buffers_of(file: str) -> Iterator[str]:
    if not file.lower().endswith(".gltf"):
        return
    try:
        with open(file, "rb") as stream:
            buffers = json.load(stream).get("buffers", [])
        uris = [buffer["uri"] for buffer in buffers if "uri" in buffer]
    except (ValueError, AttributeError, TypeError, RecursionError):
        return  # the library will say what is wrong with it
    for uri in uris:
        path = os.path.join(os.path.dirname(file), urllib.parse.unquote(str(uri)))
        if not str(uri).startswith("data:") and os.path.isfile(path):
            yield path


def library_version() -> str:
    return _modeling.library_version


def make_entry(job: Job, status: str, message: str = "", output_hash: str | None = None) -> Entry:
    return {
        "input": job.input,
        "output": job.name,
        "status": status,
        "message": message,
        "hashes": {"output": output_hash},
    }


def run_job(job: Job, settings: Settings) -> Entry:
    """Runs the recipe on one file. Failures are entries too."""
    start = time.perf_counter()
    try:
        entry = _run(job, settings)
    except _modeling.RunError as error:
        entry = make_entry(job, "failed", str(error), job.old_hash)
        entry["reasons"] = error.reasons
        entry["exitCode"] = error.exit_code
    except Exception as error:  # the other files go on
        entry = make_entry(job, "failed", f"unexpected failure: {error!r}", UNKNOWN)
    entry["seconds"] = round(time.perf_counter() - start, 6)
    return entry


def _run(job: Job, settings: Settings) -> Entry:
    if library_version() != settings.version:
        message = f"the worker has version {library_version()} of the library, but the batch has {settings.version}"
        return make_entry(job, "failed", message, job.old_hash)
    try:
        input_hash = hash_input(job.input)  # before it is read: if it changes meanwhile, the next batch sees that
    except OSError as error:
        return make_entry(job, "failed", f"{error.filename} cannot be read: {error.strerror}", job.old_hash)
    document = _modeling.run_recipe(
        settings.recipe,
        [job.input],
        job.output,
        force=True,  # a worker that died may have written it
        compress=settings.compress if job.format == "h5" else 0,
        threads=settings.threads,
        lenient=settings.lenient,
        require=settings.require,
    )
    steps = document["steps"]
    warnings = document["warnings"] + [f"step {step['step']}: {text}" for step in steps for text in step["warnings"]]
    entry = make_entry(job, "done", "; ".join(warnings))
    entry["before"] = next((step["before"] for step in steps if "before" in step), {})
    entry["after"] = next((step["after"] for step in reversed(steps) if "after" in step), {})
    entry["warnings"] = warnings
    entry["phaseSeconds"] = document["phaseSeconds"]
    entry["hashes"] = {
        "input": input_hash,
        "recipe": settings.digest,
        "library": settings.version,
        "output": hash_file(job.output),
    }
    return entry
