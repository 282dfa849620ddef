"""Runs jobs on Dask workers: those of this machine, or those of a scheduler that is running."""

from __future__ import annotations

import logging
import queue
import tempfile
import time
from collections import deque
from concurrent.futures import CancelledError
from contextlib import contextmanager
from typing import Any, Iterator, TypeAlias

import dask
import distributed
from distributed import KilledWorker, TimeoutError

from .work import UNKNOWN, Entry, Job, Settings, library_version, make_entry, run_job

Client: TypeAlias = Any  # most functions of Dask have no types
Future: TypeAlias = Any
dask_types: Any = distributed

JOBS_PER_THREAD = 2  # so that a worker need not wait for the next one
SECONDS_BETWEEN_LOOKS = 1.0
MODULE_OF_WORKERS = __name__.rpartition(".")[0] + ".worker"


class ClusterError(ConnectionError):
    """Why the cluster cannot be used, or no longer."""


def silence_dask() -> None:
    """What matters is in the entries. Dask logs errors in the name of the caller, which may be asyncio: for example when a
    worker process is replaced at the moment at which the cluster closes."""
    for name in ("distributed", "asyncio"):
        logging.getLogger(name).setLevel(logging.CRITICAL)


@contextmanager
def local_client(workers: int) -> Iterator[Client]:
    """Starts worker processes on this machine. One that dies is replaced."""
    silence_dask()
    settings = {
        "distributed.scheduler.allowed-failures": 1,  # after two deaths a job is suspected
        "distributed.nanny.pre-spawn-environ": {"DASK_LOGGING__DISTRIBUTED": "critical"},
    }
    with tempfile.TemporaryDirectory(prefix="modeling-batch-") as folder, dask.config.set(settings):
        with dask_types.LocalCluster(
            n_workers=workers,
            threads_per_worker=1,
            processes=True,
            memory_limit=0,  # workers with large meshes are left alone
            dashboard_address=None,
            scheduler_kwargs={"dashboard_address": "127.0.0.1:0"},  # its health page opens any free port, not 8787
            local_directory=folder,
            silence_logs=logging.CRITICAL,
            preload=[MODULE_OF_WORKERS],
        ) as cluster, dask_types.Client(cluster) as client:
            yield client


@contextmanager
def remote_client(address: str, seconds: float) -> Iterator[Client]:
    """Connects to a scheduler, and waits for its first worker."""
    silence_dask()
    try:
        client = dask_types.Client(address, timeout=seconds)
    except (OSError, ValueError, TimeoutError) as error:
        raise ClusterError(f"there is no scheduler at {address}: {error}") from None
    with client:
        try:
            client.wait_for_workers(1, timeout=seconds)
        except TimeoutError:
            raise ClusterError(f"the scheduler at {address} has no workers") from None
        require_version(client)
        yield client


def require_version(client: Client) -> None:
    """Refuses workers that would give other results."""
    expected = library_version()
    for address, version in client.run(library_version, on_error="return").items():
        if isinstance(version, ModuleNotFoundError):
            raise ClusterError(f"the worker {address} cannot import the package: {version}")
        if version != expected:
            raise ClusterError(f"the worker {address} has version {version} of the library, but here it is {expected}")


def run_on(client: Client, jobs: list[Job], settings: Settings, seconds: float) -> Iterator[Entry]:
    """Runs the jobs and yields their entries as they finish.

    Dask runs the jobs of a worker that dies elsewhere, and gives up a job that was on several workers when they died. It
    may only have been waiting there, so such a job gets another try with no other job beside it.
    Raises ClusterError if the scheduler is gone, or if there has been no worker for this many seconds.
    """
    suspects: list[Job] = []
    for job, entry in _Run(client, settings, seconds).run(jobs):
        if entry:
            yield entry
        else:
            suspects.append(job)
    for suspect in suspects:
        for job, entry in _Run(client, settings, seconds).run([suspect]):
            why = "each worker process that ran it died: it crashes, or needs more memory than there is"
            yield entry or make_entry(job, "failed", why, UNKNOWN)


class _Run:
    def __init__(self, client: Client, settings: Settings, seconds: float) -> None:
        self._client = client
        self._settings = settings
        self._patience = seconds
        self._finished: queue.SimpleQueue[Future] = queue.SimpleQueue()
        self._running: dict[str, tuple[Future, Job]] = {}
        self._capacity = 0
        self._last_look = 0.0
        self._last_worker = time.monotonic()

    def run(self, jobs: list[Job]) -> Iterator[tuple[Job, Entry | None]]:
        """Yields no entry for a job whose workers died."""
        waiting = deque(jobs)
        try:
            while waiting or self._running:
                self._look_at_workers()
                while waiting and len(self._running) < self._capacity:
                    self._submit(waiting.popleft())
                try:
                    future = self._finished.get(timeout=SECONDS_BETWEEN_LOOKS)
                except queue.Empty:
                    continue
                result = self._result_of(future)
                if result is not None:
                    yield result
        finally:
            for future, _ in self._running.values():
                future.cancel()

    def _submit(self, job: Job) -> None:
        future = self._client.submit(run_job, job, self._settings, pure=False)
        self._running[future.key] = (future, job)
        future.add_done_callback(self._finished.put)

    def _look_at_workers(self) -> None:
        now = time.monotonic()
        if now < self._last_look + SECONDS_BETWEEN_LOOKS:
            return
        self._last_look = now
        try:
            threads = sum(self._client.nthreads().values())
        except Exception as error:  # of many kinds, depending on how the connection ended
            raise ClusterError(f"the scheduler is gone: {error}") from None
        self._capacity = JOBS_PER_THREAD * threads
        if threads:
            self._last_worker = now
        elif now > self._last_worker + self._patience:
            raise ClusterError(f"there has been no worker for {self._patience:.0f} seconds")

    def _result_of(self, future: Future) -> tuple[Job, Entry | None] | None:
        _, job = self._running[future.key]
        entry: Entry | None
        try:
            entry = future.result(timeout=SECONDS_BETWEEN_LOOKS)
        except TimeoutError:  # its worker died with the result, so the job runs again
            future.add_done_callback(self._finished.put)
            return None
        except KilledWorker:
            entry = None
        except CancelledError:
            raise ClusterError("the scheduler is gone, or has cancelled the jobs") from None
        except Exception as error:
            entry = make_entry(job, "failed", f"the worker cannot run it: {error!r}", UNKNOWN)
        del self._running[future.key]
        return job, entry
