"""Stores on a disk that is full: what is there stays, what is new is refused as documented."""

import json
import os
import subprocess

import pytest

from conftest import BUILD, PASSWORDS, SESSIONS
from tasks import TASK, WORK, alice, started  # noqa: F401

TOKEN = BUILD / "programs" / "webapi-token"
STATE = "var/lib/webapi"


@pytest.fixture
def small(root):
    """Puts a small file system in the place of a directory: small(path, mode, KiB)."""
    mounted = []

    def mount(path, mode, size):
        directory = root / path
        directory.mkdir(mode=mode, parents=True, exist_ok=True)
        options = f"size={size}k,mode={mode:o}"
        command = ["mount", "-t", "tmpfs", "-o", options, "none", directory]
        if os.geteuid() != 0 or subprocess.run(command, capture_output=True, check=False).returncode:
            pytest.skip("needs the right to mount")
        mounted.append(directory)
        return directory

    yield mount
    for directory in reversed(mounted):
        subprocess.run(["umount", "-l", directory], check=True)


def fill(directory):
    """Writes until there is no byte left. @return the file to remove for room"""
    file = directory / ".filling"
    with open(file, "wb", buffering=0) as filling:
        for size in (4096, 1):
            try:
                while filling.write(b"x" * size):
                    pass
            except OSError:
                pass
    return file


def names(directory):
    return sorted(entry for entry in os.listdir(directory) if not entry.startswith("."))


def test_Sessions_OfBeforeGoOn_AndNoneBegins(client, small):
    sessions = small("run/webapi/sessions", 0o700, 64)
    assert sessions == SESSIONS
    before = client.login("alice", PASSWORDS["alice"]).data
    filling = fill(sessions)
    there = names(sessions)
    for _ in range(2):
        assert client.login("bob", PASSWORDS["bob"]).code == 401
    assert names(sessions) == there
    answer = client.call("QELO.Access.Session", "current", _sid=before["sid"])
    assert answer.data["user"] == "alice"
    filling.unlink()
    assert client.login("bob", PASSWORDS["bob"]).data["user"] == "bob"
    assert client.call("QELO.Access.Session", "logout", _sid=before["sid"]).code == 0


def token(*arguments):
    return subprocess.run([TOKEN, *arguments], capture_output=True, text=True, check=False)


def test_Tokens_OfBeforeGoOn_AndNoneIsMade(client, small):
    state = small(STATE, 0o711, 256)

    def caller(text):
        return client.call("QELO.Test.Identity", "plain", tid=text).data["user"]

    first = token("create", "--user", "alice").stdout.strip()
    assert caller(first) == "alice"
    filling = fill(state)
    refused = 0
    for _ in range(200):  # the log of the database may have some room left
        made = token("create", "--user", "alice")
        if made.returncode != 0:
            assert made.stdout == "" and "full" in made.stderr, made
            refused += 1
            break
        assert caller(made.stdout.strip()) == "alice"
    assert refused == 1
    assert caller(first) == "alice"
    filling.unlink()
    assert caller(first) == "alice"
    assert caller(token("create", "--user", "alice").stdout.strip()) == "alice"


def test_Tasks_OfBeforeCanBeSeen_AndNoneBegins(alice, small):
    tasks = small(STATE + "/tasks", 0o1733, 512)
    first = alice.start(steps=1, pause=10_000)
    filling = fill(tasks)
    refused = []
    for _ in range(100):
        answer = alice.call(WORK, "start", steps=1, pause=10_000)
        if answer.code != 0:
            refused.append(answer.code)
            break
        alice.started.append((alice, answer.data["task_id"]))
    assert refused == [117]
    status = alice.status(first).data
    assert (status["success"], status["finish"]) == (True, False)
    filling.unlink()
    assert alice.status(alice.start(steps=1, pause=10_000)).data["finish"] is False
    for user, full_id in alice.started:
        assert user.call(TASK, "stop", task_id=full_id).code == 0
    alice.started.clear()


def test_Counts_ThatCannotBeKept_LetNobodyIn(client, small):
    logins = small("run/webapi/logins", 0o700, 16)
    filling = fill(logins)
    answer = client.login("alice", PASSWORDS["alice"])
    assert answer.code == 401, json.dumps(answer.json)
    filling.unlink()
    assert client.login("alice", PASSWORDS["alice"]).code == 0
