"""The shipped configuration of each web server serves what the API needs."""

import json
import time
from socket import create_connection
from urllib.parse import quote

import pytest

from client import PATH, Client
from conftest import session_of
from marks import wait_for
from servers import server  # noqa: F401  (a fixture)
from tasks import alice, started  # noqa: F401  (fixtures)
from webserver import ApacheCgi, ApacheCgid, ApacheScgi, LighttpdScgi, Nginx, NginxScgi, WebServer

API = "QELO.Test.Entries"
# A GET's query in bytes, as docs/webservers.md tells: one that is served, one that is refused, and the
# status of that. lighttpd counts the other fields of the header in.
LONGEST_QUERY = {
    WebServer: (65_000, 65_536, 431),
    LighttpdScgi: (65_000, 65_536, 431),
    Nginx: (28_639, 28_640, 414),
    NginxScgi: (65_503, 65_504, 414),
    ApacheCgi: (130_970, 130_971, 414),
    ApacheCgid: (130_970, 130_971, 414),
    ApacheScgi: (130_970, 130_971, 414),
}


@pytest.fixture(scope="module")
def client(server):  # noqa: F811
    return Client(server.port)


@pytest.fixture
def echo(describe):
    """Answers parameters; no session is needed."""
    describe(API, "entries.so", methods={"1": ["echo", "slow", "large"]})
    return f"api={API}&version=1&method=echo"


def test_Login_ServesCallsByCookieAndByParameter(client):
    session = session_of(client, "alice")
    by_parameter = f"api=QELO.Access.Session&version=1&method=current&_sid={session['sid']}"
    assert client.get(by_parameter).data["user"] == "alice"
    by_cookie = client.call("QELO.Access.Session", "current", cookie=session["sid"],
                            headers={"X-Qelo-Token": session["token"]})
    assert by_cookie.data["user"] == "alice"


def test_Rest_IsServedBesideIt(client, server, echo):  # noqa: F811
    answer = client.request("POST", f"/webapi/rest/{API}/v1/echo?a=1", '{"name": "5"}',
                            {"Content-Type": "application/json"})
    assert answer.status == 200, answer.body
    assert (answer.data["name"], answer.data["a"]) == ("5", 1)
    assert client.request("POST", "/webapi/rest/QELO.No.Such/v1/x").status == 404
    assert client.request("GET", f"/webapi/rest/{API}/v1/echo").status == 405
    assert client.request("POST", f"/webapi/rest/a%20b/v1/x?api={API}&version=1&method=echo").status == 404
    assert client.request("POST", f"/webapi/restful/{API}/v1/echo").status in (403, 404)


def test_Rest_TakesASession(client, server):  # noqa: F811
    session = session_of(client, "alice")
    path = "/webapi/rest/QELO.Access.Session/v1/current"
    assert client.request("POST", f"{path}?_sid={session['sid']}").data["user"] == "alice"
    cookie = {"Cookie": f"id={session['sid']}", "X-Qelo-Token": session["token"]}
    assert client.request("POST", path, headers=cookie).data["user"] == "alice"
    assert client.request("POST", path).status == 401


def test_Login_SetsTheCookieForThePathThatTheClientSees(client):
    answer = client.login("alice", "alice-pw")
    assert answer.headers["set-cookie"].startswith("id=")
    assert answer.headers["content-type"].startswith("application/json")
    assert len(answer.headers.get_all("content-type")) == 1


@pytest.mark.parametrize("text", ["a\nb\r\0c", "%2F..%2F", "a+b &=;#?", "ä€😀", "//a/../b"])
def test_Query_ArrivesAsItWasSent(client, echo, text):
    answer = client.get(f"{echo}&x={quote(json.dumps(text, ensure_ascii=False), safe='')}")
    assert answer.data["x"] == text


def test_MalformedEscape_InTheQuery_ReachesTheProgram(client, echo):
    assert client.get(f"{echo}&x=%zz").code == 101


def test_Post_ArrivesWhole(client, echo):
    size = 4 << 20
    assert client.post(f"{echo}&x={'y' * size}").data["x"] == "y" * size


def test_ChunkedPost_HasALengthUnlessItIsApaches(server, client, echo):
    pieces = [f"{echo}&x=".encode(), b"y" * 100_000]
    answer = client.post(iter(pieces))
    if isinstance(server, ApacheScgi):
        assert answer.status == 411
    elif isinstance(server, ApacheCgi):
        assert answer.code == 101
    else:
        assert answer.data["x"] == "y" * 100_000


def test_LargeAnswer_ArrivesWhole(client, echo):
    size = 4 << 20
    answer = client.get(f"{echo.replace('echo', 'large')}&size={size}")
    assert answer.data == "x" * size


def test_BodyBeyondTheLimit_IsRefusedBeforeItIsSent(server):
    with create_connection(("127.0.0.1", server.port), timeout=10) as connection:
        connection.sendall(f"POST {PATH} HTTP/1.1\r\nHost: nas\r\nContent-Length: {(16 << 30) + 1}"
                           "\r\nContent-Type: application/x-www-form-urlencoded\r\n\r\n".encode())
        assert b" 413 " in connection.recv(100)


def test_Redirect_NamesTheHostAndPortOfTheRequest(server, client, describe):
    describe("QELO.Test.Call", "redirecting.so")
    call = "api=QELO.Test.Call&version=1&method=run&to=%22/there?x=1%22"
    answer = client.get(call)
    assert answer.status == 302
    assert answer.headers["location"] == f"http://127.0.0.1:{server.port}/there?x=1"
    answer = client.get(call, headers={"Host": "nas.example:81"})
    assert answer.headers["location"] == "http://nas.example:81/there?x=1"


def test_Task_IsStartedAndWaitedFor(alice):  # noqa: F811
    full_id = alice.start(steps=3, pause=100)
    assert alice.wait_for_end(full_id)["finish"]


def test_ClientThatHangsUp_LeavesNoProgramAndDelaysNobody(server, client, echo):
    slow = echo.replace("echo", "slow")
    for _ in range(3):
        with create_connection(("127.0.0.1", server.port), timeout=10) as connection:
            connection.sendall(f"GET {PATH}?{slow}&ms=2000 HTTP/1.1\r\nHost: nas\r\n\r\n".encode())
            assert wait_for(lambda: server.programs(), 5)
    started_at = time.monotonic()
    assert client.get(f"{echo}&x=1").data["x"] == 1
    assert time.monotonic() - started_at < 1.5
    assert wait_for(lambda: not server.programs(), 10)


def test_WaitingCalls_DelayNobody(server, client, echo):
    """As many as there are processes, but one."""
    slow = echo.replace("echo", "slow")
    waiting = []
    try:
        for _ in range(Nginx.processes - 1):
            connection = create_connection(("127.0.0.1", server.port), timeout=10)
            connection.sendall(f"GET {PATH}?{slow}&ms=2000 HTTP/1.0\r\nHost: nas\r\n\r\n".encode())
            waiting.append(connection)
        started_at = time.monotonic()
        assert client.get(f"{echo}&x=1").data["x"] == 1
        assert time.monotonic() - started_at < 1.5
    finally:
        for connection in waiting:
            connection.close()


def test_Query_UpToTheLongest_IsServed(server, client, echo):
    longest, refused, status = LONGEST_QUERY[type(server)]
    answer = client.get(f"{echo}&x=".ljust(longest, "y"))
    assert answer.data["x"].strip("y") == ""
    assert client.get(f"{echo}&x=".ljust(refused, "y")).status == status


def test_Logs_NameNoSession(server, client):
    session = session_of(client, "alice")
    client.get(f"api=QELO.Access.Session&version=1&method=current&_sid={session['sid']}")
    assert wait_for(lambda: PATH in server.log(), 5)
    assert session["sid"] not in server.log()
