"""What the fork server tells of itself, and whom."""

import os
import pwd
import socket
import subprocess
import sys
import time

import pytest

from conftest import ROOT, needs_root
from marks import wait_for
from metrics import ask, figures, page, state
from scgi import header, rest, start, status, variables  # noqa: F401  (a fixture)

QUERY = "api=QELO.Test.Entries&version=1&method="
STATUS = "QELO.Server.Status"


@pytest.fixture(autouse=True)
def entries(describe):
    describe("QELO.Test.Entries", "entries.so", methods={"1": ["echo", "slow"]})
    describe("QELO.Test.Call", "crashing.so")


@pytest.fixture
def serve(start, tmp_path):
    """Starts it with figures; gives the server and the path of their socket."""
    path = tmp_path / "metrics.sock"
    return lambda *options: (start("--metrics", path, *options), path)


def requests(path, result):
    return figures(path)[f'webapi_server_requests_total{{result="{result}"}}']


def refused(path, reason):
    return figures(path)[f'webapi_server_refused_total{{reason="{reason}"}}']


def test_Requests_AreCountedByTheirEnd(serve):
    server, path = serve("--time-limit", 1)
    for _ in range(3):
        server.call(QUERY + "echo")
    assert server.request("api=QELO.Test.Call&version=1&method=run") == b""
    assert status(server.request(QUERY + "slow&ms=60000")) == 503
    assert wait_for(lambda: requests(path, "killed") == 1, 5)
    assert (requests(path, "served"), requests(path, "crashed")) == (3, 1)
    all_of_it = figures(path)
    assert all_of_it['webapi_server_stage_seconds_count{stage="serving"}'] == 5
    assert 1 <= all_of_it['webapi_server_stage_seconds_sum{stage="serving"}'] < 20
    assert all_of_it['webapi_server_stage_seconds_bucket{stage="serving",le="+Inf"}'] == 5
    assert 0 < all_of_it["webapi_server_processor_seconds_total"] < 20
    assert abs(all_of_it["webapi_server_start_time_seconds"] - time.time()) < 60
    assert not any(all_of_it[f'webapi_server_refused_total{{reason="{reason}"}}']
                   for reason in ("busy", "slow", "malformed", "too_large", "gone", "denied"))


def test_Refusals_AreCountedByReason(serve):
    server, path = serve("--header-limit", 1, "--requests", 1, "--queue", 1)
    server.raw(b"600000:CONTENT_LENGTH\0")
    server.raw(b"nonsense" * 4)
    with server.connect() as slow:
        rest(slow)
    first = server.connect()
    first.sendall(header(variables(QUERY + "slow&ms=1500")))
    assert wait_for(server.children, 5)
    second = server.connect()
    second.sendall(header(variables(QUERY + "echo")))
    assert wait_for(lambda: state(path)["now"] == {"running": 1, "waiting": 1, "arriving": 0}, 5)
    assert status(server.request(QUERY + "echo")) == 503
    second.close()
    rest(first)
    assert wait_for(lambda: refused(path, "gone") == 1, 5)
    first.close()
    assert [refused(path, reason) for reason in ("too_large", "malformed", "slow", "busy")] == [1] * 4
    assert state(path)["limits"] == {"running": 1, "waiting": 1, "arriving": 256}


def test_Figures_AreAsManyWhateverClientsSend(serve):
    server, path = serve()
    server.call(QUERY + "echo")
    before = set(figures(path))
    for number in range(30):
        server.request(f'api=QELO.Made.Up{number}"}}&version=1&method=x{number}')
        server.raw(f"name{number}:".encode() * 5)
    assert set(figures(path)) == before
    assert len(page(path)[1]) < 16384


def test_OtherPages_AreNone(serve):
    _, path = serve()
    assert page(path, "/")[0] == page(path, "/metrics/x")[0] == 404
    assert page(path, method="POST")[0] == 405
    assert page(path, "/metrics?x=1")[0] == 200
    assert ask(path, b"x" * 5000) == b"", "longer than any request"
    assert ask(path, header(variables(QUERY + "echo")) + b"\r\n\r\n").startswith(b"HTTP/1.0 405")


def test_Reader_DelaysNobodyAndIsServedThoughNoRequestIs(serve):
    server, path = serve("--arriving", 1)
    with socket.socket(socket.AF_UNIX) as slow:
        slow.connect(str(path))
        slow.sendall(b"GET /metr")
        time.sleep(0.1)
        assert server.call(QUERY + "echo&a=1")["data"]["a"] == 1
        with server.connect():
            assert wait_for(lambda: state(path)["now"]["arriving"] == 1, 5)
            with server.connect() as beyond:
                assert status(rest(beyond)) == 503
        slow.sendall(b"ics HTTP/1.0\r\n\r\n")
        slow.settimeout(5)
        assert slow.recv(100).startswith(b"HTTP/1.0 200 ")
    assert refused(path, "busy") == 1


@needs_root
def test_Readers_AreRootAndTheGivenAccountAlone(serve, tmp_path):
    server, path = serve("--reader", "nobody")
    for parent in (tmp_path, *tmp_path.parents):
        if str(parent).startswith("/tmp/"):
            parent.chmod(0o755)
    script = ("import socket, sys\nc = socket.socket(socket.AF_UNIX)\nc.connect(sys.argv[1])\n"
              "c.sendall(b'GET /metrics HTTP/1.0\\r\\n\\r\\n')\nprint(len(c.recv(100)))")

    def read_by(name):
        account = pwd.getpwnam(name)
        done = subprocess.run([sys.executable, "-c", script, path], user=account.pw_uid,
                              group=account.pw_gid, extra_groups=[], capture_output=True, text=True,
                              timeout=20, check=False)
        return done.stdout.strip() or done.stderr.splitlines()[-1].split(":")[0]

    assert os.stat(path).st_mode & 0o777 == 0o600
    assert read_by("nobody") == "100"
    assert read_by("www-data") == "PermissionError"
    path.chmod(0o666)  # the peer is asked for, too
    assert read_by("nobody") == "100"
    assert read_by("www-data") in ("0", "BrokenPipeError", "ConnectionResetError")
    server.log_line("refused a connection of the user")
    assert wait_for(lambda: refused(path, "denied") == 1, 5)


def test_Reader_MayNotServeRequests(serve):
    """The two sockets are two."""
    server, path = serve()
    assert b"success" not in ask(path, header(variables(QUERY + "echo")) + b"\r\n\r\n")
    assert not server.raw(b"GET /metrics HTTP/1.0\r\n\r\n").startswith(b"HTTP/1.0")


@pytest.fixture
def place(root):
    """Where the status method looks."""
    path = ROOT / "run" / "webapi-server" / "metrics.sock"
    path.unlink(missing_ok=True)
    yield path
    path.unlink(missing_ok=True)


def test_StatusMethod_IsForAdministrators(client, alice, place):
    assert client.call(STATUS, "get", _sid=alice["sid"]).code == 105


def test_StatusMethod_SaysThatNoServerRuns(client, admin, place):
    assert client.call(STATUS, "get", _sid=admin["sid"]).data == {"running": False}
    place.parent.mkdir(exist_ok=True)
    place.write_text("no socket")
    assert client.call(STATUS, "get", _sid=admin["sid"]).data == {"running": False}


def test_StatusMethod_TellsTheServersFigures_ByEachRoad(start, client, admin, place):
    server = start("--metrics", place)
    server.call(QUERY + "echo")
    assert wait_for(lambda: requests(place, "served") == 1, 5)
    data = client.call(STATUS, "get", _sid=admin["sid"]).data
    assert data["running"] is True
    assert data["requests"] == {"served": 1, "crashed": 0, "killed": 0}
    assert data["stages"]["serving"]["count"] == 1
    data = server.call(f"api={STATUS}&version=1&method=get&_sid={admin['sid']}")["data"]
    assert data["now"]["running"] == 1, "the call that asks"


def test_StatusMethod_WithoutAnAnswer_SaysSo(client, admin, place):
    place.parent.mkdir(exist_ok=True)
    with socket.socket(socket.AF_UNIX) as silent:
        silent.bind(str(place))
        silent.listen()
        begin = time.monotonic()
        assert client.call(STATUS, "get", _sid=admin["sid"]).code == 400
        assert time.monotonic() - begin < 10
