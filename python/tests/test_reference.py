"""Every function gives what the library gives in C++, to the bit, for random objects with properties of all element types."""

import functools
import json
import operator
import os
import pathlib
import subprocess
from collections.abc import Callable
from typing import Any

import numpy as np
import pytest

import modeling

# What is no operation of the library: files and facts are compared with those of the program by the other tests.
WITHOUT_COUNTERPART = {"adopt", "make_volume", "thread_count", "topology", "write"}


def function_named(name: str) -> Any:
    return operator.attrgetter(name)(modeling)


class Case:
    """A call that the library was given, and what came of it."""

    def __init__(self, folder: pathlib.Path, case: dict[str, Any]) -> None:
        self.folder = folder
        self.case = case

    def decoded(self, value: Any) -> Any:
        if isinstance(value, list):
            return [self.decoded(item) for item in value]
        if not isinstance(value, dict):
            return value
        if "file" in value:
            read = modeling.read(self.folder / value["file"])
            self.require_contents(read, value["file"])
            return read
        if "function" in value:
            return self.called(function_named(value["function"]), value["arguments"], value["options"])
        if "tuple" in value:
            return tuple(value["tuple"])
        if "float32" in value:
            return np.array(value["float32"], np.uint32).view(np.float32).reshape(value["shape"])
        kind = "uint32" if "uint32" in value else "bool"
        return np.array(value[kind], kind)

    def require_contents(self, result: Any, file: str) -> None:
        """HDF5 files hold objects without loss, and the same object is always in the same bytes."""
        made = self.folder / "made.h5"
        modeling.write(result, made, overwrite=True)
        assert made.read_bytes() == (self.folder / file).read_bytes(), (self.case["function"], self.case["options"], file)

    def called(self, function: Callable[..., Any], arguments: list[Any], options: dict[str, Any]) -> Any:
        return function(*self.decoded(arguments), **{name: self.decoded(value) for name, value in options.items()})

    def require_equal(self, found: Any, expected: Any) -> None:
        if isinstance(expected, dict) and "file" in expected:
            self.require_contents(found, expected["file"])
        value = self.decoded(expected)
        if isinstance(value, np.ndarray):
            assert (found.dtype, found.shape) == (value.dtype, value.shape), self.case
            assert found.tobytes() == value.tobytes(), self.case
        else:
            assert type(found) is type(value) and found == value, self.case

    def check(self) -> None:
        case = self.case
        call = functools.partial(self.called, function_named(case["function"]), case["arguments"], case["options"])
        if case.get("result", self) is None:
            with pytest.raises(modeling.Refusal):
                call()
            return
        made = call()
        if "result" in case:
            self.require_equal(made, case["result"])
        for name, arguments, options, expected in case.get("members", ()):
            member = getattr(made, name)
            self.require_equal(member if arguments is None else self.called(member, arguments, options), expected)


@pytest.mark.filterwarnings("ignore::modeling.GeometryWarning")
@pytest.mark.parametrize("seed", range(int(os.environ.get("MODELING_TEST_SEEDS", "3"))))
def test_results_are_those_of_the_library(seed: int, tmp_path: pathlib.Path) -> None:
    subprocess.run([os.environ["OPERATION_REFERENCE"], tmp_path, str(seed)], check=True)
    cases = [Case(tmp_path, case) for case in json.loads((tmp_path / "cases.json").read_text())]
    for case in cases:
        case.check()
    compared = {case.case["function"].split(".")[0] for case in cases} | {"read"}
    functions = {name for name in modeling.__all__ if callable(value := getattr(modeling, name)) and not isinstance(value, type)}
    assert (functions | {"Guide", "HalfEdges", "StitchTemplate"}) - compared == WITHOUT_COUNTERPART
