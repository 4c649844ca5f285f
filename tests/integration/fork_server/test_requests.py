"""What the fork server answers, and what its processes are: the same as entry.cgi."""

import json
import re
import threading
import time
from urllib.parse import urlencode

import pytest

from conftest import answer_of, run_entry
from marks import mark, wait_for  # noqa: F401  (a fixture)
from scgi import header, rest, start, status, variables  # noqa: F401  (a fixture)

ENTRIES = "QELO.Test.Entries"
SESSION = "QELO.Access.Session"


@pytest.fixture
def entries(describe):
    describe(ENTRIES, "entries.so", methods={"1": [
        "echo", "process", "slow", "large", "fail", "mark", "descriptors", "later", "silent"]})
    return f"api={ENTRIES}&version=1&method="


def same_but_ids(answer):
    """An answer without what differs from call to call."""
    return re.sub(rb'(id=|"sid":"|"token":")[\w-]{43}', rb"\1", answer)


def requests(entries):
    call = f"api={SESSION}&version=1&method="
    yield {}
    yield {"query": ""}
    yield {"query": "api=QELO.Test.Open&version=1&method=plain&x=[1,2]&y=%C3%A4%00b"}
    yield {"query": "api=QELO.Test.Open&version=9&method=plain"}
    yield {"query": "api=QELO.No.Such&version=1&method=x"}
    yield {"query": "x=%zz"}
    yield {"query": call + "current", "HTTP_COOKIE": "id=" + "x" * 43}
    yield {"query": "api=QELO.Host.Info&version=1&method=get"}
    yield {"body": (call + "login&account=alice&password=alice-pw").encode()}
    yield {"body": (call + "login&account=alice&password=alice-pw").encode(), "HTTPS": "on"}
    yield {"body": b""}
    yield {"body": b"a=1\0b=2"}
    yield {"query": entries + "echo", "body": b"z=" + b"y" * 70_000}
    yield {"query": entries + "echo", "body": b"z=" + b"y" * 3_000_000}
    yield {"query": entries + "echo", "body": b"z", "length": 17 << 20}
    yield {"query": entries + "echo", "body": b"a=1", "CONTENT_TYPE": "multipart/form-data; boundary=x"}
    yield {"query": entries + "echo", "REQUEST_METHOD": "DELETE"}
    yield {"query": entries + "fail&code=444&word=nope"}
    yield {"query": entries + "large&size=3000000"}
    yield {"query": entries + "mark"}
    yield {"query": entries + "silent"}
    yield {"query": entries + "missing"}
    compound = [{"api": ENTRIES, "version": 1, "method": "echo", "n": n} for n in range(3)]
    for mode in ("sequential", "parallel"):
        yield {"body": urlencode({"api": "QELO.Entry.Request", "version": 1, "method": "request",
                                  "mode": json.dumps(mode), "compound": json.dumps(compound)}).encode()}


def test_Answers_AreTheSameBytes(start, entries):
    server = start()
    compared = 0
    for request in requests(entries):
        if request.get("length"):
            with server.connect() as connection:  # which says that more comes, and goes
                connection.sendall(header(variables(**request)) + request["body"])
                connection.shutdown(1)
                got = rest(connection)
        else:
            got = server.request(**request)
        expected = run_entry(**request)
        assert same_but_ids(got) == same_but_ids(expected), request
        compared += 1
    assert compared > 20


def test_Process_HasWhatACgiProgramHas(start, describe):
    describe("QELO.Test.Surroundings", "surroundings.so")
    query = "api=QELO.Test.Surroundings&version=1&method=run"
    environment = {"HTTP_X_OWN": "1", "SERVER_NAME": "n", "HTTP_PROXY": "x", "LD_AUDIT": "", "HOME": "/"}
    server = start(SECRET="x")
    got = server.call(query, **environment)["data"]
    expected = answer_of(run_entry(query, CONTENT_LENGTH="0", **environment))["data"]
    assert sorted(got["environment"]) == sorted(expected["environment"])
    assert not any("eventpoll" in str(name) or "signalfd" in str(name) for name in got["descriptors"])
    assert len(got["descriptors"]) <= len(expected["descriptors"])


def test_Requests_HaveProcessesAndVariablesOfTheirOwn(start, describe, entries):
    describe("QELO.Test.Surroundings", "surroundings.so")
    server = start()
    first = server.call(entries + "process")["data"]["pid"]
    assert first != server.call(entries + "process")["data"]["pid"]
    query = "api=QELO.Test.Surroundings&version=1&method=run"
    assert "HTTP_X_FIRST=1" in server.call(query, HTTP_X_FIRST="1")["data"]["environment"]
    second = server.call(query, HTTP_X_SECOND="1")["data"]["environment"]
    assert not any(entry.startswith("HTTP_X_FIRST") for entry in second)


def test_TwoUsersAtOnce_SeeTheirOwnAlone(start, client):
    from conftest import session_of

    server = start("--requests", 4)
    wrong = []

    def ask(user, sid):
        for number in range(60):
            answer = server.call(f"api=QELO.Test.Identity&version=1&method=plain&_sid={sid}&mark={user}{number}")
            data = answer.get("data", {})
            if (data.get("user"), data.get("parameters", {}).get("mark")) != (user, f"{user}{number}"):
                wrong.append(answer)

    threads = [threading.Thread(target=ask, args=(user, session_of(client, user)["sid"]))
               for user in ("alice", "bob", "alice", "bob")]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()
    assert wrong == []


def test_Body_EndsWhereItEnds_ThoughTheConnectionStays(start, describe):
    describe("QELO.Test.Call", "reading.so", methods={"1": [
        {"run": {"allowUpload": True, "deferUpload": True}}]})
    server = start()
    for size in (1, 1000, 65536, 65537, 300_000):
        body = b"z" * size
        answer = server.request("api=QELO.Test.Call&version=1&method=run", body=body,
                                CONTENT_TYPE="multipart/form-data; boundary=x")
        assert answer_of(answer)["data"] == {"stream": "z" * size, "file": 0, "descriptor": 0}, size


def test_Body_ThatStopsEarly_IsTakenAsFarAsItCame(start, entries):
    server = start()
    for length in (1000, 100_000):
        with server.connect() as connection:
            connection.sendall(header(variables(entries + "echo", body=b"", length=length)) + b"z=12")
            connection.shutdown(1)
            assert answer_of(rest(connection))["data"]["z"] == 12


def test_LargeBodyThatNobodyReads_KeepsTheAnswerFromNobody(start):
    server = start()
    body = b"z=" + b"y" * (20 << 20)
    answer = server.request("api=QELO.No.Such&version=1&method=x", body=body,
                            CONTENT_TYPE="multipart/form-data; boundary=x")
    assert answer_of(answer)["error"]["code"] == 102


def test_Callback_RunsAfterTheAnswer(start, entries, mark):
    server = start()
    begin = time.monotonic()
    assert server.call(f"{entries}later&file={mark}")["success"]
    assert time.monotonic() - begin < 0.9
    assert wait_for(lambda: mark.read_text() == "ran\n", 10)


def test_ProcessThatAMethodLeaves_HoldsNoClient(start, describe):
    describe("QELO.Test.Forking", "forking.so", methods={"1": ["keeping"]})
    server = start()
    begin = time.monotonic()
    assert server.call("api=QELO.Test.Forking&version=1&method=keeping&seconds=5")["success"]
    assert time.monotonic() - begin < 3


def test_Crash_CostsOneRequest(start, describe, entries):
    describe("QELO.Test.Call", "crashing.so")
    server = start()
    assert server.request("api=QELO.Test.Call&version=1&method=run") == b""
    server.log_line("ended by signal 11 after")
    assert server.call(entries + "echo&a=1")["data"]["a"] == 1


def test_RefusedConnection_NeverReachesTheProgram(start, entries):
    server = start()
    assert status(server.raw(b"17:CONTENT_LENGTH\0x\0,")) == 400
    assert server.call(entries + "echo&a=1")["data"]["a"] == 1
