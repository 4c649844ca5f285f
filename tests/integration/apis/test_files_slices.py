"""QELO.Files.Item: one file in several forms, for what no client wants to begin anew."""

import os
from urllib.parse import urlencode

import pytest

from client import PATH
from conftest import ROOT, needs_root
from files import API, alice, bob, common, home, put  # noqa: F401  (fixtures)
from upload import TYPE, Form, left_behind

ID = "a-large-file-of-alice"
CONTENT = bytes(index % 251 for index in range(300_000))


def send(user, offset, content):
    """A slice, or without a content the question how much there is."""
    form = Form().field("path", "/own")
    if content is not None:
        form.file("f", "large.bin", content)
    query = urlencode({"api": API, "version": 1, "method": "upload", "_sid": user.sid})
    return user.client.request("POST", f"{PATH}?{query}", body=form.body(), headers={
        "Content-Type": TYPE, "X-TYPE-NAME": "SLICEUPLOAD", "X-UPLOAD-ID": ID, "X-FILE-SIZE": str(len(CONTENT)),
        "X-SLICE-OFFSET": str(offset)})


def test_Slices_AreAFileWhenItIsWhole(alice, home):
    for offset in (0, 100_000):
        answer = send(alice, offset, CONTENT[offset:offset + 100_000])
        assert answer.data == {"received": offset + 100_000, "size": len(CONTENT)}
        assert names(home) == []
    assert send(alice, 0, None).data["received"] == 200_000
    (item,) = send(alice, 200_000, CONTENT[200_000:]).data["items"]
    assert (item["path"], item["size"], item["mode"]) == ("/own/large.bin", len(CONTENT), "0644")
    assert (home / "large.bin").read_bytes() == CONTENT
    assert (home / "large.bin").stat().st_uid == home.stat().st_uid
    assert left_behind() == []
    records = ROOT / "var/lib/webapi/uploads"
    assert [path.stat().st_size for path in records.iterdir()] == [0]  # for the next one to remove


def test_SliceAtAnotherPlace_IsToldTheRightOne(alice, home):
    send(alice, 0, CONTENT[:1000])
    answer = send(alice, 999, CONTENT[999:])
    assert answer.json["error"] == {"code": 108, "errors": {
        "upload_err": -10, "received": 1000, "size": len(CONTENT)}}
    assert send(alice, 1000, CONTENT[1000:]).code == 0


def test_SliceOfATakenName_IsRefusedBeforeItComes(alice, home):
    put(home / "large.bin", b"good")
    assert send(alice, 0, CONTENT[:1000]).json["error"]["errors"]["reason"] == "exists"
    assert send(alice, 0, None).data["received"] == 0
    assert (home / "large.bin").read_bytes() == b"good"
    assert left_behind() == []


@needs_root
def test_PartOfAnother_IsNotHers(alice, bob, common):
    send(alice, 0, CONTENT[:1000])
    assert send(bob, 0, None).data["received"] == 0
    assert send(bob, 1000, CONTENT[1000:]).code == 108
    assert send(alice, 1000, CONTENT[1000:]).code == 0


def names(folder):
    return [name for name in os.listdir(folder) if name != ".webapi"]


@pytest.fixture(autouse=True)
def cleared(root):
    yield
    for folder in ("tmp", "var/lib/webapi/uploads"):
        for path in (ROOT / folder).glob("*"):
            path.unlink()
