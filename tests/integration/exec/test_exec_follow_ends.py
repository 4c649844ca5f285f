"""webapi-exec --follow: how the watching ends, by the task and by the person."""

import json
import os
import signal
import subprocess
import time

import pytest

from exec_follow import (  # noqa: F401
    INTERRUPT, TASK, children_of, counts, follow, following, following_id, shown, status_of, task, work)
from exec_program import EXEC, described, run  # noqa: F401
from tasks import WORK, assert_ends, is_running

pytestmark = pytest.mark.usefixtures("described", "following")

# Ends


def test_Error_IsTheTasksEnd(work, follow):
    steps = work(counts(1, 4), {"code": 444, "errors": {"reason": "no \x1b[31mroom"}})
    terminal = follow(*steps.arguments())
    terminal.wait_until(shown(25))
    steps.open()
    status, output = terminal.finish()
    assert (status, json.loads(output)["error"]["code"]) == (1, 444)
    screen = terminal.screen()
    assert screen[1].startswith(" 25% ["), "how far it had come"
    assert screen[2:] == [
        "webapi-exec: error 444: an error of the API's own", "webapi-exec: no ?[31mroom", ""]


def test_KilledProcess_IsAFailure(work, follow):
    terminal = follow(*work(counts(1, 4)).arguments())
    pid = status_of(terminal.task_id())["data"]["pid"]
    os.kill(pid, signal.SIGKILL)
    status, output = terminal.finish()
    assert (status, json.loads(output)["error"]["code"]) == (1, 117)
    assert "The task's process ended without finishing it." in terminal.printed


def test_TaskThatSomebodyElseStops_IsAFailure(work, follow):
    terminal = follow(*work(counts(1, 4)).arguments())
    terminal.wait_until(shown(25))
    assert task("stop", terminal.task_id())["success"]
    status, output = terminal.finish()
    assert (status, json.loads(output)["data"]["files"]) == (1, {"done": 1, "total": 4})
    assert "webapi-exec: the task was stopped before all was done" in terminal.printed


def test_RecordThatSomebodyElseRemoves_IsAFailure(work, follow):
    terminal = follow(*work(counts(1, 4)).arguments())
    terminal.wait_until(shown(25))
    assert task("stop", terminal.task_id(), "--param", "remove=true")["success"]
    status, output = terminal.finish()
    assert (status, json.loads(output)["data"]["files"]) == (1, {"done": 1, "total": 4})
    assert "the task's record was removed" in terminal.printed


def test_RecordThatGoesWithItsTask_GivesItsLastResult(work, follow):
    steps = work(counts(1, 4), {"code": 445}, keep=False)
    terminal = follow(*steps.arguments())
    terminal.wait_until(shown(25))
    steps.open()
    status, output = terminal.finish()
    assert (status, json.loads(output)["error"]["code"]) == (1, 445)
    assert task("status", terminal.task_id())["error"]["code"] == 508, "gone, as it was to be"


# Ctrl-C

QUESTION = "Stop the task (s), leave it running (l), or continue watching (c)? "


def interrupted(terminal):
    """@return the task's id and process, while the question stands"""
    full_id = terminal.task_id()
    terminal.wait_until(shown(25))
    terminal.type(INTERRUPT)
    terminal.wait_for(QUESTION)
    return full_id, status_of(full_id)["data"]["pid"]


def test_Interrupt_ThenStop_EndsTheTask(work, follow):
    terminal = follow(*work(counts(1, 4)).arguments())
    _, pid = interrupted(terminal)
    terminal.type("s")
    status, output = terminal.finish()
    assert (status, json.loads(output)["data"]["files"]) == (1, {"done": 1, "total": 4})
    assert terminal.screen()[-2] == "webapi-exec: the task was stopped"
    assert_ends(pid)


@pytest.mark.parametrize("answer", ["l", INTERRUPT, "\x04"], ids=["l", "Ctrl-C", "Ctrl-D"])
@pytest.mark.parametrize("keep", [True, False])
def test_Interrupt_ThenLeave_LetsTheTaskGoOn(work, follow, answer, keep):
    steps = work(counts(1, 4), counts(4, 4), keep=keep)
    terminal = follow(*steps.arguments(), columns=200)
    full_id, pid = interrupted(terminal)
    assert os.getsid(pid) == pid, "Ctrl-C at the terminal does not reach it"
    terminal.type(answer)
    assert terminal.finish() == (130, "")
    again = f"webapi-exec --follow --task '{full_id}' --user 'alice'"
    assert again in [line.strip() for line in terminal.screen()]
    assert is_running(pid)
    assert status_of(full_id)["auto_remove"] is not keep, "as before"
    second = follow("--task", full_id, "--user", "alice")
    second.wait_until(shown(25))
    steps.open()
    status, output = second.finish()
    assert (status, json.loads(output)["data"]["files"]["done"]) == (0, 4)


def test_Interrupt_ThenContinue_GoesOnWatching(work, follow):
    steps = work(counts(1, 4), counts(3, 4), counts(4, 4))
    terminal = follow(*steps.arguments())
    interrupted(terminal)
    terminal.type("w")
    terminal.wait_for(QUESTION, times=2)
    terminal.type("c")
    steps.open(1)
    terminal.wait_until(shown(75))
    terminal.type(INTERRUPT)
    terminal.wait_for(QUESTION, times=3)
    steps.open()  # it ends while the question stands
    assert terminal.finish()[0] == 0
    assert terminal.screen()[-2].startswith("100% [")


def test_WhatWasTypedBeforeTheQuestion_IsNoAnswer(work, follow):
    terminal = follow(*work(counts(1, 4)).arguments())
    terminal.wait_until(shown(25))
    terminal.type("s")
    _, pid = interrupted(terminal)
    terminal.type("l")
    assert terminal.finish()[0] == 130
    assert is_running(pid)


def wait_for_start(terminal):
    while not children_of(terminal.process):
        assert terminal.process.poll() is None


def test_Interrupt_WhileTheTaskIsStarted_AsksWhenItsIdIsKnown(follow):
    parameters = ("--param", "silent=4", "--param", "pause=10000")
    terminal = follow("--api", WORK, "--method", "start", "--user", "alice", *parameters)
    wait_for_start(terminal)
    terminal.type(INTERRUPT)
    terminal.wait_for(QUESTION)
    pid = None
    while not pid:
        pid = status_of(terminal.task_id()).get("data", {}).get("pid")
    assert os.getsid(pid) == pid
    terminal.type("s")
    assert terminal.finish()[0] == 1
    assert_ends(pid)


def test_Interrupt_OfAStartThatHangs_EndsTheProgramTheSecondTime(work, follow):
    watched = follow(*work(counts(1, 4)).arguments())
    terminal = follow("--api", TASK, "--method", "wait", "--user", "alice",
                      "--param", f"task_id={watched.task_id()}", "--param", "timeout=60")
    wait_for_start(terminal)
    deadline = time.monotonic() + 30
    while terminal.process.poll() is None:
        assert time.monotonic() < deadline
        terminal.type(INTERRUPT)
        time.sleep(0.1)
    assert terminal.finish() == (-signal.SIGINT, "")


@pytest.mark.parametrize("number", [signal.SIGTERM, signal.SIGHUP], ids=["TERM", "HUP"])
def test_OtherSignal_LeavesTheTask(work, follow, number):
    terminal = follow(*work(counts(1, 4), keep=False).arguments())
    full_id = terminal.task_id()
    terminal.wait_until(shown(25))
    terminal.process.send_signal(number)
    assert terminal.finish() == (128 + number, "")
    status = status_of(full_id)
    assert (status["finish"], status["auto_remove"]) == (False, True)


# The terminal's own ways, which the question changes


@pytest.mark.parametrize("number", [signal.SIGTERM, signal.SIGHUP], ids=["TERM", "HUP"])
def test_OtherSignal_AtTheQuestion_LeavesTheTerminalAsItWas(work, follow, number):
    terminal = follow(*work(counts(1, 4)).arguments())
    before = terminal.settings()
    interrupted(terminal)
    assert terminal.settings() != before
    terminal.process.send_signal(number)
    assert terminal.finish() == (128 + number, "")
    assert terminal.settings() == before


@pytest.mark.parametrize(
    "answer", ["s", "l", INTERRUPT, "\x04"], ids=["s", "l", "Ctrl-C", "Ctrl-D"])
def test_Answer_LeavesTheTerminalAsItWas(work, follow, answer):
    terminal = follow(*work(counts(1, 4)).arguments())
    before = terminal.settings()
    interrupted(terminal)
    terminal.type(answer)
    assert terminal.finish()[0] == (1 if answer == "s" else 130)
    assert terminal.settings() == before


def test_Continue_GivesTheTerminalBackAtOnce(work, follow):
    terminal = follow(*work(counts(1, 4)).arguments())
    before = terminal.settings()
    interrupted(terminal)
    terminal.type("c")
    terminal.wait_until(shown(25))
    terminal.wait_until(lambda screen: terminal.settings() == before)
    assert terminal.process.poll() is None


def test_TaskThatEndsAtTheQuestion_LeavesTheTerminalAsItWas(work, follow):
    steps = work(counts(1, 4), counts(4, 4))
    terminal = follow(*steps.arguments())
    before = terminal.settings()
    interrupted(terminal)
    steps.open()
    assert terminal.finish()[0] == 0
    assert terminal.settings() == before


@pytest.mark.parametrize("key", ["\x1a", "\x1c"], ids=["Ctrl-Z", "Ctrl-Backslash"])
def test_KeyThatWouldStopTheProgram_AtTheQuestion_IsNoAnswer(work, follow, key):
    terminal = follow(*work(counts(1, 4)).arguments())
    interrupted(terminal)
    terminal.type(key)
    terminal.wait_for(QUESTION, times=2)
    terminal.type("l")
    assert terminal.finish()[0] == 130


# Without a terminal


def test_Pipe_GetsTheResultAlone(work):
    steps = work(counts(1, 2), counts(2, 2))
    steps.open()
    process = run("--follow", *steps.arguments())
    assert (process.returncode, process.stderr) == (0, "")
    assert json.loads(process.stdout)["data"]["files"]["done"] == 2
    assert process.stdout.count("\n") == 1


def test_Interrupt_WithoutATerminal_LeavesTheTask(work):
    steps = work(counts(1, 2))
    with subprocess.Popen([EXEC, "--follow", *steps.arguments()], stdout=subprocess.PIPE,
                          stderr=subprocess.PIPE, start_new_session=True, text=True) as process:
        full_id = following_id(process)
        process.send_signal(signal.SIGINT)
        output, message = process.communicate(timeout=30)
    assert (process.returncode, output) == (130, "")
    assert message == ("The task goes on. To follow it again:\n"
                       f"  webapi-exec --follow --task '{full_id}' --user 'alice'\n")
    assert is_running(status_of(full_id)["data"]["pid"])


def test_OutputThatCannotBePrinted_KeepsTheRecord(work):
    steps = work(counts(2, 2), keep=False)
    with open("/dev/full", "w", encoding="ascii") as full, subprocess.Popen(
        [EXEC, "--follow", *steps.arguments()], stdout=full, stderr=subprocess.PIPE
    ) as process:
        full_id = following_id(process)
        while status_of(full_id)["auto_remove"]:
            assert process.poll() is None
        steps.open()
        process.communicate(timeout=30)
    assert process.returncode == 1
    assert status_of(full_id)["data"]["files"]["done"] == 2


def test_ProgramThatIsKilled_LeavesTheTaskAndNoProcess(work, follow):
    terminal = follow(*work(counts(1, 4)).arguments())
    full_id = terminal.task_id()
    terminal.wait_until(shown(25))
    (child,) = children_of(terminal.process)
    terminal.process.kill()
    terminal.finish()
    deadline = time.monotonic() + 30
    while is_running(child):
        assert time.monotonic() < deadline
        time.sleep(0.05)
    assert is_running(status_of(full_id)["data"]["pid"])
