"""QELO.Files.Item: files in, by a form."""

import json
import os
import socket
import time
from urllib.parse import quote, urlencode

import pytest

from conftest import needs_root
from files import API, alice, bob, common, give, give_folder, home, put  # noqa: F401  (fixtures)

BOUNDARY = "some-boundary"


def form(files, **fields):
    """A form as browsers send it: fields, then files of (name, content)."""
    body = b""
    for name, value in fields.items():
        body += (f'--{BOUNDARY}\r\nContent-Disposition: form-data; name="{name}"\r\n\r\n'
                 f"{value}\r\n").encode()
    for name, content in files:
        head = f'--{BOUNDARY}\r\nContent-Disposition: form-data; name="file"; filename="'
        body += head.encode() + name.encode() + b'"\r\nContent-Type: text/plain\r\n\r\n'
        body += content + b"\r\n"
    return body + f"--{BOUNDARY}--\r\n".encode()


def target(user, **query):
    return "/webapi/entry.cgi?" + urlencode(
        {"api": API, "version": 1, "method": "upload", "_sid": user.sid, **query})


def post(user, body, **query):
    return user.client.request("POST", target(user, **query), body=body, headers={
        "Content-Type": f"multipart/form-data; boundary={BOUNDARY}"})


def refused(answer):
    errors = answer.json["error"]["errors"]
    return errors["reason"], errors["path"]


def names(folder):
    return sorted(name for name in os.listdir(folder) if name != ".webapi")


@pytest.mark.parametrize("size", [0, 1, 65_535, 65_536, 1_000_003])
def test_Upload_IsTheUsersFile(alice, home, size):
    content = os.urandom(size)
    answer = post(alice, form([("größe.bin", content)], path="/own"))
    (item,) = answer.data["items"]
    assert (item["path"], item["size"], item["mode"]) == ("/own/größe.bin", size, "0644")
    assert (home / "größe.bin").read_bytes() == content
    info = (home / "größe.bin").stat()
    assert (info.st_uid, info.st_gid) == (home.stat().st_uid, home.stat().st_gid)
    assert names(home) == ["größe.bin"]


def test_Upload_OfSeveral_PutsAll(alice, home):
    answer = post(alice, form([("a", b"1"), ("b", b"22")]), path="/own")
    assert [item["name"] for item in answer.data["items"]] == ["a", "b"]
    assert ((home / "a").read_bytes(), (home / "b").read_bytes()) == (b"1", b"22")


@needs_root
def test_Upload_IntoASharedFolder_HasItsGroup(alice, common):
    assert post(alice, form([("file", b"x")]), path="/common").code == 0
    assert (common / "file").stat().st_gid == common.stat().st_gid
    assert (common / "file").stat().st_uid != common.stat().st_uid


def test_Upload_WhereTheNameIsTaken_DoesAsItIsTold(alice, home):
    put(home / "file", b"old")
    body = form([("file", b"new")])
    assert refused(post(alice, body, path="/own")) == ("exists", "/own/file")
    assert post(alice, body, path="/own", existing="skip").data == {
        "items": [], "skipped": ["/own/file"]}
    assert (home / "file").read_bytes() == b"old"
    assert len(post(alice, body, path="/own", existing="replace").data["items"]) == 1
    assert (home / "file").read_bytes() == b"new"
    assert post(alice, body, path="/own", existing="maybe").code == 101
    assert names(home) == ["file"]


def test_Upload_UnderAnotherName_IsOfOneFile(alice, home):
    assert post(alice, form([("file", b"x")]), path="/own", name="other").code == 0
    assert names(home) == ["other"]
    answer = post(alice, form([("a", b"x"), ("b", b"y")]), path="/own", name="third")
    assert answer.code == 101
    assert [item["name"] for item in answer.json["error"]["errors"]["items"]] == ["third"]


def test_Upload_WhoseSecondFileIsRefused_TellsTheFirst(alice, home):
    put(home / "b", b"old")
    answer = post(alice, form([("a", b"1"), ("b", b"2"), ("c", b"3")]), path="/own")
    assert refused(answer) == ("exists", "/own/b")
    assert [item["name"] for item in answer.json["error"]["errors"]["items"]] == ["a"]
    assert names(home) == ["a", "b"]


@pytest.mark.parametrize("name", ["a\x07b", "x" * 256, ".qelo-part-1", "a\x7f"])
def test_Upload_OfANameThatIsNone_IsRefused(alice, home, name):
    assert refused(post(alice, form([(name, b"x")]), path="/own"))[0] == "bad_name"
    assert names(home) == []


def test_Upload_OfANameWithFolders_TakesItsLastPart(alice, home):
    assert post(alice, form([("../../etc/passwd", b"x")]), path="/own").code == 0
    assert names(home) == ["passwd"]
    for name in ("..", "a/.."):
        assert post(alice, form([(name, b"x")]), path="/own").code in (108, 401)
    assert refused(post(alice, form([("f", b"x")]), path="/own", name="../x"))[0] == "bad_name"
    assert names(home) == ["passwd"]


def test_Upload_ToWhereNothingMayGo_IsRefused(alice, home, tmp_path):
    tmp_path.chmod(0o777)
    (home / "link").symlink_to(tmp_path)
    put(home / "file")
    for path, reason in (("/public", "read_only"), ("/none", "no_share"), ("/", "no_share"),
                         ("/own/none", "not_found"), ("/own/file", "not_a_folder"),
                         ("/own/link", "link"), ("/own/../etc", "bad_path")):
        assert refused(post(alice, form([("f", b"x")]), path=path))[0] == reason
    assert post(alice, form([("f", b"x")])).code == 101
    assert post(alice, form([], path="/own")).code == 101
    assert os.listdir(tmp_path) == []


def test_Upload_OverALink_ReplacesTheLinkAlone(alice, home, tmp_path):
    secret = put(tmp_path / "secret", b"secret")
    tmp_path.chmod(0o777)
    (home / "link").symlink_to(secret)
    os.link(secret, home / "hard")
    for name in ("link", "hard"):
        assert post(alice, form([(name, b"new")]), path="/own", existing="replace").code == 0
        assert (home / name).read_bytes() == b"new" and not (home / name).is_symlink()
    assert secret.read_bytes() == b"secret"


def test_Upload_OfAFormThatIsNone_Is108(alice, home):
    body = form([("file", b"x" * 100)], path="/own")
    assert post(alice, body[:-30]).json["error"] == {"code": 108, "errors": {"upload_err": -3}}
    assert post(alice, b"no form", path="/own").code == 108
    assert names(home) == []


def test_BrokenUpload_LeavesTheGoodFile(alice, home):
    put(home / "file", b"good")
    body = form([("file", b"x" * 500_000)], path="/own", existing="replace")
    head = (f"POST {target(alice)} HTTP/1.1\r\nHost: x\r\n"
            f"Content-Type: multipart/form-data; boundary={BOUNDARY}\r\n"
            f"Content-Length: {len(body)}\r\n\r\n").encode()
    for length in (0, 100, 400, 300_000, len(body) - 1):
        with socket.create_connection(("127.0.0.1", alice.client.port)) as connection:
            connection.sendall(head + body[:length])
        time.sleep(0.05)
        assert (home / "file").read_bytes() == b"good"
    assert names(home) == ["file"]


def test_Upload_ByAPlainPost_IsNone(alice, home):
    answer = alice.call("upload", path="/own")
    assert answer.code == 108
    assert alice.client.get(f"api={API}&version=1&method=upload&_sid={alice.sid}"
                            f"&path={quote(json.dumps('/own'))}").code == 108
