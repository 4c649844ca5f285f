"""webapi-exec --upload: files go to a method as a browser sends them."""

import json
import os
import re
import subprocess

import pytest

from conftest import ROOT, needs_root
from exec_program import DOWNLOAD, EXEC, call, data_of, described, on_terminal, run  # noqa: F401
from files import home  # noqa: F401  (a fixture)
from marks import wait_for
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


def begun():
    """The files that a call has begun, and did not finish."""
    return [path for path in (ROOT / "tmp").glob("webapi-partial-*") if path.stat().st_size > 0]


@pytest.fixture
def large(tmp_path):
    """More than is sent before a program can be killed."""
    file = tmp_path / "large.bin"
    with open(file, "wb") as stream:
        for number in range(128):
            stream.write(bytes([number]) * (1 << 20))
    yield file
    for path in (*(ROOT / "tmp").glob("webapi-*"), *(ROOT / "var/lib/webapi/uploads").glob("*")):
        path.unlink()


def killed(*arguments):
    """Starts a call and kills it while its upload comes."""
    process = subprocess.Popen([EXEC, *map(str, arguments)], stdout=subprocess.DEVNULL)
    assert wait_for(begun, 10)
    process.kill()
    process.wait(timeout=10)


@pytest.mark.parametrize("method", ["user", "defer"])
def test_UploadThatWasKilled_GoesOnWithTheNextCall(upload, large, method):
    arguments = ("--upload", f"file={large}")
    killed("--api", API, "--method", method, "--user", "alice", *arguments)
    there = begun()[0].stat().st_size
    assert there < large.stat().st_size
    process = call(API, method, *arguments)
    said = re.search("goes on behind ([0-9]+) bytes", process.stderr)
    assert there <= int(said[1]) < large.stat().st_size
    (file,) = data_of(process)["files"]
    assert (file["name"], file["size"]) == ("large.bin", large.stat().st_size)
    assert begun() == []


def test_UploadIntoASharedFolder_GoesOnAfterAKill(root, large, home):  # noqa: F811
    arguments = ("--param", "path=/own", "--upload", f"file={large}")
    killed("--api", "QELO.Files.Item", "--method", "upload", "--user", "alice", *arguments)
    assert [path.name for path in home.iterdir() if path.name != ".webapi"] == []
    process = call("QELO.Files.Item", "upload", *arguments)
    assert "goes on behind" in process.stderr
    assert data_of(process)["items"][0]["size"] == large.stat().st_size
    assert (home / "large.bin").read_bytes() == large.read_bytes()


def test_FileThatWasChangedMeanwhile_IsSentAnew(upload, large):
    arguments = ("--upload", f"file={large}")
    killed("--api", API, "--method", "user", "--user", "alice", *arguments)
    large.write_bytes(bytes(3 << 20))
    process = call(API, "user", *arguments)
    assert "goes on" not in process.stderr
    assert data_of(process)["files"][0]["sum"] == checksum(bytes(3 << 20))
