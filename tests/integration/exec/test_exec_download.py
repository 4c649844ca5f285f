"""webapi-exec --output: files that arrive whole, in place of what was there, or go on later."""

import fcntl
import os
import random
import resource
import subprocess

import pytest

from downloads import API, folder, sending  # noqa: F401  (fixtures)
from exec_program import EXEC, call, data_of, on_terminal

CONTENT = random.Random(1).randbytes(3 << 20)
MARK = "user.webapi.etag"


@pytest.fixture
def source(folder, sending, root):  # noqa: F811
    """A file of 3 MiB that was written long ago."""
    file = folder / "source.bin"
    file.write_bytes(CONTENT)
    os.utime(file, (10**9, 10**9))
    return file


@pytest.fixture
def target(tmp_path):
    try:
        os.setxattr(tmp_path, "user.test", b"x")
    except OSError:
        pytest.skip("the file system keeps no attributes, so nothing goes on")
    return tmp_path / "target"


def get(source, target, **options):
    return call(API, "file", "--param", f'path="{source}"', "--output", target, **options)


def break_off(source, target, length=1 << 20):
    """Has the system end the program when so much is written."""
    process = subprocess.run(
        [EXEC, "--api", API, "--method", "file", "--user", "alice", "--param", f'path="{source}"',
         "--output", target],
        preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (length, length)),
        capture_output=True, timeout=60, check=False)
    assert process.returncode != 0
    part = target.with_name(target.name + ".part")
    assert part.stat().st_size == length
    return part


def test_Output_IsWhole(source, tmp_path):
    target = tmp_path / "target"
    assert data_of(get(source, target)) == 0
    assert target.read_bytes() == CONTENT
    assert [file.name for file in tmp_path.iterdir()] == ["target"]


def test_Request_ThatThisProgramServes_CountsForNothing(source, tmp_path):
    request = {"REQUEST_METHOD": "GET", "HTTP_RANGE": "bytes=0-1", "HTTP_IF_NONE_MATCH": "*"}
    target = tmp_path / "target"
    assert data_of(get(source, target, env={**os.environ, **request})) == 0
    assert target.read_bytes() == CONTENT


def test_BrokenDownload_LeavesWhatWasThere(source, target):
    target.write_bytes(b"good")
    break_off(source, target)
    assert target.read_bytes() == b"good"


def test_BrokenDownload_GoesOn(source, target):
    part = break_off(source, target)
    assert os.getxattr(part, MARK).startswith(b'"')
    with open(part, "r+b") as file:
        file.write(b"written before")
    data_of(get(source, target))
    assert target.read_bytes() == b"written before" + CONTENT[14:]
    assert not part.exists()
    assert os.listxattr(target) == []


def test_DownloadThatWasWholeButInItsPlace_IsPutThere(source, target):
    part = break_off(source, target)
    with open(part, "r+b") as file:
        file.write(CONTENT)
    data_of(get(source, target))
    assert target.read_bytes() == CONTENT


def test_BrokenDownload_StartsAnewWhenTheFileHasChanged(source, target):
    part = break_off(source, target)
    source.write_bytes(CONTENT[::-1])
    data_of(get(source, target))
    assert target.read_bytes() == CONTENT[::-1]
    assert not part.exists()


def test_PartWithoutAMark_IsWrittenAnew(source, target):
    target.with_name("target.part").write_bytes(b"of something else")
    data_of(get(source, target))
    assert target.read_bytes() == CONTENT


def test_MethodThatFails_LeavesWhatWasThere(source, tmp_path):
    target = tmp_path / "target"
    target.write_bytes(b"good")
    process = get(source.with_name("missing"), target)
    assert process.returncode == 1
    assert target.read_bytes() == b"good"
    assert [file.name for file in tmp_path.iterdir()] == ["target"]


def test_FileThatAnotherCallWrites_IsRefused(source, tmp_path):
    target = tmp_path / "target"
    with open(tmp_path / "target.part", "wb") as part:
        fcntl.flock(part, fcntl.LOCK_EX)
        process = get(source, target)
    assert (process.returncode, process.stdout) == (1, "")
    assert process.stderr.endswith("target: Device or resource busy\n")


def test_LinksAndDevices_AreWrittenInPlace(source, tmp_path):
    (tmp_path / "link").symlink_to("real")
    data_of(get(source, tmp_path / "link"))
    assert (tmp_path / "link").is_symlink()
    assert (tmp_path / "real").read_bytes() == CONTENT
    data_of(get(source, "/dev/null"))


def test_Progress_IsShownOnATerminal(source, tmp_path):
    printed, status = on_terminal("--api", API, "--method", "file", "--user", "alice", "--param",
                                  f'path="{source}"', "--output", tmp_path / "target")
    assert status == 0
    assert "100%" in printed
    assert "3.0/3.0 MiB" in printed
