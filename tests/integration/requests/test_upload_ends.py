"""Uploads that end otherwise: nothing of them is left."""

import os
import random
import signal
import socket
import subprocess
import time

import pytest

from conftest import ENTRY, ROOT, answer_of, needs_root
from marks import mark, wait_for  # noqa: F401
from upload import API, TYPE, Form, left_behind, post, uploading
from webserver import WebServer

CALL = f"api={API}&version=1&method="


@pytest.fixture(autouse=True)
def described(describe):
    uploading(describe)
    assert left_behind() == []


def variables(length, method):
    return {"REQUEST_METHOD": "POST", "REMOTE_ADDR": "127.0.0.1", "CONTENT_TYPE": TYPE,
            "CONTENT_LENGTH": str(length), "QUERY_STRING": CALL + method}


def send(body, length, method="take"):
    """The error's "upload_err" of a body that is announced longer than it is."""
    process = subprocess.run([ENTRY], input=body, env=variables(length, method),
                             capture_output=True, timeout=30, check=True)
    return answer_of(process.stdout)["error"]["errors"]["upload_err"]


def start(length, method):
    return subprocess.Popen([ENTRY], env=variables(length, method), stdin=subprocess.PIPE,
                            stdout=subprocess.PIPE, start_new_session=True)


@pytest.mark.parametrize("method", ["take", "defer"])
def test_BodyThatBreaksOffAtAnyByte_LeavesNothing(method):
    body = Form().field("a", "1").file("f", "x", b"12").body()
    for length in range(1, len(body) - 2):  # but for the line end behind the last boundary
        assert send(body[:length], len(body), method) == -1, length
        assert left_behind() == [], length


def test_LargeBodyThatBreaksOffAnywhere_LeavesNothing():
    body = Form().file("f", "x", bytes(1_000_000)).file("g", "y", b"1" * 1_000_000).body()
    places = random.Random(1)
    for _ in range(20):
        assert send(body[:places.randrange(1, len(body))], len(body)) == -1
        assert left_behind() == []


@pytest.fixture
def streaming(root, tmp_path):
    """A web server that hands a body on while it comes."""
    server = WebServer(tmp_path, ENTRY, "server.stream-request-body = 2\n").start()
    yield server
    server.stop()


def children(server):
    """The processes that a web server has started."""
    listed = subprocess.run(["ps", "-o", "pid=", "--ppid", str(server.process.pid)],
                            capture_output=True, text=True, check=False).stdout
    return listed.split()


def test_ClientThatBreaksOff_LeavesNoFileAndNoProcess(streaming):
    body = Form().file("f", "x", bytes(3_000_000)).body()
    head = (f"POST /webapi/entry.cgi?{CALL}take HTTP/1.1\r\nHost: nas\r\nContent-Type: {TYPE}\r\n"
            f"Content-Length: {len(body)}\r\n\r\n").encode()
    places = random.Random(2)
    for _ in range(10):
        with socket.create_connection(("127.0.0.1", streaming.port), timeout=10) as connection:
            connection.sendall(head + body[:places.randrange(1, len(body))])
            time.sleep(0.02)
    assert wait_for(lambda: not children(streaming), 10)
    assert left_behind() == []


def test_ProcessThatIsKilledWhileABodyComes_LeavesNothing():
    body = Form().file("f", "x", bytes(1_000_000)).body()
    process = start(len(body), "take")
    process.stdin.write(body[:900_000])
    process.stdin.flush()
    time.sleep(0.1)
    process.kill()
    process.wait(timeout=10)
    assert left_behind() == []


@pytest.mark.parametrize("end", [signal.SIGTERM, signal.SIGPIPE, signal.SIGSEGV])
def test_ProcessThatIsEndedInItsMethod_LeavesNothing(mark, end):  # noqa: F811
    body = Form().field("mark", str(mark)).file("f", "x", b"1").body()
    process = start(len(body), "wait")
    process.stdin.write(body)
    process.stdin.close()
    assert wait_for(lambda: mark.read_text(), 10)
    assert len(left_behind()) == 1
    process.send_signal(end)
    assert process.wait(timeout=10) == -end
    assert left_behind() == []


def test_MethodThatExits_LeavesNothing(client):
    post(client, Form().file("f", "x", b"1"), "leave")
    assert wait_for(lambda: not left_behind(), 5)


def test_FilesOfAKilledMethod_AreRemovedByTheNextUpload(client):
    post(client, Form().file("f", "x", b"1").file("g", "y", b"2"), "die")
    assert wait_for(lambda: len(left_behind()) == 2, 5)
    assert post(client, Form().file("f", "x", b"1")).code == 0
    assert left_behind() == []


@pytest.fixture
def small_disk(root):
    """A file system of 20 MiB in the place of /tmp."""
    place = ROOT / "tmp"
    if subprocess.run(["mount", "-t", "tmpfs", "-o", "size=20m,mode=1777", "tmpfs", place],
                      capture_output=True, check=False).returncode != 0:
        pytest.skip("nothing may be mounted here")
    yield place
    subprocess.run(["umount", place], check=True)


@needs_root
@pytest.mark.parametrize("method, code", [("take", 108), ("defer", 400)])
def test_DiskThatFillsUp_IsTold(small_disk, method, code):
    body = Form().file("f", "x", bytes(12 << 20)).body()
    process = start(len(body), method)
    process.stdin.write(body[:4 << 20])
    process.stdin.flush()
    time.sleep(0.2)
    (small_disk / "other").write_bytes(bytes(10 << 20))
    answer = answer_of(process.communicate(body[4 << 20:], timeout=30)[0])
    assert answer["error"] == {"code": code, "errors": {"upload_err": -7}}
    assert os.listdir(small_disk) == ["other"]
    process.wait(timeout=10)


@needs_root
def test_UploadThatIsLargerThanTmp_GoesToVarTmp(small_disk, client):
    body = Form().file("f", "x", bytes(16 << 20))
    (file,) = post(client, body).data["files"]
    assert file["path"].startswith(str(ROOT / "var/tmp/"))


def test_VolumeOfTheSettings_ComesFirst(root, client):
    settings = ROOT / "etc/qeloinfo.conf"
    before = settings.read_text()
    volume = ROOT / "volume1"
    volume.mkdir()
    settings.write_text(before + 'volumes="/volume1"\n')
    try:
        (file,) = post(client, Form().file("f", "x", b"1")).data["files"]
        assert file["path"].startswith(str(volume / "@tmp"))
        assert (volume / "@tmp").stat().st_mode & 0o7777 == 0o1777
        assert list((volume / "@tmp").iterdir()) == []
    finally:
        settings.write_text(before)
        (volume / "@tmp").rmdir()
        volume.rmdir()


@pytest.mark.parametrize("method", ["take", "defer"])
@pytest.mark.parametrize("epilogue", [b"", b"x" * 100_000], ids=["bare", "epilogue"])
def test_BodyThatHasArrived_IsNotWaitedFor(method, epilogue):
    body = Form().file("f", "x", bytes(1_000_000)).body() + epilogue
    process = start(len(body), method)
    begin = time.monotonic()
    process.stdin.write(body)
    process.stdin.flush()  # and not closed: the server leaves that to the end
    answer = answer_of(process.stdout.read())
    process.wait(timeout=10)
    process.stdin.close()
    assert answer["success"]
    assert time.monotonic() - begin < 1.5
