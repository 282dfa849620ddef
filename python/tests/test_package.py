"""The package as a whole."""

import os
import subprocess

import modeling


def test_version_is_that_of_the_program() -> None:
    text = subprocess.run([os.environ["MODELING_PROGRAM"], "--version"], capture_output=True, text=True, check=True).stdout
    assert modeling.__version__ in text
