"""What the system gives a compound request too little of: room in pipes, processes, descriptors."""

import os
import tempfile
import time
from pathlib import Path

import pytest

from accounts import account, reachable
from compound import LOSING, LOSSES, Compound, code, entry, modes
from conftest import ENTRY, needs_root
from marks import wait_for
from webserver import WebServer

METHODS = ["echo", "large", "slow", "descriptors"]
PIPE_LIMIT = int(Path("/proc/sys/fs/pipe-max-size").read_text())


@pytest.fixture(autouse=True)
def described(describe):
    """Without a session, as alice: what the web server may do who runs as alice."""
    grantable = [{name: {"grantable": True}} for name in METHODS]
    describe(
        "QELO.Test.Entries",
        "entries.so",
        runAs="alice",
        methods={"1": METHODS, "2": grantable},
    )
    describe(LOSING, "losing.so", runAs="alice", methods={"1": LOSSES})


@pytest.fixture
def serve(root):
    """Starts web servers as an ordinary user, under a wrapping command."""
    started = []

    def start(*wrapper):
        identity = {}
        directory = Path(tempfile.mkdtemp(prefix="server."))
        server = WebServer(directory, ENTRY)
        if os.geteuid() == 0:
            if not reachable(ENTRY):
                pytest.skip("the build tree cannot be read by others")
            uid, gid = account("alice")
            for path in (directory, *directory.iterdir()):
                os.chown(path, uid, gid)
            identity = {"user": uid, "group": gid, "extra_groups": []}
        started.append(server)
        return Compound(server.start(*wrapper, **identity), None)

    yield start
    for server in started:
        server.stop()


@modes
def test_OrdinaryUsersAnswerBeyondTheLimit_CostsItsOwnEntry(serve, mode):
    compound = serve()
    within = PIPE_LIMIT * 3 // 4
    started = time.monotonic()
    results = compound.results(
        [
            entry("large", size=max(4 << 20, PIPE_LIMIT)),
            entry("large", size=within),
            entry("echo"),
            entry("large", size=PIPE_LIMIT),
        ],
        mode=mode,
    )
    assert time.monotonic() - started < 5
    assert [code(result) for result in results] == [117, 0, 0, 117]
    assert len(results[1]["data"]) == within
    assert compound.has_fail
    assert results[0] == {
        "api": "QELO.Test.Entries",
        "version": 1,
        "method": "large",
        "success": False,
        "error": {"code": 117},
    }


def test_OrdinaryUsersAnswerInTheRequestsProcess_HasNoLimit(serve):
    results = serve().results([entry("large", version=2, size=4 << 20)])
    assert len(results[0]["data"]) == 4 << 20


@modes
def test_OrdinaryUsersLostChildren_CostTheirOwnEntries(serve, mode):
    entries = [entry("echo")]
    for loss in LOSSES:
        entries += [entry(loss, api=LOSING), entry("echo", after=loss)]
    results = serve().results(entries, mode=mode)
    assert all(code(result) == 0 for result in results[0::2])
    assert {code(result) for result in results[1::2]} == {117 if mode == "parallel" else None}


def has_processes(uid):
    """Whether the user has any, those included that nobody has collected yet."""
    for folder in Path("/proc").glob("[0-9]*"):
        try:
            if folder.stat().st_uid == uid:
                return True
        except OSError:
            continue
    return False


def is_answered(compound):
    try:
        return code(compound.results([entry("echo")])[0]) == 0
    except ValueError:  # the web server itself had no process left for the program
        return False


@needs_root  # an ordinary user has other processes
def test_LimitOfProcesses_GivesTheRest117(serve):
    assert wait_for(lambda: not has_processes(account("alice")[0]), 20)
    compound = serve("/usr/bin/prlimit", "--nproc=40:40")
    results = compound.results([entry("slow", ms=4000)] * 100, mode="parallel")
    codes = [code(result) for result in results]
    good = codes.count(0)
    assert 30 <= good < 40
    assert codes == [0] * good + [117] * (100 - good)
    assert compound.has_fail
    # Once the last of them has ended, all is as it was.
    assert wait_for(lambda: is_answered(compound), 10)


def test_LimitOfDescriptors_GivesTheRest117(serve):
    compound = serve("/usr/bin/prlimit", "--nofile=100:100")
    results = compound.results([entry("slow", ms=300)] * 200, mode="parallel")
    codes = [code(result) for result in results]
    good = codes.count(0)
    assert 50 <= good < 100
    assert codes.count(117) == 200 - good
    assert compound.has_fail


def test_NoDescriptor_StaysOpenInTheRequestsProcess(serve):
    entries = [entry("descriptors", version=2)]
    for loss in LOSSES:
        entries += [entry(loss, api=LOSING), entry("echo"), entry("large", size=PIPE_LIMIT)]
    entries += [entry("echo")] * 50 + [entry("descriptors", version=2)]
    results = serve().results(entries)
    assert code(results[0]) == code(results[-1]) == 0
    assert results[0]["data"] == results[-1]["data"]


@modes
def test_Children_HoldNoEndOfAnothersPipe(serve, mode):
    results = serve().results([entry("descriptors")] * 50, mode=mode)
    assert len({result["data"] for result in results}) == 1
