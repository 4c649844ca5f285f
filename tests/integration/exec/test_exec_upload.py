"""webapi-exec --upload: files go to a method as a browser sends them."""

import json
import os

import pytest

from conftest import needs_root
from exec_program import DOWNLOAD, call, data_of, described, on_terminal, run  # noqa: F401
from upload import API, checksum, uploading

CONTENT = bytes(range(256)) * 1500  # more than a pipe holds


@pytest.fixture
def upload(describe, root):
    uploading(describe)


@pytest.fixture
def source(tmp_path):
    file = tmp_path / 'a "B".bin'
    file.write_bytes(CONTENT)
    return file


def paths_of(data):
    return [file["path"] for file in data["files"]]


@pytest.mark.parametrize("method", ["take", "user", "defer"])
def test_Upload_ArrivesWhole(upload, source, tmp_path, method):
    empty = tmp_path / "empty"
    empty.touch()
    data = data_of(call(API, method, "--upload", f"file={source}", "--upload", f"other={empty}",
                        "--param", "n=5"))
    assert [(file["field"], file["name"], file["size"]) for file in data["files"]] == [
        ("file", 'a "B".bin', len(CONTENT)), ("other", "empty", 0)]
    assert [file["sum"] for file in data["files"]] == [checksum(CONTENT), checksum(b"")]
    assert not any(map(os.path.exists, paths_of(data)))
    if method != "defer":
        assert data["params"]["n"] == 5


@needs_root
@pytest.mark.parametrize("method", ["take", "user"])
def test_TemporaryFile_IsTheMethodsAccounts(upload, source, method):
    data = data_of(call(API, method, "--upload", f"file={source}"))
    assert data["files"][0]["uid"] == data["euid"] != 0
    assert data["files"][0]["mode"] == 0o600


def test_MethodThatTakesNone_IsNotCalled(described, source):  # noqa: F811
    process = call(DOWNLOAD, "print", "--upload", f"file={source}")
    assert process.returncode == 1
    assert json.loads(process.stdout)["error"]["code"] == 115


def test_FileThatCannotBeRead_IsNotSent(upload, tmp_path):
    os.mkfifo(tmp_path / "pipe")
    for name, reason in (("missing", "No such file or directory"), (".", "not a regular file"),
                         ("pipe", "not a regular file")):
        process = call(API, "take", "--upload", f"file={tmp_path / name}")
        assert (process.returncode, process.stdout) == (1, "")
        assert process.stderr == f"webapi-exec: {tmp_path / name}: {reason}\n"


@pytest.mark.parametrize("argument", ["file", "=x", "file="])
def test_Upload_WithoutFieldOrFile_IsWrongUse(argument):
    process = call(API, "take", "--upload", argument)
    assert process.returncode == 2
    assert "--upload takes NAME=FILE" in process.stderr


def test_Upload_GoesWithOneCallAlone(source):
    for arguments in (("--batch", "/dev/null"), ("--follow", "--task", "alice/x")):
        assert run(*arguments, "--upload", f"file={source}").returncode == 2


def test_Progress_IsShownOnATerminal(upload, source):
    printed, status = on_terminal("--api", API, "--method", "take", "--user", "alice", "--upload",
                                  f"file={source}")
    assert status == 0
    assert "375.2/375.2 KiB" in printed
    assert "100%" in printed
