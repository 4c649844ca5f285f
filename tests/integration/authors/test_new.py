"""webapi new writes a project, once and under a good name."""

import os

import pytest

from author_program import webapi
from conftest import DESCRIPTIONS

NAME = "QELO.Photo.Album"
FILES = {"CMakeLists.txt", "README.md", "Methods.cpp", f"{NAME}.lib.in", "tests/MethodsTest.cpp"}


def files_of(directory):
    return {str(path.relative_to(directory)) for path in directory.rglob("*") if path.is_file()}


def test_New_WritesAllFiles_WithTheirNamesPutIn(root, tmp_path):
    result = webapi("new", tmp_path / "album", NAME)
    assert (result.returncode, result.stderr) == (0, "")
    assert result.stdout.endswith(f"\n  webapi call --api {NAME} --method greet --param name=Ann\n")
    assert files_of(tmp_path / "album") == FILES
    texts = "".join((tmp_path / "album" / file).read_text() for file in FILES)
    assert NAME in texts and "album_api_" in texts
    assert "@NAME@" not in texts and "@PROJECT@" not in texts
    assert "@webapi_API_LIBRARY@" in texts


def test_New_DescriptionIsGood(root, tmp_path):
    webapi("new", tmp_path / "album", NAME)
    result = webapi("check", "--no-library", tmp_path / "album" / f"{NAME}.lib.in")
    assert (result.returncode, result.stdout) == (0, "")


def test_New_IntoAnEmptyDirectory_IsGood(root, tmp_path):
    assert webapi("new", tmp_path, NAME).returncode == 0
    assert files_of(tmp_path) == FILES


def test_New_WritesOverNothing(root, tmp_path):
    (tmp_path / "mine").write_text("mine")
    result = webapi("new", tmp_path, NAME)
    assert (result.returncode, result.stdout) == (1, "")
    assert result.stderr == f"webapi new: {tmp_path} is not empty; nothing is written over\n"
    assert files_of(tmp_path) == {"mine"}
    assert webapi("new", tmp_path / "mine", NAME).stderr.endswith("File exists\n")
    os.symlink(tmp_path / "nowhere", tmp_path / "link")
    assert webapi("new", tmp_path / "link", NAME).returncode == 1


def test_New_BelowWhatIsNotThere_SaysSo(root, tmp_path):
    result = webapi("new", tmp_path / "no" / "album", NAME)
    assert (result.returncode, result.stderr.endswith("No such file or directory\n")) == (1, True)


@pytest.mark.parametrize("name", [
    "", "Album", "QELO", ".Album", "QELO.", "QELO..Album", "QELO.1Album", "QELO.Al-bum", "QELO.Al bum",
    "QELO/../x.y", "a.b.c.d.e.f", "QELO." + "x" * 100, "QELO.Album\n", "QELO.\u00c4lbum", "QELO._x", "-a.b",
])
def test_New_NameThatCannotBeOne_IsRefused(root, tmp_path, name):
    result = webapi("new", tmp_path / "album", name)
    assert (result.returncode, result.stdout) == (2, "")
    assert not (tmp_path / "album").exists()


def test_New_NameOfAnApiOfThisHost_IsRefused(root, tmp_path):
    assert (DESCRIPTIONS / "QELO.Host.Info.lib").exists()
    result = webapi("new", tmp_path / "album", "QELO.Host.Info")
    assert (result.returncode, "is an API of this host already" in result.stderr) == (2, True)


@pytest.mark.parametrize("arguments", [[], ["dir"], ["dir", NAME, "more"], ["", NAME], ["--force", "dir", NAME]])
def test_New_WrongUse_IsStatusTwo(arguments, tmp_path):
    result = webapi("new", *arguments, cwd=tmp_path)
    assert (result.returncode, result.stdout, list(tmp_path.iterdir())) == (2, "", [])
    assert "see webapi new --help" in result.stderr
