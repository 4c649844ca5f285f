"""Addresses of methods by the fork server: the same answers as by rest.cgi."""

import json
import re
from pathlib import Path

import pytest

from conftest import answer_of, run_entry, session_of
from marks import wait_for
from scgi import EVERYBODY, STAYING, header, start, start_workers, variables  # noqa: F401  (fixtures)

JSON = "application/json"
ENTRIES = "QELO.Test.Entries"
API = "QELO.Test.Good"
SCHEMA = {"type": "object", "required": ["name"], "properties": {"name": {"type": "string"}}}


@pytest.fixture
def good(describe):
    describe(API, "good.so", maxVersion=1, methods={"1": [{"echo": {"params": SCHEMA}}, "fail", "silent"]})


@pytest.fixture
def sid(client):
    return session_of(client, "alice")["sid"]


def address(path, body=None, **more):
    """A request as a web server passes it on."""
    kind = {} if body is None else {"CONTENT_TYPE": JSON}
    return {"body": body, "REQUEST_METHOD": "POST", "SCRIPT_NAME": "/webapi/rest", "PATH_INFO": path,
            **kind, **more}


def status(answer):
    """The HTTP status, whatever stands before its line."""
    found = re.search(rb"^Status: (\d+)", answer.split(b"\r\n\r\n")[0], re.MULTILINE)
    return int(found[1]) if found else 200


def requests(sid):
    echo = f"/{API}/v1/echo"
    for body in (b"", b'{"name": "12345"}', b'{"name": 5, "size": "x"}', b"[1]", b'{"name": "x"}\0 more', b"{",
                 b'{"name": "' + b"y" * 200_000 + b'"}'):
        yield address(echo, body)
    yield address(echo)
    yield address(echo, b'{"name": "x"}', query="a=1&api=QELO.No.Such")
    yield address(echo, b"name=x", CONTENT_TYPE="application/x-www-form-urlencoded")
    yield address(echo, REQUEST_METHOD="GET")
    for path in (f"/{API}/v1/fail", f"/{API}/v1/silent", f"/{API}/v2/echo", "", "/", "/x", "/QELO.No.Such/v1/x"):
        yield address(path)
    yield address("/QELO.Access.Session/v1/current", query=f"_sid={sid}")
    yield address("/QELO.Access.Session/v1/current", HTTP_COOKIE=f"id={sid}")
    yield address("/QELO.Host.Info/v1/get", query=f"_sid={sid}")
    yield address("/QELO.Catalog.API/v1/openapi", b'{"prefix": "QELO.Test.Good"}', query=f"_sid={sid}")


def test_Answers_AreTheSameBytes(start, good, sid):  # noqa: F811
    server = start()
    seen = set()
    for request in requests(sid):
        expected = run_entry(program="rest.cgi", **request)
        assert server.request(**request) == expected, request
        seen.add(status(expected))
    assert {200, 400, 401, 403, 404, 405, 415, 422, 500} <= seen


def test_OtherAddresses_AreFormEncoded(start, good):  # noqa: F811
    server = start()
    query = f"api={API}&version=1&method=echo&name=x"
    for script in ("/webapi/entry.cgi", "/webapi/restful", "/rest/webapi/entry.cgi"):
        assert answer_of(server.request(query, SCRIPT_NAME=script))["data"]["name"] == "x"
    assert status(server.request(query, SCRIPT_NAME="/nas/rest")) == 404


def names_of(server):
    """What the server's processes are called."""
    found = []
    for pid in server.children():
        try:
            found.append(Path(f"/proc/{pid}/cmdline").read_text())
        except OSError:
            pass  # it has ended
    return found


def test_Process_GoesByTheProgramsName(start, describe):  # noqa: F811
    describe(ENTRIES, "entries.so", methods={"1": ["slow"]})
    server = start()
    body = b'{"ms": 5000}'
    with server.connect() as connection:
        connection.sendall(header(variables(**address(f"/{ENTRIES}/v1/slow", body))) + body)
        assert wait_for(lambda: any(name.startswith("rest.cgi_QELO.") for name in names_of(server)), 5)


def test_Workers_LeaveThemToAProcessEach(start_workers, describe, sid):  # noqa: F811
    """A query that names a call does not make one of it."""
    describe(STAYING, "staying.so", authLevel=1, allowUser=EVERYBODY,
             methods={"1": [{"who": {"isolation": "worker"}}, {"echo": {"isolation": "worker"}}]})
    server = start_workers()
    query = f"api={STAYING}&version=1&method=who&_sid={sid}"
    for _ in range(4):
        request = address(f"/{STAYING}/v1/echo", json.dumps({"name": "[1]"}).encode(), query=query)
        answer = answer_of(server.request(**request))
        assert answer["data"]["name"] == "[1]"
        assert answer_of(server.request(**address(f"/{STAYING}/v1/who", query=query)))["data"]["calls"] == 1
