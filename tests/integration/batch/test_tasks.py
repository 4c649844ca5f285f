"""Background tasks: watched, listed and stopped with QELO.Work.Task."""

import json
import os
import signal
import time

import pytest

from conftest import SESSIONS
from tasks import LONG, TASK, WORK, assert_ends, is_running
from tasks import admin, alice, bob, started  # noqa: F401  (fixtures)


# Status


def test_Status_OfRunningWork_ShowsResultAndCall(alice):
    full_id = alice.start(prefix="pre_", **LONG)
    data = alice.status(full_id).data
    assert data["success"] and data["data"]["step"] == 1
    assert data["finish"] is False
    assert data["auto_remove"] is False
    assert data["info"] == {
        "api": WORK,
        "version": 1,
        "method": "start",
        "param": {"prefix": "pre_", "steps": 1, "pause": 10000},
        "group": "",
        "prefix": "pre_",
    }
    assert full_id.startswith("alice/pre_")


def test_Status_OfSeveral_HasEmptyObjectsForForeignOnes(alice, bob):
    own = [alice.start(**LONG), alice.start(steps=1)]
    foreign = bob.start(**LONG)
    alice.wait_for_end(own[1])
    data = alice.call(TASK, "status", task_ids=json.dumps([*own, foreign, "alice/none"])).data
    assert data[own[0]]["finish"] is False
    assert data[own[1]]["finish"] is True
    assert data[foreign] == {}
    assert data["alice/none"] == {}


def test_Status_AfterKill9_IsFinishedWithAnError(alice):
    full_id = alice.start(**LONG)
    os.kill(alice.status(full_id).data["data"]["pid"], signal.SIGKILL)
    data = alice.wait_for_end(full_id)
    assert data["finish"] is True
    assert data["success"] is False
    assert data["error"]["code"] != 0
    assert alice.status(full_id).data["success"] is False


def test_Status_AfterAutoRemove_IsNoSuchTask(alice):
    full_id = alice.start(keep="false", steps=1, pause=300)
    assert alice.status(full_id).data["auto_remove"] is True
    deadline = time.monotonic() + 10
    while alice.status(full_id).code == 0:
        assert time.monotonic() < deadline
        time.sleep(0.05)
    assert alice.status(full_id).code == 508


@pytest.mark.parametrize(
    "parameters",
    [
        {},
        {"task_id": ""},
        {"task_id": "[]"},
        {"task_id": "alice/1", "task_ids": "[]"},
        {"task_ids": "alice/1"},
        {"task_ids": json.dumps(["alice/1"] * 1001)},
        {"task_id": "alice/1", "activity": "maybe"},
    ],
)
def test_Status_OfMalformedParameters_IsBadInput(alice, parameters):
    assert alice.call(TASK, "status", **parameters).code == 101


def test_Status_OfMalformedIds_NamesTheReason(alice):
    assert alice.status("alice").code == 503
    assert alice.status("alice/").code == 508
    assert alice.status("alice/../../etc/passwd").code == 508
    assert alice.status("/none").code == 503


# Whose tasks


def test_Task_OfAnotherUser_CannotBeSeenOrStopped(alice, bob, admin):
    full_id = alice.start(**LONG)
    pid = alice.status(full_id).data["data"]["pid"]
    for other in (bob, admin):
        assert other.status(full_id).code == 503
        assert other.call(TASK, "wait", task_id=full_id).code == 503
        assert other.call(TASK, "stop", task_id=full_id).code == 503
        secret = full_id.split("/")[1]
        assert other.status(f"{other.account}/{secret}").code == 508
        assert other.call(TASK, "stop", task_id=f"@users/{secret}").code == 508
        groups = ["user", "everyone"]
        assert secret not in other.call(TASK, "list", groups=json.dumps(groups)).body.decode()
    assert is_running(pid)


def test_Task_OfTheAdministrators_IsTheirsAlone(alice, admin):
    assert alice.call(WORK, "start", group="admin").code == 105
    full_id = admin.start(group="admin", **LONG)
    assert full_id.startswith("@administrators/")
    assert alice.status(full_id).code == 503
    assert alice.call(TASK, "stop", task_id=full_id).code == 503
    assert alice.call(TASK, "list", groups="admin").code == 505
    assert admin.call(TASK, "list", groups="admin").data == {"admin": [full_id]}
    assert admin.call(TASK, "stop", task_id=full_id).code == 0


def test_Task_OfEveryone_CanBeStoppedByAnyUser(alice, bob):
    full_id = alice.start(group="everyone", **LONG)
    assert full_id.startswith("@users/")
    pid = bob.status(full_id).data["data"]["pid"]
    assert bob.call(TASK, "list", groups="everyone").data["everyone"] == [full_id]
    assert bob.call(TASK, "stop", task_id=full_id).code == 0
    assert_ends(pid)
    assert alice.status(full_id).data["finish"] is True


def test_Tasks_WithoutLogin_AreRefused(client):
    for method in ("list", "status", "stop", "wait"):
        assert client.call(TASK, method, task_id="@users/1").code == 105


# Stop and list


@pytest.mark.parametrize("method", ["start", "asUser", "asRoot"])
def test_Stop_EndsTheProcessAndKeepsTheRecord(alice, method):
    full_id = alice.start(method, **LONG)
    pid = alice.status(full_id).data["data"]["pid"]
    assert is_running(pid)
    assert alice.call(TASK, "stop", task_id=full_id).json == {"success": True}
    assert_ends(pid)
    data = alice.status(full_id).data
    assert data["finish"] is True
    assert data["data"]["step"] == 1


def test_Stop_WithRemove_RemovesTheRecord(alice):
    full_id = alice.start(**LONG)
    pid = alice.status(full_id).data["data"]["pid"]
    assert alice.call(TASK, "stop", task_id=full_id, remove="true").code == 0
    assert_ends(pid)
    assert alice.status(full_id).code == 508
    assert alice.call(TASK, "stop", task_id=full_id).code == 508


def test_Stop_OfAnEndedTask_Succeeds(alice):
    full_id = alice.start(steps=1)
    alice.wait_for_end(full_id)
    assert alice.call(TASK, "stop", task_id=full_id).code == 0


def test_Stop_OfMalformedParameters_IsRefused(alice):
    assert alice.call(TASK, "stop").code == 101
    assert alice.call(TASK, "stop", task_id="alice/1", remove="7").code == 101
    assert alice.call(TASK, "stop", task_id="alice").code == 502


def test_List_HasTheCallersTasksOldestFirst(alice):
    before = alice.call(TASK, "list").data["user"]
    made = [alice.start(prefix=prefix, **LONG) for prefix in ("a_", "b_", "a_")]
    assert alice.call(TASK, "list").data["user"] == before + made
    assert alice.call(TASK, "list", prefix="b_").data == {"user": [made[1]]}


def test_List_OfNothing_IsAnEmptyList(alice):
    assert alice.call(TASK, "list", prefix="no-such-prefix").data == {"user": []}


@pytest.mark.parametrize(
    "parameters, code",
    [({"groups": "nobody"}, 503), ({"groups": "null"}, 503), ({"prefix": "[]"}, 101)],
)
def test_List_OfMalformedParameters_IsRefused(alice, parameters, code):
    assert alice.call(TASK, "list", **parameters).code == code


# Wait


def test_Wait_WakesWithTheNextResult(alice):
    full_id = alice.start(steps=2, pause=1500)
    first = alice.call(TASK, "wait", task_id=full_id, timeout=0).data
    assert first["data"]["step"] == 1
    begin = time.monotonic()
    second = alice.call(TASK, "wait", task_id=full_id, state=first["state"], timeout=20).data
    assert second["data"]["step"] == 2
    assert 0.2 < time.monotonic() - begin < 5


def test_Wait_FromAnOldState_AnswersAtOnce(alice):
    full_id = alice.start(steps=2, pause=300)
    first = alice.call(TASK, "wait", task_id=full_id, timeout=0).data
    time.sleep(1)
    begin = time.monotonic()
    assert alice.call(TASK, "wait", task_id=full_id, state=first["state"]).data["finish"] is True
    assert time.monotonic() - begin < 5


def test_Wait_WithoutChange_EndsWithTheTime(alice):
    full_id = alice.start(**LONG)
    begin = time.monotonic()
    data = alice.call(TASK, "wait", task_id=full_id, timeout=1).data
    assert 0.9 < time.monotonic() - begin < 5
    assert data["finish"] is False


def test_Wait_NoticesKill9(alice):
    full_id = alice.start(**LONG)
    os.kill(alice.status(full_id).data["data"]["pid"], signal.SIGKILL)
    begin = time.monotonic()
    assert alice.call(TASK, "wait", task_id=full_id, timeout=20).data["finish"] is True
    assert time.monotonic() - begin < 5


@pytest.mark.parametrize(
    "parameters, code",
    [
        ({}, 101),
        ({"task_id": "alice/1", "timeout": 61}, 101),
        ({"task_id": "alice/1", "timeout": -1}, 101),
        ({"task_id": "alice/1", "timeout": "x"}, 101),
        ({"task_id": "alice"}, 503),
        ({"task_id": "alice/none"}, 508),
    ],
)
def test_Wait_OfMalformedParameters_IsRefused(alice, parameters, code):
    assert alice.call(TASK, "wait", **parameters).code == code


# The login session


@pytest.mark.parametrize("method", ["status", "wait"])
def test_Watching_IsNoUseOfTheSession(alice, method):
    full_id = alice.start(**LONG)
    file = SESSIONS / alice.sid
    os.utime(file, (time.time() - 300, time.time() - 300))
    before = file.stat().st_mtime
    alice.call(TASK, method, task_id=full_id, timeout=0)
    assert file.stat().st_mtime == before
    alice.call(TASK, method, task_id=full_id, timeout=0, activity="true")
    assert file.stat().st_mtime > before + 290


@pytest.mark.parametrize("others, is_use", [([], False), (["list"], True)])
def test_Watching_WithinACompoundRequest_IsUseOnlyWithOtherCalls(alice, others, is_use):
    file = SESSIONS / alice.sid
    os.utime(file, (time.time() - 300, time.time() - 300))
    before = file.stat().st_mtime
    entries = [
        {"api": TASK, "version": 1, "method": method, "task_id": "alice/none", "timeout": 0}
        for method in ("status", "wait", *others)
    ]
    alice.call("QELO.Entry.Request", "request", compound=json.dumps(entries))
    assert (file.stat().st_mtime > before) == is_use


@pytest.mark.parametrize("method", ["list", "stop"])
def test_OtherCalls_AreUseOfTheSession(alice, method):
    file = SESSIONS / alice.sid
    os.utime(file, (time.time() - 300, time.time() - 300))
    before = file.stat().st_mtime
    alice.call(TASK, method, task_id="alice/none")
    assert file.stat().st_mtime > before + 290


def test_Watching_OfATimedOutSession_IsRefused(alice):
    file = SESSIONS / alice.sid
    os.utime(file, (time.time() - 100_000, time.time() - 100_000))
    assert alice.status("alice/none").refusal == (106, "timeout")
