"""Many calls in one request, through a real web server and curl."""

import os
import select
import threading
import time
from pathlib import Path

import pytest

from accounts import account
from compound import ENTRIES, IDENTITY, LOSING, LOSSES, OUTER, Compound, code, entry, modes
from conftest import ENTRY, needs_root, session_of
from marks import mark, wait_for  # noqa: F401  (mark is a fixture)

EVERYBODY = ["admin.local", "normal.local"]
METHODS = ["echo", "process", "fail", "large", "slow", "restart", "silent", "later", "refused"]
TRANSFERS = [{"upload": {"allowUpload": True}}, {"download": {"allowDownload": True}}]


@pytest.fixture(autouse=True)
def described(describe):
    """Version 1 runs in child processes, version 2, when sequential, in the request's own."""
    describe(
        ENTRIES,
        "entries.so",
        authLevel=1,
        allowUser=EVERYBODY,
        methods={"1": METHODS + TRANSFERS, "2": [{name: {"grantable": True}} for name in METHODS]},
    )
    # As root its methods can tell the answer to the web server, which they leave alone.
    describe(LOSING, "losing.so", allowUser=EVERYBODY, runAs="root", methods={"1": LOSSES})


@pytest.fixture
def compound(server, alice):
    return Compound(server, alice["sid"])


@modes
@pytest.mark.parametrize("user", ["alice", "admin"])
def test_MixedCalls_EachAnswerForItself(server, client, user, mode):
    compound = Compound(server, session_of(client, user)["sid"])
    nested = [entry("plain", api=IDENTITY), entry("fail", code=444)]
    results = compound.results(
        [
            entry("plain", api=IDENTITY),
            entry("grantable", api=IDENTITY),
            entry("upload"),
            entry("adminOnly", api=IDENTITY),
            entry("request", api=OUTER, compound=nested),
            entry("get", api="QELO.Test.Unknown"),
            entry("download"),
            entry("unknown"),
            entry("echo", version=9),
            {"method": "echo"},
            entry("echo", text="ä", list=[1, {"a": None}]),
        ],
        mode=mode,
    )
    refused = 0 if user == "admin" else 105
    codes = [code(result) for result in results]
    assert codes == [0, 0, 113, refused, 0, 102, 113, 103, 104, 104, 0]
    assert compound.has_fail
    assert results[0]["data"]["user"] == results[1]["data"]["user"] == user
    assert results[0]["data"]["isAdmin"] == (user == "admin")
    inner = results[4]["data"]
    assert inner["has_fail"]
    assert [code(result) for result in inner["result"]] == [0, 444]
    assert inner["result"][0]["data"]["user"] == user
    assert results[10]["data"]["text"] == "ä"
    assert results[10]["data"]["list"] == [1, {"a": None}]
    assert {key: results[0][key] for key in ("api", "version", "method")} == entry(
        "plain", api=IDENTITY
    )


@needs_root
@modes
def test_EachCall_RunsWithTheRightsThatItsDescriptionNames(compound, mode):
    methods = ["plain", "asRoot", "grantable", "asUser", "asAlice", "asRoot", "plain"]
    names = ["system", "root", "system", "alice", "alice", "root", "system"]
    results = compound.results([entry(method, api=IDENTITY) for method in methods], mode=mode)
    ids = [(result["data"]["euid"], result["data"]["egid"]) for result in results]
    assert ids == [account(name) for name in names]


def test_Sequential_GrantableRunsInTheRequestsProcess(compound):
    results = compound.results([entry("process", version) for version in (2, 1, 2, 1)])
    pids = [result["data"]["pid"] for result in results]
    assert pids[0] == pids[2]
    assert len(set(pids)) == 3


def test_StopWhenError_StopsAfterTheFirstFailure(compound):
    entries = [entry("echo"), entry("fail", version=2), entry("echo"), entry("echo", version=2)]
    results = compound.results(entries, stop_when_error=True)
    assert [code(result) for result in results] == [0, 400, 112, 112]
    assert compound.has_fail
    results = compound.results(entries)
    assert [code(result) for result in results] == [0, 400, 0, 0]


def test_NoEntries_GiveAnEmptyResult(compound):
    assert compound([]) == {"success": True, "data": {"has_fail": False, "result": []}}


def test_WhatIsNoList_IsRefused(compound):
    answer = compound({"api": ENTRIES})
    assert answer == {"success": False, "error": {"code": 110, "errors": ""}}


@modes
def test_WithoutASession_EachCallIsRefusedForItself(server, mode):
    compound = Compound(server, None)
    results = compound.results(
        [entry("echo"), entry("plain", api="QELO.Test.Open"), entry("echo", version=2)], mode=mode
    )
    assert [code(result) for result in results] == [105, 0, 105]
    assert "x-request-error: noprivilege" in compound.head


def test_OneSession_DoesNotSeeTheOthersUser(server, alice, admin):
    entries = [entry("process"), entry("process", version=2)]
    for session in (alice, admin, alice):
        for result in Compound(server, session["sid"]).results(entries):
            assert result["data"]["user"] == session["user"]


@needs_root
@modes
def test_FourMebibytes_ArriveWhole(compound, mode):
    size = 4 << 20
    results = compound.results(
        [entry("large", size=size), entry("large", size=10), entry("large", size=size)], mode=mode
    )
    assert [len(result["data"]) for result in results] == [size, 10, size]
    assert not compound.has_fail


@modes
def test_LostChildren_CostTheirOwnEntries(compound, mode):
    entries = [entry("echo")]
    for loss in LOSSES:
        entries += [entry(loss, api=LOSING), entry("echo", after=loss)]
    results = compound.results(entries, mode=mode)
    assert all(code(result) == 0 for result in results[0::2])
    assert {code(result) for result in results[1::2]} == {117 if mode == "parallel" else None}
    assert compound.has_fail


def test_FiveHundredInParallel_AllAnswer(compound):
    results = compound.results([entry("echo", index=i) for i in range(500)], mode="parallel")
    assert [result["data"]["index"] for result in results] == list(range(500))
    assert not compound.has_fail


def test_Parallel_EntriesOverlap(compound):
    started = time.monotonic()
    results = compound.results([entry("slow", ms=500)] * 8, mode="parallel")
    assert time.monotonic() - started < 2
    assert all(code(result) == 0 for result in results)


class EndOfEntry:
    """Notes when the entry.cgi that the web server starts next has ended."""

    def __init__(self, server):
        self.server = server.process.pid
        self.before = set(self.find())
        self.at = None
        self.thread = threading.Thread(target=self.watch, daemon=True)
        self.thread.start()

    def find(self):
        for folder in Path("/proc").glob("[0-9]*"):
            try:
                parent = int((folder / "stat").read_text().rsplit(")", 1)[1].split()[1])
                if parent == self.server and os.readlink(folder / "exe") == str(ENTRY):
                    yield int(folder.name)
            except (OSError, IndexError):
                continue

    def watch(self):
        found = set()
        while not found:
            found = set(self.find()) - self.before
        process = os.pidfd_open(found.pop())
        select.select([process], [], [], 30)
        self.at = time.monotonic()
        os.close(process)


@pytest.mark.parametrize(
    "version, mode", [(1, "sequential"), (1, "parallel"), (2, "sequential"), (2, "parallel")]
)
def test_LongCallback_DoesNotHoldTheClient(
    server, compound, mark, version, mode  # noqa: F811
):
    entries = [
        entry("slow", ms=300),
        entry("later", version=version, file=str(mark), ms=2000),
        entry("echo"),
    ]
    end = EndOfEntry(server)
    started = time.monotonic()
    results = compound.results(entries, mode=mode)
    complete = time.monotonic()
    end.thread.join(timeout=30)
    assert [code(result) for result in results] == [0, 0, 0]
    assert end.at is not None
    assert complete - end.at < 0.1
    assert mark.read_text() == ""
    assert wait_for(lambda: mark.read_text() != "", 20)
    assert time.monotonic() - started >= 2
    assert mark.read_text() == "ran\n"
