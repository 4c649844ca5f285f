"""What a call leaves behind in a worker: the next call finds a process as it was, or another one."""

import time

import pytest

from conftest import session_of
from marks import mark, wait_for  # noqa: F401  (a fixture)
from scgi import staying, start_workers  # noqa: F401  (fixtures)

PUT_BACK = ["directory", "environment", "umask", "handler", "mask", "alarm", "locale", "thread locale",
            "C++ locale", "format", "stream errors", "streams closed", "name"]
ENDS = {"descriptor": "a descriptor", "high descriptor": "a descriptor", "lock": "a descriptor",
        "child": "a process", "grandchild": "a process", "thread": "a thread", "priority": "another priority",
        "schedule": "another priority", "memory": "too much memory", "timer": "a timer",
        "limit": "another limit"}


@pytest.fixture
def one(start_workers, staying, client):
    """A server with one front, so that each call finds the worker of the one before."""
    started = start_workers("--fronts", 1)
    sid = session_of(client, "alice")["sid"]

    def call(method):
        time.sleep(0.02)  # so that the worker is ready, however busy the machine is
        answer = started.call(f"{staying}{method}&_sid={sid}")
        assert answer["success"], (method, answer)
        return answer.get("data")

    started.ask = call
    return started


@pytest.mark.parametrize("what", PUT_BACK)
def test_WhatCanBePutBack_Is(one, what):
    before = one.ask("state")
    first = one.ask("who")
    for _ in range(3):
        one.ask(f"leave&what={what.replace('+', '%2B')}")
        assert one.ask("state") == before
    after = one.ask("who")
    assert (after["pid"], after["descriptors"]) == (first["pid"], first["descriptors"])


@pytest.mark.parametrize("what", ENDS)
def test_WhatCannotBePutBack_EndsTheWorker(one, what, mark):
    before = one.ask("state")
    first = one.ask("who")
    one.ask(f"leave&what={what}&file={mark}")
    assert one.ask("state") == before
    after = one.ask("who")
    assert (after["pid"] != first["pid"], after["calls"]) == (True, 1)
    one.log_line(f"of system ended: a call has left {ENDS[what]}")
    time.sleep(0.1)
    assert one.ask("state") == before


@pytest.mark.parametrize("what", ["other descriptor", "pending"])
def test_WhatEndsTheProcess_CostsNoOtherCall(one, what):
    before = one.ask("state")
    first = one.ask("who")
    started = [one.request(f"api=QELO.Test.Staying&version=1&method=leave&what={what}")]
    assert started
    try:
        one.ask(f"leave&what={what}")
    except AssertionError:  # its own answer may have gone the wrong way
        pass
    for _ in range(3):
        assert one.ask("state") == before
    assert one.ask("who")["pid"] != first["pid"]
