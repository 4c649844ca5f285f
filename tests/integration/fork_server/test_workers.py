"""Workers: methods that share a process with the calls of the same account, and nothing else."""

import os
import re
import shutil
import signal
import threading
import time

import pytest

import conftest
from conftest import answer_of, needs_root, run_entry, session_of
from marks import mark, wait_for  # noqa: F401  (a fixture)
from scgi import (  # noqa: F401  (fixtures among them)
    EVERYBODY,
    STAYING,
    header,
    methods,
    rest,
    staying,
    start,
    start_workers,
    variables,
)


@pytest.fixture
def sid(client):
    return session_of(client, "alice")["sid"]


def same_but_process(answer):
    return re.sub(rb'"(pid|calls|descriptors)":\d+|"last":"[^"]*"', b"", answer)


def requests(call, sid):
    query = call.replace("method=", "method={}") + f"&_sid={sid}"
    yield {"query": query.format("state")}
    yield {"query": query.format("who"), "HTTP_X_OWN": "1", "HTTP_COOKIE": "lang=ger; a=b"}
    yield {"query": query.format("asUser")}
    yield {"query": query.format("asAlice")}
    yield {"query": query.format("echo") + "&a=[1,2.0,null]&b=%C3%A4%00b&c=%FF&header=h&d=12345678901234567890"}
    yield {"query": query.format("echo") + "&header=a%0D%0Ab"}
    yield {"query": query.format("echo"), "body": b"x=" + b"y" * 20_000}
    yield {"query": query.format("echo"), "body": b"x=" + b"y" * 60_000}
    yield {"body": (query.format("echo") + "&in=body").encode()}
    yield {"query": query.format("echo"), "body": b"a=1", "CONTENT_TYPE": "multipart/form-data; boundary=x"}
    yield {"query": query.format("bytes")}
    yield {"query": query.format("large") + "&size=1"}
    yield {"query": query.format("large") + "&size=70000"}
    yield {"query": query.format("large") + "&size=3000000"}
    yield {"query": query.format("silent")}
    yield {"query": query.format("fail")}
    yield {"query": query.format("refused")}
    yield {"query": query.format("missing")}
    yield {"query": query.format("slow") + "&ms=60"}
    yield {"query": query.format("apart")}
    yield {"query": query.format("state") + "&relay_zt=1"}
    yield {"query": query.format("state").replace("version=1", "version=9")}
    yield {"query": query.format("state").replace(sid, "x" * 43)}
    yield {"query": query.format("state").replace(f"&_sid={sid}", "")}
    yield {"query": query.format("state"), "REMOTE_ADDR": "192.0.2.1"}
    yield {"query": query.format("state") + "&tid=" + "x" * 43}


def test_Answers_AreTheSameBytes(start_workers, start, staying, sid):
    server = start_workers()
    apart = start()
    compared = 0
    for request in list(requests(staying, sid)) * 2:
        expected = same_but_process(run_entry(**request))
        assert same_but_process(server.request(**request)) == expected, request
        assert same_but_process(apart.request(**request)) == expected, request
        compared += 1
    assert compared > 50


@pytest.mark.parametrize("call", [
    "QELO.Catalog.API&version=1&method=list", "QELO.Catalog.API&version=1&method=describe&name=QELO.Catalog.API"])
def test_BundledApis_AnswerTheSameBytesByWorkers(start_workers, sid, call):
    server = start_workers()
    query = f"api={call}&_sid={sid}"
    expected = run_entry(query)
    assert b'"success":true' in expected
    assert [server.request(query) for _ in range(4)] == [expected] * 4
    assert wait_for(lambda: len(children(server.process.pid)) > 2, 1)  # a worker beside the fronts


def test_Worker_ServesTheCallsOfItsAccount(start_workers, staying, sid):
    server = start_workers()
    found = [server.call(f"{staying}who&_sid={sid}&mark={i}")["data"] for i in range(8)]
    assert len({data["pid"] for data in found}) <= 2
    assert max(data["calls"] for data in found) > 2
    assert found[-1]["session"] == sid


@needs_root
def test_Worker_HasItsAccountForGood(start_workers, staying, client):
    server = start_workers()
    for user in ("alice", "bob"):
        sid = session_of(client, user)["sid"]
        for method in ("who", "asUser", "asAlice"):
            query = f"{staying}{method}&_sid={sid}"
            expected = answer_of(run_entry(query))["data"]
            got = server.call(query)["data"]
            assert (got["ids"], got["user"]) == (expected["ids"], user)
        answer = server.call(f"{staying}escape&_sid={sid}&uid={os.stat('/').st_uid}")["data"]
        assert answer["ways"] == []
        alice = server.call(f"{staying}asAlice&_sid={sid}")["data"]["ids"][0]
        answer = server.call(f"{staying}escape&_sid={sid}&uid={alice}")["data"]
        assert (answer["ways"], answer["ids"][0] != alice) == ([], True)
        assert server.call(f"{staying}who&_sid={sid}")["data"]["ids"] == answer["ids"]


def test_Accounts_HaveProcessesOfTheirOwn(start_workers, staying, client):
    server = start_workers()
    sids = {user: session_of(client, user)["sid"] for user in ("alice", "bob")}
    seen = {"alice": set(), "bob": set()}
    for i in range(20):
        for user, sid in sids.items():
            data = server.call(f"{staying}asUser&_sid={sid}&mark={i}")["data"]
            assert data["last"] == "nothing" or data["last"].startswith(user)
            seen[user].add(data["pid"])
    assert not seen["alice"] & seen["bob"]
    assert len(seen["alice"]) <= 2


def interleave(server, staying, client, rounds):
    """Two users at once by all methods; answers what was wrong and how many processes there were."""
    wrong = []
    pids = set()

    def ask(user, number):
        sid = session_of(client, user)["sid"]
        for i in range(rounds):
            method = ("who", "asUser")[i % 2]
            text = f"{user}-{number}-{i}"
            answer = server.call(f"{staying}{method}&_sid={sid}&mark={text}", HTTP_COOKIE=f"lang=enu; own={text}")
            data = answer.get("data", {})
            mine = (data.get("user"), data.get("variable"), data.get("session"),
                    data.get("parameters", {}).get("mark"))
            if mine != (user, user, sid, text) or f"own={text}" not in data["cookie"]:
                wrong.append(answer)
            if method == "asUser" and data["last"] != "nothing" and not data["last"].startswith(user):
                wrong.append(answer)
            pids.add(data.get("pid"))

    threads = [threading.Thread(target=ask, args=(user, number))
               for number, user in enumerate(("alice", "bob", "alice", "bob"))]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()
    return wrong, pids


def test_TwoUsersAtOnce_SeeTheirOwnAlone(start_workers, staying, client):
    rounds = int(os.environ.get("WEBAPI_TEST_ROUNDS", "75"))
    wrong, pids = interleave(start_workers(), staying, client, rounds)
    assert wrong == []
    assert len(pids) < rounds  # else no worker was used


@pytest.mark.parametrize("method", ["crash", "finish"])
def test_WorkerThatEnds_CostsItsCall(start_workers, staying, sid, method):
    server = start_workers("--fronts", 1)
    seen = [server.call(f"{staying}who&_sid={sid}")["data"]["pid"]]
    for _ in range(3):
        assert server.call(f"{staying}{method}&_sid={sid}") == {"success": False, "error": {"code": 117}}
        after = server.call(f"{staying}who&_sid={sid}")["data"]
        assert (after["calls"], after["pid"] in seen) == (1, False)
        seen.append(after["pid"])
    server.log_line("gave no answer")
    if method == "crash":
        server.log_line("ended by signal 6")


def test_WorkerKilledInACall_CostsThatCall(start_workers, staying, sid):
    server = start_workers()
    answers = []
    caller = threading.Thread(
        target=lambda: answers.append(server.call(f"{staying}slow&ms=5000&_sid={sid}")))
    before = workers_of(server)
    caller.start()
    assert wait_for(lambda: workers_of(server) - before, 5)
    time.sleep(0.2)
    others = [server.call(f"{staying}who&_sid={sid}") for _ in range(4)]
    for pid in workers_of(server):
        os.kill(pid, signal.SIGKILL)
    caller.join()
    assert answers == [{"success": False, "error": {"code": 117}}]
    assert all(answer["success"] for answer in others)
    assert all(server.call(f"{staying}who&_sid={sid}")["success"] for _ in range(8))


def children(pid):
    try:
        with open(f"/proc/{pid}/task/{pid}/children") as file:
            return {int(child) for child in file.read().split()}
    except FileNotFoundError:
        return set()


def by_age(server):
    """The server's processes, the oldest first: its fronts, then workers."""
    def started(pid):
        with open(f"/proc/{pid}/stat") as file:
            return int(file.read().rpartition(")")[2].split()[19]), pid

    return sorted(children(server.process.pid), key=started)


def workers_of(server):
    return set(by_age(server)[2:])


def test_SlowCalls_KeepNobodyWaiting(start_workers, staying, client):
    server = start_workers("--requests", 8)
    slow = session_of(client, "alice")["sid"]
    quick = session_of(client, "bob")["sid"]
    server.call(f"{staying}asUser&_sid={quick}")
    callers = [threading.Thread(target=server.call, args=(f"{staying}userSlow&ms=3000&_sid={slow}",))
               for _ in range(6)]
    for caller in callers:
        caller.start()
    time.sleep(0.3)
    begin = time.monotonic()
    for _ in range(20):
        assert server.call(f"{staying}asUser&_sid={quick}")["data"]["user"] == "bob"
    assert time.monotonic() - begin < 2
    for caller in callers:
        caller.join()


def test_ClientThatReadsSlowly_KeepsNobodyWaiting(start_workers, staying, sid):
    server = start_workers()
    size = 4 << 20
    slow = []
    for _ in range(4):
        connection = server.connect()
        connection.sendall(header(variables(f"{staying}large&size={size}&_sid={sid}")))
        slow.append(connection)
    time.sleep(0.5)
    begin = time.monotonic()
    assert all(server.call(f"{staying}who&_sid={sid}")["success"] for _ in range(20))
    assert time.monotonic() - begin < 2
    for connection in slow:
        with connection:
            assert len(rest(connection)) > size


def test_TimeLimit_EndsTheCallAlone(start_workers, staying, sid):
    server = start_workers("--time-limit", 1)
    begin = time.monotonic()
    assert server.call(f"{staying}slow&ms=20000&_sid={sid}")["error"]["code"] == 117
    assert time.monotonic() - begin < 5
    assert server.call(f"{staying}who&_sid={sid}")["success"]
    server.log_line("ended by signal 9")


def test_Callback_RunsAfterTheAnswer(start_workers, staying, sid, mark):
    server = start_workers()
    begin = time.monotonic()
    assert server.call(f"{staying}later&file={mark}&_sid={sid}")["success"]
    assert time.monotonic() - begin < 0.9
    assert wait_for(lambda: mark.read_text() == "ran\n", 10)


def test_Worker_EndsAfterItsCalls_AndWhenNobodyCalls(start_workers, staying, sid):
    server = start_workers("--worker-calls", 3, "--worker-idle", 1)
    found = [server.call(f"{staying}who&_sid={sid}")["data"] for _ in range(14)]
    assert max(data["calls"] for data in found) == 3
    assert len({data["pid"] for data in found}) >= 4
    assert wait_for(lambda: not workers_of(server), 6)
    assert server.call(f"{staying}who&_sid={sid}")["data"]["calls"] == 1


@pytest.fixture
def library(mark, describe):
    """A copy of the API's library that every account can read."""
    file = mark.parent / "library.so"
    shutil.copy(conftest.PLUGINS / "staying.so", file)
    describe(STAYING, authLevel=1, allowUser=EVERYBODY, methods=methods(), lib=str(file))
    return file


def test_LibraryThatIsReplaced_IsNoticed(start_workers, staying, library, sid):
    server = start_workers()
    assert [server.call(f"{staying}who&_sid={sid}")["success"] for _ in range(6)] == [True] * 6
    shutil.copy(conftest.PLUGINS / "staying.so", library.with_suffix(".new"))
    os.replace(library.with_suffix(".new"), library)
    found = [server.call(f"{staying}who&_sid={sid}")["data"] for _ in range(12)]
    assert found[0]["calls"] == 1
    assert max(data["calls"] for data in found) > 1


@needs_root
@pytest.mark.parametrize("closed", ["file", "directory"])
def test_LibraryThatRootAloneCanRead_IsServedAsEver(start_workers, staying, library, sid, closed):
    (library if closed == "file" else library.parent).chmod(0o700)
    server = start_workers()
    found = [server.call(f"{staying}who&_sid={sid}") for _ in range(3)]
    assert [answer.get("data", {}).get("calls") for answer in found] == [1] * 3


def test_Description_IsReadByEachCall(start_workers, staying, describe, sid):
    server = start_workers()
    assert server.call(f"{staying}who&_sid={sid}")["success"]
    describe(STAYING, "staying.so", authLevel=1, allowUser=EVERYBODY, methods={"1": ["who"]})
    apart = [server.call(f"{staying}who&_sid={sid}")["data"] for _ in range(4)]
    assert [data["calls"] for data in apart] == [1] * 4
    describe(STAYING, "staying.so", authLevel=1, allowUser=["admin.local"],
             methods={"1": [{"who": {"isolation": "worker"}}]})
    assert server.call(f"{staying}who&_sid={sid}")["error"]["code"] == 105


def test_UnknownIsolation_IsAProcessForEachCall_AndLogged(start_workers, staying, describe, sid):
    describe(STAYING, "staying.so", authLevel=1, allowUser=EVERYBODY,
             methods={"1": [{"who": {"isolation": "thread"}}]})
    server = start_workers()
    found = [server.call(f"{staying}who&_sid={sid}")["data"]["calls"] for _ in range(4)]
    assert found == [1] * 4
    server.log_line("isolation of QELO.Test.Staying_1_who is neither process nor worker")


def test_Stop_FinishesWhatRuns_AndLeavesNobody(start_workers, staying, sid):
    server = start_workers()
    answers = []
    callers = [threading.Thread(
        target=lambda: answers.append(server.call(f"{staying}slow&ms=700&_sid={sid}"))) for _ in range(3)]
    for caller in callers:
        caller.start()
    time.sleep(0.3)
    left = children(server.process.pid)
    server.signal(signal.SIGTERM)
    for caller in callers:
        caller.join()
    assert [answer["success"] for answer in answers] == [True] * 3
    assert server.wait() == 0
    assert not any(os.path.exists(f"/proc/{pid}") for pid in left)


def test_AccountThatDoesNotExist_HasNoWorker(start_workers, staying, describe, sid):
    describe(STAYING, "staying.so", authLevel=1, allowUser=EVERYBODY, runAs="nobody-of-that-name",
             methods={"1": [{"who": {"isolation": "worker"}}]})
    server = start_workers()
    assert server.call(f"{staying}who&_sid={sid}")["error"]["code"] == 117
    server.log_line("no worker for nobody-of-that-name: its rights cannot be taken for good")


def test_FrontThatEnds_CostsItsRequest(start_workers, staying, sid):
    server = start_workers("--fronts", 1)
    assert server.call(f"{staying}who&_sid={sid}")["success"]
    front = by_age(server)[0]
    time.sleep(0.1)  # so that it is done with that
    os.kill(front, signal.SIGSTOP)
    answers = []
    caller = threading.Thread(target=lambda: answers.append(server.request(f"{staying}who&_sid={sid}")))
    caller.start()
    time.sleep(0.3)
    begin = time.monotonic()
    assert server.call(f"{staying}who&_sid={sid}")["success"]  # by a process of its own
    assert time.monotonic() - begin < 1
    os.kill(front, signal.SIGKILL)
    caller.join()
    assert answers == [b""]
    server.log_line(f"the front {front} ended within a request")
    assert wait_for(lambda: server.call(f"{staying}who&_sid={sid}")["data"]["calls"] > 1, 5)
