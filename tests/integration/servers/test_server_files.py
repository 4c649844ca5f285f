"""Files go in and out through each web server, by forms and by the protocol for uploads in pieces."""

import os

import pytest

from client import Client
from files import Visitor, home, put  # noqa: F401  (fixture)
from servers import server  # noqa: F401  (a fixture)
from tus import Uploader


@pytest.fixture
def alice(server, home):  # noqa: F811
    return Visitor(Client(server.port), "alice")


def test_UploadInPieces_Works(alice, home):
    content = os.urandom(300_001)
    upload = Uploader(alice)
    assert upload.request("OPTIONS", upload.endpoint, Tus_Resumable=None).status == 204
    assert upload.create("größe", len(content)).status == 201
    answer = upload.patch(0, content[:200_000])
    assert (answer.status, answer.headers["Upload-Offset"], answer.content) == (204, "200000", b"")
    assert upload.offset() == 200_000
    assert upload.patch(100, b"x").status == 409
    assert upload.patch(200_000, content[200_000:]).status == 204
    assert (home / "größe").read_bytes() == content
    assert upload.create("other", 5).status == 201
    assert upload.request("DELETE").status == 204
    assert upload.request("HEAD").status == 404


def test_Form_AndDownload_Work(alice, home):
    content = os.urandom(300_001)
    body = (b'--x\r\nContent-Disposition: form-data; name="f"; filename="file"\r\n\r\n'
            + content + b"\r\n--x--\r\n")
    call = f"/webapi/entry.cgi?api=QELO.Files.Item&version=1&_sid={alice.sid}"
    answer = alice.client.request("POST", f"{call}&method=upload&path=/own", body=body, headers={
        "Content-Type": "multipart/form-data; boundary=x"})
    assert [item["path"] for item in answer.data["items"]] == ["/own/file"]
    assert (home / "file").read_bytes() == content
    answer = alice.client.request("GET", f"{call}&method=download&path=/own/file")
    assert answer.body == content
    archive = alice.client.request("GET", f'{call}&method=download&path=["/own/file","/own/file"]')
    assert archive.headers["Content-Type"] == "application/zip"
    assert len(archive.body) > 600_002
