"""Background tasks: how a method starts them, and what its caller waits for."""

import json
import os
import signal
import subprocess
import time
from urllib.parse import urlencode

import pytest

from conftest import ENTRY, needs_root
from exec_program import call
from tasks import LONG, TASK, WORK, alice, bob, started  # noqa: F401


def fastest(user, tries, **parameters):
    """The best time of several starts: what the machine does besides must not count."""
    times = []
    for _ in range(tries):
        begin = time.monotonic()
        full_id = user.start(**parameters)
        times.append(time.monotonic() - begin)
        assert user.status(full_id).data["finish"] is False
    return min(times)


def test_Start_OfSilentWork_AnswersWhileTheWorkGoesOn(alice):
    assert fastest(alice, 3, silent=100) < 0.7


def test_Start_OfWorkWithAFirstResult_AnswersAtOnce(alice):
    assert fastest(alice, 15, **LONG) < 0.05


@pytest.mark.parametrize("method", ["start", "asUser", "asRoot"])
def test_Start_WithWhateverCredentials_CanBeWatched(alice, method):
    full_id = alice.start(method, steps=3, pause=100)
    assert full_id.startswith("alice/")
    data = alice.wait_for_end(full_id)
    assert data["success"]
    assert data["data"]["step"] == 3


@needs_root
def test_Start_AsUser_WorksWithTheUsersRightsForGood(alice):
    full_id = alice.start("asUser", **LONG)
    data = alice.status(full_id).data["data"]
    uid = data["uid"]
    assert uid not in (0, os.getuid())
    with open(f"/proc/{data['pid']}/status", encoding="utf-8") as file:
        ids = [line.split()[1:] for line in file if line.startswith(("Uid:", "Gid:"))]
    assert ids == [[str(uid)] * 4] * 2


def test_Start_ByACallWithSessionParameter_KeepsTheSessionOutOfTheRecord(alice, bob):
    full_id = alice.start(group="everyone", **LONG)
    answer = bob.status(full_id)
    assert answer.data["info"]["param"] == {"group": "everyone", "pause": 10000, "steps": 1}
    assert alice.sid not in answer.body.decode()


def test_Start_WithinACompoundRequest_AnswersWhileTheWorkGoesOn(alice):
    entries = [{"api": WORK, "version": 1, "method": "start", **LONG}] * 2
    for mode in ("sequential", "parallel"):
        begin = time.monotonic()
        answer = alice.call("QELO.Entry.Request", "request", mode=mode, compound=json.dumps(entries))
        assert time.monotonic() - begin < 5
        assert answer.data["has_fail"] is False
        for result in answer.data["result"]:
            full_id = result["data"]["task_id"]
            alice.started.append((alice, full_id))
            assert alice.status(full_id).data["finish"] is False


def find_task(user, prefix):
    deadline = time.monotonic() + 10
    while not (found := user.call(TASK, "list", prefix=prefix).data["user"]):
        assert time.monotonic() < deadline
        time.sleep(0.01)
    user.started.append((user, found[0]))
    return found[0]


@pytest.mark.parametrize("mode", ["sequential", "parallel"])
def test_Start_WithinACompoundRequest_ByAnEntryThatDies_DoesNotHoldTheAnswer(alice, mode):
    prefix = f"die_{mode}_"
    entry = {"api": WORK, "version": 1, "method": "start", "die": True, "prefix": prefix, **LONG}
    begin = time.monotonic()
    answer = alice.call("QELO.Entry.Request", "request", mode=mode, compound=json.dumps([entry]))
    assert time.monotonic() - begin < 5
    assert answer.data["has_fail"] is True
    assert alice.status(find_task(alice, prefix)).data["finish"] is False


@needs_root
def test_Start_WithinACallFromCode_ThatDies_DoesNotHoldTheAnswer(alice):
    begin = time.monotonic()
    parameters = json.dumps({"die": True, "prefix": "die_exec_", **LONG})
    result = call(WORK, "start", "--json", "-", text=parameters)
    assert time.monotonic() - begin < 5
    assert json.loads(result.stdout)["error"]["code"] == 117, result
    assert alice.status(find_task(alice, "die_exec_")).data["finish"] is False


@pytest.mark.parametrize("method", ["start", "asUser", "asRoot"])
def test_Start_WhoseWorkWritesToAStreamOfTheMethod_LosesNoRecord(alice, method):
    before = alice.start(method, steps=1)
    full_id = alice.start(method, stream=True, steps=2)
    assert alice.wait_for_end(full_id)["data"]["step"] == 2
    assert alice.status(before).data["finish"] is True


def test_Start_WithAnUnusablePrefix_MakesNoTask(alice):
    before = alice.call(TASK, "list").data
    assert alice.call(WORK, "start", prefix="a/b").code == 117
    assert alice.call(TASK, "list").data == before


def test_Start_WithoutLogin_MakesNoTaskOfANamelessUser(alice, client, describe):
    describe(WORK, "background.so", maxVersion=1, methods={"1": ["start"]})
    assert client.call(WORK, "start").code == 117
    full_id = client.call(WORK, "start", group="everyone", steps=1).data["task_id"]
    alice.started.append((alice, full_id))
    assert full_id.startswith("@users/")


def test_Start_WhoseOwnProcessIsKilled_GoesOn(alice):
    query = urlencode({"api": WORK, "version": 1, "method": "start", "prefix": "orphan_",
                       "silent": 5, "steps": 3, "pause": 100, "_sid": alice.sid})
    environment = {"REQUEST_METHOD": "GET", "QUERY_STRING": query, "REMOTE_ADDR": "127.0.0.1"}
    process = subprocess.Popen([ENTRY], env=environment, stdout=subprocess.DEVNULL)
    full_id = find_task(alice, "orphan_")
    time.sleep(0.05)  # the record comes before the background process
    process.kill()
    assert process.wait() == -signal.SIGKILL, "it had answered before"
    assert alice.wait_for_end(full_id)["data"]["step"] == 3


def test_Start_IsNoChildOfTheWebServersSession(alice):
    pid = alice.status(alice.start(**LONG)).data["data"]["pid"]
    assert os.getsid(pid) == pid
