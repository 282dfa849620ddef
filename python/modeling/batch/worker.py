"""Loaded by the worker processes of this machine when they start."""

from __future__ import annotations

import os
import signal
import sys
from typing import Any

from . import work  # noqa: F401: loads the library before the first job


def dask_setup(worker: Any) -> None:
    """Ctrl-C reaches all processes of a terminal, but the batch ends its workers itself.

    What goes wrong inside Dask while a worker ends says nothing about the files. Messages of crashes still appear.
    """
    signal.signal(signal.SIGINT, signal.SIG_IGN)
    sys.stderr = open(os.devnull, "w")
