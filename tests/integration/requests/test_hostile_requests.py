"""Three hundred requests as nobody means them well: they get an answer or none, hurt nobody else, and
leave nothing behind."""

import json
import os
import threading
import time
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path
from statistics import median

import pytest

from client import Client
from conftest import BUILD, ENTRY, PASSWORDS, ROOT
from hostile import requests, send
from marks import wait_for
from webserver import WebServer

AT_ONCE = 2
# What the web server itself refuses; it may close before it has taken all, and its answer gets lost.
REFUSED = {"length", "length too short", "chunks", "cookies", "session cookies", "header", "headers",
           "agent", "address", "query", "verb", "verb with a body"}
LONGEST_LINE = 1024  # bytes of the log: some texts of a client, each cut, and the words around them
OTHERS = 0.1  # seconds that an ordinary call takes at most, beside what the machine needs for it


def entries():
    """The ids of the processes of entry.cgi."""
    found = set()
    for process in Path("/proc").glob("[0-9]*"):
        try:
            if os.path.samefile(process / "exe", ENTRY):
                found.add(process.name)
        except OSError:
            pass
    return found


def files():
    """What stands in the private root, where the program writes all that it writes."""
    return {path for path in ROOT.rglob("*") if not path.is_dir()}


@pytest.fixture
def logged(root, tmp_path):
    """A web server in front of an entry.cgi that logs to a file: the server and the file."""
    log = tmp_path / "log"
    program = tmp_path / "entry.cgi"
    shim = BUILD / "tests" / "integration" / "log_file.so"
    program.write_text(f"#!/bin/sh\nLOG_FILE={log} LD_PRELOAD={shim} exec {ENTRY}\n")
    program.chmod(0o755)
    server = WebServer(tmp_path / "server", program, "server.max-read-idle = 3\n")
    yield server.start(), log
    server.stop()


class Bystander(threading.Thread):
    """A logged-in client that goes on making ordinary calls."""

    def __init__(self, port):
        super().__init__()
        self.client = Client(port, "127.0.0.2")
        self.sid = self.client.login("alice", PASSWORDS["alice"]).data["sid"]
        self.goes_on = True
        self.seconds = []
        self.refused = []

    def call(self):
        start = time.monotonic()
        answer = self.client.call("QELO.Access.Session", "current", _sid=self.sid)
        self.seconds.append(time.monotonic() - start)
        if answer.status != 200 or answer.data["user"] != "alice":
            self.refused.append(answer.body)

    def run(self):
        while self.goes_on:
            self.call()
            time.sleep(0.02)

    def usual(self, calls=40):
        """How long a call takes without anybody else."""
        for _ in range(calls):
            self.call()
        usual = median(self.seconds)
        self.seconds = []
        return usual


def unchunked(body):
    """A body that the server passed on piece by piece; an end that is missing is an error."""
    whole = b""
    while True:
        size, _, rest = body.partition(b"\r\n")
        if int(size, 16) == 0:
            return whole
        whole += rest[:int(size, 16)]
        body = rest[int(size, 16) + 2:]


def is_whole(answer):
    """Whether it is an answer of the web API, or the server's own refusal."""
    start, _, body = answer.partition(b"\r\n\r\n")
    status = start.split(b" ", 2)[1]
    if b"\r\ntransfer-encoding: chunked" in start.lower():
        body = unchunked(body)
    if status == b"200":
        return json.loads(body)["success"] in (True, False)
    return status[:1] == b"4" or status in (b"501", b"505")


def test_HostileRequests_HurtNobodyElse_AndLeaveNothingBehind(logged):
    server, log = logged
    hostile = requests()
    assert len(hostile) >= 300
    bystander = Bystander(server.port)
    usual = bystander.usual()
    before = files()

    bystander.start()
    with ThreadPoolExecutor(AT_ONCE) as clients:
        answers = list(clients.map(lambda request: send(server.port, request), hostile))
    bystander.goes_on = False
    bystander.join()

    wrong = [(request.label, answer[:200]) for request, answer in zip(hostile, answers)
             if answer and not is_whole(answer)]
    assert wrong == []
    unanswered = [request.label for request, answer in zip(hostile, answers)
                  if not answer and request.hang_up is None and request.label not in REFUSED]
    assert unanswered == []

    assert bystander.refused == []
    meanwhile = median(bystander.seconds)
    print(f"an ordinary call: {usual * 1000:.1f} ms, meanwhile {meanwhile * 1000:.1f} ms")
    # The hostile ones take their share of the machine, however slow it is, and no more than that.
    assert meanwhile < OTHERS + usual * (AT_ONCE + 1)

    assert wait_for(lambda: entries() == set(), 15), "processes are left"
    left = files() - before
    # Of an address so many logins may fail, one account or many; each leaves a note of when.
    assert {path.parent for path in left} <= {ROOT / "run" / "webapi" / "logins"}
    assert len(left) <= 21
    assert list((server.directory / "uploads").iterdir()) == []
    lines = log.read_bytes().split(b"\n")
    assert len(lines) > 50
    assert max(map(len, lines)) <= LONGEST_LINE
