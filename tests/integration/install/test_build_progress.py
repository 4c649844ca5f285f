"""What building a tree shows, on a terminal and elsewhere."""

import os
import pty
import re
import subprocess

import pytest

from conftest import SOURCE

PROJECT = """
cmake_minimum_required(VERSION 3.25)
project(some LANGUAGES CXX)
add_library(some STATIC one.cpp two.cpp)
"""
SCRIPT = f'set -euo pipefail; . {SOURCE}/packaging/build.sh; build_tree "$PWD/build"; echo built'


@pytest.fixture
def project(tmp_path):
    (tmp_path / "CMakeLists.txt").write_text(PROJECT)
    (tmp_path / "one.cpp").write_text("int one() { return 1; }\n")
    (tmp_path / "two.cpp").write_text("int two() { return 2; }\n")
    return tmp_path


def on_a_terminal(directory):
    """What somebody sees who builds there, as bytes, and the status."""
    process, terminal = pty.fork()
    if process == 0:
        os.chdir(directory)
        os.execvp("bash", ["bash", "-c", SCRIPT])
    shown = b""
    try:
        while piece := os.read(terminal, 4096):
            shown += piece
    except OSError:
        pass  # the terminal's end, as Linux tells it
    os.close(terminal)
    return shown.decode(), os.waitstatus_to_exitcode(os.waitpid(process, 0)[1])


def elsewhere(directory):
    return subprocess.run(["bash", "-c", SCRIPT], cwd=directory, capture_output=True, text=True,
                          check=False)


def test_Terminal_ShowsHowMuchIsBuilt_AndTakesItAway(project):
    shown, status = on_a_terminal(project)
    assert status == 0
    assert re.search(r"\rBuilding: +\d+ %", shown)
    assert "\rBuilding: 100 %" in shown
    assert shown.endswith("\r\x1b[Kbuilt\r\n")


def test_Elsewhere_BuildingIsQuiet(project):
    result = elsewhere(project)
    assert (result.returncode, result.stdout, result.stderr) == (0, "built\n", "")
    assert "%]" in (project / "build" / "build.log").read_text()


def test_FailedBuild_EndsTheScriptAndNamesTheLog(project):
    (project / "two.cpp").write_text("int two() { return nothing; }\n")
    result = elsewhere(project)
    assert result.returncode != 0
    assert "built" not in result.stdout
    assert "nothing" in result.stderr
    assert f"{project}/build/build.log" in result.stderr
    shown, status = on_a_terminal(project)
    assert status != 0
    assert "the whole log is" in shown
