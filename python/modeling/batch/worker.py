"""Loaded by the worker processes of this machine when they start."""

from __future__ import annotations

import signal
from typing import Any

from . import work  # noqa: F401: loads the library before the first job


def dask_setup(worker: Any) -> None:
    """Ctrl-C reaches all processes of a terminal. The batch ends its workers itself."""
    signal.signal(signal.SIGINT, signal.SIG_IGN)
