"""One file in several requests, as docs/uploads.md has them."""

import os
import subprocess

import pytest

from conftest import ENTRY, ROOT, session_of
from upload import API, TYPE, Form, checksum, left_behind, post, uploading

ID = "0123456789abcdef"
CONTENT = bytes(index % 251 for index in range(300_000))


@pytest.fixture(autouse=True)
def described(describe):
    uploading(describe)


def headers(offset, size=len(CONTENT), name=ID):
    return {"X-TYPE-NAME": "SLICEUPLOAD", "X-UPLOAD-ID": name, "X-FILE-SIZE": str(size),
            "X-SLICE-OFFSET": str(offset)}


def send(client, sid, offset, content, method="user", **said):
    return post(client, Form().file("f", "x.bin", content), method, headers=headers(offset, **said),
                _sid=sid)


def ask(client, sid):
    return post(client, Form().field("a", "1"), "user", headers=headers(0), _sid=sid).data["received"]


@pytest.fixture
def sid(client):
    return session_of(client, "alice")["sid"]


@pytest.mark.parametrize("method", ["user", "defer"])
def test_Slices_MakeOneFile(client, sid, method):
    for offset in (0, 100_000):
        data = send(client, sid, offset, CONTENT[offset:offset + 100_000], method).data
        assert data == {"received": offset + 100_000, "size": len(CONTENT)}
    (file,) = send(client, sid, 200_000, CONTENT[200_000:], method).data["files"]
    assert (file["size"], file["sum"], file["name"]) == (len(CONTENT), checksum(CONTENT), "x.bin")
    assert left_behind() == []


def test_SliceThatBreaksOff_GoesOnWhereItEnded(client, sid):
    body = Form().file("f", "x.bin", CONTENT).body()
    environment = {"REQUEST_METHOD": "POST", "REMOTE_ADDR": "127.0.0.1", "CONTENT_TYPE": TYPE,
                   "CONTENT_LENGTH": str(len(body)),
                   "QUERY_STRING": f"api={API}&version=1&method=user&_sid={sid}",
                   **{f"HTTP_{name.replace('-', '_')}": value for name, value in headers(0).items()}}
    subprocess.run([ENTRY], input=body[:150_000], env=environment, capture_output=True, check=True)
    received = ask(client, sid)
    assert 100_000 < received < 150_000
    (file,) = send(client, sid, received, CONTENT[received:]).data["files"]
    assert file["sum"] == checksum(CONTENT)
    assert left_behind() == []


def test_SliceForAMethodThatReadsIt_GoesOnWhereItEnded(client, sid):
    send(client, sid, 0, CONTENT[:1000], "defer")
    answer = send(client, sid, 999, CONTENT[999:], "defer")
    assert answer.json["error"] == {"code": 400, "errors": {
        "upload_err": -10, "received": 1000, "size": len(CONTENT)}}
    question = post(client, Form().field("a", "1"), "defer", headers=headers(0), _sid=sid)
    assert question.data == {"received": 1000, "size": len(CONTENT)}
    (file,) = send(client, sid, 1000, CONTENT[1000:], "defer").data["files"]
    assert file["sum"] == checksum(CONTENT)
    assert left_behind() == []
    records = ROOT / "var/lib/webapi/uploads"
    assert [path.stat().st_size for path in records.iterdir()] == [0]  # for the next one to remove


def test_SliceAtAnotherPlace_IsToldTheRightOne(client, sid):
    send(client, sid, 0, CONTENT[:1000])
    answer = send(client, sid, 999, CONTENT[999:])
    assert answer.json["error"] == {"code": 108, "errors": {
        "upload_err": -10, "received": 1000, "size": len(CONTENT)}}
    assert send(client, sid, 1000, CONTENT[1000:]).code == 0


def test_SliceOfAnotherUser_IsOfAnotherFile(client, sid):
    send(client, sid, 0, CONTENT[:1000])
    bob = session_of(client, "bob")["sid"]
    assert ask(client, bob) == 0
    assert send(client, bob, 1000, CONTENT[1000:]).code == 108
    assert send(client, sid, 1000, CONTENT[1000:]).code == 0


def test_SliceOfNobody_IsRefused(client):
    answer = post(client, Form().file("f", "x", b"1"), "take", headers=headers(0))
    assert answer.json["error"]["errors"]["upload_err"] == -10
    assert left_behind() == []
