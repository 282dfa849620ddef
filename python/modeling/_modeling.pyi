from os import PathLike
from typing import Any, Sequence

__version__: str
library_version: str
writable_formats: tuple[str, ...]
requirements: tuple[str, ...]

class RecipeError(ValueError):
    step: int
    key: str
    line: int

class RunError(RuntimeError):
    exit_code: int
    reasons: list[str]
    report: dict[str, Any]

def check_recipe(text: str, format: str = "") -> dict[str, Any]: ...
def run_recipe(
    recipe: str,
    inputs: Sequence[str | PathLike[str]],
    output: str | PathLike[str],
    *,
    force: bool = False,
    format: str = "",
    compress: int = 0,
    threads: int = 0,
    lenient: bool = False,
    require: str = "",
) -> dict[str, Any]: ...
