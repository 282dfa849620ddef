"""Recipes in JSON and TOML."""

from __future__ import annotations

import copy
import hashlib
import json
import math
import os
import tomllib
from dataclasses import dataclass
from typing import Any

from .. import _modeling
from .work import hash_input


class BatchError(Exception):
    """What is wrong with recipe, inputs or folder before anything starts."""


@dataclass(frozen=True)
class Recipe:
    """A recipe that has been checked."""

    path: str
    text: str  # JSON, in which names of files are absolute
    digest: str  # of the steps and of the contents of their files
    format: str  # of outputs; empty if the recipe names none
    compress: int  # of HDF5 files; 0 for none

    def check(self, format: str) -> None:
        """Refuses a format that cannot hold the result."""
        try:
            _modeling.check_recipe(self.text, format)
        except _modeling.RecipeError as error:
            raise BatchError(f"{self.path}: {error}") from None


def read_recipe(path: str) -> Recipe:
    try:
        with open(path, encoding="utf-8-sig") as file:
            source = file.read()
    except OSError as error:
        raise BatchError(f"{path} cannot be read: {error.strerror}") from None
    except UnicodeDecodeError:
        raise BatchError(f"{path} cannot be read: it is not UTF-8") from None
    is_toml = path.lower().endswith(".toml")
    try:
        text = json.dumps(_plain(tomllib.loads(source))) if is_toml else source
        checked = _modeling.check_recipe(text)
    except tomllib.TOMLDecodeError as error:
        raise BatchError(f"{path} cannot be read: {error}") from None
    except RecursionError:
        raise BatchError(f"{path} cannot be read: its values are nested too deeply") from None
    except _modeling.RecipeError as error:
        line = line_in_toml(source, error.step, error.key) if is_toml else error.line
        raise BatchError(f"{path}: {f'line {line}: ' if line else ''}{error}") from None
    places = [
        (step, key, line_in_toml(source, step + 1, key) if is_toml else line) for step, key, line in checked["files"]
    ]
    document, digest = _with_absolute_files(path, checked["recipe"], places)
    return Recipe(path, json.dumps(document), digest, checked["format"], checked["compress"])


def _with_absolute_files(
    path: str, recipe: dict[str, Any], places: list[tuple[int, str, int]]
) -> tuple[dict[str, Any], str]:
    """Workers have other current folders. The digest does not depend on where the files are."""
    absolute, hashed = copy.deepcopy(recipe), copy.deepcopy(recipe)
    for step, key, line in places:
        value = recipe["steps"][step][key]
        names = value if isinstance(value, list) else [value]
        paths = [os.path.abspath(name) for name in names]
        try:
            hashes = [hash_input(file) for file in paths]
        except OSError as error:
            why = f'"{key}": {error.filename} cannot be read: {error.strerror}'
            raise BatchError(f"{path}: line {line}: step {step + 1}: {why}") from None
        absolute["steps"][step][key] = paths if isinstance(value, list) else paths[0]
        hashed["steps"][step][key] = hashes
    return absolute, hashlib.sha256(json.dumps(hashed, sort_keys=True).encode()).hexdigest()


def _plain(value: Any) -> Any:
    """The value as JSON can hold it. What it cannot, dates and infinity, becomes a string, which is then refused."""
    if isinstance(value, dict):
        return {key: _plain(item) for key, item in value.items()}
    if isinstance(value, list):
        return [_plain(item) for item in value]
    is_json = isinstance(value, (str, bool, int)) or isinstance(value, float) and math.isfinite(value)
    return value if is_json else str(value)


def line_in_toml(source: str, step: int, key: str) -> int:
    """The line of a key, counted from 1, or 0.

    tomllib does not tell lines. But the shortest beginning of the document that has the key ends with it. Within an array
    of steps over several lines, it has to be closed: after a step, or in an array or text that is a value of a step.
    """
    path: list[Any] = ["steps", step - 1, key][: 3 if key else 2] if step else list(key.split("."))
    lines = source.splitlines()
    begin = 0  # of what has been added since the last beginning that is a document
    for end in range(1, len(lines) + 1):
        has_key = _has_key("\n".join(lines[:end]), path)
        if has_key:
            closings = ("\n]", "\n]}\n]", '\n"""', "\n'''") if path[0] == "steps" else ()
            cuts = ((cut, closing) for cut in range(begin + 1, end) for closing in closings)
            return next((cut for cut, closing in cuts if _has_key("\n".join(lines[:cut]) + closing, path)), end)
        if has_key is False:
            begin = end
    return line_in_toml(source, step, "") if step and key else 0


def _has_key(text: str, path: list[Any]) -> bool | None:
    """None if the text is not a document."""
    try:
        value: Any = tomllib.loads(text)
    except tomllib.TOMLDecodeError:
        return None
    try:
        for part in path:
            value = value[part]
    except (KeyError, IndexError, TypeError):
        return False
    return True
