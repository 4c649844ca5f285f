"""Calls that the API daemon makes."""

import json
import signal
import subprocess
import time
from urllib.parse import urlencode

import pytest

from conftest import DESCRIPTIONS, ROOT, run_entry
from daemon import (  # noqa: F401  (fixtures among them)
    ENTRIES, PLACE, call, describe_there, entries, in_background, path, start)
from marks import mark, wait_for  # noqa: F401  (a fixture)
from service import Service

IDENTITY = "QELO.Test.Identity"
CALL = "QELO.Test.Call"


def test_Call_RunsInAProcessOfTheDaemonsAlone(start, entries):
    daemon = start()
    first = call(ENTRIES, "process")["data"]
    second = call(ENTRIES, "process")["data"]
    assert first["pid"] != second["pid"]
    assert first["requestMethod"] == "GET"
    line = daemon.log_line(f"pid={first['pid']} ")
    assert 'call="QELO.Test.Entries_1_process" user="" end=answered code=0' in line
    assert wait_for(lambda: daemon.children() == [], 5)


def test_Answer_IsTheSameAsInProcess(start, entries):
    requests = [("echo", {"a": '{"b":[1,"x",null,1e300]}', "c": "ä\n\0€"}), ("fail", {"code": 444}),
                ("large", {"size": 300_000}), ("mark", {}), ("missing", {}), ("silent", {})]
    alone = [run_entry(urlencode({"api": ENTRIES, "version": 1, "method": method, **parameters}))
             for method, parameters in requests]
    daemon = start()
    there = [run_entry(urlencode({"api": ENTRIES, "version": 1, "method": method, **parameters}))
             for method, parameters in requests]
    assert there == alone
    daemon.log_line('call="QELO.Test.Entries_1_large" user="" end=answered code=0')
    daemon.log_line('call="QELO.Test.Entries_1_fail" user="" end=answered code=444')


@pytest.mark.parametrize("method", ["plain", "asUser", "asRoot", "asAlice", "grantable", "patient"])
def test_Method_HasTheRightsThatItsDescriptionGives(start, describe_there, alice, method):
    file = DESCRIPTIONS / f"{IDENTITY}.lib"
    description = json.loads(file.read_text())[IDENTITY]
    alone = call(IDENTITY, method, _sid=alice["sid"])
    describe_there(IDENTITY, **{"authLevel": 1, **description})
    daemon = start()
    there = call(IDENTITY, method, _sid=alice["sid"])
    assert there == alone
    assert there["data"]["user"] == "alice"
    daemon.log_line(f'call="{IDENTITY}_1_{method}" user="alice" end=answered')


def test_Permission_IsAskedBeforeTheDaemonIs(start, describe_there, alice):
    description = json.loads((DESCRIPTIONS / f"{IDENTITY}.lib").read_text())[IDENTITY]
    describe_there(IDENTITY, **{"authLevel": 1, **description})
    daemon = start()
    assert call(IDENTITY, "plain")["error"]["code"] == 105
    assert call(IDENTITY, "adminOnly", _sid=alice["sid"])["error"]["code"] == 105
    assert "call=" not in daemon.log()


def test_Priority_IsTheDescriptions(start, describe_there):
    describe_there(CALL, "state.so", priority=7)
    start()
    assert call(CALL, "run")["data"]["priority"] == 7


def test_Process_KnowsThatItIsTheDaemonsAndHasNothingOfOthers(start, describe_there):
    describe_there("QELO.Test.Surroundings", "surroundings.so")
    start(SECRET="x")
    data = call("QELO.Test.Surroundings", "run")["data"]
    assert "in_qeloapid=1" in data["environment"]
    assert not any(entry.startswith(("SECRET=", "LD_", "REMOTE_ADDR=")) for entry in data["environment"])
    sockets = [name for name in data["descriptors"] if "socket" in str(name)]
    assert len(sockets) <= 1, "the connection to the front"
    assert not any("eventpoll" in str(name) or "signalfd" in str(name) for name in data["descriptors"])


def test_Method_ThatTurnsTheSocketOff_RunsInProcess(start, describe_there):
    describe_there("QELO.Test.Surroundings", "surroundings.so",
                   methods={"1": [{"run": {"disableSocket": True}}]})
    start()
    assert "in_qeloapid=1" not in call("QELO.Test.Surroundings", "run")["data"]["environment"]


def test_Crash_CostsOneCall(start, describe_there, path):
    describe_there(CALL, "crashing.so")
    describe_there(ENTRIES, "entries.so", methods={"1": ["echo"]})
    daemon = start()
    assert call(CALL, "run")["error"]["code"] == 117
    daemon.log_line('call="QELO.Test.Call_1_run" user="" end=signal-11 code=')
    assert call(ENTRIES, "echo", a=1)["data"]["a"] == 1


def test_CallBeyondItsTime_IsKilledWithWhatItStarted(start, describe_there):
    describe_there("QELO.Test.Forking", "forking.so", methods={"1": ["keeping"]})
    describe_there(ENTRIES, "entries.so", methods={"1": ["slow"]})
    daemon = start("--time-limit", 1)
    begin = time.monotonic()
    assert call(ENTRIES, "slow", ms=60_000)["error"]["code"] == 117
    assert time.monotonic() - begin < 10
    daemon.log_line('call="QELO.Test.Entries_1_slow" user="" end=timed-out')
    assert wait_for(lambda: daemon.children() == [], 5)


def test_ProcessThatAMethodLeaves_HoldsNobody(start, describe_there):
    describe_there("QELO.Test.Forking", "forking.so", methods={"1": ["keeping"]})
    start()
    begin = time.monotonic()
    assert call("QELO.Test.Forking", "keeping", seconds=5)["success"]
    assert time.monotonic() - begin < 4


def test_CallsBeyondCallsAndQueue_AreRefused(start, entries):
    daemon = start("--calls", 1, "--queue", 1)
    thread, results = in_background(lambda: call(ENTRIES, "slow", ms=1500))
    assert wait_for(lambda: daemon.children(), 5)
    queued, later = in_background(lambda: call(ENTRIES, "slow", ms=0))
    time.sleep(0.3)
    assert call(ENTRIES, "slow", ms=0)["error"]["code"] == 117
    thread.join()
    queued.join()
    assert results[0]["success"] and later[0]["success"]
    daemon.log_line("refused 1; 1 at work, 1 waiting", seconds=10)


def test_ManyCallsAtOnce_AreAllAnswered(start, entries):
    daemon = start("--calls", 3)
    calls = [in_background(lambda i=i: call(ENTRIES, "echo", n=i)) for i in range(12)]
    for thread, _ in calls:
        thread.join()
    assert [results[0]["data"]["n"] for _, results in calls] == list(range(12))
    assert wait_for(lambda: daemon.log().count("end=answered") == 12, 5)


def test_Hangup_ReadsDescriptionsAnew(start, entries, describe, path):
    other = PLACE / "other.sock"
    daemon = start()
    assert path.exists() and not other.exists()
    describe(ENTRIES, "entries.so", socket=str(other), methods={"1": ["process"]})
    daemon.signal(signal.SIGHUP)
    daemon.expect_state("RELOADING=1\nMONOTONIC_USEC=")
    daemon.expect_state("READY=1")
    assert other.exists() and not path.exists()
    assert call(ENTRIES, "process")["data"]["pid"] > 0
    daemon.log_line(f'call="{ENTRIES}_1_process"')


def test_Termination_FinishesWhatRuns(start, entries, path):
    daemon = start("--calls", 1)
    running, results = in_background(lambda: call(ENTRIES, "slow", ms=1000))
    assert wait_for(lambda: daemon.children(), 5)
    queued, later = in_background(lambda: call(ENTRIES, "echo", a=1))
    time.sleep(0.3)
    daemon.signal(signal.SIGTERM)
    daemon.expect_state("STOPPING=1")
    assert wait_for(lambda: not path.exists(), 5)
    assert daemon.wait() == 0
    running.join()
    queued.join()
    assert results[0]["success"] and later[0]["data"]["a"] == 1


def test_SecondTermination_KillsWhatRuns(start, entries):
    daemon = start()
    running, results = in_background(lambda: call(ENTRIES, "slow", ms=30_000))
    assert wait_for(lambda: daemon.children(), 5)
    daemon.signal(signal.SIGTERM)
    daemon.expect_state("STOPPING=1")
    daemon.signal(signal.SIGTERM)
    assert daemon.wait() == 0
    running.join()
    assert results[0]["error"]["code"] == 117


def test_Call_IsCountedOnce(start, entries):
    counter = ROOT / "var" / "spool" / "webapi" / "QELO.Test.Entries.json"
    counter.unlink(missing_ok=True)
    start()
    for _ in range(2):
        assert call(ENTRIES, "echo")["success"]
    assert json.loads(counter.read_text())["QELO.Test.Entries_1_echo"]["count"] == 2


def test_Callback_IsRefusedWithALogLine(start, entries, mark):
    daemon = start()
    assert call(ENTRIES, "later", file=str(mark))["success"]
    daemon.log_line("cannot use callback function in qeloapid")


@pytest.mark.parametrize("options", [["--calls", "0"], ["--calls"], ["--other", "1"], ["--queue", "x"]])
def test_WrongOptions_AreRefused(root, tmp_path, options):
    program = Service(tmp_path, "qeloapid").program
    done = subprocess.run([program, *options], capture_output=True, text=True, timeout=10, check=False)
    assert done.returncode == 2
    assert options[0] in done.stderr and "usage: qeloapid" in done.stderr


def test_Help_IsAnAnswer(root, tmp_path):
    program = Service(tmp_path, "qeloapid").program
    done = subprocess.run([program, "--help"], capture_output=True, text=True, timeout=10, check=False)
    assert (done.returncode, done.stderr) == (0, "") and done.stdout.startswith("usage: qeloapid")
