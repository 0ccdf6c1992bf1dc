"""The test programs of a build, which run with any library."""

import json
import os
import pathlib
import subprocess


def test_programs(build):
    """The programs of GoogleTest that test the library."""
    listed = subprocess.run(["ctest", "--test-dir", build, "--show-only=json-v1"], check=True,
                            stdout=subprocess.PIPE, text=True).stdout
    return sorted({test["command"][0] for test in json.loads(listed)["tests"]
                   if any(argument.startswith("--gtest") for argument in test["command"])
                   and pathlib.Path(test["command"][0]).parent == build / "tests"})


def with_library(library):
    """The environment in which they run with this library."""
    return dict(os.environ, LD_LIBRARY_PATH=str(library.parent), QEL_LIBRARY=str(library))
