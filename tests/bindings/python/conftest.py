"""What the tests of the Python package share: the program beside it, clips, and made-up sound."""

import json
import os
import pathlib
import subprocess

import pytest


@pytest.fixture(scope="session")
def tree():
    return pathlib.Path(os.environ["KZ_SOURCE_DIR"])


@pytest.fixture(scope="session")
def clips():
    return pathlib.Path(os.environ["KZ_CLIPS"])


@pytest.fixture(scope="session")
def dist():
    return pathlib.Path(os.environ["KZ_DIST"])


@pytest.fixture(scope="session")
def kzfp():
    """Runs the command-line program; gives what it writes."""
    def run(*arguments):
        done = subprocess.run([os.environ["KZFP"], *map(str, arguments)], capture_output=True,
                              text=True, check=False, env=without_preloads())
        assert done.returncode in (0, 1), done.stderr  # 1: the files that are compared differ
        return done.stdout
    return run


@pytest.fixture(scope="session")
def kzfp_json(kzfp):
    """The same of a command that writes JSON, one value for each line."""
    def run(*arguments):
        return [json.loads(line) for line in kzfp(*arguments, "--format", "json").splitlines()]
    return run


def without_preloads():
    return {name: value for name, value in os.environ.items() if name != "LD_PRELOAD"}
