"""Who may send the API daemon what."""

import json
import os
import socket
import stat
import struct
import subprocess

import pytest

from conftest import needs_root
from daemon import ENTRIES, call, describe_there, entries, path, start  # noqa: F401  (fixtures)
from marks import wait_for


def exchange(path, data, end=False):
    """Sends bytes and answers all that comes back."""
    with socket.socket(socket.AF_UNIX) as connection:
        connection.settimeout(10)
        connection.connect(str(path))
        connection.sendall(data)
        if end:
            connection.shutdown(socket.SHUT_WR)
        received = b""
        try:
            while piece := connection.recv(65536):
                received += piece
        except ConnectionResetError:
            pass
        return received


def framed(text):
    return struct.pack(">I", len(text)) + text


@needs_root
def test_PeerOfAnotherAccount_IsHungUpOn(start, entries, path):
    daemon = start()
    path.chmod(0o666)  # as by mistake
    code = ("import socket, sys\n"
            "c = socket.socket(socket.AF_UNIX); c.settimeout(10); c.connect(sys.argv[1])\n"
            "try: print(len(c.recv(10)))\n"
            "except ConnectionError: print(0)\n")
    alone = subprocess.run(["/usr/bin/python3", "-c", code, path], user=1002, group=1002,
                           extra_groups=[], capture_output=True, text=True, timeout=30, check=False)
    if "Permission" in alone.stderr:
        pytest.skip("the build tree cannot be reached by another account")
    assert alone.stdout == "0\n", alone
    daemon.log_line("refused a message of the user 1002")


@pytest.mark.parametrize("text", [
    b"", b"no JSON", b"{}", b'{"req": {}}', b'{"req": 5, "resp": {}}', b"[" * 5000,
    b'{"req": [], "resp": []}'], ids=range(7))
def test_MessageThatIsNoCall_GetsNoAnswer(start, entries, path, text):
    daemon = start()
    assert exchange(path, framed(text)) == b""
    daemon.log_line("the message is no call")
    assert call(ENTRIES, "echo", a=1)["data"]["a"] == 1


def test_MessageTooLongOrCutShort_GetsNoAnswer(start, entries, path):
    daemon = start()
    assert exchange(path, b"\xff\xff\xff\xff") == b""
    assert exchange(path, framed(b"{}")[:-1], end=True) == b""
    assert wait_for(lambda: daemon.log().count("no message came") == 2, 5)
    assert call(ENTRIES, "echo", a=1)["data"]["a"] == 1


def test_ApiOfAnotherSocket_IsNotServed(start, entries, path):
    start()
    for api, code in [("QELO.Test.Open", 102), ("QELO.Entry.Request", 102), (ENTRIES, 0)]:
        record = {"param": {"api": api, "version": 1, "method": "echo"},
                  "private": {"api": api, "version": 1, "method":
                              {"QELO.Test.Open": "plain", "QELO.Entry.Request": "request"}.get(api, "echo")}}
        sections = {"environ": {}, "cookie": {}, "reqLib": {}, "session": {}, "attr": {}, "url": {},
                    "userAgent": {}}
        answer = exchange(path, framed(json.dumps({"req": {**sections, **record}, "resp": {
            "headers": {}, "setCookie": [], "success": {}, "option": {}, "code": 117}}).encode()))
        assert json.loads(answer[4:])["code"] == code, api


def test_Socket_IsTheOwnersAlone(start, entries, path):
    start()
    info = os.stat(path)
    assert stat.S_ISSOCK(info.st_mode) and stat.S_IMODE(info.st_mode) == 0o600
    assert info.st_uid == os.geteuid()
    assert stat.S_IMODE(os.stat(path.parent).st_mode) & 0o022 == 0
