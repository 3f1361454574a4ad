"""The units for systemd: they are right, run the program with options that it has, and leave it
little to do harm with."""

import os
import pathlib
import re
import shutil
import subprocess

import pytest
from conftest import TREE

UNITS = TREE / "contrib/systemd"
MOST_EXPOSURE = 1.5  # of 10

pytestmark = pytest.mark.skipif(shutil.which("systemd-analyze") is None,
                                reason="systemd-analyze is missing")


@pytest.fixture()
def units(tmp_path):
    """The units with the program where it is."""
    for name in ("kzfp-serve.service", "kzfp-serve.socket"):
        text = (UNITS / name).read_text(encoding="utf-8")
        program = str(pathlib.Path(os.environ["KZFP"]).resolve())
        (tmp_path / name).write_text(text.replace("/usr/bin/kzfp", program), encoding="utf-8")
    return [tmp_path / "kzfp-serve.service", tmp_path / "kzfp-serve.socket"]


def analysed(*arguments):
    return subprocess.run(["systemd-analyze", *map(str, arguments)], capture_output=True,
                          text=True, check=False)


def test_units_are_understood(units):
    done = analysed("verify", "--man=no", *units)
    assert (done.returncode, done.stderr) == (0, "")


def test_the_service_is_confined(units):
    told = analysed("security", "--offline=true", "--no-pager", units[0]).stdout
    found = re.search(r"Overall exposure level for \S+: ([\d.]+)", told)
    assert found and float(found[1]) <= MOST_EXPOSURE, told


def test_units_name_options_that_there_are(kzfp):
    shown = kzfp("serve", "--help").decode()
    text = (UNITS / "kzfp-serve.service").read_text(encoding="utf-8")
    named = {option for option in re.findall(r"--[a-z-]+", text) if option != "--now"}
    assert named
    assert not {option for option in named if option not in shown}
