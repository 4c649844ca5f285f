"""Files arrive whole, in parts and by condition, behind each web server."""

import errno
import json
import os
import random
import time
from socket import create_connection
from urllib.parse import quote

import pytest

from downloads import API, downloads, folder, sending  # noqa: F401  (fixtures)
from marks import wait_for
from servers import server  # noqa: F401  (a fixture)

# Around the buffers of programs, pipes and servers.
SIZES = (0, 1, 4095, 4096, 65535, 65536, 65537, 3 << 20)


def pattern(size):
    """The first bytes of always the same."""
    return random.Random(1).randbytes(3 << 20)[:size]


def test_File_OfEachSizeArrives(downloads):
    for size in SIZES:
        got = downloads.file(downloads.put("file.png", pattern(size)))
        assert (got.status, got.exit_code) == (200, 0)
        assert got.body == pattern(size), size
        assert int(got["Content-Length"]) == size
        assert got["Content-Type"] == "image/png"


def test_Answer_HasEachLineOnce(downloads):
    got = downloads.file(downloads.put("page.html", b"<script>alert(1)</script>"))
    assert got["Content-Type"] == "text/html"
    assert got["X-Content-Type-Options"] == "nosniff"
    assert "sandbox" in got["Content-Security-Policy"]
    assert got["Cache-Control"] == "private, no-cache"
    assert got["Content-Disposition"] == 'attachment; filename="page.html"'
    assert got["Accept-Ranges"] == "bytes"
    assert got["Last-Modified"] == "Sun, 09 Sep 2001 01:46:40 GMT"
    assert got["Status"] is None
    names = [name.lower() for name, _ in got.lines]
    assert len(names) == len(set(names))


def test_Range_IsAPart(downloads):
    file = downloads.put("file", pattern(100_000))
    for wanted, start, end in (("0-0", 0, 1), ("70000-", 70_000, 100_000), ("-1", 99_999, 100_000),
                               ("4095-65536", 4095, 65_537), ("99999-200000", 99_999, 100_000)):
        got = downloads.file(file, "-r", wanted)
        assert got.status == 206
        assert got.body == pattern(100_000)[start:end]
        assert got["Content-Range"] == f"bytes {start}-{end - 1}/100000"
        assert int(got["Content-Length"]) == end - start
    got = downloads.file(file, "-r", "100000-")
    assert (got.status, got["Content-Range"]) == (416, "bytes */100000")


def test_SeveralRanges_AreParts(downloads):
    got = downloads.file(downloads.put("file.txt", pattern(100_000)), "-r", "0-9,50000-50009,-10")
    assert got.status == 206
    boundary = got["Content-Type"].removeprefix("multipart/byteranges; boundary=").encode()
    parts = got.body.split(b"--" + boundary)
    assert [part.split(b"\r\n\r\n")[1][:-2] for part in parts[1:-1]] == [
        pattern(100_000)[:10], pattern(100_000)[50_000:50_010], pattern(100_000)[-10:]]
    assert parts[-1] == b"--\r\n"
    assert b"Content-Type: text/plain\r\nContent-Range: bytes 50000-50009/100000\r\n" in parts[2]


def test_BrokenDownload_IsResumed(downloads):
    content = pattern(200_000)
    file = downloads.put("file", content)
    for there in (1, 65_536, 199_999):
        local = downloads.directory / "local"
        local.write_bytes(content[:there])
        got = downloads.curl(downloads.url("file", path=file), "-C", "-", output=local)
        assert (got.status, got.exit_code) == (206, 0)
        assert local.read_bytes() == content


def test_Resuming_StartsAnewWhenTheFileHasChanged(downloads):
    file = downloads.put("file", b"a" * 1000)
    tag = downloads.file(file)["ETag"]
    assert tag.startswith('"')
    assert downloads.file(file, "-r", "10-", "-H", f"If-Range: {tag}").status == 206
    file.write_bytes(b"b" * 1000)
    got = downloads.file(file, "-r", "10-", "-H", f"If-Range: {tag}")
    assert (got.status, got.body) == (200, b"b" * 1000)


def test_Conditions_SaveTheContent(downloads):
    file = downloads.put("file", b"content")
    tag = downloads.file(file)["ETag"]
    got = downloads.file(file, "-H", f"If-None-Match: {tag}")
    assert (got.status, got.body, got["ETag"]) == (304, b"", tag)
    assert downloads.file(file, "-z", "Sun, 09 Sep 2001 01:46:40 GMT").status == 304
    assert downloads.file(file, "-z", "Sun, 09 Sep 2001 01:46:39 GMT").status == 200
    assert downloads.file(file, "-H", 'If-Match: "other"').status == 412
    assert downloads.file(file, "-H", f"If-Match: {tag}").body == b"content"
    before = "If-Unmodified-Since: Sun, 09 Sep 2001 01:46:39 GMT"
    assert downloads.file(file, "-H", before).status == 412


def test_Head_HasTheHeaderAlone(downloads):
    file = downloads.put("file.pdf", b"x" * 5000)
    got = downloads.file(file, "-I")
    assert got.status == 200
    assert got["Content-Length"] == "5000"
    assert got["Content-Type"] == "application/pdf"
    assert got["ETag"] == downloads.file(file)["ETag"]


def test_Name_OfAnyScriptArrives(downloads):
    for name in ("Bär.txt", "文書.txt", "ملف.txt", "a b;c'.txt", 'a"b%41.txt'):
        got = downloads.file(downloads.put(name, b"x"))
        encoded = quote(name, safe="!#$&+-.^_`|~")
        if encoded == name or name == "a b;c'.txt":
            assert got["Content-Disposition"] == f'attachment; filename="{name}"'
        else:
            assert got["Content-Disposition"].endswith(f"; filename*=UTF-8''{encoded}")
    got = downloads.file(downloads.put("file", b"x"), name="x/Ä\r\nX-Evil: 1", inline=1)
    assert got["Content-Disposition"] == (
        "inline; filename=\"___X-Evil: 1\"; filename*=UTF-8''%C3%84__X-Evil%3A%201")
    assert got["X-Evil"] is None


def test_Stream_OfUnknownLengthArrives(downloads):
    for size in (0, 1, 65_537, 1_000_000):
        got = downloads.curl(downloads.url("stream", size=size), "-r", "0-9")
        assert (got.status, got.exit_code) == (200, 0)
        assert got.body == (b"y\n" * (size // 2 + 1))[:size]
        assert got["Content-Type"] == "application/octet-stream"


def test_Descriptor_IsSentFromItsPosition(downloads):
    file = downloads.put("file.jpg", pattern(100_000))
    got = downloads.curl(downloads.url("descriptor", path=file))
    assert got.body == pattern(100_000)
    assert got["Content-Type"] == "image/jpeg"
    got = downloads.curl(downloads.url("descriptor", path=file, **{"from": 10}), "-r", "5-9")
    assert got.body == pattern(100_000)[15:20]
    assert got["Content-Range"] == "bytes 5-9/99990"


def test_FileThatCannotBeRead_IsAnErrorInJson(downloads):
    os.mkfifo(downloads.directory / "pipe")
    for path, error in ((downloads.directory / "missing", 2), (downloads.directory, 22),
                        (downloads.directory / "pipe", 22), ("/dev/zero", 22)):
        got = downloads.file(path, name="saved.txt")
        assert got.status == 200
        assert json.loads(got.body) == {"success": False, "error": {"code": 400, "errors": error}}
        assert got["Content-Type"].startswith("application/json")
        assert got["Content-Disposition"] is None


def test_MethodWithoutTheAttribute_SendsNothing(downloads, describe):
    describe(API, "sending.so", methods={"1": ["file"]})
    got = downloads.file(downloads.put("file", b"x"))
    assert json.loads(got.body)["error"] == {"code": 400, "errors": errno.EPERM}


@pytest.mark.parametrize("method", ["file", "endless"])
def test_ClientThatHangsUp_LeavesNoProcess(server, downloads, method):  # noqa: F811
    file = downloads.directory / "large"
    with open(file, "wb") as large:
        large.truncate(1 << 30)
    target = downloads.url(method, path=file).split(str(downloads.port), 1)[1]
    with create_connection(("127.0.0.1", downloads.port), timeout=10) as connection:
        connection.sendall(f"GET {target} HTTP/1.1\r\nHost: nas\r\n\r\n".encode())
        assert b"200" in connection.recv(1000)
        assert server.programs()
    assert wait_for(lambda: not server.programs(), 10)


def test_SlowClient_DelaysNobodyAndGetsAll(downloads):
    content = pattern(3 << 20)
    file = downloads.put("file", content)
    target = downloads.url("file", path=file).split(str(downloads.port), 1)[1]
    with create_connection(("127.0.0.1", downloads.port), timeout=10) as connection:
        connection.sendall(f"GET {target} HTTP/1.0\r\nHost: nas\r\n\r\n".encode())
        received = connection.recv(1000)
        started = time.monotonic()
        assert downloads.file(file, "-r", "0-9").body == content[:10]
        assert time.monotonic() - started < 5
        while piece := connection.recv(1 << 20):
            received += piece
    assert received.split(b"\r\n\r\n", 1)[1] == content
