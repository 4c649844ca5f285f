"""QELO.Files.Item: files out, one as it is, several as an archive."""

import io
import json
import os
import subprocess
import zipfile
from pathlib import Path
from urllib.parse import urlencode

from conftest import ENTRY, needs_root
from files import API, alice, bob, common, give, give_folder, home, put  # noqa: F401  (fixtures)


def get(user, path, headers=None, verb="GET", **parameters):
    query = {"api": API, "version": 1, "method": "download", "_sid": user.sid,
             "path": json.dumps(path), **parameters}
    return user.client.request(verb, "/webapi/entry.cgi?" + urlencode(query), headers=headers)


def archive_of(answer):
    assert answer.status == 200 and answer.headers["Content-Type"] == "application/zip", answer.body
    archive = zipfile.ZipFile(io.BytesIO(answer.body))
    assert archive.testzip() is None
    return archive


def test_Download_OfAFile_SendsItWithItsNameAndType(alice, home):
    content = os.urandom(300_000)
    put(home / "Grüße \"1\".txt", content)
    answer = get(alice, "/own/Grüße \"1\".txt")
    assert answer.body == content
    assert answer.headers["Content-Type"].startswith("text/plain")
    assert answer.headers["Content-Length"] == "300000"
    disposition = answer.headers["Content-Disposition"]
    assert disposition.startswith("attachment") and "Gr%C3%BC%C3%9Fe" in disposition
    assert answer.headers["X-Content-Type-Options"] == "nosniff"
    shown = get(alice, "/own/Grüße \"1\".txt", inline="true")
    assert shown.headers["Content-Disposition"].startswith("inline")


def test_Download_OfAnEmptyFile_IsEmpty(alice, home):
    put(home / "empty")
    answer = get(alice, "/own/empty")
    assert (answer.status, answer.body) == (200, b"")


def test_Download_InRanges_AndWhenItChanged(alice, home):
    put(home / "file", b"0123456789")
    os.utime(home / "file", (1_000_000, 1_000_000))
    part = get(alice, "/own/file", {"Range": "bytes=2-4"})
    assert (part.status, part.body) == (206, b"234")
    assert part.headers["Content-Range"] == "bytes 2-4/10"
    again = get(alice, "/own/file", {"If-None-Match": part.headers["ETag"]})
    assert (again.status, again.body) == (304, b"")
    head = get(alice, "/own/file", verb="HEAD")
    assert (head.status, head.body, head.headers["Content-Length"]) == (200, b"", "10")


def test_Download_OfAFolder_IsAnArchiveOfIt(alice, home):
    put(home / "Ordner ä" / "file", b"text")
    put(home / "Ordner ä" / "größe" / "deep", b"d" * 1_000_000)
    give_folder(home / "Ordner ä" / "empty")
    os.utime(home / "Ordner ä" / "file", (1_500_000_000, 1_500_000_000))
    archive = archive_of(get(alice, "/own/Ordner ä"))
    assert sorted(archive.namelist()) == [
        "Ordner ä/", "Ordner ä/empty/", "Ordner ä/file", "Ordner ä/größe/", "Ordner ä/größe/deep"]
    assert archive.read("Ordner ä/file") == b"text"
    assert archive.read("Ordner ä/größe/deep") == b"d" * 1_000_000
    assert archive.getinfo("Ordner ä/file").date_time[0] == 2017


def test_Download_OfSeveral_IsAnArchiveOfThem(alice, home, common):
    put(home / "a", b"1")
    put(common / "b" / "c", b"2")
    answer = get(alice, ["/own/a", "/common/b"])
    assert sorted(archive_of(answer).namelist()) == ["a", "b/", "b/c"]
    assert 'filename="own.zip"' in answer.headers["Content-Disposition"]
    names = archive_of(get(alice, "/common")).namelist()
    assert sorted(names) == ["common/", "common/b/", "common/b/c"]


def test_Download_TellsInTheArchiveWhatIsLeftOut(alice, home, tmp_path):
    (tmp_path / "secret").write_text("secret")
    put(home / "folder" / "file", b"x")
    (home / "folder" / "link").symlink_to(tmp_path / "secret")
    (home / "folder" / "up").symlink_to("..")
    os.mkfifo(home / "folder" / "pipe")
    archive = archive_of(get(alice, "/own/folder"))
    assert sorted(archive.namelist()) == ["folder/", "folder/file", "left-out.txt"]
    assert sorted(archive.read("left-out.txt").decode().splitlines()) == [
        "folder/link: link", "folder/pipe: special", "folder/up: link"]


@needs_root
def test_Download_OfWhatIsDenied_IsRefusedOrLeftOut(alice, bob, common):
    put(common / "folder" / "open", b"x")
    put(common / "folder" / "locked", b"secret")
    (common / "folder").chmod(0o755)
    (common / "folder" / "locked").chmod(0o600)
    assert get(bob, "/common/folder/locked").json["error"] == {
        "code": 405, "errors": {"path": "/common/folder/locked", "reason": "denied"}}
    archive = archive_of(get(bob, "/common/folder"))
    assert archive.read("left-out.txt") == b"folder/locked: denied\n"
    assert b"secret" not in get(bob, "/common/folder").body


def test_Download_OfWhatIsNoFile_IsRefused(alice, home):
    (home / "link").symlink_to("/etc/passwd")
    os.mkfifo(home / "pipe")
    for path, reason in (("/own/link", "link"), ("/own/pipe", "special"), ("/own/none", "not_found"),
                         ("/own/link/x", "link"), ("/own/../etc", "bad_path"), ("/", "no_share"),
                         (["/own", "/own/none"], "not_found")):
        answer = get(alice, path)
        assert answer.headers["Content-Type"].startswith("application/json")
        assert answer.json["error"]["errors"]["reason"] == reason
    assert get(alice, []).code == 101


def test_Archive_IsSentWhileItIsWritten(alice, home):
    """Of 64 GiB that take no room on the disk the first bytes are there at once."""
    give_folder(home / "large")
    for number in range(2):
        with open(put(home / "large" / f"{number}"), "wb") as file:
            file.truncate(32 << 30)
    query = urlencode({"api": API, "version": 1, "method": "download", "_sid": alice.sid,
                       "path": json.dumps("/own/large")})
    with subprocess.Popen([ENTRY], stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                          env={"REQUEST_METHOD": "GET", "REMOTE_ADDR": "127.0.0.1",
                               "QUERY_STRING": query}) as process:
        first = process.stdout.read(1 << 20)
        memory = Path(f"/proc/{process.pid}/status").read_text()
        process.stdout.close()
        assert process.wait(timeout=10) == 0, "it ends when nobody reads any more"
    assert b"\r\n\r\nPK\x03\x04" in first
    assert len(first) == 1 << 20
    (peak,) = [line.split()[1] for line in memory.splitlines() if line.startswith("VmHWM")]
    assert int(peak) < 40 << 10, "KiB"
