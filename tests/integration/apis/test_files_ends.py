"""QELO.Files.Item: uploads that break off, at every byte, leave neither a file nor a process."""

import base64
import hashlib
import json
import os
import socket
import subprocess
from urllib.parse import urlencode

import pytest

from client import PATH
from conftest import ENTRY, answer_of
from files import API, Visitor, home, put  # noqa: F401  (fixtures)
from marks import wait_for
from tus import BODY
from upload import TYPE, Form, left_behind
from webserver import WebServer

CONTENT = b"0123456789abcdefghijklmnop"


@pytest.fixture
def alice(client, home):  # noqa: F811
    return Visitor(client, "alice")


def query(user, method, **parameters):
    sent = {key: json.dumps(value) for key, value in parameters.items()}
    return urlencode({"api": API, "version": 1, "method": method, "_sid": user.sid, **sent})


def run(verb, target, body=b"", length=None, **headers):
    """What the program prints for a body that ends early."""
    variables = {"REQUEST_METHOD": verb, "REMOTE_ADDR": "127.0.0.1", "QUERY_STRING": target,
                 "CONTENT_LENGTH": str(len(body) if length is None else length), **headers}
    return subprocess.run([ENTRY], input=body, env=variables, capture_output=True, timeout=30,
                          check=True).stdout


def left_in(folder):
    return sorted(name for name in os.listdir(folder) if name != ".webapi")


def programs():
    """The processes of the program."""
    found = []
    for process in filter(str.isdigit, os.listdir("/proc")):
        try:
            if os.readlink(f"/proc/{process}/exe") == str(ENTRY):
                found.append(process)
        except OSError:
            continue  # it has ended
    return found


@pytest.mark.parametrize("existing", ["refuse", "replace"])
def test_FormThatBreaksOffAtAnyByte_LeavesNothing(alice, home, existing):  # noqa: F811
    body = Form().field("path", "/own").field("existing", existing).file("f", "x", b"new").body()
    target = query(alice, "upload")
    if existing == "replace":
        put(home / "x", b"good")
    for length in range(1, len(body) - 2):  # but for the line end behind the last boundary
        answer = answer_of(run("POST", target, body[:length], len(body), CONTENT_TYPE=TYPE))
        assert answer["error"]["errors"]["upload_err"] == -1, length
        assert left_in(home) == (["x"] if existing == "replace" else []), length
        if existing == "replace":
            assert (home / "x").read_bytes() == b"good", length
        assert left_behind() == [], length
    assert programs() == []


def created(alice, length):
    """The query that goes on with a new resumable upload."""
    name = base64.b64encode(b"x").decode()
    printed = run("POST", query(alice, "tus", path="/own"), HTTP_TUS_RESUMABLE="1.0.0",
                  HTTP_UPLOAD_LENGTH=str(length), HTTP_UPLOAD_METADATA=f"filename {name}")
    location = next(line for line in printed.decode().split("\r\n") if line.startswith("Location: "))
    return location.partition("?")[2]


def offset_of(target):
    printed = run("HEAD", target, HTTP_TUS_RESUMABLE="1.0.0").decode()
    return int(printed.partition("Upload-Offset: ")[2].split()[0])


def patch(target, offset, body, length, **headers):
    return run("PATCH", target, body, length, HTTP_TUS_RESUMABLE="1.0.0", CONTENT_TYPE=BODY,
               HTTP_UPLOAD_OFFSET=str(offset), **headers)


def unfinished(home):  # noqa: F811
    return [name for name in left_in(home) if name.startswith(".qelo-part-")]


def test_ResumableThatBreaksOffAtAnyByte_GoesOnFromThere(alice, home):  # noqa: F811
    for length in range(len(CONTENT)):
        target = created(alice, len(CONTENT))
        patch(target, 0, CONTENT[:length], len(CONTENT))
        assert offset_of(target) == length
        assert left_in(home) == unfinished(home)  # no target
        patch(target, length, CONTENT[length:], len(CONTENT) - length)
        assert (home / "x").read_bytes() == CONTENT, length
        assert left_in(home) == ["x"]
        (home / "x").unlink()
    assert programs() == []


def test_CheckedPieceThatBreaksOffAtAnyByte_CountsNothing(alice, home):  # noqa: F811
    digest = "sha1 " + base64.b64encode(hashlib.sha1(CONTENT).digest()).decode()
    target = created(alice, len(CONTENT))
    for length in range(len(CONTENT)):
        patch(target, 0, CONTENT[:length], len(CONTENT), HTTP_UPLOAD_CHECKSUM=digest)
        assert offset_of(target) == 0, length
        assert len(unfinished(home)) == len(left_in(home)) == 1
    patch(target, 0, CONTENT, len(CONTENT), HTTP_UPLOAD_CHECKSUM=digest)
    assert (home / "x").read_bytes() == CONTENT
    assert programs() == []


def test_ManyConnectionsThatBreakOffAtOnce_LeaveNothing(alice, home, tmp_path):  # noqa: F811
    server = WebServer(tmp_path, ENTRY, "server.stream-request-body = 2\n").start()
    try:
        body = Form().field("path", "/own").file("f", "x", bytes(3000)).body()
        head = (f"POST {PATH}?{query(alice, 'upload')} HTTP/1.1\r\nHost: nas\r\nContent-Type: {TYPE}"
                f"\r\nContent-Length: {len(body)}\r\n\r\n").encode()
        connections = []
        for length in range(1, 3000, 120):
            connection = socket.create_connection(("127.0.0.1", server.port), timeout=10)
            connection.sendall(head + body[:length])
            connections.append(connection)
        assert wait_for(lambda: len(server.programs()) > 5, 10)
        for connection in connections:
            connection.close()
        assert wait_for(lambda: not server.programs(), 20)
        assert left_in(home) == []
        assert left_behind() == []
    finally:
        server.stop()
