"""QELO.Files.Item while somebody else changes what an upload or a download is about."""

import json
import os
import subprocess
import threading
from urllib.parse import urlencode

import pytest

from conftest import ENTRY, answer_of
from files import API, BAD_NAMES, alice, give_folder, home, outside, put  # noqa: F401  (fixtures)
from upload import TYPE, Form, left_behind

CONTENT = b"new" * 300_000
FIRST = 700_000  # bytes, more than a pipe and the program's buffer: the file is being received


class Upload:
    """A form that comes to the program in two pieces."""

    def __init__(self, user, **parameters):
        self.body = Form().file("f", "x", CONTENT).body()
        sent = {key: json.dumps(value) for key, value in {"path": "/own", **parameters}.items()}
        self.process = subprocess.Popen([ENTRY], stdin=subprocess.PIPE, stdout=subprocess.PIPE, env={
            "REQUEST_METHOD": "POST", "REMOTE_ADDR": "127.0.0.1", "CONTENT_TYPE": TYPE,
            "CONTENT_LENGTH": str(len(self.body)), "QUERY_STRING": urlencode(
                {"api": API, "version": 1, "method": "upload", "_sid": user.sid, **sent})})
        self.process.stdin.write(self.body[:FIRST])
        self.process.stdin.flush()

    def finish(self):
        printed, _ = self.process.communicate(self.body[FIRST:], timeout=30)
        assert left_behind() == []
        return answer_of(printed)


def names(folder):
    return sorted(name for name in os.listdir(folder) if name != ".webapi")


@pytest.mark.parametrize("existing", ["refuse", "skip"])
def test_NameTakenDuringAnUpload_IsNotReplaced(alice, home, existing):  # noqa: F811
    upload = Upload(alice, existing=existing)
    put(home / "x", b"good")
    answer = upload.finish()
    if existing == "refuse":
        assert answer["error"]["errors"] == {"path": "/own/x", "reason": "exists"}
    else:
        assert answer["data"] == {"items": [], "skipped": ["/own/x"]}
    assert (home / "x").read_bytes() == b"good"
    assert names(home) == ["x"]


def test_FolderReplacedByALinkDuringAnUpload_LeadsNowhere(alice, home, outside):  # noqa: F811
    give_folder(home / "in")
    upload = Upload(alice, path="/own/in")
    os.rename(home / "in", home / "moved")
    (home / "in").symlink_to(outside)
    upload.finish()
    assert (home / "moved" / "x").read_bytes() == CONTENT  # the folder that was meant


def test_TargetReplacedByALinkDuringAnUpload_IsTheLinkAlone(alice, home, outside):  # noqa: F811
    put(home / "x", b"good")
    upload = Upload(alice, existing="replace")
    (home / "x").unlink()
    (home / "x").symlink_to(outside / "secret")
    assert upload.finish()["success"]
    assert not (home / "x").is_symlink()
    assert (home / "x").read_bytes() == CONTENT


def test_FolderRemovedDuringAnUpload_IsAnError(alice, home):  # noqa: F811
    give_folder(home / "in")
    upload = Upload(alice, path="/own/in")
    (home / "in").rmdir()
    assert upload.finish()["error"]["errors"]["reason"] == "not_found"
    assert names(home) == []


@pytest.mark.parametrize("name", [name for name in BAD_NAMES if name])
def test_UploadUnderANameThatIsNone_IsRefused(alice, home, name):  # noqa: F811
    query = urlencode({"api": API, "version": 1, "method": "upload", "_sid": alice.sid,
                       "path": '"/own"', "name": json.dumps(name)})
    answer = alice.client.request("POST", f"/webapi/entry.cgi?{query}", headers={
        "Content-Type": TYPE}, body=Form().file("f", "x", b"1").body())
    assert answer.json["error"]["errors"]["reason"] == "bad_name"
    assert names(home) == []


def test_FileReplacedByALinkAgainAndAgain_IsSentAsItIsOrNotAtAll(alice, home, outside):  # noqa: F811
    put(home / "file", b"good")
    (home / "link").symlink_to(outside / "secret")
    ends = threading.Event()

    def swap():
        while not ends.is_set():
            os.rename(home / "file", home / "kept")
            os.rename(home / "link", home / "file")
            os.rename(home / "file", home / "link")
            os.rename(home / "kept", home / "file")

    swapper = threading.Thread(target=swap)
    swapper.start()
    try:
        for _ in range(40):
            body = alice.call("download", path="/own/file").body
            assert body == b"good" or json.loads(body)["error"]["errors"]["reason"] in (
                "link", "not_found", "changed"), body
    finally:
        ends.set()
        swapper.join()
