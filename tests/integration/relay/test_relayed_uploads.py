"""Uploads that another host takes."""

import hashlib
import socket
import time
from urllib.parse import urlencode

import pytest
from conftest import ROOT, needs_root
from relay_hosts import API, authority, good, hosts, other, scripted  # noqa: F401
from tls import json_answer
from upload import TYPE, Form

pytestmark = needs_root


def upload(client, session, body, **parameters):
    query = urlencode({"api": "QELO.Test.Upload", "version": 1, "method": "run", "_sid": session["sid"],
                       "relay_zt": 7, **parameters})
    return client.request("POST", f"/webapi/entry.cgi?{query}", body,
                          {"Content-Type": "multipart/form-data; boundary=b"})


def test_Upload_IsPassedOnWhole(client, admin, scripted, hosts, describe):
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, scripted.url)
    body = bytes(range(256)) * 40_000
    del scripted.requests[:]
    answer = upload(client, admin, body, x="a b", relay_timeout=20)
    assert answer.json == {"success": True}
    assert answer.headers["Content-type"] == 'text/plain; charset="UTF-8"'
    line, headers, _, digest = scripted.requests[0]
    assert line == ('POST /webapi/entry.cgi?api=%22QELO.Test.Upload%22&version=1&method=%22run%22'
                    '&x=%22a%20b%22 HTTP/1.1\r\n')
    assert headers["Content-Type"] == "multipart/form-data; boundary=b"
    assert headers["Content-Length"] == str(len(body))
    assert digest == hashlib.sha256(body).hexdigest()


def test_UploadThatFails_AnswersAllTheSame(client, admin, scripted, hosts, describe):
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, "https://localhost:1/webapi/entry.cgi")
    assert upload(client, admin, b"x" * 3_000_000).code == 109
    hosts(7, scripted.url)
    assert upload(client, admin, b"x", long="x" * 6000).code == 109


def test_Upload_ReachesTheMethodOfTheOtherHost(client, admin, other, hosts):
    """A file, there and back again, and nothing of it here."""
    hosts(7, other.url, other.token)
    content = bytes(range(256)) * 8_000
    query = {"api": "QELO.Files.Item", "version": 1, "_sid": admin["sid"], "relay_zt": 7}
    target = f"/webapi/entry.cgi?{urlencode({**query, 'method': 'upload', 'path': '/own'})}"
    form = Form().field("existing", "refuse").file("file", "relayed.bin", content).body()
    answer = client.request("POST", target, form, {"Content-Type": TYPE})
    assert [item["path"] for item in answer.data["items"]] == ["/own/relayed.bin"]
    assert (other.place / "home/alice/relayed.bin").read_bytes() == content
    assert not list((ROOT / "home").rglob("relayed.bin"))
    back = client.call("QELO.Files.Item", "download", _sid=admin["sid"], relay_zt=7, path="/own/relayed.bin")
    assert back.body == content
    again = client.request("POST", target, form, {"Content-Type": TYPE})
    assert again.code == 406  # the other method's own error: it is there


def test_UploadWhoseCallStandsInTheForm_Is109(client, admin, scripted, hosts, describe):
    """Its body was begun to be read, so that it cannot be passed on whole."""
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, scripted.url)
    del scripted.requests[:]
    served = scripted.served
    form = Form()
    for name, value in (("api", "QELO.Test.Upload"), ("version", "1"), ("method", "run"),
                        ("_sid", admin["sid"]), ("relay_zt", "7")):
        form.field(name, value)
    form.file("file", "a", b"x" * 300_000)
    start = time.monotonic()
    answer = client.request("POST", "/webapi/entry.cgi", form.body(), {"Content-Type": TYPE})
    assert answer.code == 109
    assert time.monotonic() - start < 8
    assert (scripted.requests, scripted.served) == ([], served)


@pytest.mark.parametrize("relayed_call", ["upload", "call"])
def test_Answer_WaitsForTheBody(client, admin, scripted, hosts, describe, relayed_call):
    """The web server takes the answer when it has passed on the body; who reads it late gets it all."""
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, scripted.url)
    scripted.answer = json_answer({"success": True, "data": "y" * 3_000_000})
    api, method, kind = (("QELO.Test.Upload", "run", TYPE) if relayed_call == "upload" else
                         (API, "plain", "application/octet-stream"))
    query = urlencode({"api": api, "version": 1, "method": method, "_sid": admin["sid"], "relay_zt": 7})
    size = 8_000_000
    with socket.create_connection(("127.0.0.1", client.port), timeout=60) as connection:
        connection.sendall(f"POST /webapi/entry.cgi?{query} HTTP/1.0\r\nHost: localhost\r\n"
                           f"Content-Type: {kind}\r\nContent-Length: {size}\r\n\r\n".encode())
        for _ in range(size // 1_000_000):  # not a byte is read meanwhile
            connection.sendall(b"x" * 1_000_000)
            time.sleep(0.1)
        received = b"".join(iter(lambda: connection.recv(65536), b""))
    scripted.answer = None
    assert received.endswith(b'"}') and received.count(b"y" * 1000) == 3000


def test_UploadOfABadKind_Is109(client, admin, scripted, hosts, describe):
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, scripted.url)
    del scripted.requests[:]
    query = urlencode({"api": "QELO.Test.Upload", "version": 1, "method": "run", "_sid": admin["sid"],
                       "relay_zt": 7})
    answer = client.request("POST", f"/webapi/entry.cgi?{query}", b"x",
                            {"Content-Type": "multipart/form-data; boundary=" + "b" * 1100})
    assert answer.code == 109
    assert scripted.requests == []


def test_UploadThatEndsEarly_IsNoneForTheOtherHost(client, admin, scripted, hosts, describe):
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, scripted.url)
    del scripted.requests[:]
    query = urlencode({"api": "QELO.Test.Upload", "version": 1, "method": "run", "_sid": admin["sid"],
                       "relay_zt": 7})
    with socket.create_connection(("127.0.0.1", client.port), timeout=30) as connection:
        connection.sendall(f"POST /webapi/entry.cgi?{query} HTTP/1.0\r\nHost: localhost\r\nContent-Type: {TYPE}"
                           "\r\nContent-Length: 3000000\r\n\r\n".encode() + b"x" * 500_000)
        time.sleep(0.3)
    assert upload(client, admin, b"whole").code == 0  # the server has gone on
    assert [int(headers["Content-Length"]) for _, headers, _, _ in scripted.requests] == [5]
