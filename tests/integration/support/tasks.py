"""Users who start background tasks, and what becomes of the tasks after a test."""

import time

import pytest

from conftest import session_of

WORK = "QELO.Test.Background"
TASK = "QELO.Work.Task"
LONG = {"steps": 1, "pause": 10_000}  # a result at once, then ten seconds of work


class User:
    """A logged-in user and the tasks that were started for a test."""

    def __init__(self, client, account, started):
        self.client = client
        self.account = account
        self.sid = session_of(client, account)["sid"]
        self.started = started

    def call(self, api, method, **parameters):
        return self.client.call(api, method, _sid=self.sid, **parameters)

    def start(self, method="start", **parameters):
        answer = self.call(WORK, method, **parameters)
        full_id = answer.data["task_id"]
        self.started.append((self, full_id))
        return full_id

    def status(self, full_id, **parameters):
        return self.call(TASK, "status", task_id=full_id, **parameters)

    def wait_for_end(self, full_id):
        state = ""
        deadline = time.monotonic() + 20
        while time.monotonic() < deadline:
            data = self.call(TASK, "wait", task_id=full_id, state=state, timeout=5).data
            if data["finish"]:
                return data
            state = data["state"]
        raise AssertionError(f"{full_id} does not end")


@pytest.fixture
def alice(client, started):
    return User(client, "alice", started)


@pytest.fixture
def bob(client, started):
    return User(client, "bob", started)


@pytest.fixture
def admin(client, started):
    return User(client, "admin", started)


@pytest.fixture
def started():
    tasks = []
    yield tasks
    for user, full_id in tasks:
        user.call(TASK, "stop", task_id=full_id, remove="true")


def is_running(pid):
    try:
        with open(f"/proc/{pid}/stat", encoding="utf-8") as file:
            return file.read().rsplit(")", 1)[1].split()[0] != "Z"
    except FileNotFoundError:
        return False


def assert_ends(pid):
    deadline = time.monotonic() + 5
    while is_running(pid):
        assert time.monotonic() < deadline, f"process {pid} goes on"
        time.sleep(0.01)
