"""The command line."""

from __future__ import annotations

import argparse
import hashlib
import io
import json
import os
import sys
import time
from typing import Sequence

from .. import _modeling
from .plan import Plan, find_jobs, make_plan
from .recipe import BatchError, Recipe, read_recipe
from .report import Report, locked, print_table
from .run import Place, interruptible, progress_of, run_jobs
from .work import Job, Settings, library_version

DONE, SOME_FAILED, WRONG, LOST, CANCELLED = 0, 1, 2, 3, 6

DESCRIPTION = """\
Runs the steps of a recipe on each input file, as "modeling run IN OUT --recipe RECIPE" does, with several processes on
this machine or on a Dask cluster. A file that fails does not stop the others. A second run does only what is missing or
has changed. DIR/report.json tells what became of each file."""

EPILOG = """\
examples:
  python3 -m modeling.batch clean.json scans/ --out clean/
  python3 -m modeling.batch clean.toml 'parts/**/*.obj' --out triangles/ --format stl
  python3 -m modeling.batch clean.json scans/ --out /shared/clean/ --scheduler tcp://10.0.0.1:8786

A recipe is a JSON file, or a TOML file of the same structure:
  modeling = 1
  output = {format = "ply"}
  steps = [{do = "repair"}, {do = "smooth", amount = 2}]

exit status:
  0  all files are done or up to date
  1  some files failed; the report says why
  2  command line, recipe, inputs or DIR are wrong; nothing was started
  3  no scheduler or no workers, or the report cannot be written
  6  cancelled by Ctrl-C, SIGTERM or SIGHUP; finished files are kept"""


def make_parser() -> argparse.ArgumentParser:
    parser = argparse.ArgumentParser(
        prog="python3 -m modeling.batch",
        description=DESCRIPTION,
        epilog=EPILOG,
        formatter_class=argparse.RawDescriptionHelpFormatter,
    )
    parser.add_argument("recipe", metavar="RECIPE", help="steps and output format, in JSON or TOML (FILE.toml)")
    parser.add_argument(
        "inputs",
        metavar="INPUTS",
        nargs="+",
        help="files, folders (all geometry files in and below them), or quoted globs; an output has the name of its "
        "input, below a folder or the fixed part of a glob with the same subfolders",
    )
    parser.add_argument("--out", metavar="DIR", required=True, help="folder of the outputs, which is created")
    parser.add_argument(
        "--format",
        choices=_modeling.writable_formats,
        default="",
        help="format of the outputs; default: that of the recipe, or that of each input",
    )
    parser.add_argument(
        "-f",
        "--force",
        action="store_true",
        help="also replace files in DIR that no batch has written, or that have been changed since",
    )
    parser.add_argument("-q", "--quiet", action="store_true", help="print only failures and the summary")
    parser.add_argument("-n", "--dry-run", action="store_true", help="check everything, list what would run, and exit")
    where = parser.add_argument_group("where to run")
    place = where.add_mutually_exclusive_group()
    place.add_argument("--workers", metavar="N", type=_count, help="processes on this machine; default: one per core")
    place.add_argument(
        "--scheduler",
        metavar="ADDRESS",
        default="",
        help="Dask scheduler whose workers run the files, such as tcp://10.0.0.1:8786; they need this package and the "
        "same paths",
    )
    place.add_argument(
        "--in-process",
        action="store_true",
        help="one file after another in this process, without Dask; a crash ends the batch",
    )
    where.add_argument("--threads", metavar="N", type=_count, default=1, help="threads per file; default: 1")
    where.add_argument(
        "--wait", metavar="SECONDS", type=float, default=60.0, help="how long to wait for a worker; default: 60"
    )
    reading = parser.add_argument_group("reading")
    reading.add_argument("--lenient", action="store_true", help="leave out broken elements of inputs, with a warning")
    reading.add_argument(
        "--require",
        metavar="LIST",
        type=_requirements,
        help=f"refuse inputs that are not all of these, separated by commas: {', '.join(_modeling.requirements)}",
    )
    return parser


def _count(text: str) -> int:
    number = int(text)
    if not 1 <= number <= 1024:
        raise argparse.ArgumentTypeError(f"{text} is not a number from 1 to 1024")
    return number


def _requirements(text: str) -> str:
    for name in text.split(","):
        if name not in _modeling.requirements:
            raise argparse.ArgumentTypeError(f"{name} is none of {', '.join(_modeling.requirements)}")
    return text


def main(arguments: Sequence[str] | None = None) -> int:
    options = make_parser().parse_args(arguments)
    options.require = options.require or ""
    for stream in (sys.stdout, sys.stderr):
        if isinstance(stream, io.TextIOWrapper):
            stream.reconfigure(errors="backslashreplace")  # names of files need not be text
    try:
        with interruptible():
            return _run(options)
    except BatchError as error:
        return _fail(str(error), WRONG)
    except KeyboardInterrupt:
        return _fail("cancelled", CANCELLED)
    except OSError as error:
        return _fail(f"{error.filename or options.out}: {error.strerror}", LOST)


def _fail(message: str, status: int) -> int:
    print(f"modeling.batch: {message}", file=sys.stderr)
    return status


def _run(options: argparse.Namespace) -> int:
    recipe = read_recipe(options.recipe)
    format = options.format or recipe.format
    if recipe.compress and format not in ("", "h5"):
        raise BatchError(f"{recipe.path}: \"compress\" applies to HDF5 files only, and --format is {format}")
    jobs = find_jobs(options.inputs, options.out, format)
    for used in sorted({job.format for job in jobs}):
        recipe.check(used)
    settings = _settings_of(options, recipe)
    if options.dry_run and not os.path.isdir(options.out):
        return _list_jobs(Plan(jobs, []), options)
    _make_folders(jobs, options)
    with locked(options.out):
        report = Report(options.out, {"recipe": os.path.abspath(recipe.path), "library": settings.version})
        plan = make_plan(jobs, settings, report.earlier, options.force)
        if options.dry_run:
            return _list_jobs(plan, options)
        report.begin(jobs, plan.settled)
        return _work(plan, settings, report, options)


def _settings_of(options: argparse.Namespace, recipe: Recipe) -> Settings:
    changing = [recipe.digest, recipe.compress, options.lenient, options.require]
    digest = hashlib.sha256(json.dumps(changing).encode()).hexdigest()
    return Settings(
        recipe.text, digest, library_version(), recipe.compress, options.threads, options.lenient, options.require
    )


def _make_folders(jobs: list[Job], options: argparse.Namespace) -> None:
    if options.dry_run:
        return
    try:
        for folder in sorted({os.path.dirname(job.output) for job in jobs} | {options.out}):
            os.makedirs(folder, exist_ok=True)
    except OSError as error:
        raise BatchError(f"the folder {error.filename} cannot be created: {error.strerror}") from None


def _list_jobs(plan: Plan, options: argparse.Namespace) -> int:
    for job in plan.jobs:
        print(f"{job.input} -> {job.output}")
    print(f"{len(plan.jobs)} to run, {len(plan.settled)} up to date or refused", file=sys.stderr)
    return DONE


def _work(plan: Plan, settings: Settings, report: Report, options: argparse.Namespace) -> int:
    place = Place(options.scheduler, options.workers or 0, options.in_process, options.wait)
    start = time.monotonic()
    trouble: tuple[str, int] | None = None
    try:
        with progress_of(len(report.entries), len(plan.settled), options.quiet) as show:
            if plan.jobs:
                for entry in run_jobs(plan.jobs, settings, place):
                    report.add(entry)
                    show(entry)
    except KeyboardInterrupt:
        trouble = ("cancelled; finished files are kept, and the next run does the others", CANCELLED)
    except ConnectionError as error:
        trouble = (str(error), LOST)
    report.save()
    _print_results(report, time.monotonic() - start, options)
    if trouble:
        return _fail(*trouble)
    return SOME_FAILED if report.counts()["failed"] else DONE


def _print_results(report: Report, seconds: float, options: argparse.Namespace) -> None:
    entries = [entry for entry in report.entries.values() if not options.quiet or entry["status"] == "failed"]
    if entries:
        print_table(entries)
    counts = report.counts()
    parts = [f"{counts[status]} {status}" for status in ("done", "current", "failed", "open") if counts[status]]
    files = "1 file" if counts["files"] == 1 else f"{counts['files']} files"
    print(f"{files}: {', '.join(parts)}, {seconds:.1f} s; {report.path}")
