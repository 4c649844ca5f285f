"""Clients that send, or read, a byte now and then hold no process for long."""

import contextlib
import json
import socket
import time
from urllib.parse import urlencode

import pytest

from client import PATH, Client
from conftest import ENTRY, ROOT, session_of
from downloads import downloads, folder, sending  # noqa: F401  (fixtures)
from files import home  # noqa: F401  (a fixture)
from marks import wait_for
from upload import API, TYPE, Form, left_behind, uploading
from webserver import WebServer

LIMITS = 'upload_window="1"\ndownload_window="2"\ntransfer_least_rate="1000"\n'


@pytest.fixture
def server(root, tmp_path):
    """One that hands a body on while it comes, on a host that has little patience."""
    settings = ROOT / "etc/qeloinfo.conf"
    before = settings.read_text()
    settings.write_text(before + LIMITS)
    one = WebServer(tmp_path, ENTRY, "server.stream-request-body = 2\n")
    yield one.start()
    one.stop()
    settings.write_text(before)


def trickle(server, head, body, seconds, pause=0.1):
    """Sends a byte now and then. @return what is answered, or None after so many seconds"""
    with socket.create_connection(("127.0.0.1", server.port), timeout=10) as connection:
        connection.sendall(head)
        end = time.monotonic() + seconds
        connection.settimeout(pause)
        for at in range(len(body)):
            if time.monotonic() > end:
                return None
            try:
                connection.sendall(body[at:at + 1])
                return connection.recv(65536)
            except TimeoutError:
                continue
            except ConnectionError:
                return b""
    return None


def head_of(length, query="", verb="POST", **headers):
    lines = "".join(f"{name.replace('_', '-')}: {value}\r\n" for name, value in headers.items())
    return (f"{verb} {PATH}?{query} HTTP/1.1\r\nHost: nas\r\n{lines}"
            f"Content-Length: {length}\r\n\r\n").encode()


@pytest.mark.parametrize("method", ["take", "defer"])
def test_UploadByteByByte_IsGivenUp(server, describe, method):
    uploading(describe)
    body = Form().file("f", "x", bytes(10_000)).body()
    head = head_of(len(body), f"api={API}&version=1&method={method}", Content_Type=TYPE)
    answer = trickle(server, head, body, 8)
    assert b'"upload_err":-1' in answer.replace(b" ", b"")
    assert wait_for(lambda: not server.programs(), 10)
    assert left_behind() == []


def test_ParametersByteByByte_AreTakenAsFarAsTheyCame(server):
    body = b"api=QELO.Host.Info&version=1&method=get&" + b"x" * 10_000
    head = head_of(len(body), Content_Type="application/x-www-form-urlencoded")
    answer = trickle(server, head, body, 8)
    assert b'"code":101' in answer.replace(b" ", b"")
    assert wait_for(lambda: not server.programs(), 10)


def test_ResumableUploadByteByByte_KeepsWhatCame(server, home):  # noqa: F811
    sid = session_of(Client(server.port), "alice")["sid"]
    query = urlencode({"api": "QELO.Files.Item", "version": 1, "method": "tus", "_sid": sid,
                       "path": json.dumps("/own"), "name": json.dumps("slow.bin")})
    created = Client(server.port).request("POST", f"{PATH}?{query}", body=b"", headers={
        "Tus-Resumable": "1.0.0", "Upload-Length": "10000"})
    target = created.headers["Location"].partition("?")[2]
    head = head_of(10_000, target, "PATCH", Tus_Resumable="1.0.0", Upload_Offset=0,
                   Content_Type="application/offset+octet-stream")
    answer = trickle(server, head, b"x" * 10_000, 8)
    assert answer.startswith(b"HTTP/1.1 204")
    assert 0 < int(answer.partition(b"Upload-Offset: ")[2].split()[0]) < 1000
    assert wait_for(lambda: not server.programs(), 10)


def test_BodyThatIsSlowButNotTooSlow_IsTaken(server, describe):
    uploading(describe)
    body = Form().file("f", "x", bytes(6_000)).body()
    head = head_of(len(body), f"api={API}&version=1&method=take", Content_Type=TYPE)
    with socket.create_connection(("127.0.0.1", server.port), timeout=10) as connection:
        connection.sendall(head)
        for at in range(0, len(body), 500):  # 2,500 bytes a second
            connection.sendall(body[at:at + 500])
            time.sleep(0.2)
        assert b'"success":true' in connection.recv(65536).replace(b" ", b"")


def test_DownloadThatNobodyReads_IsGivenUp(server, downloads):  # noqa: F811
    file = downloads.put("large", bytes(64 << 20))
    target = downloads.url("file", path=file).partition(PATH)[2]
    with socket.create_connection(("127.0.0.1", server.port), timeout=10) as connection:
        connection.sendall(f"GET {PATH}{target} HTTP/1.1\r\nHost: nas\r\n\r\n".encode())
        assert wait_for(server.programs, 5)
        assert wait_for(lambda: not server.programs(), 10)
        received = 0
        connection.settimeout(0.5)
        with contextlib.suppress(TimeoutError):  # the server hangs up some seconds later
            while piece := connection.recv(1 << 20):
                received += len(piece)
        assert 0 < received < 64 << 20
