"""What clients of the fork server may ask for at most, and that nobody waits for another."""

import socket
import time

import pytest

from conftest import answer_of
from marks import wait_for
from scgi import header, rest, start, status, variables  # noqa: F401  (a fixture)

QUERY = "api=QELO.Test.Entries&version=1&method="


@pytest.fixture(autouse=True)
def entries(describe):
    describe("QELO.Test.Entries", "entries.so", methods={"1": ["echo", "slow", "large"]})


def waiting(server, query):
    """A request that is on its way."""
    connection = server.connect()
    connection.sendall(header(variables(query)))
    return connection


@pytest.mark.parametrize("text", [
    b"x", b":", b"abc:", b"-5:" + b"x" * 20, b"5:abcde,", b"99999999:" + b"x" * 20, b"\0" * 30,
    b"GET / HTTP/1.1\r\nHost: x\r\n\r\n", b"24:" + b"\0" * 24 + b",", b"24:" + b"a" * 24 + b",",
    b"24:CONTENT_LENGTH\0" + b"1" * 8 + b"\0X",
    header({"SCGI": "1", "CONTENT_LENGTH": "0", "REQUEST_METHOD": "GET"}),
    header({"CONTENT_LENGTH": "0", "REQUEST_METHOD": "GET", "QUERY_STRING": ""}),
    header({"CONTENT_LENGTH": "", "SCGI": "1", "REQUEST_METHOD": "GET"}),
    header({"CONTENT_LENGTH": "-1", "SCGI": "1", "REQUEST_METHOD": "GET"}),
    header({"CONTENT_LENGTH": "0", "SCGI": "1", "A=B": "1", "C": "ddddddddd"}),
    header({"CONTENT_LENGTH": "0", "SCGI": "1", **{f"N{n}": "x" for n in range(2000)}}),
], ids=range(17))
def test_MalformedHeader_Is400(start, text):
    server = start()
    assert status(server.raw(text, end=True)) == 400
    assert server.call(QUERY + "echo&a=1")["data"]["a"] == 1


def test_HeaderThatIsTooLong_Is431BeforeItIsSent(start):
    server = start()
    assert status(server.raw(b"600000:CONTENT_LENGTH\0")) == 431


def test_LongestHeaders_Pass(start):
    server = start()
    assert server.call(QUERY + "echo&x=" + "y" * 120_000, REQUEST_URI="/x?" + "y" * 120_000)["data"]


def test_HeaderThatDoesNotCome_Is408AndDelaysNobody(start):
    server = start("--header-limit", 1)
    slow = [server.connect() for _ in range(50)]
    try:
        for index, connection in enumerate(slow):
            connection.sendall(header(variables(QUERY + "echo"))[:index * 2])
        assert server.call(QUERY + "echo&a=1")["data"]["a"] == 1
        assert server.children() == []
        for connection in slow:
            assert status(rest(connection)) == 408
    finally:
        for connection in slow:
            connection.close()


def test_HeaderInPieces_IsTaken(start):
    server = start()
    text = header(variables(QUERY + "echo&a=1"))
    with server.connect() as connection:
        for index in range(len(text)):
            connection.sendall(text[index:index + 1])
            time.sleep(0.001)
        assert answer_of(rest(connection))["data"]["a"] == 1


def test_ConnectionsBeyondThoseThatMayArrive_Are503(start):
    server = start("--arriving", 3)
    idle = [server.connect() for _ in range(3)]
    try:
        time.sleep(0.2)
        with server.connect() as connection:
            assert status(rest(connection)) == 503
        assert server.call(QUERY + "echo&a=1")["data"]["a"] == 1, "one that is whole at once passes"
    finally:
        for connection in idle:
            connection.close()


def test_RequestsBeyondQueue_Are503(start):
    server = start("--requests", 1, "--queue", 1)
    first = waiting(server, QUERY + "slow&ms=1000")
    assert wait_for(lambda: server.children(), 5)
    second = waiting(server, QUERY + "echo&a=2")
    time.sleep(0.2)
    assert status(server.request(QUERY + "echo&a=3")) == 503
    assert answer_of(rest(first))["success"]
    assert answer_of(rest(second))["data"]["a"] == 2
    server.log_line("refused 1; 1 at work, 1 waiting", seconds=10)


def test_RequestThatGetsNoTurn_Is503(start):
    server = start("--requests", 1, "--queue-limit", 1)
    with waiting(server, QUERY + "slow&ms=3000"):
        assert wait_for(lambda: server.children(), 5)
        begin = time.monotonic()
        assert status(server.request(QUERY + "echo")) == 503
        assert time.monotonic() - begin < 2.5


def test_ClientThatHasGone_TakesNoProcess(start):
    server = start("--requests", 1, "--queue", 5)
    first = waiting(server, QUERY + "slow&ms=700")
    assert wait_for(lambda: server.children(), 5)
    for _ in range(20):
        waiting(server, QUERY + "slow&ms=60000").close()
    begin = time.monotonic()
    assert server.call(QUERY + "echo&a=1")["data"]["a"] == 1, "they keep nobody out of the queue"
    assert time.monotonic() - begin < 5
    assert answer_of(rest(first))["success"]


def test_RequestBeyondItsTime_Is503(start, describe):
    server = start("--time-limit", 1)
    begin = time.monotonic()
    assert status(server.request(QUERY + "slow&ms=60000")) == 503
    assert time.monotonic() - begin < 10
    server.log_line("time over: 1")
    assert wait_for(lambda: server.children() == [], 5)
    assert server.call(QUERY + "echo&a=1")["data"]["a"] == 1


def test_AnswerThatHasBegun_EndsWithoutAnother(start):
    """A client that takes nothing keeps its process waiting until its time is over."""
    server = start("--time-limit", 1)
    with waiting(server, QUERY + "large&size=5000000") as connection:
        time.sleep(2)
        answer = rest(connection)
    assert answer.startswith(b"Content-type: application/json") and b"Status:" not in answer
    assert len(answer) < 5_000_000
    server.log_line("time over: 1")


def test_Port_IsServedOnTheLoopbackAddressAlone(start, tmp_path):
    from webserver import free_port

    port = free_port()
    server = start("--port", port)
    with socket.create_connection(("127.0.0.1", port), timeout=10) as connection:
        connection.sendall(header(variables(QUERY + "echo&a=1")))
        assert answer_of(rest(connection))["data"]["a"] == 1
    listening = [line.split()[1] for line in open("/proc/net/tcp", encoding="ascii")]
    assert f"0100007F:{port:04X}" in listening and f"00000000:{port:04X}" not in listening
    assert server.call(QUERY + "echo&a=1")["data"]["a"] == 1
